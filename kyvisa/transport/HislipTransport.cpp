#include "kyvisa/transport/HislipTransport.h"

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/Connector.h"
#include "kyvisa/transport/IoStatus.h"

#include <algorithm>
#include <cstring>

namespace kyvisa
{

using namespace wire::hislip;
using os::IoResult;

namespace
{

constexpr std::size_t InputCapacity = 16 * 1024;
constexpr std::uint16_t VendorId = 'Z' << 8 | 'Z'; // registered to nobody
constexpr std::uint8_t DeliveredFlag = 1;
constexpr std::uint8_t OverlapFlag = 1;
constexpr std::uint8_t EncryptionFlags = 2 | 4; // mandatory, required at the beginning

std::uint8_t control(auto code)
{
    return static_cast<std::uint8_t>(code);
}

/// Why an instrument refused a session.
ViStatus refusal(const Header &header)
{
    if (header.type != MessageType::FatalError)
        return VI_ERROR_RSRC_NFOUND;
    switch (static_cast<FatalErrorCode>(header.control)) {
    case FatalErrorCode::MaximumClients:
        return VI_ERROR_RSRC_BUSY;
    case FatalErrorCode::SecureConnectionFailed:
        return VI_ERROR_INV_PROT;
    default:
        return VI_ERROR_RSRC_NFOUND;
    }
}

/// While opening, a connection that breaks off is a resource that is not there.
ViStatus whileOpening(ViStatus status)
{
    return status == VI_ERROR_CONN_LOST || status == VI_ERROR_IO ? VI_ERROR_RSRC_NFOUND : status;
}

ViStatus initialize(HislipChannel &channel, const std::string &subAddress, Header &response, const os::WaitLimit &limit)
{
    const Header request{MessageType::Initialize, 0, initializeParameter(Version1, VendorId), subAddress.size()};
    std::size_t sent = 0;
    IoResult result = channel.send(request, std::as_bytes(std::span(subAddress)), limit, sent);
    if (result == IoResult::Done)
        result = channel.next(response, limit);
    if (result != IoResult::Done)
        return whileOpening(transferStatus(result, limit));
    if (response.type != MessageType::InitializeResponse)
        return refusal(response);
    if ((response.control & EncryptionFlags) != 0)
        return VI_ERROR_INV_PROT;
    return VI_SUCCESS;
}

} // namespace

ViStatus HislipTransport::connect(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                                  std::unique_ptr<Transport> &transport)
{
    os::StreamSocket socket;
    IoResult connected = os::connectStream(name.host, name.port, limit, socket);
    if (connected != IoResult::Done)
        return connectStatus(connected, limit);
    const std::string address = socket.peerAddress();
    attributes.setText(VI_ATTR_TCPIP_ADDR, address);
    HislipChannel sync(std::move(socket), InputCapacity);
    Header response;
    ViStatus status = initialize(sync, name.deviceName, response, limit);
    if (status < VI_SUCCESS)
        return status;

    os::StreamSocket asyncSocket;
    // A name may have several addresses: the other connection belongs to the instrument that answered the first.
    connected = os::connectStream(address.empty() ? name.host : address, name.port, limit, asyncSocket);
    if (connected != IoResult::Done)
        return connectStatus(connected, limit);
    auto async = std::make_unique<HislipAsyncChannel>(std::move(asyncSocket));
    const std::uint32_t session = response.parameter & 0xFFFF;
    HislipAsyncChannel::Reply reply;
    status = async->transact({MessageType::AsyncInitialize, 0, session, 0}, {}, MessageType::AsyncInitializeResponse,
                             reply, limit);
    if (status < VI_SUCCESS)
        return whileOpening(status);

    const bool overlapped = (response.control & OverlapFlag) != 0;
    auto hislip = std::make_unique<HislipTransport>(std::move(sync), std::move(async), overlapped);
    status = hislip->agreeOnSizes(attributes.number(VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB) * 1024, limit);
    if (status < VI_SUCCESS)
        return whileOpening(status);
    const std::uint32_t version = std::min<std::uint32_t>(response.parameter >> 16, Version1);
    attributes.setNumber(VI_ATTR_TCPIP_HISLIP_VERSION, (version >> 8) << 20 | (version & 0xFF) << 8);
    attributes.setNumber(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, overlapped ? VI_TRUE : VI_FALSE);
    transport = std::move(hislip);
    return VI_SUCCESS;
}

HislipTransport::HislipTransport(HislipChannel sync, std::unique_ptr<HislipAsyncChannel> async, bool overlapped)
    : m_sync(std::move(sync)), m_async(std::move(async)), m_overlapped(overlapped)
{
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
    if (status == VI_ERROR_CONN_LOST)
        close();
    return status;
}

ViStatus HislipTransport::ended(IoResult result, const os::WaitLimit &limit)
{
    return checked(transferStatus(result, limit));
}

std::uint32_t HislipTransport::takeNextId()
{
    const std::uint32_t id = m_nextId;
    m_nextId += 2;
    return id;
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
            m_inMessage = false;
            m_lastDeliveredId = m_messageId;
            if (m_messageEnds) {
                m_deliveredToReport = true;
                if (!mode.suppressEnd)
                    return VI_SUCCESS;
            }
        }
        if (status == VI_SUCCESS_TERM_CHAR)
            return status;
        if (count == buffer.size())
            return VI_SUCCESS_MAX_CNT;
        if (limit.deadline.expired())
            return VI_ERROR_TMO;
    }
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
            // AsyncInterrupted was faster than its counterpart here: until that comes, everything is stale.
            const bool stale = !m_overlapped && (!ours || m_async->interruptions() > m_interruptions);
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
            ++m_interruptions;
            break;
        case MessageType::FatalError:
            return checked(VI_ERROR_CONN_LOST);
        case MessageType::Error:
            return VI_ERROR_IO;
        case MessageType::DeviceClearAcknowledge: // of a clear that was given up
            break;
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
    if (m_sync.messageIsHalfSent())
        return VI_ERROR_RAW_WR_PROT_VIOL;
    if (m_overlapped)
        return VI_SUCCESS;
    m_inMessage = false; // what was not read of the last response is dropped
    return m_interruptions > 0 ? checked(m_async->awaitInterruptions(m_interruptions, limit)) : VI_SUCCESS;
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
        const Header header{last && mode.sendEnd ? MessageType::DataEnd : MessageType::Data, takeDeliveredFlag(),
                            takeNextId(), payload.size()};
        std::size_t sent = 0;
        const IoResult result = m_sync.send(header, payload, limit, sent);
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
    HislipAsyncChannel::Reply reply;
    const ViStatus result = m_async->transact({MessageType::AsyncStatusQuery, takeDeliveredFlag(), id, 0}, {},
                                              MessageType::AsyncStatusResponse, reply, limit);
    if (result >= VI_SUCCESS)
        status = reply.header.control;
    return checked(result);
}

ViStatus HislipTransport::trigger(const TransferMode &, const os::WaitLimit &limit)
{
    if (const ViStatus status = beforeSending(limit); status < VI_SUCCESS)
        return status;
    std::size_t sent = 0;
    return ended(m_sync.send({MessageType::Trigger, takeDeliveredFlag(), takeNextId(), 0}, {}, limit, sent), limit);
}

ViStatus HislipTransport::clear(const os::WaitLimit &limit)
{
    return clearInto(m_overlapped, limit);
}

ViStatus HislipTransport::clearInto(bool overlapped, const os::WaitLimit &limit)
{
    if (!m_sync.isOpen())
        return VI_ERROR_CONN_LOST;
    if (const IoResult result = m_sync.finishMessage(limit); result != IoResult::Done)
        return ended(result, limit);
    HislipAsyncChannel::Reply reply;
    const ViStatus status = m_async->transact({MessageType::AsyncDeviceClear, 0, 0, 0}, {},
                                              MessageType::AsyncDeviceClearAcknowledge, reply, limit);
    if (status < VI_SUCCESS)
        return checked(status);

    const std::uint8_t wanted = overlapped ? OverlapFlag : 0;
    std::size_t sent = 0;
    IoResult result = m_sync.send({MessageType::DeviceClearComplete, wanted, 0, 0}, {}, limit, sent);
    m_inMessage = false;
    Header header;
    for (bool first = true; result == IoResult::Done; first = false) {
        if (!first && limit.deadline.expired())
            return VI_ERROR_TMO;
        result = m_sync.next(header, limit);
        if (result == IoResult::Done && header.type == MessageType::FatalError)
            return checked(VI_ERROR_CONN_LOST);
        if (result == IoResult::Done && header.type == MessageType::DeviceClearAcknowledge)
            break;
    }
    if (result != IoResult::Done)
        return ended(result, limit);
    m_overlapped = (header.control & OverlapFlag) != 0;
    m_nextId = FirstMessageId;
    m_lastDeliveredId = NothingSentId;
    m_deliveredToReport = false;
    m_interruptions = 0;
    m_async->forgetInterruptions();
    return VI_SUCCESS;
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
        if (on == m_overlapped)
            return VI_SUCCESS;
        const ViStatus status = clearInto(on, limit);
        return status == VI_SUCCESS && m_overlapped != on ? VI_ERROR_NSUP_ATTR_STATE : status;
    }
    default:
        return VI_SUCCESS;
    }
}

ViStatus HislipTransport::watchServiceRequests(std::function<void()> notify)
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
