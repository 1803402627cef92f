#include "kyvisa/discovery/TaskPool.h"

#include "kyvisa/os/Thread.h"

#include <exception>
#include <utility>

namespace kyvisa
{

void TaskPool::add(std::function<void()> task)
{
    bool enough;
    {
        const std::lock_guard lock(m_mutex);
        m_tasks.push_back(std::move(task));
        enough = m_idle >= m_tasks.size() || m_threads.size() >= m_mostThreads;
    }
    m_changed.notify_one();
    if (enough)
        return;
    try {
        m_threads.reserve(m_threads.size() + 1); // a thread that runs must have its place
        m_threads.push_back(os::startThread([this] { work(); }));
    } catch (const std::exception &) { // neither a thread nor memory for one
        if (!m_threads.empty())
            return;
        std::function<void()> own = std::move(m_tasks.back());
        m_tasks.pop_back();
        own();
    }
}

void TaskPool::finish()
{
    {
        const std::lock_guard lock(m_mutex);
        m_finishing = true;
    }
    m_changed.notify_all();
    for (std::thread &thread : std::exchange(m_threads, {}))
        thread.join();
}

void TaskPool::work()
{
    std::unique_lock lock(m_mutex);
    for (;;) {
        ++m_idle;
        m_changed.wait(lock, [this] { return m_finishing || !m_tasks.empty(); });
        --m_idle;
        if (m_tasks.empty())
            return;
        const std::function<void()> task = std::move(m_tasks.front());
        m_tasks.pop_front();
        lock.unlock();
        task();
        lock.lock();
    }
}

} // namespace kyvisa
