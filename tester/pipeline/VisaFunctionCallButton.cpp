#include "pipeline/VisaFunctionCallButton.h"

#include <QPointer>

VisaFunctionCallButton::VisaFunctionCallButton(VisaFunctionCallHandler *handler, VisaFunctionCallTyp type,
                                               QWidget *parent)
    : QPushButton(parent), VisaFunctionCallCreator(handler)
{
    setType(type);
}

void VisaFunctionCallButton::sendFunctionCall()
{
    if (VisaFunctionCallCreator::sendFunctionCall())
        emit functionCallSended();
}

void VisaFunctionCallButton::mouseReleaseEvent(QMouseEvent *event)
{
    // Whoever hears of the request may delete the button.
    const QPointer<VisaFunctionCallButton> alive(this);
    sendFunctionCall();
    if (alive)
        QPushButton::mouseReleaseEvent(event);
}
