#include "simulator/server/Connection.h"

#include "simulator/server/FaultySend.h"

#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/epoll.h>
#include <sys/socket.h>
#include <sys/uio.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

namespace simulator
{
namespace
{

// A client that floods must leave the others their turn.
constexpr std::size_t BytesPerTurn = 4 * 1024 * 1024;
constexpr std::size_t MaxDirect = 1024 * 1024;
constexpr std::size_t MaxPieces = 64;
// A client that a fault has cut off may look at what it got before its connection goes altogether.
constexpr std::chrono::seconds PatienceForCut{2};

void setOption(int fd, int level, int option)
{
    const int on = 1;
    ::setsockopt(fd, level, option, &on, sizeof on);
}

} // namespace

Connection::Connection(EventLoop &loop, FileDescriptor socket, Owner &owner)
    : m_loop(loop), m_socket(std::move(socket)), m_owner(&owner), m_events(EPOLLIN),
      m_buffer(std::make_unique_for_overwrite<std::byte[]>(BufferSize))
{
    setOption(m_socket.get(), IPPROTO_TCP, TCP_NODELAY);
    setOption(m_socket.get(), SOL_SOCKET, SO_KEEPALIVE);
    m_watch = m_loop.watch(m_socket.get(), m_events, [this](std::uint32_t events) { ready(events); });
}

Connection::~Connection()
{
    m_loop.cancel(m_hold);
    m_loop.cancel(m_timer);
    m_loop.remove(m_watch);
}

void Connection::consume(std::size_t count)
{
    m_begin += count;
    if (m_begin == m_end)
        m_begin = m_end = 0;
    if (!m_reading)
        updateWatch();
}

void Connection::ready(std::uint32_t events)
{
    if ((events & (EPOLLERR | EPOLLHUP)) != 0) {
        // Both directions are down: whatever is still to be sent reaches nobody.
        fail();
        return;
    }
    if ((events & EPOLLOUT) != 0) {
        flush();
        if (m_queue.empty() && !m_closing && !m_failed)
            m_owner->drained();
    }
    if ((events & EPOLLIN) != 0 && !m_failed)
        read();
}

void Connection::poll()
{
    if (!m_reading && !m_failed)
        read();
}

void Connection::read()
{
    m_reading = true;
    std::size_t turn = 0;
    while (turn < BytesPerTurn && !m_inputEnded && !m_failed) {
        if (m_closing)
            m_begin = m_end = 0; // thrown away
        std::span<std::byte> to;
        if (m_begin == m_end && !m_closing)
            to = m_owner->directInput();
        const bool direct = !to.empty();
        if (direct) {
            to = to.first(std::min(to.size(), MaxDirect));
        } else {
            if (m_begin > 0 && m_end == BufferSize) {
                std::memmove(m_buffer.get(), m_buffer.get() + m_begin, m_end - m_begin);
                m_end -= std::exchange(m_begin, 0);
            }
            to = {m_buffer.get() + m_end, BufferSize - m_end};
        }
        if (to.empty())
            break;
        const ssize_t count = ::recv(m_socket.get(), to.data(), to.size(), 0);
        if (count < 0) {
            if (errno == EINTR)
                continue;
            if (errno != EAGAIN && errno != EWOULDBLOCK)
                fail();
            break;
        }
        const auto size = static_cast<std::size_t>(count);
        turn += size;
        m_inputEnded = size == 0;
        if (m_closing) {
            if (m_inputEnded && m_queue.empty())
                fail();
        } else if (direct && size > 0) {
            m_owner->directReceived(size);
        } else {
            m_end += size;
            m_owner->received();
        }
        if (size < to.size())
            break;
    }
    m_reading = false;
    updateWatch();
}

void Connection::send(std::vector<Outgoing> message, std::chrono::nanoseconds delay)
{
    if (m_cut)
        return;
    const bool wasEmpty = m_queue.empty();
    bool first = true;
    for (Outgoing &piece : message) {
        m_unsent += piece.size();
        m_queue.push_back({std::move(piece), std::exchange(first, false), std::exchange(delay, {})});
    }
    if (wasEmpty)
        flush();
}

void Connection::send(std::string message)
{
    std::vector<Outgoing> pieces;
    pieces.push_back({std::move(message), nullptr, {}});
    send(std::move(pieces));
}

void Connection::sendPast(Faults &faults, const MessageForm &form, std::vector<Outgoing> message)
{
    if (!faults.any())
        return send(std::move(message));
    const Delivery delivery = passFaults(faults, form, message);
    if (delivery.dropped)
        return;
    send(std::move(message), delivery.delay);
    if (!delivery.cut)
        return;
    m_cut = true;
    closeAfterSending(PatienceForCut + std::chrono::ceil<std::chrono::milliseconds>(delivery.delay));
}

/// True while the first chunk has to wait for its time.
bool Connection::firstIsHeld()
{
    std::chrono::nanoseconds &delay = m_queue.front().delay;
    if (delay > std::chrono::nanoseconds{0}) {
        const std::chrono::nanoseconds wait = std::exchange(delay, {});
        m_hold = m_loop.after(wait, [this] {
            m_hold = Timers::None;
            flush();
            if (m_queue.empty() && !m_closing && !m_failed)
                m_owner->drained();
        });
    }
    return m_hold != Timers::None;
}

void Connection::flush()
{
    std::size_t turn = 0;
    while (!m_queue.empty() && !m_failed && turn < BytesPerTurn && !firstIsHeld()) {
        std::array<iovec, MaxPieces> pieces;
        std::size_t count = 0;
        std::size_t skip = m_sentOfFirst;
        const auto add = [&](const void *data, std::size_t size) {
            const std::size_t skipped = std::min(skip, size);
            skip -= skipped;
            if (size > skipped)
                pieces[count++] = {const_cast<char *>(static_cast<const char *>(data)) + skipped, size - skipped};
        };
        for (auto chunk = m_queue.begin(); chunk != m_queue.end() && count + 2 <= MaxPieces; ++chunk) {
            if (chunk->delay > std::chrono::nanoseconds{0})
                break;
            add(chunk->piece.text.data(), chunk->piece.text.size());
            add(chunk->piece.bytes.data(), chunk->piece.bytes.size());
        }
        msghdr message{};
        message.msg_iov = pieces.data();
        message.msg_iovlen = count;
        const ssize_t sent = ::sendmsg(m_socket.get(), &message, MSG_NOSIGNAL);
        if (sent < 0) {
            if (errno == EINTR)
                continue;
            if (errno != EAGAIN && errno != EWOULDBLOCK)
                fail();
            break;
        }
        turn += static_cast<std::size_t>(sent);
        m_unsent -= static_cast<std::size_t>(sent);
        m_sentOfFirst += static_cast<std::size_t>(sent);
        while (!m_queue.empty()) {
            const std::size_t size = m_queue.front().piece.size();
            if (m_sentOfFirst < size)
                break;
            m_sentOfFirst -= size;
            m_queue.pop_front();
        }
    }
    if (m_queue.empty() && m_closing)
        finishSending();
    if (!m_reading)
        updateWatch();
}

void Connection::finishSending()
{
    // What the peer still sends is read and thrown away until it closes too: closing with unread input would cut off our last words.
    ::shutdown(m_socket.get(), SHUT_WR);
    if (m_inputEnded)
        fail();
}

void Connection::dropUnsent()
{
    auto chunk = m_queue.begin();
    if (m_sentOfFirst > 0)
        ++chunk;
    while (chunk != m_queue.end() && !chunk->beginsMessage)
        ++chunk;
    for (auto dropped = chunk; dropped != m_queue.end(); ++dropped)
        m_unsent -= dropped->piece.size();
    if (chunk == m_queue.begin())
        m_loop.cancel(std::exchange(m_hold, Timers::None));
    m_queue.erase(chunk, m_queue.end());
}

void Connection::closeAfterSending(std::chrono::milliseconds patience)
{
    if (m_closing || m_failed)
        return;
    m_closing = true;
    m_begin = m_end = 0;
    m_timer = m_loop.after(patience, [this] { fail(); });
    if (m_queue.empty())
        finishSending();
    updateWatch();
}

void Connection::updateWatch()
{
    std::uint32_t events = 0;
    const bool room = m_begin > 0 || m_end < BufferSize;
    if (!m_inputEnded && (m_closing || room))
        events |= EPOLLIN;
    if (!m_queue.empty() && m_hold == Timers::None)
        events |= EPOLLOUT;
    if (events != m_events && !m_failed)
        m_loop.change(m_watch, m_events = events);
}

void Connection::fail()
{
    if (std::exchange(m_failed, true))
        return;
    m_loop.cancel(m_timer);
    m_timer = m_loop.after({}, [this] {
        m_timer = Timers::None;
        m_owner->closed();
    });
}

} // namespace simulator
