#include "kyvisa/core/IoGate.h"

#include <algorithm>

namespace kyvisa
{

IoGate::Entered IoGate::enter(os::Deadline deadline, bool *waited)
{
    std::unique_lock lock(m_mutex);
    const bool waits = !m_closed && (m_busy || !m_line.empty());
    if (waited)
        *waited = waits;
    if (waits)
        return waitInLine(lock, join(), deadline, nullptr);
    if (m_closed)
        return Entered::Closed;
    m_busy = true;
    return Entered::Yes;
}

IoGate::Entered IoGate::enterAt(Place place, os::Deadline deadline, const std::atomic<bool> &cancelled)
{
    std::unique_lock lock(m_mutex);
    return waitInLine(lock, place, deadline, &cancelled);
}

IoGate::Entered IoGate::waitInLine(std::unique_lock<std::mutex> &lock, Place place, os::Deadline deadline,
                                   const std::atomic<bool> *cancelled)
{
    const auto givenUp = [&] { return m_closed || (cancelled && cancelled->load()); };
    const bool ended =
        os::waitUntil(m_changed, lock, deadline, [&] { return givenUp() || (!m_busy && m_line.front() == place); });
    leaveLine(place);
    if (m_closed)
        return Entered::Closed;
    if (givenUp())
        return Entered::Cancelled;
    if (!ended)
        return Entered::TimedOut;
    m_busy = true;
    return Entered::Yes;
}

IoGate::Place IoGate::join()
{
    m_line.push_back(++m_lastPlace);
    return m_lastPlace;
}

/// Whoever stands behind may be the first one now.
void IoGate::leaveLine(Place place)
{
    const auto found = std::find(m_line.begin(), m_line.end(), place);
    if (found == m_line.end())
        return;
    m_line.erase(found);
    if (!m_line.empty())
        m_changed.notify_all();
}

IoGate::Place IoGate::reserve()
{
    const std::lock_guard lock(m_mutex);
    return join();
}

void IoGate::giveUp(Place place)
{
    const std::lock_guard lock(m_mutex);
    leaveLine(place);
}

void IoGate::wake()
{
    const std::lock_guard lock(m_mutex);
    m_changed.notify_all();
}

void IoGate::leave()
{
    const std::lock_guard lock(m_mutex);
    m_busy = false;
    if (m_awaited || !m_line.empty())
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
    m_awaited = true;
    m_changed.wait(lock, [this] { return !m_busy; });
}

} // namespace kyvisa
