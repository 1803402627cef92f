#pragma once

#include "kyvisa/os/Deadline.h"

#include <condition_variable>
#include <mutex>

namespace kyvisa
{

/**
 * A session's turn: one thread at a time talks on its connection, the others wait with a deadline. Unlike a mutex the
 * wait ends when the session is closed.
 */
class IoGate
{
public:
    enum class Entered { Yes, TimedOut, Closed };

    Entered enter(os::Deadline deadline);
    void leave();

    /// No one enters any more; those who wait leave with Closed.
    void close();
    /// After close(): waits until the last one has left.
    void awaitEmpty();

private:
    std::mutex m_mutex;
    std::condition_variable m_changed;
    bool m_busy = false;
    bool m_closed = false;
    int m_waiting = 0;
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
