#include "kyvisa/transport/ReceiveBuffer.h"

#include <algorithm>
#include <cstring>

namespace kyvisa
{

ReceiveBuffer::ReceiveBuffer(std::size_t capacity)
    : m_capacity(capacity), m_bytes(std::make_unique<std::byte[]>(capacity))
{
}

void ReceiveBuffer::consume(std::size_t count)
{
    m_begin += std::min(count, m_end - m_begin);
    if (m_begin == m_end)
        clear();
}

std::size_t ReceiveBuffer::take(std::span<std::byte> to)
{
    const std::size_t count = std::min(to.size(), data().size());
    if (count > 0)
        std::memcpy(to.data(), data().data(), count);
    consume(count);
    return count;
}

std::span<std::byte> ReceiveBuffer::room()
{
    if (m_end == m_capacity && m_begin > 0) {
        std::memmove(m_bytes.get(), m_bytes.get() + m_begin, m_end - m_begin);
        m_end -= m_begin;
        m_begin = 0;
    }
    return {m_bytes.get() + m_end, m_capacity - m_end};
}

os::Transfer ReceiveBuffer::fill(os::StreamSocket &socket, const os::WaitLimit &limit)
{
    const os::Transfer got = socket.receive(room(), limit);
    m_end += got.count;
    return got;
}

os::Transfer ReceiveBuffer::fillNow(os::StreamSocket &socket)
{
    const os::Transfer got = socket.receiveNow(room());
    m_end += got.count;
    return got;
}

} // namespace kyvisa
