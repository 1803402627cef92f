#include "simulator/server/BoundSocket.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <net/if.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <memory>
#include <optional>
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

/// The broadcast address of the interface that has this one.
std::optional<in_addr> broadcastOf(in_addr address)
{
    ifaddrs *all = nullptr;
    if (::getifaddrs(&all) != 0)
        return std::nullopt;
    const std::unique_ptr<ifaddrs, decltype(&::freeifaddrs)> owner(all, &::freeifaddrs);
    for (const ifaddrs *entry = all; entry; entry = entry->ifa_next)
        if (entry->ifa_addr && entry->ifa_addr->sa_family == AF_INET && (entry->ifa_flags & IFF_BROADCAST) != 0 &&
            entry->ifa_broadaddr &&
            reinterpret_cast<const sockaddr_in *>(entry->ifa_addr)->sin_addr.s_addr == address.s_addr) {
            const in_addr broadcast = reinterpret_cast<const sockaddr_in *>(entry->ifa_broadaddr)->sin_addr;
            // Where none was set, the address itself stands there.
            if (broadcast.s_addr != address.s_addr)
                return broadcast;
        }
    return std::nullopt;
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

FileDescriptor bindBroadcast(const ListenAddress &address, std::uint16_t port)
{
    if (address.isIpv6())
        return {};
    SocketAddress name;
    const socklen_t length = fill(name, address, port);
    const std::optional<in_addr> broadcast = broadcastOf(name.v4.sin_addr);
    if (!broadcast)
        return {};
    name.v4.sin_addr = *broadcast;
    FileDescriptor socket(::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    const int on = 1;
    if (!socket || ::setsockopt(socket.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on) < 0 ||
        ::bind(socket.get(), &name.any, length) < 0)
        return {};
    return socket;
}

std::string peerOf(const FileDescriptor &socket)
{
    SocketAddress name;
    socklen_t length = sizeof name;
    std::array<char, INET6_ADDRSTRLEN> text{};
    if (::getpeername(socket.get(), &name.any, &length) < 0)
        return "?";
    if (name.any.sa_family == AF_INET6) {
        ::inet_ntop(AF_INET6, &name.v6.sin6_addr, text.data(), text.size());
        return "[" + std::string(text.data()) + "]:" + std::to_string(ntohs(name.v6.sin6_port));
    }
    ::inet_ntop(AF_INET, &name.v4.sin_addr, text.data(), text.size());
    return std::string(text.data()) + ":" + std::to_string(ntohs(name.v4.sin_port));
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
