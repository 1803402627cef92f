#include "log/MessageQueue.h"

#include <algorithm>
#include <chrono>
#include <thread>

namespace
{
// To wake a blocked consumer costs the producer a system call for each line until the consumer runs, ten times what a line
// costs otherwise. While lines come, the consumer therefore looks for the next one at growing intervals; it blocks only when
// none came for a while. The longest interval is far below the time in which a producer could fill the queue.
constexpr std::chrono::microseconds ShortestDoze(20);
constexpr std::chrono::microseconds LongestDoze(2000);
constexpr int Dozes = 500; // about a second

constexpr int WakeUpPermits = 100; // more threads than ever log to one session

constexpr std::uint32_t next(std::uint32_t index)
{
    return (index + 1) & (MessageQueue::Slots - 1);
}
} // namespace

MessageQueue::MessageQueue() : m_free(Capacity), m_used(0)
{
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    pthread_mutexattr_setpshared(&attributes, PTHREAD_PROCESS_SHARED);
    pthread_mutex_init(&m_mutex, &attributes);
    pthread_mutexattr_destroy(&attributes);
}

MessageQueue::~MessageQueue()
{
    stop();
    pthread_mutex_destroy(&m_mutex);
}

bool MessageQueue::push(const FastBuffer &line)
{
    pthread_mutex_lock(&m_mutex);
    if (!m_stopped)
        m_free.acquire();
    // Before the stop a permit means room. The permits that stop() adds do not: the consumer may still be copying the
    // slot at its index, so the indices decide.
    if (next(m_write) != m_read) {
        m_ring[m_write] = line;
        m_write = next(m_write);
        m_used.release();
    }
    pthread_mutex_unlock(&m_mutex);
    return true;
}

bool MessageQueue::pop(FastBuffer &line)
{
    if (m_stopped)
        return false;
    awaitLine();
    if (m_stopped)
        return false;
    const std::uint32_t index = m_read;
    line = m_ring[index];
    m_read = next(index);
    m_free.release();
    return true;
}

void MessageQueue::awaitLine()
{
    std::chrono::microseconds doze = ShortestDoze;
    for (int i = 0; i < Dozes; ++i) {
        if (m_used.tryAcquire())
            return;
        std::this_thread::sleep_for(doze);
        doze = std::min(2 * doze, LongestDoze);
    }
    m_used.acquire();
}

void MessageQueue::stop()
{
    m_stopped = true;
    m_free.release(WakeUpPermits);
    m_used.release(WakeUpPermits);
}
