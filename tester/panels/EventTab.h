#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <QWidget>

class EventComboBox;
class MechanismFrame;
class QLabel;
class VisaFunctionCallButton;

/**
 * The page that enables, disables, discards and waits for events, and installs the handler that logs them.
 *
 * Which events are enabled only the VISA library knows. What came of a request stands in the log and in the status label;
 * events that reach the handler are lines of the log.
 */
class EventTab : public QWidget, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    EventTab(VisaFunctionCallHandler *handler, QWidget *parent);

    void visaFunctionCallFinished(_visaFunctionCall &call) override;

private:
    void setupUi();
    void setupNames();
    void setupTexts();

    QLabel *m_typeLabel;
    EventComboBox *m_type;
    MechanismFrame *m_mechanism;
    VisaFunctionCallButton *m_enable;
    VisaFunctionCallButton *m_disable;
    VisaFunctionCallButton *m_discard;
    VisaFunctionCallButton *m_wait;
    VisaFunctionCallButton *m_install;
    VisaFunctionCallButton *m_uninstall;
};
