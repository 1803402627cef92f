#include "simulator/server/HislipSession.h"

#include "simulator/server/EventLoop.h"

#include <algorithm>
#include <utility>

namespace simulator
{

using namespace wire::hislip;

namespace
{

constexpr std::size_t MaxAsyncPayload = 512;
constexpr std::uint16_t ServerVendorId = 0x5A5A; // "ZZ", which nobody has registered
constexpr std::uint8_t RmtDelivered = 0x01;
constexpr std::uint8_t Overlapped = 0x01; ///< in InitializeResponse and in the features of a device clear

std::uint8_t modeBit(bool overlapped)
{
    return overlapped ? Overlapped : std::uint8_t{0};
}

ErrorCode unknown(MessageType type)
{
    return static_cast<std::uint8_t>(type) >= 128 ? ErrorCode::UnknownVendorMessage : ErrorCode::UnknownMessageType;
}

} // namespace

std::span<std::byte> HislipSession::Side::directInput()
{
    const bool takes = this == &m_session.m_syncSide && m_session.m_exchange && !m_session.m_ended;
    return takes ? m_session.m_exchange->directInput() : std::span<std::byte>{};
}

void HislipSession::Side::directReceived(std::size_t count)
{
    m_session.m_exchange->directReceived(count);
    m_session.receiveSync();
}

void HislipSession::Side::drained()
{
    if (!m_session.m_exchange)
        return;
    m_session.m_exchange->pump();
    m_session.receiveSync();
}

void HislipSession::Side::closed()
{
    m_open = false;
    m_session.end();
}

HislipSession::HislipSession(EventLoop &loop, Instrument &instrument, const HislipOptions &options, std::uint16_t id,
                             std::unique_ptr<Connection> connection, Ended ended)
    : m_loop(loop), m_instrument(instrument), m_options(options), m_id(id), m_whenEnded(std::move(ended)),
      m_syncSide(*this, &HislipSession::receiveSync), m_asyncSide(*this, &HislipSession::receiveAsync),
      m_sync(std::move(connection)), m_traffic(instrument.traffic, "hislip", m_sync.connection().peer())
{
    m_sync.connection().setOwner(m_syncSide);
    m_sync.setFaults(m_instrument.faults, FaultProtocol::Hislip);
    m_patience = m_loop.after(m_options.patience.secondConnection,
                              [this] { fatal(FatalErrorCode::BadInitialization, "no asynchronous connection came"); });
    m_sync.send(MessageType::InitializeResponse, modeBit(m_options.preferOverlapped),
                std::uint32_t{Version1} << 16 | m_id);
}

HislipSession::~HislipSession()
{
    m_loop.cancel(m_patience);
}

void HislipSession::setAsynchronous(std::unique_ptr<Connection> connection)
{
    m_loop.cancel(std::exchange(m_patience, Timers::None));
    m_async.emplace(std::move(connection));
    m_async->connection().setOwner(m_asyncSide);
    m_async->setFaults(m_instrument.faults, FaultProtocol::HislipAsync);
    m_control.emplace(
        m_instrument, *m_async, [this] { receiveSync(); }, m_traffic);
    m_exchange.emplace(m_loop, m_instrument, m_sync, *m_async, static_cast<HislipExchange::Owner &>(*this),
                       m_options.reportUnread);
    m_exchange->setTraffic(m_traffic);
    m_exchange->restart(m_options.preferOverlapped);
    m_async->send(MessageType::AsyncInitializeResponse, 0, ServerVendorId);
    receiveAsync();
    receiveSync();
}

void HislipSession::fatal(FatalErrorCode code, std::string_view text)
{
    if (m_ended)
        return;
    m_sync.sendFatalError(code, text);
    if (m_async)
        m_async->sendFatalError(code, text);
    end();
}

void HislipSession::end()
{
    if (!std::exchange(m_ended, true)) {
        m_loop.cancel(std::exchange(m_patience, Timers::None));
        if (m_exchange) {
            m_exchange->stop();
            m_control->leave();
        }
        if (m_syncSide.m_open)
            m_sync.connection().closeAfterSending(m_options.patience.lastWords);
        if (m_async && m_asyncSide.m_open)
            m_async->connection().closeAfterSending(m_options.patience.lastWords);
    }
    if (!m_syncSide.m_open && (!m_async || !m_asyncSide.m_open))
        m_whenEnded(*this);
}

// ---- synchronous channel

void HislipSession::receiveSync()
{
    while (!m_ended) {
        const HislipChannel::Next next = m_sync.next();
        if (next == HislipChannel::Next::Malformed)
            return fatal(FatalErrorCode::BadHeader, "poorly formed message header");
        if (next == HislipChannel::Next::Nothing)
            break;
        const bool goesOn = syncMessage();
        if (!m_ended && isFlooded())
            return end();
        if (!goesOn)
            break;
    }
    if (!m_ended && m_sync.connection().inputEnded())
        end();
}

/// False when the message has to wait, or for more of its payload.
bool HislipSession::syncMessage()
{
    const MessageType type = m_sync.header().type;
    if (type == MessageType::FatalError) {
        end();
        return false;
    }
    if (!m_exchange) {
        fatal(FatalErrorCode::ChannelsNotEstablished, "the asynchronous connection is missing");
        return false;
    }
    if (m_clearing && type != MessageType::DeviceClearComplete) {
        m_sync.finish();
        return true;
    }
    switch (type) {
    case MessageType::Data:
    case MessageType::DataEnd:
        return m_exchange->data();
    case MessageType::Trigger:
        return m_exchange->trigger();
    case MessageType::DeviceClearComplete:
        deviceClearComplete();
        return true;
    case MessageType::Error:
        m_sync.finish();
        return true;
    case MessageType::Initialize:
    case MessageType::AsyncInitialize:
        fatal(FatalErrorCode::BadInitialization, "initialized already");
        return false;
    default:
        m_sync.refuse(unknown(type), "not a message for the synchronous channel");
        return true;
    }
}

// ---- asynchronous channel

void HislipSession::receiveAsync()
{
    m_sync.connection().poll();
    while (!m_ended) {
        const HislipChannel::Next next = m_async->next();
        if (next == HislipChannel::Next::Malformed)
            return fatal(FatalErrorCode::BadHeader, "poorly formed message header");
        if (next == HislipChannel::Next::Nothing)
            break;
        const Header header = m_async->header();
        if (header.payloadLength > MaxAsyncPayload) {
            m_async->refuse(ErrorCode::MessageTooLarge, "message too large");
        } else {
            if (!m_async->payloadComplete())
                break;
            asyncMessage(header, m_async->payload());
            m_async->finish();
        }
        if (!m_ended && isFlooded())
            return end();
    }
    if (!m_ended && m_async->connection().inputEnded())
        end();
}

void HislipSession::asyncMessage(const Header &header, std::string_view payload)
{
    switch (header.type) {
    case MessageType::FatalError:
        return end();
    case MessageType::Error:
        return;
    case MessageType::AsyncMaximumMessageSize:
        return maximumMessageSize(payload);
    case MessageType::AsyncStatusQuery:
        return statusQuery(header);
    case MessageType::AsyncDeviceClear:
        return deviceClear();
    case MessageType::AsyncLock:
        return m_control->lock(header, payload);
    case MessageType::AsyncLockInfo:
        return m_control->lockInfo();
    case MessageType::AsyncRemoteLocalControl:
        return m_control->remoteLocal(header);
    case MessageType::Initialize:
    case MessageType::AsyncInitialize:
        return fatal(FatalErrorCode::BadInitialization, "initialized already");
    default:
        return m_async->refuse(unknown(header.type), "not a message for the asynchronous channel");
    }
}

void HislipSession::statusQuery(const Header &header)
{
    const std::uint8_t truth = m_exchange->statusQuery((header.control & RmtDelivered) != 0, header.parameter);
    m_async->send(MessageType::AsyncStatusResponse, m_instrument.faults.told(FaultProtocol::Hislip, truth));
}

void HislipSession::maximumMessageSize(std::string_view payload)
{
    if (payload.size() != 8)
        return fatal(FatalErrorCode::BadHeader, "the payload of AsyncMaximumMessageSize is 8 bytes");
    const auto *bytes = reinterpret_cast<const std::byte *>(payload.data());
    const std::uint64_t size = decodeSize(std::span<const std::byte, 8>{bytes, 8});
    // Implementations differ in whether the header counts: with it, nobody is sent too much.
    m_exchange->setClientPayload(
        static_cast<std::size_t>(std::clamp<std::uint64_t>(size, HeaderSize + 1, std::uint64_t{1} << 40) - HeaderSize));
    const auto own = encodeSize(m_instrument.options().maxMessage);
    m_async->send(MessageType::AsyncMaximumMessageSizeResponse, 0, 0,
                  {reinterpret_cast<const char *>(own.data()), own.size()});
}

// ---- device clear

void HislipSession::deviceClear()
{
    m_clearing = true;
    m_traffic.event("device clear");
    m_control->cleared();
    m_exchange->clear();
    m_loop.cancel(m_patience);
    m_patience = m_loop.after(m_options.patience.clear,
                              [this] { fatal(FatalErrorCode::Unidentified, "the device clear was not completed"); });
    m_async->send(MessageType::AsyncDeviceClearAcknowledge, modeBit(m_options.preferOverlapped));
    receiveSync();
}

void HislipSession::deviceClearComplete()
{
    if (!m_clearing)
        return m_sync.refuse(ErrorCode::Unidentified, "no device clear is under way");
    m_loop.cancel(std::exchange(m_patience, Timers::None));
    m_clearing = false;
    // Both modes are served: the client's wish decides.
    m_exchange->restart((m_sync.header().control & Overlapped) != 0);
    m_control->restart();
    m_sync.finish();
    m_sync.send(MessageType::DeviceClearAcknowledge, modeBit(m_exchange->overlapped()));
}

} // namespace simulator
