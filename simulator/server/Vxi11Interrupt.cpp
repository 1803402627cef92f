#include "simulator/server/Vxi11Interrupt.h"

#include "wire/Rpc.h"
#include "wire/RpcRecord.h"

#include <netinet/in.h>
#include <sys/epoll.h>
#include <sys/socket.h>

#include <cerrno>
#include <utility>

namespace simulator
{

using namespace wire;

namespace
{

constexpr std::chrono::seconds PatienceForConnection{5};
// A controller that does not read what it asked for misses requests; memory it gets no more of.
constexpr std::size_t EnoughUnsent = 64 * 1024;

} // namespace

Vxi11Interrupt::Vxi11Interrupt(EventLoop &loop, const vxi11::RemoteFunc &remote, Established established)
    : m_loop(loop), m_remote(remote), m_established(std::move(established)),
      m_socket(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0))
{
    sockaddr_in name{};
    name.sin_family = AF_INET;
    name.sin_port = htons(static_cast<std::uint16_t>(remote.hostPort));
    name.sin_addr.s_addr = htonl(remote.hostAddress);
    const bool started =
        m_socket && (::connect(m_socket.get(), reinterpret_cast<const sockaddr *>(&name), sizeof name) == 0 ||
                     errno == EINPROGRESS);
    if (!started) {
        m_timer = m_loop.after({}, [this] { finish(false); });
        return;
    }
    m_timer = m_loop.after(PatienceForConnection, [this] { finish(false); });
    m_watch = m_loop.watch(m_socket.get(), EPOLLOUT, [this](std::uint32_t) { connecting(); });
}

Vxi11Interrupt::~Vxi11Interrupt()
{
    m_loop.cancel(m_timer);
    if (m_watch != 0)
        m_loop.remove(m_watch);
}

void Vxi11Interrupt::connecting()
{
    int error = 0;
    socklen_t length = sizeof error;
    const bool connected = ::getsockopt(m_socket.get(), SOL_SOCKET, SO_ERROR, &error, &length) == 0 && error == 0;
    m_loop.remove(std::exchange(m_watch, 0));
    if (connected)
        m_connection =
            std::make_unique<Connection>(m_loop, std::move(m_socket), static_cast<Connection::Owner &>(*this));
    finish(connected);
}

void Vxi11Interrupt::finish(bool established)
{
    m_loop.cancel(std::exchange(m_timer, Timers::None));
    if (m_watch != 0)
        m_loop.remove(std::exchange(m_watch, 0));
    std::exchange(m_established, nullptr)(established); // may destroy this
}

void Vxi11Interrupt::requestService(std::span<const std::byte> handle)
{
    if (!m_connection || m_connection->unsent() > EnoughUnsent)
        return;
    std::vector<std::byte> buffer;
    xdr::Writer writer(buffer);
    const std::size_t begun = rpc::beginRecord(writer);
    rpc::encode(writer, rpc::Call{++m_xid, m_remote.program, m_remote.version, vxi11::DeviceIntrSrq});
    encode(writer, vxi11::IntrSrqCall{handle});
    rpc::finishRecord(writer, begun);
    m_connection->send(std::string{reinterpret_cast<const char *>(buffer.data()), buffer.size()});
}

void Vxi11Interrupt::closed()
{
    m_loop.destroyLater(std::shared_ptr<Connection>(std::move(m_connection)));
}

void Vxi11Interrupt::received()
{
    m_connection->consume(m_connection->input().size());
    if (m_connection->inputEnded())
        m_connection->closeAfterSending({});
}

} // namespace simulator
