#pragma once

#include "simulator/instrument/Instrument.h"
#include "simulator/instrument/MessageExchange.h"
#include "simulator/server/Vxi11Response.h"

#include <cstdint>
#include <deque>
#include <functional>
#include <optional>
#include <span>
#include <vector>

namespace simulator
{

/**
 * The instrument behind one device name of VXI-11, or at one address of the bus: one message exchange, one output queue and one status byte,
 * however many links there are.
 *
 * Input that the exchange does not take now, because a command makes it wait, is kept up to InputCapacity: the write that brought it is
 * complete then, and when that is full the next one waits. An answer
 * goes to whoever waits for one before the next program message can end it.
 */
class Vxi11Device final : private MessageExchange::Client
{
public:
    static constexpr std::size_t InputCapacity = 1024 * 1024;

    /// None of them may call back.
    struct Events {
        std::function<void()> changed;   ///< there is an answer, or room
        std::function<bool()> isAwaited; ///< a client waits in a read
        std::function<void()> serviceRequest;
    };

    Vxi11Device(Instrument &instrument, Events events);
    ~Vxi11Device();

    Instrument &instrument() { return m_instrument; }
    /// What passes from here on is this client's.
    void setTraffic(TrafficLog::Client &client) { m_exchange.setTraffic(&client); }
    /// The client goes.
    void endTraffic(const TrafficLog::Client &client)
    {
        if (m_exchange.traffic() == &client)
            m_exchange.setTraffic(nullptr);
    }

    /// Room for another write.
    bool hasRoom() const { return m_backlogSize < InputCapacity; }
    /// At most InputCapacity bytes. @p end: END comes with the last one.
    void write(std::span<const std::byte> bytes, bool end);

    bool answerReady() const { return m_response.active(); }
    /// A client wants to read. Reports -420 when there is nothing to read, and nothing that will give it.
    void readBegins();
    Vxi11Response::Piece read(std::size_t most, std::optional<std::uint8_t> termination);

    /// A trigger would not overtake input.
    bool acceptsTrigger() const { return m_exchange.accepting() && m_backlog.empty(); }
    void trigger();
    void clear();
    /// A trigger behind the input that is there already.
    void triggerInOrder();
    std::uint8_t poll() { return m_exchange.poll(); }
    bool requestsService() const { return m_exchange.requestsService(); }

private:
    struct Input {
        std::vector<std::byte> bytes;
        bool end;
        bool trigger = false; ///< and nothing else
    };

    bool takes() const;
    bool take(std::span<const std::byte> &bytes, bool end);
    bool take(Input &input);
    void keep(Input input);
    void takeBacklogLater();
    void takeBacklog();
    void messageBegins();
    void fetchAnswer();
    void inputAccepted() override;

    Instrument &m_instrument;
    const Events m_events;
    MessageExchange m_exchange;
    Vxi11Response m_response;
    std::deque<Input> m_backlog;
    std::size_t m_backlogSize = 0;
    Timers::Id m_backlogTimer = Timers::None;
};

} // namespace simulator
