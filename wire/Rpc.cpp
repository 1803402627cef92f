#include "Rpc.h"

namespace wire::rpc
{
namespace
{

constexpr std::uint32_t TypeCall = 0;
constexpr std::uint32_t TypeReply = 1;
constexpr std::uint32_t StatusAccepted = 0;
constexpr std::uint32_t StatusDenied = 1;
constexpr std::uint32_t AuthNone = 0;
constexpr std::uint32_t AuthBadCredentials = 1;

void encodeNoAuth(xdr::Writer &writer)
{
    writer.u32(AuthNone);
    writer.u32(0);
}

bool skipAuth(xdr::Reader &reader)
{
    reader.u32();
    reader.opaque(MaxAuthLength);
    return reader.ok();
}

} // namespace

void encode(xdr::Writer &writer, const Call &call)
{
    writer.u32s({call.xid, TypeCall, RpcVersion, call.program, call.version,
                 call.procedure, // then who asks, and the proof
                 AuthNone, 0, AuthNone, 0});
}

CallForm decode(xdr::Reader &reader, Call &call)
{
    call.xid = reader.u32();
    const std::uint32_t type = reader.u32();
    const std::uint32_t rpcVersion = reader.u32();
    if (!reader.ok() || type != TypeCall)
        return CallForm::NotACall;
    if (rpcVersion != RpcVersion)
        return CallForm::OtherVersion;
    call.program = reader.u32();
    call.version = reader.u32();
    call.procedure = reader.u32();
    if (!reader.ok())
        return CallForm::NotACall;
    return skipAuth(reader) && skipAuth(reader) ? CallForm::Good : CallForm::BadCredentials;
}

void encode(xdr::Writer &writer, const Reply &reply)
{
    writer.u32(reply.xid);
    writer.u32(TypeReply);
    if (reply.kind == Reply::Kind::Denied) {
        writer.u32(StatusDenied);
        writer.u32(static_cast<std::uint32_t>(reply.rejected));
        if (reply.rejected == RejectStatus::RpcMismatch) {
            writer.u32(reply.low);
            writer.u32(reply.high);
        } else {
            writer.u32(reply.authStatus);
        }
        return;
    }
    writer.u32(StatusAccepted);
    encodeNoAuth(writer);
    writer.u32(static_cast<std::uint32_t>(reply.accepted));
    if (reply.accepted == AcceptStatus::ProgramMismatch) {
        writer.u32(reply.low);
        writer.u32(reply.high);
    }
}

bool decode(xdr::Reader &reader, Reply &reply)
{
    reply = {};
    reply.xid = reader.u32();
    const std::uint32_t type = reader.u32();
    const std::uint32_t status = reader.u32();
    if (!reader.ok() || type != TypeReply || status > StatusDenied)
        return false;
    if (status == StatusDenied) {
        reply.kind = Reply::Kind::Denied;
        const std::uint32_t why = reader.u32();
        if (why > static_cast<std::uint32_t>(RejectStatus::AuthError))
            return false;
        reply.rejected = static_cast<RejectStatus>(why);
        if (reply.rejected == RejectStatus::RpcMismatch) {
            reply.low = reader.u32();
            reply.high = reader.u32();
        } else {
            reply.authStatus = reader.u32();
        }
        return reader.ok();
    }
    skipAuth(reader);
    const std::uint32_t accepted = reader.u32();
    if (accepted > static_cast<std::uint32_t>(AcceptStatus::SystemError))
        return false;
    reply.accepted = static_cast<AcceptStatus>(accepted);
    if (reply.accepted == AcceptStatus::ProgramMismatch) {
        reply.low = reader.u32();
        reply.high = reader.u32();
    }
    return reader.ok();
}

Reply success(std::uint32_t xid)
{
    Reply reply;
    reply.xid = xid;
    return reply;
}

Reply refuse(std::uint32_t xid, AcceptStatus status)
{
    Reply reply;
    reply.xid = xid;
    reply.accepted = status;
    return reply;
}

Reply refuseVersion(std::uint32_t xid, std::uint32_t low, std::uint32_t high)
{
    Reply reply = refuse(xid, AcceptStatus::ProgramMismatch);
    reply.low = low;
    reply.high = high;
    return reply;
}

Reply denyVersion(std::uint32_t xid)
{
    Reply reply;
    reply.xid = xid;
    reply.kind = Reply::Kind::Denied;
    reply.rejected = RejectStatus::RpcMismatch;
    reply.low = RpcVersion;
    reply.high = RpcVersion;
    return reply;
}

Reply denyAuthentication(std::uint32_t xid)
{
    Reply reply;
    reply.xid = xid;
    reply.kind = Reply::Kind::Denied;
    reply.rejected = RejectStatus::AuthError;
    reply.authStatus = AuthBadCredentials;
    return reply;
}

} // namespace wire::rpc
