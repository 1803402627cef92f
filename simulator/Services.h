#pragma once

#include "simulator/Options.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/server/HislipServer.h"
#include "simulator/server/Listener.h"
#include "simulator/server/Portmapper.h"
#include "simulator/server/SocketServer.h"
#include "simulator/server/Vxi11Server.h"

#include <iosfwd>
#include <memory>
#include <string>
#include <vector>

namespace simulator
{

/// Says in one line for each address that other machines can reach that they can.
void noteExposure(const std::vector<ListenAddress> &addresses, std::ostream &notes);

/// The instrument and every way to it that the options ask for.
class Services
{
public:
    /// Throws std::runtime_error that names the address and port which cannot be had.
    Services(EventLoop &loop, const Options &options);

    /// One line a service, then "ready", to @p out; what the user should know besides to @p notes.
    void announce(std::ostream &out, std::ostream &notes) const;

private:
    using Accept = std::function<void(FileDescriptor)>;
    /// The line that announces a service on a host and port.
    using Line = std::function<std::string(const std::string &host, std::uint16_t port)>;
    /// How a service is offered besides TCP.
    using Datagrams = std::function<void(FileDescriptor)>;
    struct Service {
        std::string name;
        Accept accept;
        Line line;
        Datagrams datagrams;
    };

    /// Returns the port.
    std::uint16_t serve(const Service &service, std::uint16_t port);
    bool listenOnAll(const Service &service, std::uint16_t &port);
    void serveVxi11();
    void servePortmapper();

    EventLoop &m_loop;
    const Options m_options;
    Instrument m_instrument;
    HislipServer m_hislip;
    SocketServer m_socket;
    Vxi11Server m_vxi11;
    Portmapper m_portmapper;
    std::vector<std::unique_ptr<Listener>> m_listeners;
    std::vector<std::string> m_lines;
    std::vector<std::string> m_notes;
};

} // namespace simulator
