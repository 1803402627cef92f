#pragma once

#include "kyvisa/include/visatype.h"
#include "kyvisa/transport/HislipChannel.h"

#include <array>
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

    /// AsyncInterrupted messages since the beginning or the last device clear.
    unsigned interruptions();
    /// Waits until there were at least @p count.
    ViStatus awaitInterruptions(unsigned count, const os::WaitLimit &limit);
    void forgetInterruptions();

    /// Calls @p notify for each service request from now on.
    ViStatus watch(std::function<void()> notify);

    void setKeepAlive(bool on) { m_channel.socket().setKeepAlive(on); }
    void close();
    void abandon();

private:
    using Condition = std::function<std::optional<ViStatus>()>;

    ViStatus await(const Condition &condition, const os::WaitLimit &limit);
    os::IoResult receiveOne(const os::WaitLimit &limit);
    os::IoResult refuse(wire::hislip::MessageType type, const os::Wakeup &wakeup);
    os::IoResult sort(const wire::hislip::Header &header, const os::WaitLimit &limit);
    void keepReply(const wire::hislip::Header &header, const std::array<std::byte, 8> &payload);
    void readForEver();
    std::optional<ViStatus> answered(wire::hislip::MessageType expected, Reply &reply);

    HislipChannel m_channel; ///< receiving belongs to the thread once there is one
    std::mutex m_sending;    ///< the caller's requests, and refusals by whoever receives
    std::unique_ptr<std::thread> m_thread;
    os::Wakeup m_stop;
    os::Wakeup m_news; ///< raised by the thread after each message

    std::mutex m_mutex; ///< guards what follows
    std::function<void()> m_notify;
    std::array<unsigned, 256> m_unanswered{}; ///< requests by the type of their response
    std::optional<Reply> m_reply;
    unsigned m_interruptions = 0;
    bool m_lost = false;
};

} // namespace kyvisa
