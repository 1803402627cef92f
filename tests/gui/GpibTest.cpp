#include "gui/support/StandinWindowTest.h"

#include <visa.h>

namespace
{

/// Connected, on the page "Gpib".
class GpibPage : public StandinWindowTest
{
protected:
    GpibPage()
    {
        openWindow();
        connectSession();
        showPage("Gpib");
    }

    void press(const char *name, const QString &status = "VI_SUCCESS")
    {
        StandinWindowTest::press(name);
        ASSERT_TRUE(statusIs(status)) << text("statusLabel").toStdString();
    }

    /// Types the command and sends it: the bytes that the library got.
    std::string command(const QString &typed)
    {
        enter("gpibCommand", typed);
        press("gpibSendCommand");
        return standin::calls("viGpibCommand").back().texts.at(0);
    }

    bool lineAppears(const QString &line)
    {
        return eventually([&] { return logRow(line) >= 0; });
    }
};

TEST_F(GpibPage, RenTakesEachMode)
{
    struct Row {
        const char *mode;
        const char *line;
    };
    std::uint64_t value = 0;
    for (const Row &row :
         {Row{"VI_GPIB_REN_DEASSERT", "viGpibControlREN(vi= 2,mode= VI_GPIB_REN_DEASSERT)"},
          Row{"VI_GPIB_REN_ASSERT", "viGpibControlREN(vi= 2,mode= VI_GPIB_REN_ASSERT)"},
          Row{"VI_GPIB_REN_DEASSERT_GTL", "viGpibControlREN(vi= 2,mode= VI_GPIB_REN_DEASSERT_GTL)"},
          Row{"VI_GPIB_REN_ASSERT_ADDRESS", "viGpibControlREN(vi= 2,mode= VI_GPIB_REN_ASSERT_ADDRESS)"},
          Row{"VI_GPIB_REN_ASSERT_LLO", "viGpibControlREN(vi= 2,mode= VI_GPIB_REN_ASSERT_LLO)"},
          Row{"VI_GPIB_REN_ASSERT_ADDRESS_LLO", "viGpibControlREN(vi= 2,mode= VI_GPIB_REN_ASSERT_ADDRESS_LLO)"},
          Row{"VI_GPIB_REN_ADDRESS_GTL", "viGpibControlREN(vi= 2,mode= VI_GPIB_REN_ADDRESS_GTL)"}}) {
        choose("gpibRen", row.mode);
        press("gpibSendRen");
        EXPECT_EQ(standin::calls("viGpibControlREN").back().numbers.at(0), value++);
        EXPECT_TRUE(lineAppears(row.line)) << row.line;
    }
}

TEST_F(GpibPage, AtnTakesEachModeAndIsLoggedInItsOwnSpelling)
{
    struct Row {
        const char *mode;
        const char *line;
    };
    std::uint64_t value = 0;
    for (const Row &row :
         {Row{"VI_GPIB_ATN_DEASSERT", "vigpibControlATN(vi= 2,mode= VI_GPIB_ATN_DEASSERT)"},
          Row{"VI_GPIB_ATN_ASSERT", "vigpibControlATN(vi= 2,mode= VI_GPIB_ATN_ASSERT)"},
          Row{"VI_GPIB_ATN_DEASSERT_HANDSHAKE", "vigpibControlATN(vi= 2,mode= VI_GPIB_ATN_DEASSERT_HANDSHAKE)"},
          Row{"VI_GPIB_ATN_ASSERT_IMMEDIATE", "vigpibControlATN(vi= 2,mode= VI_GPIB_ATN_ASSERT_IMMEDIATE)"}}) {
        choose("gpibAtn", row.mode);
        press("gpibSendAtn");
        EXPECT_EQ(standin::calls("viGpibControlATN").back().numbers.at(0), value++);
        EXPECT_TRUE(lineAppears(row.line)) << row.line;
    }
}

TEST_F(GpibPage, InterfaceClearIsSent)
{
    press("gpibSendIfc");
    EXPECT_EQ(standin::calls("viGpibSendIFC").size(), 1u);
    EXPECT_TRUE(lineAppears("viGpibSendIFC(vi= 2)"));
}

TEST_F(GpibPage, ACommandIsSentByteForByte)
{
    EXPECT_EQ(command("\\x3F\\x25"), "?%");
    EXPECT_TRUE(lineAppears("viGpibCommand(vi= 2,buf=\"?%\",cnt=2,retCnt=2)"));
}

TEST_F(GpibPage, LowerCaseDigitsStayAsTheyWereTyped)
{
    EXPECT_EQ(command("\\x3f"), "\\x3f");
}

TEST_F(GpibPage, ThreeDigitsCountModulo256)
{
    EXPECT_EQ(command("\\x13F"), "?");
}

TEST_F(GpibPage, CarriageReturnAndTabHaveNoEscapes)
{
    EXPECT_EQ(command("\\r\\t\\n\\0."), "\\r\\t\n.");
}

TEST_F(GpibPage, AByteAbove7FIsSentAsTwo)
{
    EXPECT_EQ(command("\\xA0"), "\xC2\xA0");
}

TEST_F(GpibPage, ALineBreakInTheEditorIsALineFeed)
{
    enter("gpibCommand", "a");
    key(Qt::Key_Return);
    type("b");
    press("gpibSendCommand");
    EXPECT_EQ(standin::calls("viGpibCommand").back().texts.at(0), "a\nb");
}

TEST_F(GpibPage, AnEmptyEditorSendsAnEmptyCommand)
{
    press("gpibSendCommand");
    EXPECT_EQ(standin::calls("viGpibCommand").at(0).numbers.at(0), 0u);
    EXPECT_TRUE(lineAppears("viGpibCommand(vi= 2,buf=\"\",cnt=0,retCnt=0)"));
}

TEST_F(GpibPage, TheCommandStaysForTheNextTime)
{
    command("\\x3F");
    EXPECT_EQ(shown("gpibCommand", "plainText").toString(), "\\x3F");
}

TEST_F(GpibPage, PassControlTakesBothAddresses)
{
    enterNumber("gpibPrimary", 5);
    enterNumber("gpibSecondary", 65535);
    press("gpibPassControl");
    EXPECT_EQ(standin::calls("viGpibPassControl").at(0).numbers, (std::vector<std::uint64_t>{5, 65535}));
    EXPECT_TRUE(lineAppears("viGpibPassControl(vi= 2,primAddr= 0x5, secAddr= 0xFFFF)"));
}

TEST_F(GpibPage, AnAddressBeyond16BitsReachesTheLibraryCutToThem)
{
    enterNumber("gpibPrimary", 65545);
    press("gpibPassControl");
    EXPECT_EQ(shown("gpibPrimary", "value").toInt(), 65545);
    EXPECT_EQ(standin::calls("viGpibPassControl").at(0).numbers.at(0), 9u);
    enterNumber("gpibPrimary", 65546);
    EXPECT_LE(shown("gpibPrimary", "value").toInt(), 65545);
}

TEST_F(GpibPage, AFailureStandsInTheStatusLabelAndTheLog)
{
    standin::script("viGpibSendIFC", {.status = VI_ERROR_NSUP_OPER});
    press("gpibSendIfc", "VI_ERROR_NSUP_OPER");
    ASSERT_TRUE(lineAppears("viGpibSendIFC(vi= 2)"));
    EXPECT_EQ(logCell(logRow("viGpibSendIFC(vi= 2)"), 2), "VI_ERROR_NSUP_OPER");
}

} // namespace
