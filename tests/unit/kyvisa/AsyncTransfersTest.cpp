#include "kyvisa/core/AsyncTransfers.h"
#include "kyvisa/core/Event.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/Wakeup.h"

#include <atomic>
#include <condition_variable>
#include <gtest/gtest.h>
#include <map>
#include <mutex>
#include <thread>

using namespace kyvisa;

namespace
{

/// Transfers that last a little while, or until somebody ends them.
class AsyncTransfersTest : public testing::Test
{
protected:
    ViStatus transfer(const AsyncTransfers::Job &job, const std::atomic<bool> &cancelled)
    {
        switch (m_gate.enterAt(job.place, os::Deadline::never(), cancelled)) {
        case IoGate::Entered::Yes:
            break;
        default:
            return VI_ERROR_ABORT;
        }
        m_wakeup.rearm();
        const GateTurn turn(m_gate);
        const AsyncTransfers::Talking talking(m_transfers);
        for (int i = 0; i < 20 && !m_wakeup.raised() && !cancelled; ++i)
            std::this_thread::yield();
        return m_wakeup.raised() || cancelled ? VI_ERROR_ABORT : VI_SUCCESS;
    }
    ViJobId start()
    {
        ViJobId job = VI_NULL;
        ViStatus status = VI_ERROR_QUEUE_ERROR;
        while ((status = m_transfers.start(true, {}, &job)) == VI_ERROR_QUEUE_ERROR)
            std::this_thread::yield();
        EXPECT_EQ(status, VI_SUCCESS);
        return job;
    }

    IoGate m_gate;
    os::Wakeup m_wakeup;
    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::map<ViJobId, int> m_completed; ///< how often each was told
    AsyncTransfers m_transfers{m_gate, m_wakeup,
                               [this](const AsyncTransfers::Job &job, const std::atomic<bool> &cancelled,
                                      std::size_t &) { return transfer(job, cancelled); },
                               [this](const Event &event) {
                                   const std::lock_guard lock(m_mutex);
                                   ++m_completed[event.job];
                                   m_changed.notify_all();
                               }};
};

// Four threads at once: two start jobs, each of which is terminated at some moment; one terminates everything; one makes
// calls between the jobs, which nothing that was meant for a job may hit.
TEST_F(AsyncTransfersTest, EachJobCompletesOnceAndTerminatingItHitsNoCall)
{
    constexpr std::size_t Jobs = 400;
    std::atomic<bool> stop{false};
    const auto startAndTerminate = [&] {
        for (std::size_t i = 0; i < Jobs; ++i) {
            const ViJobId job = start();
            for (std::size_t spin = 0; spin < i % 40; ++spin)
                std::this_thread::yield();
            const ViStatus status = m_transfers.terminate(job);
            EXPECT_TRUE(status == VI_SUCCESS || status == VI_ERROR_INV_JOB_ID) << status;
        }
    };
    std::thread first(startAndTerminate);
    std::thread second(startAndTerminate);
    std::thread everything([&] {
        while (!stop) {
            m_transfers.terminateAll();
            std::this_thread::yield();
        }
    });
    std::thread calls([&] {
        while (!stop) {
            ASSERT_EQ(m_gate.enter(os::Deadline::never()), IoGate::Entered::Yes);
            m_wakeup.rearm();
            for (int i = 0; i < 10; ++i)
                std::this_thread::yield();
            EXPECT_FALSE(m_wakeup.raised());
            m_gate.leave();
        }
    });
    first.join();
    second.join();
    {
        std::unique_lock lock(m_mutex);
        EXPECT_TRUE(m_changed.wait_for(lock, std::chrono::seconds(60), [&] { return m_completed.size() >= 2 * Jobs; }));
        for (const auto &[job, times] : m_completed)
            EXPECT_EQ(times, 1) << job;
        EXPECT_EQ(m_completed.size(), 2 * Jobs);
    }
    stop = true;
    everything.join();
    calls.join();
}

TEST_F(AsyncTransfersTest, ClosingDropsWhatWaitsAndTellsNobody)
{
    ASSERT_EQ(m_gate.enter(os::Deadline::never()), IoGate::Entered::Yes); // a call that holds them all up
    for (int i = 0; i < 100; ++i)
        start();
    m_transfers.stop();
    m_gate.close();
    m_transfers.close();
    m_gate.leave();
    EXPECT_TRUE(m_completed.empty());
    EXPECT_EQ(m_transfers.start(true, {}, nullptr), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(m_transfers.terminate(1), VI_ERROR_INV_JOB_ID);
}

} // namespace
