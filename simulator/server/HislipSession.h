#pragma once

#include "simulator/instrument/Instrument.h"
#include "simulator/server/HislipChannel.h"
#include "simulator/server/HislipControl.h"
#include "simulator/server/HislipExchange.h"

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>

namespace simulator
{

/// How long a client may keep the server waiting.
struct HislipPatience {
    std::chrono::seconds introduction{10};     ///< from the connection to the first message
    std::chrono::seconds secondConnection{30}; ///< from the first connection to the second
    std::chrono::seconds clear{60};            ///< from the beginning of a device clear to its end
    std::chrono::seconds lastWords{2};         ///< to take what it is told before the end
};

struct HislipOptions {
    std::size_t maxSessions = 64;
    HislipPatience patience = {};
    /// Off for clients that never say that they have read a response (RMT-delivered): an unread one is then no error.
    bool reportUnread = true;
    /// The mode in which a session begins and that a device clear offers; the client's wish in the clear decides.
    bool preferOverlapped = false;
};

/**
 * A HiSLIP client (IVI-6.1): its two channels from the first connection to the last, and who deals with what arrives on them. HislipExchange has the program messages and
 * responses, HislipControl the locks; both exist from the second connection on. Device clear concerns all of it and is done here.
 *
 * The synchronous channel is held while another client's lock shuts this one out or a command makes it wait; what has arrived by then stays where it is. The
 * asynchronous channel is always served. A message there may refer to one on the synchronous channel, which has often arrived already: that
 * channel is looked at first.
 *
 * A session ends when either connection does. It is destroyed when both are closed.
 */
class HislipSession final : private HislipExchange::Owner
{
public:
    using Ended = std::function<void(HislipSession &)>;

    HislipSession(EventLoop &loop, Instrument &instrument, const HislipOptions &options, std::uint16_t id,
                  std::unique_ptr<Connection> connection, Ended ended);
    ~HislipSession();
    HislipSession(const HislipSession &) = delete;
    HislipSession &operator=(const HislipSession &) = delete;

    std::uint16_t id() const { return m_id; }
    bool hasEnded() const { return m_ended; }
    /// Looks at what came behind the introduction.
    void start() { receiveSync(); }
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
        void directReceived(std::size_t count) override;
        void drained() override;
        void closed() override;

        HislipSession &m_session;
        void (HislipSession::*m_receive)();
        bool m_open = true;
    };

    // HislipExchange::Owner
    bool mayBegin() const override { return m_control->allowed(); }
    void completed(std::uint32_t messageId) override { m_control->completed(messageId); }
    void resume() override { receiveSync(); }

    void receiveSync();
    bool syncMessage();
    void receiveAsync();
    void asyncMessage(const wire::hislip::Header &header, std::string_view payload);
    void statusQuery(const wire::hislip::Header &header);
    void maximumMessageSize(std::string_view payload);
    void deviceClear();
    void deviceClearComplete();
    bool isFlooded() const { return m_sync.isFlooded() || (m_async && m_async->isFlooded()); }
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
    TrafficLog::Client m_traffic;
    std::optional<HislipControl> m_control;
    std::optional<HislipExchange> m_exchange;
    bool m_ended = false;
    bool m_clearing = false; ///< between AsyncDeviceClear and DeviceClearComplete
    Timers::Id m_patience = Timers::None;
};

} // namespace simulator
