#include "gui/support/StandinWindowTest.h"

#include <visa.h>

#include <QElapsedTimer>

namespace
{

/// Connected, on the page "Basics".
class Basics : public StandinWindowTest
{
protected:
    Basics()
    {
        openWindow();
        connectSession();
    }

    QString view() { return shown("basicReadView", "plainText").toString(); }
    bool viewShows(const QString &expected)
    {
        return eventually([&] { return view() == expected; });
    }
};

TEST_F(Basics, AnOpenedSessionFollowsTheSendEndBox)
{
    const auto call = standin::calls("viSetAttribute").at(0);
    EXPECT_EQ(call.handle, 2u);
    EXPECT_EQ(call.numbers.at(0), 0x3FFF0016u);
    EXPECT_EQ(call.numbers.at(1), 1u);

    tick("basicSendEnd");
    ASSERT_TRUE(called("viSetAttribute", 2));
    EXPECT_EQ(standin::calls("viSetAttribute").at(1).numbers.at(1), 0u);
    press("resourceDisconnect");
    ASSERT_TRUE(eventually([this] { return isVisible("resourceConnect"); }));
    press("resourceConnect");
    ASSERT_TRUE(called("viSetAttribute", 3));
    EXPECT_EQ(standin::calls("viSetAttribute").at(2).numbers.at(1), 0u);
}

TEST_F(Basics, AFailedSendEndLeavesTheBoxAndSendsNothingMore)
{
    standin::script("viSetAttribute", {.status = VI_ERROR_NSUP_ATTR});
    tick("basicSendEnd");
    ASSERT_TRUE(statusIs("VI_ERROR_NSUP_ATTR"));
    EXPECT_FALSE(shown("basicSendEnd", "checked").toBool());
    meanwhile();
    EXPECT_EQ(standin::calls("viSetAttribute").size(), 2u);
}

TEST_F(Basics, QueryWritesReadsAndShowsTheAnswer)
{
    standin::setReply("*IDN?", "Acme,One,1,2\n");
    enter("basicCommand", "*IDN?\\n");
    press("basicQuery");
    EXPECT_TRUE(viewShows("Acme,One,1,2\n")) << view().toStdString();
    EXPECT_EQ(standin::calls("viWrite").at(0).texts.at(0), "*IDN?\n");
    EXPECT_EQ(standin::calls("viRead").at(0).numbers.at(0), 1024u);
}

TEST_F(Basics, ReadAppendsAndUsesTheReadCount)
{
    standin::script("viRead", {.status = VI_SUCCESS_MAX_CNT, .bytes = "one "});
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "two\n"});
    enterNumber("basicReadCount", 4);
    press("basicRead");
    ASSERT_TRUE(viewShows("one "));
    press("basicRead");
    EXPECT_TRUE(viewShows("one two\n"));
    EXPECT_EQ(standin::calls("viRead").at(0).numbers.at(0), 4u);
}

TEST_F(Basics, ReadCountStartsAt1024AndTakesTheLargestInteger)
{
    EXPECT_EQ(shown("basicReadCount", "value").toInt(), 1024);
    EXPECT_EQ(shown("basicReadCount", "minimum").toInt(), 0);
    EXPECT_EQ(shown("basicReadCount", "maximum").toInt(), 2147483647);
}

TEST_F(Basics, AWriteClearsTheReadViewEvenWhenItFails)
{
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "old"});
    press("basicRead");
    ASSERT_TRUE(viewShows("old"));
    standin::script("viWrite", {.status = VI_ERROR_TMO});
    enter("basicCommand", "x");
    press("basicWrite");
    ASSERT_TRUE(statusIs("VI_ERROR_TMO"));
    EXPECT_EQ(view(), "");
}

TEST_F(Basics, AFailedReadLeavesTheReadView)
{
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "kept"});
    press("basicRead");
    ASSERT_TRUE(viewShows("kept"));
    standin::script("viRead", {.status = VI_ERROR_TMO});
    press("basicRead");
    ASSERT_TRUE(statusIs("VI_ERROR_TMO"));
    EXPECT_EQ(view(), "kept");
}

TEST_F(Basics, AnAnswerEndsAtItsFirstZeroByte)
{
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = std::string("before\0after", 12)});
    press("basicRead");
    EXPECT_TRUE(viewShows("before"));
}

TEST_F(Basics, BytesAreShownAsUtf8AndInvalidOnesAsReplacements)
{
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "\xC2\xB5V \xFF."});
    press("basicRead");
    EXPECT_TRUE(viewShows(QString::fromUtf8("\xC2\xB5V \xEF\xBF\xBD."))) << view().toStdString();
}

TEST_F(Basics, ClearTextEmptiesTheReadView)
{
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "text"});
    press("basicRead");
    ASSERT_TRUE(viewShows("text"));
    press("basicClearText");
    EXPECT_EQ(view(), "");
}

TEST_F(Basics, TheStatusByteIsGreenForFourSecondsAndThenBlack)
{
    EXPECT_EQ(text("basicStatusByte"), "0x----");
    standin::script("viReadSTB", {.status = VI_SUCCESS, .numbers = {0x5A}});
    press("basicReadStb");
    ASSERT_TRUE(eventually([this] { return text("basicStatusByte") == "0x5a"; }));
    EXPECT_EQ(shown("basicStatusByte", "styleSheet").toString(), "QLabel { color: green }");
    QElapsedTimer timer;
    timer.start();
    EXPECT_TRUE(eventually(
        [this] { return shown("basicStatusByte", "styleSheet").toString() == "QLabel { color: black }"; }, 30000));
    EXPECT_GE(timer.elapsed(), 2500);
    EXPECT_EQ(text("basicStatusByte"), "0x5a");
}

TEST_F(Basics, AStatusByteHasNoLeadingZeros)
{
    standin::script("viReadSTB", {.status = VI_SUCCESS, .numbers = {4}});
    press("basicReadStb");
    EXPECT_TRUE(eventually([this] { return text("basicStatusByte") == "0x4"; }));
}

TEST_F(Basics, AFailedStatusByteShowsNothingNew)
{
    standin::script("viReadSTB", {.status = VI_ERROR_TMO});
    press("basicReadStb");
    ASSERT_TRUE(statusIs("VI_ERROR_TMO"));
    EXPECT_EQ(text("basicStatusByte"), "0x----");
}

TEST_F(Basics, TriggerAndClearReachTheInstrument)
{
    press("basicTrigger");
    ASSERT_TRUE(called("viAssertTrigger", 1));
    EXPECT_EQ(standin::calls("viAssertTrigger").at(0).numbers.at(0), 0u);
    ASSERT_TRUE(statusIs("VI_SUCCESS"));
    press("basicClear");
    ASSERT_TRUE(called("viClear", 1));
    EXPECT_EQ(standin::calls("viClear").at(0).handle, 2u);
}

TEST_F(Basics, HotkeysWriteReadAndQuery)
{
    standin::setReply("a", "first");
    enter("basicCommand", "a\\n");
    press("basicClearText"); // the focus leaves the command line, not the page
    key(Qt::Key_W, Qt::ControlModifier);
    ASSERT_TRUE(called("viWrite", 1));
    ASSERT_TRUE(statusIs("VI_SUCCESS"));
    key(Qt::Key_R, Qt::ControlModifier);
    ASSERT_TRUE(viewShows("first"));
    key(Qt::Key_Q, Qt::ControlModifier);
    ASSERT_TRUE(called("viRead", 2));
    EXPECT_EQ(standin::calls("viWrite").size(), 2u);
    EXPECT_TRUE(viewShows("first"));
}

TEST_F(Basics, AHotkeyWithAnotherModifierDoesNothing)
{
    press("basicClearText");
    key(Qt::Key_W, Qt::ControlModifier | Qt::ShiftModifier);
    key(Qt::Key_W);
    meanwhile();
    EXPECT_TRUE(standin::calls("viWrite").empty());
}

TEST_F(Basics, RequestButtonsIgnoreSpaceAndReturn)
{
    press("basicReadStb");
    ASSERT_TRUE(called("viReadSTB", 1));
    ASSERT_TRUE(statusIs("VI_SUCCESS"));
    key(Qt::Key_Space);
    key(Qt::Key_Return);
    meanwhile();
    EXPECT_EQ(standin::calls("viReadSTB").size(), 1u);
}

TEST_F(Basics, AnImpossibleReadCountEndsInALogLineAndTheWindowGoesOn)
{
    // 2147483647 bytes may or may not be had; a read of them must end either way, and the next call must work.
    standin::script("viRead", {.status = VI_ERROR_TMO});
    enterNumber("basicReadCount", 2147483647);
    press("basicRead");
    ASSERT_TRUE(eventually([this] { return text("statusLabel") != "Status: ----"; }));
    standin::script("viReadSTB", {.status = VI_SUCCESS, .numbers = {16}});
    press("basicReadStb");
    EXPECT_TRUE(eventually([this] { return text("basicStatusByte") == "0x10"; }));
}

} // namespace
