#include "kyvisa/os/ListeningSocket.h"

#include "kyvisa/os/SystemCalls.h"

#include <netinet/in.h>
#include <utility>

namespace kyvisa::os
{
namespace
{

constexpr int Backlog = 4;

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
    if (systemCalls().bind(m_descriptor, generic, length) != 0 || systemCalls().listen(m_descriptor, Backlog) != 0 ||
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
