#pragma once

#include "simulator/instrument/Instrument.h"
#include "simulator/instrument/MessageExchange.h"
#include "simulator/server/HislipDelivery.h"
#include "simulator/server/HislipResponse.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

namespace simulator
{

class EventLoop;
class HislipChannel;

/**
 * The program messages of a HiSLIP client and their responses, in either mode (IVI-6.1): what passes on the synchronous channel, and the status byte
 * that depends on it.
 *
 * A message that has to wait stays in its channel, unfinished: for another client's lock, for a command that holds the input, and in overlapped
 * mode, where responses stand in line, for the one before its own to be sent. Owner::resume() says when to come again.
 */
class HislipExchange final : private MessageExchange::Client
{
public:
    class Owner
    {
    public:
        /// False while another client's lock shuts this one out.
        virtual bool mayBegin() const = 0;
        /// The message with this id was dealt with.
        virtual void completed(std::uint32_t messageId) = 0;
        /// What had to wait can go on.
        virtual void resume() = 0;

    protected:
        ~Owner() = default;
    };

    HislipExchange(EventLoop &loop, Instrument &instrument, HislipChannel &sync, HislipChannel &async, Owner &owner,
                   bool reportUnread);
    ~HislipExchange();
    HislipExchange(const HislipExchange &) = delete;
    HislipExchange &operator=(const HislipExchange &) = delete;

    void setTraffic(TrafficLog::Client &traffic) { m_exchange.setTraffic(&traffic); }
    bool overlapped() const { return m_delivery.overlapped(); }
    /// Counts ids anew, after the initialization and each device clear.
    void restart(bool overlapped);
    /// Largest payload of a message to the client.
    void setClientPayload(std::size_t bytes) { m_clientPayload = bytes; }

    /// Deals with the Data, DataEND or Trigger that the synchronous channel shows. False when it has to wait, or for more of its payload.
    bool data();
    bool trigger();
    std::span<std::byte> directInput();
    void directReceived(std::size_t count);
    /// Goes on sending a response.
    void pump();

    /// The status byte for a status query, which is a serial poll.
    std::uint8_t statusQuery(bool delivered, std::uint32_t messageId);
    /// Device clear: forgets the message that is coming in and all responses.
    void clear();
    /// The session has ended: as clear(), and nothing is sent any more.
    void stop();

private:
    bool mayBegin() const;
    void beginMessage();
    void endMessage();
    bool respond();
    std::optional<std::uint32_t> nextMessage() const;
    void interrupted(std::uint32_t messageId);
    void updateAvailable();
    void inputAccepted() override;
    void requestService(std::uint8_t statusByte);

    EventLoop &m_loop;
    Instrument &m_instrument;
    HislipChannel &m_sync;
    HislipChannel &m_async;
    Owner &m_owner;
    const bool m_reportUnread;
    MessageExchange m_exchange;
    HislipDelivery m_delivery;

    bool m_stopped = false;
    bool m_inData = false;  ///< the message that the synchronous channel shows has begun
    bool m_endSeen = false; ///< and its END has reached the exchange
    std::uint32_t m_received = wire::hislip::NothingSentId; ///< id of the last message that began

    HislipResponse m_response;
    std::size_t m_clientPayload;
    Timers::Id m_pumpTimer = Timers::None;
};

} // namespace simulator
