#pragma once

#include "simulator/traffic/TrafficLog.h"

#include <cstddef>
#include <deque>
#include <string>

namespace simulator
{

/// The last entries of the traffic, for a page that shows them.
class RecentTraffic final : public TrafficLog::Watcher
{
public:
    static constexpr std::size_t Capacity = 30;

    struct Line {
        std::string time;
        std::string protocol;
        std::string client;
        std::string arrow;
        std::string text;
    };

    explicit RecentTraffic(TrafficLog &log);
    ~RecentTraffic();
    RecentTraffic(const RecentTraffic &) = delete;
    RecentTraffic &operator=(const RecentTraffic &) = delete;

    void seen(const TrafficLog::Entry &entry) override;
    /// Oldest first.
    const std::deque<Line> &lines() const { return m_lines; }

private:
    TrafficLog &m_log;
    std::deque<Line> m_lines;
};

} // namespace simulator
