#pragma once

#include "kyvisa/os/StreamSocket.h"

#include <cstddef>
#include <memory>
#include <span>

namespace kyvisa
{

/// Input that has arrived and was not asked for yet. Its size is fixed: what does not fit stays in the system.
class ReceiveBuffer
{
public:
    explicit ReceiveBuffer(std::size_t capacity);

    std::span<const std::byte> data() const { return {m_bytes.get() + m_begin, m_end - m_begin}; }
    bool empty() const { return m_begin == m_end; }
    std::size_t capacity() const { return m_capacity; }

    void consume(std::size_t count);
    void clear() { m_begin = m_end = 0; }
    /// Moves at most @p to.size() bytes out; the number moved.
    std::size_t take(std::span<std::byte> to);

    /// Receives at least one byte.
    os::Transfer fill(os::StreamSocket &socket, const os::WaitLimit &limit);
    /// Receives what is there, without waiting.
    os::Transfer fillNow(os::StreamSocket &socket);

private:
    std::span<std::byte> room();

    std::size_t m_capacity;
    std::unique_ptr<std::byte[]> m_bytes;
    std::size_t m_begin = 0;
    std::size_t m_end = 0;
};

} // namespace kyvisa
