#pragma once

#include <cstdint>
#include <netinet/in.h>
#include <stdexcept>
#include <sys/socket.h>
#include <unistd.h>

namespace test
{

/**
 * A TCP port on which nobody listens, in both address families, for as long as this object lives. A port that was merely freed
 * may be another test's the next moment; this one is taken and never listens.
 */
class ClosedPort
{
public:
    ClosedPort() : m_socket(::socket(AF_INET6, SOCK_STREAM | SOCK_CLOEXEC, 0))
    {
        const int both = 0;
        sockaddr_in6 name{};
        name.sin6_family = AF_INET6;
        socklen_t length = sizeof name;
        if (m_socket < 0 || ::setsockopt(m_socket, IPPROTO_IPV6, IPV6_V6ONLY, &both, sizeof both) != 0 ||
            ::bind(m_socket, reinterpret_cast<sockaddr *>(&name), length) != 0 ||
            ::getsockname(m_socket, reinterpret_cast<sockaddr *>(&name), &length) != 0)
            throw std::runtime_error("no port to keep closed");
        m_number = ntohs(name.sin6_port);
    }
    ~ClosedPort() { ::close(m_socket); }
    ClosedPort(const ClosedPort &) = delete;
    ClosedPort &operator=(const ClosedPort &) = delete;

    std::uint16_t number() const { return m_number; }

private:
    int m_socket;
    std::uint16_t m_number = 0;
};

} // namespace test
