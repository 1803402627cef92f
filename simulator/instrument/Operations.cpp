#include "simulator/instrument/Operations.h"

#include "simulator/instrument/Timers.h"

#include <utility>

namespace simulator
{

void Operations::end()
{
    if (--m_pending != 0 || m_waiting.empty())
        return;
    m_due.merge(m_waiting);
    m_timers.after({}, [this] { tell(); });
}

Operations::Id Operations::whenIdle(std::function<void()> action)
{
    const Id id = ++m_lastId;
    if (idle()) {
        m_due.emplace(id, std::move(action));
        m_timers.after({}, [this] { tell(); });
    } else {
        m_waiting.emplace(id, std::move(action));
    }
    return id;
}

void Operations::forget(Id id)
{
    m_waiting.erase(id);
    m_due.erase(id);
}

void Operations::tell()
{
    // An action may forget another one, or begin to wait again.
    const Id last = m_lastId;
    while (!m_due.empty() && m_due.begin()->first <= last) {
        const std::function<void()> action = std::move(m_due.begin()->second);
        m_due.erase(m_due.begin());
        action();
    }
}

} // namespace simulator
