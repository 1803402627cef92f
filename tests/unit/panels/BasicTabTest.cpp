#include "PanelTest.h"

#include "panels/BasicTab.h"
#include "panels/ScipiLineEdit.h"
#include "panels/SpinBoxParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QCheckBox>
#include <QElapsedTimer>
#include <QLabel>
#include <QLineEdit>
#include <QPlainTextEdit>

namespace
{
class BasicTabTest : public PanelTest
{
protected:
    VisaFunctionCallButton *button(const char *name) const { return find<VisaFunctionCallButton>(m_tab, name); }
    QString shown() const { return m_view->toPlainText(); }

    void hotkey(int key, Qt::KeyboardModifiers modifiers = Qt::ControlModifier)
    {
        QKeyEvent event(QEvent::KeyPress, key, modifiers);
        event.ignore();
        m_tab.keyPressEvent(&event);
        m_accepted = event.isAccepted();
    }

    _visaFunctionCall data(Kind kind, const std::string &bytes, ViStatus status = 0)
    {
        _visaFunctionCall call = result(kind, status);
        call.parameter[0].stringValue = bytes;
        return call;
    }

    _visaFunctionCall attribute(Kind kind, std::uint64_t id, std::uint64_t value, ViStatus status = 0)
    {
        _visaFunctionCall call = result(kind, status);
        call.parameter[0].uintValue = id;
        call.parameter[1].uintValue = value;
        return call;
    }

    _visaFunctionCall statusByte(std::uint64_t value)
    {
        _visaFunctionCall call = result(Kind::ReadSTB);
        call.parameter[0].uintValue = value;
        return call;
    }

    void expectSendEndRequest(std::uint64_t value)
    {
        const auto sent = requests();
        ASSERT_EQ(sent.size(), 1u);
        EXPECT_EQ(sent[0].type, Kind::SetAttribute);
        EXPECT_EQ(sent[0].parameter[0].uintValue, 0x3FFF0016u);
        EXPECT_EQ(sent[0].parameter[1].uintValue, value);
    }

    BasicTab m_tab{m_handler.get(), nullptr};
    ScipiLineEdit *m_command = find<ScipiLineEdit>(m_tab, "basicCommand");
    QPlainTextEdit *m_view = find<QPlainTextEdit>(m_tab, "basicReadView");
    QCheckBox *m_sendEnd = find<QCheckBox>(m_tab, "basicSendEnd");
    QLabel *m_stb = find<QLabel>(m_tab, "basicStatusByte");
    bool m_accepted = false;
};

TEST_F(BasicTabTest, ShowsItsTextsAndTooltips)
{
    struct Row {
        const char *name;
        const char *text;
        const char *toolTip;
    };
    for (const Row &row :
         {Row{"basicWrite", "Write", "Write the text to the remote interface.\nHotkey: Ctrl + W"},
          Row{"basicRead", "Read", "Read from the remote intreface.\nHotkey: Ctrl + R"},
          Row{"basicQuery", "Query", "Write and Read.\nHotkey: Ctrl + Q"},
          Row{"basicReadStb", "Read STB", "Read the Status Byte."}, Row{"basicTrigger", "Trigger", "Send a Trigger."},
          Row{"basicClear", "Clear", "Cleared the Remoteinterface."},
          Row{"basicClearText", "Clear Text", "Clears the readview."},
          Row{"basicClearHistory", "Clear History", "Delete old commands."}}) {
        auto *push = find<QPushButton>(m_tab, row.name);
        EXPECT_EQ(push->text(), row.text);
        EXPECT_EQ(push->toolTip(), row.toolTip);
    }
    EXPECT_EQ(m_command->toolTip(), "Command field.");
    EXPECT_EQ(m_view->toolTip(), "Show the text, which was read.");
    EXPECT_EQ(find<QLabel>(m_tab, "basicReadCountLabel")->text(), "Read count");
    EXPECT_EQ(find<QLabel>(m_tab, "basicReadCountLabel")->toolTip(), "Bytes to read.");
    auto *count = find<SpinBoxParameter>(m_tab, "basicReadCount");
    EXPECT_EQ(count->toolTip(), "Bytes to read.");
    EXPECT_EQ(count->minimum(), 0);
    EXPECT_EQ(count->maximum(), 2147483647);
    EXPECT_EQ(count->value(), 1024);
    EXPECT_EQ(m_stb->text(), "0x----");
    EXPECT_EQ(m_sendEnd->text(), "Send End");
    EXPECT_TRUE(m_sendEnd->isChecked());
}

TEST_F(BasicTabTest, ButtonsSendTheirRequests)
{
    m_command->setEditText(R"(*RST\n)");
    find<SpinBoxParameter>(m_tab, "basicReadCount")->setValue(99);
    struct Row {
        const char *name;
        Kind kind;
        std::string text;
        std::array<std::uint64_t, 2> numbers;
    };
    for (const Row &row :
         {Row{"basicWrite", Kind::Write, "*RST\n", {0, 0}}, Row{"basicRead", Kind::Read, "", {99, 0}},
          Row{"basicQuery", Kind::Query, "*RST\n", {0, 99}}, Row{"basicReadStb", Kind::ReadSTB, "", {0, 0}},
          Row{"basicTrigger", Kind::AssertTrigger, "", {0, 0}}, Row{"basicClear", Kind::Clear, "", {0, 0}}}) {
        press(button(row.name));
        const auto sent = requests();
        ASSERT_EQ(sent.size(), 1u) << row.name;
        EXPECT_EQ(sent[0].type, row.kind);
        EXPECT_EQ(sent[0].parameter[0].stringValue, row.text);
        EXPECT_EQ(sent[0].parameter[0].uintValue, row.numbers[0]);
        EXPECT_EQ(sent[0].parameter[1].uintValue, row.numbers[1]);
        finish(result(row.kind, VI_ERROR_TMO)); // frees the buttons
    }
}

TEST_F(BasicTabTest, ReturnInTheCommandLineWritesIt)
{
    m_command->setEditText("abc");
    QTest::keyClick(m_command, Qt::Key_Return);
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::Write);
    EXPECT_EQ(sent[0].parameter[0].stringValue, "abc");
    EXPECT_EQ(m_command->lineEdit()->selectedText(), "abc");
}

TEST_F(BasicTabTest, AnRInTheCommandLineReads)
{
    m_command->setEditText("r");
    QTest::keyClick(m_command, Qt::Key_Return);
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::Read);
    EXPECT_EQ(sent[0].parameter[0].uintValue, 1024u);
    EXPECT_EQ(m_command->currentText(), "");
    EXPECT_EQ(m_command->count(), 2);
}

TEST_F(BasicTabTest, ReadsAppendAndQueriesToo)
{
    finish(data(Kind::Read, "one\n"));
    finish(data(Kind::Query, "two"));
    finish(data(Kind::Read, "three", VI_SUCCESS_MAX_CNT));
    EXPECT_EQ(shown(), "one\ntwothree");
}

TEST_F(BasicTabTest, AFailedReadLeavesTheViewUnchanged)
{
    finish(data(Kind::Read, "one"));
    finish(data(Kind::Read, "two", VI_ERROR_TMO));
    finish(data(Kind::Query, "three", VI_ERROR_TMO));
    EXPECT_EQ(shown(), "one");
}

TEST_F(BasicTabTest, ShowsInvalidUtf8AsReplacementCharacters)
{
    finish(data(Kind::Read, "\xC3\xBC\xFF!"));
    EXPECT_EQ(shown(), QString(QChar(0xFC)) + QChar(0xFFFD) + "!");
}

TEST_F(BasicTabTest, ALongAnswerWithoutABreakDoesNotHoldTheWindow)
{
    constexpr int Length = 512 * 1024;
    m_tab.resize(600, 400);
    m_tab.show();
    QElapsedTimer timer;
    timer.start();
    finish(data(Kind::Read, std::string(Length, '7')));
    QCoreApplication::processEvents();
    EXPECT_LT(timer.elapsed(), 20000) << "it takes less than one second on an idle machine";
    EXPECT_EQ(shown().size(), Length);
}

/// So many characters in lines.
std::string lines(std::size_t characters)
{
    std::string text(characters, '7');
    for (std::size_t end = 79; end < text.size(); end += 80)
        text[end] = '\n';
    return text;
}

TEST_F(BasicTabTest, OfAnAnswerLongerThanTheReadViewHoldsTheBeginningIsShown)
{
    _visaFunctionCall call = data(Kind::Read, lines((16 << 20) + 5));
    m_tab.visaFunctionCallFinished(call);
    EXPECT_EQ(shown().size(), 16 << 20);
}

TEST_F(BasicTabTest, AFullReadViewBeginsAnew)
{
    _visaFunctionCall call = data(Kind::Read, lines(15 << 20));
    m_tab.visaFunctionCallFinished(call);
    finish(data(Kind::Read, lines(1 << 20)));
    EXPECT_EQ(shown().size(), 16 << 20);
    finish(data(Kind::Read, "new"));
    EXPECT_EQ(shown(), "new");
}

TEST_F(BasicTabTest, TheReadViewCannotBeTypedInto)
{
    finish(data(Kind::Read, "one"));
    m_tab.show();
    QTest::keyClicks(m_view, "xyz");
    EXPECT_EQ(shown(), "one");
}

TEST_F(BasicTabTest, WriteAndQueryEmptyTheViewBeforeTheirAnswerReadDoesNot)
{
    finish(data(Kind::Read, "old"));
    press(button("basicRead"));
    EXPECT_EQ(shown(), "old");
    finish(result(Kind::Read, VI_ERROR_TMO));
    press(button("basicQuery"));
    EXPECT_EQ(shown(), "");
    finish(data(Kind::Query, "new"));
    EXPECT_EQ(shown(), "new");
    press(button("basicWrite"));
    EXPECT_EQ(shown(), "");
    finish(result(Kind::Write, VI_ERROR_TMO));
    EXPECT_EQ(shown(), "");
}

TEST_F(BasicTabTest, AWriteThatTheLockRefusesEmptiesTheViewAllTheSame)
{
    press(button("basicRead"));
    finish(data(Kind::Read, "old"));
    press(button("basicRead")); // outstanding
    requests();
    press(button("basicWrite"));
    EXPECT_TRUE(requests().empty());
    EXPECT_EQ(shown(), "");
}

TEST_F(BasicTabTest, ClearTextEmptiesTheView)
{
    finish(data(Kind::Read, "old"));
    press(find<QPushButton>(m_tab, "basicClearText"));
    EXPECT_EQ(shown(), "");
    EXPECT_TRUE(requests().empty());
}

TEST_F(BasicTabTest, ClearHistoryRestoresThePresets)
{
    m_command->setData("one\ntwo\nthree");
    press(find<QPushButton>(m_tab, "basicClearHistory"));
    ASSERT_EQ(m_command->count(), 2);
    EXPECT_EQ(m_command->itemText(0), R"(:syst:err?\n)");
    EXPECT_EQ(m_command->itemText(1), R"(*IDN?\n)");
}

TEST_F(BasicTabTest, SendEndIsSentWhenItIsSwitched)
{
    m_sendEnd->setChecked(false);
    expectSendEndRequest(0);
    m_sendEnd->setChecked(true);
    expectSendEndRequest(1);
}

TEST_F(BasicTabTest, ANewSessionGetsTheStateOfSendEnd)
{
    finish(result(Kind::Open));
    expectSendEndRequest(1);
    m_sendEnd->setChecked(false);
    requests();
    finish(result(Kind::Open, VI_SUCCESS_DEV_NPRESENT));
    expectSendEndRequest(0);
    finish(result(Kind::Open, VI_ERROR_RSRC_NFOUND));
    EXPECT_TRUE(requests().empty());
}

TEST_F(BasicTabTest, SendEndFollowsTheAttributeWithoutANewCall)
{
    finish(attribute(Kind::SetAttribute, 0x3FFF0016, 0));
    EXPECT_FALSE(m_sendEnd->isChecked());
    finish(attribute(Kind::SetAttribute, 0x3FFF0016, 0x100000000));
    EXPECT_TRUE(m_sendEnd->isChecked());
    EXPECT_TRUE(requests().empty());
}

TEST_F(BasicTabTest, SendEndIgnoresOtherAttributesKindsAndFailures)
{
    finish(attribute(Kind::SetAttribute, 0x3FFF0038, 0));
    finish(attribute(Kind::SetAttributeDef, 0x3FFF0016, 0));
    finish(attribute(Kind::GetAttribute, 0x3FFF0016, 0));
    finish(attribute(Kind::SetAttribute, 0x3FFF0016, 0, VI_ERROR_NSUP_ATTR));
    EXPECT_TRUE(m_sendEnd->isChecked());
}

TEST_F(BasicTabTest, ShowsTheStatusByteInLowerCaseHexadecimal)
{
    finish(statusByte(0x50));
    EXPECT_EQ(m_stb->text(), "0x50");
    finish(statusByte(0xAB));
    EXPECT_EQ(m_stb->text(), "0xab");
    finish(statusByte(0));
    EXPECT_EQ(m_stb->text(), "0x0");
    finish(statusByte(0x12345F));
    EXPECT_EQ(m_stb->text(), "0x345f");
}

TEST_F(BasicTabTest, AFreshStatusByteIsGreenAndLaterBlackWithItsValueLeft)
{
    finish(statusByte(0x40));
    EXPECT_EQ(m_stb->styleSheet(), "QLabel { color: green }");
    EXPECT_TRUE(QTest::qWaitFor([this] { return m_stb->styleSheet() == "QLabel { color: black }"; }, 30000));
    EXPECT_EQ(m_stb->text(), "0x40");
}

TEST_F(BasicTabTest, OneTimerServesTheStatusByteAndEachReadingRestartsIt)
{
    finish(statusByte(1));
    const auto timers = m_tab.findChildren<QTimer *>(QString(), Qt::FindDirectChildrenOnly);
    ASSERT_EQ(timers.size(), 1);
    EXPECT_TRUE(timers[0]->isSingleShot());
    EXPECT_EQ(timers[0]->interval(), 4000);
    ASSERT_TRUE(QTest::qWaitFor([&timers] { return timers[0]->remainingTime() < 3000; }, 30000));
    finish(statusByte(2));
    EXPECT_GT(timers[0]->remainingTime(), 3000);
    EXPECT_EQ(m_stb->styleSheet(), "QLabel { color: green }");
}

TEST_F(BasicTabTest, AFailedStatusByteReadingChangesNothing)
{
    finish(result(Kind::ReadSTB, VI_ERROR_TMO));
    EXPECT_EQ(m_stb->text(), "0x----");
    EXPECT_EQ(m_stb->styleSheet(), "QLabel { color: black }");
}

TEST_F(BasicTabTest, HotkeysSendWhileThePanelIsVisible)
{
    m_tab.show();
    struct Row {
        int key;
        Kind kind;
    };
    for (const Row &row : {Row{Qt::Key_W, Kind::Write}, Row{Qt::Key_R, Kind::Read}, Row{Qt::Key_Q, Kind::Query}}) {
        hotkey(row.key);
        EXPECT_TRUE(m_accepted);
        const auto sent = requests();
        ASSERT_EQ(sent.size(), 1u);
        EXPECT_EQ(sent[0].type, row.kind);
        finish(result(row.kind, VI_ERROR_TMO));
    }
}

TEST_F(BasicTabTest, HotkeysNeedExactlyControl)
{
    m_tab.show();
    for (const auto modifiers : {Qt::KeyboardModifiers(Qt::NoModifier), Qt::ControlModifier | Qt::ShiftModifier,
                                 Qt::ControlModifier | Qt::AltModifier, Qt::KeyboardModifiers(Qt::AltModifier)}) {
        hotkey(Qt::Key_W, modifiers);
        EXPECT_FALSE(m_accepted);
    }
    hotkey(Qt::Key_E);
    EXPECT_FALSE(m_accepted);
    EXPECT_TRUE(requests().empty());
}

TEST_F(BasicTabTest, HotkeysDoNothingWhileThePanelIsHidden)
{
    hotkey(Qt::Key_W);
    EXPECT_FALSE(m_accepted);
    EXPECT_TRUE(requests().empty());
}

TEST_F(BasicTabTest, HotkeysWorkFromTheCommandLineAndTheReadView)
{
    m_tab.show();
    QTest::keyClick(m_command, Qt::Key_W, Qt::ControlModifier);
    EXPECT_EQ(requests().size(), 1u);
    finish(result(Kind::Write));
    QTest::keyClick(m_view, Qt::Key_R, Qt::ControlModifier);
    EXPECT_EQ(requests().size(), 1u);
}

TEST_F(BasicTabTest, TabFollowsTheEyeAndPassesTheRequestButtonsBy)
{
    EXPECT_EQ(tabOrder(m_tab, m_command), QStringList({"basicCommand", "basicClearHistory", "basicSendEnd",
                                                       "basicReadCount", "basicClearText", "basicReadView"}));
}

TEST_F(BasicTabTest, EveryWidgetHasANameAndInputsAnAccessibleOne)
{
    for (const char *name : {"basicCommand", "basicReadCount", "basicReadView", "basicStatusByte"})
        EXPECT_FALSE(find<QWidget>(m_tab, name)->accessibleName().isEmpty()) << name;
    for (const QWidget *child : m_tab.findChildren<QWidget *>(QString(), Qt::FindDirectChildrenOnly))
        EXPECT_FALSE(child->objectName().isEmpty()) << child->metaObject()->className();
}
} // namespace
