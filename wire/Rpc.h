#pragma once

#include "wire/Xdr.h"

#include <cstdint>

/**
 * ONC RPC version 2 messages (RFC 5531): the headers in front of a procedure's arguments and results. One message is one datagram, or
 * one record on a stream.
 *
 *     call:   xid | 0 | 2 | program | version | procedure | credential | verifier | arguments
 *     reply:  xid | 1 | 0 accepted | verifier | accept status | results, or the range of versions
 *             xid | 1 | 1 denied | 0 RPC version wrong | range, or 1 authentication | why
 *
 * A credential or verifier is a flavour and at most 400 bytes. Calls go out with AUTH_NONE; any flavour is accepted and not looked at.
 */
namespace wire::rpc
{

constexpr std::uint32_t RpcVersion = 2;
constexpr std::uint32_t MaxAuthLength = 400;
constexpr std::uint32_t NullProcedure = 0;

enum class AcceptStatus : std::uint32_t {
    Success = 0,
    ProgramUnavailable = 1,
    ProgramMismatch = 2, ///< with the lowest and highest version served
    ProcedureUnavailable = 3,
    GarbageArguments = 4,
    SystemError = 5,
};

enum class RejectStatus : std::uint32_t {
    RpcMismatch = 0, ///< with the lowest and highest RPC version
    AuthError = 1,   ///< with the reason
};

struct Call {
    std::uint32_t xid = 0;
    std::uint32_t program = 0;
    std::uint32_t version = 0;
    std::uint32_t procedure = 0;

    bool operator==(const Call &) const = default;
};

enum class CallForm {
    Good,           ///< the reader stands at the arguments
    OtherVersion,   ///< a call of another RPC version, only the xid is known: answer with denyVersion()
    NotACall,       ///< a reply, or shorter than a header: there is nothing to answer
    BadCredentials, ///< only the fields of Call are known: answer with denyAuthentication()
};

void encode(xdr::Writer &writer, const Call &call);
CallForm decode(xdr::Reader &reader, Call &call);

struct Reply {
    enum class Kind { Accepted, Denied };

    std::uint32_t xid = 0;
    Kind kind = Kind::Accepted;
    AcceptStatus accepted = AcceptStatus::Success;     ///< when accepted
    RejectStatus rejected = RejectStatus::RpcMismatch; ///< when denied
    std::uint32_t low = 0;                             ///< of ProgramMismatch and RpcMismatch
    std::uint32_t high = 0;
    std::uint32_t authStatus = 0; ///< of AuthError

    bool success() const { return kind == Kind::Accepted && accepted == AcceptStatus::Success; }
    bool operator==(const Reply &) const = default;
};

/// Writes the header of a reply. After a success the results follow.
void encode(xdr::Writer &writer, const Reply &reply);

/// False when the bytes are no reply. After true and a success the reader stands at the results.
bool decode(xdr::Reader &reader, Reply &reply);

Reply success(std::uint32_t xid);
Reply refuse(std::uint32_t xid, AcceptStatus status);
Reply refuseVersion(std::uint32_t xid, std::uint32_t low, std::uint32_t high);
Reply denyVersion(std::uint32_t xid);
Reply denyAuthentication(std::uint32_t xid);

} // namespace wire::rpc
