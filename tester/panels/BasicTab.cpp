#include "panels/BasicTab.h"

#include "panels/ScipiLineEdit.h"
#include "panels/SpinBoxParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QCheckBox>
#include <QGridLayout>
#include <QKeyEvent>
#include <QLabel>
#include <QPlainTextEdit>
#include <QPushButton>
#include <QSignalBlocker>
#include <QTextOption>

#include <algorithm>
#include <limits>

namespace
{
constexpr int StatusByteFreshMs = 4000;
constexpr int MostCharacters = 16 << 20; ///< in the read view; Qt itself ends the program at about a thousand million
constexpr int CommandCharacters = 20;    ///< of the line's least width; long history items must not widen the page
} // namespace

BasicTab::BasicTab(VisaFunctionCallHandler *handler, QWidget *parent)
    : QWidget(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::All), m_command(new ScipiLineEdit(this)),
      m_write(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::Write, this)),
      m_read(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::Read, this)),
      m_query(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::Query, this)),
      m_readStb(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::ReadSTB, this)),
      m_trigger(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::AssertTrigger, this)),
      m_clear(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::Clear, this)),
      m_readCountLabel(new QLabel(this)), m_readCount(new SpinBoxParameter(this)), m_statusByte(new QLabel(this)),
      m_sendEnd(new QCheckBox(this)), m_readView(new QPlainTextEdit(this)), m_clearText(new QPushButton(this)),
      m_clearHistory(new QPushButton(this)), m_statusByteTimer(this)
{
    m_write->setParameter(m_command);
    m_read->setParameter(m_readCount);
    m_query->setParameter(m_command);
    m_query->setParameter(m_readCount);
    setupUi();
    setupConnections();
}

void BasicTab::setupUi()
{
    setupNames();
    setupTexts();

    m_command->setSizeAdjustPolicy(QComboBox::AdjustToMinimumContentsLengthWithIcon);
    m_command->setMinimumContentsLength(CommandCharacters);
    m_readCount->setRange(0, std::numeric_limits<int>::max());
    m_readCount->setValue(1024);
    m_readCountLabel->setBuddy(m_readCount);
    m_sendEnd->setChecked(true);
    m_statusByte->setTextInteractionFlags(Qt::TextSelectableByMouse);
    m_readView->setReadOnly(true);
    m_readView->setUndoRedoEnabled(false); // otherwise each read would be kept twice
    // Looking for places to break at takes minutes in half a megabyte that has none.
    m_readView->setWordWrapMode(QTextOption::WrapAnywhere);
    m_statusByteTimer.setSingleShot(true);
    m_statusByteTimer.setTimerType(Qt::PreciseTimer);
    timeup();

    // Request buttons answer the mouse only; keeping them out of the tab chain leaves no stop where the keys do nothing,
    // and a click leaves the cursor in the command line.
    for (VisaFunctionCallButton *button : {m_write, m_read, m_query, m_readStb, m_trigger, m_clear})
        button->setFocusPolicy(Qt::NoFocus);

    auto *grid = new QGridLayout(this);
    grid->addWidget(m_command, 0, 0, 1, 3);
    grid->addWidget(m_clearHistory, 0, 3);
    grid->addWidget(m_write, 1, 0);
    grid->addWidget(m_read, 1, 1);
    grid->addWidget(m_query, 1, 2);
    grid->addWidget(m_sendEnd, 1, 3);
    grid->addWidget(m_readStb, 2, 0);
    grid->addWidget(m_statusByte, 2, 1);
    grid->addWidget(m_trigger, 2, 2);
    grid->addWidget(m_clear, 2, 3);
    grid->addWidget(m_readCountLabel, 3, 0);
    grid->addWidget(m_readCount, 3, 1, 1, 2);
    grid->addWidget(m_clearText, 3, 3);
    grid->addWidget(m_readView, 4, 0, 1, 4);
    grid->setRowStretch(4, 1);

    setTabOrder(m_command, m_clearHistory);
    setTabOrder(m_clearHistory, m_sendEnd);
    setTabOrder(m_sendEnd, m_readCount);
    setTabOrder(m_readCount, m_clearText);
    setTabOrder(m_clearText, m_readView);
}

void BasicTab::setupNames()
{
    setObjectName(QStringLiteral("basicTab"));
    m_command->setObjectName(QStringLiteral("basicCommand"));
    m_write->setObjectName(QStringLiteral("basicWrite"));
    m_read->setObjectName(QStringLiteral("basicRead"));
    m_query->setObjectName(QStringLiteral("basicQuery"));
    m_readStb->setObjectName(QStringLiteral("basicReadStb"));
    m_trigger->setObjectName(QStringLiteral("basicTrigger"));
    m_clear->setObjectName(QStringLiteral("basicClear"));
    m_readCountLabel->setObjectName(QStringLiteral("basicReadCountLabel"));
    m_readCount->setObjectName(QStringLiteral("basicReadCount"));
    m_statusByte->setObjectName(QStringLiteral("basicStatusByte"));
    m_sendEnd->setObjectName(QStringLiteral("basicSendEnd"));
    m_readView->setObjectName(QStringLiteral("basicReadView"));
    m_clearText->setObjectName(QStringLiteral("basicClearText"));
    m_clearHistory->setObjectName(QStringLiteral("basicClearHistory"));

    m_command->setAccessibleName(tr("Command"));
    m_readCount->setAccessibleName(tr("Read count"));
    m_statusByte->setAccessibleName(tr("Status byte"));
    m_readView->setAccessibleName(tr("Read data"));
}

void BasicTab::setupTexts()
{
    const QString control = tr("Ctrl");
    m_command->setToolTip(tr("Command field."));
    m_write->setText(tr("Write"));
    m_write->setToolTip(tr("Write the text to the remote interface.\nHotkey: ") + control + tr(" + W"));
    m_read->setText(tr("Read"));
    m_read->setToolTip(tr("Read from the remote intreface.\nHotkey: ") + control + tr(" + R"));
    m_query->setText(tr("Query"));
    m_query->setToolTip(tr("Write and Read.\nHotkey: ") + control + tr(" + Q"));
    m_readStb->setText(tr("Read STB"));
    m_readStb->setToolTip(tr("Read the Status Byte."));
    m_trigger->setText(tr("Trigger"));
    m_trigger->setToolTip(tr("Send a Trigger."));
    m_clear->setText(tr("Clear"));
    m_clear->setToolTip(tr("Cleared the Remoteinterface."));
    m_readCountLabel->setText(tr("Read count"));
    m_readCountLabel->setToolTip(tr("Bytes to read."));
    m_readCount->setToolTip(tr("Bytes to read."));
    m_statusByte->setText(QStringLiteral("0x----"));
    m_statusByte->setToolTip(tr("Status byte of the last \"Read STB\"; green while it is fresh."));
    m_sendEnd->setText(tr("Send End"));
    m_sendEnd->setToolTip(tr("Mark the last byte of each write as the end of the message."));
    m_readView->setToolTip(tr("Show the text, which was read."));
    m_clearText->setText(tr("Clear Text"));
    m_clearText->setToolTip(tr("Clears the readview."));
    m_clearHistory->setText(tr("Clear History"));
    m_clearHistory->setToolTip(tr("Delete old commands."));
}

void BasicTab::setupConnections()
{
    connect(m_command, &ScipiLineEdit::write, m_write, &VisaFunctionCallButton::sendFunctionCall);
    connect(m_command, &ScipiLineEdit::read, m_read, &VisaFunctionCallButton::sendFunctionCall);
    connect(m_clearHistory, &QPushButton::clicked, this, &BasicTab::buttonClearHistoryClicked);
    connect(m_clearText, &QPushButton::clicked, m_readView, &QPlainTextEdit::clear);
    connect(m_write, &VisaFunctionCallButton::functionCallSended, m_readView, &QPlainTextEdit::clear);
    connect(m_query, &VisaFunctionCallButton::functionCallSended, m_readView, &QPlainTextEdit::clear);
    connect(m_sendEnd, &QCheckBox::toggled, this, &BasicTab::endEnableClicked);
    connect(&m_statusByteTimer, &QTimer::timeout, this, &BasicTab::timeup);
}

void BasicTab::visaFunctionCallFinished(_visaFunctionCall &call)
{
    if (call.status < 0)
        return;
    switch (call.type) {
    case VisaFunctionCallTyp::Open:
        sendEnd(m_sendEnd->isChecked());
        break;
    case VisaFunctionCallTyp::SetAttribute:
        if (call.parameter[0].uintValue == VI_ATTR_SEND_END_EN) {
            const QSignalBlocker noNewCall(m_sendEnd);
            m_sendEnd->setChecked(call.parameter[1].uintValue != 0);
        }
        break;
    case VisaFunctionCallTyp::Read:
    case VisaFunctionCallTyp::Query:
        appendToReadView(call.parameter[0].stringValue);
        break;
    case VisaFunctionCallTyp::ReadSTB:
        m_statusByte->setStyleSheet(QStringLiteral("QLabel { color: green }"));
        m_statusByte->setText(QStringLiteral("0x%1").arg(call.parameter[0].uintValue & 0xFFFF, 0, 16));
        m_statusByteTimer.start(StatusByteFreshMs);
        break;
    default:
        break;
    }
}

/// Inserts instead of setting the whole text anew: the text is the same, and a long session of reads stays fast. What is
/// longer than the view holds is cut; a view that would overflow begins anew.
void BasicTab::appendToReadView(const std::string &bytes)
{
    const auto length = std::min(bytes.size(), static_cast<std::size_t>(MostCharacters));
    const QString text = QString::fromUtf8(bytes.data(), static_cast<int>(length));
    const int shown = m_readView->document()->characterCount() - 1; // an empty document counts one
    if (shown > MostCharacters - text.size())
        m_readView->clear();
    QTextCursor end(m_readView->document());
    end.movePosition(QTextCursor::End);
    const int start = end.position();
    end.insertText(text);
    end.setPosition(start);
    m_readView->setTextCursor(end); // scrolls to where the new data begins
}

void BasicTab::endEnableClicked(const bool &enabled)
{
    sendEnd(enabled);
}

void BasicTab::sendEnd(bool enabled)
{
    _visaFunctionCall call;
    call.type = VisaFunctionCallTyp::SetAttribute;
    call.parameter[0].uintValue = VI_ATTR_SEND_END_EN;
    call.parameter[1].uintValue = enabled ? 1 : 0;
    sendVisaFunctionCall(call);
}

void BasicTab::buttonClearHistoryClicked()
{
    m_command->clear();
}

void BasicTab::timeup()
{
    m_statusByte->setStyleSheet(QStringLiteral("QLabel { color: black }"));
}

void BasicTab::keyPressEvent(QKeyEvent *event)
{
    VisaFunctionCallButton *button = nullptr;
    if (isVisible() && event->modifiers() == Qt::ControlModifier) {
        switch (event->key()) {
        case Qt::Key_W:
            button = m_write;
            break;
        case Qt::Key_R:
            button = m_read;
            break;
        case Qt::Key_Q:
            button = m_query;
            break;
        default:
            break;
        }
    }
    if (!button) {
        event->ignore();
        return;
    }
    event->accept();
    button->sendFunctionCall();
}
