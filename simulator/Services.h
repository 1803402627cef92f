#pragma once

#include "simulator/Options.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/server/HislipServer.h"
#include "simulator/server/Listener.h"
#include "simulator/server/SocketServer.h"

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
    /// Text between host and end of the resource string, for a port.
    using Resource = std::function<std::string(std::uint16_t port)>;

    void serve(const std::string &name, std::uint16_t port, const Accept &accept, const Resource &resource);
    bool listenOnAll(const std::string &name, std::uint16_t port, const Accept &accept, const Resource &resource);

    EventLoop &m_loop;
    const Options m_options;
    Instrument m_instrument;
    HislipServer m_hislip;
    SocketServer m_socket;
    std::vector<std::unique_ptr<Listener>> m_listeners;
    std::vector<std::string> m_lines;
};

} // namespace simulator
