// How the program ends at bad moments. What ends a process runs in a child of its own.

#include "gui/support/StandinWindowTest.h"

#include "app/MainWindow.h"

#include <visa.h>

#include <QElapsedTimer>
#include <QFile>

#include <sys/resource.h>
#include <unistd.h>

#include <thread>

namespace
{

/// The home folder is the parent's in the child too, so that the parent sees what the child left.
class Shutdown : public StandinWindowTest
{
protected:
    Shutdown()
    {
        ::testing::GTEST_FLAG(death_test_style) = "threadsafe";
        if (!qEnvironmentVariableIsSet("SHARED_HOME"))
            qputenv("SHARED_HOME", qgetenv("HOME"));
        qputenv("HOME", qgetenv("SHARED_HOME"));
    }

    ~Shutdown() override { qunsetenv("SHARED_HOME"); }

    /// Connects, starts a read that never returns, and closes the window.
    [[noreturn]] void closeWithAStuckWorker()
    {
        openWindow();
        connectSession();
        auto gate = std::make_shared<standin::Gate>();
        standin::script("viRead", {.gate = gate});
        press("basicRead");
        gate->waitForArrival();
        closeWindow();
        std::_Exit(1); // not reached: the window's end ends the process
    }

    [[noreturn]] void workAndCloseNormally()
    {
        openWindow();
        connectSession();
        press("basicClear");
        EXPECT_TRUE(called("viClear", 1));
        closeWindow();
        // The window has ended by itself. The test program's own statics are not what is looked at here.
        std::_Exit(HasFailure() ? 1 : 0);
    }
};

TEST_F(Shutdown, AStuckWorkerEndsTheProcessWith55AfterFourSeconds)
{
    QElapsedTimer timer;
    timer.start();
    EXPECT_EXIT(closeWithAStuckWorker(), ::testing::ExitedWithCode(55), "");
    EXPECT_GE(timer.elapsed(), 4000);
    EXPECT_LT(timer.elapsed(), 30000);
    // The session's values were saved before the wait.
    EXPECT_TRUE(contents(dataFile()).startsWith("000001000025TCPIP::localhost::hislip0"))
        << contents(dataFile()).toStdString();
}

TEST_F(Shutdown, ACallThatReturnsInTimeIsWaitedFor)
{
    openWindow();
    connectSession();
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viRead", {.gate = gate});
    press("basicRead");
    ASSERT_TRUE(gate->waitForArrival());
    std::thread later([gate] {
        std::this_thread::sleep_for(std::chrono::milliseconds(300));
        gate->open();
    });
    closeWindow();
    later.join();
    EXPECT_EQ(standin::openObjects(), 0u);
}

TEST_F(Shutdown, RequestsThatStillWaitAreNotCarriedOut)
{
    openWindow();
    connectSession();
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viClear", {.gate = gate});
    press("basicClear");
    ASSERT_TRUE(gate->waitForArrival());
    for (int i = 0; i < 5; ++i)
        tick("basicSendEnd");
    std::thread later([gate] {
        std::this_thread::sleep_for(std::chrono::milliseconds(300));
        gate->open();
    });
    closeWindow();
    later.join();
    EXPECT_EQ(standin::calls("viSetAttribute").size(), 1u);
}

TEST_F(Shutdown, ClosingRightAfterOpeningIsNoMatter)
{
    for (int i = 0; i < 3; ++i) {
        openWindow();
        closeWindow();
    }
    EXPECT_EQ(standin::openObjects(), 0u);
}

TEST_F(Shutdown, AnUnwritableHomeLosesTheValuesAndNothingElse)
{
    QFile::setPermissions(home(), QFile::ReadOwner | QFile::ExeOwner | QFile::ReadOther | QFile::ExeOther);
    EXPECT_EXIT(
        {
            // Permissions do not bind root: be somebody else.
            if (::geteuid() == 0 && ::setresuid(65534, 65534, 65534) != 0)
                std::_Exit(2);
            workAndCloseNormally();
        },
        ::testing::ExitedWithCode(0), "");
    EXPECT_FALSE(QFile::exists(dataFile()));
    EXPECT_TRUE(logFiles().isEmpty());
    QFile::setPermissions(home(), QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner);
}

TEST_F(Shutdown, TwoTestersAtOnceDoNotDisturbEachOther)
{
    // The child runs this test from its start, too: it must not open the first window again.
    if (!qEnvironmentVariableIsSet("SECOND_TESTER")) {
        openWindow();
        tick("writeLog");
        meanwhile(50);
        connectSession();
        qputenv("SECOND_TESTER", "1");
    }
    EXPECT_EXIT(workAndCloseNormally(), ::testing::ExitedWithCode(0), "");
    press("basicClear");
    ASSERT_TRUE(called("viClear", 1));
    ASSERT_TRUE(eventually([this] { return logRow("viClear(vi= 2)") >= 0; }));
    closeWindow();
    EXPECT_TRUE(contents(dataFile()).startsWith("000001000025TCPIP::localhost::hislip0"));
    ASSERT_EQ(logFiles().size(), 1) << "the first one's log, and nothing left of the second";
    EXPECT_TRUE(contents(logFiles().constFirst()).contains("\tviClear(vi= 2)\t"));
}

} // namespace
