#pragma once

#include "log/FastBuffer.h"
#include "log/LightSemaphore.h"

#include <pthread.h>

#include <array>
#include <atomic>
#include <cstdint>

/**
 * The bounded queue between the threads that log and the thread that writes the log file. Several producers, one
 * consumer.
 *
 * Full: push() waits, holding the producers' mutex, until the writer has taken a line; nothing is dropped.
 * Stopped, for good: pop() answers false at once, lines that still wait are dropped, producers that wait wake up, and
 * push() never blocks again. It stores while there is room, although nobody will read it.
 *
 * The semaphores order the hand-over of a slot: a producer fills it before it releases "used", the consumer has copied it
 * before it releases "free".
 */
class MessageQueue
{
public:
    static constexpr unsigned Slots = 16384;
    static constexpr unsigned Capacity = Slots - 1; ///< lines that can wait

    MessageQueue();
    ~MessageQueue();
    MessageQueue(const MessageQueue &) = delete;
    MessageQueue &operator=(const MessageQueue &) = delete;

    bool push(const FastBuffer &line); ///< always true
    bool pop(FastBuffer &line);        ///< false once the queue is stopped
    void stop();

private:
    void awaitLine();

    std::array<FastBuffer, Slots> m_ring;
    std::uint32_t m_write = 0;            ///< guarded by m_mutex
    std::atomic<std::uint32_t> m_read{0}; ///< the consumer's; producers look at it once stopped
    std::atomic<bool> m_stopped{false};
    LightSemaphore m_free;
    LightSemaphore m_used;
    pthread_mutex_t m_mutex; ///< process-shared; serialises producers
};
