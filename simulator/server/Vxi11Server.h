#pragma once

#include "simulator/instrument/LockTable.h"
#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"
#include "simulator/server/Vxi11Gateway.h"
#include "simulator/server/Vxi11Instrument.h"
#include "wire/Vxi11.h"

#include <map>
#include <memory>
#include <string_view>

namespace simulator
{

class Vxi11Session;

/// A client's way to a device. It belongs to the connection on which it was created and ends with it.
struct Vxi11Link {
    wire::vxi11::LinkId id;
    Vxi11Session *session;
    Vxi11Target *target;
    LockTable::Owner lockOwner;
    bool serviceRequests = false;
    std::vector<std::byte> handle; ///< that comes back with service requests
    std::unique_ptr<TrafficLog::Client> traffic;
};

/**
 * VXI-11: the core and the abort program, on one port. The device name is inst0, or none, or one of the gateway where there is one; all links
 * to a name share its Vxi11Target.
 *
 * A session is a connection; it executes one call after the other. Calls of different sessions that wait for an answer or a lock are
 * tried again, in the order in which they came, whenever something has changed. When there are too many connections, the oldest that has
 * never called gives way to a new one.
 */
class Vxi11Server
{
public:
    static constexpr std::size_t MaxLinks = 256;
    static constexpr std::size_t MaxDeviceName = 64;
    static constexpr std::uint32_t MaxRecvSize = Vxi11Device::InputCapacity;

    Vxi11Server(EventLoop &loop, Instrument &instrument, std::size_t maxClients);
    ~Vxi11Server();

    /// Adds the device names of a LAN/GPIB gateway.
    void openGateway(const Vxi11Gateway::Options &options);
    void accept(FileDescriptor socket);
    /// Where accept() gets its connections from: told to clients as the abort port.
    void setPort(std::uint16_t port) { m_port = port; }
    std::uint16_t port() const { return m_port; }

    // For sessions.
    EventLoop &loop() { return m_loop; }
    Faults &faults() { return m_faults; }
    /// Of which protocol the faults are that strike links to @p target.
    FaultProtocol protocolOf(const Vxi11Target *target) const
    {
        return target == nullptr || target == &m_instrument ? FaultProtocol::Vxi11 : FaultProtocol::Gpib;
    }
    /// What the device name leads to; another error than NoError when nothing.
    wire::vxi11::Error find(std::string_view device, Vxi11Target *&target);
    /// @p name: how the client is shown. None when there are too many.
    Vxi11Link *createLink(Vxi11Session &session, Vxi11Target &target, std::string_view device, const std::string &name);
    Vxi11Link *findLink(wire::vxi11::LinkId id);
    void destroyLink(const Vxi11Link &link);
    void destroyLinks(const Vxi11Session &session);
    /// The call of @p session waits; it is told to try again when something has changed.
    /// @p answerOf: the target whose answer it waits for, if it does.
    void wait(Vxi11Session &session, const Vxi11Target *answerOf);
    void endWait(Vxi11Session &session);
    void forget(Vxi11Session &session);

private:
    struct Waiting {
        Vxi11Session *session;
        const Vxi11Target *answerOf;
    };

    void changed();
    void retryAll();
    bool isAwaited(const Vxi11Target &target) const;
    void requestService(const Vxi11Target &target);

    EventLoop &m_loop;
    TrafficLog &m_traffic;
    Faults &m_faults;
    std::uint16_t m_port = 0;
    std::map<wire::vxi11::LinkId, Vxi11Link> m_links;
    wire::vxi11::LinkId m_nextLink = 0;
    std::vector<Waiting> m_waiting;
    Timers::Id m_retry = Timers::None;
    Vxi11Instrument m_instrument;
    std::unique_ptr<Vxi11Gateway> m_gateway;
    const std::size_t m_maxClients;
    std::map<std::uint64_t, std::shared_ptr<Vxi11Session>>
        m_sessions; ///< by their number, in the order in which they came
    std::uint64_t m_lastSession = 0;
};

} // namespace simulator
