#include "simulator/server/SerialServer.h"

#include "simulator/instrument/Instrument.h"
#include "simulator/server/FaultySend.h"

namespace simulator
{
namespace
{

// More than this on its way to a client, and its next message waits.
constexpr std::size_t EnoughUnsent = 1024 * 1024;

} // namespace

SerialServer::SerialServer(EventLoop &loop, Instrument &instrument)
    : m_instrument(instrument), m_line(loop, *this), m_traffic(instrument.traffic, "serial", m_line.name()),
      m_exchange(instrument, *this, {false, true, {}}),
      m_lockOwner(instrument.locks.join([this] { received(); }, &m_traffic))
{
    m_exchange.setTraffic(&m_traffic);
}

SerialServer::~SerialServer()
{
    m_instrument.locks.leave(m_lockOwner);
}

bool SerialServer::mayGoOn() const
{
    return m_exchange.accepting() && m_line.unsent() < EnoughUnsent &&
           (m_exchange.inMessage() || m_instrument.locks.allows(m_lockOwner));
}

void SerialServer::received()
{
    answer();
    while (!m_line.input().empty() && mayGoOn()) {
        m_instrument.remote.addressed();
        std::span<const std::byte> bytes = m_line.input();
        const std::size_t before = bytes.size();
        m_exchange.receive(bytes);
        m_line.consume(before - bytes.size());
        answer();
    }
    if (m_line.input().empty() && m_exchange.inMessage() && !m_line.connected())
        forgetUnfinished();
}

void SerialServer::answer()
{
    if (!m_exchange.output().isComplete())
        return;
    std::vector<Outgoing> message = toOutgoing(m_exchange.output().take());
    Delivery delivery;
    if (m_instrument.faults.any()) {
        MessageForm form{FaultProtocol::Serial, true};
        form.payloadSize = sizeOf(message) - 1; // without the line feed
        form.end = EndMark::LastByte;
        delivery = passFaults(m_instrument.faults, form, message);
    }
    if (!delivery.dropped)
        m_line.send(std::move(message), delivery.delay);
}

/// The rest of a message whose sender has gone will not come; without this a block that was begun would swallow what the next one sends.
void SerialServer::forgetUnfinished()
{
    if (m_exchange.accepting() && m_exchange.inMessage())
        m_exchange.clear();
}

} // namespace simulator
