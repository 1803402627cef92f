#include "support/ScriptedPeer.h"

#include <arpa/inet.h>
#include <array>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <stdexcept>
#include <sys/socket.h>
#include <unistd.h>
#include <utility>

namespace test
{
namespace
{

constexpr int Patience = 20000; // milliseconds: only a test that has gone wrong waits that long

bool ready(int descriptor, short events, int milliseconds)
{
    pollfd watched{descriptor, events, 0};
    return ::poll(&watched, 1, milliseconds) == 1;
}

std::string shown(std::string_view bytes)
{
    std::string text;
    for (const unsigned char byte : bytes.substr(0, 80)) {
        std::array<char, 4> digits{};
        std::snprintf(digits.data(), digits.size(), "%02X ", byte);
        text += digits.data();
    }
    return text;
}

} // namespace

PeerConnection::PeerConnection(PeerConnection &&other) noexcept : m_descriptor(std::exchange(other.m_descriptor, -1)) {}

PeerConnection::~PeerConnection()
{
    close();
}

void PeerConnection::close()
{
    if (m_descriptor >= 0)
        ::close(std::exchange(m_descriptor, -1));
}

void PeerConnection::reset()
{
    const linger hard{1, 0};
    ::setsockopt(m_descriptor, SOL_SOCKET, SO_LINGER, &hard, sizeof hard);
    close();
}

std::string PeerConnection::takeUntilClosed(std::size_t count)
{
    std::string bytes;
    while (bytes.size() < count) {
        std::array<char, 65536> chunk;
        if (!ready(m_descriptor, POLLIN, Patience)) {
            ADD_FAILURE() << "the client sent nothing more after " << shown(bytes);
            break;
        }
        const ssize_t got = ::recv(m_descriptor, chunk.data(), std::min(chunk.size(), count - bytes.size()), 0);
        if (got <= 0)
            break;
        bytes.append(chunk.data(), static_cast<std::size_t>(got));
    }
    return bytes;
}

std::string PeerConnection::take(std::size_t count)
{
    std::string bytes = takeUntilClosed(count);
    if (bytes.size() < count)
        ADD_FAILURE() << "the client said no more than " << shown(bytes);
    return bytes;
}

void PeerConnection::expect(std::string_view bytes)
{
    EXPECT_EQ(shown(take(bytes.size())), shown(bytes));
}

void PeerConnection::send(std::string_view bytes)
{
    EXPECT_TRUE(trySend(bytes)) << "the client did not take " << shown(bytes);
}

bool PeerConnection::trySend(std::string_view bytes)
{
    while (!bytes.empty()) {
        if (!ready(m_descriptor, POLLOUT, Patience))
            return false;
        const ssize_t sent = ::send(m_descriptor, bytes.data(), bytes.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
        if (sent < 0 && errno != EAGAIN)
            return false;
        bytes.remove_prefix(sent < 0 ? 0 : static_cast<std::size_t>(sent));
    }
    return true;
}

void PeerConnection::expectClosed()
{
    char byte;
    EXPECT_TRUE(ready(m_descriptor, POLLIN, Patience)) << "the client did not close";
    EXPECT_LE(::recv(m_descriptor, &byte, 1, 0), 0) << "the client sent something more";
}

bool PeerConnection::silentFor(std::chrono::milliseconds span)
{
    return !ready(m_descriptor, POLLIN, static_cast<int>(span.count()));
}

ScriptedPeer::ScriptedPeer(Script script, bool ipv6)
    : m_listener(::socket(ipv6 ? AF_INET6 : AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0))
{
    sockaddr_in6 six{};
    six.sin6_family = AF_INET6;
    six.sin6_addr = in6addr_loopback;
    sockaddr_in four{};
    four.sin_family = AF_INET;
    four.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    listen(ipv6 ? reinterpret_cast<sockaddr *>(&six) : reinterpret_cast<sockaddr *>(&four),
           ipv6 ? sizeof six : sizeof four);
    m_port = ntohs(ipv6 ? six.sin6_port : four.sin_port);
    m_thread = std::thread([this, run = std::move(script)] { run(*this); });
}

ScriptedPeer::ScriptedPeer(Script script, const char *address, std::uint16_t port)
    : m_listener(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0))
{
    const int on = 1;
    ::setsockopt(m_listener, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    sockaddr_in name{};
    name.sin_family = AF_INET;
    name.sin_port = htons(port);
    ::inet_pton(AF_INET, address, &name.sin_addr);
    listen(reinterpret_cast<sockaddr *>(&name), sizeof name);
    m_port = ntohs(name.sin_port);
    m_thread = std::thread([this, run = std::move(script)] { run(*this); });
}

/// Stores in @p address what the system chose.
void ScriptedPeer::listen(sockaddr *address, socklen_t length)
{
    if (m_listener < 0 || ::bind(m_listener, address, length) != 0 || ::listen(m_listener, 64) != 0 ||
        ::getsockname(m_listener, address, &length) != 0)
        throw std::runtime_error("no listening socket for the scripted peer");
}

ScriptedPeer::~ScriptedPeer()
{
    finish();
    ::close(m_listener);
}

void ScriptedPeer::finish()
{
    if (m_thread.joinable())
        m_thread.join();
}

PeerConnection ScriptedPeer::accept()
{
    if (!ready(m_listener, POLLIN, Patience)) {
        ADD_FAILURE() << "no client came";
        return PeerConnection(-1);
    }
    const int descriptor = ::accept4(m_listener, nullptr, nullptr, SOCK_CLOEXEC);
    const int on = 1;
    ::setsockopt(descriptor, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    return PeerConnection(descriptor);
}

std::string hex(std::string_view digits)
{
    std::string bytes;
    int high = -1;
    for (const char c : digits) {
        if (c == ' ')
            continue;
        const int value = c <= '9' ? c - '0' : (c | 0x20) - 'a' + 10;
        if (high < 0) {
            high = value;
        } else {
            bytes.push_back(static_cast<char>(high * 16 + value));
            high = -1;
        }
    }
    return bytes;
}

} // namespace test
