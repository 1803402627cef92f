#include "kyvisa/os/StreamSocket.h"

#include "kyvisa/os/Poll.h"
#include "kyvisa/os/SystemCalls.h"

#include <array>
#include <cerrno>
#include <climits>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <utility>

namespace kyvisa::os
{
namespace
{

constexpr int IdleSeconds = 60;
constexpr int ProbeSeconds = 10;
constexpr int UnansweredProbes = 6;

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

StreamSocket::StreamSocket(StreamSocket &&other) noexcept : m_descriptor(std::exchange(other.m_descriptor, -1)) {}

StreamSocket &StreamSocket::operator=(StreamSocket &&other) noexcept
{
    if (this != &other) {
        close();
        m_descriptor = std::exchange(other.m_descriptor, -1);
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
    while (!pieces.empty()) {
        if (limit.wakeup.raised())
            return {IoResult::Woken, done.count};
        msghdr message{};
        message.msg_iov = pieces.data();
        message.msg_iovlen = std::min<std::size_t>(pieces.size(), IOV_MAX);
        const ssize_t sent = systemCalls().sendmsg(m_descriptor, &message, MSG_NOSIGNAL);
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
        done.result = waitFor(POLLOUT, limit);
        if (done.result != IoResult::Done)
            return done;
    }
    return done;
}

Transfer StreamSocket::receiveNow(std::span<std::byte> buffer)
{
    if (!isOpen())
        return {IoResult::Closed, 0};
    for (;;) {
        const ssize_t got = systemCalls().recv(m_descriptor, buffer.data(), buffer.size(), 0);
        if (got > 0)
            return {IoResult::Done, static_cast<std::size_t>(got)};
        if (got == 0)
            return {IoResult::Closed, 0};
        if (errno == EINTR)
            continue;
        if (wouldBlock(errno))
            return {IoResult::Done, 0};
        return {errno == ENOMEM || errno == ENOBUFS ? IoResult::NoMemory : IoResult::Closed, 0};
    }
}

Transfer StreamSocket::receive(std::span<std::byte> buffer, const WaitLimit &limit)
{
    // Trying first costs next to nothing while the answer is on its way, and saves the wait when it is here. A peer that
    // never lets it come to a wait must not outlast the wake-up, so that is looked at here too.
    for (;;) {
        if (limit.wakeup.raised())
            return {IoResult::Woken, 0};
        const Transfer got = receiveNow(buffer);
        if (got.result != IoResult::Done || got.count > 0)
            return got;
        const IoResult waited = waitFor(POLLIN, limit);
        if (waited != IoResult::Done)
            return {waited, 0};
    }
}

bool StreamSocket::setNoDelay(bool on)
{
    const int value = on ? 1 : 0;
    return systemCalls().setsockopt(m_descriptor, IPPROTO_TCP, TCP_NODELAY, &value, sizeof value) == 0;
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

} // namespace kyvisa::os
