#pragma once

#include "kyvisa/os/StreamSocket.h"
#include "kyvisa/transport/ReceiveBuffer.h"
#include "wire/Rpc.h"
#include "wire/RpcRecord.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace kyvisa
{

/**
 * A connection to one ONC RPC program (RFC 5531): one call after the other.
 *
 *     auto arguments = client.begin(procedure);
 *     encode(arguments, ...);
 *     client.send(limit) && client.receive(reply, limit) && client.take(results, limit)
 *
 * Everything may stop at any byte when its limit ends it, and the next call goes on from there: what was not sent of a call
 * goes out before the next one, because the peer has its beginning; what was not read of a reply is skipped, and so is the
 * reply to a call that was given up. Replies are told apart by their transaction ids alone.
 *
 * Results go straight to where the caller wants them, whatever fragments they come in; nothing is allocated by a length from
 * the wire. A record that is no reply, or ends before its results do, ends the connection.
 */
class RpcClient
{
public:
    RpcClient(os::StreamSocket socket, std::uint32_t program, std::uint32_t version);

    bool isOpen() const { return m_socket.isOpen(); }
    void close() { m_socket.close(); }
    os::StreamSocket &socket() { return m_socket; }

    /// Starts the next call. Its arguments are written to what is returned, before send().
    wire::xdr::Writer begin(std::uint32_t procedure);
    /// Sends the call in one go, with @p data and its padding behind the arguments.
    os::IoResult send(const os::WaitLimit &limit, std::span<const std::byte> data = {});
    /// Waits for the reply to the call that was sent last. Its results follow.
    os::IoResult receive(wire::rpc::Reply &reply, const os::WaitLimit &limit);
    /// Moves exactly @p to.size() bytes of the results. The count is right also when it ends early.
    os::Transfer take(std::span<std::byte> to, const os::WaitLimit &limit);

    /// The peer has a whole call that it has not answered yet.
    bool awaitsReply() const { return m_awaitsReply; }

private:
    enum class Stage { Header, Results }; ///< of the reply that comes or came last

    os::IoResult sendRest(const os::WaitLimit &limit);
    void keepUnsent(std::span<const iovec> pieces);
    os::IoResult nextMark(const os::WaitLimit &limit);
    os::Transfer takeSome(std::span<std::byte> to, const os::WaitLimit &limit);
    os::IoResult skipRecord(const os::WaitLimit &limit);
    os::IoResult fillHeader(std::size_t size, const os::WaitLimit &limit);
    os::IoResult receiveHeader(wire::rpc::Reply &reply, const os::WaitLimit &limit);
    os::IoResult broken();

    os::StreamSocket m_socket;
    const std::uint32_t m_program;
    const std::uint32_t m_version;
    std::uint32_t m_xid;
    bool m_awaitsReply = false;

    std::vector<std::byte> m_call;   ///< the call being made: mark, header, arguments
    std::vector<std::byte> m_unsent; ///< the end of an earlier call that stopped in the middle

    // The record being received. It is over when its last fragment has nothing left.
    ReceiveBuffer m_input;
    bool m_inRecord = false;
    bool m_lastFragment = false;
    std::size_t m_fragmentLeft = 0;
    unsigned m_emptyFragments = 0;
    std::array<std::byte, 24 + wire::rpc::MaxAuthLength + 8> m_header{}; ///< of the reply, as far as it has come
    std::size_t m_headerSize = 0;
    Stage m_stage = Stage::Header;
};

} // namespace kyvisa
