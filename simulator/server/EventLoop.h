#pragma once

#include "simulator/instrument/Timers.h"
#include "simulator/server/FileDescriptor.h"

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <unordered_map>
#include <utility>
#include <vector>

namespace simulator
{

/**
 * The one thread of the simulator: waits for descriptors and timers, and calls whoever asked. Idle costs nothing.
 *
 * An object that wants to go away inside one of its own calls hands itself to destroyLater(); nobody is called for a watch that was
 * removed, even when its event was waiting already.
 */
class EventLoop final : public Timers
{
public:
    using WatchId = std::uint64_t;
    using Ready = std::function<void(std::uint32_t events)>; ///< EPOLLIN, EPOLLOUT, ...

    using Clock = std::chrono::steady_clock;
    using Now = std::function<Clock::time_point()>;

    /// @p now: another clock, for tests.
    explicit EventLoop(Now now = Clock::now);

    /// Runs until stop(), which may be called from any of the calls.
    void run();
    void stop() { m_running = false; }

    WatchId watch(int fd, std::uint32_t events, Ready ready);
    void change(WatchId watch, std::uint32_t events);
    void remove(WatchId watch);

    Id after(std::chrono::nanoseconds delay, std::function<void()> action) override;
    void cancel(Id id) override;

    /// Destroys @p object when the calls of this round have returned.
    void destroyLater(std::shared_ptr<void> object) { m_dying.push_back(std::move(object)); }

private:
    struct Watch {
        int fd;
        Ready ready;
    };

    int timeoutForEpoll() const;
    void runTimers();

    const Now m_now;
    FileDescriptor m_epoll;
    bool m_running = false;
    WatchId m_lastWatch = 0;
    std::unordered_map<WatchId, std::shared_ptr<Watch>> m_watches;
    Id m_lastTimer = None;
    std::set<std::pair<Clock::time_point, Id>> m_due;
    std::map<Id, std::pair<Clock::time_point, std::function<void()>>> m_timers;
    std::vector<std::shared_ptr<void>> m_dying;
};

} // namespace simulator
