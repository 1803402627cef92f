#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <QLabel>
#include <QPalette>

/**
 * Shows the status of the last finished call: blue success, orange warning, red error. Every call that starts resets it.
 *
 * It also closes the session when a call reports that the connection was lost.
 */
class StatusLabel : public QLabel, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    StatusLabel(VisaFunctionCallHandler *handler, QWidget *parent);

    void setStatus(const unsigned int &status);
    void setDefault();
    void visaFunctionCallFinished(_visaFunctionCall &call) override;
    void newVisaCallStarted(const VisaFunctionCallTyp &type) override;

private:
    QPalette m_success;
    QPalette m_warning;
    QPalette m_error;
};
