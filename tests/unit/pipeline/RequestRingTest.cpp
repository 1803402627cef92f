#include "pipeline/VisaFunctionCallHandler.h"

#include "Asleep.h"
#include "RecordingListener.h"

#include <gmock/gmock.h>

#include <unistd.h>

#include <atomic>
#include <chrono>
#include <future>
#include <memory>
#include <thread>
#include <vector>

using testing::ElementsAre;
using testing::IsEmpty;

namespace
{
class RequestRing : public testing::Test
{
protected:
    const std::unique_ptr<VisaFunctionCallHandler> m_handler = std::make_unique<VisaFunctionCallHandler>(nullptr);

    bool send(VisaFunctionCallTyp type, bool lock = false, std::uint64_t number = 0)
    {
        return m_handler->sendVisaFunctionCall(makeCall(type, number), lock);
    }
    void finish(VisaFunctionCallTyp type)
    {
        _visaFunctionCall call = makeCall(type);
        m_handler->VisaFunctionCallFinshed(call);
    }
};

TEST_F(RequestRing, HandsOverTypeStatusAndAllThreeSlots)
{
    _visaFunctionCall sent;
    sent.type = VisaFunctionCallTyp::Query;
    sent.status = -7;
    sent.parameter = {Parameter{1, std::string("a\0b", 3)}, Parameter{1ull << 63, "second"}, Parameter{3, "third"}};
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(sent, true));

    _visaFunctionCall taken = makeCall(VisaFunctionCallTyp::Open, 99, "left over");
    ASSERT_TRUE(m_handler->getVisaFunctionCall(taken));
    EXPECT_EQ(taken.type, VisaFunctionCallTyp::Query);
    EXPECT_EQ(taken.status, -7);
    EXPECT_EQ(taken.parameter[0].uintValue, 1u);
    EXPECT_EQ(taken.parameter[0].stringValue, std::string("a\0b", 3));
    EXPECT_EQ(taken.parameter[1].uintValue, 1ull << 63);
    EXPECT_EQ(taken.parameter[1].stringValue, "second");
    EXPECT_EQ(taken.parameter[2].uintValue, 3u);
    EXPECT_EQ(taken.parameter[2].stringValue, "third");
}

TEST_F(RequestRing, RefusesThe1025thOutstandingRequest)
{
    for (unsigned i = 0; i < 1024; ++i)
        ASSERT_TRUE(send(VisaFunctionCallTyp::Read, false, i)) << i;
    EXPECT_FALSE(send(VisaFunctionCallTyp::Read, false, 1024));

    // Room for one again; the order survives the end of the array.
    _visaFunctionCall taken;
    ASSERT_TRUE(m_handler->getVisaFunctionCall(taken));
    EXPECT_EQ(taken.parameter[0].uintValue, 0u);
    EXPECT_TRUE(send(VisaFunctionCallTyp::Read, false, 2000));
    EXPECT_FALSE(send(VisaFunctionCallTyp::Read, false, 2001));
    for (unsigned i = 1; i < 1024; ++i) {
        ASSERT_TRUE(m_handler->getVisaFunctionCall(taken));
        ASSERT_EQ(taken.parameter[0].uintValue, i);
    }
    ASSERT_TRUE(m_handler->getVisaFunctionCall(taken));
    EXPECT_EQ(taken.parameter[0].uintValue, 2000u);
}

TEST_F(RequestRing, RefusesALockingRequestWhileOneIsOutstanding)
{
    EXPECT_TRUE(send(VisaFunctionCallTyp::Read, true));
    EXPECT_FALSE(send(VisaFunctionCallTyp::Write, true));
    // Taking it is not finishing it.
    _visaFunctionCall taken;
    ASSERT_TRUE(m_handler->getVisaFunctionCall(taken));
    EXPECT_FALSE(send(VisaFunctionCallTyp::Write, true));
}

TEST_F(RequestRing, AnyFinishedCallEndsTheLock)
{
    EXPECT_TRUE(send(VisaFunctionCallTyp::Read, true));
    finish(VisaFunctionCallTyp::StopTest); // nobody listens, and it is another call's result
    EXPECT_TRUE(send(VisaFunctionCallTyp::Write, true));
}

TEST_F(RequestRing, ANonLockingRequestClearsTheLock)
{
    EXPECT_TRUE(send(VisaFunctionCallTyp::Read, true));
    EXPECT_TRUE(send(VisaFunctionCallTyp::GetAttribute, false));
    EXPECT_TRUE(send(VisaFunctionCallTyp::Write, true));
}

TEST_F(RequestRing, ARequestRefusedForAFullRingSetsTheLock)
{
    for (unsigned i = 0; i < 1024; ++i)
        ASSERT_TRUE(send(VisaFunctionCallTyp::Read));
    EXPECT_FALSE(send(VisaFunctionCallTyp::Read, true));

    _visaFunctionCall taken;
    ASSERT_TRUE(m_handler->getVisaFunctionCall(taken));
    EXPECT_FALSE(send(VisaFunctionCallTyp::Write, true)) << "there is room, but the refused request left the flag set";
}

TEST_F(RequestRing, ANonLockingRequestRefusedForAFullRingClearsTheLock)
{
    for (unsigned i = 0; i < 1023; ++i)
        ASSERT_TRUE(send(VisaFunctionCallTyp::Read));
    ASSERT_TRUE(send(VisaFunctionCallTyp::Read, true));
    EXPECT_FALSE(send(VisaFunctionCallTyp::Read, false));

    _visaFunctionCall taken;
    ASSERT_TRUE(m_handler->getVisaFunctionCall(taken));
    EXPECT_TRUE(send(VisaFunctionCallTyp::Write, true));
}

TEST_F(RequestRing, TellsOnlyListenersOfAllThatACallStarted)
{
    RecordingListener everything(m_handler.get(), VisaFunctionCallTyp::All);
    RecordingListener reads(m_handler.get(), VisaFunctionCallTyp::Read);
    send(VisaFunctionCallTyp::Read, true);
    send(VisaFunctionCallTyp::Read, true); // refused: nothing starts
    EXPECT_THAT(everything.started, ElementsAre(VisaFunctionCallTyp::Read));
    EXPECT_THAT(reads.started, IsEmpty());
}

TEST_F(RequestRing, AListenerMayGoWhileItIsToldThatACallStarted)
{
    auto first = std::make_unique<RecordingListener>(m_handler.get(), VisaFunctionCallTyp::All);
    auto second = std::make_unique<RecordingListener>(m_handler.get(), VisaFunctionCallTyp::All);
    RecordingListener third(m_handler.get(), VisaFunctionCallTyp::All);
    first->onStarted = [&] {
        second.reset();
        first.reset();
    };
    EXPECT_TRUE(send(VisaFunctionCallTyp::Read));
    EXPECT_THAT(third.started, ElementsAre(VisaFunctionCallTyp::Read));
    EXPECT_TRUE(send(VisaFunctionCallTyp::Write));
    EXPECT_THAT(third.started, ElementsAre(VisaFunctionCallTyp::Read, VisaFunctionCallTyp::Write));
}

TEST_F(RequestRing, ATakerWaitsForARequest)
{
    std::promise<std::uint64_t> taken;
    std::thread worker([&] {
        _visaFunctionCall call;
        taken.set_value(m_handler->getVisaFunctionCall(call) ? call.parameter[0].uintValue : 0);
    });
    EXPECT_TRUE(send(VisaFunctionCallTyp::Read, false, 42));
    EXPECT_EQ(taken.get_future().get(), 42u);
    worker.join();
}

TEST_F(RequestRing, ClosingWakesATakerAndEndsTaking)
{
    std::promise<bool> answer;
    std::promise<pid_t> started;
    std::thread worker([&] {
        _visaFunctionCall call;
        started.set_value(gettid());
        answer.set_value(m_handler->getVisaFunctionCall(call));
    });
    const pid_t taker = started.get_future().get();
    while (!isAsleep(taker))
        std::this_thread::yield();
    m_handler->close();
    EXPECT_FALSE(answer.get_future().get());
    worker.join();

    // For good, however often somebody asks.
    _visaFunctionCall call;
    for (int i = 0; i < 250; ++i)
        ASSERT_FALSE(m_handler->getVisaFunctionCall(call));
}

TEST_F(RequestRing, ClosingWakesAHundredTakers)
{
    std::atomic<int> awake{0};
    std::vector<std::promise<pid_t>> started(100);
    std::vector<std::thread> takers;
    takers.reserve(started.size());
    for (auto &start : started) {
        takers.emplace_back([&] {
            start.set_value(gettid());
            _visaFunctionCall call;
            m_handler->getVisaFunctionCall(call);
            ++awake;
        });
    }
    for (auto &start : started) {
        const pid_t taker = start.get_future().get();
        while (!isAsleep(taker))
            std::this_thread::yield();
    }
    m_handler->close();
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (awake < 100 && std::chrono::steady_clock::now() < deadline)
        std::this_thread::yield();
    EXPECT_EQ(awake, 100);
    while (awake < 100) // so that a failure ends
        m_handler->close();
    for (std::thread &taker : takers)
        taker.join();
}

TEST_F(RequestRing, RequestsQueuedBeforeClosingAreNotTaken)
{
    ASSERT_TRUE(send(VisaFunctionCallTyp::Read));
    m_handler->close();
    _visaFunctionCall call;
    EXPECT_FALSE(m_handler->getVisaFunctionCall(call));
}

TEST_F(RequestRing, SendingOnAClosedHandlerIsNotRefused)
{
    m_handler->close();
    EXPECT_TRUE(send(VisaFunctionCallTyp::Read, true));
    EXPECT_FALSE(send(VisaFunctionCallTyp::Read, true));
    for (unsigned i = 1; i < 1024; ++i)
        ASSERT_TRUE(send(VisaFunctionCallTyp::Read, false));
    EXPECT_FALSE(send(VisaFunctionCallTyp::Read, false));
}

TEST_F(RequestRing, KeepsTheOrderBetweenTwoThreads)
{
    constexpr std::uint64_t Count = 20000;
    std::thread worker([&] {
        _visaFunctionCall call;
        for (std::uint64_t i = 0; i < Count; ++i) {
            ASSERT_TRUE(m_handler->getVisaFunctionCall(call));
            ASSERT_EQ(call.parameter[0].uintValue, i);
            ASSERT_EQ(call.parameter[0].stringValue, "a text too long to be kept inside the string itself");
        }
    });
    for (std::uint64_t i = 0; i < Count; ++i) {
        const auto call =
            makeCall(VisaFunctionCallTyp::Write, i, "a text too long to be kept inside the string itself");
        while (!m_handler->sendVisaFunctionCall(call, false))
            std::this_thread::yield();
    }
    worker.join();
}
} // namespace
