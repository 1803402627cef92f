#pragma once

#include "kyvisa/os/ListeningSocket.h"
#include "kyvisa/os/Wakeup.h"
#include "wire/RpcRecord.h"
#include "wire/Vxi11.h"

#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

namespace kyvisa
{

/**
 * This end of the interrupt channel of VXI-11: a small server, to which the instrument connects and tells of service requests.
 *
 * It listens from the beginning on a thread of its own, because the instrument connects before it answers the call that
 * asks for it. Each session has its own; a request is known by the handle that the instrument was given, wherever in a record
 * it stands: instruments were seen that get the rest wrong. The call is one-way, and yet some instruments wait for an answer
 * before they do anything else, so it gets one if that can be sent at once; the others never read it.
 *
 * Whatever comes here, and whoever connects, the session's own connection does not notice.
 */
class Vxi11Interrupt
{
public:
    Vxi11Interrupt() = default;
    ~Vxi11Interrupt();
    Vxi11Interrupt(const Vxi11Interrupt &) = delete;
    Vxi11Interrupt &operator=(const Vxi11Interrupt &) = delete;

    /// Begins to listen on this machine's @p address. False when the system has nothing left for it.
    bool start(std::uint32_t address);
    /// Called from now on for each request, on this object's thread.
    void setNotify(std::function<void()> notify);

    /// What the instrument is told.
    wire::vxi11::RemoteFunc where() const;
    wire::xdr::Bytes handle() const { return std::as_bytes(std::span(m_handle)); }

    /// Instead of the destructor in a forked child.
    void abandon();

private:
    struct Channel {
        os::StreamSocket socket;
        wire::rpc::RecordReader records;
    };

    void serve();
    bool receive(Channel &channel);
    void take(Channel &channel);

    os::ListeningSocket m_listener;
    std::uint32_t m_address = 0;
    std::string m_handle;
    os::Wakeup m_stop;
    std::unique_ptr<std::thread> m_thread;
    std::list<Channel> m_channels; ///< the thread's

    std::mutex m_mutex; ///< guards what follows
    std::function<void()> m_notify;
};

} // namespace kyvisa
