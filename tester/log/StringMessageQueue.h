#pragma once

#include "log/FastBuffer.h"

#include <array>
#include <atomic>
#include <cstdint>
#include <mutex>

/**
 * The ring of recent lines that the live view polls. Never blocks and never refuses: old lines are overwritten.
 *
 * Any thread adds, the user-interface thread copies. One mutex serves all rings of the process; when it cannot be locked,
 * the operation throws std::system_error.
 *
 * A ring is 4 MB of slots that are touched only as lines come in.
 */
class StringMessageQueue
{
public:
    static constexpr unsigned Capacity = 8192;

    StringMessageQueue();

    /// Ignores a null @p line.
    void addMessage(const FastBuffer *line);
    /// Copies the newest min(held, @p max) lines to @p dest, oldest first; returns how many. A null @p dest gets none.
    unsigned copyFromQueue(FastBuffer *dest, unsigned max);
    /// Lines ever added; clear() does not reset it.
    std::uint64_t getLines() const { return m_lines.load(std::memory_order_relaxed); }
    void clear();

private:
    static std::mutex s_mutex;

    // The write position advances 0, 1 .. 8192, 1 .. 8192: the slot behind the ring takes the line written at 8192.
    std::array<FastBuffer, Capacity + 1> m_ring;
    std::uint32_t m_position = 0;
    std::uint32_t m_count = 0;
    std::atomic<std::uint64_t> m_lines{0};
};
