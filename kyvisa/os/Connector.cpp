#include "kyvisa/os/Connector.h"

#include "kyvisa/os/Poll.h"
#include "kyvisa/os/Resolver.h"
#include "kyvisa/os/SystemCalls.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <vector>

namespace kyvisa::os
{
namespace
{

constexpr std::chrono::milliseconds HeadStart{250};

/// The connections being tried. Those that lose are closed with it.
class Race
{
public:
    explicit Race(std::vector<Address> addresses) : m_addresses(std::move(addresses))
    {
        m_running.reserve(m_addresses.size()); // so that a new descriptor always finds its place
    }
    ~Race()
    {
        for (const int descriptor : m_running)
            systemCalls().close(descriptor);
    }
    Race(const Race &) = delete;
    Race &operator=(const Race &) = delete;

    IoResult run(const WaitLimit &limit, StreamSocket &winner);

private:
    bool hasNext() const { return m_next < m_addresses.size(); }
    IoResult startNext();
    IoResult waitAndCollect(const WaitLimit &limit, Deadline nextStart);
    void win(std::size_t index);
    /// Nobody was reached.
    IoResult lost() const { return m_portsUsedUp ? IoResult::NoMemory : IoResult::NoAddress; }

    std::vector<Address> m_addresses;
    std::size_t m_next = 0;
    std::vector<int> m_running;
    StreamSocket m_winner;
    bool m_portsUsedUp = false;
};

/// connect() calls an address unavailable when this machine has no way there, and also when all local ports towards it are in
/// use. A datagram socket needs the way alone.
bool hasWayTo(const Address &address)
{
    const int descriptor = systemCalls().socket(address.storage.ss_family, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    if (descriptor < 0)
        return false;
    const bool reachable = systemCalls().connect(descriptor, address.get(), address.length) == 0;
    systemCalls().close(descriptor);
    return reachable;
}

IoResult Race::run(const WaitLimit &limit, StreamSocket &winner)
{
    Deadline nextStart = Deadline::now();
    for (;;) {
        if (hasNext() && (m_running.empty() || nextStart.expired())) {
            const IoResult started = startNext();
            if (started != IoResult::Done)
                return started;
            nextStart = Deadline::after(HeadStart);
        }
        if (!m_winner.isOpen() && !m_running.empty()) {
            const IoResult waited = waitAndCollect(limit, hasNext() ? nextStart : Deadline::never());
            if (waited != IoResult::Done)
                return waited;
        }
        if (m_winner.isOpen()) {
            m_winner.setNoDelay(true);
            m_winner.allowBriefWaits();
            winner = std::move(m_winner);
            return IoResult::Done;
        }
        if (!hasNext() && m_running.empty())
            return lost();
    }
}

IoResult Race::startNext()
{
    const Address &address = m_addresses[m_next++];
    const int descriptor =
        systemCalls().socket(address.storage.ss_family, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    if (descriptor < 0) // a family that this system lacks is no reason to give up
        return errno == EAFNOSUPPORT ? IoResult::Done : IoResult::NoMemory;
    m_running.push_back(descriptor);
    if (systemCalls().connect(descriptor, address.get(), address.length) == 0) {
        win(m_running.size() - 1);
    } else if (errno != EINPROGRESS && errno != EINTR) {
        const bool unavailable = errno == EADDRNOTAVAIL;
        systemCalls().close(descriptor);
        m_running.pop_back();
        m_portsUsedUp = m_portsUsedUp || (unavailable && hasWayTo(address));
    }
    return IoResult::Done;
}

void Race::win(std::size_t index)
{
    m_winner = StreamSocket(m_running[index]);
    m_running.erase(m_running.begin() + static_cast<std::ptrdiff_t>(index));
}

IoResult Race::waitAndCollect(const WaitLimit &limit, Deadline nextStart)
{
    std::vector<pollfd> watched;
    for (const int descriptor : m_running)
        watched.push_back({descriptor, POLLOUT, 0});
    watched.push_back({});
    const IoResult waited = pollWithin(watched, limit, nextStart);
    if (waited != IoResult::Done)
        return waited;
    for (std::size_t i = m_running.size(); i-- > 0;) {
        if (watched[i].revents == 0)
            continue;
        int error = 0;
        socklen_t length = sizeof error;
        if (systemCalls().getsockopt(m_running[i], SOL_SOCKET, SO_ERROR, &error, &length) == 0 && error == 0) {
            win(i);
            return IoResult::Done;
        }
        systemCalls().close(m_running[i]);
        m_running.erase(m_running.begin() + static_cast<std::ptrdiff_t>(i));
    }
    return IoResult::Done;
}

} // namespace

IoResult connectStream(const std::string &host, std::uint16_t port, const WaitLimit &limit, StreamSocket &connected,
                       AddressOrder order)
{
    std::vector<Address> addresses;
    const IoResult resolved = resolve(host, port, limit, addresses);
    if (resolved != IoResult::Done)
        return resolved;
    if (order == AddressOrder::Ipv4First)
        std::stable_partition(addresses.begin(), addresses.end(),
                              [](const Address &address) { return address.storage.ss_family == AF_INET; });
    return Race(std::move(addresses)).run(limit, connected);
}

} // namespace kyvisa::os
