#include "simulator/server/Listener.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/epoll.h>
#include <sys/socket.h>

#include <cerrno>
#include <cstring>
#include <system_error>

namespace simulator
{
namespace
{

constexpr int Backlog = 128;
constexpr int AcceptsPerTurn = 16;
constexpr std::chrono::milliseconds PauseWithoutDescriptors{100};

union SocketAddress {
    sockaddr any;
    sockaddr_in v4;
    sockaddr_in6 v6;
};

[[noreturn]] void fail(const char *what)
{
    throw std::system_error(errno, std::generic_category(), what);
}

socklen_t fill(SocketAddress &to, const ListenAddress &address, std::uint16_t port)
{
    std::memset(&to, 0, sizeof to);
    if (address.isIpv6()) {
        to.v6.sin6_family = AF_INET6;
        to.v6.sin6_port = htons(port);
        if (::inet_pton(AF_INET6, address.text.c_str(), &to.v6.sin6_addr) != 1)
            throw std::system_error(EINVAL, std::generic_category(), address.text);
        return sizeof to.v6;
    }
    to.v4.sin_family = AF_INET;
    to.v4.sin_port = htons(port);
    if (::inet_pton(AF_INET, address.text.c_str(), &to.v4.sin_addr) != 1)
        throw std::system_error(EINVAL, std::generic_category(), address.text);
    return sizeof to.v4;
}

} // namespace

bool ListenAddress::isLoopback() const
{
    return text == "::1" || text.starts_with("127.");
}

Listener::Listener(EventLoop &loop, const ListenAddress &address, std::uint16_t port, Accepted accepted)
    : m_loop(loop), m_accepted(std::move(accepted))
{
    SocketAddress name;
    socklen_t length = fill(name, address, port);
    m_socket = FileDescriptor(::socket(name.any.sa_family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!m_socket)
        fail("socket");
    const int on = 1;
    ::setsockopt(m_socket.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    // Each family is asked for by its own address.
    if (address.isIpv6())
        ::setsockopt(m_socket.get(), IPPROTO_IPV6, IPV6_V6ONLY, &on, sizeof on);
    if (::bind(m_socket.get(), &name.any, length) < 0)
        fail("bind");
    if (::listen(m_socket.get(), Backlog) < 0)
        fail("listen");
    length = sizeof name;
    if (::getsockname(m_socket.get(), &name.any, &length) < 0)
        fail("getsockname");
    m_port = ntohs(address.isIpv6() ? name.v6.sin6_port : name.v4.sin_port);
    watch();
}

Listener::~Listener()
{
    m_loop.cancel(m_pause);
    m_loop.remove(m_watch);
}

void Listener::watch()
{
    m_watch = m_loop.watch(m_socket.get(), EPOLLIN, [this](std::uint32_t) { accept(); });
}

void Listener::accept()
{
    for (int i = 0; i < AcceptsPerTurn; ++i) {
        FileDescriptor socket(::accept4(m_socket.get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
        if (socket) {
            m_accepted(std::move(socket));
            continue;
        }
        if (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM) {
            // The connection stays in the backlog; without a pause the loop would spin on it.
            m_loop.remove(m_watch);
            m_pause = m_loop.after(PauseWithoutDescriptors, [this] { watch(); });
            return;
        }
        if (errno == EAGAIN || errno == EWOULDBLOCK)
            return;
    }
}

} // namespace simulator
