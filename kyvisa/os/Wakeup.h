#pragma once

#include <atomic>

namespace kyvisa::os
{

/**
 * Ends waits from another thread: every wait on descriptors also watches this one.
 *
 * terminate() ends what is being done now; rearm() forgets it when the next call begins. close() is for good.
 */
class Wakeup
{
public:
    Wakeup();
    ~Wakeup();
    Wakeup(const Wakeup &) = delete;
    Wakeup &operator=(const Wakeup &) = delete;

    /// False when the system had no descriptor left.
    bool valid() const { return m_descriptor >= 0; }
    int descriptor() const { return m_descriptor; }

    void terminate();
    void close();
    /// In a forked child: frees the descriptor. Nothing is woken by this object any more.
    void abandon();
    bool closed() const { return m_closed.load(std::memory_order_acquire); }
    bool raised() const { return closed() || m_terminated.load(std::memory_order_acquire); }

    /// Only by the thread that owns the session's turn, before it begins to wait.
    void rearm();
    /// Empties the descriptor unless the wake-up is raised: a signal may come in after rearm() has forgotten its reason.
    void forgetStaleSignal() const;

private:
    void signal() const;

    int m_descriptor;
    std::atomic<bool> m_terminated{false};
    std::atomic<bool> m_closed{false};
};

} // namespace kyvisa::os
