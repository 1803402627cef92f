#include "kyvisa/core/IoGate.h"

namespace kyvisa
{

IoGate::Entered IoGate::enter(os::Deadline deadline)
{
    std::unique_lock lock(m_mutex);
    if (m_busy && !m_closed) {
        ++m_waiting;
        const bool free = os::waitUntil(m_changed, lock, deadline, [this] { return !m_busy || m_closed; });
        --m_waiting;
        if (!free)
            return Entered::TimedOut;
    }
    if (m_closed)
        return Entered::Closed;
    m_busy = true;
    return Entered::Yes;
}

void IoGate::leave()
{
    const std::lock_guard lock(m_mutex);
    m_busy = false;
    if (m_waiting > 0)
        m_changed.notify_all();
}

void IoGate::close()
{
    const std::lock_guard lock(m_mutex);
    m_closed = true;
    m_changed.notify_all();
}

void IoGate::awaitEmpty()
{
    std::unique_lock lock(m_mutex);
    ++m_waiting;
    m_changed.wait(lock, [this] { return !m_busy; });
    --m_waiting;
}

} // namespace kyvisa
