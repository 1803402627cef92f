#include "panels/ScipiLineEdit.h"

#include <QCompleter>
#include <QLineEdit>
#include <QSignalSpy>
#include <QTest>

#include <gtest/gtest.h>

#include <string>

namespace
{
QStringList history(const ScipiLineEdit &line)
{
    QStringList items;
    for (int i = 0; i < line.count(); ++i)
        items << line.itemText(i);
    return items;
}

std::string sent(ScipiLineEdit &line, const QString &text)
{
    line.setEditText(text);
    Parameter slot;
    EXPECT_TRUE(line.getParameter(slot));
    return slot.stringValue;
}

TEST(CommandLine, StartsWithTwoPresets)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(history(line), QStringList({R"(:syst:err?\n)", R"(*IDN?\n)"}));
    EXPECT_TRUE(line.isEditable());
    EXPECT_FALSE(line.duplicatesEnabled());
    ASSERT_NE(line.completer(), nullptr);
    EXPECT_EQ(line.completer()->completionMode(), QCompleter::InlineCompletion);
}

TEST(CommandLine, ClearRestoresThePresets)
{
    ScipiLineEdit line(nullptr);
    sent(line, "a");
    line.clear();
    EXPECT_EQ(history(line), QStringList({R"(:syst:err?\n)", R"(*IDN?\n)"}));
}

TEST(CommandLine, SendsThePresetWithALineFeed)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(sent(line, R"(*IDN?\n)"), "*IDN?\n");
}

TEST(CommandLine, RemembersCommandsNewestFirstAsTyped)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(sent(line, R"(one\n)"), "one\n");
    sent(line, "two");
    EXPECT_EQ(history(line), QStringList({"two", R"(one\n)", R"(:syst:err?\n)", R"(*IDN?\n)"}));
}

TEST(CommandLine, KeepsACommandThatIsSentTwiceOnceAtTheTop)
{
    ScipiLineEdit line(nullptr);
    sent(line, "one");
    sent(line, "two");
    sent(line, "one");
    EXPECT_EQ(history(line), QStringList({"one", "two", R"(:syst:err?\n)", R"(*IDN?\n)"}));
}

TEST(CommandLine, TellsCommandsApartByCase)
{
    ScipiLineEdit line(nullptr);
    sent(line, "abc");
    sent(line, "ABC");
    EXPECT_EQ(history(line).mid(0, 2), QStringList({"ABC", "abc"}));
}

TEST(CommandLine, The21stCommandDropsTheOldest)
{
    ScipiLineEdit line(nullptr);
    for (int i = 1; i <= 20; ++i)
        sent(line, QString("c%1").arg(i));
    ASSERT_EQ(line.count(), 20);
    EXPECT_EQ(line.itemText(19), "c1");
    sent(line, "c21");
    ASSERT_EQ(line.count(), 20);
    EXPECT_EQ(line.itemText(0), "c21");
    EXPECT_EQ(line.itemText(19), "c2");
}

TEST(CommandLine, AFullHistoryDropsTheOldestEvenWhenTheCommandIsKnown)
{
    ScipiLineEdit line(nullptr);
    for (int i = 1; i <= 20; ++i)
        sent(line, QString("c%1").arg(i));
    sent(line, "c20");
    ASSERT_EQ(line.count(), 19);
    EXPECT_EQ(line.itemText(0), "c20");
    EXPECT_EQ(line.itemText(18), "c2");
}

TEST(CommandLine, AnEmptyCommandIsSentAndNotRemembered)
{
    ScipiLineEdit line(nullptr);
    Parameter slot{7, "before"};
    line.setEditText("");
    EXPECT_TRUE(line.getParameter(slot));
    EXPECT_EQ(slot.stringValue, "");
    EXPECT_EQ(slot.uintValue, 7u);
    EXPECT_EQ(line.count(), 2);
}

TEST(CommandLine, KeepsTheTextSelectedAfterSending)
{
    ScipiLineEdit line(nullptr);
    sent(line, R"(hello\t)");
    EXPECT_EQ(line.currentText(), R"(hello\t)");
    EXPECT_EQ(line.lineEdit()->selectedText(), R"(hello\t)");
}

struct EscapeRow {
    const char *typed;
    std::string sent;
};

class Escapes : public testing::TestWithParam<EscapeRow>
{
};

TEST_P(Escapes, AreExpandedPassByPass)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(sent(line, QString::fromUtf8(GetParam().typed)), GetParam().sent);
}

using namespace std::string_literals;
INSTANTIATE_TEST_SUITE_P(
    Passes, Escapes,
    testing::Values(EscapeRow{R"(\x0A)", "\n"}, EscapeRow{R"(\x00A)", "\n"}, EscapeRow{R"(\x1FF)", "\xC3\xBF"},
                    EscapeRow{R"(\xFF)", "\xC3\xBF"}, EscapeRow{R"(\x80)", "\xC2\x80"}, EscapeRow{R"(\x41B)", "\x1B"},
                    EscapeRow{R"(\x41 B)", "A B"}, EscapeRow{R"(\x00)", "\0"s}, EscapeRow{R"(a\x00b)", "a\x0B"},
                    EscapeRow{R"(a\x00 b)", "a\0 b"s}, EscapeRow{R"(\x4)", R"(\x4)"}, EscapeRow{R"(\x4G)", R"(\x4G)"},
                    EscapeRow{R"(\X41)", R"(\X41)"}, EscapeRow{R"(\x)", R"(\x)"}, EscapeRow{R"(\x\x41)", R"(\xA)"},
                    EscapeRow{R"(\n\r\t)", "\n\r\t"}, EscapeRow{R"(a\0b)", "ab"}, EscapeRow{R"(\\)", R"(\)"},
                    EscapeRow{R"(\\\)", R"(\\)"}, EscapeRow{R"(\\n)", "\\\n"}, EscapeRow{R"(\\t)", "\\\t"},
                    EscapeRow{R"(\\r)", "\\\r"}, EscapeRow{R"(\\0)", R"(\)"}, EscapeRow{R"(\x5Cn)", "\n"},
                    EscapeRow{R"(\x05Cx041)", "A"}, EscapeRow{R"(\x5Cx41)", "A"}, EscapeRow{R"(\x05Cx41)", "A"},
                    EscapeRow{R"(\x5C\x5C)", R"(\)"}, EscapeRow{R"(\a\N)", R"(\a\N)"}, EscapeRow{R"(\)", R"(\)"},
                    EscapeRow{"gr\xC3\xBC\xC3\x9F", "gr\xC3\xBC\xC3\x9F"}));

TEST(EscapeRules, ThreeHexadecimalDigitsComeBeforeTwo)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(sent(line, R"(\x41B)"), "\x1B");
}

TEST(EscapeRules, ADoubledBackslashProtectsNothing)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(sent(line, R"(\\n)"), "\\\n");
}

TEST(EscapeRules, BackslashZeroIsDeletedAndYieldsNoZeroByte)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(sent(line, R"(a\0b)"), "ab");
}

TEST(EscapeRules, AnExpandedBackslashStartsTheNextEscape)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(sent(line, R"(\x5Cx41)"), "A");
}

TEST(EscapeRules, CodesAbove127AreSentAsUtf8)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(sent(line, R"(\xFF)"), "\xC3\xBF");
}

class CommandLineKeys : public testing::Test
{
protected:
    ScipiLineEdit m_line{nullptr};
    QSignalSpy m_write{&m_line, &ScipiLineEdit::write};
    QSignalSpy m_read{&m_line, &ScipiLineEdit::read};
};

TEST_F(CommandLineKeys, ReturnAndEnterAskForAWrite)
{
    m_line.setEditText("abc");
    QTest::keyClick(&m_line, Qt::Key_Return);
    EXPECT_EQ(m_write.count(), 1);
    QTest::keyClick(&m_line, Qt::Key_Enter);
    EXPECT_EQ(m_write.count(), 2);
    EXPECT_EQ(m_read.count(), 0);
    EXPECT_EQ(m_line.currentText(), "abc");
}

TEST_F(CommandLineKeys, ALoneLowerCaseRAsksForAReadAndLeavesTheLineEmpty)
{
    QTest::keyClick(&m_line, Qt::Key_A, Qt::ControlModifier);
    QTest::keyClicks(&m_line, "r");
    QTest::keyClick(&m_line, Qt::Key_Return);
    EXPECT_EQ(m_read.count(), 1);
    EXPECT_EQ(m_write.count(), 0);
    EXPECT_EQ(m_line.currentText(), "");
    EXPECT_EQ(history(m_line), QStringList({R"(:syst:err?\n)", R"(*IDN?\n)"}));
}

TEST_F(CommandLineKeys, OtherTextsThanALoneRAskForAWrite)
{
    for (const char *text : {"R", "rr", " r", "r ", ""}) {
        m_line.setEditText(text);
        QTest::keyClick(&m_line, Qt::Key_Return);
    }
    EXPECT_EQ(m_write.count(), 5);
    EXPECT_EQ(m_read.count(), 0);
}

TEST_F(CommandLineKeys, ReturnAloneInsertsNothing)
{
    m_line.setEditText("new command");
    QTest::keyClick(&m_line, Qt::Key_Return);
    EXPECT_EQ(history(m_line), QStringList({R"(:syst:err?\n)", R"(*IDN?\n)"}));
}

TEST_F(CommandLineKeys, ReturnReachesTheComboBoxToo)
{
    QSignalSpy returnPressed(m_line.lineEdit(), &QLineEdit::returnPressed);
    m_line.setEditText("abc");
    QTest::keyClick(&m_line, Qt::Key_Return);
    m_line.setEditText("r");
    QTest::keyClick(&m_line, Qt::Key_Return);
    EXPECT_EQ(returnPressed.count(), 2);
}

TEST_F(CommandLineKeys, ASentCommandIsReplacedByTheNextOneTyped)
{
    QObject::connect(&m_line, &ScipiLineEdit::write, &m_line, [this] { sent(m_line, m_line.currentText()); });
    m_line.setEditText("first");
    QTest::keyClick(&m_line, Qt::Key_Return);
    QTest::keyClicks(&m_line, "second");
    EXPECT_EQ(m_line.currentText(), "second");
}

TEST_F(CommandLineKeys, ASentCommandStaysWhateverWasTypedBefore)
{
    QObject::connect(&m_line, &ScipiLineEdit::write, &m_line, [this] { sent(m_line, m_line.currentText()); });
    m_line.setData("abc\n*RST");
    m_line.show();
    m_line.activateWindow();
    ASSERT_TRUE(QTest::qWaitForWindowActive(&m_line, 30000));
    m_line.setFocus();
    QTest::keyClicks(&m_line, "a"); // completed to "abc"
    ASSERT_EQ(m_line.currentText(), "abc");
    m_line.setCurrentIndex(1);
    QTest::keyClick(&m_line, Qt::Key_Return);
    EXPECT_EQ(m_line.currentText(), "*RST");
    EXPECT_EQ(m_line.lineEdit()->selectedText(), "*RST");
    EXPECT_EQ(history(m_line), QStringList({"*RST", "abc"}));
}

TEST_F(CommandLineKeys, DownLeadsToTheCommandBeforeTheOneJustSent)
{
    sent(m_line, "older");
    sent(m_line, "newer");
    QTest::keyClick(&m_line, Qt::Key_Down);
    EXPECT_EQ(m_line.currentText(), "older");
}

TEST(CommandHistory, IsTheItemWithIdentifierFour)
{
    struct Four final : Data {
        Four() : Data(4) {}
        QByteArray getData() override { return {}; }
        void setData(const QByteArray &) override {}
    };
    EXPECT_TRUE(ScipiLineEdit(nullptr) == Four());
}

TEST(CommandHistory, IsSavedOneItemALine)
{
    ScipiLineEdit line(nullptr);
    EXPECT_EQ(line.getData(), QByteArray(":syst:err?\\n\n*IDN?\\n"));
}

TEST(CommandHistory, IsRestoredWithoutPresetsAndWithAnEmptyLine)
{
    ScipiLineEdit line(nullptr);
    line.setData("one\n\ntwo\\n\n");
    EXPECT_EQ(history(line), QStringList({"one", "", "two\\n", ""}));
    EXPECT_EQ(line.currentText(), "");
}

TEST(CommandHistory, AnEmptyOneLeavesTheListEmpty)
{
    ScipiLineEdit line(nullptr);
    line.setData(QByteArray());
    EXPECT_EQ(line.count(), 0);
    EXPECT_EQ(line.currentText(), "");
    EXPECT_EQ(line.getData(), QByteArray());
}

TEST(CommandHistory, IsReadAsLatin1UpToTheFirstZeroByte)
{
    ScipiLineEdit line(nullptr);
    line.setData(QByteArray("\xFC\nb\0c\nd", 7));
    EXPECT_EQ(history(line), QStringList({QString(QChar(0xFC)), "b"}));
}

TEST(CommandHistory, IsWrittenAsLatin1)
{
    ScipiLineEdit line(nullptr);
    line.setData("x");
    sent(line, QString(QChar(0xFC)) + QChar(0x20AC));
    EXPECT_EQ(line.getData(), QByteArray("\xFC?\nx"));
}

TEST(CommandHistory, TakesNoMoreThan20ItemsFromADamagedFile)
{
    ScipiLineEdit line(nullptr);
    line.setData(QByteArray(999999, '\n'));
    EXPECT_EQ(line.count(), 20);
}

TEST(CommandHistory, SurvivesARun)
{
    ScipiLineEdit before(nullptr);
    sent(before, R"(:sour:volt 5\n)");
    ScipiLineEdit after(nullptr);
    after.setData(before.getData());
    EXPECT_EQ(history(after), QStringList({R"(:sour:volt 5\n)", R"(:syst:err?\n)", R"(*IDN?\n)"}));
    EXPECT_EQ(after.currentText(), "");
}
} // namespace
