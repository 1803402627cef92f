#include "kyvisa/transport/HislipAsyncChannel.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/os/Poll.h"
#include "kyvisa/transport/IoStatus.h"

#include <chrono>
#include <system_error>

namespace kyvisa
{

using namespace wire::hislip;
using os::IoResult;

namespace
{

constexpr std::size_t InputCapacity = 1024;

bool isResponse(MessageType type)
{
    switch (type) {
    case MessageType::AsyncLockResponse:
    case MessageType::AsyncRemoteLocalResponse:
    case MessageType::AsyncMaximumMessageSizeResponse:
    case MessageType::AsyncInitializeResponse:
    case MessageType::AsyncStatusResponse:
    case MessageType::AsyncDeviceClearAcknowledge:
    case MessageType::AsyncLockInfoResponse:
        return true;
    default:
        return false;
    }
}

} // namespace

HislipAsyncChannel::HislipAsyncChannel(os::StreamSocket socket) : m_channel(std::move(socket), InputCapacity) {}

HislipAsyncChannel::~HislipAsyncChannel()
{
    close();
}

ViStatus HislipAsyncChannel::transact(const Header &request, std::span<const std::byte> payload, MessageType expected,
                                      Reply &reply, const os::WaitLimit &limit)
{
    {
        const std::lock_guard lock(m_mutex);
        if (m_lost)
            return VI_ERROR_CONN_LOST;
        m_reply.reset();
        ++m_unanswered[static_cast<std::uint8_t>(expected)];
    }
    std::size_t sent = 0;
    IoResult result;
    {
        const std::lock_guard sending(m_sending);
        result = m_channel.finishMessage(limit);
        if (result == IoResult::Done)
            result = m_channel.send(request, payload, limit, sent);
    }
    if (result != IoResult::Done) {
        const std::lock_guard lock(m_mutex);
        unsigned &unanswered = m_unanswered[static_cast<std::uint8_t>(expected)];
        if (unanswered > 0)
            --unanswered;
        return transferStatus(result, limit);
    }
    const ViStatus status = await([&] { return answered(expected, reply); }, limit);
    if (status != VI_ERROR_TMO)
        return status;
    // The instrument left an earlier request unanswered for good: then this answer is the one, and the count starts anew.
    const std::lock_guard lock(m_mutex);
    if (!m_reply || m_reply->header.type != expected)
        return status;
    m_unanswered[static_cast<std::uint8_t>(expected)] = 0;
    reply = *m_reply;
    return VI_SUCCESS;
}

std::optional<ViStatus> HislipAsyncChannel::answered(MessageType expected, Reply &reply)
{
    if (m_reply && m_reply->header.type == MessageType::Error) {
        m_unanswered[static_cast<std::uint8_t>(expected)] = 0;
        const auto code = static_cast<ErrorCode>(m_reply->header.control);
        return code == ErrorCode::UnknownMessageType ? VI_ERROR_NSUP_OPER : VI_ERROR_IO;
    }
    if (!m_reply || m_reply->header.type != expected || m_unanswered[static_cast<std::uint8_t>(expected)] > 0)
        return std::nullopt;
    reply = *m_reply;
    return VI_SUCCESS;
}

unsigned HislipAsyncChannel::interruptions()
{
    const std::lock_guard lock(m_mutex);
    return m_interruptions;
}

ViStatus HislipAsyncChannel::awaitInterruptions(unsigned count, const os::WaitLimit &limit)
{
    return await(
        [&]() -> std::optional<ViStatus> {
            return m_interruptions >= count ? std::optional<ViStatus>(VI_SUCCESS) : std::nullopt;
        },
        limit);
}

void HislipAsyncChannel::forgetInterruptions()
{
    const std::lock_guard lock(m_mutex);
    m_interruptions = 0;
}

ViStatus HislipAsyncChannel::await(const Condition &condition, const os::WaitLimit &limit)
{
    for (bool first = true;; first = false) {
        {
            const std::lock_guard lock(m_mutex);
            if (const auto status = condition())
                return *status;
            if (m_lost)
                return VI_ERROR_CONN_LOST;
        }
        if (!first && limit.deadline.expired())
            return VI_ERROR_TMO;
        IoResult result;
        if (m_thread) {
            std::array<pollfd, 2> watched = {pollfd{m_news.descriptor(), POLLIN, 0}};
            result = os::pollWithin(watched, limit);
            m_news.rearm();
            m_news.forgetStaleSignal();
        } else {
            result = receiveOne(limit);
        }
        if (result != IoResult::Done && result != IoResult::Closed)
            return transferStatus(result, limit);
    }
}

IoResult HislipAsyncChannel::receiveOne(const os::WaitLimit &limit)
{
    Header header;
    IoResult result = m_channel.next(header, limit);
    if (result == IoResult::Done)
        result = sort(header, limit);
    if (result == IoResult::Closed) {
        const std::lock_guard lock(m_mutex);
        m_lost = true;
    }
    return result;
}

IoResult HislipAsyncChannel::sort(const Header &header, const os::WaitLimit &limit)
{
    std::array<std::byte, 8> payload{};
    std::size_t got = 0;
    const auto wanted = static_cast<std::size_t>(std::min<std::uint64_t>(payload.size(), header.payloadLength));
    while (isResponse(header.type) && got < wanted) {
        const os::Transfer piece = m_channel.readPayload(std::span(payload).subspan(got, wanted - got), limit);
        if (piece.result != IoResult::Done)
            return piece.result;
        got += piece.count;
    }
    std::function<void()> notify;
    switch (header.type) {
    case MessageType::AsyncServiceRequest: {
        const std::lock_guard lock(m_mutex);
        notify = m_notify;
        break;
    }
    case MessageType::AsyncInterrupted: {
        const std::lock_guard lock(m_mutex);
        ++m_interruptions;
        break;
    }
    case MessageType::FatalError:
        return IoResult::Closed;
    default:
        if (isResponse(header.type) || header.type == MessageType::Error) {
            keepReply(header, payload);
        } else {
            return refuse(header.type, limit.wakeup);
        }
    }
    if (notify)
        notify();
    return IoResult::Done;
}

/// Answers a message that is not understood, unless that would have to wait: a request on its way out comes first.
IoResult HislipAsyncChannel::refuse(MessageType type, const os::Wakeup &wakeup)
{
    const std::unique_lock sending(m_sending, std::try_to_lock);
    if (!sending || m_channel.messageIsHalfSent())
        return IoResult::Done;
    const bool vendor = static_cast<std::uint8_t>(type) >= 128;
    const auto code = vendor ? ErrorCode::UnknownVendorMessage : ErrorCode::UnknownMessageType;
    std::size_t sent = 0;
    const IoResult result = m_channel.send({MessageType::Error, static_cast<std::uint8_t>(code), 0, 0}, {},
                                           {os::Deadline::now(), wakeup}, sent);
    return result == IoResult::TimedOut ? IoResult::Done : result;
}

void HislipAsyncChannel::keepReply(const Header &header, const std::array<std::byte, 8> &payload)
{
    const std::lock_guard lock(m_mutex);
    m_reply = Reply{header, payload};
    unsigned &unanswered = m_unanswered[static_cast<std::uint8_t>(header.type)];
    if (unanswered > 0)
        --unanswered;
    // A device clear ends all other transactions: their answers came before its acknowledgement, or never will.
    if (header.type == MessageType::AsyncDeviceClearAcknowledge) {
        const unsigned clears = unanswered;
        m_unanswered.fill(0);
        unanswered = clears;
    }
}

ViStatus HislipAsyncChannel::watch(std::function<void()> notify)
{
    {
        const std::lock_guard lock(m_mutex);
        if (m_lost)
            return VI_ERROR_CONN_LOST;
        m_notify = std::move(notify);
    }
    if (m_thread)
        return VI_SUCCESS;
    if (!m_stop.valid() || !m_news.valid())
        return VI_ERROR_ALLOC;
    try {
        m_thread = std::make_unique<std::thread>([this] { readForEver(); });
    } catch (const std::system_error &) {
        return VI_ERROR_ALLOC;
    }
    return VI_SUCCESS;
}

void HislipAsyncChannel::readForEver()
{
    const os::WaitLimit limit{os::Deadline::never(), m_stop};
    IoResult result = IoResult::Done;
    while (result == IoResult::Done) {
        try {
            result = receiveOne(limit);
        } catch (const std::bad_alloc &) {
            result = IoResult::NoMemory;
        }
        if (result != IoResult::Done) {
            const std::lock_guard lock(m_mutex);
            m_lost = true;
        }
        m_news.terminate();
    }
}

void HislipAsyncChannel::close()
{
    m_stop.close();
    if (m_thread) {
        m_thread->join();
        m_thread.reset();
    }
    m_channel.close();
}

void HislipAsyncChannel::abandon()
{
    static_cast<void>(m_thread.release()); // the thread is in another process: neither to be joined nor to be destroyed
    m_channel.close();
}

} // namespace kyvisa
