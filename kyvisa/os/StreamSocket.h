#pragma once

#include "kyvisa/os/WaitLimit.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <sys/uio.h>

namespace kyvisa::os
{

/// A result and the bytes moved, also when it is not Done.
struct Transfer {
    IoResult result = IoResult::Done;
    std::size_t count = 0;
};

/**
 * One connected TCP socket. Every wait is bounded by a WaitLimit.
 *
 * An answer is usually here within microseconds, and then a poll before the recv would be the dearest part of a query. So
 * receive() first waits inside recv itself, which the system ends after BriefWait; only then does it poll, together with the
 * wake-up. A wake-up may be noticed that much later, a deadline not: with little time left receive() polls at once.
 *
 * One thread receives and one thread sends at a time; the two may be different threads. The owner closes it when neither
 * is inside.
 */
class StreamSocket
{
public:
    StreamSocket() = default;
    /// Takes the connected, non-blocking descriptor.
    explicit StreamSocket(int descriptor) : m_descriptor(descriptor) {}
    ~StreamSocket() { close(); }
    StreamSocket(StreamSocket &&other) noexcept;
    StreamSocket &operator=(StreamSocket &&other) noexcept;

    bool isOpen() const { return m_descriptor >= 0; }
    void close();
    /// For waiting on several at once.
    int descriptor() const { return m_descriptor; }
    /// Ends the connection both ways and keeps the descriptor, so it may come while the other thread is inside.
    void shutDown();

    /// Sends all bytes of all pieces, in one system call where the system takes them. @p pieces is used up on the way.
    Transfer send(std::span<iovec> pieces, const WaitLimit &limit);

    /// Takes what is there, at most the buffer's size, and waits when nothing is; count > 0 when Done.
    Transfer receive(std::span<std::byte> buffer, const WaitLimit &limit);
    /// Takes what is there without waiting; Done with 0 bytes when nothing is.
    Transfer receiveNow(std::span<std::byte> buffer);

    /// From now on receive() may wait in the system. Where that cannot be had it goes on polling.
    void allowBriefWaits();
    bool setNoDelay(bool on);
    /// Sizes of the system's buffers in bytes: what it rounds and limits is its own affair.
    bool setReceiveBuffer(std::size_t size);
    bool setSendBuffer(std::size_t size);
    /// Asks the peer for a sign of life after a minute of silence: firewalls forget idle connections after a few.
    bool setKeepAlive(bool on);
    /// The peer's address in numbers, or an empty text.
    std::string peerAddress() const;
    /// This end's IPv4 address in host order; 0 on a connection that is not of that family.
    std::uint32_t localIpv4Address() const;

private:
    IoResult waitFor(short events, const WaitLimit &limit) const;
    bool mayWaitBriefly(const WaitLimit &limit) const;
    Transfer receiveOnce(std::span<std::byte> buffer, int flags);

    int m_descriptor = -1;
    bool m_waitsBriefly = false; ///< blocking, and the system ends the wait of a recv
};

} // namespace kyvisa::os
