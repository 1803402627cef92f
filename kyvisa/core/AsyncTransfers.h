#pragma once

#include "kyvisa/core/IoGate.h"
#include "kyvisa/include/visatype.h"

#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <span>
#include <thread>

namespace kyvisa
{

namespace os
{
class Wakeup;
}
struct Event;

/**
 * The asynchronous transfers of one session: a line of jobs and the thread that carries them out, one after the other.
 *
 * The thread is started by the first job and ends with close(). It runs no code of the program: how a job ended is posted
 * as VI_EVENT_IO_COMPLETION, exactly one for each job that was taken, and handlers have a thread of their own. What is not
 * over when the session is closed is dropped, and nothing is posted for it.
 *
 * A job may be cancelled at each of its three stations: in this line it is taken out; in the line for the session's turn it
 * is sent away; once it is talking, the session's wake-up ends its transfer. Talking tells the last two apart, so that the
 * wake-up never hits a call that has the turn before or after the job.
 */
class AsyncTransfers
{
public:
    struct Job {
        bool reads = false;
        std::span<std::byte> buffer; ///< the program's, until the job is over; not written to when the job writes
        ViJobId id = VI_NULL;
        IoGate::Place place = 0;
    };
    /// Carries a job out and answers its status. @p cancelled tells that it is no longer wanted.
    using Transfer = std::function<ViStatus(const Job &, const std::atomic<bool> &cancelled, std::size_t &count)>;
    using Completion = std::function<void(const Event &)>;

    AsyncTransfers(IoGate &gate, os::Wakeup &wakeup, Transfer transfer, Completion completion);
    ~AsyncTransfers();

    /// Takes a job. @param id receives its number, before the transfer begins; may be null.
    /// @return VI_ERROR_QUEUE_ERROR when the line is full or no thread is to be had.
    ViStatus start(bool reads, std::span<std::byte> buffer, ViJobId *id);
    /// Ends one job with VI_ERROR_ABORT. @return VI_ERROR_INV_JOB_ID when it is over or was never here.
    ViStatus terminate(ViJobId id);
    void terminateAll();
    /// From here on nothing is taken, begun or posted.
    void stop();
    /// Once the session's turn is closed: stops, and returns when the thread has ended.
    void close();

    /// For the time in which a job has the session's turn.
    class Talking
    {
    public:
        explicit Talking(AsyncTransfers &transfers);
        ~Talking();
        Talking(const Talking &) = delete;
        Talking &operator=(const Talking &) = delete;

    private:
        AsyncTransfers &m_transfers;
    };

private:
    void run();
    void cancelCurrent();
    void complete(const Job &job, ViStatus status, std::size_t count) const;
    void abort(const Job &job);

    IoGate &m_gate;
    os::Wakeup &m_wakeup;
    const Transfer m_transfer;
    const Completion m_completion;

    std::mutex m_mutex; ///< guards what follows; taken before those of the gate and the events
    std::condition_variable m_changed;
    std::deque<Job> m_waiting;
    ViJobId m_current = VI_NULL;
    std::atomic<bool> m_cancelled{false}; ///< of the current job
    bool m_talking = false;
    bool m_closed = false;
    std::thread m_thread;
};

} // namespace kyvisa
