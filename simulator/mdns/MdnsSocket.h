#pragma once

#include "simulator/mdns/MdnsResponder.h"
#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"

#include <functional>
#include <string>

namespace simulator
{

/// An interface of this machine, with one family of addresses.
struct MdnsInterface {
    unsigned index = 0;
    std::string name; ///< "eth0"
    bool ipv6 = false;
};

/**
 * The socket of one interface and family, on the port that all multicast DNS programs of the machine share. It is bound to the group's address: datagrams
 * that are sent to this machine alone stay for whoever else has the port.
 */
class MdnsSocket final : public MdnsLink
{
public:
    using Received = std::function<void(MdnsSocket &, std::span<const std::byte>, const MdnsPeer &)>;

    /// Joins the group and sees whether anything can be sent there. Throws std::system_error.
    MdnsSocket(EventLoop &loop, const MdnsInterface &interface, Received received);
    ~MdnsSocket();
    MdnsSocket(const MdnsSocket &) = delete;
    MdnsSocket &operator=(const MdnsSocket &) = delete;

    void multicast(std::span<const std::byte> message) override;
    void unicast(std::span<const std::byte> message, const MdnsPeer &to) override;

private:
    void open4(const MdnsInterface &interface);
    void open6(const MdnsInterface &interface);
    void receive();

    EventLoop &m_loop;
    const Received m_received;
    FileDescriptor m_socket;
    MdnsPeer m_group;
    EventLoop::WatchId m_watch = 0;
};

} // namespace simulator
