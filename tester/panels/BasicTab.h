#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <QTimer>
#include <QWidget>

class QCheckBox;
class QLabel;
class QPlainTextEdit;
class QPushButton;
class ScipiLineEdit;
class SpinBoxParameter;
class VisaFunctionCallButton;

/**
 * The page on which the user talks to the instrument in text.
 *
 * Listens to every kind of call, so that the page follows requests of other pages too: an opened session gets the state
 * of "Send End", and an attribute set elsewhere is reflected in that box.
 *
 * Hotkeys, while the page is visible: Ctrl+W writes, Ctrl+R reads, Ctrl+Q queries. The session tab passes on keys that
 * were pressed elsewhere.
 */
class BasicTab : public QWidget, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    BasicTab(VisaFunctionCallHandler *handler, QWidget *parent);

    ScipiLineEdit *getCommandLine() const { return m_command; }

    void visaFunctionCallFinished(_visaFunctionCall &call) override;
    void keyPressEvent(QKeyEvent *event) override;

public slots:
    void endEnableClicked(const bool &enabled);
    void buttonClearHistoryClicked();
    /// Ends the green of a fresh status byte.
    void timeup();

private:
    void setupUi();
    void setupNames();
    void setupTexts();
    void setupConnections();
    void sendEnd(bool enabled);
    void appendToReadView(const std::string &bytes);

    ScipiLineEdit *m_command;
    VisaFunctionCallButton *m_write;
    VisaFunctionCallButton *m_read;
    VisaFunctionCallButton *m_query;
    VisaFunctionCallButton *m_readStb;
    VisaFunctionCallButton *m_trigger;
    VisaFunctionCallButton *m_clear;
    QLabel *m_readCountLabel;
    SpinBoxParameter *m_readCount;
    QLabel *m_statusByte;
    QCheckBox *m_sendEnd;
    QPlainTextEdit *m_readView;
    QPushButton *m_clearText;
    QPushButton *m_clearHistory;
    QTimer m_statusByteTimer; ///< restarted by each reading
};
