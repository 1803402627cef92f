#pragma once

#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"
#include "simulator/traffic/TrafficLog.h"

#include <cstddef>
#include <string>

namespace simulator
{

/**
 * Prints the traffic, one line an entry:
 *
 *     13:05:59.042 hislip 127.0.0.1:40312 -> *IDN?\n
 *     13:05:59.042 hislip 127.0.0.1:40312 <- Oltrava,KyVisaSimulator,100001,5.8.6\n
 *     13:05:59.050 hislip 127.0.0.1:40312 -- serial poll 0x00
 *
 * Never waits for whoever reads it: what is not taken stays in a buffer of Capacity bytes, and when that is full, lines are left out and their number is
 * printed as soon as there is room. A reader that has gone ends the printing and nothing else.
 */
class LogPrinter final : public TrafficLog::Watcher
{
public:
    static constexpr std::size_t Capacity = 256 * 1024;

    /// Does not own @p descriptor, and leaves it blocking or not as it is: it may be shared with a shell.
    LogPrinter(EventLoop &loop, TrafficLog &log, int descriptor);
    /// Prints the rest as far as it is taken at once.
    ~LogPrinter();
    LogPrinter(const LogPrinter &) = delete;
    LogPrinter &operator=(const LogPrinter &) = delete;

    void seen(const TrafficLog::Entry &entry) override;

private:
    void append(const std::string &line);
    void flush();
    ssize_t write(const char *text, std::size_t size) const;
    void waitForRoom(bool wait);

    EventLoop &m_loop;
    TrafficLog &m_log;
    FileDescriptor m_own; ///< a description of our own of the same pipe or terminal, which does not block
    bool m_isSocket = false;
    bool m_isCareful = false; ///< it may block
    int m_descriptor;
    Timers::Id m_timer = Timers::None;
    EventLoop::WatchId m_watch = 0;
    bool m_broken = false;
    std::string m_text;
    std::size_t m_printed = 0; ///< of m_text
    std::uint64_t m_leftOut = 0;
};

} // namespace simulator
