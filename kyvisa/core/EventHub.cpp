#include "kyvisa/core/EventHub.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/os/Deadline.h"
#include "kyvisa/os/Thread.h"

#include <algorithm>
#include <system_error>

namespace kyvisa
{
namespace
{

constexpr ViUInt16 CallbackModes = VI_HNDLR | VI_SUSPEND_HNDLR;
/// Of events on their way to a handler.
constexpr std::size_t MostForHandlers = 4096;

bool validToEnable(ViUInt16 mechanism)
{
    const bool known = mechanism != 0 && (mechanism & ~(VI_QUEUE | CallbackModes)) == 0;
    return known && (mechanism & CallbackModes) != CallbackModes;
}

bool validToDisable(ViUInt16 mechanism)
{
    return mechanism == VI_ALL_MECH || (mechanism != 0 && (mechanism & ~(VI_QUEUE | CallbackModes)) == 0);
}

bool validToDiscard(ViUInt16 mechanism)
{
    return mechanism == VI_ALL_MECH || (mechanism != 0 && (mechanism & ~(VI_QUEUE | VI_SUSPEND_HNDLR)) == 0);
}

bool matches(ViEventType wanted, ViEventType type)
{
    return wanted == VI_ALL_ENABLED_EVENTS || wanted == type;
}

} // namespace

EventHub::EventHub(std::span<const ViEventType> types, Contexts contexts) : m_handlers(std::move(contexts))
{
    for (const ViEventType type : types.first(std::min(types.size(), m_states.size())))
        m_states[m_stateCount++].type = type;
}

EventHub::TypeState *EventHub::stateOf(ViEventType type)
{
    for (TypeState &state : states())
        if (state.type == type)
            return &state;
    return nullptr;
}

bool EventHub::possible(ViEventType type) const
{
    return std::any_of(m_states.begin(), m_states.begin() + static_cast<std::ptrdiff_t>(m_stateCount),
                       [type](const TypeState &state) { return state.type == type; });
}

bool EventHub::setQueueLength(ViUInt32 length)
{
    const std::lock_guard lock(m_mutex);
    if (m_everEnabled)
        return false;
    m_queueLength = length;
    return true;
}

ViStatus EventHub::enableOne(TypeState &state, ViUInt16 mechanism, std::vector<Event> &pending)
{
    if (state.type == VI_EVENT_EXCEPTION && mechanism != VI_HNDLR)
        return VI_ERROR_NSUP_MECH;
    if ((mechanism & VI_HNDLR) != 0 && !m_handlers.any(state.type))
        return VI_ERROR_HNDLR_NINSTALLED;
    if ((mechanism & VI_HNDLR) != 0 && state.type != VI_EVENT_EXCEPTION && !startHandlerThread())
        return VI_ERROR_ALLOC;

    const bool already = (state.mechanisms & mechanism) != 0;
    if ((mechanism & CallbackModes) != 0)
        state.mechanisms &= static_cast<ViUInt16>(~CallbackModes);
    state.mechanisms |= mechanism;
    if ((mechanism & VI_SUSPEND_HNDLR) != 0)
        suspend(state.type);
    m_everEnabled = true;
    if ((mechanism & VI_HNDLR) != 0) {
        std::copy_if(m_suspended.begin(), m_suspended.end(), std::back_inserter(pending),
                     [&](const Event &event) { return event.type == state.type; });
        std::erase_if(m_suspended, [&](const Event &event) { return event.type == state.type; });
    }
    return already ? VI_SUCCESS_EVENT_EN : VI_SUCCESS;
}

/// What has not reached a handler yet waits until handlers are enabled again.
void EventHub::suspend(ViEventType type)
{
    const auto ofType = [type](const Event &event) { return event.type == type; };
    for (const Event &event : m_forHandlers)
        if (ofType(event))
            append(m_suspended, event, m_queueLength);
    std::erase_if(m_forHandlers, ofType);
}

ViStatus EventHub::enable(ViEventType type, ViUInt16 mechanism, ViEventFilter filter)
{
    std::unique_lock lock(m_mutex);
    TypeState *only = stateOf(type);
    if (!only && type != VI_ALL_ENABLED_EVENTS)
        return VI_ERROR_INV_EVENT;
    if (!validToEnable(mechanism))
        return VI_ERROR_INV_MECH;
    if (filter != 0)
        return VI_ERROR_INV_CONTEXT;
    std::vector<Event> pending;
    ViStatus status = VI_SUCCESS;
    for (TypeState &state : states()) {
        const bool chosen = only ? &state == only : state.mechanisms != 0 && state.type != VI_EVENT_EXCEPTION;
        if (!chosen)
            continue;
        const ViStatus one = enableOne(state, mechanism, pending);
        if (one < VI_SUCCESS || status == VI_SUCCESS)
            status = one;
        if (one < VI_SUCCESS)
            break;
    }
    if (!pending.empty())
        handOver(lock, pending);
    return status;
}

/// Those that waited while the handlers were suspended reach them before the call returns, and before any newer one.
void EventHub::handOver(std::unique_lock<std::mutex> &lock, const std::vector<Event> &pending)
{
    const bool inHandler = m_handingOver && m_handsOver == std::this_thread::get_id();
    bool mine = false;
    if (!inHandler) {
        ++m_pendingFirst;
        mine = os::waitUntil(m_changed, lock, os::Deadline::after(EventHandlers::Patience),
                             [this] { return !m_handingOver || m_closed; });
        --m_pendingFirst;
        if (m_closed)
            return;
    }
    if (mine) {
        m_handingOver = true;
        m_handsOver = std::this_thread::get_id();
    }
    lock.unlock();
    for (const Event &event : pending)
        m_handlers.call(event);
    lock.lock();
    if (mine)
        m_handingOver = false;
    m_changed.notify_all();
}

ViStatus EventHub::disable(ViEventType type, ViUInt16 mechanism)
{
    const std::lock_guard lock(m_mutex);
    TypeState *only = stateOf(type);
    if (!only && type != VI_ALL_ENABLED_EVENTS)
        return VI_ERROR_INV_EVENT;
    if (!validToDisable(mechanism))
        return VI_ERROR_INV_MECH;
    // Both callback modes are one mechanism: asking for either ends whichever is on.
    ViUInt16 ended = mechanism;
    if ((ended & CallbackModes) != 0)
        ended |= CallbackModes;

    bool someWereOff = false;
    for (TypeState &state : states()) {
        if (only && &state != only)
            continue;
        const bool queueAsked = (ended & VI_QUEUE) != 0;
        const bool callbackAsked = (ended & CallbackModes) != 0;
        const bool queueOff = (state.mechanisms & VI_QUEUE) == 0;
        const bool callbackOff = (state.mechanisms & CallbackModes) == 0;
        if (mechanism == VI_ALL_MECH)
            someWereOff |= only && queueOff && callbackOff;
        else
            someWereOff |= only && ((queueAsked && queueOff) || (callbackAsked && callbackOff));
        state.mechanisms &= static_cast<ViUInt16>(~ended);
        if (callbackAsked)
            suspend(state.type);
    }
    m_changed.notify_all();
    return someWereOff ? VI_SUCCESS_EVENT_DIS : VI_SUCCESS;
}

ViStatus EventHub::discard(ViEventType type, ViUInt16 mechanism)
{
    const std::lock_guard lock(m_mutex);
    if (!stateOf(type) && type != VI_ALL_ENABLED_EVENTS)
        return VI_ERROR_INV_EVENT;
    if (!validToDiscard(mechanism))
        return VI_ERROR_INV_MECH;
    std::size_t dropped = 0;
    const auto drop = [&](Queue &queue) {
        dropped += std::erase_if(queue, [type](const Event &event) { return matches(type, event.type); });
    };
    if ((mechanism & VI_QUEUE) != 0)
        drop(m_queue);
    if ((mechanism & VI_SUSPEND_HNDLR) != 0)
        drop(m_suspended);
    return dropped == 0 ? VI_SUCCESS_QUEUE_EMPTY : VI_SUCCESS;
}

bool EventHub::isQueued(ViEventType type) const
{
    return std::any_of(m_queue.begin(), m_queue.end(),
                       [type](const Event &event) { return matches(type, event.type); });
}

bool EventHub::takeQueued(ViEventType type, Event &event)
{
    const auto oldest = std::find_if(m_queue.begin(), m_queue.end(),
                                     [type](const Event &queued) { return matches(type, queued.type); });
    if (oldest == m_queue.end())
        return false;
    event = *oldest;
    m_queue.erase(oldest);
    return true;
}

bool EventHub::anyEnabled(ViEventType type, ViUInt16 mechanism)
{
    return std::any_of(states().begin(), states().end(), [&](const TypeState &state) {
        return matches(type, state.type) && (state.mechanisms & mechanism) != 0;
    });
}

ViStatus EventHub::wait(ViEventType type, ViUInt32 timeout, Event &event)
{
    const os::Deadline deadline = os::Deadline::afterVisaTimeout(timeout);
    std::unique_lock lock(m_mutex);
    if (!stateOf(type) && type != VI_ALL_ENABLED_EVENTS)
        return VI_ERROR_INV_EVENT;
    const unsigned before = m_terminations;
    const bool ended = os::waitUntil(m_changed, lock, deadline, [&] {
        return m_closed || isQueued(type) || !anyEnabled(type, VI_QUEUE) || m_terminations != before;
    });
    if (m_closed)
        return VI_ERROR_INV_OBJECT;
    if (m_terminations != before && !isQueued(type))
        return VI_ERROR_ABORT;
    if (!ended)
        return VI_ERROR_TMO;
    if (!takeQueued(type, event))
        return VI_ERROR_NENABLED;
    TypeState &state = *stateOf(event.type);
    if (state.overflowed) {
        state.overflowed = false;
        return VI_WARN_QUEUE_OVERFLOW;
    }
    return isQueued(type) ? VI_SUCCESS_QUEUE_NEMPTY : VI_SUCCESS;
}

ViStatus EventHub::install(ViEventType type, ViHndlr handler, ViAddr userHandle)
{
    return possible(type) ? m_handlers.install(type, handler, userHandle) : VI_ERROR_INV_EVENT;
}

ViStatus EventHub::uninstall(ViEventType type, ViHndlr handler, ViAddr userHandle)
{
    {
        const std::lock_guard lock(m_mutex);
        TypeState *state = stateOf(type);
        if (!state)
            return VI_ERROR_INV_EVENT;
        if (const ViStatus status = m_handlers.uninstall(type, handler, userHandle); status != VI_SUCCESS)
            return status;
        if (!m_handlers.any(type)) {
            state->mechanisms &= static_cast<ViUInt16>(~CallbackModes);
            suspend(type);
        }
    }
    m_handlers.awaitReturn(type, handler, userHandle);
    return VI_SUCCESS;
}

bool EventHub::append(Queue &queue, const Event &event, std::size_t most)
{
    const auto sameType =
        std::count_if(queue.begin(), queue.end(), [&](const Event &queued) { return queued.type == event.type; });
    if (static_cast<std::size_t>(sameType) >= most)
        return false;
    queue.push_back(event);
    return true;
}

void EventHub::post(const Event &event)
{
    const std::lock_guard lock(m_mutex);
    TypeState *state = stateOf(event.type);
    if (!state || m_closed)
        return;
    if ((state->mechanisms & VI_QUEUE) != 0 && !append(m_queue, event, m_queueLength))
        state->overflowed = true;
    if ((state->mechanisms & VI_HNDLR) != 0)
        append(m_forHandlers, event, MostForHandlers);
    if ((state->mechanisms & VI_SUSPEND_HNDLR) != 0)
        append(m_suspended, event, m_queueLength);
    m_changed.notify_all();
}

void EventHub::raiseException(const Event &event)
{
    {
        const std::lock_guard lock(m_mutex);
        const TypeState *state = stateOf(VI_EVENT_EXCEPTION);
        if (m_closed || !state || (state->mechanisms & VI_HNDLR) == 0)
            return;
    }
    if (!m_handlers.runningHere(VI_EVENT_EXCEPTION))
        m_handlers.call(event);
}

bool EventHub::startHandlerThread()
{
    if (m_handlerThreadStarted)
        return true;
    try {
        os::startThread([self = shared_from_this()] { self->runHandlers(); }).detach();
    } catch (const std::system_error &) {
        return false;
    }
    m_handlerThreadStarted = true;
    return true;
}

void EventHub::runHandlers()
{
    std::unique_lock lock(m_mutex);
    for (;;) {
        m_changed.wait(
            lock, [this] { return m_closed || (!m_forHandlers.empty() && !m_handingOver && m_pendingFirst == 0); });
        if (m_closed)
            return;
        const Event event = m_forHandlers.front();
        m_forHandlers.pop_front();
        m_handingOver = true;
        m_handsOver = std::this_thread::get_id();
        lock.unlock();
        m_handlers.call(event);
        lock.lock();
        m_handingOver = false;
        m_changed.notify_all();
    }
}

void EventHub::terminate()
{
    const std::lock_guard lock(m_mutex);
    ++m_terminations;
    m_changed.notify_all();
}

void EventHub::close()
{
    {
        const std::lock_guard lock(m_mutex);
        m_closed = true;
        m_queue.clear();
        m_suspended.clear();
        m_forHandlers.clear();
        m_changed.notify_all();
    }
    m_handlers.close();
}

} // namespace kyvisa
