#pragma once

#include <QSemaphore>

#include <algorithm>
#include <atomic>

/**
 * A QSemaphore with a counter before it, for a producer that must not make a system call for each line: QSemaphore makes one
 * with every release that finds permits there already, whether somebody waits or not. Here the semaphore behind the counter has
 * permits only while somebody is being woken.
 *
 * The counter is the number of permits, or minus the number of threads that wait. Any thread may call.
 */
class LightSemaphore
{
public:
    explicit LightSemaphore(int permits) : m_count(permits) {}

    /// Takes a permit, waiting for one.
    void acquire()
    {
        if (m_count.fetch_sub(1) <= 0)
            m_sleepers.acquire();
    }

    /// Takes a permit if there is one.
    bool tryAcquire()
    {
        int count = m_count.load();
        while (count > 0)
            if (m_count.compare_exchange_weak(count, count - 1))
                return true;
        return false;
    }

    /// Adds @p permits and wakes as many waiting threads.
    void release(int permits = 1)
    {
        const int before = m_count.fetch_add(permits);
        if (before < 0)
            m_sleepers.release(std::min(-before, permits));
    }

private:
    std::atomic<int> m_count;
    QSemaphore m_sleepers{0};
};
