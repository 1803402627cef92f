#include "kyvisa/transport/HislipAsyncChannel.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/os/Poll.h"
#include "kyvisa/os/Thread.h"
#include "kyvisa/transport/IoStatus.h"

#include <algorithm>
#include <system_error>

namespace kyvisa
{

using namespace wire::hislip;
using os::IoResult;

namespace
{

constexpr std::size_t InputCapacity = 1024;
/// AsyncInterrupted messages without a counterpart that are kept. One is the rule.
constexpr std::size_t MostInterruptions = 16;
constexpr std::uint8_t LockGranted = 1;

bool isResponse(MessageType type)
{
    switch (type) {
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

/// Sends a request behind what is left of an earlier one. @param begun some of it left.
IoResult HislipAsyncChannel::post(const Header &request, std::span<const std::byte> payload, bool &begun,
                                  const os::WaitLimit &limit)
{
    std::size_t sent = 0;
    IoResult result;
    begun = false;
    {
        const std::lock_guard sending(m_sending);
        result = m_channel.finishMessage(limit);
        if (result == IoResult::Done) {
            result = m_channel.send(request, payload, limit, sent);
            begun = result == IoResult::Done || m_channel.messageIsHalfSent();
        }
    }
    payBack(limit.wakeup);
    return result;
}

ViStatus HislipAsyncChannel::transact(const Header &request, std::span<const std::byte> payload, MessageType expected,
                                      Reply &reply, const os::WaitLimit &limit)
{
    unsigned &unanswered = m_unanswered[static_cast<std::uint8_t>(expected)];
    {
        const std::lock_guard lock(m_mutex);
        if (m_lost)
            return VI_ERROR_CONN_LOST;
        m_reply.reset();
        ++unanswered;
    }
    bool begun = false;
    const IoResult result = post(request, payload, begun, limit);
    if (result != IoResult::Done) {
        // What was cut in the middle is finished before the next request, and then it is answered.
        const std::lock_guard lock(m_mutex);
        if (!begun && unanswered > 0)
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
    unanswered = 0;
    reply = *m_reply;
    return VI_SUCCESS;
}

bool HislipAsyncChannel::awaits(MessageType type)
{
    const std::lock_guard lock(m_mutex);
    return m_unanswered[static_cast<std::uint8_t>(type)] > 0;
}

ViStatus HislipAsyncChannel::awaitAnswers(MessageType type, const os::WaitLimit &limit)
{
    {
        const std::lock_guard sending(m_sending);
        if (const IoResult result = m_channel.finishMessage(limit); result != IoResult::Done)
            return transferStatus(result, limit);
    }
    return await(
        [&]() -> std::optional<ViStatus> {
            return m_unanswered[static_cast<std::uint8_t>(type)] == 0 ? std::optional<ViStatus>(VI_SUCCESS)
                                                                      : std::nullopt;
        },
        limit);
}

ViStatus HislipAsyncChannel::requestLock(std::chrono::milliseconds patience, std::span<const std::byte> key,
                                         std::uint32_t lastSentId, std::uint8_t &control, const os::WaitLimit &limit)
{
    const auto milliseconds = static_cast<std::uint32_t>(patience.count());
    return lockCall({MessageType::AsyncLock, 1, milliseconds, key.size()}, key, {true, false, lastSentId}, control,
                    limit);
}

ViStatus HislipAsyncChannel::releaseLock(std::uint32_t lastSentId, std::uint8_t &control, const os::WaitLimit &limit)
{
    return lockCall({MessageType::AsyncLock, 0, lastSentId, 0}, {}, {false, false, lastSentId}, control, limit);
}

ViStatus HislipAsyncChannel::lockCall(const Header &header, std::span<const std::byte> payload, const LockCall &call,
                                      std::uint8_t &control, const os::WaitLimit &limit)
{
    // Answers to lock and unlock look alike: those that were given up come first.
    IoResult finished;
    {
        const std::lock_guard sending(m_sending);
        finished = m_channel.finishMessage(limit);
    }
    if (finished != IoResult::Done) {
        if (!call.request)
            releaseLater(call.lastSentId);
        return transferStatus(finished, limit);
    }
    payBack(limit.wakeup);
    const ViStatus settled = await(
        [this]() -> std::optional<ViStatus> {
            return m_lockCalls.empty() && m_locksToReturn.empty() ? std::optional<ViStatus>(VI_SUCCESS) : std::nullopt;
        },
        limit);
    if (settled != VI_SUCCESS && !call.request)
        releaseLater(call.lastSentId);
    if (settled != VI_SUCCESS)
        return settled == VI_ERROR_TMO && call.request ? VI_ERROR_RSRC_LOCKED : settled;
    {
        const std::lock_guard lock(m_mutex);
        m_reply.reset();
        m_lockAnswer.reset();
        m_lockCalls.push_back(call);
    }
    bool begun = false;
    const IoResult result = post(header, payload, begun, limit);
    if (result != IoResult::Done) {
        giveUpLockCall(begun);
        if (!begun && !call.request)
            releaseLater(call.lastSentId);
        return transferStatus(result, limit);
    }
    const ViStatus status = await(
        [&]() -> std::optional<ViStatus> {
            if (m_lockAnswer)
                return VI_SUCCESS;
            if (!m_reply || m_reply->header.type != MessageType::Error)
                return std::nullopt;
            m_lockCalls.clear();
            return static_cast<ErrorCode>(m_reply->header.control) == ErrorCode::UnknownMessageType ? VI_ERROR_NSUP_OPER
                                                                                                    : VI_ERROR_IO;
        },
        limit);
    if (status != VI_SUCCESS) {
        giveUpLockCall(true);
        return status;
    }
    const std::lock_guard lock(m_mutex);
    control = *m_lockAnswer;
    return VI_SUCCESS;
}

/// @param begun the request left, at least in part, so it will be answered.
void HislipAsyncChannel::giveUpLockCall(bool begun)
{
    bool mayBeGranted = false;
    {
        const std::lock_guard lock(m_mutex);
        if (m_lockCalls.empty() || m_lost)
            return;
        if (begun) {
            m_lockCalls.back().givenUp = true;
            mayBeGranted = m_lockCalls.back().request;
        } else {
            m_lockCalls.pop_back();
        }
    }
    if (mayBeGranted && !m_stop.closed())
        startReading();
}

/// The caller takes the lock for released, so it has to be, sooner or later.
void HislipAsyncChannel::releaseLater(std::uint32_t lastSentId)
{
    {
        const std::lock_guard lock(m_mutex);
        if (m_lost)
            return;
        m_locksToReturn.push_back(lastSentId);
    }
    if (!m_stop.closed())
        startReading();
}

/// Returns a lock that came too late, unless that would have to wait: then the next request on its way out does it.
void HislipAsyncChannel::payBack(const os::Wakeup &wakeup)
{
    const std::unique_lock sending(m_sending, std::try_to_lock);
    if (!sending || m_channel.messageIsHalfSent())
        return;
    std::uint32_t lastSentId = 0;
    {
        const std::lock_guard lock(m_mutex);
        // An answer that is still to come would look like that to this release.
        if (m_locksToReturn.empty() || !m_lockCalls.empty())
            return;
        lastSentId = m_locksToReturn.front();
        m_locksToReturn.pop_front();
        m_lockCalls.push_back({false, true, lastSentId});
    }
    std::size_t sent = 0;
    const IoResult result =
        m_channel.send({MessageType::AsyncLock, 0, lastSentId, 0}, {}, {os::Deadline::now(), wakeup}, sent);
    if (result == IoResult::Done || m_channel.messageIsHalfSent())
        return;
    const std::lock_guard lock(m_mutex);
    m_lockCalls.pop_back();
    m_locksToReturn.push_front(lastSentId);
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

bool HislipAsyncChannel::interrupted(std::uint32_t messageId)
{
    const std::lock_guard lock(m_mutex);
    return std::find(m_interrupted.begin(), m_interrupted.end(), messageId) != m_interrupted.end();
}

bool HislipAsyncChannel::takeInterruption(std::uint32_t messageId)
{
    const std::lock_guard lock(m_mutex);
    return std::erase(m_interrupted, messageId) > 0;
}

ViStatus HislipAsyncChannel::awaitInterruption(std::uint32_t messageId, const os::WaitLimit &limit)
{
    return await(
        [&]() -> std::optional<ViStatus> {
            return std::erase(m_interrupted, messageId) > 0 ? std::optional<ViStatus>(VI_SUCCESS) : std::nullopt;
        },
        limit);
}

void HislipAsyncChannel::forgetPast()
{
    const std::lock_guard lock(m_mutex);
    m_interrupted.clear();
    m_lockCalls.clear();
    // Messages are counted anew: none of the new ones has to come before.
    std::fill(m_locksToReturn.begin(), m_locksToReturn.end(), NothingSentId);
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
    if (result == IoResult::Closed)
        lose();
    return result;
}

void HislipAsyncChannel::lose()
{
    const std::lock_guard lock(m_mutex);
    m_lost = true;
    m_sawBadHeader = m_channel.sawBadHeader();
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
        m_interrupted.push_back(header.parameter);
        if (m_interrupted.size() > MostInterruptions)
            m_interrupted.pop_front();
        break;
    }
    case MessageType::AsyncLockResponse:
        keepLockAnswer(header.control);
        payBack(limit.wakeup);
        break;
    case MessageType::FatalError: {
        const std::lock_guard lock(m_mutex);
        m_fatalError = static_cast<FatalErrorCode>(header.control);
        return IoResult::Closed;
    }
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

void HislipAsyncChannel::keepLockAnswer(std::uint8_t control)
{
    const std::lock_guard lock(m_mutex);
    if (m_lockCalls.empty())
        return; // nobody asked
    const LockCall call = m_lockCalls.front();
    m_lockCalls.pop_front();
    if (!call.givenUp)
        m_lockAnswer = control;
    else if (call.request && control == LockGranted)
        m_locksToReturn.push_back(call.lastSentId);
}

ViStatus HislipAsyncChannel::watch(std::function<void()> notify)
{
    {
        const std::lock_guard lock(m_mutex);
        if (m_lost)
            return VI_ERROR_CONN_LOST;
        m_notify = std::move(notify);
    }
    return startReading() ? VI_SUCCESS : VI_ERROR_ALLOC;
}

bool HislipAsyncChannel::startReading()
{
    if (m_thread)
        return true;
    if (!m_stop.valid() || !m_news.valid())
        return false;
    try {
        auto thread = std::make_unique<std::thread>(); // before it runs: without room for it there is none to end
        *thread = os::startThread([this] { readForEver(); });
        m_thread = std::move(thread);
    } catch (const std::system_error &) {
        return false;
    }
    return true;
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
        if (result != IoResult::Done)
            lose();
        m_news.terminate();
    }
}

std::optional<FatalErrorCode> HislipAsyncChannel::fatalError()
{
    const std::lock_guard lock(m_mutex);
    return m_fatalError;
}

bool HislipAsyncChannel::sawBadHeader()
{
    const std::lock_guard lock(m_mutex);
    return m_sawBadHeader;
}

void HislipAsyncChannel::fail(FatalErrorCode code)
{
    const std::unique_lock sending(m_sending, std::try_to_lock);
    if (sending && !m_channel.messageIsHalfSent())
        m_channel.fail(code);
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
    m_stop.abandon();
    m_news.abandon();
}

} // namespace kyvisa
