#include "kyvisa/transport/HislipTransport.h"

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/transport/IoStatus.h"

#include <algorithm>
#include <chrono>
#include <cstring>

namespace kyvisa
{

using namespace wire::hislip;
using os::IoResult;

namespace
{

constexpr std::uint8_t DeliveredFlag = 1;
constexpr std::uint8_t OverlapFlag = 1;
constexpr std::uint8_t ExclusiveGranted = 1; ///< in AsyncLockInfoResponse

/// How long the counterpart of an Interrupted message may take. An instrument that never sends it does not stop the writes.
constexpr std::chrono::milliseconds PatienceForCounterpart{2000};
/// An instrument that takes nothing for so long does not look at its input.
constexpr std::chrono::milliseconds PatienceForStillInput{500};

/// And no more than a quarter of the call's time, or a clear would end before it has begun.
os::Deadline stillInputSeen(os::Deadline deadline)
{
    const auto patience = os::Deadline::after(PatienceForStillInput);
    return deadline.isNever() ? patience
                              : patience.orEarlier(os::Deadline::after(
                                    std::chrono::duration_cast<std::chrono::milliseconds>(deadline.remaining()) / 4));
}
/// For the question who holds a lock, behind a read that has timed out.
constexpr std::chrono::milliseconds PatienceForLockInfo{200};

std::uint8_t control(auto code)
{
    return static_cast<std::uint8_t>(code);
}

} // namespace

HislipTransport::HislipTransport(HislipChannel sync, std::unique_ptr<HislipAsyncChannel> async, bool overlapped,
                                 std::chrono::milliseconds patienceForClear)
    : m_sync(std::move(sync)), m_async(std::move(async)), m_overlapped(overlapped), m_patienceForClear(patienceForClear)
{
}

void HislipTransport::showModeIn(AttributeStore &attributes)
{
    m_attributes = &attributes;
    attributes.setNumber(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, m_overlapped ? VI_TRUE : VI_FALSE);
}

ViStatus HislipTransport::agreeOnSizes(ViUInt64 largestToUs, const os::WaitLimit &limit)
{
    const auto size = encodeSize(largestToUs);
    HislipAsyncChannel::Reply reply;
    const ViStatus status = m_async->transact({MessageType::AsyncMaximumMessageSize, 0, 0, size.size()}, size,
                                              MessageType::AsyncMaximumMessageSizeResponse, reply, limit);
    if (status < VI_SUCCESS)
        return checked(status);
    if (reply.header.payloadLength != size.size()) {
        close();
        return VI_ERROR_CONN_LOST;
    }
    // Some count the header as part of the message. Leaving room for it suits both.
    const std::uint64_t largest = decodeSize(reply.payload);
    m_largestPayload = largest > HeaderSize ? largest - HeaderSize : 1;
    return VI_SUCCESS;
}

ViStatus HislipTransport::checked(ViStatus status)
{
    if (status != VI_ERROR_CONN_LOST)
        return status;
    // What is wrong with one connection is told on both.
    if (m_sync.sawBadHeader())
        m_async->fail(FatalErrorCode::BadHeader);
    else if (m_async->sawBadHeader())
        m_sync.fail(FatalErrorCode::BadHeader);
    close();
    return status;
}

ViStatus HislipTransport::ended(IoResult result, const os::WaitLimit &limit)
{
    return checked(transferStatus(result, limit));
}

/// Sends a message that has an id. One of which nothing left has used up neither the id nor the word of delivery.
IoResult HislipTransport::sendNumbered(MessageType type, std::span<const std::byte> payload, const os::WaitLimit &limit,
                                       std::size_t &sent)
{
    const Header header{type, takeDeliveredFlag(), m_nextId, payload.size()};
    const IoResult result = m_sync.send(header, payload, limit, sent);
    if (result == IoResult::Done || m_sync.messageIsHalfSent())
        m_nextId += 2;
    else
        m_deliveredToReport = header.control != 0;
    return result;
}

std::uint8_t HislipTransport::takeDeliveredFlag()
{
    const bool flag = m_deliveredToReport;
    m_deliveredToReport = false;
    return flag ? DeliveredFlag : 0;
}

ViStatus HislipTransport::read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                               std::size_t &count)
{
    const bool immediate = limit.deadline.expired();
    if (const ViStatus status = finishClear(limit); status < VI_SUCCESS)
        return status;
    const ViStatus status = readResponse(buffer, mode, limit, count);
    // While another client has a lock the instrument does not even look at the question.
    if (status == VI_ERROR_TMO && count == 0 && !immediate && lockedByAnother(limit.wakeup))
        return VI_ERROR_RSRC_LOCKED;
    return status;
}

ViStatus HislipTransport::readResponse(std::span<std::byte> buffer, const TransferMode &mode,
                                       const os::WaitLimit &limit, std::size_t &count)
{
    for (;;) {
        if (!m_inMessage) {
            const ViStatus status = nextData(count, limit);
            if (status < VI_SUCCESS)
                return status;
        }
        const ViStatus status = deliver(buffer, mode, limit, count);
        if (status < VI_SUCCESS)
            return status;
        if (m_sync.payloadLeft() == 0) {
            responseMessageTaken();
            if (m_messageEnds && !mode.suppressEnd)
                return VI_SUCCESS;
        }
        if (status == VI_SUCCESS_TERM_CHAR)
            return status;
        if (count == buffer.size())
            return VI_SUCCESS_MAX_CNT;
        if (limit.deadline.expired())
            return VI_ERROR_TMO;
    }
}

void HislipTransport::responseMessageTaken()
{
    m_inMessage = false;
    m_lastDeliveredId = m_messageId;
    m_deliveredToReport = m_deliveredToReport || m_messageEnds;
}

/// Moves payload until the message, the buffer or, where that counts, the termination character ends it.
ViStatus HislipTransport::deliver(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                                  std::size_t &count)
{
    while (m_sync.payloadLeft() > 0 && count < buffer.size()) {
        std::span<std::byte> room = buffer.subspan(count);
        bool terminated = false;
        if (mode.termCharEnabled) {
            std::span<const std::byte> payload;
            if (const IoResult result = m_sync.peekPayload(payload, limit); result != IoResult::Done)
                return ended(result, limit);
            payload = payload.first(std::min(payload.size(), room.size()));
            const auto *found =
                static_cast<const std::byte *>(std::memchr(payload.data(), mode.termChar, payload.size()));
            terminated = found != nullptr;
            room = room.first(terminated ? static_cast<std::size_t>(found - payload.data()) + 1 : payload.size());
        }
        const os::Transfer got = m_sync.readPayload(room, limit);
        count += got.count;
        if (got.result != IoResult::Done)
            return ended(got.result, limit);
        if (terminated)
            return VI_SUCCESS_TERM_CHAR;
        if (m_sync.payloadLeft() > 0 && count < buffer.size() && limit.deadline.expired())
            return VI_ERROR_TMO;
    }
    return VI_SUCCESS;
}

/// Goes on to the next message that belongs to the response. What does not takes @p count, the bytes of this read, with it.
ViStatus HislipTransport::nextData(std::size_t &count, const os::WaitLimit &limit)
{
    for (bool first = true;; first = false) {
        if (!first && limit.deadline.expired())
            return VI_ERROR_TMO;
        Header header;
        if (const IoResult result = m_sync.next(header, limit); result != IoResult::Done)
            return ended(result, limit);
        switch (header.type) {
        case MessageType::Data:
        case MessageType::DataEnd: {
            const bool unnamed = header.type == MessageType::Data && header.parameter == UnknownMessageId;
            const bool ours = header.parameter == lastSentId() || unnamed;
            // Interrupted was faster: the two halves make one interruption, which is over.
            if (m_interrupted && m_async->takeInterruption(*m_interrupted))
                m_interrupted.reset();
            // AsyncInterrupted was faster than its counterpart here: until that comes, everything is stale.
            const bool stale = !m_overlapped && (!ours || m_async->interrupted(lastSentId()));
            if (stale) {
                count = 0;
                break;
            }
            m_inMessage = true;
            m_messageEnds = header.type == MessageType::DataEnd;
            m_messageId = header.parameter;
            return VI_SUCCESS;
        }
        case MessageType::Interrupted:
            count = 0;
            if (!m_async->takeInterruption(header.parameter)) {
                m_interrupted = header.parameter;
                m_counterpartDue = os::Deadline::after(PatienceForCounterpart);
            }
            break;
        case MessageType::FatalError:
            return checked(VI_ERROR_CONN_LOST);
        case MessageType::Error:
            return VI_ERROR_IO;
        default:
            if (const ViStatus status = refuse(header, limit); status < VI_SUCCESS)
                return status;
        }
    }
}

/// Answers a message that is not understood.
ViStatus HislipTransport::refuse(const Header &header, const os::WaitLimit &limit)
{
    const bool vendor = static_cast<std::uint8_t>(header.type) >= 128;
    const auto code = vendor ? ErrorCode::UnknownVendorMessage : ErrorCode::UnknownMessageType;
    if (m_sync.messageIsHalfSent())
        return VI_SUCCESS;
    std::size_t sent = 0;
    return ended(m_sync.send({MessageType::Error, control(code), 0, 0}, {}, limit, sent), limit);
}

ViStatus HislipTransport::beforeSending(const os::WaitLimit &limit)
{
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    if (m_sync.messageIsHalfSent() && m_clearing == Clearing::No)
        return VI_ERROR_RAW_WR_PROT_VIOL;
    if (const ViStatus status = finishClear(limit); status < VI_SUCCESS)
        return status;
    if (m_overlapped)
        return VI_SUCCESS;
    m_inMessage = false; // what was not read of the last response is dropped
    if (!m_interrupted)
        return VI_SUCCESS;
    const ViStatus status =
        m_async->awaitInterruption(*m_interrupted, {limit.deadline.orEarlier(m_counterpartDue), limit.wakeup});
    if (status == VI_ERROR_TMO && !m_counterpartDue.expired())
        return status;
    if (status != VI_SUCCESS && status != VI_ERROR_TMO)
        return checked(status);
    m_interrupted.reset();
    return VI_SUCCESS;
}

ViStatus HislipTransport::write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                                std::size_t &count)
{
    if (const ViStatus status = beforeSending(limit); status < VI_SUCCESS)
        return status;
    while (count < data.size()) {
        const auto payload = data.subspan(
            count, static_cast<std::size_t>(std::min<std::uint64_t>(data.size() - count, m_largestPayload)));
        const bool last = count + payload.size() == data.size();
        std::size_t sent = 0;
        const IoResult result =
            sendNumbered(last && mode.sendEnd ? MessageType::DataEnd : MessageType::Data, payload, limit, sent);
        count += sent;
        if (result != IoResult::Done)
            return ended(result, limit);
        if (!last && limit.deadline.expired())
            return VI_ERROR_TMO;
    }
    return VI_SUCCESS;
}

ViStatus HislipTransport::readStatusByte(const TransferMode &, const os::WaitLimit &limit, ViUInt16 &status)
{
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    const std::uint32_t id = m_overlapped ? m_lastDeliveredId : lastSentId();
    const std::uint8_t delivered = takeDeliveredFlag();
    HislipAsyncChannel::Reply reply;
    const ViStatus result = m_async->transact({MessageType::AsyncStatusQuery, delivered, id, 0}, {},
                                              MessageType::AsyncStatusResponse, reply, limit);
    if (result >= VI_SUCCESS)
        status = reply.header.control;
    else if (result == VI_ERROR_TMO && !m_async->awaits(MessageType::AsyncStatusResponse)) // it never left
        m_deliveredToReport = m_deliveredToReport || delivered != 0;
    return checked(result);
}

/// Drops the responses that have arrived, and the rest of one that is still arriving, without waiting for any.
ViStatus HislipTransport::flushLine(ViUInt16 mask, const os::WaitLimit &limit)
{
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    if ((mask & (VI_IO_IN_BUF | VI_IO_IN_BUF_DISCARD)) == 0)
        return VI_SUCCESS;                                               // what was sent is the system's
    if (const ViStatus status = finishClear(limit); status < VI_SUCCESS) // its end is in that input too
        return status;
    const os::WaitLimit atOnce{os::Deadline::now(), limit.wakeup};
    do {
        if (!m_inMessage) {
            std::size_t none = 0;
            const ViStatus status = nextData(none, atOnce);
            if (status < VI_SUCCESS)
                return status == VI_ERROR_TMO ? VI_SUCCESS : status;
        }
        const IoResult result = m_sync.skipPayload(atOnce);
        if (result != IoResult::Done) {
            m_inMessage = false; // the next header comes behind what is left of it
            return result == IoResult::TimedOut ? VI_SUCCESS : ended(result, limit);
        }
        responseMessageTaken();
    } while (!limit.deadline.expired());
    return VI_SUCCESS;
}

ViStatus HislipTransport::resizeLine(ViUInt16 mask, std::size_t size)
{
    return resizeBuffersOf(m_sync.socket(), mask, size);
}

ViStatus HislipTransport::trigger(const TransferMode &, const os::WaitLimit &limit)
{
    if (const ViStatus status = beforeSending(limit); status < VI_SUCCESS)
        return status;
    std::size_t sent = 0;
    return ended(sendNumbered(MessageType::Trigger, {}, limit, sent), limit);
}

ViStatus HislipTransport::clear(const os::WaitLimit &limit)
{
    return clearInto(m_overlapped, limit);
}

ViStatus HislipTransport::clearInto(bool overlapped, const os::WaitLimit &limit)
{
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    if (m_clearing == Clearing::No) {
        if (const IoResult finished = finishAsFarAsTaken(limit); finished != IoResult::Done)
            return ended(finished, limit);
        m_clearDue = os::Deadline::after(m_patienceForClear);
        HislipAsyncChannel::Reply reply;
        const ViStatus status =
            m_async->transact({MessageType::AsyncDeviceClear, 0, 0, 0}, {}, MessageType::AsyncDeviceClearAcknowledge,
                              reply, {limit.deadline.orEarlier(m_clearDue), limit.wakeup});
        const bool underWay = status == VI_SUCCESS || m_async->awaits(MessageType::AsyncDeviceClearAcknowledge);
        if (!underWay)
            return checked(status);
        m_clearing = status == VI_SUCCESS ? Clearing::Acknowledged : Clearing::Requested;
        m_clearIntoOverlap = overlapped;
        if (status < VI_SUCCESS)
            return whileClearing(status);
    }
    m_clearIntoOverlap = m_clearing == Clearing::Completed ? m_clearIntoOverlap : overlapped;
    return finishClear(limit);
}

/// An instrument that has left a clear unfinished for too long will not take anything else either.
ViStatus HislipTransport::whileClearing(ViStatus status)
{
    if (status != VI_ERROR_TMO || !m_clearDue.expired())
        return checked(status);
    m_sync.fail(FatalErrorCode::Unidentified);
    m_async->fail(FatalErrorCode::Unidentified);
    return checked(VI_ERROR_CONN_LOST);
}

/// Finishes a message that stopped in the middle, as long as the instrument takes it. One that does not look at its input,
/// because of another client's lock for example, will begin to discard it when it is asked for the clear.
IoResult HislipTransport::finishAsFarAsTaken(const os::WaitLimit &limit)
{
    for (;;) {
        const std::uint64_t before = m_sync.unsent();
        const IoResult result = m_sync.finishMessage({stillInputSeen(limit.deadline), limit.wakeup});
        if (result != IoResult::TimedOut || limit.deadline.expired())
            return result;
        if (m_sync.unsent() == before)
            return IoResult::Done;
    }
}

/// Goes on with a device clear that is under way, to its end.
ViStatus HislipTransport::finishClear(const os::WaitLimit &limit)
{
    if (m_clearing == Clearing::No)
        return VI_SUCCESS;
    return whileClearing(goOnWithClear({limit.deadline.orEarlier(m_clearDue), limit.wakeup}));
}

ViStatus HislipTransport::goOnWithClear(const os::WaitLimit &limit)
{
    if (m_clearing == Clearing::Requested) {
        const ViStatus status = m_async->awaitAnswers(MessageType::AsyncDeviceClearAcknowledge, limit);
        if (status < VI_SUCCESS)
            return status;
        m_clearing = Clearing::Acknowledged;
    }
    if (m_clearing == Clearing::Acknowledged) {
        IoResult result = m_sync.finishMessage(limit);
        std::size_t sent = 0;
        const std::uint8_t wanted = m_clearIntoOverlap ? OverlapFlag : 0;
        if (result == IoResult::Done)
            result = m_sync.send({MessageType::DeviceClearComplete, wanted, 0, 0}, {}, limit, sent);
        const bool begun = result == IoResult::Done || m_sync.messageIsHalfSent();
        if (begun)
            m_clearing = Clearing::Completed;
        if (result != IoResult::Done)
            return transferStatus(result, limit);
        m_inMessage = false;
    }
    if (m_clearing == Clearing::Completed) {
        if (const IoResult result = m_sync.finishMessage(limit); result != IoResult::Done)
            return transferStatus(result, limit);
        Header header;
        for (bool first = true; header.type != MessageType::DeviceClearAcknowledge; first = false) {
            if (!first && limit.deadline.expired())
                return VI_ERROR_TMO;
            if (const IoResult result = m_sync.next(header, limit); result != IoResult::Done)
                return transferStatus(result, limit);
            if (header.type == MessageType::FatalError)
                return VI_ERROR_CONN_LOST;
        }
        cleared((header.control & OverlapFlag) != 0);
    }
    return VI_SUCCESS;
}

void HislipTransport::cleared(bool overlapped)
{
    m_clearing = Clearing::No;
    m_overlapped = overlapped;
    if (m_attributes)
        showModeIn(*m_attributes);
    m_inMessage = false;
    m_nextId = FirstMessageId;
    m_lastDeliveredId = NothingSentId;
    m_deliveredToReport = false;
    m_interrupted.reset();
    m_async->forgetPast();
}

ViStatus HislipTransport::controlRemote(ViUInt16 mode, const os::WaitLimit &limit)
{
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    HislipAsyncChannel::Reply reply;
    return checked(m_async->transact({MessageType::AsyncRemoteLocalControl, control(mode), lastSentId(), 0}, {},
                                     MessageType::AsyncRemoteLocalResponse, reply, limit));
}

ViStatus HislipTransport::applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit)
{
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    const bool on = value != 0;
    switch (attribute) {
    case VI_ATTR_TCPIP_NODELAY:
        return m_sync.socket().setNoDelay(on) ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
    case VI_ATTR_TCPIP_KEEPALIVE:
        m_async->setKeepAlive(on);
        return m_sync.socket().setKeepAlive(on) ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
    case VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB:
        return agreeOnSizes(value * 1024, limit);
    case VI_ATTR_TCPIP_HISLIP_OVERLAP_EN: {
        if (on == m_overlapped && m_clearing == Clearing::No)
            return VI_SUCCESS;
        // A clear whose end was sent already may be going into the other mode.
        const bool another = m_clearing == Clearing::Completed && on != m_clearIntoOverlap;
        ViStatus status = clearInto(on, limit);
        if (status == VI_SUCCESS && another)
            status = clearInto(on, limit);
        return status == VI_SUCCESS && m_overlapped != on ? VI_ERROR_NSUP_ATTR_STATE : status;
    }
    default:
        return VI_SUCCESS;
    }
}

ViStatus HislipTransport::lockDevice(const std::string &key, std::chrono::milliseconds patience,
                                     const os::WaitLimit &limit)
{
    enum : std::uint8_t { Failed = 0, Granted = 1 };
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    std::uint8_t answer = Failed;
    const ViStatus status = m_async->requestLock(patience, std::as_bytes(std::span(key)), lastSentId(), answer, limit);
    if (status < VI_SUCCESS)
        return checked(status);
    if (answer == Failed)
        return VI_ERROR_RSRC_LOCKED;
    if (answer != Granted) // "error": the instrument takes it for held, or cannot lock
        return VI_ERROR_IO;
    (key.empty() ? m_holdsExclusive : m_holdsShared) = true;
    return VI_SUCCESS;
}

ViStatus HislipTransport::unlockDevice(const os::WaitLimit &limit)
{
    enum : std::uint8_t { ExclusiveReleased = 1, SharedReleased = 2 };
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    (m_holdsExclusive ? m_holdsExclusive : m_holdsShared) = false;
    std::uint8_t answer = 0;
    const ViStatus status = m_async->releaseLock(lastSentId(), answer, limit);
    if (status < VI_SUCCESS)
        return checked(status);
    return answer == ExclusiveReleased || answer == SharedReleased ? VI_SUCCESS : VI_ERROR_IO;
}

ViStatus HislipTransport::readLockState(const os::WaitLimit &limit, ViAccessMode &state)
{
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    HislipAsyncChannel::Reply reply;
    const ViStatus status =
        m_async->transact({MessageType::AsyncLockInfo, 0, 0, 0}, {}, MessageType::AsyncLockInfoResponse, reply, limit);
    if (status < VI_SUCCESS)
        return checked(status);
    state = VI_NO_LOCK;
    if ((reply.header.control & ExclusiveGranted) != 0)
        state = VI_EXCLUSIVE_LOCK;
    else if (reply.header.parameter > 0)
        state = VI_SHARED_LOCK;
    return VI_SUCCESS;
}

bool HislipTransport::lockedByAnother(const os::Wakeup &wakeup)
{
    if (m_holdsExclusive || !m_tellsLocks)
        return false;
    ViAccessMode state = VI_NO_LOCK;
    m_tellsLocks = readLockState({os::Deadline::after(PatienceForLockInfo), wakeup}, state) == VI_SUCCESS;
    return state == VI_EXCLUSIVE_LOCK || (state == VI_SHARED_LOCK && !m_holdsShared);
}

ViStatus HislipTransport::watchServiceRequests(std::function<void()> notify, const os::WaitLimit &)
{
    return m_sync.isOpen() ? m_async->watch(std::move(notify)) : VI_ERROR_CONN_LOST;
}

void HislipTransport::close()
{
    m_sync.close();
    m_async->close();
}

void HislipTransport::abandon()
{
    m_sync.close();
    m_async->abandon();
}

} // namespace kyvisa
