#include "simulator/traffic/LogPrinter.h"

#include "simulator/traffic/LogLine.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/epoll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <utility>

namespace simulator
{
namespace
{

constexpr std::size_t BytesPerTurn = 64 * 1024;

/// A second way to the same pipe or terminal, whose not blocking is seen by nobody else. None for what cannot keep a writer waiting.
FileDescriptor reopened(int descriptor, mode_t kind)
{
    if (!S_ISFIFO(kind) && !(S_ISCHR(kind) && ::isatty(descriptor) == 1))
        return {};
    const std::string path = "/proc/self/fd/" + std::to_string(descriptor);
    return FileDescriptor(::open(path.c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC | O_NOCTTY));
}

} // namespace

LogPrinter::LogPrinter(EventLoop &loop, TrafficLog &log, int descriptor)
    : m_loop(loop), m_log(log), m_descriptor(descriptor)
{
    struct stat status {
    };
    m_broken = ::fstat(descriptor, &status) != 0;
    m_isSocket = S_ISSOCK(status.st_mode);
    m_own = reopened(descriptor, status.st_mode);
    m_isCareful = !m_own && (S_ISFIFO(status.st_mode) || S_ISCHR(status.st_mode));
    if (m_own)
        m_descriptor = m_own.get();
    m_log.add(*this);
}

LogPrinter::~LogPrinter()
{
    m_log.remove(*this);
    for (std::size_t before = m_text.size() + 1; !m_text.empty() && m_text.size() < before;) {
        before = m_text.size();
        flush();
    }
    waitForRoom(false);
    m_loop.cancel(m_timer);
}

void LogPrinter::seen(const TrafficLog::Entry &entry)
{
    if (m_broken)
        return;
    std::string line = timeOfDay(entry.time);
    line.append(" ").append(entry.protocol).append(" ").append(entry.client);
    line.append(" ").append(arrowOf(entry.kind)).append(" ").append(entry.text).append("\n");
    append(line);
}

void LogPrinter::append(const std::string &line)
{
    const std::string gap = m_leftOut == 0 ? std::string() : "(" + std::to_string(m_leftOut) + " lines left out)\n";
    if (m_text.size() - m_printed + gap.size() + line.size() > Capacity) {
        ++m_leftOut;
        return;
    }
    m_text.append(gap).append(line);
    m_leftOut = 0;
    if (m_timer == Timers::None && m_watch == 0)
        m_timer = m_loop.after({}, [this] {
            m_timer = Timers::None;
            flush();
        });
}

void LogPrinter::flush()
{
    std::size_t turn = 0;
    while (m_printed < m_text.size() && turn < BytesPerTurn && !m_broken) {
        const ssize_t count =
            write(m_text.data() + m_printed, std::min(m_text.size() - m_printed, BytesPerTurn - turn));
        if (count < 0 && errno == EINTR)
            continue;
        if (count < 0 && (errno == EAGAIN || errno == EWOULDBLOCK))
            break;
        m_broken = count < 0;
        m_printed += static_cast<std::size_t>(std::max<ssize_t>(count, 0));
        turn += static_cast<std::size_t>(std::max<ssize_t>(count, 0));
    }
    if (m_broken)
        m_printed = m_text.size();
    m_text.erase(0, std::exchange(m_printed, 0));
    if (m_text.empty() && m_leftOut > 0 && !m_broken)
        append({});
    waitForRoom(!m_text.empty());
}

ssize_t LogPrinter::write(const char *text, std::size_t size) const
{
    if (m_isCareful) {
        // A pipe that is writable takes this much without making the writer wait.
        pollfd watched{m_descriptor, POLLOUT, 0};
        if (::poll(&watched, 1, 0) == 0) {
            errno = EAGAIN;
            return -1;
        }
        size = std::min<std::size_t>(size, PIPE_BUF);
    }
    if (m_isSocket)
        return ::send(m_descriptor, text, size, MSG_DONTWAIT | MSG_NOSIGNAL);
    return ::write(m_descriptor, text, size);
}

void LogPrinter::waitForRoom(bool wait)
{
    if (wait == (m_watch != 0))
        return;
    if (!wait)
        return m_loop.remove(std::exchange(m_watch, 0));
    try {
        m_watch = m_loop.watch(m_descriptor, EPOLLOUT, [this](std::uint32_t) { flush(); });
    } catch (const std::system_error &) {
        // A file is always ready and cannot be watched: the rest goes out in the next turn.
        if (m_timer == Timers::None)
            m_timer = m_loop.after({}, [this] {
                m_timer = Timers::None;
                flush();
            });
    }
}

} // namespace simulator
