#include "simulator/mdns/MdnsSocket.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/epoll.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <system_error>

namespace simulator
{
namespace
{

constexpr int DatagramsPerTurn = 64;
constexpr int HopLimit = 255; ///< RFC 6762, 11
constexpr const char *Group4 = "224.0.0.251";
constexpr const char *Group6 = "ff02::fb";

[[noreturn]] void fail(const char *what)
{
    throw std::system_error(errno, std::generic_category(), what);
}

template <typename Value>
void set(const FileDescriptor &socket, int level, int option, const Value &value, const char *what)
{
    if (::setsockopt(socket.get(), level, option, &value, sizeof value) < 0)
        fail(what);
}

void shareThePort(const FileDescriptor &socket)
{
    set(socket, SOL_SOCKET, SO_REUSEADDR, 1, "SO_REUSEADDR");
    set(socket, SOL_SOCKET, SO_REUSEPORT, 1, "SO_REUSEPORT");
}

template <typename Address>
MdnsPeer peer(const Address &address)
{
    MdnsPeer result;
    std::memcpy(&result.address, &address, sizeof address);
    result.length = sizeof address;
    result.port = wire::dns::MulticastPort;
    return result;
}

std::uint16_t portOf(const sockaddr_storage &address)
{
    if (address.ss_family == AF_INET6)
        return ntohs(reinterpret_cast<const sockaddr_in6 &>(address).sin6_port);
    return ntohs(reinterpret_cast<const sockaddr_in &>(address).sin_port);
}

} // namespace

MdnsSocket::MdnsSocket(EventLoop &loop, const MdnsInterface &interface, Received received)
    : m_loop(loop), m_received(std::move(received)),
      m_socket(::socket(interface.ipv6 ? AF_INET6 : AF_INET, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0))
{
    if (!m_socket)
        fail("socket");
    shareThePort(m_socket);
    if (interface.ipv6)
        open6(interface);
    else
        open4(interface);
    // A message without questions and answers asks for nothing, and shows whether there is a way.
    const std::vector<std::byte> nothing = wire::dns::encode({});
    if (::sendto(m_socket.get(), nothing.data(), nothing.size(), 0, reinterpret_cast<sockaddr *>(&m_group.address),
                 m_group.length) < 0)
        fail("sendto");
    m_watch = m_loop.watch(m_socket.get(), EPOLLIN, [this](std::uint32_t) { receive(); });
}

MdnsSocket::~MdnsSocket()
{
    m_loop.remove(m_watch);
}

void MdnsSocket::open4(const MdnsInterface &interface)
{
    sockaddr_in group{};
    group.sin_family = AF_INET;
    group.sin_port = htons(wire::dns::MulticastPort);
    ::inet_pton(AF_INET, Group4, &group.sin_addr);
    m_group = peer(group);
    ip_mreqn membership{};
    membership.imr_multiaddr = group.sin_addr;
    membership.imr_ifindex = static_cast<int>(interface.index);
    // Else the memberships of all sockets of the machine count for this one.
    set(m_socket, IPPROTO_IP, IP_MULTICAST_ALL, 0, "IP_MULTICAST_ALL");
    set(m_socket, IPPROTO_IP, IP_ADD_MEMBERSHIP, membership, "IP_ADD_MEMBERSHIP");
    set(m_socket, IPPROTO_IP, IP_MULTICAST_IF, membership, "IP_MULTICAST_IF");
    set(m_socket, IPPROTO_IP, IP_MULTICAST_TTL, HopLimit, "IP_MULTICAST_TTL");
    set(m_socket, IPPROTO_IP, IP_MULTICAST_LOOP, 1, "IP_MULTICAST_LOOP");
    if (::bind(m_socket.get(), reinterpret_cast<sockaddr *>(&group), sizeof group) < 0)
        fail("bind");
}

void MdnsSocket::open6(const MdnsInterface &interface)
{
    sockaddr_in6 group{};
    group.sin6_family = AF_INET6;
    group.sin6_port = htons(wire::dns::MulticastPort);
    group.sin6_scope_id = interface.index;
    ::inet_pton(AF_INET6, Group6, &group.sin6_addr);
    m_group = peer(group);
    ipv6_mreq membership{};
    membership.ipv6mr_multiaddr = group.sin6_addr;
    membership.ipv6mr_interface = interface.index;
    set(m_socket, IPPROTO_IPV6, IPV6_V6ONLY, 1, "IPV6_V6ONLY");
    set(m_socket, IPPROTO_IPV6, IPV6_MULTICAST_ALL, 0, "IPV6_MULTICAST_ALL");
    set(m_socket, IPPROTO_IPV6, IPV6_JOIN_GROUP, membership, "IPV6_JOIN_GROUP");
    set(m_socket, IPPROTO_IPV6, IPV6_MULTICAST_IF, interface.index, "IPV6_MULTICAST_IF");
    set(m_socket, IPPROTO_IPV6, IPV6_MULTICAST_HOPS, HopLimit, "IPV6_MULTICAST_HOPS");
    set(m_socket, IPPROTO_IPV6, IPV6_MULTICAST_LOOP, 1, "IPV6_MULTICAST_LOOP");
    if (::bind(m_socket.get(), reinterpret_cast<sockaddr *>(&group), sizeof group) < 0)
        fail("bind");
}

void MdnsSocket::multicast(std::span<const std::byte> message)
{
    unicast(message, m_group);
}

void MdnsSocket::unicast(std::span<const std::byte> message, const MdnsPeer &to)
{
    // What does not get through is said again, or asked for again: there is nobody to tell.
    static_cast<void>(::sendto(m_socket.get(), message.data(), message.size(), 0,
                               reinterpret_cast<const sockaddr *>(&to.address), to.length));
}

void MdnsSocket::receive()
{
    std::array<std::byte, wire::dns::MaxMessage> buffer;
    for (int i = 0; i < DatagramsPerTurn; ++i) {
        MdnsPeer from;
        from.length = sizeof from.address;
        const ssize_t size = ::recvfrom(m_socket.get(), buffer.data(), buffer.size(), 0,
                                        reinterpret_cast<sockaddr *>(&from.address), &from.length);
        if (size < 0)
            return;
        from.port = portOf(from.address);
        m_received(*this, std::span(buffer).first(static_cast<std::size_t>(size)), from);
    }
}

} // namespace simulator
