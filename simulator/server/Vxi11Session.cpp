#include "simulator/server/Vxi11Session.h"

#include <netinet/in.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <utility>

namespace simulator
{

using namespace wire;
using vxi11::Error;
using vxi11::Procedure;

namespace
{

constexpr std::array<RpcProgram, 2> Programs{
    {{vxi11::CoreProgram, vxi11::Version}, {vxi11::AbortProgram, vxi11::Version}}};

// Longer than any write that is taken, so that one that is too long can be refused by its error and not by silence.
constexpr std::size_t MaxCall = 4 * 1024 * 1024;
// What a client gets in one reply, however much it asks for.
constexpr std::size_t MaxReadSize = 1024 * 1024;

// In the results of device_read, where error, reason and the data's length come before the data.
constexpr std::size_t ReadHeadSize = 12;
constexpr std::size_t ReasonLastByte = 7;

constexpr std::uint32_t LoopbackNet = 127;

/// The client's IPv4 address; that of an IPv6 client on this machine is the loopback's.
std::uint32_t peerAddress(int socket)
{
    union {
        sockaddr any;
        sockaddr_in v4;
        sockaddr_in6 v6;
    } name{};
    socklen_t length = sizeof name;
    if (::getpeername(socket, &name.any, &length) != 0)
        return 0;
    if (name.any.sa_family == AF_INET)
        return ntohl(name.v4.sin_addr.s_addr);
    return name.any.sa_family == AF_INET6 && IN6_IS_ADDR_LOOPBACK(&name.v6.sin6_addr) ? INADDR_LOOPBACK : 0;
}

} // namespace

Vxi11Session::Vxi11Session(Vxi11Server &server, FileDescriptor socket, std::uint64_t number)
    : m_server(server), m_number(number), m_peer(peerAddress(socket.get())), m_name(peerOf(socket)),
      m_connection(server.loop(), std::move(socket), Programs, MaxCall, *this)
{
    m_connection.setFaults(server.faults());
}

Vxi11Session::~Vxi11Session()
{
    m_server.loop().cancel(m_timer);
}

void Vxi11Session::closed()
{
    endPending();
    m_interrupt.reset();
    m_server.forget(*this);
}

// ---- calls

void Vxi11Session::called(const rpc::Call &call, xdr::Reader arguments)
{
    bool understood = false;
    if (call.program == vxi11::AbortProgram) {
        if (call.procedure != vxi11::DeviceAbort)
            return m_connection.refuse(rpc::AcceptStatus::ProcedureUnavailable);
        understood = abortCall(arguments);
    } else {
        constexpr std::array<std::uint32_t, 15> Known{10, 11, 12, 13, 14, 15, 16, 17, 18, 19, 20, 22, 23, 25, 26};
        if (std::find(Known.begin(), Known.end(), call.procedure) == Known.end())
            return m_connection.refuse(rpc::AcceptStatus::ProcedureUnavailable);
        m_pending = Pending{static_cast<Procedure>(call.procedure), nullptr, 0, 0, 0, {}, {}, {}, false, false};
        understood = core(m_pending->procedure, arguments);
    }
    if (!understood) {
        endPending();
        m_connection.refuse(rpc::AcceptStatus::GarbageArguments);
    }
}

bool Vxi11Session::core(Procedure procedure, xdr::Reader &arguments)
{
    switch (procedure) {
    case Procedure::CreateLink:
        return createLink(arguments);
    case Procedure::DeviceWrite:
        return write(arguments);
    case Procedure::DeviceRead:
        return read(arguments);
    case Procedure::DeviceReadStb:
    case Procedure::DeviceTrigger:
    case Procedure::DeviceClear:
    case Procedure::DeviceRemote:
    case Procedure::DeviceLocal:
        return generic(arguments);
    case Procedure::DeviceLock:
        return lock(arguments);
    case Procedure::DeviceUnlock:
        return unlock(arguments);
    case Procedure::DeviceEnableSrq:
        return enableSrq(arguments);
    case Procedure::DeviceDocmd:
        return docmd(arguments);
    case Procedure::DestroyLink:
        return destroyLink(arguments);
    case Procedure::CreateIntrChan:
        return createInterrupt(arguments);
    case Procedure::DestroyIntrChan:
        return destroyInterrupt();
    }
    return false;
}

bool Vxi11Session::createLink(xdr::Reader &arguments)
{
    vxi11::CreateLinkCall call;
    if (!vxi11::decode(arguments, call))
        return false;
    Vxi11Target *target = nullptr;
    if (const Error error = m_server.find(call.device, target); error != Error::NoError)
        return finish(error), true;
    m_pending->link = m_server.createLink(*this, *target, call.device, m_name);
    if (!m_pending->link)
        return finish(Error::OutOfResources), true;
    if (call.lockDevice)
        requestLock(call.lockTimeout);
    else
        answer(vxi11::CreateLinkResult{Error::NoError, m_pending->link->id, m_server.port(), Vxi11Server::MaxRecvSize});
    return true;
}

bool Vxi11Session::write(xdr::Reader &arguments)
{
    vxi11::WriteCall call;
    if (!vxi11::decode(arguments, call))
        return false;
    m_pending->link = ownLink(call.link);
    m_pending->flags = call.flags;
    m_pending->lockTimeout = call.lockTimeout;
    m_pending->ioTimeout = call.ioTimeout;
    m_pending->data = call.data;
    if (!m_pending->link)
        finish(Error::InvalidLink);
    else if (call.data.size() > Vxi11Server::MaxRecvSize)
        finish(Error::Parameter);
    else
        attempt();
    return true;
}

bool Vxi11Session::read(xdr::Reader &arguments)
{
    vxi11::ReadCall &call = m_pending->read;
    if (!vxi11::decode(arguments, call))
        return false;
    m_pending->link = ownLink(call.link);
    m_pending->flags = call.flags;
    m_pending->lockTimeout = call.lockTimeout;
    m_pending->ioTimeout = call.ioTimeout;
    if (!m_pending->link)
        finish(Error::InvalidLink);
    else
        attempt();
    return true;
}

bool Vxi11Session::generic(xdr::Reader &arguments)
{
    vxi11::GenericCall call;
    if (!vxi11::decode(arguments, call))
        return false;
    m_pending->link = ownLink(call.link);
    m_pending->flags = call.flags;
    m_pending->lockTimeout = call.lockTimeout;
    m_pending->ioTimeout = call.ioTimeout;
    if (!m_pending->link)
        finish(Error::InvalidLink);
    else
        attempt();
    return true;
}

bool Vxi11Session::lock(xdr::Reader &arguments)
{
    vxi11::LockCall call;
    if (!vxi11::decode(arguments, call))
        return false;
    m_pending->link = ownLink(call.link);
    if (!m_pending->link)
        finish(Error::InvalidLink);
    else
        requestLock((call.flags & vxi11::FlagWaitLock) != 0 ? call.lockTimeout : 0);
    return true;
}

bool Vxi11Session::unlock(xdr::Reader &arguments)
{
    vxi11::Link call;
    if (!vxi11::decode(arguments, call))
        return false;
    Vxi11Link *link = ownLink(call.link);
    if (!link)
        return finish(Error::InvalidLink), true;
    const LockTable::Released released = link->target->locks().release(link->lockOwner);
    m_pending->link = link; // not before: those who waited for the lock look at what is pending
    finish(released == LockTable::Released::Nothing ? Error::NoLockHeld : Error::NoError);
    return true;
}

bool Vxi11Session::enableSrq(xdr::Reader &arguments)
{
    vxi11::EnableSrqCall call;
    if (!vxi11::decode(arguments, call))
        return false;
    Vxi11Link *link = ownLink(call.link);
    if (!link)
        return finish(Error::InvalidLink), true;
    link->serviceRequests = call.enable;
    link->handle.assign(call.handle.begin(), call.handle.end());
    m_pending->link = link;
    finish(Error::NoError);
    return true;
}

bool Vxi11Session::docmd(xdr::Reader &arguments)
{
    vxi11::DocmdCall call;
    if (!vxi11::decode(arguments, call))
        return false;
    m_pending->link = ownLink(call.link);
    m_pending->flags = call.flags;
    m_pending->lockTimeout = call.lockTimeout;
    m_pending->ioTimeout = call.ioTimeout;
    m_pending->command = call;
    if (!m_pending->link)
        finish(Error::InvalidLink);
    else
        attempt();
    return true;
}

bool Vxi11Session::destroyLink(xdr::Reader &arguments)
{
    vxi11::Link call;
    if (!vxi11::decode(arguments, call))
        return false;
    const Vxi11Link *link = ownLink(call.link);
    if (link)
        m_server.destroyLink(*link);
    finish(link ? Error::NoError : Error::InvalidLink);
    return true;
}

bool Vxi11Session::createInterrupt(xdr::Reader &arguments)
{
    vxi11::RemoteFunc remote;
    if (!vxi11::decode(arguments, remote))
        return false;
    if (m_interrupt)
        finish(Error::ChannelEstablished);
    else if (remote.family != static_cast<std::uint32_t>(vxi11::Family::Tcp))
        finish(Error::NotSupported);
    else if (remote.hostPort == 0 || remote.hostPort > UINT16_MAX)
        finish(Error::Parameter);
    else if (!mayConnectTo(remote))
        finish(Error::InvalidAddress);
    else
        m_interrupt = std::make_unique<Vxi11Interrupt>(m_server.loop(), remote, [this](bool established) {
            if (!established)
                m_interrupt.reset();
            finish(established ? Error::NoError : Error::ChannelNotEstablished);
        });
    return true;
}

bool Vxi11Session::destroyInterrupt()
{
    const bool existed = m_interrupt != nullptr;
    m_interrupt.reset();
    finish(existed ? Error::NoError : Error::ChannelNotEstablished);
    return true;
}

bool Vxi11Session::abortCall(xdr::Reader &arguments)
{
    vxi11::Link call;
    if (!vxi11::decode(arguments, call))
        return false;
    const Vxi11Link *link = m_server.findLink(call.link);
    if (link)
        link->session->abort(call.link);
    answer(vxi11::ErrorResult{link ? Error::NoError : Error::InvalidLink});
    return true;
}

// ---- what they have in common

FaultProtocol Vxi11Session::protocol() const
{
    return m_server.protocolOf(m_pending && m_pending->link ? m_pending->link->target : nullptr);
}

Vxi11Link *Vxi11Session::ownLink(vxi11::LinkId id)
{
    Vxi11Link *link = m_server.findLink(id);
    return link && link->session == this ? link : nullptr;
}

/// The client itself and nobody else: a stranger's port is not for us to connect to on somebody's word.
bool Vxi11Session::mayConnectTo(const vxi11::RemoteFunc &remote) const
{
    const bool bothHere = m_peer >> 24 == LoopbackNet && remote.hostAddress >> 24 == LoopbackNet;
    return bothHere || (m_peer != 0 && m_peer == remote.hostAddress);
}

void Vxi11Session::retry()
{
    if (m_pending && m_pending->link && m_pending->procedure != Procedure::CreateLink &&
        m_pending->procedure != Procedure::DeviceLock)
        attempt();
}

void Vxi11Session::attempt()
{
    Vxi11Target &target = *m_pending->link->target;
    if (!m_pending->passedLock) {
        if (!target.locks().allows(m_pending->link->lockOwner))
            return waitFor(false, (m_pending->flags & vxi11::FlagWaitLock) != 0 ? m_pending->lockTimeout : 0);
        m_pending->passedLock = true;
        m_server.loop().cancel(std::exchange(m_timer, Timers::None));
        if (m_pending->procedure == Procedure::DeviceRead && m_pending->read.requestSize > 0)
            target.beginRead();
    }
    if (Vxi11Device *device = target.device())
        device->setTraffic(*m_pending->link->traffic);
    switch (m_pending->procedure) {
    case Procedure::DeviceWrite: {
        const xdr::Bytes data = m_pending->data;
        const std::optional<Error> error =
            data.empty() ? Error::NoError : target.write(data, (m_pending->flags & vxi11::FlagEnd) != 0);
        if (!error)
            return waitFor(false, m_pending->ioTimeout);
        return answer(
            vxi11::WriteResult{*error, static_cast<std::uint32_t>(*error == Error::NoError ? data.size() : 0)});
    }
    case Procedure::DeviceRead:
        return attemptRead();
    case Procedure::DeviceReadStb: {
        vxi11::ReadStbResult result = target.poll();
        if (result.error == Error::NoError)
            result.statusByte = m_server.faults().told(protocol(), result.statusByte);
        return answer(result);
    }
    case Procedure::DeviceTrigger: {
        const std::optional<Error> error = target.trigger();
        return error ? finish(*error) : waitFor(false, m_pending->ioTimeout);
    }
    case Procedure::DeviceClear:
        m_pending->link->traffic->event("device clear");
        return finish(target.clear());
    case Procedure::DeviceRemote:
        return finish(target.remote());
    case Procedure::DeviceLocal:
        return finish(target.local());
    case Procedure::DeviceDocmd: {
        std::vector<std::byte> data;
        const std::optional<Error> error = target.command(m_pending->command, data);
        return error ? answer(vxi11::DocmdResult{*error, data}) : waitFor(false, m_pending->ioTimeout);
    }
    default:
        return;
    }
}

void Vxi11Session::attemptRead()
{
    const vxi11::ReadCall &call = m_pending->read;
    const bool termination = (call.flags & vxi11::FlagTermCharSet) != 0;
    if (call.requestSize == 0)
        return answer(vxi11::ReadHead{Error::NoError, vxi11::ReasonRequestCount, 0});
    std::optional<Vxi11Target::Reading> reading =
        m_pending->link->target->read(std::min<std::size_t>(call.requestSize, MaxReadSize),
                                      termination ? std::optional{call.termChar} : std::nullopt);
    if (!reading)
        return waitFor(true, call.ioTimeout);
    if (reading->error != Error::NoError)
        return finish(reading->error);
    Vxi11Response::Piece piece = std::move(reading->piece);
    std::uint32_t reason = 0;
    if (piece.last)
        reason |= vxi11::ReasonEnd;
    if (piece.matched)
        reason |= vxi11::ReasonCharacter;
    if (piece.size == call.requestSize)
        reason |= vxi11::ReasonRequestCount;
    if (const std::size_t padding = xdr::padding(piece.size); padding > 0)
        piece.bytes.push_back({std::string(padding, '\0'), nullptr, {}});
    MessageForm content{FaultProtocol::Vxi11, true};
    content.payloadAt = ReadHeadSize;
    content.payloadSize = piece.size;
    if (piece.last) {
        content.end = EndMark::Byte;
        content.endAt = ReasonLastByte;
        content.openEnd = static_cast<std::uint8_t>(reason & ~std::uint32_t{vxi11::ReasonEnd});
    }
    answer(vxi11::ReadHead{Error::NoError, reason, static_cast<std::uint32_t>(piece.size)}, std::move(piece.bytes),
           content);
}

void Vxi11Session::waitFor(bool forAnswer, std::uint32_t milliseconds)
{
    const Error late = m_pending->passedLock ? Error::IoTimeout : Error::LockedByAnother;
    if (milliseconds == 0)
        return finish(late);
    if (m_timer == Timers::None)
        m_timer = m_server.loop().after(std::chrono::milliseconds{milliseconds}, [this, late] {
            m_timer = Timers::None;
            finish(late);
        });
    m_server.wait(*this, forAnswer ? m_pending->link->target : nullptr);
}

void Vxi11Session::requestLock(std::uint32_t milliseconds)
{
    if (m_server.faults().refusesLock(protocol()))
        return finish(Error::LockedByAnother);
    m_pending->link->target->locks().request(
        m_pending->link->lockOwner, {}, std::chrono::milliseconds{milliseconds}, [this](LockTable::Answer granted) {
            const bool creating = m_pending->procedure == Procedure::CreateLink;
            if (granted != LockTable::Answer::Granted)
                return finish(m_pending->aborted ? Error::Abort : Error::LockedByAnother);
            if (creating)
                answer(vxi11::CreateLinkResult{Error::NoError, m_pending->link->id, m_server.port(),
                                               Vxi11Server::MaxRecvSize});
            else
                finish(Error::NoError);
        });
}

void Vxi11Session::abort(vxi11::LinkId link)
{
    if (!m_pending || !m_pending->link || m_pending->link->id != link || m_pending->procedure == Procedure::CreateLink)
        return;
    m_pending->aborted = true;
    if (m_pending->procedure == Procedure::DeviceLock)
        m_pending->link->target->locks().endWait(m_pending->link->lockOwner);
    else
        finish(Error::Abort);
}

void Vxi11Session::requestService(std::span<const std::byte> handle, FaultProtocol protocol)
{
    if (!m_interrupt)
        return;
    for (unsigned left = m_server.faults().serviceRequests(protocol); left > 0; --left)
        m_interrupt->requestService(handle);
}

void Vxi11Session::finish(Error error)
{
    switch (m_pending->procedure) {
    case Procedure::CreateLink:
        if (m_pending->link)
            m_server.destroyLink(*std::exchange(m_pending->link, nullptr));
        return answer(vxi11::CreateLinkResult{error, 0, 0, 0});
    case Procedure::DeviceWrite:
        return answer(vxi11::WriteResult{error, 0});
    case Procedure::DeviceRead:
        return answer(vxi11::ReadResult{error, 0, {}});
    case Procedure::DeviceReadStb:
        return answer(vxi11::ReadStbResult{error, 0});
    case Procedure::DeviceDocmd:
        return answer(vxi11::DocmdResult{error, {}});
    default:
        return answer(vxi11::ErrorResult{error});
    }
}

template <typename Result>
void Vxi11Session::answer(const Result &result, std::vector<Outgoing> following, MessageForm content)
{
    m_buffer.clear();
    xdr::Writer writer(m_buffer);
    encode(writer, result);
    content.protocol = protocol();
    endPending();
    m_connection.succeed(m_buffer, std::move(following), content);
}

void Vxi11Session::endPending()
{
    m_pending.reset();
    m_server.loop().cancel(std::exchange(m_timer, Timers::None));
    m_server.endWait(*this);
}

} // namespace simulator
