#include "visa/CallBackLog.h"

#include "unit/visa/SessionFixture.h"

#include <atomic>
#include <chrono>
#include <cstdio>
#include <future>
#include <thread>

using testing::IsEmpty;

namespace
{

/// A session's log that registers for callbacks and is gone, like its registration, at the end.
struct Front {
    Front() { CallBackLog::createCallBackLog(&sessionLog); }

    std::vector<FastBuffer> lines() const
    {
        std::vector<FastBuffer> held(64);
        held.resize(log->getMessageQueue()->copyFromQueue(held.data(), 64));
        return held;
    }

    std::unique_ptr<Log> log = std::make_unique<Log>(nullptr);
    SessionLog sessionLog{log.get(), nullptr};
};

} // namespace

TEST(CallBackLog, WritesOneFreeLineForEachCallback)
{
    const Front front;
    int user = 0;
    EXPECT_EQ(CallBackLog::viEventHandler(5, VI_EVENT_SERVICE_REQ, 2001, &user), 0);
    EXPECT_EQ(CallBackLog::viEventHandler(6, 0x1234, 0xFFFFFFFF, nullptr), 0);
    char expected[120];
    std::snprintf(expected, sizeof expected,
                  "Callback from Event VI_EVENT_SERVICE_REQ: vi=5,context=2001,userHandle=%p",
                  static_cast<void *>(&user));
    const auto lines = front.lines();
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_STREQ(lines[0].text, expected);
    EXPECT_STREQ(lines[1].text, "Callback from Event Unknown Event: vi=6,context=4294967295,userHandle=(nil)");
    EXPECT_FALSE(lines[0].visaLine);
    EXPECT_EQ(lines[0].status, 0);
    EXPECT_EQ(lines[0].duration, 0u);
    EXPECT_EQ(lines[1].line, lines[0].line + 1);
}

TEST(CallBackLog, ShowsCallbacksOfAllSessionsInTheFirstOneEvenWhenItsLogIsOff)
{
    const Front first;
    Front second;
    second.sessionLog.showLog(true);
    standin::reset();
    VisaSessionWithLog session(&second.sessionLog);
    char name[] = "A";
    session.open(name, 0, 0);
    session.installHandler(VI_EVENT_SERVICE_REQ, CallBackLog::viEventHandler, nullptr);
    const auto before = second.lines().size();
    standin::fireEvent(2, VI_EVENT_SERVICE_REQ);
    ASSERT_EQ(first.lines().size(), 1u);
    EXPECT_STREQ(first.lines()[0].text, "Callback from Event VI_EVENT_SERVICE_REQ: vi=2,context=2001,userHandle=(nil)");
    EXPECT_EQ(second.lines().size(), before);
}

TEST(CallBackLog, IsOneInTheProcess)
{
    const Front first;
    CallBackLog *instance = CallBackLog::createCallBackLog(nullptr);
    Front second;
    EXPECT_EQ(CallBackLog::createCallBackLog(&second.sessionLog), instance);
}

TEST(CallBackLog, IsSilentWithoutALog)
{
    EXPECT_EQ(CallBackLog::viEventHandler(5, VI_EVENT_SERVICE_REQ, 1, nullptr), 0);
    Front front;
    CallBackLog::forget(&front.sessionLog);
    EXPECT_EQ(CallBackLog::viEventHandler(5, VI_EVENT_SERVICE_REQ, 1, nullptr), 0);
    EXPECT_THAT(front.lines(), IsEmpty());
}

TEST(CallBackLog, ForgetsALogThatIsDestroyed)
{
    {
        const Front front;
    }
    EXPECT_EQ(CallBackLog::viEventHandler(5, VI_EVENT_SERVICE_REQ, 1, nullptr), 0);
    const Front next; // a window that is opened later has callbacks again
    CallBackLog::viEventHandler(5, VI_EVENT_SERVICE_REQ, 1, nullptr);
    EXPECT_EQ(next.lines().size(), 1u);
}

TEST(CallBackLog, KeepsItsLogWhenAnotherOneGoes)
{
    const Front first;
    {
        const Front second;
        CallBackLog::forget(&second.sessionLog);
    }
    CallBackLog::viEventHandler(5, VI_EVENT_SERVICE_REQ, 1, nullptr);
    EXPECT_EQ(first.lines().size(), 1u);
}

TEST(CallBackLog, ForgetsALogOnlyAfterTheCallbackThatWritesToIt)
{
    auto front = std::make_unique<Front>();
    front->sessionLog.writeLogFile(true);
    // The file queue is full: the callback waits inside the log.
    const FastBuffer line{};
    for (unsigned i = 0; i < MessageQueue::Capacity; ++i)
        front->log->getFileMessageQueue()->push(line);
    std::thread callback([] { CallBackLog::viEventHandler(5, VI_EVENT_SERVICE_REQ, 1, nullptr); });
    while (front->lines().empty()) // the line is shown before it goes to the file
        std::this_thread::yield();
    std::promise<void> forgotten;
    auto isForgotten = forgotten.get_future();
    std::thread owner([&] {
        CallBackLog::forget(&front->sessionLog);
        forgotten.set_value();
    });
    // Time enough for an owner that does not wait.
    EXPECT_EQ(isForgotten.wait_for(std::chrono::milliseconds(100)), std::future_status::timeout);
    FastBuffer popped;
    EXPECT_TRUE(front->log->getFileMessageQueue()->pop(popped));
    callback.join();
    owner.join();
    EXPECT_EQ(isForgotten.wait_for(std::chrono::milliseconds(0)), std::future_status::ready);
    front.reset();
}

TEST(CallBackLog, SurvivesLogsThatComeAndGoUnderCallbacks)
{
    std::atomic<bool> stop = false;
    std::thread callbacks([&] {
        while (!stop)
            CallBackLog::viEventHandler(5, VI_EVENT_SERVICE_REQ, 1, nullptr);
    });
    for (int i = 0; i < 50; ++i) {
        Front front;
        CallBackLog::forget(&front.sessionLog);
    }
    stop = true;
    callbacks.join();
}
