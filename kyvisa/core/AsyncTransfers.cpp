#include "kyvisa/core/AsyncTransfers.h"

#include "kyvisa/core/Event.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/Thread.h"
#include "kyvisa/os/Wakeup.h"

#include <algorithm>
#include <new>
#include <system_error>

namespace kyvisa
{
namespace
{

/// A program that starts jobs without looking at how they end must not fill the memory.
constexpr std::size_t MaxWaiting = 1024;

/// Of the whole process, so that the job of one session is unknown to every other.
ViJobId nextJob()
{
    static std::atomic<ViJobId> last{VI_NULL};
    ViJobId id = ++last;
    while (id == VI_NULL)
        id = ++last;
    return id;
}

} // namespace

AsyncTransfers::AsyncTransfers(IoGate &gate, os::Wakeup &wakeup, Transfer transfer, Completion completion)
    : m_gate(gate), m_wakeup(wakeup), m_transfer(std::move(transfer)), m_completion(std::move(completion))
{
}

AsyncTransfers::~AsyncTransfers()
{
    close();
}

ViStatus AsyncTransfers::start(bool reads, std::span<std::byte> buffer, ViJobId *id)
{
    const std::lock_guard lock(m_mutex);
    if (m_closed)
        return VI_ERROR_INV_OBJECT;
    if (m_waiting.size() >= MaxWaiting)
        return VI_ERROR_QUEUE_ERROR;
    if (!m_thread.joinable()) {
        try {
            m_thread = os::startThread([this] { run(); });
        } catch (const std::system_error &) {
            return VI_ERROR_QUEUE_ERROR;
        }
    }
    Job &job = m_waiting.emplace_back(Job{.reads = reads, .buffer = buffer, .id = nextJob()});
    try {
        job.place = m_gate.reserve();
    } catch (...) {
        m_waiting.pop_back();
        throw;
    }
    if (id)
        *id = job.id;
    m_changed.notify_all();
    return VI_SUCCESS;
}

void AsyncTransfers::run()
{
    std::unique_lock lock(m_mutex);
    for (;;) {
        m_changed.wait(lock, [this] { return m_closed || !m_waiting.empty(); });
        if (m_closed)
            return;
        const Job job = m_waiting.front();
        m_waiting.pop_front();
        m_current = job.id;
        m_cancelled.store(false);
        lock.unlock();
        std::size_t count = 0;
        ViStatus status = VI_ERROR_SYSTEM_ERROR;
        try {
            status = m_transfer(job, m_cancelled, count);
        } catch (const std::bad_alloc &) {
            status = VI_ERROR_ALLOC;
        } catch (...) {
            // The status says so.
        }
        m_gate.giveUp(job.place); // a job that failed before it came to the gate
        lock.lock();
        m_current = VI_NULL;
        if (!m_closed)
            complete(job, status, count);
    }
}

/// With the lock: completions come in the order in which jobs leave the line.
void AsyncTransfers::complete(const Job &job, ViStatus status, std::size_t count) const
{
    try {
        m_completion({.type = VI_EVENT_IO_COMPLETION,
                      .status = status,
                      .operation = job.reads ? "viReadAsync" : "viWriteAsync",
                      .job = job.id,
                      .buffer = job.buffer.data(),
                      .count = count});
    } catch (...) {
        // No memory for the event: it is lost, as one that finds its queue full.
    }
}

void AsyncTransfers::cancelCurrent()
{
    m_cancelled.store(true);
    if (m_talking)
        m_wakeup.terminate();
    else
        m_gate.wake();
}

ViStatus AsyncTransfers::terminate(ViJobId id)
{
    const std::lock_guard lock(m_mutex);
    if (id == VI_NULL || m_closed)
        return VI_ERROR_INV_JOB_ID;
    if (m_current == id) {
        cancelCurrent();
        return VI_SUCCESS;
    }
    const auto found =
        std::find_if(m_waiting.begin(), m_waiting.end(), [id](const Job &waiting) { return waiting.id == id; });
    if (found == m_waiting.end())
        return VI_ERROR_INV_JOB_ID;
    abort(*found);
    m_waiting.erase(found);
    return VI_SUCCESS;
}

void AsyncTransfers::terminateAll()
{
    const std::lock_guard lock(m_mutex);
    if (m_closed)
        return;
    if (m_current != VI_NULL)
        cancelCurrent();
    for (const Job &job : m_waiting)
        abort(job);
    m_waiting.clear();
}

void AsyncTransfers::abort(const Job &job)
{
    m_gate.giveUp(job.place);
    complete(job, VI_ERROR_ABORT, 0);
}

void AsyncTransfers::stop()
{
    const std::lock_guard lock(m_mutex);
    m_closed = true;
    m_waiting.clear();
    m_changed.notify_all();
}

void AsyncTransfers::close()
{
    stop();
    if (m_thread.joinable())
        m_thread.join();
}

AsyncTransfers::Talking::Talking(AsyncTransfers &transfers) : m_transfers(transfers)
{
    const std::lock_guard lock(m_transfers.m_mutex);
    m_transfers.m_talking = true;
}

AsyncTransfers::Talking::~Talking()
{
    const std::lock_guard lock(m_transfers.m_mutex);
    m_transfers.m_talking = false;
}

} // namespace kyvisa
