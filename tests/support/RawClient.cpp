#include "support/RawClient.h"

#include <gtest/gtest.h>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstring>
#include <utility>
#include <vector>

namespace test
{
namespace
{

constexpr int Patience = 30000; // milliseconds: only what never comes takes that long

template <typename Address>
int connected(int family, Address address)
{
    const int descriptor = ::socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const int on = 1;
    ::setsockopt(descriptor, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    EXPECT_EQ(::connect(descriptor, reinterpret_cast<const sockaddr *>(&address), sizeof address), 0)
        << std::strerror(errno);
    return descriptor;
}

} // namespace

RawClient::RawClient(std::uint16_t port, bool ipv6)
{
    if (ipv6) {
        sockaddr_in6 address{};
        address.sin6_family = AF_INET6;
        address.sin6_port = htons(port);
        address.sin6_addr = in6addr_loopback;
        m_descriptor = connected(AF_INET6, address);
    } else {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(port);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        m_descriptor = connected(AF_INET, address);
    }
}

RawClient::~RawClient()
{
    close();
}

RawClient::RawClient(RawClient &&other) noexcept : m_descriptor(std::exchange(other.m_descriptor, -1)) {}

bool RawClient::trySend(std::string_view bytes)
{
    while (!bytes.empty()) {
        pollfd watched{m_descriptor, POLLOUT, 0};
        if (::poll(&watched, 1, Patience) != 1)
            return false;
        const ssize_t sent = ::send(m_descriptor, bytes.data(), bytes.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
        if (sent < 0 && errno != EAGAIN)
            return false;
        bytes.remove_prefix(static_cast<std::size_t>(std::max<ssize_t>(sent, 0)));
    }
    return true;
}

void RawClient::send(std::string_view bytes)
{
    EXPECT_TRUE(trySend(bytes)) << "the server takes no more";
}

std::string RawClient::receive(std::size_t count)
{
    std::string result(count, '\0');
    std::size_t have = 0;
    while (have < count) {
        pollfd watched{m_descriptor, POLLIN, 0};
        const ssize_t got =
            ::poll(&watched, 1, Patience) == 1 ? ::recv(m_descriptor, result.data() + have, count - have, 0) : -1;
        if (got <= 0) {
            ADD_FAILURE() << "only " << have << " of " << count << " bytes came";
            result.resize(have);
            return result;
        }
        have += static_cast<std::size_t>(got);
    }
    return result;
}

std::string RawClient::receiveLine()
{
    std::string line;
    while (!line.ends_with('\n')) {
        const std::string c = receive(1);
        if (c.empty())
            break;
        line += c;
    }
    return line;
}

std::string RawClient::receiveAll()
{
    std::string result;
    std::vector<char> piece(65536);
    while (true) {
        pollfd watched{m_descriptor, POLLIN, 0};
        if (::poll(&watched, 1, Patience) != 1) {
            ADD_FAILURE() << "the server does not close";
            return result;
        }
        const ssize_t got = ::recv(m_descriptor, piece.data(), piece.size(), 0);
        if (got <= 0)
            return result;
        result.append(piece.data(), static_cast<std::size_t>(got));
    }
}

bool RawClient::silentFor(std::chrono::milliseconds span)
{
    pollfd watched{m_descriptor, POLLIN, 0};
    return ::poll(&watched, 1, static_cast<int>(span.count())) == 0;
}

void RawClient::finishSending()
{
    ::shutdown(m_descriptor, SHUT_WR);
}

void RawClient::close()
{
    if (m_descriptor >= 0)
        ::close(std::exchange(m_descriptor, -1));
}

std::string fromHex(std::string_view digits)
{
    std::string bytes;
    std::string pair;
    for (const char c : digits) {
        if (c == ' ')
            continue;
        pair += c;
        if (pair.size() == 2) {
            bytes += static_cast<char>(std::stoi(pair, nullptr, 16));
            pair.clear();
        }
    }
    EXPECT_TRUE(pair.empty()) << "half a byte in: " << digits;
    return bytes;
}

} // namespace test
