#include "simulator/Services.h"

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
      m_hislip(loop, m_instrument, {.reportUnread = options.reportUnread}), m_socket(loop, m_instrument)
{
    if (m_options.hislip)
        serve(
            "hislip", *m_options.hislip, [this](FileDescriptor socket) { m_hislip.accept(std::move(socket)); },
            [](std::uint16_t port) { return "hislip0," + std::to_string(port) + "::INSTR"; });
    if (m_options.socket)
        serve(
            "socket", *m_options.socket, [this](FileDescriptor socket) { m_socket.accept(std::move(socket)); },
            [](std::uint16_t port) { return std::to_string(port) + "::SOCKET"; });
}

void Services::serve(const std::string &name, std::uint16_t port, const Accept &accept, const Resource &resource)
{
    // All addresses use one port; a free one of the first may be taken on the next.
    for (int attempt = 1; attempt < AttemptsForFreePort; ++attempt)
        if (listenOnAll(name, port, accept, resource))
            return;
    throw std::runtime_error(name + ": found no port that is free on all addresses");
}

/// False when a port that was free on the first address is in use on another.
bool Services::listenOnAll(const std::string &name, std::uint16_t port, const Accept &accept, const Resource &resource)
{
    const bool anyPort = port == 0;
    std::vector<std::unique_ptr<Listener>> listeners;
    std::vector<std::string> lines;
    for (const ListenAddress &address : m_options.listen) {
        try {
            listeners.push_back(std::make_unique<Listener>(m_loop, address, port, accept));
        } catch (const std::system_error &error) {
            const bool inUse = error.code().value() == EADDRINUSE;
            if (inUse && anyPort && port != 0)
                return false;
            if (address.optional && !inUse)
                continue;
            throw std::runtime_error(name + ": cannot listen on " + address.text + " port " + std::to_string(port) +
                                     ": " + error.code().message());
        }
        port = listeners.back()->port();
        if (!address.optional)
            lines.push_back(name + " TCPIP::" + hostOf(address) + "::" + resource(port));
    }
    for (auto &listener : listeners)
        m_listeners.push_back(std::move(listener));
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
    for (const std::string &line : m_lines)
        out << line << '\n';
    out << "ready" << std::endl;
}

} // namespace simulator
