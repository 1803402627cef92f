#include "simulator/Services.h"

#include "simulator/server/BoundSocket.h"
#include "wire/Vxi11.h"

#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
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
    result.version = KYVISA_VERSION;
    result.maxMessage = options.maxMessage;
    // The largest block that can be sent can be stored.
    result.massMemory = std::max<std::uint64_t>(result.massMemory, options.maxMessage);
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
      m_hislip(loop, m_instrument, {.reportUnread = options.reportUnread}), m_socket(loop, m_instrument),
      m_vxi11(loop, m_instrument), m_portmapper(loop)
{
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
    m_portmapper.add({vxi11::CoreProgram, vxi11::Version, portmap::Tcp, port});
    m_portmapper.add({vxi11::AbortProgram, vxi11::Version, portmap::Tcp, port});
}

void Services::servePortmapper()
{
    using namespace wire;
    const Service service{
        "portmapper", [this](FileDescriptor socket) { m_portmapper.accept(std::move(socket)); },
        [](const std::string &host, std::uint16_t port) { return "portmapper " + host + " " + std::to_string(port); },
        [this](FileDescriptor socket) { m_portmapper.answerOn(std::move(socket)); }};
    try {
        const std::uint16_t port = serve(service, *m_options.portmapper);
        m_portmapper.add({portmap::Program, portmap::Version, portmap::Tcp, port});
        m_portmapper.add({portmap::Program, portmap::Version, portmap::Udp, port});
    } catch (const std::runtime_error &error) {
        if (!m_options.portmapperIsOptional)
            throw;
        m_notes.push_back(std::string(error.what()) + "; VXI-11 clients cannot ask for its port, which is " +
                          std::to_string(m_vxi11.port()));
    }
}

std::uint16_t Services::serve(const Service &service, std::uint16_t port)
{
    // All addresses use one port; a free one of the first may be taken on the next.
    for (int attempt = 1; attempt < AttemptsForFreePort; ++attempt) {
        std::uint16_t used = port;
        if (listenOnAll(service, used))
            return used;
    }
    throw std::runtime_error(service.name + ": found no port that is free on all addresses");
}

/// False when a port that was free on the first address is in use on another, or for datagrams.
bool Services::listenOnAll(const Service &service, std::uint16_t &port)
{
    const bool anyPort = port == 0;
    std::vector<std::unique_ptr<Listener>> listeners;
    std::vector<FileDescriptor> datagramSockets;
    std::vector<std::string> lines;
    for (const ListenAddress &address : m_options.listen) {
        try {
            auto listener = std::make_unique<Listener>(m_loop, address, port, service.accept);
            port = listener->port();
            if (service.datagrams)
                datagramSockets.push_back(bindSocket(address, SOCK_DGRAM, port));
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
    for (FileDescriptor &socket : datagramSockets)
        service.datagrams(std::move(socket));
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
