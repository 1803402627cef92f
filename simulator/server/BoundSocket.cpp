#include "simulator/server/BoundSocket.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <cerrno>
#include <cstring>
#include <system_error>

namespace simulator
{
namespace
{

union SocketAddress {
    sockaddr any;
    sockaddr_in v4;
    sockaddr_in6 v6;
};

[[noreturn]] void fail(const char *what)
{
    throw std::system_error(errno, std::generic_category(), what);
}

socklen_t fill(SocketAddress &to, const ListenAddress &address, std::uint16_t port)
{
    std::memset(&to, 0, sizeof to);
    if (address.isIpv6()) {
        to.v6.sin6_family = AF_INET6;
        to.v6.sin6_port = htons(port);
        if (::inet_pton(AF_INET6, address.text.c_str(), &to.v6.sin6_addr) != 1)
            throw std::system_error(EINVAL, std::generic_category(), address.text);
        return sizeof to.v6;
    }
    to.v4.sin_family = AF_INET;
    to.v4.sin_port = htons(port);
    if (::inet_pton(AF_INET, address.text.c_str(), &to.v4.sin_addr) != 1)
        throw std::system_error(EINVAL, std::generic_category(), address.text);
    return sizeof to.v4;
}

} // namespace

bool ListenAddress::isLoopback() const
{
    return text == "::1" || text.starts_with("127.");
}

FileDescriptor bindSocket(const ListenAddress &address, int type, std::uint16_t port)
{
    SocketAddress name;
    const socklen_t length = fill(name, address, port);
    FileDescriptor socket(::socket(name.any.sa_family, type | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!socket)
        fail("socket");
    const int on = 1;
    // With datagrams this would let two programs have the same port.
    if (type == SOCK_STREAM)
        ::setsockopt(socket.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    // Each family is asked for by its own address.
    if (address.isIpv6())
        ::setsockopt(socket.get(), IPPROTO_IPV6, IPV6_V6ONLY, &on, sizeof on);
    if (::bind(socket.get(), &name.any, length) < 0)
        fail("bind");
    return socket;
}

std::uint16_t portOf(const FileDescriptor &socket)
{
    SocketAddress name;
    socklen_t length = sizeof name;
    if (::getsockname(socket.get(), &name.any, &length) < 0)
        fail("getsockname");
    return ntohs(name.any.sa_family == AF_INET6 ? name.v6.sin6_port : name.v4.sin_port);
}

} // namespace simulator
