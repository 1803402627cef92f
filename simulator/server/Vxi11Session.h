#pragma once

#include "simulator/server/RpcConnection.h"
#include "simulator/server/Vxi11Interrupt.h"
#include "simulator/server/Vxi11Server.h"

#include <memory>
#include <optional>
#include <span>

namespace simulator
{

/**
 * One connection of a VXI-11 client: its calls, its links, its interrupt channel.
 *
 * A call that cannot be answered at once, for a lock or for the instrument, stays as m_pending and is tried again by retry() until its
 * time is over: first the lock time-out with error 11, then the I/O time-out with error 15.
 */
class Vxi11Session final : private RpcConnection::Client
{
public:
    /// @p number: sessions count up.
    Vxi11Session(Vxi11Server &server, FileDescriptor socket, std::uint64_t number);
    ~Vxi11Session();
    Vxi11Session(const Vxi11Session &) = delete;
    Vxi11Session &operator=(const Vxi11Session &) = delete;

    std::uint64_t number() const { return m_number; }
    /// No call has come yet.
    bool isSilent() const { return !m_connection.hasCalled(); }
    /// Executes nothing any more: the server has forgotten it.
    void stop() { m_connection.stop(); }
    /// Something has changed that the pending call may have waited for.
    void retry();
    /// Ends the pending call on this link with error 23, if there is one.
    void abort(wire::vxi11::LinkId link);
    void requestService(std::span<const std::byte> handle, FaultProtocol protocol);

private:
    struct Pending {
        wire::vxi11::Procedure procedure;
        Vxi11Link *link = nullptr; ///< none for a call that concerns no link
        std::uint32_t flags = 0;
        std::uint32_t lockTimeout = 0;
        std::uint32_t ioTimeout = 0;
        wire::xdr::Bytes data; ///< of a write
        wire::vxi11::ReadCall read;
        wire::vxi11::DocmdCall command;
        bool passedLock = false; ///< from here on no lock matters, and the I/O time-out runs
        bool aborted = false;
    };

    void called(const wire::rpc::Call &call, wire::xdr::Reader arguments) override;
    void closed() override;

    /// False when the arguments do not make sense to a decoder.
    bool core(wire::vxi11::Procedure procedure, wire::xdr::Reader &arguments);
    bool createLink(wire::xdr::Reader &arguments);
    bool write(wire::xdr::Reader &arguments);
    bool read(wire::xdr::Reader &arguments);
    bool generic(wire::xdr::Reader &arguments);
    bool lock(wire::xdr::Reader &arguments);
    bool unlock(wire::xdr::Reader &arguments);
    bool enableSrq(wire::xdr::Reader &arguments);
    bool docmd(wire::xdr::Reader &arguments);
    bool destroyLink(wire::xdr::Reader &arguments);
    bool createInterrupt(wire::xdr::Reader &arguments);
    bool destroyInterrupt();
    bool abortCall(wire::xdr::Reader &arguments);

    /// Of the call that is under way.
    FaultProtocol protocol() const;
    Vxi11Link *ownLink(wire::vxi11::LinkId id);
    bool mayConnectTo(const wire::vxi11::RemoteFunc &remote) const;
    void attempt();
    void attemptRead();
    void waitFor(bool forAnswer, std::uint32_t milliseconds);
    void requestLock(std::uint32_t milliseconds);

    /// Ends the pending call with the kind of result that its procedure has and no other news than the error, or none.
    void finish(wire::vxi11::Error error);
    template <typename Result>
    void answer(const Result &result, std::vector<Outgoing> following = {},
                MessageForm content = {FaultProtocol::Vxi11});
    void endPending();

    Vxi11Server &m_server;
    const std::uint64_t m_number;
    const std::uint32_t m_peer; ///< IPv4 address of the client; 0 when it has another one
    const std::string m_name;   ///< of the client, for those who watch
    std::optional<Pending> m_pending;
    Timers::Id m_timer = Timers::None;
    std::unique_ptr<Vxi11Interrupt> m_interrupt;
    std::vector<std::byte> m_buffer; ///< of results, kept for its memory
    RpcConnection m_connection;
};

} // namespace simulator
