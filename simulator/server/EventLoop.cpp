#include "simulator/server/EventLoop.h"

#include <sys/epoll.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <limits>
#include <system_error>

namespace simulator
{

EventLoop::EventLoop(Now now) : m_now(std::move(now)), m_epoll(::epoll_create1(EPOLL_CLOEXEC))
{
    if (!m_epoll)
        throw std::system_error(errno, std::generic_category(), "epoll_create1");
}

void EventLoop::run()
{
    m_running = true;
    std::array<epoll_event, 64> events;
    while (m_running) {
        const int count =
            ::epoll_wait(m_epoll.get(), events.data(), static_cast<int>(events.size()), timeoutForEpoll());
        if (count < 0 && errno != EINTR)
            throw std::system_error(errno, std::generic_category(), "epoll_wait");
        for (int i = 0; i < count && m_running; ++i) {
            const auto found = m_watches.find(events[static_cast<std::size_t>(i)].data.u64);
            if (found == m_watches.end())
                continue;
            const std::shared_ptr<Watch> watch = found->second; // it may be removed inside its own call
            watch->ready(events[static_cast<std::size_t>(i)].events);
        }
        runTimers();
        while (!m_dying.empty()) {
            const auto dying = std::exchange(m_dying, {}); // a destructor may add more
        }
    }
}

EventLoop::WatchId EventLoop::watch(int fd, std::uint32_t events, Ready ready)
{
    const WatchId id = ++m_lastWatch;
    epoll_event event{};
    event.events = events;
    event.data.u64 = id;
    if (::epoll_ctl(m_epoll.get(), EPOLL_CTL_ADD, fd, &event) < 0)
        throw std::system_error(errno, std::generic_category(), "epoll_ctl");
    m_watches.emplace(id, std::make_shared<Watch>(Watch{fd, std::move(ready)}));
    return id;
}

void EventLoop::change(WatchId watch, std::uint32_t events)
{
    epoll_event event{};
    event.events = events;
    event.data.u64 = watch;
    ::epoll_ctl(m_epoll.get(), EPOLL_CTL_MOD, m_watches.at(watch)->fd, &event);
}

void EventLoop::remove(WatchId watch)
{
    const auto found = m_watches.find(watch);
    if (found == m_watches.end())
        return;
    ::epoll_ctl(m_epoll.get(), EPOLL_CTL_DEL, found->second->fd, nullptr);
    m_watches.erase(found);
}

Timers::Id EventLoop::after(std::chrono::nanoseconds delay, std::function<void()> action)
{
    const Id id = ++m_lastTimer;
    const Clock::time_point when = m_now() + delay;
    m_due.emplace(when, id);
    m_timers.emplace(id, std::pair{when, std::move(action)});
    return id;
}

void EventLoop::cancel(Id id)
{
    const auto timer = m_timers.find(id);
    if (timer == m_timers.end())
        return;
    m_due.erase({timer->second.first, id});
    m_timers.erase(timer);
}

int EventLoop::timeoutForEpoll() const
{
    if (m_due.empty())
        return -1;
    // Rounded up: waking a fraction early would spin until the time has come.
    const auto wait = std::chrono::ceil<std::chrono::milliseconds>(m_due.begin()->first - m_now());
    return static_cast<int>(std::clamp<std::int64_t>(wait.count(), 0, std::numeric_limits<int>::max()));
}

void EventLoop::runTimers()
{
    if (m_due.empty())
        return;
    // Only what was asked for before now, so that actions which ask again cannot hold the loop.
    const Clock::time_point now = m_now();
    const Id last = m_lastTimer;
    auto next = m_due.begin();
    while (next != m_due.end() && next->first <= now) {
        if (next->second > last) {
            ++next;
            continue;
        }
        const auto timer = m_timers.find(next->second);
        const std::function<void()> action = std::move(timer->second.second);
        m_timers.erase(timer);
        m_due.erase(next);
        action();
        next = m_due.begin();
    }
}

} // namespace simulator
