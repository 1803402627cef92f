#include "kyvisa/core/EventHandlers.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/os/Deadline.h"

#include <algorithm>
#include <limits>

namespace kyvisa
{
namespace
{

constexpr std::ptrdiff_t MostOfAType = 1000;

} // namespace

bool EventHandlers::Handler::is(ViEventType aType, ViHndlr aFunction, ViAddr aUserHandle) const
{
    return type == aType && userHandle == aUserHandle && (!aFunction || function == aFunction);
}

ViStatus EventHandlers::install(ViEventType type, ViHndlr function, ViAddr userHandle)
{
    if (!function)
        return VI_ERROR_INV_HNDLR_REF;
    const std::lock_guard lock(m_mutex);
    const auto sameType = std::count_if(m_installed.begin(), m_installed.end(),
                                        [type](const Handler &handler) { return handler.type == type; });
    if (sameType >= MostOfAType)
        return VI_ERROR_HNDLR_NINSTALLED;
    m_installed.push_back({type, function, userHandle, ++m_lastNumber});
    return VI_SUCCESS;
}

ViStatus EventHandlers::uninstall(ViEventType type, ViHndlr function, ViAddr userHandle)
{
    if (!any(type))
        return VI_ERROR_HNDLR_NINSTALLED;
    const std::lock_guard lock(m_mutex);
    const auto removed =
        std::erase_if(m_installed, [&](const Handler &handler) { return handler.is(type, function, userHandle); });
    return removed > 0 ? VI_SUCCESS : VI_ERROR_INV_HNDLR_REF;
}

bool EventHandlers::any(ViEventType type) const
{
    const std::lock_guard lock(m_mutex);
    return std::any_of(m_installed.begin(), m_installed.end(),
                       [type](const Handler &handler) { return handler.type == type; });
}

/// The youngest handler that is older than @p below, as the one that this thread is in from now on.
std::optional<EventHandlers::Handler> EventHandlers::begin(ViEventType type, unsigned below)
{
    const std::lock_guard lock(m_mutex);
    if (m_closed)
        return std::nullopt;
    for (auto handler = m_installed.rbegin(); handler != m_installed.rend(); ++handler)
        if (handler->type == type && handler->number < below) {
            m_running.push_back({*handler, std::this_thread::get_id()});
            return *handler;
        }
    return std::nullopt;
}

void EventHandlers::end(unsigned number)
{
    const std::lock_guard lock(m_mutex);
    const auto own = std::find_if(m_running.rbegin(), m_running.rend(), [number](const Running &running) {
        return running.handler.number == number && running.thread == std::this_thread::get_id();
    });
    m_running.erase(std::next(own).base());
    m_changed.notify_all();
}

bool EventHandlers::enter()
{
    const std::lock_guard lock(m_mutex);
    if (!m_closed)
        m_inside.push_back(std::this_thread::get_id());
    return !m_closed;
}

void EventHandlers::leave()
{
    const std::lock_guard lock(m_mutex);
    m_inside.erase(std::find(m_inside.begin(), m_inside.end(), std::this_thread::get_id()));
    m_changed.notify_all();
}

void EventHandlers::callAll(const Event &event, ViEvent context)
{
    unsigned below = std::numeric_limits<unsigned>::max();
    while (const auto handler = begin(event.type, below)) {
        below = handler->number;
        ViStatus answer = VI_SUCCESS;
        try {
            answer = handler->function(m_session, event.type, context, handler->userHandle);
        } catch (...) {
            // A handler that lets an exception out must not end the program.
        }
        end(handler->number);
        if (answer == VI_SUCCESS_NCHAIN)
            return;
    }
}

void EventHandlers::call(const Event &event) noexcept
{
    bool entered = false;
    ViEvent context = VI_NULL;
    try {
        entered = enter();
        if (entered)
            context = m_contexts.make(event);
        if (context != VI_NULL)
            callAll(event, context);
    } catch (...) {
        // Out of memory: the event is lost, the program goes on.
    }
    if (context != VI_NULL)
        m_contexts.close(context);
    if (entered)
        leave();
}

bool EventHandlers::runningHere(ViEventType type) const
{
    const std::lock_guard lock(m_mutex);
    return std::any_of(m_running.begin(), m_running.end(), [type](const Running &running) {
        return running.handler.type == type && running.thread == std::this_thread::get_id();
    });
}

void EventHandlers::awaitReturn(ViEventType type, ViHndlr function, ViAddr userHandle)
{
    std::unique_lock lock(m_mutex);
    os::waitUntil(m_changed, lock, os::Deadline::after(Patience), [&] {
        return std::none_of(m_running.begin(), m_running.end(), [&](const Running &running) {
            return running.thread != std::this_thread::get_id() && running.handler.is(type, function, userHandle);
        });
    });
}

void EventHandlers::close()
{
    std::unique_lock lock(m_mutex);
    m_closed = true;
    os::waitUntil(m_changed, lock, os::Deadline::after(Patience), [&] {
        return std::all_of(m_inside.begin(), m_inside.end(),
                           [](std::thread::id thread) { return thread == std::this_thread::get_id(); });
    });
}

} // namespace kyvisa
