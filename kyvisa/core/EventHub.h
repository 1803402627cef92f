#pragma once

#include "kyvisa/core/Event.h"
#include "kyvisa/core/EventHandlers.h"
#include "kyvisa/include/visatype.h"

#include <array>
#include <condition_variable>
#include <deque>
#include <memory>
#include <mutex>
#include <span>
#include <thread>
#include <vector>

namespace kyvisa
{

/**
 * The events of one session: what is enabled, what is queued, and when handlers are called.
 *
 * post() may come from any thread. Handlers of events run one after another on a thread that the hub starts when the
 * first handler is enabled; events that waited while their handlers were suspended are handed over by the call that enables
 * them again, in its place in that order. Handlers of VI_EVENT_EXCEPTION run on the thread that failed. No lock of the
 * library is held while a handler runs: it may do anything, also close the session.
 *
 * Each queue holds VI_ATTR_MAX_QUEUE_LENGTH events of a type. A new event that finds its queue full is dropped, and the
 * next viWaitOnEvent for the type says so. Events on their way to a handler are no queue in that sense: only a handler that
 * lets thousands pile up loses some.
 */
class EventHub : public std::enable_shared_from_this<EventHub>
{
public:
    using Contexts = EventHandlers::Contexts;

    /// @param types the events that are possible on the session, at most three.
    EventHub(std::span<const ViEventType> types, Contexts contexts);

    /// The handle that handlers are told. Before anything is enabled.
    void setSession(ViSession session) { m_handlers.setSession(session); }

    ViStatus enable(ViEventType type, ViUInt16 mechanism, ViEventFilter filter);
    ViStatus disable(ViEventType type, ViUInt16 mechanism);
    ViStatus discard(ViEventType type, ViUInt16 mechanism);
    /// Takes the oldest event of @p type into @p event when the status is not negative.
    ViStatus wait(ViEventType type, ViUInt32 timeout, Event &event);
    ViStatus install(ViEventType type, ViHndlr handler, ViAddr userHandle);
    /// When it returns the handler does not run any more, unless it is the caller, or has not returned for five seconds.
    ViStatus uninstall(ViEventType type, ViHndlr handler, ViAddr userHandle);

    void post(const Event &event);
    /// Calls the exception handlers, here and now, when they are enabled. What fails inside of them raises no other.
    void raiseException(const Event &event);

    bool possible(ViEventType type) const;
    /// False once something was enabled: the length of the queue is fixed from then on.
    bool setQueueLength(ViUInt32 length);

    /// Ends the waits that are going on with VI_ERROR_ABORT.
    void terminate();
    /// Wakes who waits, drops what is queued. A handler that is running is given five seconds to return, unless the
    /// caller is that handler.
    void close();

private:
    struct TypeState {
        ViEventType type = 0;
        ViUInt16 mechanisms = 0;
        bool overflowed = false;
    };
    using Queue = std::deque<Event>;

    TypeState *stateOf(ViEventType type);
    std::span<TypeState> states() { return {m_states.data(), m_stateCount}; }
    static bool append(Queue &queue, const Event &event, std::size_t most);
    ViStatus enableOne(TypeState &state, ViUInt16 mechanism, std::vector<Event> &pending);
    void suspend(ViEventType type);
    void handOver(std::unique_lock<std::mutex> &lock, const std::vector<Event> &pending);
    bool takeQueued(ViEventType type, Event &event);
    bool isQueued(ViEventType type) const;
    bool anyEnabled(ViEventType type, ViUInt16 mechanism);
    bool startHandlerThread();
    void runHandlers();

    EventHandlers m_handlers;

    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::array<TypeState, 3> m_states;
    std::size_t m_stateCount = 0;
    ViUInt32 m_queueLength = 50;
    bool m_everEnabled = false;
    bool m_closed = false;
    unsigned m_terminations = 0;
    Queue m_queue;
    Queue m_suspended;
    Queue m_forHandlers;
    bool m_handlerThreadStarted = false;
    // One thread at a time hands events to handlers: the hub's, or one that enables suspended handlers.
    bool m_handingOver = false;
    std::thread::id m_handsOver;
    int m_pendingFirst = 0; ///< threads with events that are older than those in m_forHandlers
};

} // namespace kyvisa
