#include "log/MessageQueue.h"

namespace
{
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
    m_used.acquire();
    if (m_stopped)
        return false;
    const std::uint32_t index = m_read;
    line = m_ring[index];
    m_read = next(index);
    m_free.release();
    return true;
}

void MessageQueue::stop()
{
    m_stopped = true;
    m_free.release(WakeUpPermits);
    m_used.release(WakeUpPermits);
}
