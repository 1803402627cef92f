#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <QFrame>

class ObserverLineEdit;
class OpenModeParameter;
class QCheckBox;
class QLayout;
class ResourceName;
class SpinBoxParameter;
class VisaFunctionCallButton;

/**
 * The strip at the top of a session: resource string, Connect or Disconnect, access mode, open time-out, log switches.
 *
 * A press of Connect sends the open request with the text as it stands and then stores the text as the session's
 * resource name. Return in the line edit only stores it. The frame follows the results: a finished open that did not fail
 * shows Disconnect and disables the line edit, any finished close shows Connect again.
 */
class ResourceFrame : public QFrame, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    ResourceFrame(VisaFunctionCallHandler *handler, QWidget *parent);

    /// Shows @p name and stores changes in it. Not owned.
    void setResourceName(ResourceName *name);
    void visaFunctionCallFinished(_visaFunctionCall &call) override;

    ObserverLineEdit *getLineEdit() const { return m_resource; }
    QCheckBox *getShowLog() const { return m_showLog; }
    QCheckBox *getWriteLog() const { return m_writeLog; }

public slots:
    /// Stores the line edit's text as the session's resource name.
    void newResourceName();

private:
    void setupUi();
    void setConnected(bool connected);

    ObserverLineEdit *m_resource;
    VisaFunctionCallButton *m_connect;
    VisaFunctionCallButton *m_disconnect;
    OpenModeParameter *m_accessMode;
    SpinBoxParameter *m_timeout;
    QCheckBox *m_showLog;
    QCheckBox *m_writeLog;
    ResourceName *m_resourceName = nullptr;
};
