#pragma once

#include "simulator/instrument/Instrument.h"
#include "simulator/instrument/MessageExchange.h"
#include "simulator/server/HislipChannel.h"
#include "simulator/server/HislipResponse.h"

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>

namespace simulator
{

struct HislipOptions {
    std::size_t maxSessions = 64;
    /// Off for clients that never say that they have read a response (RMT-delivered): an unread one is then no error.
    bool reportUnread = true;
};

/**
 * A HiSLIP client, synchronized mode (IVI-6.1): its two channels, its message exchange, its place in the lock table.
 *
 * The synchronous channel is held while another client's lock shuts this one out or a command makes it wait; what has arrived by then stays where it is. The
 * asynchronous channel is always served. A message there may refer to one on the synchronous channel, which has often arrived already: that
 * channel is looked at first.
 *
 * A session ends when either connection does. It is destroyed when both are closed.
 */
class HislipSession final : private MessageExchange::Client
{
public:
    using Ended = std::function<void(HislipSession &)>;

    HislipSession(EventLoop &loop, Instrument &instrument, const HislipOptions &options, std::uint16_t id,
                  std::unique_ptr<Connection> connection, Ended ended);
    ~HislipSession();
    HislipSession(const HislipSession &) = delete;
    HislipSession &operator=(const HislipSession &) = delete;

    std::uint16_t id() const { return m_id; }
    /// True until the second connection has come.
    bool wantsAsynchronous() const { return !m_async && !m_ended; }
    void setAsynchronous(std::unique_ptr<Connection> connection);
    /// Tells the client why, on both channels, and ends the session.
    void fatal(wire::hislip::FatalErrorCode code, std::string_view text);

private:
    /// A connection's owner that passes on to the session.
    struct Side final : Connection::Owner {
        Side(HislipSession &session, void (HislipSession::*receive)()) : m_session(session), m_receive(receive) {}
        void received() override { (m_session.*m_receive)(); }
        std::span<std::byte> directInput() override;
        void directReceived(std::size_t count) override { m_session.directReceived(count); }
        void drained() override { m_session.pump(); }
        void closed() override;

        HislipSession &m_session;
        void (HislipSession::*m_receive)();
        bool m_open = true;
    };

    // Synchronous channel.
    void receiveSync();
    bool syncMessage();
    bool data();
    bool trigger();
    bool mayBegin() const;
    void beginMessage(const wire::hislip::Header &header);
    void endMessage();
    std::span<std::byte> directInput();
    void directReceived(std::size_t count);
    void respond();
    void interrupted(std::uint32_t messageId);
    void pump();
    void inputAccepted() override;
    void deviceClearComplete();

    // Asynchronous channel.
    void receiveAsync();
    void asyncMessage(const wire::hislip::Header &header, std::string_view payload);
    void maximumMessageSize(std::string_view payload);
    void statusQuery(const wire::hislip::Header &header);
    void deviceClear();
    void lock(const wire::hislip::Header &header, std::string_view key);
    void unlock();
    void remoteLocal(std::uint8_t request);
    void runDeferred();
    bool isComplete(std::uint32_t messageId) const;
    void requestService(std::uint8_t statusByte);

    void refuse(HislipChannel &channel, wire::hislip::ErrorCode code, std::string_view text);
    void end();

    EventLoop &m_loop;
    Instrument &m_instrument;
    const HislipOptions &m_options;
    const std::uint16_t m_id;
    Ended m_whenEnded;

    Side m_syncSide;
    Side m_asyncSide;
    HislipChannel m_sync;
    std::optional<HislipChannel> m_async;
    std::optional<MessageExchange> m_exchange; ///< from the second connection on
    LockTable::Owner m_lockOwner = 0;
    bool m_ended = false;

    bool m_inData = false;     ///< the message that the synchronous channel shows has begun
    bool m_endSeen = false;    ///< and its END has reached the exchange
    std::uint32_t m_received;  ///< id of the last message that began
    std::uint32_t m_completed; ///< id of the last one that was dealt with
    bool m_responseExpected =
        false; ///< RMT-expected: a complete response was sent, and the client has not said that it has it

    HislipResponse m_response;
    std::size_t m_clientMessageSize;
    Timers::Id m_pumpTimer = Timers::None;

    bool m_clearing = false; ///< between AsyncDeviceClear and DeviceClearComplete
    Timers::Id m_patience = Timers::None;

    std::optional<std::uint32_t> m_unlockAfter;
    std::optional<std::pair<std::uint32_t, std::uint8_t>> m_remoteLocalAfter;
};

} // namespace simulator
