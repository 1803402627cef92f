#include "gui/support/StandinWindowTest.h"

#include <visa.h>

#include <QColor>
#include <QPalette>

namespace
{

/// Connected, on the page "Locking".
class LockingPage : public StandinWindowTest
{
protected:
    LockingPage()
    {
        openWindow();
        connectSession();
        showPage("Locking");
    }

    void press(const char *name, const QString &status = "VI_SUCCESS")
    {
        StandinWindowTest::press(name);
        ASSERT_TRUE(statusIs(status)) << text("statusLabel").toStdString();
    }

    QString key() { return text("lockAccessKey"); }
    bool lineAppears(const QString &line)
    {
        return eventually([&] { return logRow(line) >= 0; });
    }
};

TEST_F(LockingPage, AnExclusiveLockNeedsTheTimeOutOnly)
{
    enter("lockRequestedKey", "not for this one");
    press("lockExclusive");
    const auto call = standin::calls("viLock").at(0);
    EXPECT_EQ(call.handle, 2u);
    EXPECT_EQ(call.numbers, (std::vector<std::uint64_t>{1, 2000, 0, 0}));
    EXPECT_TRUE(lineAppears("viLock(vi= 2,mode= VI_EXCLUSIVE_LOCK, timeout= 2000, rKey= \"\", aKey= \"\")"));
    EXPECT_EQ(key(), "");
}

TEST_F(LockingPage, ASharedLockAsksForTheKeyAndShowsIt)
{
    enter("lockRequestedKey", "bench 7");
    enterNumber("lockTimeout", 250);
    press("lockShared");
    const auto call = standin::calls("viLock").at(0);
    EXPECT_EQ(call.numbers.at(0), 2u);
    EXPECT_EQ(call.numbers.at(1), 250u);
    EXPECT_EQ(call.texts.at(0), "bench 7");
    EXPECT_EQ(key(), "bench 7");
    EXPECT_TRUE(lineAppears("viLock(vi= 2,mode= VI_SHARED_LOCK, timeout= 250, rKey= bench 7, aKey= bench 7)"));
}

TEST_F(LockingPage, ShowsTheKeyThatTheLibraryReturnedWhateverWasAskedFor)
{
    standin::script("viLock", {.status = VI_SUCCESS, .bytes = "M\xC3\xBCller:4711"});
    enter("lockRequestedKey", "asked");
    press("lockShared");
    EXPECT_EQ(key(), QString::fromUtf8("Müller:4711"));
    EXPECT_EQ(text("lockRequestedKey"), "asked");
}

TEST_F(LockingPage, AnEmptyKeyIsPassedAsAnEmptyText)
{
    press("lockShared");
    const auto call = standin::calls("viLock").at(0);
    EXPECT_NE(call.numbers.at(2), 0u) << "the key itself is there";
    EXPECT_EQ(call.texts.at(0), "");
}

TEST_F(LockingPage, AFailedSharedLockLeavesTheKeyBefore)
{
    enter("lockRequestedKey", "first");
    press("lockShared");
    standin::script("viLock", {.status = VI_ERROR_RSRC_LOCKED, .bytes = "not granted"});
    enter("lockRequestedKey", "second");
    press("lockShared", "VI_ERROR_RSRC_LOCKED");
    EXPECT_EQ(key(), "first");
}

TEST_F(LockingPage, ANestedSharedLockShowsItsKeyAndIsNoFailure)
{
    standin::script("viLock", {.status = VI_SUCCESS_NESTED_SHARED, .bytes = "nested"});
    press("lockShared", "VI_SUCCESS_NESTED_SHARED");
    EXPECT_EQ(key(), "nested");
    const QColor shown = widget("statusLabel")->palette().color(QPalette::WindowText).toHsl();
    EXPECT_EQ(shown, QColor::fromHsl(30, 255, 128)) << "orange";
}

TEST_F(LockingPage, UnlockExclusiveLockAndDisconnectLeaveTheOldKey)
{
    enter("lockRequestedKey", "old");
    press("lockShared");
    press("lockUnlock");
    EXPECT_TRUE(lineAppears("viUnlock(vi= 2)"));
    EXPECT_EQ(key(), "old");
    press("lockExclusive");
    EXPECT_EQ(key(), "old");
    press("resourceDisconnect");
    EXPECT_EQ(key(), "old");
}

TEST_F(LockingPage, UnlockingWhatIsNotLockedSaysSo)
{
    standin::script("viUnlock", {.status = VI_ERROR_SESN_NLOCKED});
    press("lockUnlock", "VI_ERROR_SESN_NLOCKED");
}

TEST_F(LockingPage, TheTimeOutStepsByAThousandBetweenItsLimits)
{
    EXPECT_EQ(shown("lockTimeout", "value").toInt(), 2000);
    enter("lockTimeout", "2000");
    WindowTest::key(Qt::Key_Up);
    EXPECT_EQ(shown("lockTimeout", "value").toInt(), 3000);
    for (int i = 0; i < 5; ++i)
        WindowTest::key(Qt::Key_Down);
    EXPECT_EQ(shown("lockTimeout", "value").toInt(), 0);
    enterNumber("lockTimeout", 2147483647);
    press("lockExclusive");
    EXPECT_EQ(standin::calls("viLock").at(0).numbers.at(1), 2147483647u);
}

TEST_F(LockingPage, LocalAndRemoteSendTheirModes)
{
    press("lockGoToLocal");
    EXPECT_EQ(standin::calls("viGpibControlREN").at(0).numbers.at(0), 2u);
    EXPECT_TRUE(lineAppears("viGpibControlREN(vi= 2,mode= VI_GPIB_REN_DEASSERT_GTL)"));
    press("lockGoToRemote");
    EXPECT_EQ(standin::calls("viGpibControlREN").at(1).numbers.at(0), 3u);
    EXPECT_TRUE(lineAppears("viGpibControlREN(vi= 2,mode= VI_GPIB_REN_ASSERT_ADDRESS)"));
}

TEST_F(LockingPage, TheWindowLivesWhileALockIsWaitedFor)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viLock", {.status = VI_ERROR_TMO, .gate = gate});
    StandinWindowTest::press("lockExclusive");
    ASSERT_TRUE(gate->waitForArrival());
    enter("lockRequestedKey", "typed meanwhile");
    EXPECT_EQ(text("lockRequestedKey"), "typed meanwhile");
    StandinWindowTest::press("lockUnlock"); // one call at a time
    gate->open();
    ASSERT_TRUE(statusIs("VI_ERROR_TMO"));
    meanwhile();
    EXPECT_TRUE(standin::calls("viUnlock").empty());
}

} // namespace
