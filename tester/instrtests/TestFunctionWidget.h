#pragma once

#include "pipeline/VisaFunctionCallListener.h"
#include "pipeline/VisaFunctionCallParameter.h"

#include <QWidget>

#include <memory>

class ComboBoxParamerter;
class LineEditParameter;
class QLabel;
class QPushButton;
class VisaFunctionCallButton;
class VisaFunctionCallHandler;

/**
 * Starts and stops the tests of one slot and shows whether one runs.
 *
 *     idle ──Start Test──> running ──Stop Test──> stopping (wait cursor)
 *      ^                      │                       │
 *      └───── StopTest record of this slot ───────────┘     red and a warning when its result is not 0
 *
 * Two ways would lead nowhere, were it not for SendWatch, which knows whether the handler took a request: the buttons say
 * "sent" of a refused one, too. A start that was refused runs nothing, so its stop brings the slot back at once. A stop
 * that was refused goes out once more without the lock, and one that was taken is followed by a request without the lock:
 * its own result comes only when the test ends, and the other buttons must not wait for that.
 */
class TestFunctionWidget : public QWidget, public VisaFunctionCallListener, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    TestFunctionWidget(unsigned id, VisaFunctionCallHandler *handler, QWidget *parent);
    ~TestFunctionWidget() override;

    void setResourceText(const QString &name);
    /// The slot tests what setResourceText() says, and nothing that the user types.
    void setResourceFixed();
    /// Shows or hides the finder's button.
    void enableFindButton(bool enable);

    /// The slot's number.
    bool getParameter(Parameter &parameter) override;
    void visaFunctionCallFinished(_visaFunctionCall &call) override;

public slots:
    void testStarted();
    void stopTestClicked();
    void findResourceClicked();

private:
    class SendWatch;

    void setupUi();
    void setupConnections();
    void fillChooser();
    void becomeIdle();
    void showResult(const QString &text, Qt::GlobalColor color);
    void warn();
    void sendUnlocked(VisaFunctionCallTyp type);

    const unsigned m_id;
    bool m_running = false; ///< the handler took the start, and the test's end has not arrived yet
    std::unique_ptr<SendWatch> m_watch;
    QLabel *m_status;
    LineEditParameter *m_resource;
    QPushButton *m_find;
    ComboBoxParamerter *m_chooser;
    VisaFunctionCallButton *m_start;
    VisaFunctionCallButton *m_stop;
    QLabel *m_result;
};
