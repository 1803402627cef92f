#pragma once

#include "simulator/server/Connection.h"
#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"

#include <chrono>
#include <cstddef>
#include <deque>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace simulator
{

/**
 * The instrument's end of a serial line: a pseudo terminal, whose other end a client opens by name() as it would a serial port. Eight bits, raw, until a client
 * sets it otherwise. Never blocks, and never ends: clients come and go.
 *
 * Input waits here as in a Connection, and when the buffer is full the client's writes wait. A client that has switched on XON/XOFF stops and
 * starts the output by those two bytes, which then are no input.
 *
 * What a client has not read when it closes the port is gone, as with a port; what it has written still comes. A pseudo terminal says nothing about being
 * opened, and carries no break.
 */
class SerialLine
{
public:
    class Owner
    {
    public:
        /// There is more input, or nobody left to send any.
        virtual void received() = 0;
        /// What had to wait has been sent.
        virtual void drained() = 0;
        /// The client that sent what came so far has gone, and another one has come.
        virtual void replaced() = 0;

    protected:
        ~Owner() = default;
    };

    static constexpr std::size_t BufferSize = 64 * 1024;

    /// Throws std::system_error where there are no pseudo terminals.
    SerialLine(EventLoop &loop, Owner &owner);
    ~SerialLine();
    SerialLine(const SerialLine &) = delete;
    SerialLine &operator=(const SerialLine &) = delete;

    /// What the client opens.
    const std::string &name() const { return m_name; }
    /// Somebody has it open.
    bool connected();

    std::span<const std::byte> input() const { return {m_buffer.get() + m_begin, m_end - m_begin}; }
    void consume(std::size_t count);
    /// Goes out as far as the client takes it; nowhere when nobody is there.
    /// Nothing of it leaves before @p delay, nor anything behind it.
    void send(std::vector<Outgoing> message, std::chrono::nanoseconds delay = {});
    std::size_t unsent() const { return m_unsent; }

private:
    struct Chunk {
        Outgoing piece;
        std::chrono::nanoseconds delay; ///< from when it is the first one
    };

    bool firstIsHeld();
    void ready(std::uint32_t events);
    void read();
    void makeRoom();
    bool sawClosing();
    void look();
    void takeFlowControl(std::size_t from);
    void flush();
    void forgetOutput();
    void updateWatch();
    void openOwn();

    EventLoop &m_loop;
    Owner &m_owner;
    FileDescriptor m_line;
    FileDescriptor m_own; ///< the other end, read-only: keeps the line up, and can end a client's claim on the port
    FileDescriptor m_closings;
    std::string m_name;
    EventLoop::WatchId m_watch = 0;
    EventLoop::WatchId m_closingsWatch = 0;
    std::uint32_t m_events = 0;
    Timers::Id m_retry = Timers::None;
    bool m_connected = false; ///< when last looked

    std::unique_ptr<std::byte[]> m_buffer;
    std::size_t m_begin = 0;
    std::size_t m_end = 0;
    std::deque<Chunk> m_queue;
    std::size_t m_sentOfFirst = 0;
    std::size_t m_unsent = 0;
    Timers::Id m_hold = Timers::None; ///< the first chunk waits for it
    bool m_stopped = false;           ///< by XOFF
};

} // namespace simulator
