#include "kyvisa/os/DatagramSocket.h"

#include "kyvisa/os/SystemCalls.h"

#include <cerrno>
#include <utility>

namespace kyvisa::os
{
namespace
{

constexpr int MulticastHops = 255; // RFC 6762 section 11: from this link alone

sockaddr_in addressOf(in_addr host, std::uint16_t port)
{
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr = host;
    address.sin_port = htons(port);
    return address;
}

template <typename Value>
bool setOption(int descriptor, int level, int option, const Value &value)
{
    return systemCalls().setsockopt(descriptor, level, option, &value, sizeof value) == 0;
}

} // namespace

DatagramSocket::DatagramSocket(const NetworkInterface &interface)
    : m_descriptor(systemCalls().socket(AF_INET, SOCK_DGRAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0))
{
    if (m_descriptor < 0)
        return;
    const sockaddr_in own = addressOf(interface.address, 0);
    const bool ready = setOption(m_descriptor, SOL_SOCKET, SO_BROADCAST, 1) &&
                       setOption(m_descriptor, IPPROTO_IP, IP_MULTICAST_IF, interface.address) &&
                       setOption(m_descriptor, IPPROTO_IP, IP_MULTICAST_TTL, MulticastHops) &&
                       systemCalls().bind(m_descriptor, reinterpret_cast<const sockaddr *>(&own), sizeof own) == 0;
    if (!ready)
        systemCalls().close(std::exchange(m_descriptor, -1));
}

DatagramSocket::~DatagramSocket()
{
    if (m_descriptor >= 0)
        systemCalls().close(m_descriptor);
}

DatagramSocket::DatagramSocket(DatagramSocket &&other) noexcept : m_descriptor(std::exchange(other.m_descriptor, -1)) {}

bool DatagramSocket::send(std::span<const std::byte> data, in_addr to, std::uint16_t port)
{
    sockaddr_in address = addressOf(to, port);
    iovec piece{const_cast<std::byte *>(data.data()), data.size()};
    msghdr message{};
    message.msg_name = &address;
    message.msg_namelen = sizeof address;
    message.msg_iov = &piece;
    message.msg_iovlen = 1;
    return systemCalls().sendmsg(m_descriptor, &message, MSG_NOSIGNAL) == static_cast<ssize_t>(data.size());
}

std::optional<std::size_t> DatagramSocket::receive(std::span<std::byte> buffer, in_addr &from)
{
    for (;;) {
        sockaddr_in address{};
        socklen_t length = sizeof address;
        const ssize_t size = systemCalls().recvfrom(m_descriptor, buffer.data(), buffer.size(), 0,
                                                    reinterpret_cast<sockaddr *>(&address), &length);
        if (size >= 0) {
            from = address.sin_addr;
            return static_cast<std::size_t>(size);
        }
        // An earlier datagram that found nobody is reported here, and says nothing of those behind it.
        if (errno != EINTR && errno != ECONNREFUSED)
            return std::nullopt;
    }
}

} // namespace kyvisa::os
