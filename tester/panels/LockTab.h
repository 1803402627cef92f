#pragma once

#include "pipeline/VisaFunctionCallListener.h"
#include "pipeline/VisaFunctionCallParameter.h"

#include <QWidget>

class LineEditParameter;
class QLabel;
class QLineEdit;
class SpinBoxParameter;
class VisaFunctionCallButton;

/**
 * The page that locks and unlocks the resource, and switches a GPIB instrument between local and remote.
 *
 * "Actual AccessKey" shows the key of the last shared lock that was granted. It hears of shared locks only: what follows,
 * an unlock too, leaves the key there for the user to pass on.
 */
class LockTab : public QWidget, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    LockTab(VisaFunctionCallHandler *handler, QWidget *parent);

    void visaFunctionCallFinished(_visaFunctionCall &call) override;

private:
    void setupUi();
    void setupNames();
    void setupTexts();

    LineEditParameter *m_requestedKey;
    QLabel *m_requestedKeyLabel;
    QLineEdit *m_accessKey;
    QLabel *m_accessKeyLabel;
    SpinBoxParameter *m_timeout;
    QLabel *m_timeoutLabel;
    VisaFunctionCallButton *m_exclusive;
    VisaFunctionCallButton *m_shared;
    VisaFunctionCallButton *m_unlock;
    VisaFunctionCallButton *m_local;
    VisaFunctionCallButton *m_remote;
    VisaFunctionCallParameterValue m_localMode;
    VisaFunctionCallParameterValue m_remoteMode;
};
