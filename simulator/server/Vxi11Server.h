#pragma once

#include "simulator/instrument/LockTable.h"
#include "simulator/server/Vxi11Device.h"
#include "wire/Vxi11.h"

#include <map>
#include <memory>

namespace simulator
{

class Vxi11Session;

/// A client's way to the instrument. It belongs to the connection on which it was created and ends with it.
struct Vxi11Link {
    wire::vxi11::LinkId id;
    Vxi11Session *session;
    LockTable::Owner lockOwner;
    bool serviceRequests = false;
    std::vector<std::byte> handle; ///< that comes back with service requests
};

/**
 * VXI-11: the core and the abort program, on one port. The device name is inst0, or none; all links share the one Vxi11Device.
 *
 * A session is a connection; it executes one call after the other. Calls of different sessions that wait for an answer or a lock are
 * tried again, in the order in which they came, whenever something has changed.
 */
class Vxi11Server
{
public:
    static constexpr std::size_t MaxClients = 64;
    static constexpr std::size_t MaxLinks = 256;
    static constexpr std::uint32_t MaxRecvSize = Vxi11Device::InputCapacity;

    Vxi11Server(EventLoop &loop, Instrument &instrument);
    ~Vxi11Server();

    void accept(FileDescriptor socket);
    /// Where accept() gets its connections from: told to clients as the abort port.
    void setPort(std::uint16_t port) { m_port = port; }
    std::uint16_t port() const { return m_port; }

    // For sessions.
    EventLoop &loop() { return m_loop; }
    Vxi11Device &device() { return m_device; }
    /// None when there are too many.
    Vxi11Link *createLink(Vxi11Session &session);
    Vxi11Link *findLink(wire::vxi11::LinkId id);
    void destroyLink(const Vxi11Link &link);
    void destroyLinks(const Vxi11Session &session);
    /// The call of @p session waits; it is told to try again when something has changed.
    void wait(Vxi11Session &session, bool forAnswer);
    void endWait(Vxi11Session &session);
    void forget(Vxi11Session &session);

private:
    struct Waiting {
        Vxi11Session *session;
        bool forAnswer;
    };

    void changed();
    void retryAll();
    void requestService();

    EventLoop &m_loop;
    Instrument &m_instrument;
    std::uint16_t m_port = 0;
    std::map<wire::vxi11::LinkId, Vxi11Link> m_links;
    wire::vxi11::LinkId m_nextLink = 0;
    std::vector<Waiting> m_waiting;
    Timers::Id m_retry = Timers::None;
    Vxi11Device m_device;
    std::map<Vxi11Session *, std::shared_ptr<Vxi11Session>> m_sessions;
};

} // namespace simulator
