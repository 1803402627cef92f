#include "log/StringMessageQueue.h"

#include <algorithm>

std::mutex StringMessageQueue::s_mutex;

// Not defaulted in the class: value initialisation would then clear, and so touch, the whole ring.
StringMessageQueue::StringMessageQueue() = default;

void StringMessageQueue::addMessage(const FastBuffer *line)
{
    if (!line)
        return;
    const std::lock_guard guard(s_mutex);
    m_ring[m_position] = *line;
    m_position = (m_position & (Capacity - 1)) + 1;
    m_count = std::min(m_count + 1, Capacity);
    m_lines.fetch_add(1, std::memory_order_relaxed);
}

unsigned StringMessageQueue::copyFromQueue(FastBuffer *dest, unsigned max)
{
    const std::lock_guard guard(s_mutex);
    if (m_count == 0 || !dest)
        return 0;

    const std::uint32_t n = std::min(m_count, max);
    const std::uint32_t start = m_position - n; // wraps below zero when the lines do
    const auto ring = m_ring.cbegin();
    if (start <= Capacity) {
        std::copy_n(ring + start, n, dest);
    } else {
        const std::uint32_t older = n - m_position;
        dest = std::copy_n(ring + (Capacity - older), older, dest);
        std::copy_n(ring, m_position, dest);
    }
    return n;
}

void StringMessageQueue::clear()
{
    const std::lock_guard guard(s_mutex);
    m_position = 0;
    m_count = 0;
}
