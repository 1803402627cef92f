#pragma once

#include "simulator/server/BoundSocket.h"
#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"
#include "simulator/server/Outgoing.h"

#include <cstddef>
#include <deque>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace simulator
{

class Faults;
struct MessageForm;

/**
 * One TCP connection: a receive buffer of fixed size and a queue of what is to be sent. Never blocks.
 *
 * The owner looks at input() whenever received() says that there is more, and consumes what it can use; what it leaves stays, and when
 * the buffer is full nothing more is read until it consumes. So a client that is made to wait fills its own TCP connection and no memory here.
 *
 * What is sent goes out at once as far as the peer takes it. Broken connections are reported by closed(), which always comes from the loop, never from
 * inside a call of the owner.
 */
class Connection
{
public:
    class Owner
    {
    public:
        /// There is more input, or its end.
        virtual void received() = 0;
        /// Where the next bytes belong when the buffer is empty; then they skip it.
        virtual std::span<std::byte> directInput() { return {}; }
        virtual void directReceived(std::size_t count) { static_cast<void>(count); }
        /// What had to wait has been sent.
        virtual void drained() {}
        /// The connection broke. Destroy it later, not now.
        virtual void closed() = 0;

    protected:
        ~Owner() = default;
    };

    static constexpr std::size_t BufferSize = 64 * 1024;

    Connection(EventLoop &loop, FileDescriptor socket, Owner &owner);
    ~Connection();
    Connection(const Connection &) = delete;
    Connection &operator=(const Connection &) = delete;

    /// Changes who is called; the input stays.
    void setOwner(Owner &owner) { m_owner = &owner; }

    std::span<const std::byte> input() const { return {m_buffer.get() + m_begin, m_end - m_begin}; }
    void consume(std::size_t count);
    /// The peer will send nothing more; input() holds the last of it.
    bool inputEnded() const { return m_inputEnded; }
    /// Reads what has arrived by now, as if the loop had come by.
    void poll();

    /// Queues a message and sends what the peer takes. Nothing of it leaves before @p delay, nor anything behind it.
    void send(std::vector<Outgoing> message, std::chrono::nanoseconds delay = {});
    void send(std::string message);
    /// As send(), in the way that the faults leave to a message of this form.
    void sendPast(Faults &faults, const MessageForm &form, std::vector<Outgoing> message);
    /// Forgets whole messages of which no byte has been sent.
    void dropUnsent();
    std::size_t unsent() const { return m_unsent; }
    /// The client's address and port.
    std::string peer() const { return peerOf(m_socket); }
    /// Closes when everything has been sent, and after @p patience at the latest; input is ignored. closed() follows.
    void closeAfterSending(std::chrono::milliseconds patience);

private:
    struct Chunk {
        Outgoing piece;
        bool beginsMessage;
        std::chrono::nanoseconds delay; ///< from when it is the first one
    };

    void ready(std::uint32_t events);
    void read();
    void flush();
    bool firstIsHeld();
    void finishSending();
    void updateWatch();
    void fail();

    EventLoop &m_loop;
    FileDescriptor m_socket;
    Owner *m_owner;
    EventLoop::WatchId m_watch;
    std::uint32_t m_events = 0;

    std::unique_ptr<std::byte[]> m_buffer;
    std::size_t m_begin = 0;
    std::size_t m_end = 0;
    bool m_inputEnded = false;
    bool m_reading = false;

    std::deque<Chunk> m_queue;
    std::size_t m_sentOfFirst = 0; ///< bytes of the first chunk that are gone
    std::size_t m_unsent = 0;
    Timers::Id m_hold = Timers::None; ///< the first chunk waits for it
    bool m_cut = false;               ///< what is said from now on reaches nobody
    bool m_closing = false;
    bool m_failed = false;
    Timers::Id m_timer = Timers::None;
};

} // namespace simulator
