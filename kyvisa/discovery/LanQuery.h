#pragma once

#include "kyvisa/os/DatagramSocket.h"
#include "kyvisa/os/NetworkInterfaces.h"

#include <chrono>
#include <cstddef>
#include <span>
#include <string>
#include <vector>

namespace kyvisa
{

/**
 * One way of asking who is there: a datagram to every network interface, repeated a few times because datagrams get lost,
 * and any number of answers.
 */
class LanQuery
{
public:
    virtual ~LanQuery() = default;
    LanQuery(const LanQuery &) = delete;
    LanQuery &operator=(const LanQuery &) = delete;

    /// When to ask, counted from the beginning, in ascending order.
    virtual std::span<const std::chrono::milliseconds> schedule() const = 0;
    /// Asks on every interface. One that does not take the question is passed over.
    void ask();

    std::size_t socketCount() const { return m_links.size(); }
    int descriptor(std::size_t socket) const { return m_links[socket].socket.descriptor(); }
    /// Takes the answers that wait on one of the sockets, a bounded number of them.
    void collect(std::size_t socket);

protected:
    struct Link {
        os::NetworkInterface interface;
        os::DatagramSocket socket;
    };

    LanQuery() = default;
    void open(const os::NetworkInterface &interface);

    virtual void askOn(Link &link) = 0;
    /// @param from the sender's address in numbers.
    virtual void take(std::span<const std::byte> answer, const std::string &from, Link &link) = 0;

private:
    std::vector<Link> m_links;
};

} // namespace kyvisa
