#include "RunningWorker.h"

#include <gmock/gmock.h>

#include <QDir>
#include <QFile>

using testing::ElementsAre;

namespace
{
using WorkerLife = RunningWorker;

TEST_F(WorkerLife, OpensItsResourceManagersAtOnce)
{
    // Of the session and of the two tests.
    EXPECT_THAT(standin::operations(), ElementsAre("viOpenDefaultRM", "viOpenDefaultRM", "viOpenDefaultRM"));
    EXPECT_THAT(logLines(), testing::IsEmpty());
}

TEST_F(WorkerLife, TheThreadEndsWhenTheHandlerIsClosedAndQueuedRequestsAreNotExecuted)
{
    open();
    const auto gate = std::make_shared<standin::Gate>();
    standin::script("viClear", {.gate = gate});
    const auto clear = makeCall(VisaFunctionCallTyp::Clear);
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(clear, false));
    ASSERT_TRUE(gate->waitForArrival());
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(clear, false));
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(clear, false));
    m_handler->close();
    EXPECT_FALSE(m_thread.isFinished());
    gate->open();
    EXPECT_TRUE(m_thread.wait(20000));
    EXPECT_EQ(standin::calls("viClear").size(), 1u);
    EXPECT_EQ(m_handler->finishedCount(), 0u) << "the call under way has nobody to tell any more";
}

TEST_F(WorkerLife, TheThreadThatWritesTheLogFileEndsWithTheLoop)
{
    const auto threads = [] { return QDir(QStringLiteral("/proc/self/task")).entryList(QDir::Dirs).size(); };
    const auto before = threads();
    m_handler->close();
    ASSERT_TRUE(m_thread.wait(20000));
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (threads() > before - 2 && std::chrono::steady_clock::now() < deadline)
        std::this_thread::yield();
    EXPECT_LE(threads(), before - 2) << "the loop's thread and the writer's, long before the worker itself goes";
}

TEST_F(WorkerLife, LinesGoToTheLogFileOnAThreadOfTheirOwn)
{
    m_worker->getLog()->writeLogFile(true);
    QFile file(m_worker->getLogFile()->getCurrentFileName());
    open();
    ASSERT_TRUE(file.open(QIODevice::ReadOnly)) << file.fileName().toStdString();
    QByteArray content;
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (!content.contains("viOpen(sesn= 1, rsrc= TCPIP::localhost::hislip0, mode= 0, timeout= 3000, vi= 2)") &&
           std::chrono::steady_clock::now() < deadline) {
        content += file.readAll();
        std::this_thread::yield();
    }
    EXPECT_LT(std::chrono::steady_clock::now(), deadline) << content.toStdString();
}

TEST_F(WorkerLife, PanelsAndTestsHaveLogsOfTheirOwnInOneRing)
{
    ASSERT_NE(m_worker->getLog(), m_worker->getTestLog());
    m_worker->getLog()->showLog(false);
    EXPECT_FALSE(m_worker->getTestLog()->isLogging());
    m_worker->getTestLog()->showLog(true);
    EXPECT_FALSE(m_worker->getLog()->isLogging());
    FastBuffer line{};
    std::snprintf(line.text, sizeof line.text, "from a test");
    m_worker->getTestLog()->emitWriteMessage(&line);
    EXPECT_THAT(logLines(), ElementsAre("from a test"));
}

TEST_F(WorkerLife, ReopensItsResourceManagers)
{
    open();
    m_thread.closeRM();
    EXPECT_EQ(standin::openObjects(), 0u);
    m_thread.openRM();
    EXPECT_EQ(standin::openObjects(), 3u);
    open();
}

TEST_F(WorkerLife, LeavesNothingOpenInTheLibrary)
{
    open();
    end();
    EXPECT_EQ(standin::openObjects(), 0u);
}

TEST_F(WorkerLife, CallbacksAfterItsEndAreSilent)
{
    open();
    run(VisaFunctionCallTyp::InstallHandler, number(0x3FFF200B));
    const auto handler = reinterpret_cast<ViHndlr>(standin::calls("viInstallHandler")[0].numbers[1]);
    end();
    EXPECT_EQ(handler(2, 0x3FFF200B, 2001, nullptr), 0);
}

TEST(WorkerWithoutItsLoop, EndsItsLogThread)
{
    standin::reset();
    const auto handler = std::make_unique<VisaFunctionCallHandler>(nullptr);
    const auto worker = std::make_unique<VisaSessionWorker>(handler.get()); // would hang here if the thread stayed
}

TEST(WorkerThread, WithoutAWorkerItEndsAtOnce)
{
    VisaThread thread;
    thread.openRM();
    thread.closeRM();
    thread.start();
    EXPECT_TRUE(thread.wait(20000));
}

TEST_F(WorkerLife, ManyRequestsComeBackInTheirOrder)
{
    open();
    m_worker->getLog()->showLog(false);
    std::uint64_t sent = 0;
    std::uint64_t received = 0;
    while (received < 5000) {
        while (sent < 5000 &&
               m_handler->sendVisaFunctionCall(makeCall(VisaFunctionCallTyp::SetAttribute, 0x3FFF001A), false))
            ++sent;
        ASSERT_EQ(awaitResult().type, VisaFunctionCallTyp::SetAttribute);
        ++received;
    }
    EXPECT_EQ(sent, 5000u);
}
} // namespace
