#include "kyvisa/core/EventHub.h"
#include "kyvisa/include/visa.h"

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <functional>
#include <future>
#include <gtest/gtest.h>
#include <mutex>
#include <thread>

using namespace kyvisa;

namespace
{

struct Call {
    char who;
    ViEventType type;
    ViEvent context;
};

/// What handlers did, in order. Handlers of VI_EVENT_EXCEPTION and of pending events run on the calling thread.
struct Diary {
    std::vector<Call> calls;
    ViStatus answer = VI_SUCCESS;

    std::string order() const
    {
        std::string text;
        for (const Call &call : calls)
            text += call.who;
        return text;
    }
};

template <char Who>
ViStatus handler(ViSession, ViEventType type, ViEvent context, ViAddr user)
{
    auto &diary = *static_cast<Diary *>(user);
    diary.calls.push_back({Who, type, context});
    return diary.answer;
}

constexpr std::array<ViEventType, 3> All = {VI_EVENT_IO_COMPLETION, VI_EVENT_EXCEPTION, VI_EVENT_SERVICE_REQ};

class Events : public testing::Test
{
protected:
    void TearDown() override
    {
        m_hub->close();
        EXPECT_EQ(m_made, m_closed);
    }

    void post(ViEventType type, ViJobId job = 0) { m_hub->post({.type = type, .job = job}); }
    ViStatus wait(ViEventType type, ViUInt32 timeout = 0) { return m_hub->wait(type, timeout, m_event); }

    ViEvent m_made = 0;
    ViEvent m_closed = 0;
    std::shared_ptr<EventHub> m_hub = std::make_shared<EventHub>(
        All, EventHub::Contexts{[this](const Event &) { return ++m_made; }, [this](ViEvent) { ++m_closed; }});
    Event m_event;
    Diary m_diary;
};

constexpr ViEventType Srq = VI_EVENT_SERVICE_REQ;
constexpr ViEventType Done = VI_EVENT_IO_COMPLETION;
constexpr ViEventType Failed = VI_EVENT_EXCEPTION;

TEST_F(Events, EnableChecksItsArgumentsInOrder)
{
    EXPECT_EQ(m_hub->enable(VI_EVENT_TRIG, 99, 1), VI_ERROR_INV_EVENT);
    EXPECT_EQ(m_hub->enable(Srq, 0, 1), VI_ERROR_INV_MECH);
    EXPECT_EQ(m_hub->enable(Srq, VI_HNDLR | VI_SUSPEND_HNDLR, 0), VI_ERROR_INV_MECH);
    EXPECT_EQ(m_hub->enable(Srq, VI_ALL_MECH, 0), VI_ERROR_INV_MECH);
    EXPECT_EQ(m_hub->enable(Srq, 8, 0), VI_ERROR_INV_MECH);
    EXPECT_EQ(m_hub->enable(Srq, VI_QUEUE, 1), VI_ERROR_INV_CONTEXT);
    EXPECT_EQ(m_hub->enable(Srq, VI_HNDLR, 0), VI_ERROR_HNDLR_NINSTALLED);
    EXPECT_EQ(m_hub->enable(Failed, VI_QUEUE, 0), VI_ERROR_NSUP_MECH);
    EXPECT_EQ(m_hub->enable(Failed, VI_SUSPEND_HNDLR, 0), VI_ERROR_NSUP_MECH);
}

TEST_F(Events, QueueAndHandlerAreIndependent)
{
    ASSERT_EQ(m_hub->install(Srq, handler<'a'>, &m_diary), VI_SUCCESS);
    EXPECT_EQ(m_hub->enable(Srq, VI_QUEUE, 0), VI_SUCCESS);
    EXPECT_EQ(m_hub->enable(Srq, VI_QUEUE | VI_SUSPEND_HNDLR, 0), VI_SUCCESS_EVENT_EN);
    EXPECT_EQ(m_hub->disable(Srq, VI_QUEUE), VI_SUCCESS);
    EXPECT_EQ(m_hub->disable(Srq, VI_QUEUE), VI_SUCCESS_EVENT_DIS);
    EXPECT_EQ(m_hub->disable(Srq, VI_HNDLR), VI_SUCCESS); // the callback mode, whichever it is
    EXPECT_EQ(m_hub->disable(Srq, VI_ALL_MECH), VI_SUCCESS_EVENT_DIS);
    EXPECT_EQ(m_hub->disable(Srq, 0), VI_ERROR_INV_MECH);
    EXPECT_EQ(m_hub->disable(VI_EVENT_CLEAR, VI_QUEUE), VI_ERROR_INV_EVENT);
}

TEST_F(Events, DisablingAllMechanismsOfWhichOneWasOnIsPlainSuccess)
{
    ASSERT_EQ(m_hub->enable(Srq, VI_QUEUE, 0), VI_SUCCESS);
    EXPECT_EQ(m_hub->disable(Srq, VI_ALL_MECH), VI_SUCCESS);
}

TEST_F(Events, NothingIsQueuedThatIsNotEnabled)
{
    post(Srq);
    EXPECT_EQ(wait(Srq), VI_ERROR_NENABLED);
    ASSERT_EQ(m_hub->enable(Srq, VI_QUEUE, 0), VI_SUCCESS);
    EXPECT_EQ(wait(Srq), VI_ERROR_TMO);
    EXPECT_EQ(wait(VI_EVENT_TRIG), VI_ERROR_INV_EVENT);
}

TEST_F(Events, QueuedEventsSurviveDisabling)
{
    ASSERT_EQ(m_hub->enable(Srq, VI_QUEUE, 0), VI_SUCCESS);
    post(Srq);
    ASSERT_EQ(m_hub->disable(Srq, VI_QUEUE), VI_SUCCESS);
    EXPECT_EQ(wait(Srq), VI_SUCCESS);
    EXPECT_EQ(wait(Srq), VI_ERROR_NENABLED);
}

TEST_F(Events, OldestOfAllTypesComesFirst)
{
    ASSERT_EQ(m_hub->enable(Srq, VI_QUEUE, 0), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Done, VI_QUEUE, 0), VI_SUCCESS);
    post(Done, 1);
    post(Srq);
    post(Done, 2);
    EXPECT_EQ(wait(Srq), VI_SUCCESS); // the only one of its type
    EXPECT_EQ(wait(VI_ALL_ENABLED_EVENTS), VI_SUCCESS_QUEUE_NEMPTY);
    EXPECT_EQ(m_event.job, 1u);
    EXPECT_EQ(wait(VI_ALL_ENABLED_EVENTS), VI_SUCCESS);
    EXPECT_EQ(m_event.job, 2u);
    EXPECT_EQ(wait(VI_ALL_ENABLED_EVENTS), VI_ERROR_TMO);
}

TEST_F(Events, FullQueueDropsTheNewEventAndSaysSoOnce)
{
    ASSERT_TRUE(m_hub->setQueueLength(2));
    ASSERT_EQ(m_hub->enable(Done, VI_QUEUE, 0), VI_SUCCESS);
    EXPECT_FALSE(m_hub->setQueueLength(5));
    for (ViJobId job = 1; job <= 4; ++job)
        post(Done, job);
    EXPECT_EQ(wait(Done), VI_WARN_QUEUE_OVERFLOW);
    EXPECT_EQ(m_event.job, 1u);
    EXPECT_EQ(wait(Done), VI_SUCCESS);
    EXPECT_EQ(m_event.job, 2u);
    EXPECT_EQ(wait(Done), VI_ERROR_TMO);
}

TEST_F(Events, DiscardEmptiesTheQueueThatWasNamed)
{
    ASSERT_EQ(m_hub->install(Srq, handler<'a'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Srq, VI_QUEUE | VI_SUSPEND_HNDLR, 0), VI_SUCCESS);
    post(Srq);
    EXPECT_EQ(m_hub->discard(Srq, VI_SUSPEND_HNDLR), VI_SUCCESS);
    EXPECT_EQ(m_hub->discard(Srq, VI_SUSPEND_HNDLR), VI_SUCCESS_QUEUE_EMPTY);
    EXPECT_EQ(wait(Srq), VI_SUCCESS);
    post(Srq);
    EXPECT_EQ(m_hub->discard(VI_ALL_ENABLED_EVENTS, VI_ALL_MECH), VI_SUCCESS);
    EXPECT_EQ(wait(Srq), VI_ERROR_TMO);
    EXPECT_EQ(m_hub->discard(Srq, VI_HNDLR), VI_ERROR_INV_MECH);
}

TEST_F(Events, HandlersRunLastInFirstOut)
{
    ASSERT_EQ(m_hub->install(Failed, handler<'a'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->install(Failed, handler<'b'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->install(Failed, handler<'c'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->install(Failed, handler<'d'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Failed, VI_HNDLR, 0), VI_SUCCESS);
    m_hub->raiseException({.type = Failed});
    EXPECT_EQ(m_diary.order(), "dcba");
    m_diary.answer = VI_SUCCESS_NCHAIN;
    m_hub->raiseException({.type = Failed});
    EXPECT_EQ(m_diary.order(), "dcbad");
}

TEST_F(Events, HandlerIsKnownByFunctionAndUserHandle)
{
    EXPECT_EQ(m_hub->uninstall(Srq, handler<'a'>, &m_diary), VI_ERROR_HNDLR_NINSTALLED);
    ASSERT_EQ(m_hub->install(Srq, handler<'a'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->install(Srq, handler<'b'>, &m_diary), VI_SUCCESS);
    EXPECT_EQ(m_hub->install(Srq, nullptr, &m_diary), VI_ERROR_INV_HNDLR_REF);
    EXPECT_EQ(m_hub->install(VI_EVENT_TRIG, handler<'a'>, &m_diary), VI_ERROR_INV_EVENT);
    EXPECT_EQ(m_hub->uninstall(Srq, handler<'c'>, &m_diary), VI_ERROR_INV_HNDLR_REF);
    EXPECT_EQ(m_hub->uninstall(Srq, handler<'a'>, nullptr), VI_ERROR_INV_HNDLR_REF);
    EXPECT_EQ(m_hub->uninstall(Srq, handler<'a'>, &m_diary), VI_SUCCESS);
    EXPECT_EQ(m_hub->uninstall(Srq, VI_ANY_HNDLR, &m_diary), VI_SUCCESS);
    EXPECT_EQ(m_hub->uninstall(Srq, VI_ANY_HNDLR, &m_diary), VI_ERROR_HNDLR_NINSTALLED);
}

TEST_F(Events, UninstallingTheLastHandlerDisablesTheMechanism)
{
    ASSERT_EQ(m_hub->install(Failed, handler<'a'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Failed, VI_HNDLR, 0), VI_SUCCESS);
    ASSERT_EQ(m_hub->uninstall(Failed, handler<'a'>, &m_diary), VI_SUCCESS);
    EXPECT_EQ(m_hub->disable(Failed, VI_HNDLR), VI_SUCCESS_EVENT_DIS);
}

TEST_F(Events, SuspendedEventsReachTheHandlersBeforeEnablingReturns)
{
    ASSERT_EQ(m_hub->install(Srq, handler<'a'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Srq, VI_SUSPEND_HNDLR, 0), VI_SUCCESS);
    post(Srq);
    post(Srq);
    EXPECT_EQ(m_diary.order(), "");
    EXPECT_EQ(m_hub->enable(Srq, VI_HNDLR, 0), VI_SUCCESS);
    EXPECT_EQ(m_diary.order(), "aa");
}

TEST_F(Events, AllEnabledEventsSwitchTheirCallbackModeTogether)
{
    ASSERT_EQ(m_hub->install(Srq, handler<'s'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->install(Done, handler<'d'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Srq, VI_SUSPEND_HNDLR, 0), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Done, VI_SUSPEND_HNDLR, 0), VI_SUCCESS);
    post(Srq);
    post(Done);
    EXPECT_EQ(m_hub->enable(VI_ALL_ENABLED_EVENTS, VI_HNDLR, 0), VI_SUCCESS);
    std::string order = m_diary.order();
    std::sort(order.begin(), order.end());
    EXPECT_EQ(order, "ds");
}

TEST_F(Events, ClosingEndsAWaitWithoutEnd)
{
    ASSERT_EQ(m_hub->enable(Srq, VI_QUEUE, 0), VI_SUCCESS);
    std::thread waiting([&] {
        Event event;
        EXPECT_EQ(m_hub->wait(Srq, VI_TMO_INFINITE, event), VI_ERROR_INV_OBJECT);
    });
    m_hub->close();
    waiting.join();
}

TEST_F(Events, DisablingEndsAWaitThatNothingCanEndAnyMore)
{
    ASSERT_EQ(m_hub->enable(Srq, VI_QUEUE, 0), VI_SUCCESS);
    std::thread waiting([&] {
        Event event;
        EXPECT_EQ(m_hub->wait(Srq, VI_TMO_INFINITE, event), VI_ERROR_NENABLED);
    });
    m_hub->disable(Srq, VI_QUEUE);
    waiting.join();
}

/// A handler that does what the test says. Counts its calls and can be waited for from other threads.
struct Actor {
    std::function<void(ViEvent)> act = [](ViEvent) {};
    std::mutex mutex;
    std::condition_variable changed;
    int calls = 0;

    static ViStatus call(ViSession, ViEventType, ViEvent context, ViAddr user)
    {
        auto &self = *static_cast<Actor *>(user);
        self.act(context);
        const std::lock_guard lock(self.mutex);
        ++self.calls;
        self.changed.notify_all();
        return VI_SUCCESS;
    }
    bool awaitCalls(int count)
    {
        std::unique_lock lock(mutex);
        return changed.wait_for(lock, std::chrono::seconds(60), [&] { return calls >= count; });
    }
};

TEST_F(Events, AHandlerThatAnotherOneTakesOutIsNotCalled)
{
    Actor remover;
    remover.act = [&](ViEvent) { EXPECT_EQ(m_hub->uninstall(Failed, handler<'a'>, &m_diary), VI_SUCCESS); };
    ASSERT_EQ(m_hub->install(Failed, handler<'a'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->install(Failed, Actor::call, &remover), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Failed, VI_HNDLR, 0), VI_SUCCESS);
    m_hub->raiseException({.type = Failed});
    EXPECT_EQ(remover.calls, 1);
    EXPECT_EQ(m_diary.order(), "");
}

TEST_F(Events, AHandlerMayTakeItselfOut)
{
    Actor once;
    once.act = [&](ViEvent) { EXPECT_EQ(m_hub->uninstall(Srq, Actor::call, &once), VI_SUCCESS); };
    ASSERT_EQ(m_hub->install(Srq, Actor::call, &once), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Srq, VI_HNDLR, 0), VI_SUCCESS);
    post(Srq);
    ASSERT_TRUE(once.awaitCalls(1));
    EXPECT_EQ(m_hub->disable(Srq, VI_HNDLR), VI_SUCCESS_EVENT_DIS);
}

// Programs free what a handler uses as soon as it is taken out.
TEST_F(Events, TakingAHandlerOutWaitsForTheCallThatIsGoingOn)
{
    std::promise<void> entered;
    std::atomic<bool> returned{false};
    Actor slow;
    slow.act = [&](ViEvent) {
        entered.set_value();
        while (m_hub->enable(Srq, VI_HNDLR, 0) != VI_ERROR_HNDLR_NINSTALLED) // until it has been taken out
            std::this_thread::yield();
        for (int i = 0; i < 20'000; ++i)
            std::this_thread::yield();
        returned = true;
    };
    ASSERT_EQ(m_hub->install(Srq, Actor::call, &slow), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Srq, VI_HNDLR, 0), VI_SUCCESS);
    post(Srq);
    entered.get_future().wait();
    EXPECT_EQ(m_hub->uninstall(Srq, Actor::call, &slow), VI_SUCCESS);
    EXPECT_TRUE(returned);
    ASSERT_TRUE(slow.awaitCalls(1));
}

TEST_F(Events, NoOtherHandlerIsCalledOnceOneHasClosedTheSession)
{
    Actor closer;
    closer.act = [&](ViEvent) { m_hub->close(); };
    ASSERT_EQ(m_hub->install(Failed, handler<'a'>, &m_diary), VI_SUCCESS);
    ASSERT_EQ(m_hub->install(Failed, Actor::call, &closer), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Failed, VI_HNDLR, 0), VI_SUCCESS);
    m_hub->raiseException({.type = Failed});
    EXPECT_EQ(closer.calls, 1);
    EXPECT_EQ(m_diary.order(), "");
}

TEST_F(Events, WhatFailsInsideAnExceptionHandlerRaisesNoOtherException)
{
    Actor failing;
    failing.act = [&](ViEvent) { m_hub->raiseException({.type = Failed}); };
    ASSERT_EQ(m_hub->install(Failed, Actor::call, &failing), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Failed, VI_HNDLR, 0), VI_SUCCESS);
    m_hub->raiseException({.type = Failed});
    EXPECT_EQ(failing.calls, 1);
}

TEST_F(Events, EventsThatWaitedReachTheHandlersBeforeNewerOnes)
{
    std::vector<ViEvent> order; // contexts are numbered as they are made
    Actor actor;
    actor.act = [&](ViEvent context) {
        if (order.empty())
            post(Srq); // while the older ones are being handed over
        order.push_back(context);
    };
    ASSERT_EQ(m_hub->install(Srq, Actor::call, &actor), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Srq, VI_SUSPEND_HNDLR, 0), VI_SUCCESS);
    for (int i = 0; i < 3; ++i)
        post(Srq);
    ASSERT_EQ(m_hub->enable(Srq, VI_HNDLR, 0), VI_SUCCESS);
    {
        const std::lock_guard lock(actor.mutex);
        EXPECT_GE(actor.calls, 3);
    }
    ASSERT_TRUE(actor.awaitCalls(4));
    EXPECT_EQ(order, (std::vector<ViEvent>{1, 2, 3, 4}));
}

// A handler that is busy has received an event; what comes behind it has not, and waits.
TEST_F(Events, EventsThatReachedNoHandlerWhenItWasDisabledWaitForTheNextEnabling)
{
    std::promise<void> entered;
    std::promise<void> mayReturn;
    Actor actor;
    actor.act = [&, first = true](ViEvent) mutable {
        if (!std::exchange(first, false))
            return;
        entered.set_value();
        mayReturn.get_future().wait();
    };
    ASSERT_EQ(m_hub->install(Srq, Actor::call, &actor), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Srq, VI_HNDLR, 0), VI_SUCCESS);
    post(Srq);
    entered.get_future().wait();
    post(Srq);
    post(Srq);
    EXPECT_EQ(m_hub->disable(Srq, VI_HNDLR), VI_SUCCESS);
    mayReturn.set_value();
    ASSERT_TRUE(actor.awaitCalls(1));
    EXPECT_EQ(m_hub->enable(Srq, VI_SUSPEND_HNDLR, 0), VI_SUCCESS);
    EXPECT_EQ(m_hub->enable(Srq, VI_HNDLR, 0), VI_SUCCESS);
    EXPECT_EQ(actor.calls, 3);
}

TEST_F(Events, HandlersGetMoreEventsThanTheQueueHolds)
{
    std::promise<void> entered;
    std::promise<void> mayReturn;
    Actor actor;
    actor.act = [&, first = true](ViEvent) mutable {
        if (!std::exchange(first, false))
            return;
        entered.set_value();
        mayReturn.get_future().wait();
    };
    ASSERT_TRUE(m_hub->setQueueLength(2));
    ASSERT_EQ(m_hub->install(Done, Actor::call, &actor), VI_SUCCESS);
    ASSERT_EQ(m_hub->enable(Done, VI_HNDLR, 0), VI_SUCCESS);
    post(Done);
    entered.get_future().wait();
    for (ViJobId job = 1; job < 1000; ++job)
        post(Done, job);
    mayReturn.set_value();
    EXPECT_TRUE(actor.awaitCalls(1000));
}

TEST_F(Events, HandlersAreBounded)
{
    for (int i = 0; i < 1000; ++i)
        ASSERT_EQ(m_hub->install(Srq, handler<'a'>, &m_diary), VI_SUCCESS) << i;
    EXPECT_EQ(m_hub->install(Srq, handler<'a'>, &m_diary), VI_ERROR_HNDLR_NINSTALLED);
    EXPECT_EQ(m_hub->install(Done, handler<'a'>, &m_diary), VI_SUCCESS);
}

TEST_F(Events, ExceptionsThatAreNotEnabledDisturbNobody)
{
    ASSERT_EQ(m_hub->install(Failed, handler<'a'>, &m_diary), VI_SUCCESS);
    m_hub->raiseException({.type = Failed});
    EXPECT_EQ(m_diary.order(), "");
}

} // namespace
