#include "pipeline/VisaDispatcher.h"

#include "RecordingListener.h"
#include "pipeline/VisaFunctionCallCreator.h"
#include "pipeline/VisaFunctionCallHandler.h"
#include "support/EventLoop.h"

#include <gmock/gmock.h>

#include <atomic>
#include <memory>
#include <thread>

namespace
{
/// Counts the events that reach the dispatcher.
class EventCounter : public QObject
{
public:
    explicit EventCounter(QObject *dispatcher) { dispatcher->installEventFilter(this); }
    bool eventFilter(QObject *, QEvent *event) override
    {
        count += event->type() == 5000;
        return false;
    }
    int count = 0;
};

class Dispatcher : public testing::Test
{
protected:
    QObject m_window;
    VisaDispatcher *const m_dispatcher = VisaDispatcher::getVisaDispatcherInstance(&m_window);
    std::unique_ptr<VisaFunctionCallHandler> m_handler = std::make_unique<VisaFunctionCallHandler>(m_dispatcher);
    EventCounter m_events{m_dispatcher};

    void finish(VisaFunctionCallTyp type, std::uint64_t number = 0) { finish(*m_handler, type, number); }
    static void finish(VisaFunctionCallHandler &handler, VisaFunctionCallTyp type, std::uint64_t number = 0)
    {
        _visaFunctionCall call = makeCall(type, number);
        handler.VisaFunctionCallFinshed(call);
    }
    static void deliver() { QCoreApplication::sendPostedEvents(nullptr, 5000); }
};

TEST_F(Dispatcher, IsOnePerProcess)
{
    QObject other;
    EXPECT_EQ(m_dispatcher->parent(), &m_window);
    EXPECT_EQ(VisaDispatcher::getVisaDispatcherInstance(&other), m_dispatcher);
    EXPECT_EQ(m_dispatcher->parent(), &m_window);
}

TEST(DispatcherLife, ANewOneFollowsTheOneThatWentWithItsWindow)
{
    for (int window = 0; window < 3; ++window) {
        QObject parent;
        auto *dispatcher = VisaDispatcher::getVisaDispatcherInstance(&parent);
        EXPECT_EQ(dispatcher->parent(), &parent);
        const auto handler = std::make_unique<VisaFunctionCallHandler>(dispatcher);
        RecordingListener listener(handler.get(), VisaFunctionCallTyp::Read);
        _visaFunctionCall call = makeCall(VisaFunctionCallTyp::Read);
        handler->VisaFunctionCallFinshed(call);
        QCoreApplication::sendPostedEvents(nullptr, 5000);
        EXPECT_EQ(listener.finished.size(), 1u);
        handler->VisaFunctionCallFinshed(call); // is on its way when the handler goes
    }
}

TEST_F(Dispatcher, OneEventBringsAnyNumberOfResults)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    for (std::uint64_t i = 0; i < 1000; ++i)
        finish(VisaFunctionCallTyp::Read, i);
    EXPECT_EQ(listener.finished.size(), 0u);
    deliver();
    ASSERT_EQ(listener.finished.size(), 1000u);
    for (std::uint64_t i = 0; i < 1000; ++i)
        ASSERT_EQ(listener.finished[i].parameter[0].uintValue, i);
    EXPECT_EQ(m_events.count, 1);
    finish(VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(m_events.count, 2);
}

TEST_F(Dispatcher, BringsResultsOfAnotherThreadToThisOne)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    bool here = true;
    const auto self = std::this_thread::get_id();
    listener.onFinished = [&](_visaFunctionCall &) { here = here && std::this_thread::get_id() == self; };
    // More than the ring holds: the worker waits for deliveries.
    std::thread worker([&] {
        for (std::uint64_t i = 0; i < 20000; ++i)
            finish(VisaFunctionCallTyp::Read, i);
    });
    EXPECT_TRUE(processEventsUntil([&] { return listener.finished.size() == 20000; }));
    worker.join();
    EXPECT_TRUE(here);
    for (std::uint64_t i = 0; i < 20000; ++i)
        ASSERT_EQ(listener.finished[i].parameter[0].uintValue, i);
}

TEST_F(Dispatcher, NoResultIsLeftBehindWithoutAnEvent)
{
    // Each result is awaited alone: had its wake-up been lost, nothing would follow to repair that.
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    std::atomic<unsigned> seen{0};
    listener.onFinished = [&](_visaFunctionCall &) { ++seen; };
    std::thread worker([&] {
        for (unsigned i = 0; i < 5000; ++i) {
            finish(VisaFunctionCallTyp::Read, i);
            while (seen < i)
                std::this_thread::yield();
        }
    });
    EXPECT_TRUE(processEventsUntil([&] { return seen == 5000; }));
    worker.join();
}

TEST_F(Dispatcher, ADeliveryEndsWithWhatWaitedWhenItBegan)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    listener.onFinished = [&](_visaFunctionCall &call) {
        if (call.parameter[0].uintValue < 100)
            finish(VisaFunctionCallTyp::Read, call.parameter[0].uintValue + 1);
    };
    finish(VisaFunctionCallTyp::Read, 0);
    QEvent *first = new VisaFunctionCallEvent(m_handler.get());
    QCoreApplication::sendEvent(m_dispatcher, first);
    delete first;
    EXPECT_EQ(listener.finished.size(), 1u) << "a chain of results held the window";
    EXPECT_TRUE(processEventsUntil([&] { return listener.finished.size() == 101; }));
}

TEST_F(Dispatcher, AListenerMayDeleteItselfInADelivery)
{
    auto listener = std::make_unique<RecordingListener>(m_handler.get(), VisaFunctionCallTyp::Read);
    RecordingListener label(m_handler.get(), VisaFunctionCallTyp::All);
    int heard = 0;
    listener->onFinished = [&](_visaFunctionCall &) {
        ++heard;
        const auto last = std::move(listener);
    };
    finish(VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(heard, 1);
    EXPECT_EQ(label.finished.size(), 2u);
}

TEST_F(Dispatcher, AListenerMayDeleteAnotherOneInADelivery)
{
    RecordingListener first(m_handler.get(), VisaFunctionCallTyp::Read);
    auto second = std::make_unique<RecordingListener>(m_handler.get(), VisaFunctionCallTyp::Read);
    second->onFinished = [](_visaFunctionCall &) { ADD_FAILURE() << "called after its end"; };
    first.onFinished = [&](_visaFunctionCall &) { second.reset(); };
    finish(VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(first.finished.size(), 2u);
}

TEST_F(Dispatcher, ListenersComeAndGoUnderALoadOfResults)
{
    RecordingListener label(m_handler.get(), VisaFunctionCallTyp::All);
    std::atomic<bool> stop{false};
    std::thread worker([&] {
        while (!stop)
            finish(VisaFunctionCallTyp::FindNext);
    });
    std::size_t heard = 0;
    for (int i = 0; i < 200; ++i) {
        RecordingListener finder(m_handler.get(), VisaFunctionCallTyp::FindNext);
        EXPECT_TRUE(processEventsUntil([&] { return !finder.finished.empty(); }));
        heard += finder.finished.size();
        label.finished.clear();
    }
    stop = true;
    EXPECT_TRUE(processEventsUntil([&] { return true; }));
    m_handler->close();
    worker.join();
    EXPECT_GE(heard, 200u);
}

TEST_F(Dispatcher, ANestedEventLoopGoesOnDelivering)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    std::vector<std::uint64_t> order;
    listener.onFinished = [&](_visaFunctionCall &call) {
        order.push_back(call.parameter[0].uintValue);
        if (order.size() == 1) {
            finish(VisaFunctionCallTyp::Read, 3);
            deliver();
        }
    };
    finish(VisaFunctionCallTyp::Read, 1);
    finish(VisaFunctionCallTyp::Read, 2);
    deliver();
    EXPECT_THAT(order, testing::ElementsAre(1, 2, 3));
}

TEST_F(Dispatcher, AClosedHandlersResultsAreNotDelivered)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    listener.onFinished = [&](_visaFunctionCall &) { m_handler->close(); };
    finish(VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(listener.finished.size(), 1u);
}

TEST_F(Dispatcher, AHandlersEndDropsItsEvent)
{
    finish(VisaFunctionCallTyp::Read);
    EXPECT_EQ(m_events.count, 0);
    m_handler.reset();
    deliver();
    EXPECT_EQ(m_events.count, 0);

    // And the dispatcher can be woken again.
    m_handler = std::make_unique<VisaFunctionCallHandler>(m_dispatcher);
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(listener.finished.size(), 1u);
}

TEST_F(Dispatcher, AHandlersEndKeepsAnotherHandlersEvent)
{
    const auto other = std::make_unique<VisaFunctionCallHandler>(m_dispatcher);
    RecordingListener listener(other.get(), VisaFunctionCallTyp::Read);
    finish(*other, VisaFunctionCallTyp::Read);
    m_handler.reset();
    deliver();
    EXPECT_EQ(listener.finished.size(), 1u);
}

TEST_F(Dispatcher, AHandlerMayEndInTheMiddleOfItsDelivery)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    listener.onFinished = [&](_visaFunctionCall &) { m_handler.reset(); };
    finish(VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(listener.finished.size(), 1u);
    EXPECT_EQ(listener.handler(), nullptr);
}

TEST_F(Dispatcher, AWakeUpForASecondHandlerIsDroppedWhileTheFirstOnesIsOnItsWay)
{
    const auto other = std::make_unique<VisaFunctionCallHandler>(m_dispatcher);
    RecordingListener first(m_handler.get(), VisaFunctionCallTyp::Read);
    RecordingListener second(other.get(), VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    finish(*other, VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(first.finished.size(), 1u);
    EXPECT_EQ(second.finished.size(), 0u);
    finish(*other, VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(second.finished.size(), 2u);
}

TEST_F(Dispatcher, AProducerThatWaitsForRoomAsksUntilADeliveryComes)
{
    const auto other = std::make_unique<VisaFunctionCallHandler>(m_dispatcher);
    RecordingListener first(m_handler.get(), VisaFunctionCallTyp::Read);
    RecordingListener second(other.get(), VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    for (unsigned i = 0; i < 4096; ++i)
        finish(*other, VisaFunctionCallTyp::Read); // all these wishes are dropped
    std::thread worker([&] { finish(*other, VisaFunctionCallTyp::Read); });
    EXPECT_TRUE(processEventsUntil([&] { return second.finished.size() == 4097; }));
    other->close();
    worker.join();
}

TEST_F(Dispatcher, SkipsWhatIsRegisteredButReceivesNothing)
{
    class Creator final : public VisaFunctionCallCreator
    {
    public:
        using VisaFunctionCallCreator::VisaFunctionCallCreator;
    } creator(m_handler.get());
    ASSERT_TRUE(m_handler->addVisaFunctionCallListener(&creator, VisaFunctionCallTyp::Read));
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    deliver();
    EXPECT_EQ(listener.finished.size(), 1u);
}
} // namespace
