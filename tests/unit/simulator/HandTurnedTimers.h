#pragma once

#include "simulator/instrument/Timers.h"

#include <algorithm>
#include <map>
#include <utility>

/// A clock that stands still until the test turns it.
class HandTurnedTimers final : public simulator::Timers
{
public:
    Id after(std::chrono::nanoseconds delay, std::function<void()> action) override
    {
        const Id id = ++m_lastId;
        m_timers.emplace(std::pair{m_now + delay, id}, std::move(action));
        return id;
    }

    void cancel(Id id) override
    {
        std::erase_if(m_timers, [=](const auto &timer) { return timer.first.second == id; });
    }

    /// Runs what is due by then, in order.
    void turn(std::chrono::nanoseconds by = {})
    {
        const std::chrono::nanoseconds until = m_now + by;
        while (!m_timers.empty() && m_timers.begin()->first.first <= until) {
            const auto timer = m_timers.begin();
            m_now = timer->first.first;
            const std::function<void()> action = std::move(timer->second);
            m_timers.erase(timer);
            action();
        }
        m_now = until;
    }

    /// Runs the one that is due first, whenever that is. False when there is none.
    bool turnToNext()
    {
        if (m_timers.empty())
            return false;
        const auto timer = m_timers.begin();
        m_now = std::max(m_now, timer->first.first);
        const std::function<void()> action = std::move(timer->second);
        m_timers.erase(timer);
        action();
        return true;
    }

    std::size_t waiting() const { return m_timers.size(); }

private:
    std::chrono::nanoseconds m_now{0};
    Id m_lastId = None;
    std::map<std::pair<std::chrono::nanoseconds, Id>, std::function<void()>> m_timers;
};
