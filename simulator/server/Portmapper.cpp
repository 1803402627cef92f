#include "simulator/server/Portmapper.h"

#include "simulator/server/RpcConnection.h"

#include <sys/epoll.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>

namespace simulator
{

using namespace wire;

namespace
{

constexpr std::array<RpcProgram, 1> Programs{{{portmap::Program, portmap::Version}}};
constexpr std::size_t MaxCall = 1024; // credentials and verifier take most of it
constexpr int DatagramsPerTurn = 32;

} // namespace

class Portmapper::Client final : RpcConnection::Client
{
public:
    Client(Portmapper &portmapper, FileDescriptor socket, std::uint64_t number)
        : m_number(number), m_portmapper(portmapper),
          m_connection(portmapper.m_loop, std::move(socket), Programs, MaxCall, *this)
    {
    }

private:
    void called(const rpc::Call &call, xdr::Reader arguments) override
    {
        std::vector<std::byte> results;
        xdr::Writer writer(results);
        const rpc::AcceptStatus status = m_portmapper.execute(call, arguments, writer);
        if (status == rpc::AcceptStatus::Success)
            m_connection.succeed(results);
        else
            m_connection.refuse(status);
    }

    void closed() override { m_portmapper.forget(m_number); }

    const std::uint64_t m_number;
    Portmapper &m_portmapper;
    RpcConnection m_connection;
};

Portmapper::Portmapper(EventLoop &loop) : m_loop(loop) {}

Portmapper::~Portmapper()
{
    for (const Datagrams &each : m_sockets)
        m_loop.remove(each.watch);
}

void Portmapper::accept(FileDescriptor socket)
{
    if (m_clients.size() >= MaxClients)
        forget(m_clients.begin()->first);
    const std::uint64_t number = ++m_lastClient;
    m_clients.emplace(number, std::make_shared<Client>(*this, std::move(socket), number));
}

void Portmapper::forget(std::uint64_t client)
{
    const auto found = m_clients.find(client);
    if (found == m_clients.end())
        return;
    m_loop.destroyLater(found->second);
    m_clients.erase(found);
}

void Portmapper::answerOn(FileDescriptor socket, FileDescriptor broadcasts)
{
    const int answerBy = socket.get();
    listenOn(std::move(socket), answerBy);
    if (broadcasts)
        listenOn(std::move(broadcasts), answerBy);
}

void Portmapper::listenOn(FileDescriptor socket, int answerBy)
{
    const int fd = socket.get();
    const EventLoop::WatchId watch =
        m_loop.watch(fd, EPOLLIN, [this, fd, answerBy](std::uint32_t) { datagrams(fd, answerBy); });
    m_sockets.push_back({std::move(socket), watch});
}

void Portmapper::datagrams(int socket, int answerBy)
{
    for (int i = 0; i < DatagramsPerTurn; ++i) {
        std::array<std::byte, MaxCall> buffer;
        sockaddr_storage from{};
        socklen_t length = sizeof from;
        auto *const sender = reinterpret_cast<sockaddr *>(&from);
        const ssize_t size = ::recvfrom(socket, buffer.data(), buffer.size(), 0, sender, &length);
        if (size < 0) {
            if (errno == EAGAIN || errno == EWOULDBLOCK)
                return;
            continue; // an earlier answer reached nobody
        }
        const std::vector<std::byte> reply = answer(std::span(buffer).first(static_cast<std::size_t>(size)));
        // An answer that cannot go out now is lost, as any datagram may be.
        if (!reply.empty())
            ::sendto(answerBy, reply.data(), reply.size(), MSG_NOSIGNAL, sender, length);
    }
}

std::vector<std::byte> Portmapper::answer(std::span<const std::byte> datagram) const
{
    xdr::Reader reader(datagram);
    rpc::Call call;
    const rpc::CallForm form = rpc::decode(reader, call);
    std::vector<std::byte> reply;
    if (form == rpc::CallForm::NotACall)
        return reply;
    xdr::Writer writer(reply);
    if (const std::optional<rpc::Reply> refusal = replyWithoutProgram(form, call, Programs)) {
        encode(writer, *refusal);
        return reply;
    }
    std::vector<std::byte> results;
    xdr::Writer resultWriter(results);
    const rpc::AcceptStatus status = execute(call, reader, resultWriter);
    // A call to be passed on is answered when it succeeds, and by silence otherwise (RFC 1833, section 3.2).
    if (call.procedure == static_cast<std::uint32_t>(portmap::Procedure::CallIt))
        return reply;
    encode(writer, rpc::refuse(call.xid, status));
    reply.insert(reply.end(), results.begin(), results.end());
    return reply;
}

rpc::AcceptStatus Portmapper::execute(const rpc::Call &call, xdr::Reader arguments, xdr::Writer &results) const
{
    portmap::Mapping mapping;
    switch (static_cast<portmap::Procedure>(call.procedure)) {
    case portmap::Procedure::Set:
    case portmap::Procedure::Unset:
        if (!portmap::decode(arguments, mapping))
            return rpc::AcceptStatus::GarbageArguments;
        portmap::encodeDone(results, false);
        return rpc::AcceptStatus::Success;
    case portmap::Procedure::GetPort: {
        if (!portmap::decode(arguments, mapping))
            return rpc::AcceptStatus::GarbageArguments;
        std::uint32_t port = 0;
        for (const portmap::Mapping &each : m_mappings)
            if (each.program == mapping.program && each.version == mapping.version && each.protocol == mapping.protocol)
                port = each.port;
        portmap::encodePort(results, static_cast<std::uint16_t>(port));
        return rpc::AcceptStatus::Success;
    }
    case portmap::Procedure::Dump:
        portmap::encodeList(results, m_mappings);
        return rpc::AcceptStatus::Success;
    default:
        return rpc::AcceptStatus::ProcedureUnavailable;
    }
}

} // namespace simulator
