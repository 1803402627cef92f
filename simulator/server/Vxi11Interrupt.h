#pragma once

#include "simulator/server/Connection.h"
#include "wire/Vxi11.h"

#include <functional>
#include <memory>
#include <span>

namespace simulator
{

/**
 * The interrupt channel of VXI-11: a connection back to the controller, on which it is told of service requests. Nothing is answered there; what
 * controllers answer all the same is thrown away. A channel that breaks falls silent.
 */
class Vxi11Interrupt final : private Connection::Owner
{
public:
    /// Called once, from the loop: true when the controller has taken the connection.
    using Established = std::function<void(bool)>;

    Vxi11Interrupt(EventLoop &loop, const wire::vxi11::RemoteFunc &remote, Established established);
    ~Vxi11Interrupt();
    Vxi11Interrupt(const Vxi11Interrupt &) = delete;
    Vxi11Interrupt &operator=(const Vxi11Interrupt &) = delete;

    /// Tells the controller of a service request for the link that has this handle.
    void requestService(std::span<const std::byte> handle);

private:
    void connecting();
    void finish(bool established);

    void received() override;
    void closed() override;

    EventLoop &m_loop;
    const wire::vxi11::RemoteFunc m_remote;
    Established m_established;
    FileDescriptor m_socket; ///< until it is connected
    EventLoop::WatchId m_watch = 0;
    Timers::Id m_timer = Timers::None;
    std::unique_ptr<Connection> m_connection;
    std::uint32_t m_xid = 0;
};

} // namespace simulator
