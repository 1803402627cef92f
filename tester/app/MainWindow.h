#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <QMainWindow>

class SessionInstanceTab;
class StatusLabel;
class VisaDispatcher;

/**
 * The window: a tool bar, one session, a status bar.
 *
 * Its title names the VISA implementation once three attribute requests, sent at start, have been answered. Any failing
 * call and any foreign attribute result that comes first ends the composition; the title then stays as it is.
 *
 * It owns the dispatcher, which the session uses as long as it lives: the session is deleted before the other children.
 */
class MainWindow : public QMainWindow, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    explicit MainWindow(QWidget *parent);
    ~MainWindow() override;

    void visaFunctionCallFinished(_visaFunctionCall &call) override;
    void newVisaCallStarted(const VisaFunctionCallTyp &type) override;

public slots:
    void findResource();
    void showLoggingDialog();
    void kyVisaConfigClicked();
    void kyVisaTraceToolClicked();
    /// Asks for the three attributes that the title is made of.
    void updateTitle();
    void chooseImplementation();
    void changeVisa(unsigned short implementation);

private:
    void readSettings();
    void writeSettings();
    void setupUi();
    void setupConnections();
    void setPlainTitle();
    void composeTitle();

    SessionInstanceTab *m_sessionTab = nullptr;
    VisaDispatcher *m_dispatcher;
    StatusLabel *m_statusLabel = nullptr;
    QString m_manufacturer;
    unsigned m_implVersion = 0;
    bool m_titleDone = false; ///< composed, or given up
};
