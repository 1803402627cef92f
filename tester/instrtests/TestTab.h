#pragma once

#include <QWidget>

class QCheckBox;
class SessionLog;
class TestFunctionWidget;
class VisaFunctionCallHandler;

/// The page "Tests": two slots for instrument tests, and what of them is logged. Slot 0 tests the session's own resource,
/// slot 1 any other.
class TestTab : public QWidget
{
    Q_OBJECT

public:
    TestTab(VisaFunctionCallHandler *handler, QWidget *parent);

    /// The log that the check boxes switch (not owned). To be called once.
    void setTestLog(SessionLog *log);

public slots:
    void resourceNameChanged(const QString &name);
    /// Does nothing: both slots are always shown.
    void showTestTwo(bool show);

private:
    SessionLog *m_testLog = nullptr;
    QCheckBox *m_showLog;
    QCheckBox *m_writeLog;
    TestFunctionWidget *m_sessionTest;
    TestFunctionWidget *m_otherTest;
};
