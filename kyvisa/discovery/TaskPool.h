#pragma once

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

namespace kyvisa
{

/// Runs tasks side by side on a few threads, started as they are needed. Tasks do not throw.
class TaskPool
{
public:
    explicit TaskPool(std::size_t mostThreads) : m_mostThreads(mostThreads) {}
    ~TaskPool() { finish(); }
    TaskPool(const TaskPool &) = delete;
    TaskPool &operator=(const TaskPool &) = delete;

    /// Where no thread can be had, the task runs here and now.
    void add(std::function<void()> task);
    /// Waits until all tasks are done, and ends the threads.
    void finish();

private:
    void work();

    const std::size_t m_mostThreads;
    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::deque<std::function<void()>> m_tasks;
    std::size_t m_idle = 0;
    bool m_finishing = false;
    std::vector<std::thread> m_threads; ///< used by the owner's thread alone
};

} // namespace kyvisa
