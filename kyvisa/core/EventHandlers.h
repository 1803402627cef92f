#pragma once

#include "kyvisa/core/Event.h"
#include "kyvisa/include/visatype.h"

#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

namespace kyvisa
{

/**
 * The handlers of one session, and the calls of them that are going on.
 *
 * A handler is a function and a user handle. Those of an event are called last in, first out, with no lock held. A handler
 * that was taken out, by another one or by another thread, is not called any more; taking one out and close() wait for the
 * calls that other threads are in, for it is usual to free what a handler uses right afterwards.
 */
class EventHandlers
{
public:
    /// How long a handler that does not return is waited for.
    static constexpr std::chrono::seconds Patience{5};

    /// Makes and closes the context of an event: nothing here knows of handles.
    struct Contexts {
        std::function<ViEvent(const Event &)> make;
        std::function<void(ViEvent)> close;
    };

    explicit EventHandlers(Contexts contexts) : m_contexts(std::move(contexts)) {}

    /// The handle that handlers are told.
    void setSession(ViSession session) { m_session = session; }

    /// @return VI_ERROR_HNDLR_NINSTALLED when there are 1,000 for the type already.
    ViStatus install(ViEventType type, ViHndlr function, ViAddr userHandle);
    /// @param function VI_ANY_HNDLR for all with @p userHandle.
    ViStatus uninstall(ViEventType type, ViHndlr function, ViAddr userHandle);
    bool any(ViEventType type) const;

    /// Calls the handlers of the event's type until one answers VI_SUCCESS_NCHAIN. Lets no exception out.
    void call(const Event &event) noexcept;
    /// The calling thread is inside of a handler of this type.
    bool runningHere(ViEventType type) const;

    /// Waits for the calls of such handlers that other threads are in.
    void awaitReturn(ViEventType type, ViHndlr function, ViAddr userHandle);
    /// Nothing is called any more; waits for the calls that other threads are in, and for the end of their contexts.
    void close();

private:
    struct Handler {
        ViEventType type;
        ViHndlr function;
        ViAddr userHandle;
        unsigned number; ///< in the order of installing
        bool is(ViEventType aType, ViHndlr aFunction, ViAddr aUserHandle) const;
    };
    struct Running {
        Handler handler;
        std::thread::id thread;
    };

    bool enter();
    void leave();
    void callAll(const Event &event, ViEvent context);
    std::optional<Handler> begin(ViEventType type, unsigned below);
    void end(unsigned number);

    const Contexts m_contexts;
    ViSession m_session = 0;

    mutable std::mutex m_mutex;
    std::condition_variable m_changed;
    std::vector<Handler> m_installed;
    std::vector<Running> m_running;
    std::vector<std::thread::id> m_inside; ///< of call(), once for each level
    unsigned m_lastNumber = 0;
    bool m_closed = false;
};

} // namespace kyvisa
