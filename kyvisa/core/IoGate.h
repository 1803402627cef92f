#pragma once

#include "kyvisa/os/Deadline.h"

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <mutex>

namespace kyvisa
{

/**
 * A session's turn: one thread at a time talks on its connection, the others wait with a deadline, and who came first goes
 * first. Unlike a mutex the wait ends when the session is closed.
 *
 * A place in the line can be taken before there is a thread that waits in it: an asynchronous transfer stands where its call
 * came, between the calls before and behind it.
 */
class IoGate
{
public:
    enum class Entered { Yes, TimedOut, Closed, Cancelled };
    using Place = std::uint64_t;

    /// @param waited set to true when somebody else had the turn at first.
    Entered enter(os::Deadline deadline, bool *waited = nullptr);
    void leave();

    /// Takes the last place in the line, for one enterAt() or giveUp().
    Place reserve();
    /// Waits in a place that was reserved. Ends with Cancelled once @p cancelled is set and wake() called.
    Entered enterAt(Place place, os::Deadline deadline, const std::atomic<bool> &cancelled);
    void giveUp(Place place);
    void wake();

    /// No one enters any more; those who wait leave with Closed.
    void close();
    /// After close(): waits until the last one has left.
    void awaitEmpty();

private:
    Entered waitInLine(std::unique_lock<std::mutex> &lock, Place place, os::Deadline deadline,
                       const std::atomic<bool> *cancelled);
    Place join();
    void leaveLine(Place place);

    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::deque<Place> m_line; ///< who waits, in order
    Place m_lastPlace = 0;
    bool m_busy = false;
    bool m_closed = false;
    bool m_awaited = false;
};

/// Leaves a gate that was entered when the operation is over, also by an exception.
class GateTurn
{
public:
    explicit GateTurn(IoGate &gate) : m_gate(gate) {}
    ~GateTurn() { m_gate.leave(); }
    GateTurn(const GateTurn &) = delete;
    GateTurn &operator=(const GateTurn &) = delete;

private:
    IoGate &m_gate;
};

} // namespace kyvisa
