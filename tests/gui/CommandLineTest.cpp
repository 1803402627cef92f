#include "gui/support/StandinWindowTest.h"

#include <QComboBox>

namespace
{

class CommandLine : public StandinWindowTest
{
protected:
    CommandLine()
    {
        openWindow();
        connectSession();
    }

    /// What the instrument gets when @p typed is written.
    std::string sent(const QString &typed)
    {
        enter("basicCommand", typed);
        return written();
    }

    std::string written()
    {
        const std::size_t before = standin::calls("viWrite").size();
        press("basicWrite");
        EXPECT_TRUE(called("viWrite", before + 1));
        EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_SUCCESS"; }));
        return standin::calls("viWrite").back().texts.at(0);
    }

    QStringList history()
    {
        auto *box = qobject_cast<QComboBox *>(widget("basicCommand"));
        QStringList items;
        for (int i = 0; i < box->count(); ++i)
            items << box->itemText(i);
        return items;
    }

    QString line() { return shown("basicCommand", "currentText").toString(); }
};

TEST_F(CommandLine, StartsWithTwoPresets)
{
    EXPECT_EQ(history(), (QStringList{":syst:err?\\n", "*IDN?\\n"}));
}

TEST_F(CommandLine, ABackslashNIsSentAsALineFeed)
{
    EXPECT_EQ(sent("*IDN?\\n"), "*IDN?\n");
    EXPECT_EQ(sent("a\\rb\\tc"), "a\rb\tc");
}

TEST_F(CommandLine, HexadecimalEscapesGiveOneCharacter)
{
    EXPECT_EQ(sent("\\x0A"), "\n");
    EXPECT_EQ(sent("\\x00A"), "\n");
    EXPECT_EQ(sent("x\\x00y"), std::string("x\0y", 3));
}

TEST_F(CommandLine, CharactersAbove7FAreSentAsUtf8)
{
    EXPECT_EQ(sent("\\x1FF"), "\xC3\xBF");
    EXPECT_EQ(sent("\\x80"), "\xC2\x80");
}

TEST_F(CommandLine, ThreeDigitsComeBeforeTwo)
{
    EXPECT_EQ(sent("\\x41B"), "\x1B");
    EXPECT_EQ(sent("\\x41G"), "AG");
}

TEST_F(CommandLine, ABackslashZeroIsDropped)
{
    EXPECT_EQ(sent("a\\0b"), "ab");
}

TEST_F(CommandLine, ADoubledBackslashProtectsNothing)
{
    EXPECT_EQ(sent("\\\\n"), "\\\n");
    EXPECT_EQ(sent("\\\\q"), "\\q");
}

TEST_F(CommandLine, AnEscapedBackslashCombinesWithWhatFollows)
{
    EXPECT_EQ(sent("\\x5Cn"), "\n"); // 0x5C is a backslash
}

TEST_F(CommandLine, LowerCaseDigitsCountAndAnUpperCaseXDoesNot)
{
    EXPECT_EQ(sent("\\x4a"), "J");
    EXPECT_EQ(sent("\\X4A"), "\\X4A");
}

TEST_F(CommandLine, AnEmptyCommandIsSentAndLeavesTheHistory)
{
    EXPECT_EQ(sent(""), "");
    EXPECT_EQ(history(), (QStringList{":syst:err?\\n", "*IDN?\\n"}));
}

TEST_F(CommandLine, HistoryKeepsTheTextAsTypedNewestFirst)
{
    sent("first\\n");
    sent("second\\n");
    EXPECT_EQ(history(), (QStringList{"second\\n", "first\\n", ":syst:err?\\n", "*IDN?\\n"}));
    EXPECT_EQ(line(), "second\\n");
}

TEST_F(CommandLine, ARepeatedCommandMovesToTheTop)
{
    sent("one");
    sent("two");
    sent("one");
    EXPECT_EQ(history(), (QStringList{"one", "two", ":syst:err?\\n", "*IDN?\\n"}));
    sent("ONE"); // another text
    EXPECT_EQ(history().size(), 5);
}

TEST_F(CommandLine, TheTwentyFirstCommandDropsTheOldest)
{
    for (int i = 1; i <= 18; ++i)
        sent("c" + QString::number(i));
    EXPECT_EQ(history().size(), 20);
    EXPECT_EQ(history().last(), "*IDN?\\n");
    sent("c19");
    EXPECT_EQ(history().size(), 20);
    EXPECT_EQ(history().first(), "c19");
    EXPECT_EQ(history().last(), ":syst:err?\\n");
}

TEST_F(CommandLine, AfterSendingAllOfItIsMarkedAndTypingReplacesIt)
{
    sent("old");
    enter("basicCommand", "old");
    written();
    enter("basicCommand", "");
    type("new");
    EXPECT_EQ(line(), "new");
}

TEST_F(CommandLine, ReturnWritesAndInsertsNothingByItself)
{
    enter("basicCommand", "*RST\\n");
    key(Qt::Key_Return);
    ASSERT_TRUE(called("viWrite", 1));
    EXPECT_EQ(standin::calls("viWrite").at(0).texts.at(0), "*RST\n");
    EXPECT_EQ(history(), (QStringList{"*RST\\n", ":syst:err?\\n", "*IDN?\\n"}));
}

TEST_F(CommandLine, RAndReturnReadsAndEmptiesTheLine)
{
    standin::script("viRead", {.status = 0, .bytes = "answer"});
    enterNumber("basicReadCount", 77);
    enter("basicCommand", "r");
    key(Qt::Key_Return);
    ASSERT_TRUE(called("viRead", 1));
    EXPECT_EQ(standin::calls("viRead").at(0).numbers.at(0), 77u);
    EXPECT_EQ(line(), "");
    EXPECT_EQ(history(), (QStringList{":syst:err?\\n", "*IDN?\\n"}));
    EXPECT_TRUE(standin::calls("viWrite").empty());
    EXPECT_TRUE(eventually([this] { return shown("basicReadView", "plainText").toString() == "answer"; }));
}

TEST_F(CommandLine, EnterOnTheKeypadIsReturn)
{
    enter("basicCommand", "x");
    key(Qt::Key_Enter);
    EXPECT_TRUE(called("viWrite", 1));
}

TEST_F(CommandLine, ClearHistoryBringsThePresetsBack)
{
    sent("something");
    press("basicClearHistory");
    EXPECT_EQ(history(), (QStringList{":syst:err?\\n", "*IDN?\\n"}));
}

} // namespace
