#pragma once

#include "simulator/Options.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/mdns/MdnsAnnouncer.h"
#include "simulator/server/HislipServer.h"
#include "simulator/server/HttpServer.h"
#include "simulator/server/Listener.h"
#include "simulator/server/PortmapRegistration.h"
#include "simulator/server/Portmapper.h"
#include "simulator/server/SerialServer.h"
#include "simulator/server/SocketServer.h"
#include "simulator/server/Vxi11Server.h"
#include "simulator/web/WebSite.h"

#include <iosfwd>
#include <map>
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

    TrafficLog &traffic() { return m_instrument.traffic; }
    /// One line a service, then "ready", to @p out; what the user should know besides to @p notes.
    void announce(std::ostream &out, std::ostream &notes) const;

private:
    using Accept = std::function<void(FileDescriptor)>;
    /// The line that announces a service on a host and port.
    using Line = std::function<std::string(const std::string &host, std::uint16_t port)>;
    /// How a service is offered besides TCP: the socket, and one that hears broadcasts, where there is one.
    using Datagrams = std::function<void(FileDescriptor socket, FileDescriptor broadcasts)>;
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
    /// Where another portmapper has the port. @p reason: why there is none of our own.
    void registerElsewhere(const std::string &reason);
    void serveSerial();
    void serveHttp();
    void announceByMdns();

    EventLoop &m_loop;
    const Options m_options;
    Instrument m_instrument;
    HislipServer m_hislip;
    SocketServer m_socket;
    Vxi11Server m_vxi11;
    Portmapper m_portmapper;
    std::unique_ptr<PortmapRegistration> m_registration;
    std::unique_ptr<SerialServer> m_serial;
    HttpServer m_http;
    std::optional<WebSite> m_site; ///< with --http
    std::unique_ptr<MdnsAnnouncer> m_mdns;
    std::map<std::string, std::uint16_t> m_ports; ///< by service
    std::vector<std::unique_ptr<Listener>> m_listeners;
    std::vector<std::string> m_lines;
    std::vector<std::string> m_notes;
};

} // namespace simulator
