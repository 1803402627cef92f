#include "simulator/server/HislipSession.h"

#include "simulator/instrument/StatusBits.h"

#include <algorithm>
#include <utility>

namespace simulator
{

using namespace wire::hislip;

namespace
{

constexpr std::size_t ClientMessageSizeUntilTold = 1024 * 1024;
constexpr std::chrono::seconds PatienceForSecondConnection{30};
constexpr std::chrono::seconds PatienceForClear{60};
constexpr std::chrono::seconds PatienceForLastWords{2};
constexpr std::size_t MaxAsyncPayload = 512;
constexpr std::uint16_t ServerVendorId = 0x5A5A; // "ZZ", which nobody has registered
constexpr std::uint8_t RmtDelivered = 0x01;
constexpr std::uint8_t Synchronized = 0;
// A client that provokes answers and never reads them.
constexpr std::size_t MaxUnreadAnswers = 1024 * 1024;

} // namespace

std::span<std::byte> HislipSession::Side::directInput()
{
    return this == &m_session.m_syncSide ? m_session.directInput() : std::span<std::byte>{};
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
      m_sync(std::move(connection)), m_received(NothingSentId), m_completed(NothingSentId),
      m_clientMessageSize(ClientMessageSizeUntilTold)
{
    m_sync.connection().setOwner(m_syncSide);
    m_patience = m_loop.after(PatienceForSecondConnection,
                              [this] { fatal(FatalErrorCode::BadInitialization, "no asynchronous connection came"); });
    m_sync.send(MessageType::InitializeResponse, Synchronized, std::uint32_t{Version1} << 16 | m_id);
}

HislipSession::~HislipSession()
{
    m_loop.cancel(m_patience);
    m_loop.cancel(m_pumpTimer);
    if (m_lockOwner != 0)
        m_instrument.locks.leave(m_lockOwner);
}

void HislipSession::setAsynchronous(std::unique_ptr<Connection> connection)
{
    m_loop.cancel(std::exchange(m_patience, Timers::None));
    m_async.emplace(std::move(connection));
    m_async->connection().setOwner(m_asyncSide);
    m_exchange.emplace(m_instrument, static_cast<MessageExchange::Client &>(*this),
                       MessageExchange::Traits{true, false, [this](std::uint8_t byte) { requestService(byte); }});
    m_lockOwner = m_instrument.locks.join([this] { receiveSync(); });
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
        m_response.drop();
        if (m_exchange)
            m_exchange->clear();
        if (m_lockOwner != 0)
            m_instrument.locks.leave(std::exchange(m_lockOwner, 0));
        if (m_syncSide.m_open)
            m_sync.connection().closeAfterSending(PatienceForLastWords);
        if (m_async && m_asyncSide.m_open)
            m_async->connection().closeAfterSending(PatienceForLastWords);
    }
    if (!m_syncSide.m_open && (!m_async || !m_asyncSide.m_open))
        m_whenEnded(*this);
}

void HislipSession::refuse(HislipChannel &channel, ErrorCode code, std::string_view text)
{
    channel.sendError(code, text);
    channel.finish();
    if (channel.connection().unsent() > MaxUnreadAnswers)
        end();
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
        if (!syncMessage())
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
        return data();
    case MessageType::Trigger:
        return trigger();
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
        refuse(m_sync,
               static_cast<std::uint8_t>(type) >= 128 ? ErrorCode::UnknownVendorMessage : ErrorCode::UnknownMessageType,
               "not a message for the synchronous channel");
        return true;
    }
}

bool HislipSession::mayBegin() const
{
    return m_exchange->accepting() && m_instrument.locks.allows(m_lockOwner);
}

bool HislipSession::data()
{
    if (!m_inData) {
        if (!mayBegin())
            return false;
        if (m_sync.header().payloadLength > m_instrument.options().maxMessage) {
            refuse(m_sync, ErrorCode::MessageTooLarge, "message too large");
            return true;
        }
        beginMessage(m_sync.header());
        m_inData = true;
        m_endSeen = false;
    }
    while (true) {
        if (!m_exchange->accepting())
            return false;
        respond();
        if (m_ended)
            return false;
        if (m_sync.remaining() == 0)
            break;
        std::span<const std::byte> bytes = m_sync.available();
        if (bytes.empty())
            return false;
        const std::size_t before = bytes.size();
        m_exchange->receive(bytes);
        m_sync.taken(before - bytes.size());
    }
    if (m_sync.header().type == MessageType::DataEnd && !m_endSeen) {
        m_endSeen = true;
        m_exchange->end();
        if (!m_exchange->accepting())
            return false;
        respond();
    }
    endMessage();
    return true;
}

bool HislipSession::trigger()
{
    if (!mayBegin())
        return false;
    beginMessage(m_sync.header());
    m_exchange->trigger();
    endMessage();
    return true;
}

void HislipSession::beginMessage(const Header &header)
{
    m_received = header.parameter;
    m_instrument.remote.addressed();
    const bool delivered = (header.control & RmtDelivered) != 0;
    const bool unread = m_responseExpected != delivered || m_response.active();
    m_responseExpected = false;
    if (unread && m_options.reportUnread) {
        m_response.drop();
        m_sync.connection().dropUnsent();
        m_exchange->interrupted();
    }
    m_exchange->setMessageAvailable(false);
}

void HislipSession::endMessage()
{
    m_completed = m_received;
    m_inData = false;
    m_sync.finish();
    runDeferred();
}

std::span<std::byte> HislipSession::directInput()
{
    if (!m_inData || m_ended)
        return {};
    const std::span<std::byte> space = m_exchange->directInput();
    return space.first(static_cast<std::size_t>(std::min<std::uint64_t>(space.size(), m_sync.remaining())));
}

void HislipSession::directReceived(std::size_t count)
{
    m_exchange->directReceived(count);
    m_sync.takenDirectly(count);
    receiveSync();
}

void HislipSession::inputAccepted()
{
    receiveSync();
}

/// Sends the response that is complete, or reports that it came too late.
void HislipSession::respond()
{
    if (!m_exchange->output().isComplete())
        return;
    Header next;
    if (m_sync.remaining() > 0)
        return interrupted(m_received);
    if (m_sync.peekNext(next) &&
        (next.type == MessageType::Data || next.type == MessageType::DataEnd || next.type == MessageType::Trigger))
        return interrupted(next.parameter);
    m_response.begin(m_exchange->output().take(), m_received);
    pump();
    m_exchange->setMessageAvailable(true);
}

void HislipSession::interrupted(std::uint32_t messageId)
{
    m_response.drop();
    m_sync.connection().dropUnsent();
    m_exchange->interrupted();
    m_async->send(MessageType::AsyncInterrupted, 0, messageId);
    m_sync.send(MessageType::Interrupted, 0, messageId);
    if (std::max(m_sync.connection().unsent(), m_async->connection().unsent()) > MaxUnreadAnswers)
        end();
}

void HislipSession::pump()
{
    if (m_ended || !m_response.active())
        return;
    m_response.pump(m_sync, m_clientMessageSize);
    if (!m_response.active())
        m_responseExpected = true;
    else if (m_sync.connection().unsent() == 0 && m_pumpTimer == Timers::None)
        m_pumpTimer = m_loop.after({}, [this] {
            m_pumpTimer = Timers::None;
            pump();
        });
}

void HislipSession::deviceClearComplete()
{
    if (!m_clearing)
        return refuse(m_sync, ErrorCode::Unidentified, "no device clear is under way");
    m_loop.cancel(std::exchange(m_patience, Timers::None));
    m_clearing = false;
    m_received = m_completed = NothingSentId;
    m_responseExpected = false;
    m_sync.finish();
    m_sync.send(MessageType::DeviceClearAcknowledge, Synchronized);
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
            refuse(*m_async, ErrorCode::MessageTooLarge, "message too large");
            continue;
        }
        if (!m_async->payloadComplete())
            break;
        asyncMessage(header, m_async->payload());
        if (m_ended)
            return;
        m_async->finish();
        if (m_async->connection().unsent() > MaxUnreadAnswers)
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
        return lock(header, payload);
    case MessageType::AsyncLockInfo:
        return m_async->send(MessageType::AsyncLockInfoResponse, m_instrument.locks.exclusivelyLocked() ? 1 : 0,
                             static_cast<std::uint32_t>(m_instrument.locks.holders()));
    case MessageType::AsyncRemoteLocalControl:
        if (header.control > 6)
            return refuse(*m_async, ErrorCode::UnknownControlCode, "unknown remote/local request");
        if (m_remoteLocalAfter)
            return refuse(*m_async, ErrorCode::Unidentified, "a remote/local request is still waiting");
        m_remoteLocalAfter = {header.parameter, header.control};
        return runDeferred();
    case MessageType::Initialize:
    case MessageType::AsyncInitialize:
        return fatal(FatalErrorCode::BadInitialization, "initialized already");
    default:
        return refuse(*m_async,
                      static_cast<std::uint8_t>(header.type) >= 128 ? ErrorCode::UnknownVendorMessage
                                                                    : ErrorCode::UnknownMessageType,
                      "not a message for the asynchronous channel");
    }
}

void HislipSession::maximumMessageSize(std::string_view payload)
{
    if (payload.size() != 8)
        return fatal(FatalErrorCode::BadHeader, "the payload of AsyncMaximumMessageSize is 8 bytes");
    const auto *bytes = reinterpret_cast<const std::byte *>(payload.data());
    const std::uint64_t size = decodeSize(std::span<const std::byte, 8>{bytes, 8});
    // Implementations differ in whether the header counts: with it, nobody is sent too much.
    m_clientMessageSize =
        static_cast<std::size_t>(std::clamp<std::uint64_t>(size, HeaderSize + 1, std::uint64_t{1} << 40) - HeaderSize);
    const auto own = encodeSize(m_instrument.options().maxMessage);
    m_async->send(MessageType::AsyncMaximumMessageSizeResponse, 0, 0,
                  {reinterpret_cast<const char *>(own.data()), own.size()});
}

void HislipSession::statusQuery(const Header &header)
{
    m_instrument.remote.addressed();
    if ((header.control & RmtDelivered) != 0) {
        m_responseExpected = false;
        m_exchange->setMessageAvailable(false);
    }
    std::uint8_t byte = m_exchange->poll();
    if (header.parameter != m_received)
        byte &= static_cast<std::uint8_t>(~StbMessageAvailable); // the query overtook data
    m_async->send(MessageType::AsyncStatusResponse, byte);
}

void HislipSession::deviceClear()
{
    m_instrument.remote.addressed();
    m_instrument.locks.endWait(m_lockOwner);
    m_clearing = true;
    runDeferred();
    m_exchange->clear();
    m_response.drop();
    m_sync.connection().dropUnsent();
    if (std::exchange(m_inData, false))
        m_sync.finish();
    m_loop.cancel(m_patience);
    m_patience = m_loop.after(PatienceForClear,
                              [this] { fatal(FatalErrorCode::Unidentified, "the device clear was not completed"); });
    m_async->send(MessageType::AsyncDeviceClearAcknowledge, Synchronized);
    receiveSync();
}

void HislipSession::lock(const Header &header, std::string_view key)
{
    enum Response : std::uint8_t { Failed = 0, Granted = 1, Wrong = 3 };
    m_instrument.remote.addressed();
    if (header.control > 1)
        return refuse(*m_async, ErrorCode::UnknownControlCode, "neither a request nor a release");
    if (m_unlockAfter || key.size() > MaxLockString + 1)
        return m_async->send(MessageType::AsyncLockResponse, Wrong);
    if (header.control == 0) {
        m_unlockAfter = header.parameter;
        return runDeferred();
    }
    if (key.ends_with('\0'))
        key.remove_suffix(1);
    m_instrument.locks.request(m_lockOwner, std::string{key}, std::chrono::milliseconds{header.parameter},
                               [this](LockTable::Answer answer) {
                                   const std::uint8_t control = answer == LockTable::Answer::Granted  ? Granted
                                                                : answer == LockTable::Answer::Failed ? Failed
                                                                                                      : Wrong;
                                   m_async->send(MessageType::AsyncLockResponse, control);
                               });
}

/// Does what had to wait for a message on the synchronous channel, when that has been dealt with or will never be.
void HislipSession::runDeferred()
{
    if (m_unlockAfter && (m_clearing || isComplete(*m_unlockAfter))) {
        m_unlockAfter.reset();
        unlock();
    }
    if (m_remoteLocalAfter && (m_clearing || isComplete(m_remoteLocalAfter->first)))
        remoteLocal(std::exchange(m_remoteLocalAfter, std::nullopt)->second);
}

bool HislipSession::isComplete(std::uint32_t messageId) const
{
    // Ids wrap around.
    return static_cast<std::int32_t>(m_completed - messageId) >= 0;
}

void HislipSession::unlock()
{
    enum Response : std::uint8_t { ExclusiveReleased = 1, SharedReleased = 2, NotHeld = 3 };
    std::uint8_t control = NotHeld;
    switch (m_instrument.locks.release(m_lockOwner)) {
    case LockTable::Released::Exclusive:
        control = ExclusiveReleased;
        break;
    case LockTable::Released::Shared:
        control = SharedReleased;
        break;
    case LockTable::Released::Nothing:
        break;
    }
    m_async->send(MessageType::AsyncLockResponse, control);
}

void HislipSession::remoteLocal(std::uint8_t request)
{
    enum Request : std::uint8_t {
        DisableRemote,
        EnableRemote,
        DisableAndGoToLocal,
        EnableAndGoToRemote,
        EnableAndLockOut,
        EnableGoToRemoteAndLockOut,
        GoToLocal,
    };
    RemoteState &remote = m_instrument.remote;
    if (request != GoToLocal)
        remote.setRemoteEnable(request != DisableRemote && request != DisableAndGoToLocal);
    if (request == EnableAndLockOut || request == EnableGoToRemoteAndLockOut)
        remote.setLockout();
    if (request == EnableAndGoToRemote || request == EnableGoToRemoteAndLockOut)
        remote.addressed();
    if (request == GoToLocal)
        remote.goToLocal();
    m_async->send(MessageType::AsyncRemoteLocalResponse);
}

void HislipSession::requestService(std::uint8_t statusByte)
{
    if (!m_ended)
        m_async->send(MessageType::AsyncServiceRequest, statusByte);
}

} // namespace simulator
