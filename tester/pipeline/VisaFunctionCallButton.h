#pragma once

#include "pipeline/VisaFunctionCallCreator.h"

#include <QPushButton>

/**
 * A push button that sends one kind of request.
 *
 * The mouse release sends, not the clicked signal: a programmatic click(), Space and Return send nothing. Other widgets
 * send through the slot.
 */
class VisaFunctionCallButton : public QPushButton, public VisaFunctionCallCreator
{
    Q_OBJECT

public:
    VisaFunctionCallButton(VisaFunctionCallHandler *handler, VisaFunctionCallTyp type, QWidget *parent);

public slots:
    void sendFunctionCall();

signals:
    /// A request was built and handed to the handler (which may have refused it).
    void functionCallSended();

protected:
    void mouseReleaseEvent(QMouseEvent *event) override;
};
