#include "kyvisa/os/StreamSocket.h"

#include "kyvisa/os/Poll.h"
#include "kyvisa/os/SystemCalls.h"

#include <array>
#include <cerrno>
#include <climits>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/ioctl.h>
#include <sys/time.h>
#include <utility>

namespace kyvisa::os
{
namespace
{

constexpr int IdleSeconds = 60;
constexpr int ProbeSeconds = 10;
constexpr int UnansweredProbes = 6;

/// The system counts this in ticks of up to 10 ms, and rounds it up by two of them.
constexpr std::chrono::milliseconds BriefWait{5};
constexpr std::chrono::milliseconds LongestBriefWait{50};

bool wouldBlock(int error)
{
    return error == EAGAIN || error == EWOULDBLOCK;
}

/// Drops @p count bytes from the front of @p pieces.
void advance(std::span<iovec> &pieces, std::size_t count)
{
    while (!pieces.empty() && count >= pieces.front().iov_len) {
        count -= pieces.front().iov_len;
        pieces = pieces.subspan(1);
    }
    if (count > 0) {
        pieces.front().iov_base = static_cast<char *>(pieces.front().iov_base) + count;
        pieces.front().iov_len -= count;
    }
}

} // namespace

StreamSocket::StreamSocket(StreamSocket &&other) noexcept
    : m_descriptor(std::exchange(other.m_descriptor, -1)), m_waitsBriefly(other.m_waitsBriefly)
{
}

StreamSocket &StreamSocket::operator=(StreamSocket &&other) noexcept
{
    if (this != &other) {
        close();
        m_descriptor = std::exchange(other.m_descriptor, -1);
        m_waitsBriefly = other.m_waitsBriefly;
    }
    return *this;
}

void StreamSocket::close()
{
    if (isOpen())
        systemCalls().close(std::exchange(m_descriptor, -1));
}

void StreamSocket::shutDown()
{
    if (isOpen())
        systemCalls().shutdown(m_descriptor, SHUT_RDWR);
}

IoResult StreamSocket::waitFor(short events, const WaitLimit &limit) const
{
    std::array<pollfd, 2> watched = {pollfd{m_descriptor, events, 0}};
    return pollWithin(watched, limit);
}

Transfer StreamSocket::send(std::span<iovec> pieces, const WaitLimit &limit)
{
    Transfer done;
    if (!isOpen())
        return {IoResult::Closed, 0};
    bool waited = false;
    while (!pieces.empty()) {
        if (limit.wakeup.raised())
            return {IoResult::Woken, done.count};
        msghdr message{};
        message.msg_iov = pieces.data();
        message.msg_iovlen = std::min<std::size_t>(pieces.size(), IOV_MAX);
        const ssize_t sent = systemCalls().sendmsg(m_descriptor, &message, MSG_NOSIGNAL | MSG_DONTWAIT);
        if (sent >= 0) {
            done.count += static_cast<std::size_t>(sent);
            advance(pieces, static_cast<std::size_t>(sent));
            if (!pieces.empty() && limit.deadline.expired())
                return {IoResult::TimedOut, done.count};
            continue;
        }
        if (errno == EINTR)
            continue;
        if (!wouldBlock(errno))
            return {errno == ENOMEM || errno == ENOBUFS ? IoResult::NoMemory : IoResult::Closed, done.count};
        if (std::exchange(waited, true) && limit.deadline.expired()) // ready, and yet it took nothing
            return {IoResult::TimedOut, done.count};
        done.result = waitFor(POLLOUT, limit);
        if (done.result != IoResult::Done)
            return done;
    }
    return done;
}

Transfer StreamSocket::receiveOnce(std::span<std::byte> buffer, int flags)
{
    if (!isOpen())
        return {IoResult::Closed, 0};
    for (;;) {
        const ssize_t got = systemCalls().recv(m_descriptor, buffer.data(), buffer.size(), flags);
        if (got > 0)
            return {IoResult::Done, static_cast<std::size_t>(got)};
        if (got == 0)
            return {IoResult::Closed, 0};
        // A wait that was interrupted is not begun again: signals without end would never let the deadline come.
        if (errno == EINTR && flags == MSG_DONTWAIT)
            continue;
        if (errno == EINTR || wouldBlock(errno))
            return {IoResult::Done, 0};
        return {errno == ENOMEM || errno == ENOBUFS ? IoResult::NoMemory : IoResult::Closed, 0};
    }
}

Transfer StreamSocket::receiveNow(std::span<std::byte> buffer)
{
    return receiveOnce(buffer, MSG_DONTWAIT);
}

bool StreamSocket::mayWaitBriefly(const WaitLimit &limit) const
{
    return m_waitsBriefly && (limit.deadline.isNever() || limit.deadline.remaining() > LongestBriefWait);
}

Transfer StreamSocket::receive(std::span<std::byte> buffer, const WaitLimit &limit)
{
    // A peer that never lets it come to a poll must not outlast the wake-up, so that is looked at here too.
    for (bool first = true;; first = false) {
        if (limit.wakeup.raised())
            return {IoResult::Woken, 0};
        const Transfer got = receiveOnce(buffer, first && mayWaitBriefly(limit) ? 0 : MSG_DONTWAIT);
        if (got.result != IoResult::Done || got.count > 0)
            return got;
        if (!first && limit.deadline.expired()) // ready, and yet there was nothing
            return {IoResult::TimedOut, 0};
        const IoResult waited = waitFor(POLLIN, limit);
        if (waited != IoResult::Done)
            return {waited, 0};
    }
}

void StreamSocket::allowBriefWaits()
{
    timeval wait{};
    wait.tv_usec = std::chrono::microseconds(BriefWait).count();
    int nonBlocking = 0;
    m_waitsBriefly = systemCalls().setsockopt(m_descriptor, SOL_SOCKET, SO_RCVTIMEO, &wait, sizeof wait) == 0 &&
                     systemCalls().ioctl(m_descriptor, FIONBIO, &nonBlocking) == 0;
}

bool StreamSocket::setNoDelay(bool on)
{
    const int value = on ? 1 : 0;
    return systemCalls().setsockopt(m_descriptor, IPPROTO_TCP, TCP_NODELAY, &value, sizeof value) == 0;
}

bool StreamSocket::setReceiveBuffer(std::size_t size)
{
    const int value = static_cast<int>(size);
    return systemCalls().setsockopt(m_descriptor, SOL_SOCKET, SO_RCVBUF, &value, sizeof value) == 0;
}

bool StreamSocket::setSendBuffer(std::size_t size)
{
    const int value = static_cast<int>(size);
    return systemCalls().setsockopt(m_descriptor, SOL_SOCKET, SO_SNDBUF, &value, sizeof value) == 0;
}

bool StreamSocket::setKeepAlive(bool on)
{
    const int value = on ? 1 : 0;
    const auto set = [this](int level, int option, int number) {
        return systemCalls().setsockopt(m_descriptor, level, option, &number, sizeof number) == 0;
    };
    return set(IPPROTO_TCP, TCP_KEEPIDLE, IdleSeconds) && set(IPPROTO_TCP, TCP_KEEPINTVL, ProbeSeconds) &&
           set(IPPROTO_TCP, TCP_KEEPCNT, UnansweredProbes) && set(SOL_SOCKET, SO_KEEPALIVE, value);
}

std::string StreamSocket::peerAddress() const
{
    sockaddr_storage address{};
    socklen_t length = sizeof address;
    std::array<char, NI_MAXHOST> text{};
    if (::getpeername(m_descriptor, reinterpret_cast<sockaddr *>(&address), &length) != 0 ||
        ::getnameinfo(reinterpret_cast<sockaddr *>(&address), length, text.data(), text.size(), nullptr, 0,
                      NI_NUMERICHOST) != 0)
        return {};
    return text.data();
}

std::uint32_t StreamSocket::localIpv4Address() const
{
    sockaddr_in address{};
    socklen_t length = sizeof address;
    if (::getsockname(m_descriptor, reinterpret_cast<sockaddr *>(&address), &length) != 0 ||
        address.sin_family != AF_INET)
        return 0;
    return ntohl(address.sin_addr.s_addr);
}

} // namespace kyvisa::os
