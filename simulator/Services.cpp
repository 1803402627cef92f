#include "simulator/Services.h"

#include "simulator/profile/ProfileModel.h"
#include "simulator/server/BoundSocket.h"
#include "simulator/web/FaultPage.h"
#include "wire/Vxi11.h"

#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <iostream>
#include <ostream>
#include <stdexcept>
#include <system_error>

namespace simulator
{
namespace
{

constexpr int AttemptsForFreePort = 16;

InstrumentOptions instrumentOptions(const Options &options)
{
    InstrumentOptions result;
    result.identification.firmware = KYVISA_VERSION;
    result.seed = options.seed;
    result.signedErrors = options.signedErrors;
    if (options.profile)
        applyProfile(*options.profile, result);
    result.maxMessage = options.maxMessage;
    // Unless told otherwise, the largest block that can be sent can be stored.
    result.massMemory = options.memory.value_or(std::max<std::uint64_t>(result.massMemory, options.maxMessage));
    return result;
}

HislipOptions hislipOptions(const Options &options)
{
    HislipOptions result{.maxSessions = options.maxClients,
                         .reportUnread = options.reportUnread,
                         .preferOverlapped = options.hislipOverlap};
    if (options.handshakeTimeout != 0)
        result.patience.introduction = result.patience.secondConnection =
            std::chrono::seconds{options.handshakeTimeout};
    return result;
}

/// How a client on this machine writes the address in a resource string.
std::string hostOf(const ListenAddress &address)
{
    if (address.text == "0.0.0.0")
        return "127.0.0.1";
    if (address.text == "::")
        return "[::1]";
    return address.isIpv6() ? "[" + address.text + "]" : address.text;
}

} // namespace

Services::Services(EventLoop &loop, const Options &options)
    : m_loop(loop), m_options(options), m_instrument(loop, instrumentOptions(options)),
      m_hislip(loop, m_instrument, hislipOptions(options)), m_socket(loop, m_instrument, options.maxClients),
      m_vxi11(loop, m_instrument, options.maxClients), m_portmapper(loop), m_http(loop)
{
    if (m_options.profile)
        installProfile(*m_options.profile, m_instrument);
    for (const FaultSpec &fault : m_options.faults)
        m_instrument.faults.add(fault);
    if (m_options.hislip)
        serve({"hislip",
               [this](FileDescriptor socket) { m_hislip.accept(std::move(socket)); },
               [](const std::string &host, std::uint16_t port) {
                   return "hislip TCPIP::" + host + "::hislip0," + std::to_string(port) + "::INSTR";
               },
               {}},
              *m_options.hislip);
    if (m_options.socket)
        serve({"socket",
               [this](FileDescriptor socket) { m_socket.accept(std::move(socket)); },
               [](const std::string &host, std::uint16_t port) {
                   return "socket TCPIP::" + host + "::" + std::to_string(port) + "::SOCKET";
               },
               {}},
              *m_options.socket);
    if (m_options.vxi11)
        serveVxi11();
    if (m_options.portmapper)
        servePortmapper();
    if (m_options.serial)
        serveSerial();
    if (m_options.http)
        serveHttp();
    if (m_options.mdns)
        announceByMdns();
    if (m_site)
        m_site->setStartLines(m_lines);
}

void Services::serveVxi11()
{
    using namespace wire;
    const std::uint16_t port =
        serve({"vxi11",
               [this](FileDescriptor socket) { m_vxi11.accept(std::move(socket)); },
               [](const std::string &host, std::uint16_t) { return "vxi11 TCPIP::" + host + "::inst0::INSTR"; },
               {}},
              *m_options.vxi11);
    m_vxi11.setPort(port);
    if (m_options.gateway) {
        m_vxi11.openGateway({m_instrument, m_options.refuseBusCommands});
        for (const ListenAddress &address : m_options.listen)
            if (!address.optional)
                m_lines.push_back("gpib TCPIP::" + hostOf(address) + "::gpib0,5::INSTR");
    }
    m_portmapper.add({vxi11::CoreProgram, vxi11::Version, portmap::Tcp, port});
    m_portmapper.add({vxi11::AbortProgram, vxi11::Version, portmap::Tcp, port});
}

void Services::servePortmapper()
{
    using namespace wire;
    const Service service{
        "portmapper", [this](FileDescriptor socket) { m_portmapper.accept(std::move(socket)); },
        [](const std::string &host, std::uint16_t port) { return "portmapper " + host + " " + std::to_string(port); },
        [this](FileDescriptor socket, FileDescriptor broadcasts) {
            m_portmapper.answerOn(std::move(socket), std::move(broadcasts));
        }};
    try {
        const std::uint16_t port = serve(service, *m_options.portmapper);
        m_portmapper.add({portmap::Program, portmap::Version, portmap::Tcp, port});
        m_portmapper.add({portmap::Program, portmap::Version, portmap::Udp, port});
    } catch (const std::runtime_error &error) {
        if (!m_options.portmapperIsOptional)
            throw;
        registerElsewhere(error.what());
    }
}

void Services::registerElsewhere(const std::string &reason)
{
    using namespace wire;
    using Outcome = PortmapRegistration::Outcome;
    m_registration = std::make_unique<PortmapRegistration>(*m_options.portmapper);
    Outcome outcome = Outcome::Done;
    for (const std::uint32_t program : {vxi11::CoreProgram, vxi11::AbortProgram})
        if (outcome == Outcome::Done)
            outcome = m_registration->add({program, vxi11::Version, portmap::Tcp, m_vxi11.port()});
    if (outcome == Outcome::Done) {
        m_ports["portmapper"] = *m_options.portmapper; // where clients ask all the same
        m_notes.push_back("portmapper: VXI-11 is registered with the one that has port " +
                          std::to_string(*m_options.portmapper) + " already");
        return;
    }
    m_registration.reset();
    std::string note = reason;
    if (outcome == Outcome::Refused)
        note += ", and the portmapper there does not register VXI-11";
    else if (outcome == Outcome::NoAnswer)
        note += ", and no portmapper answers there";
    m_notes.push_back(note + "; VXI-11 clients cannot ask for its port, which is " + std::to_string(m_vxi11.port()));
}

void Services::serveSerial()
{
    try {
        m_serial = std::make_unique<SerialServer>(m_loop, m_instrument);
    } catch (const std::system_error &error) {
        throw std::runtime_error(std::string("serial: ") + error.what());
    }
    m_lines.push_back("serial ASRL" + m_serial->port() + "::INSTR");
}

void Services::serveHttp()
{
    m_site.emplace(m_http, m_instrument);
    addFaultPage(*m_site, m_http, m_instrument.faults);
    serve({"http",
           [this](FileDescriptor socket) { m_http.accept(std::move(socket)); },
           [](const std::string &host, std::uint16_t port) {
               return "http http://" + host + ":" + std::to_string(port) + "/";
           },
           {}},
          *m_options.http);
}

void Services::announceByMdns()
{
    // VXI-11 is announced at its portmapper, which is where a client asks first.
    constexpr std::array<std::pair<const char *, const char *>, 5> Types = {{{"http", "_http"},
                                                                             {"http", "_lxi"},
                                                                             {"portmapper", "_vxi-11"},
                                                                             {"socket", "_scpi-raw"},
                                                                             {"hislip", "_hislip"}}};
    std::vector<MdnsService> services;
    for (const auto &[service, type] : Types)
        if (const auto port = m_ports.find(service); port != m_ports.end())
            services.push_back({type, port->second});
    if (services.empty()) {
        m_notes.emplace_back("mdns: there is no service to announce");
        return;
    }
    const auto told = [](const std::string &news) { std::cerr << "KyVisaSimulator: " + news + "\n"; };
    m_mdns = std::make_unique<MdnsAnnouncer>(m_loop, m_options.listen,
                                             MdnsRecords(m_instrument.identification(), std::move(services)), told);
    m_notes.insert(m_notes.end(), m_mdns->notes().begin(), m_mdns->notes().end());
    m_lines.push_back("mdns " + m_mdns->instance());
}

std::uint16_t Services::serve(const Service &service, std::uint16_t port)
{
    // All addresses use one port; a free one of the first may be taken on the next.
    for (int attempt = 1; attempt < AttemptsForFreePort; ++attempt) {
        std::uint16_t used = port;
        if (listenOnAll(service, used))
            return m_ports[service.name] = used;
    }
    throw std::runtime_error(service.name + ": found no port that is free on all addresses");
}

/// False when a port that was free on the first address is in use on another, or for datagrams.
bool Services::listenOnAll(const Service &service, std::uint16_t &port)
{
    const bool anyPort = port == 0;
    std::vector<std::unique_ptr<Listener>> listeners;
    std::vector<std::pair<FileDescriptor, FileDescriptor>> datagramSockets;
    std::vector<std::string> lines;
    for (const ListenAddress &address : m_options.listen) {
        try {
            auto listener = std::make_unique<Listener>(m_loop, address, port, service.accept);
            port = listener->port();
            if (service.datagrams) {
                FileDescriptor socket = bindSocket(address, SOCK_DGRAM, port);
                datagramSockets.emplace_back(std::move(socket), bindBroadcast(address, port));
            }
            listeners.push_back(std::move(listener));
        } catch (const std::system_error &error) {
            const bool inUse = error.code().value() == EADDRINUSE;
            if (inUse && anyPort && port != 0)
                return false;
            if (address.optional && !inUse)
                continue;
            throw std::runtime_error(service.name + ": cannot listen on " + address.text + " port " +
                                     std::to_string(port) + ": " + error.code().message());
        }
        if (!address.optional)
            lines.push_back(service.line(hostOf(address), port));
    }
    for (auto &listener : listeners)
        m_listeners.push_back(std::move(listener));
    for (auto &[socket, broadcasts] : datagramSockets)
        service.datagrams(std::move(socket), std::move(broadcasts));
    m_lines.insert(m_lines.end(), lines.begin(), lines.end());
    return true;
}

void noteExposure(const std::vector<ListenAddress> &addresses, std::ostream &notes)
{
    for (const ListenAddress &address : addresses)
        if (!address.isLoopback())
            notes << "KyVisaSimulator: listening on " << address.text << ": other machines can reach this instrument\n";
}

void Services::announce(std::ostream &out, std::ostream &notes) const
{
    noteExposure(m_options.listen, notes);
    for (const std::string &note : m_notes)
        notes << "KyVisaSimulator: " << note << std::endl;
    for (const std::string &line : m_lines)
        out << line << '\n';
    out << "ready" << std::endl;
}

} // namespace simulator
