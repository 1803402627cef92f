#pragma once

#include "simulator/fault/MessageForm.h"
#include "simulator/server/Connection.h"
#include "wire/Rpc.h"
#include "wire/RpcRecord.h"

#include <optional>
#include <span>

namespace simulator
{

/// A program that a server offers; each has one version here.
struct RpcProgram {
    std::uint32_t number;
    std::uint32_t version;
};

/// The reply to a call that concerns none of @p programs or cannot be understood, or is procedure 0, which does nothing. None: the
/// call is for the program's procedures. Nobody answers CallForm::NotACall.
std::optional<wire::rpc::Reply> replyWithoutProgram(wire::rpc::CallForm form, const wire::rpc::Call &call,
                                                    std::span<const RpcProgram> programs);

/**
 * One TCP connection that carries ONC RPC calls. They are handed on one at a time, the next when this one has been answered, which may be
 * later; what comes meanwhile stays where it is. A client that never reads its answers is not listened to any more.
 *
 * What is no call ends the connection: behind it no record can be trusted.
 */
class RpcConnection final : private Connection::Owner
{
public:
    class Client
    {
    public:
        /// Answer with succeed() or refuse(), now or later. @p arguments is valid until then.
        virtual void called(const wire::rpc::Call &call, wire::xdr::Reader arguments) = 0;
        /// The connection is gone, or its peer is while a call is under way. Destroy it later, not now.
        virtual void closed() = 0;

    protected:
        ~Client() = default;
    };

    /// @p limit: the longest call in bytes.
    RpcConnection(EventLoop &loop, FileDescriptor socket, std::span<const RpcProgram> programs, std::size_t limit,
                  Client &client);

    /// Hands on no call any more, nor the end: for a client that gives it up and destroys it later.
    void stop() { m_ended = true; }
    /// Every reply from now on goes past the faults first.
    void setFaults(Faults &faults) { m_faults = &faults; }

    /// Replies to the call that was handed on. @p following are results that come behind @p results. @p content is what they are to the
    /// faults, its offsets counted from the first of the results.
    void succeed(std::span<const std::byte> results, std::vector<Outgoing> following = {},
                 const MessageForm &content = {FaultProtocol::Vxi11});
    void refuse(wire::rpc::AcceptStatus status);
    /// True between called() and the reply.
    bool busy() const { return m_busy; }
    /// A first call has come.
    bool hasCalled() const { return m_hasCalled; }

private:
    void received() override;
    void drained() override { received(); }
    void closed() override { end(); }

    void takeCall();
    void reply(const wire::rpc::Reply &reply, std::span<const std::byte> results, std::vector<Outgoing> following,
               const MessageForm &content);
    void end();

    const std::span<const RpcProgram> m_programs;
    Client &m_client;
    Faults *m_faults = nullptr;
    wire::rpc::RecordReader m_reader;
    std::vector<std::byte> m_buffer; ///< of replies, kept for its memory
    std::uint32_t m_xid = 0;
    bool m_hasCalled = false;
    bool m_busy = false;
    bool m_receiving = false;
    bool m_ended = false;
    Connection m_connection;
};

} // namespace simulator
