#include "kyvisa/os/ListeningSocket.h"

#include "kyvisa/os/SystemCalls.h"

#include <atomic>
#include <cerrno>
#include <netinet/in.h>
#include <utility>

namespace kyvisa::os
{
namespace
{

constexpr int Backlog = 4;

/// Dynamic ports (RFC 6335) that the system does not give to outgoing connections as it comes configured.
constexpr std::uint16_t FirstSpare = 61000;
constexpr std::uint16_t Spares = 4536;

/// Binds to a port that the system chooses. A program that opens and closes thousands of sessions a second leaves none: each
/// closed connection keeps its own for a minute. The spare ones are left then.
bool bindAnywhere(int descriptor, sockaddr_in &name)
{
    static std::atomic<unsigned> turn{0}; // those that were used last come last
    const auto bindTo = [&](std::uint16_t port) {
        name.sin_port = htons(port);
        return systemCalls().bind(descriptor, reinterpret_cast<sockaddr *>(&name), sizeof name) == 0;
    };
    if (bindTo(0))
        return true;
    const int on = 1; // closed connections of an earlier listener are no obstacle; a listener that lives still is
    systemCalls().setsockopt(descriptor, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    for (unsigned i = 0; i < Spares && errno == EADDRINUSE; ++i)
        if (bindTo(static_cast<std::uint16_t>(FirstSpare + turn.fetch_add(1) % Spares)))
            return true;
    return false;
}

} // namespace

bool ListeningSocket::open(std::uint32_t address)
{
    close();
    m_descriptor = systemCalls().socket(AF_INET, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    if (m_descriptor < 0)
        return false;
    sockaddr_in name{};
    name.sin_family = AF_INET;
    name.sin_addr.s_addr = htonl(address);
    auto *generic = reinterpret_cast<sockaddr *>(&name);
    socklen_t length = sizeof name;
    if (!bindAnywhere(m_descriptor, name) || systemCalls().listen(m_descriptor, Backlog) != 0 ||
        ::getsockname(m_descriptor, generic, &length) != 0) {
        close();
        return false;
    }
    m_port = ntohs(name.sin_port);
    return true;
}

void ListeningSocket::close()
{
    if (m_descriptor >= 0)
        systemCalls().close(std::exchange(m_descriptor, -1));
}

StreamSocket ListeningSocket::accept()
{
    const int descriptor = systemCalls().accept4(m_descriptor, nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC);
    return descriptor < 0 ? StreamSocket() : StreamSocket(descriptor);
}

} // namespace kyvisa::os
