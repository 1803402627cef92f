// Starting, stopping and ending tests: from the request to the StopTest record.

#include "instrtests/visatestfunctions.h"
#include "pipeline/VisaError.h"
#include "unit/pipeline/RunningWorker.h"

#include <visa.h>

#include <gmock/gmock.h>

#include <condition_variable>
#include <mutex>

using testing::ElementsAre;
using testing::IsEmpty;

namespace
{

/// What the test functions below share with the tests that run them: at most one of each kind at a time.
struct Stage {
    std::mutex mutex;
    std::condition_variable changed;
    int arrived = 0;
    bool released = false;

    void reset()
    {
        const std::lock_guard lock(mutex);
        arrived = 0;
        released = false;
    }
    void enter()
    {
        const std::lock_guard lock(mutex);
        ++arrived;
        changed.notify_all();
    }
    bool waitForArrivals(int count)
    {
        std::unique_lock lock(mutex);
        return changed.wait_for(lock, std::chrono::seconds(20), [&] { return arrived >= count; });
    }
    void release()
    {
        const std::lock_guard lock(mutex);
        released = true;
        changed.notify_all();
    }
};

Stage stage;

unsigned succeed(SessionLog *, VisaSessionWithLog *session, const std::atomic<bool> *)
{
    stage.enter();
    session->closeSession();
    return 0;
}

unsigned answerSeven(SessionLog *, VisaSessionWithLog *session, const std::atomic<bool> *)
{
    session->closeSession();
    return 7;
}

unsigned failInside(SessionLog *, VisaSessionWithLog *, const std::atomic<bool> *)
{
    throw VisaError(VI_ERROR_TMO);
}

unsigned untilStopped(SessionLog *, VisaSessionWithLog *session, const std::atomic<bool> *stop)
{
    stage.enter();
    while (!stop->load())
        std::this_thread::yield();
    session->closeSession();
    return 0;
}

unsigned untilReleased(SessionLog *, VisaSessionWithLog *session, const std::atomic<bool> *)
{
    stage.enter();
    std::unique_lock lock(stage.mutex);
    stage.changed.wait(lock, [] { return stage.released; });
    session->closeSession();
    return 0;
}

class TestRunner : public RunningWorker
{
protected:
    void SetUp() override
    {
        stage.reset();
        RunningWorker::SetUp();
        standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0x00500806);
        standin::forgetCalls();
    }

    static Parameter entry(TestFunction function) { return number(reinterpret_cast<std::uintptr_t>(function)); }

    void send(VisaFunctionCallTyp type, const Parameter &first, const Parameter &second = {},
              const Parameter &third = {})
    {
        _visaFunctionCall request;
        request.type = type;
        request.parameter = {first, second, third};
        EXPECT_TRUE(m_handler->sendVisaFunctionCall(request, false));
    }
    void start(TestFunction function, unsigned slot, const char *resource = "TCPIP::test")
    {
        send(VisaFunctionCallTyp::Test, text(resource), entry(function), number(slot));
    }
    void stop(unsigned slot) { send(VisaFunctionCallTyp::StopTest, number(slot)); }

    /// The next StopTest record; the others are dropped.
    _visaFunctionCall awaitEnd()
    {
        for (;;) {
            _visaFunctionCall call = awaitResult();
            if (call.type == VisaFunctionCallTyp::StopTest || HasFailure())
                return call;
        }
    }
    void expectEnd(unsigned slot, unsigned result)
    {
        const _visaFunctionCall call = awaitEnd();
        EXPECT_EQ(call.status, 0);
        EXPECT_EQ(call.parameter[0].uintValue, slot);
        EXPECT_EQ(call.parameter[1].uintValue, result);
    }
};

TEST_F(TestRunner, OpensTheResourceSaysWhoTheLibraryIsAndRunsTheTest)
{
    start(succeed, 0, "TCPIP::gr\xC3\xBC\xC3\x9F\x65::hislip0");
    expectEnd(0, 0);
    EXPECT_THAT(logLines(), ElementsAre("Open VISA-Resource: TCPIP::gr\xC3\xBC\xC3\x9F\x65::hislip0",
                                        "Manf Name: Oltrava", "Impl Version: 0x500806"));
    const auto opened = standin::calls("viOpen");
    ASSERT_EQ(opened.size(), 1u);
    EXPECT_THAT(opened[0].numbers, ElementsAre(0, 2000));
    EXPECT_THAT(opened[0].texts, ElementsAre("TCPIP::gr\xC3\xBC\xC3\x9F\x65::hislip0"));
}

TEST_F(TestRunner, TheStartIsFinishedAtOnceWhileTheTestRunsOn)
{
    start(untilStopped, 0);
    const _visaFunctionCall started = awaitResult();
    EXPECT_EQ(started.type, VisaFunctionCallTyp::Test);
    EXPECT_EQ(started.status, 0);
    for (const Parameter &parameter : started.parameter) {
        EXPECT_EQ(parameter.uintValue, 0u);
        EXPECT_THAT(parameter.stringValue, IsEmpty());
    }
    open(); // the session's own calls go on meanwhile
    stop(0);
    expectEnd(0, 0);
}

TEST_F(TestRunner, AStopAloneBringsNoRecord)
{
    stop(0);
    stop(1);
    run(VisaFunctionCallTyp::Close);
    EXPECT_EQ(m_handler->finishedCount(), 0u);
}

TEST_F(TestRunner, EachEndBringsOneRecordWithTheTestsResult)
{
    start(answerSeven, 1);
    expectEnd(1, 7);
    run(VisaFunctionCallTyp::Close);
    EXPECT_EQ(m_handler->finishedCount(), 0u);
}

TEST_F(TestRunner, BothSlotsRunAtOnceAndEachStopsItsOwn)
{
    start(untilStopped, 0, "first");
    start(untilStopped, 1, "second");
    ASSERT_TRUE(stage.waitForArrivals(2));
    stop(1);
    expectEnd(1, 0);
    stop(0);
    expectEnd(0, 0);
}

TEST_F(TestRunner, AnySlotNumberButZeroIsSlotOne)
{
    start(untilStopped, 5);
    stop(77);
    expectEnd(1, 0);
}

TEST_F(TestRunner, AResourceThatDoesNotOpenFails)
{
    standin::script("viOpen", {.status = VI_ERROR_RSRC_NFOUND});
    start(succeed, 0);
    expectEnd(0, 1);
    EXPECT_THAT(logLines(),
                ElementsAre("Open VISA-Resource: TCPIP::test", "Cannot open VISA-Resource(VI_ERROR_RSRC_NFOUND)"));
    EXPECT_EQ(stage.arrived, 0);
}

TEST_F(TestRunner, AFailureInsideTheTestIsToldAsOneOfOpening)
{
    start(failInside, 0);
    expectEnd(0, 1);
    EXPECT_EQ(logLines().back(), "Cannot open VISA-Resource(VI_ERROR_TMO)");
}

TEST_F(TestRunner, AnAttributeThatCannotBeReadFailsToo)
{
    standin::script("viGetAttribute", {});
    standin::script("viGetAttribute", {.status = VI_ERROR_NSUP_ATTR});
    start(succeed, 0);
    expectEnd(0, 1);
    EXPECT_THAT(logLines(), ElementsAre("Open VISA-Resource: TCPIP::test", "Manf Name: Oltrava",
                                        "Cannot open VISA-Resource(VI_ERROR_NSUP_ATTR)"));
}

TEST_F(TestRunner, TheThreadLeavesTheSessionOpenAndTheNextStartClosesIt)
{
    start(failInside, 0);
    expectEnd(0, 1);
    EXPECT_TRUE(standin::calls("viClose").empty());
    start(succeed, 0);
    expectEnd(0, 0);
    const auto operations = standin::operations();
    EXPECT_THAT(operations, ElementsAre("viOpen", "viGetAttribute", "viGetAttribute", "viClose", "viOpen",
                                        "viGetAttribute", "viGetAttribute", "viClose"));
}

TEST_F(TestRunner, AStartRightAfterTheEndRuns)
{
    // The record is on its way before the thread has returned: the start has to wait for that.
    for (int i = 0; i < 50; ++i) {
        start(succeed, 0);
        expectEnd(0, 0);
    }
    EXPECT_EQ(stage.arrived, 50);
}

TEST_F(TestRunner, AStopBeforeTheStartDoesNotStopIt)
{
    stop(0);
    start(untilStopped, 0);
    ASSERT_TRUE(stage.waitForArrivals(1));
    stop(0);
    expectEnd(0, 0);
}

TEST_F(TestRunner, ASecondStartStopsTheFirstInsteadOfWaitingForEver)
{
    start(untilStopped, 0);
    ASSERT_TRUE(stage.waitForArrivals(1));
    start(untilStopped, 0);
    expectEnd(0, 0);
    ASSERT_TRUE(stage.waitForArrivals(2));
    stop(0);
    expectEnd(0, 0);
}

TEST_F(TestRunner, AStartWithoutATestFails)
{
    start(nullptr, 1);
    expectEnd(1, 1);
    EXPECT_TRUE(standin::calls("viOpen").empty());
}

TEST_F(TestRunner, TheTestsSessionIsItsOwn)
{
    open();
    start(untilStopped, 0);
    ASSERT_TRUE(stage.waitForArrivals(1));
    EXPECT_EQ(awaitResult().type, VisaFunctionCallTyp::Test);
    EXPECT_EQ(standin::calls("viOpen").size(), 2u);
    EXPECT_EQ(run(VisaFunctionCallTyp::Close).status, 0);
    EXPECT_EQ(standin::openObjects(), 3u + 1) << "the test's session stays";
}

TEST_F(TestRunner, AResultThatArrivesAfterTheWorkerBeganToEndIsDropped)
{
    start(untilStopped, 0);
    start(untilStopped, 1);
    ASSERT_TRUE(stage.waitForArrivals(2));
    EXPECT_EQ(awaitResult().type, VisaFunctionCallTyp::Test);
    EXPECT_EQ(awaitResult().type, VisaFunctionCallTyp::Test);
    m_handler->close();
    m_thread.wait();
    m_worker.reset(); // stops both
    EXPECT_EQ(m_handler->finishedCount(), 0u);
    EXPECT_EQ(standin::openObjects(), 0u);
}

TEST_F(TestRunner, TheEndStopsARunningTestAndWaitsForIt)
{
    start(untilReleased, 0);
    ASSERT_TRUE(stage.waitForArrivals(1));
    std::thread later([] {
        std::this_thread::sleep_for(std::chrono::milliseconds(300));
        stage.release();
    });
    end();
    later.join();
    EXPECT_EQ(standin::openObjects(), 0u);
}

using TestRunnerDeath = TestRunner;

TEST_F(TestRunnerDeath, ATestThatDoesNotEndEndsTheProcessWith55)
{
    ::testing::GTEST_FLAG(death_test_style) = "threadsafe";
    EXPECT_EXIT(
        {
            start(untilReleased, 1);
            stage.waitForArrivals(1);
            end();
            std::_Exit(1);
        },
        ::testing::ExitedWithCode(55), "");
}

} // namespace
