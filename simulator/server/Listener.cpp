#include "simulator/server/Listener.h"

#include "simulator/server/BoundSocket.h"

#include <sys/epoll.h>
#include <sys/socket.h>

#include <cerrno>
#include <system_error>

namespace simulator
{
namespace
{

constexpr int Backlog = 128;
constexpr int AcceptsPerTurn = 16;
constexpr std::chrono::milliseconds PauseWithoutDescriptors{100};

} // namespace

Listener::Listener(EventLoop &loop, const ListenAddress &address, std::uint16_t port, Accepted accepted)
    : m_loop(loop), m_accepted(std::move(accepted))
{
    m_socket = bindSocket(address, SOCK_STREAM, port);
    if (::listen(m_socket.get(), Backlog) < 0)
        throw std::system_error(errno, std::generic_category(), "listen");
    m_port = portOf(m_socket);
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
