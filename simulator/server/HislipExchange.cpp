#include "simulator/server/HislipExchange.h"

#include "simulator/instrument/StatusBits.h"
#include "simulator/server/EventLoop.h"
#include "simulator/server/HislipChannel.h"

#include <algorithm>
#include <utility>

namespace simulator
{

using namespace wire::hislip;

namespace
{

constexpr std::size_t ClientPayloadUntilTold = 1024 * 1024;
constexpr std::uint8_t RmtDelivered = 0x01;
// A client that does not read has been told often enough by then.
constexpr std::size_t EnoughServiceRequests = 64 * 1024;

} // namespace

HislipExchange::HislipExchange(EventLoop &loop, Instrument &instrument, HislipChannel &sync, HislipChannel &async,
                               Owner &owner, bool reportUnread)
    : m_loop(loop), m_instrument(instrument), m_sync(sync), m_async(async), m_owner(owner),
      m_reportUnread(reportUnread), m_exchange(instrument, static_cast<MessageExchange::Client &>(*this),
                                               {true, false, [this](std::uint8_t byte) { requestService(byte); }}),
      m_clientPayload(ClientPayloadUntilTold)
{
}

HislipExchange::~HislipExchange()
{
    m_loop.cancel(m_pumpTimer);
}

void HislipExchange::restart(bool overlapped)
{
    m_delivery.restart(overlapped);
    m_received = NothingSentId;
}

void HislipExchange::clear()
{
    m_exchange.clear();
    m_response.drop();
    m_delivery.restart(m_delivery.overlapped());
    m_sync.connection().dropUnsent();
    if (std::exchange(m_inData, false))
        m_sync.finish();
}

void HislipExchange::stop()
{
    m_stopped = true;
    m_response.drop();
    m_exchange.clear();
}

// ---- messages

bool HislipExchange::mayBegin() const
{
    return m_exchange.accepting() && m_owner.mayBegin();
}

bool HislipExchange::data()
{
    if (!m_inData) {
        if (!mayBegin())
            return false;
        beginMessage();
        if (m_sync.header().payloadLength > m_instrument.options().maxMessage) {
            m_sync.refuse(ErrorCode::MessageTooLarge, "message too large");
            m_owner.completed(m_received);
            return true;
        }
        m_inData = true;
        m_endSeen = false;
    }
    while (true) {
        if (!m_exchange.accepting() || !respond())
            return false;
        if (m_sync.remaining() == 0)
            break;
        std::span<const std::byte> bytes = m_sync.available();
        if (bytes.empty())
            return false;
        const std::size_t before = bytes.size();
        m_exchange.receive(bytes);
        m_sync.taken(before - bytes.size());
    }
    if (m_sync.header().type == MessageType::DataEnd && !m_endSeen) {
        m_endSeen = true;
        m_exchange.end();
        if (!m_exchange.accepting() || !respond())
            return false;
    }
    endMessage();
    return true;
}

bool HislipExchange::trigger()
{
    if (!mayBegin())
        return false;
    beginMessage();
    m_exchange.trigger();
    endMessage();
    return true;
}

void HislipExchange::beginMessage()
{
    m_received = m_sync.header().parameter;
    m_instrument.remote.addressed();
    const bool isRead = m_delivery.messageCame((m_sync.header().control & RmtDelivered) != 0);
    if (!m_delivery.overlapped() && (m_response.active() || (!isRead && m_reportUnread))) {
        m_response.drop();
        m_sync.connection().dropUnsent();
        m_exchange.interrupted();
    }
    updateAvailable();
}

void HislipExchange::endMessage()
{
    m_inData = false;
    m_sync.finish();
    m_owner.completed(m_received);
}

std::span<std::byte> HislipExchange::directInput()
{
    if (!m_inData || m_stopped)
        return {};
    const std::span<std::byte> space = m_exchange.directInput();
    return space.first(static_cast<std::size_t>(std::min<std::uint64_t>(space.size(), m_sync.remaining())));
}

void HislipExchange::directReceived(std::size_t count)
{
    m_exchange.directReceived(count);
    m_sync.takenDirectly(count);
}

void HislipExchange::inputAccepted()
{
    m_owner.resume();
}

// ---- responses

/// Begins to send the response that is complete, or in synchronized mode reports that it came too late. False when the one before it is still being sent.
bool HislipExchange::respond()
{
    if (!m_exchange.output().isComplete())
        return true;
    if (m_delivery.overlapped()) {
        if (m_response.active())
            return false;
    } else if (const std::optional<std::uint32_t> next = nextMessage()) {
        interrupted(*next);
        return true;
    }
    m_response.begin(m_exchange.output().take(), m_received);
    pump();
    m_exchange.setMessageAvailable(true);
    return true;
}

/// The id of the message of which something has come already.
std::optional<std::uint32_t> HislipExchange::nextMessage() const
{
    if (m_sync.remaining() > 0)
        return m_received;
    Header next;
    if (m_sync.peekNext(next) &&
        (next.type == MessageType::Data || next.type == MessageType::DataEnd || next.type == MessageType::Trigger))
        return next.parameter;
    return std::nullopt;
}

void HislipExchange::interrupted(std::uint32_t messageId)
{
    m_response.drop();
    m_sync.connection().dropUnsent();
    m_exchange.interrupted();
    m_async.send(MessageType::AsyncInterrupted, 0, messageId);
    m_sync.send(MessageType::Interrupted, 0, messageId);
}

void HislipExchange::pump()
{
    if (m_stopped || !m_response.active())
        return;
    m_response.pump(m_sync, m_clientPayload, m_delivery);
    if (!m_response.active()) {
        m_delivery.responseSent();
    } else if (m_sync.connection().unsent() == 0 && m_pumpTimer == Timers::None) {
        m_pumpTimer = m_loop.after({}, [this] {
            m_pumpTimer = Timers::None;
            pump();
            m_owner.resume();
        });
    }
}

// ---- status

std::uint8_t HislipExchange::statusQuery(bool delivered, std::uint32_t messageId)
{
    m_instrument.remote.addressed();
    m_delivery.statusQueryCame(delivered, messageId);
    if (m_delivery.overlapped())
        m_exchange.setMessageAvailable(m_response.active() || !m_delivery.allRead());
    else if (delivered)
        m_exchange.setMessageAvailable(false);
    const std::uint8_t byte = m_exchange.poll();
    if (m_delivery.overlapped() || messageId == m_received)
        return byte;
    return static_cast<std::uint8_t>(byte & ~StbMessageAvailable); // the query overtook data
}

void HislipExchange::updateAvailable()
{
    if (!m_response.active() && m_delivery.allRead())
        m_exchange.setMessageAvailable(false);
}

void HislipExchange::requestService(std::uint8_t statusByte)
{
    if (m_stopped || m_async.connection().unsent() > EnoughServiceRequests)
        return;
    for (unsigned left = m_instrument.faults.serviceRequests(FaultProtocol::Hislip); left > 0; --left)
        m_async.send(MessageType::AsyncServiceRequest, statusByte);
}

} // namespace simulator
