#include "kyvisa/transport/Vxi11Core.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/os/Connector.h"
#include "kyvisa/transport/IoStatus.h"
#include "kyvisa/transport/PortLookup.h"
#include "kyvisa/transport/Vxi11Abort.h"

#include <algorithm>

namespace kyvisa
{

using namespace wire;
using namespace wire::vxi11;
using os::IoResult;

namespace
{

/// A gateway was seen to answer 170 ms after the time that it was given.
constexpr std::chrono::milliseconds AnswerTime{1000};
/// For what must not keep a caller who has already been told to stop.
constexpr std::chrono::milliseconds Moment{500};
/// Some instruments take the time for a signed number.
constexpr std::uint32_t LongestDeviceTime = 0x7FFFFFFF;
/// Bus commands are answered by themselves, 128 bytes at most.
constexpr std::uint32_t LongestCommandAnswer = 4096;

ViStatus refusal(const rpc::Reply &reply)
{
    const bool unknown =
        reply.kind == rpc::Reply::Kind::Accepted && (reply.accepted == rpc::AcceptStatus::ProcedureUnavailable ||
                                                     reply.accepted == rpc::AcceptStatus::ProgramUnavailable);
    return unknown ? VI_ERROR_NSUP_OPER : VI_ERROR_IO;
}

} // namespace

Vxi11Core::Vxi11Core(os::StreamSocket socket, std::string host)
    : m_rpc(std::move(socket), CoreProgram, Version), m_host(std::move(host))
{
}

ViStatus Vxi11Core::connect(const ProgramAddress &address, const os::WaitLimit &limit, os::StreamSocket &socket)
{
    const IoResult connected = os::connectStream(address.host, address.port, limit, socket);
    if (connected == IoResult::Done)
        socket.setKeepAlive(true);
    return connectStatus(connected, limit);
}

std::uint32_t Vxi11Core::deviceTime(const os::WaitLimit &limit)
{
    return std::clamp(limit.deadline.visaTimeoutLeft(), 1u, LongestDeviceTime);
}

os::WaitLimit Vxi11Core::patience(const os::WaitLimit &limit)
{
    return {limit.deadline.later(AnswerTime), limit.wakeup};
}

/// An error of the instrument as a status. A link that it does not know any more is a lost connection.
ViStatus Vxi11Core::outcome(Error error)
{
    switch (error) {
    case Error::NoError:
        return VI_SUCCESS;
    case Error::InvalidLink:
        return lost();
    case Error::Parameter:
        return VI_ERROR_INV_SETUP;
    case Error::NotSupported:
        return VI_ERROR_NSUP_OPER;
    case Error::OutOfResources:
        return VI_ERROR_ALLOC;
    case Error::LockedByAnother:
        return VI_ERROR_RSRC_LOCKED;
    case Error::NoLockHeld:
        return VI_ERROR_SESN_NLOCKED;
    case Error::IoTimeout:
        return VI_ERROR_TMO;
    case Error::Abort:
        return VI_ERROR_ABORT;
    default:
        return VI_ERROR_IO;
    }
}

ViStatus Vxi11Core::lost()
{
    m_rpc.close();
    return VI_ERROR_CONN_LOST;
}

ViStatus Vxi11Core::ended(IoResult result, const os::WaitLimit &limit)
{
    if (result == IoResult::Closed)
        return lost();
    if (result == IoResult::Woken && m_rpc.awaitsReply())
        abortCall();
    return transferStatus(result, limit);
}

ViStatus Vxi11Core::transact(std::span<std::byte> results, std::span<const std::byte> data, const os::WaitLimit &limit)
{
    rpc::Reply reply;
    IoResult result = m_rpc.send(limit, data);
    if (result == IoResult::Done)
        result = m_rpc.receive(reply, limit);
    if (result == IoResult::Done && !reply.success())
        return refusal(reply);
    if (result == IoResult::Done)
        result = m_rpc.take(results, limit).result;
    return ended(result, limit);
}

void Vxi11Core::abortCall()
{
    const os::Wakeup nobody;
    const os::WaitLimit moment{os::Deadline::after(Moment), nobody};
    if (m_abortPort == 0 || !m_busyLink || !abortLink(m_host, m_abortPort, *m_busyLink, moment))
        return;
    // The call that was aborted is answered now, and nobody wants its answer.
    rpc::Reply reply;
    if (m_rpc.receive(reply, moment) == IoResult::Closed)
        m_rpc.close();
}

ViStatus Vxi11Core::createLink(const std::string &device, const os::WaitLimit &limit, CreateLinkResult &link)
{
    begin(Procedure::CreateLink, CreateLinkCall{0, false, 0, device});
    if (const ViStatus status = finish<16>(link, {}, limit); status < VI_SUCCESS)
        return status;
    switch (link.error) {
    case Error::NoError:
        break;
    case Error::Syntax:
    case Error::Parameter:
    case Error::InvalidAddress:
        return VI_ERROR_INV_RSRC_NAME;
    case Error::OutOfResources:
        return VI_ERROR_RSRC_BUSY;
    case Error::LockedByAnother:
        return VI_ERROR_RSRC_LOCKED;
    default:
        return VI_ERROR_RSRC_NFOUND;
    }
    m_abortPort = link.abortPort;
    return VI_SUCCESS;
}

void Vxi11Core::destroyLink(LinkId link)
{
    if (!m_rpc.isOpen())
        return;
    if (m_rpc.awaitsReply())
        abortCall(); // the instrument executes in order, and is not through with an earlier call
    const os::Wakeup nobody;
    call(Procedure::DestroyLink, Link{link}, {os::Deadline::after(Moment), nobody});
}

void Vxi11Core::giveBackLock(LinkId link)
{
    const os::Wakeup nobody;
    call(Procedure::DeviceUnlock, Link{link}, {os::Deadline::after(Moment), nobody});
}

ViStatus Vxi11Core::createInterruptChannel(const RemoteFunc &where, const os::WaitLimit &limit)
{
    begin(Procedure::CreateIntrChan, where);
    ErrorResult result;
    ViStatus status = finish<4>(result, {}, limit);
    if (status < VI_SUCCESS || result.error != Error::ChannelEstablished)
        return status < VI_SUCCESS ? status : outcome(result.error);
    // It leads to where an earlier attempt listened that was given up.
    if (status = call(Procedure::DestroyIntrChan, Nothing{}, limit); status < VI_SUCCESS)
        return status;
    return call(Procedure::CreateIntrChan, where, limit);
}

ViStatus Vxi11Core::write(const WriteCall &call, const os::WaitLimit &limit, std::size_t &taken)
{
    begin(Procedure::DeviceWrite, call);
    WriteResult result;
    const ViStatus status = finish<8>(result, call.data, patience(limit));
    if (status < VI_SUCCESS)
        return status;
    taken = std::min<std::size_t>(result.size, call.data.size());
    return outcome(result.error);
}

ViStatus Vxi11Core::read(const ReadCall &call, std::span<std::byte> room, const os::WaitLimit &limit,
                         std::size_t &count, std::uint32_t &reason)
{
    begin(Procedure::DeviceRead, call);
    const os::WaitLimit patient = patience(limit);
    ReadHead head;
    if (const ViStatus status = finish<ReadHead::Size>(head, {}, patient); status < VI_SUCCESS)
        return status;
    if (head.length > room.size())
        return lost(); // more than was asked for: this is not the answer to that call
    const os::Transfer got = m_rpc.take(room.first(head.length), patient);
    count = got.count;
    reason = head.reason;
    return got.result == IoResult::Done ? outcome(head.error) : ended(got.result, patient);
}

ViStatus Vxi11Core::readStatusByte(const GenericCall &call, const os::WaitLimit &limit, ViUInt16 &status)
{
    begin(Procedure::DeviceReadStb, call);
    ReadStbResult result;
    const ViStatus ended = finish<8>(result, {}, patience(limit));
    if (ended < VI_SUCCESS)
        return ended;
    if (result.error == Error::NoError)
        status = result.statusByte;
    return outcome(result.error);
}

ViStatus Vxi11Core::command(const DocmdCall &call, const os::WaitLimit &limit, std::vector<std::byte> &answer)
{
    begin(Procedure::DeviceDocmd, call);
    const os::WaitLimit patient = patience(limit);
    std::array<std::byte, 8> bytes{};
    if (const ViStatus status = transact(bytes, {}, patient); status < VI_SUCCESS)
        return status;
    xdr::Reader reader(bytes);
    const auto error = static_cast<Error>(reader.i32());
    const std::uint32_t length = reader.u32();
    if (length > LongestCommandAnswer)
        return lost();
    answer.resize(length);
    const os::Transfer got = m_rpc.take(answer, patient);
    return got.result == IoResult::Done ? outcome(error) : ended(got.result, patient);
}

} // namespace kyvisa
