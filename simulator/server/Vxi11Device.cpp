#include "simulator/server/Vxi11Device.h"

#include <utility>

namespace simulator
{

Vxi11Device::Vxi11Device(Instrument &instrument, Events events)
    : m_instrument(instrument), m_events(std::move(events)),
      m_exchange(instrument, *this, {true, false, [this](std::uint8_t) { m_events.serviceRequest(); }})
{
}

Vxi11Device::~Vxi11Device()
{
    m_instrument.timers.cancel(m_backlogTimer);
}

void Vxi11Device::write(std::span<const std::byte> bytes, bool end)
{
    if (!m_backlog.empty() || !take(bytes, end))
        keep({{bytes.begin(), bytes.end()}, end});
}

bool Vxi11Device::takes() const
{
    return m_exchange.accepting() && !(m_response.active() && m_events.isAwaited());
}

/// False when bytes, or the end that follows them, are left over.
bool Vxi11Device::take(std::span<const std::byte> &bytes, bool end)
{
    while (!bytes.empty() && takes()) {
        messageBegins();
        m_exchange.receive(bytes);
        fetchAnswer();
    }
    if (!bytes.empty() || (end && !m_exchange.accepting()))
        return false;
    if (end) {
        m_exchange.end();
        fetchAnswer();
    }
    return true;
}

/// False when the input, or the rest of it that stays in @p input, has to wait.
bool Vxi11Device::take(Input &input)
{
    if (input.trigger) {
        if (!takes())
            return false;
        trigger();
        return true;
    }
    std::span<const std::byte> bytes = input.bytes;
    if (take(bytes, input.end))
        return true;
    input.bytes.erase(input.bytes.begin(), input.bytes.end() - static_cast<std::ptrdiff_t>(bytes.size()));
    return false;
}

void Vxi11Device::keep(Input input)
{
    m_backlogSize += sizeof(Input) + input.bytes.size();
    m_backlog.push_back(std::move(input));
    takeBacklogLater();
}

/// Later, so that whoever waits for an answer gets it first.
void Vxi11Device::takeBacklogLater()
{
    if (!m_backlog.empty() && m_exchange.accepting() && m_backlogTimer == Timers::None)
        m_backlogTimer = m_instrument.timers.after({}, [this] { takeBacklog(); });
}

void Vxi11Device::takeBacklog()
{
    m_backlogTimer = Timers::None;
    while (!m_backlog.empty()) {
        Input input = std::move(m_backlog.front());
        m_backlog.pop_front();
        m_backlogSize -= sizeof(Input) + input.bytes.size();
        if (take(input))
            continue;
        m_backlogSize += sizeof(Input) + input.bytes.size();
        m_backlog.push_front(std::move(input));
        break;
    }
    m_events.changed();
    takeBacklogLater();
}

/// The next byte may be the first of a program message: then an answer that was not read to its end is lost.
void Vxi11Device::messageBegins()
{
    if (m_exchange.inMessage() || !m_response.active())
        return;
    m_response.drop();
    m_exchange.interrupted();
}

void Vxi11Device::fetchAnswer()
{
    if (!m_exchange.output().isComplete())
        return;
    m_response.begin(m_exchange.output().take());
    m_exchange.setMessageAvailable(true);
    m_events.changed();
}

void Vxi11Device::inputAccepted()
{
    fetchAnswer();
    m_events.changed();
    takeBacklogLater();
}

void Vxi11Device::readBegins()
{
    if (!m_response.active() && m_exchange.accepting() && m_backlog.empty())
        m_exchange.unterminated();
}

Vxi11Response::Piece Vxi11Device::read(std::size_t most, std::optional<std::uint8_t> termination)
{
    Vxi11Response::Piece piece = m_response.take(most, termination);
    if (piece.last)
        m_exchange.setMessageAvailable(false);
    return piece;
}

void Vxi11Device::triggerInOrder()
{
    if (acceptsTrigger())
        trigger();
    else
        keep({{}, false, true});
}

void Vxi11Device::trigger()
{
    messageBegins();
    m_exchange.trigger();
}

void Vxi11Device::clear()
{
    m_backlog.clear();
    m_backlogSize = 0;
    m_response.drop();
    m_exchange.clear();
    m_events.changed();
}

} // namespace simulator
