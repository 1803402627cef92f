#pragma once

#include "kyvisa/os/WaitLimit.h"

#include <cstddef>
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
 * One connected TCP socket, non-blocking underneath: every wait is bounded by a WaitLimit.
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
    /// Ends the connection both ways and keeps the descriptor, so it may come while the other thread is inside.
    void shutDown();

    /// Sends all bytes of all pieces, in one system call where the system takes them. @p pieces is used up on the way.
    Transfer send(std::span<iovec> pieces, const WaitLimit &limit);

    /// Takes what is there, at most the buffer's size, and waits when nothing is; count > 0 when Done.
    Transfer receive(std::span<std::byte> buffer, const WaitLimit &limit);
    /// Takes what is there without waiting; Done with 0 bytes when nothing is.
    Transfer receiveNow(std::span<std::byte> buffer);

    bool setNoDelay(bool on);
    /// Asks the peer for a sign of life after a minute of silence: firewalls forget idle connections after a few.
    bool setKeepAlive(bool on);
    /// The peer's address in numbers, or an empty text.
    std::string peerAddress() const;

private:
    IoResult waitFor(short events, const WaitLimit &limit) const;

    int m_descriptor = -1;
};

} // namespace kyvisa::os
