#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <mutex>

namespace kyvisa::os
{

/**
 * The point in time at which a call must have ended, on the monotonic clock.
 *
 * A call makes one deadline when it begins and hands it to everything that may wait on its behalf: locks, name
 * resolution, each piece of a transfer. So a call that moves in many small steps still ends when its user asked.
 */
class Deadline
{
public:
    using Clock = std::chrono::steady_clock;

    static Deadline after(std::chrono::milliseconds span);
    /// From a VISA time-out: milliseconds, 0 = now, 0xFFFFFFFF = never.
    static Deadline afterVisaTimeout(std::uint32_t milliseconds);
    static Deadline never() { return Deadline(Clock::time_point::max()); }
    static Deadline now();

    bool isNever() const { return m_end == Clock::time_point::max(); }
    bool expired() const;
    /// Zero once expired. Meaningless for never().
    std::chrono::nanoseconds remaining() const;
    /// What is left as a VISA time-out, rounded up to milliseconds.
    std::uint32_t visaTimeoutLeft() const;
    Clock::time_point end() const { return m_end; }
    Deadline later(std::chrono::milliseconds span) const { return isNever() ? *this : Deadline(m_end + span); }
    Deadline orEarlier(Deadline other) const { return m_end <= other.m_end ? *this : other; }

private:
    explicit Deadline(Clock::time_point end) : m_end(end) {}

    Clock::time_point m_end;
};

/// Waits until @p ready answers true; false when the deadline came first.
template <typename Predicate>
bool waitUntil(std::condition_variable &condition, std::unique_lock<std::mutex> &lock, Deadline deadline,
               Predicate ready)
{
    if (deadline.isNever()) {
        condition.wait(lock, ready);
        return true;
    }
    return condition.wait_until(lock, deadline.end(), ready);
}

} // namespace kyvisa::os
