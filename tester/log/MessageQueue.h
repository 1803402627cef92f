#pragma once

#include "log/FastBuffer.h"

#include <QSemaphore>

#include <pthread.h>

#include <array>
#include <atomic>
#include <cstdint>

/**
 * The bounded queue between the threads that log and the thread that writes the log file.
 *
 * Full: push() waits until the writer has taken a line; nothing is dropped. Stopped: pop() answers false at once, lines
 * that still wait are dropped, and push() never blocks again. Several producers, one consumer.
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

    bool push(const FastBuffer &line);
    bool pop(FastBuffer &line);
    void stop();

private:
    std::array<FastBuffer, Slots> m_ring;
    std::uint32_t m_write = 0;
    std::uint32_t m_read = 0;
    std::atomic<bool> m_stopped{false};
    QSemaphore m_free;
    QSemaphore m_used;
    pthread_mutex_t m_mutex;
};
