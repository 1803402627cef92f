#include "simulator/server/SerialLine.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/epoll.h>
#include <sys/inotify.h>
#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <system_error>
#include <utility>

namespace simulator
{
namespace
{

constexpr std::byte Xon{0x11};
constexpr std::byte Xoff{0x13};
constexpr std::chrono::milliseconds PauseWhileClaimed{200};

[[noreturn]] void fail(const char *what)
{
    throw std::system_error(errno, std::generic_category(), what);
}

/// As a port is before anybody has set it: bytes pass as they are.
void setRaw(int line)
{
    termios settings{};
    if (::tcgetattr(line, &settings) != 0)
        return;
    ::cfmakeraw(&settings);
    settings.c_iflag &= ~static_cast<tcflag_t>(IXON | IXOFF | IXANY);
    settings.c_cflag |= CREAD | CLOCAL;
    ::tcsetattr(line, TCSANOW, &settings);
}

} // namespace

SerialLine::SerialLine(EventLoop &loop, Owner &owner)
    : m_loop(loop), m_owner(owner), m_line(::posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC | O_NONBLOCK)),
      m_closings(::inotify_init1(IN_CLOEXEC | IN_NONBLOCK)), m_events(EPOLLIN),
      m_buffer(std::make_unique_for_overwrite<std::byte[]>(BufferSize))
{
    std::array<char, 64> name{};
    if (!m_line || ::grantpt(m_line.get()) != 0 || ::unlockpt(m_line.get()) != 0 ||
        ::ptsname_r(m_line.get(), name.data(), name.size()) != 0)
        fail("pseudo terminal");
    m_name = name.data();
    openOwn();
    if (!m_own)
        fail(m_name.c_str());
    setRaw(m_line.get());
    // Only clients write: closing the own end is no event.
    if (!m_closings || ::inotify_add_watch(m_closings.get(), m_name.c_str(), IN_CLOSE_WRITE) < 0)
        fail("inotify");
    m_watch = m_loop.watch(m_line.get(), m_events, [this](std::uint32_t events) { ready(events); });
    m_closingsWatch = m_loop.watch(m_closings.get(), EPOLLIN, [this](std::uint32_t) { read(); });
}

SerialLine::~SerialLine()
{
    m_loop.cancel(m_hold);
    m_loop.cancel(m_retry);
    m_loop.remove(m_closingsWatch);
    if (m_watch != 0)
        m_loop.remove(m_watch);
}

void SerialLine::openOwn()
{
    m_own = FileDescriptor(::open(m_name.c_str(), O_RDONLY | O_NOCTTY | O_CLOEXEC | O_NONBLOCK));
}

bool SerialLine::connected()
{
    if (!m_connected)
        look();
    return m_connected;
}

/// Finds out whether somebody but us has the other end open: only then the line stays up when our own end is closed.
void SerialLine::look()
{
    if (!m_own)
        return;      // claimed: somebody is there
    int claimed = 0; // by TIOCEXCL: nobody else may open the port
    ::ioctl(m_own.get(), TIOCGEXCL, &claimed);
    // A claim outlives the client that made it, and would keep us out too.
    ::ioctl(m_own.get(), TIOCNXCL);
    m_own.reset();
    pollfd state{m_line.get(), 0, 0};
    m_connected = ::poll(&state, 1, 0) < 0 || (state.revents & POLLHUP) == 0;
    openOwn();
    if (claimed != 0 && m_connected && m_own)
        ::ioctl(m_own.get(), TIOCEXCL);
}

void SerialLine::ready(std::uint32_t events)
{
    if ((events & EPOLLOUT) != 0) {
        flush();
        if (m_queue.empty())
            m_owner.drained();
    }
    if ((events & (EPOLLIN | EPOLLHUP)) != 0)
        read();
    if ((events & EPOLLHUP) == 0 || m_own)
        return;
    // Somebody claimed the port before our own end was open again, and has gone: there is nothing to be seen until it can be opened.
    m_loop.remove(std::exchange(m_watch, 0));
    m_retry = m_loop.after(PauseWhileClaimed, [this] {
        m_retry = Timers::None;
        openOwn();
        m_watch = m_loop.watch(m_line.get(), m_events, [this](std::uint32_t again) { ready(again); });
    });
}

void SerialLine::read()
{
    makeRoom();
    const std::size_t before = m_end;
    ssize_t count = 0;
    do
        count = m_end < BufferSize ? ::read(m_line.get(), m_buffer.get() + m_end, BufferSize - m_end) : 0;
    while (count < 0 && errno == EINTR);
    if (count > 0)
        m_end += static_cast<std::size_t>(count);
    if (count > 0)
        takeFlowControl(before);
    // Whoever opens the port after those whose closing is known by now has sent these bytes or none yet: nothing that is forgotten here
    // answers them.
    if (sawClosing()) {
        look();
        forgetOutput();
        if (m_connected)
            m_owner.replaced();
        else
            setRaw(m_line.get());
    }
    m_owner.received();
    flush();
}

void SerialLine::makeRoom()
{
    if (m_begin == 0 || m_end < BufferSize)
        return;
    std::memmove(m_buffer.get(), m_buffer.get() + m_begin, m_end - m_begin);
    m_end -= std::exchange(m_begin, 0);
}

/// True when a client has closed its end since the last time.
bool SerialLine::sawClosing()
{
    bool seen = false;
    std::array<char, 4096> events;
    while (::read(m_closings.get(), events.data(), events.size()) > 0)
        seen = true;
    return seen;
}

void SerialLine::takeFlowControl(std::size_t from)
{
    termios settings{};
    if (::tcgetattr(m_line.get(), &settings) != 0 || (settings.c_iflag & IXOFF) == 0) {
        m_stopped = false;
        return;
    }
    std::byte *const end = m_buffer.get() + m_end;
    std::byte *const kept = std::remove_if(m_buffer.get() + from, end, [this](std::byte byte) {
        if (byte == Xon || byte == Xoff)
            m_stopped = byte == Xoff;
        return byte == Xon || byte == Xoff;
    });
    m_end = static_cast<std::size_t>(kept - m_buffer.get());
}

void SerialLine::consume(std::size_t count)
{
    m_begin += count;
    if (m_begin == m_end)
        m_begin = m_end = 0;
    updateWatch();
}

void SerialLine::send(std::vector<Outgoing> message, std::chrono::nanoseconds delay)
{
    if (!connected())
        return;
    for (Outgoing &piece : message) {
        m_unsent += piece.size();
        m_queue.push_back({std::move(piece), std::exchange(delay, {})});
    }
    flush();
}

/// True while the first chunk has to wait for its time.
bool SerialLine::firstIsHeld()
{
    const std::chrono::nanoseconds wait = std::exchange(m_queue.front().delay, {});
    if (wait > std::chrono::nanoseconds{0})
        m_hold = m_loop.after(wait, [this] {
            m_hold = Timers::None;
            flush();
            if (m_queue.empty())
                m_owner.drained();
        });
    return m_hold != Timers::None;
}

void SerialLine::flush()
{
    while (!m_queue.empty() && !m_stopped && !firstIsHeld()) {
        const Outgoing &first = m_queue.front().piece;
        const std::size_t textSize = first.text.size();
        const std::span<const std::byte> rest = m_sentOfFirst < textSize
                                                    ? std::as_bytes(std::span{first.text}).subspan(m_sentOfFirst)
                                                    : first.bytes.subspan(m_sentOfFirst - textSize);
        if (rest.empty()) {
            m_sentOfFirst = 0;
            m_queue.pop_front();
            continue;
        }
        const ssize_t sent = ::write(m_line.get(), rest.data(), rest.size());
        if (sent <= 0) {
            if (sent < 0 && errno == EINTR)
                continue;
            break;
        }
        m_sentOfFirst += static_cast<std::size_t>(sent);
        m_unsent -= static_cast<std::size_t>(sent);
    }
    updateWatch();
}

void SerialLine::forgetOutput()
{
    m_loop.cancel(std::exchange(m_hold, Timers::None));
    m_queue.clear();
    m_sentOfFirst = m_unsent = 0;
    m_stopped = false;
    // First what is on its way to the other end, then what has arrived there.
    ::tcflush(m_line.get(), TCOFLUSH);
    if (m_own)
        ::tcflush(m_own.get(), TCIFLUSH);
}

void SerialLine::updateWatch()
{
    std::uint32_t events = 0;
    if (m_begin > 0 || m_end < BufferSize)
        events |= EPOLLIN;
    if (!m_queue.empty() && !m_stopped && m_hold == Timers::None)
        events |= EPOLLOUT;
    if (std::exchange(m_events, events) != events && m_watch != 0)
        m_loop.change(m_watch, events);
}

} // namespace simulator
