#pragma once

#include "kyvisa/include/visatype.h"
#include "kyvisa/transport/HislipChannel.h"

#include <array>
#include <chrono>
#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <thread>

namespace kyvisa
{

/**
 * The asynchronous connection of a HiSLIP session: requests with their responses, and what the instrument says unasked.
 *
 * Whoever waits for a response reads the connection and sorts what comes by its type, so that a service request or an
 * interruption may arrive in between. As long as nobody watches for service requests that is the calling thread; from then
 * on a thread of this object reads, and callers wait for it. One caller at a time.
 *
 * A response that came too late for its call is told from the next one by counting: requests of a type are answered in order.
 * A lock that is granted too late is given back at once, by whoever receives the grant; so that somebody does, a lock request
 * that is given up starts the thread. A release that could not leave in its time follows as soon as it can.
 */
class HislipAsyncChannel
{
public:
    struct Reply {
        wire::hislip::Header header;
        std::array<std::byte, 8> payload{}; ///< its first bytes
    };

    explicit HislipAsyncChannel(os::StreamSocket socket);
    ~HislipAsyncChannel();

    ViStatus transact(const wire::hislip::Header &request, std::span<const std::byte> payload,
                      wire::hislip::MessageType expected, Reply &reply, const os::WaitLimit &limit);

    /// A request of that type is unanswered.
    bool awaits(wire::hislip::MessageType type);
    /// Waits until every request of that type was answered, also those that were given up.
    ViStatus awaitAnswers(wire::hislip::MessageType type, const os::WaitLimit &limit);

    /// AsyncLock. @param control receives that of the response. @param lastSentId names the last message on the other channel.
    ViStatus requestLock(std::chrono::milliseconds patience, std::span<const std::byte> key, std::uint32_t lastSentId,
                         std::uint8_t &control, const os::WaitLimit &limit);
    ViStatus releaseLock(std::uint32_t lastSentId, std::uint8_t &control, const os::WaitLimit &limit);

    /// AsyncInterrupted has come for this message, and its counterpart has not.
    bool interrupted(std::uint32_t messageId);
    /// The counterpart has come: true when AsyncInterrupted had, too.
    bool takeInterruption(std::uint32_t messageId);
    /// Waits for AsyncInterrupted and takes it.
    ViStatus awaitInterruption(std::uint32_t messageId, const os::WaitLimit &limit);

    /// After a device clear: interruptions and unanswered locks are things of the past.
    void forgetPast();

    /// Calls @p notify for each service request from now on.
    ViStatus watch(std::function<void()> notify);

    /// Why the instrument ended the connection, where it said so.
    std::optional<wire::hislip::FatalErrorCode> fatalError();
    /// The connection was ended because of a header that made no sense.
    bool sawBadHeader();
    /// As HislipChannel::fail(), when nothing else is being sent.
    void fail(wire::hislip::FatalErrorCode code);

    void setKeepAlive(bool on) { m_channel.socket().setKeepAlive(on); }
    void close();
    void abandon();

private:
    using Condition = std::function<std::optional<ViStatus>()>;

    /// A lock or unlock that is on its way. The two are answered alike, in order.
    struct LockCall {
        bool request = false;
        bool givenUp = false;
        std::uint32_t lastSentId = 0;
    };

    ViStatus await(const Condition &condition, const os::WaitLimit &limit);
    os::IoResult post(const wire::hislip::Header &request, std::span<const std::byte> payload, bool &begun,
                      const os::WaitLimit &limit);
    ViStatus lockCall(const wire::hislip::Header &header, std::span<const std::byte> payload, const LockCall &call,
                      std::uint8_t &control, const os::WaitLimit &limit);
    void giveUpLockCall(bool begun);
    void releaseLater(std::uint32_t lastSentId);
    void payBack(const os::Wakeup &wakeup);
    os::IoResult receiveOne(const os::WaitLimit &limit);
    os::IoResult refuse(wire::hislip::MessageType type, const os::Wakeup &wakeup);
    os::IoResult sort(const wire::hislip::Header &header, const os::WaitLimit &limit);
    void keepReply(const wire::hislip::Header &header, const std::array<std::byte, 8> &payload);
    void keepLockAnswer(std::uint8_t control);
    void lose();
    bool startReading();
    void readForEver();
    std::optional<ViStatus> answered(wire::hislip::MessageType expected, Reply &reply);

    HislipChannel m_channel; ///< receiving belongs to the thread once there is one
    std::mutex m_sending;    ///< the caller's requests, and what whoever receives has to send
    std::unique_ptr<std::thread> m_thread;
    os::Wakeup m_stop;
    os::Wakeup m_news; ///< raised by the thread after each message

    std::mutex m_mutex; ///< guards what follows
    std::function<void()> m_notify;
    std::array<unsigned, 256> m_unanswered{}; ///< requests by the type of their response
    std::optional<Reply> m_reply;
    std::deque<LockCall> m_lockCalls;
    std::optional<std::uint8_t> m_lockAnswer;
    std::deque<std::uint32_t> m_locksToReturn; ///< each by the message to name in its release
    std::optional<wire::hislip::FatalErrorCode> m_fatalError;
    bool m_sawBadHeader = false;
    std::deque<std::uint32_t> m_interrupted;
    bool m_lost = false;
};

} // namespace kyvisa
