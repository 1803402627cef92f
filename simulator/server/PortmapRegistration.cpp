#include "simulator/server/PortmapRegistration.h"

#include "simulator/server/FileDescriptor.h"
#include "wire/Rpc.h"
#include "wire/RpcRecord.h"

#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstddef>

namespace simulator
{

using namespace wire;
using portmap::Mapping;
using portmap::Procedure;

namespace
{

using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds Patience{1};
constexpr std::size_t MaxReply = 1024;

bool waitFor(int socket, short events, Clock::time_point deadline)
{
    for (;;) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now());
        pollfd state{socket, events, 0};
        const int ready = left.count() > 0 ? ::poll(&state, 1, static_cast<int>(left.count())) : 0;
        if (ready >= 0 || errno != EINTR)
            return ready == 1;
    }
}

/// A connection to a port of this machine. @p error: why there is none.
FileDescriptor connectTo(std::uint16_t port, Clock::time_point deadline, int &error)
{
    FileDescriptor connection(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    sockaddr_in name{};
    name.sin_family = AF_INET;
    name.sin_port = htons(port);
    name.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    error = 0;
    if (!connection || ::connect(connection.get(), reinterpret_cast<const sockaddr *>(&name), sizeof name) == 0)
        return connection;
    error = errno;
    if (error == EINPROGRESS) {
        error = ETIMEDOUT;
        socklen_t length = sizeof error;
        if (waitFor(connection.get(), POLLOUT, deadline))
            ::getsockopt(connection.get(), SOL_SOCKET, SO_ERROR, &error, &length);
    }
    if (error != 0)
        connection.reset();
    return connection;
}

/// Waits for the results of the call.
bool receiveReply(int socket, std::uint32_t xid, Clock::time_point deadline, std::vector<std::byte> &results)
{
    rpc::RecordReader record(MaxReply);
    while (record.state() == rpc::RecordReader::State::NeedMore) {
        // Byte by byte costs nothing here, and leaves nothing behind.
        std::array<std::byte, 1> piece;
        if (!waitFor(socket, POLLIN, deadline) || ::recv(socket, piece.data(), piece.size(), 0) <= 0)
            return false;
        record.feed(piece);
    }
    xdr::Reader reader(record.record());
    rpc::Reply reply;
    if (record.state() != rpc::RecordReader::State::Complete || !rpc::decode(reader, reply) || reply.xid != xid ||
        !reply.success())
        return false;
    results.assign(reader.rest().begin(), reader.rest().end());
    return true;
}

/// Calls a portmapper. False when it does not answer as one; @p error: why, as far as the system knows.
bool call(std::uint16_t portmapper, Procedure procedure, const Mapping &mapping, std::vector<std::byte> &results,
          int &error)
{
    constexpr std::uint32_t Xid = 1; // one call a connection
    const Clock::time_point deadline = Clock::now() + Patience;
    const FileDescriptor connection = connectTo(portmapper, deadline, error);
    if (!connection)
        return false;
    std::vector<std::byte> message;
    xdr::Writer writer(message);
    const std::size_t begun = rpc::beginRecord(writer);
    rpc::encode(writer, rpc::Call{Xid, portmap::Program, portmap::Version, static_cast<std::uint32_t>(procedure)});
    portmap::encode(writer, mapping);
    rpc::finishRecord(writer, begun);
    const ssize_t sent = ::send(connection.get(), message.data(), message.size(), MSG_NOSIGNAL);
    return sent == static_cast<ssize_t>(message.size()) && receiveReply(connection.get(), Xid, deadline, results);
}

} // namespace

PortmapRegistration::~PortmapRegistration()
{
    for (const Mapping &mapping : m_mappings) {
        std::vector<std::byte> results;
        int error = 0;
        call(m_portmapper, Procedure::Unset, {mapping.program, mapping.version, 0, 0}, results, error);
    }
}

PortmapRegistration::Outcome PortmapRegistration::add(const Mapping &mapping)
{
    Outcome outcome = set(mapping);
    if (outcome == Outcome::Refused && isLeftOver(mapping)) {
        std::vector<std::byte> results;
        int error = 0;
        call(m_portmapper, Procedure::Unset, {mapping.program, mapping.version, 0, 0}, results, error);
        outcome = set(mapping);
    }
    if (outcome == Outcome::Done)
        m_mappings.push_back(mapping);
    return outcome;
}

PortmapRegistration::Outcome PortmapRegistration::set(const Mapping &mapping)
{
    std::vector<std::byte> results;
    int error = 0;
    if (!call(m_portmapper, Procedure::Set, mapping, results, error))
        return error == ECONNREFUSED ? Outcome::Nobody : Outcome::NoAnswer;
    xdr::Reader reader(results);
    bool done = false;
    if (!portmap::decodeDone(reader, done))
        return Outcome::NoAnswer;
    return done ? Outcome::Done : Outcome::Refused;
}

bool PortmapRegistration::isLeftOver(const Mapping &mapping) const
{
    std::vector<std::byte> results;
    int error = 0;
    if (!call(m_portmapper, Procedure::GetPort, {mapping.program, mapping.version, mapping.protocol, 0}, results,
              error))
        return false;
    xdr::Reader reader(results);
    std::uint16_t port = 0;
    if (!portmap::decodePort(reader, port) || port == 0)
        return false;
    connectTo(port, Clock::now() + Patience, error);
    return error == ECONNREFUSED;
}

} // namespace simulator
