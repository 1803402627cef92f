#pragma once

#include <cstdint>
#include <functional>
#include <map>

namespace simulator
{

class Timers;

/**
 * The overlapped operations that are under way, for *OPC, *OPC? and *WAI.
 *
 * Whoever waits is told by a timer, never from inside end(): the end of an operation may come from another client's command, and must not run the
 * waiting client's commands in the middle of it.
 */
class Operations
{
public:
    using Id = std::uint64_t;

    explicit Operations(Timers &timers) : m_timers(timers) {}

    void begin() { ++m_pending; }
    void end();
    bool idle() const { return m_pending == 0; }

    /// Calls @p action once when what is pending now has ended.
    Id whenIdle(std::function<void()> action);
    void forget(Id id);

private:
    void tell();

    Timers &m_timers;
    unsigned m_pending = 0;
    Id m_lastId = 0;
    std::map<Id, std::function<void()>> m_waiting;
    std::map<Id, std::function<void()>> m_due; ///< their wait is over, the timer is on its way
};

} // namespace simulator
