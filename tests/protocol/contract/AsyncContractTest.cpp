// viReadAsync and viWriteAsync: what a program may rely on over every protocol.
#include "contract/Contract.h"
#include "support/Completion.h"
#include "support/Stopwatch.h"

#include <array>
#include <atomic>
#include <condition_variable>
#include <filesystem>
#include <mutex>
#include <set>
#include <thread>

using test::Completion;
using test::nextCompletion;
using test::Stopwatch;
using test::VisaSession;

namespace contract
{
namespace
{

class Async : public Contract
{
protected:
    void SetUp() override
    {
        Contract::SetUp();
        if (!HasFatalFailure()) {
            ASSERT_EQ(viEnableEvent(m_session.vi, VI_EVENT_IO_COMPLETION, VI_QUEUE, VI_NULL), VI_SUCCESS);
        }
    }

    void TearDown() override { viClose(m_session.vi); } // no job and no handler outlives what it uses

    /// The text has to live until the job is over.
    ViJobId startWrite(const std::string &text, ViStatus expected = VI_SUCCESS)
    {
        ViJobId job = VI_NULL;
        EXPECT_EQ(viWriteAsync(m_session.vi, reinterpret_cast<ViConstBuf>(text.data()),
                               static_cast<ViUInt32>(text.size()), &job),
                  expected);
        return job;
    }
    ViJobId startRead(ViStatus expected = VI_SUCCESS) { return startReadInto(m_buffer, expected); }
    template <typename Buffer>
    ViJobId startReadInto(Buffer &buffer, ViStatus expected = VI_SUCCESS)
    {
        ViJobId job = VI_NULL;
        EXPECT_EQ(viReadAsync(m_session.vi, buffer.data(), static_cast<ViUInt32>(buffer.size()), &job), expected);
        return job;
    }
    Completion next() { return nextCompletion(m_session.vi); }
    ViStatus terminate(ViJobId job) { return viTerminate(m_session.vi, VI_NULL, job); }
    /// No question is open: a read lasts until somebody ends it.
    void waitForEver() { m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE); }

    using Buffer = std::array<ViByte, 256>;
    static std::string text(const Buffer &buffer, const Completion &completion)
    {
        return {reinterpret_cast<const char *>(buffer.data()), completion.count};
    }

    Buffer m_buffer{};
};

INSTANTIATE_TEST_SUITE_P(All, Async, testing::ValuesIn(protocols()), nameOf);

TEST_P(Async, TheCompletionTellsHowATransferEnded)
{
    const std::string question = "*ESE 21;*ESE?\n";
    const ViJobId write = startWrite(question);
    EXPECT_NE(write, ViJobId{VI_NULL});
    Completion completion = next();
    EXPECT_EQ(completion.waited, VI_SUCCESS);
    EXPECT_EQ(completion.type, ViEventType{VI_EVENT_IO_COMPLETION});
    EXPECT_EQ(completion.status, VI_SUCCESS);
    EXPECT_EQ(completion.job, write);
    EXPECT_EQ(completion.count, question.size());
    EXPECT_EQ(completion.count32, question.size());
    EXPECT_EQ(completion.buffer, reinterpret_cast<ViBuf>(const_cast<char *>(question.data())));
    EXPECT_EQ(completion.operation, "viWriteAsync");

    const ViJobId read = startRead();
    EXPECT_NE(read, write);
    completion = next();
    EXPECT_EQ(completion.status, whole());
    EXPECT_EQ(completion.job, read);
    EXPECT_EQ(text(m_buffer, completion), "21\n");
    EXPECT_EQ(completion.count32, 3u);
    EXPECT_EQ(completion.buffer, m_buffer.data());
    EXPECT_EQ(completion.operation, "viReadAsync");
}

TEST_P(Async, JobsRunInTheOrderOfTheirCalls)
{
    const std::array<std::string, 4> questions = {"*ESE 1;*ESE?\n", "*ESE 2;*ESE?\n", "*ESE 4;*ESE?\n",
                                                  "*ESE 8;*ESE?\n"};
    std::array<Buffer, questions.size()> answers{};
    std::vector<ViJobId> started;
    for (std::size_t i = 0; i < questions.size(); ++i) {
        started.push_back(startWrite(questions[i]));
        started.push_back(startReadInto(answers[i]));
    }
    std::vector<ViJobId> ended;
    std::string all;
    for (std::size_t i = 0; i < questions.size(); ++i) {
        Completion completion = next();
        EXPECT_EQ(completion.status, VI_SUCCESS);
        ended.push_back(completion.job);
        completion = next();
        EXPECT_EQ(completion.status, whole());
        ended.push_back(completion.job);
        all += text(answers[i], completion);
    }
    EXPECT_EQ(all, "1\n2\n4\n8\n");
    EXPECT_EQ(ended, started);
    EXPECT_EQ(std::set(started.begin(), started.end()).size(), started.size());
}

// A read that comes behind an asynchronous question must not overtake it.
TEST_P(Async, CallsWaitBehindTheJobsThatWereStartedBefore)
{
    for (int i = 0; i < 40; ++i) {
        const std::string question = "*ESE " + std::to_string(i) + ";*ESE?\n";
        startWrite(question);
        ASSERT_EQ(m_session.read(), whole()) << i;
        EXPECT_EQ(m_session.text, std::to_string(i) + "\n");
        EXPECT_EQ(next().status, VI_SUCCESS);
    }
}

TEST_P(Async, TerminateEndsTheJobThatItNames)
{
    waitForEver();
    const ViJobId running = startRead();
    const ViJobId waiting = startRead();
    EXPECT_EQ(terminate(waiting), VI_SUCCESS);
    Completion completion = next();
    EXPECT_EQ(completion.job, waiting);
    EXPECT_EQ(completion.status, VI_ERROR_ABORT);
    EXPECT_EQ(completion.count, 0u);
    EXPECT_EQ(terminate(waiting), VI_ERROR_INV_JOB_ID);

    EXPECT_EQ(terminate(running), VI_SUCCESS); // it was not over when viReadAsync returned
    completion = next();
    EXPECT_EQ(completion.job, running);
    EXPECT_EQ(completion.status, VI_ERROR_ABORT);
    EXPECT_EQ(terminate(running), VI_ERROR_INV_JOB_ID);

    m_session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(viClear(m_session.vi), VI_SUCCESS);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

// Terminating comes at every moment of a job's life, and hits no call before or behind it.
TEST_P(Async, TerminateHitsNothingButItsJob)
{
    const int rounds = GetParam().locks == Locks::OnePortOneSession ? 5 : 25; // a break takes a quarter of a second
    for (int i = 0; i < rounds; ++i) {
        waitForEver();
        const ViJobId job = startRead();
        for (int spin = 0; spin < i * 500 / rounds; ++spin)
            std::this_thread::yield();
        ASSERT_EQ(terminate(job), VI_SUCCESS);
        m_session.set(VI_ATTR_TMO_VALUE, 20000);
        ASSERT_EQ(viClear(m_session.vi), VI_SUCCESS) << i;
        EXPECT_EQ(next().status, VI_ERROR_ABORT);
        ASSERT_EQ(query("*OPC?"), "1\n") << i;
    }
}

TEST_P(Async, TerminateWithoutAJobEndsAllOfThem)
{
    waitForEver();
    std::set<ViJobId> started;
    for (int i = 0; i < 5; ++i)
        started.insert(startRead());
    EXPECT_EQ(terminate(VI_NULL), VI_SUCCESS);
    for (int i = 0; i < 5; ++i) {
        const Completion completion = next();
        EXPECT_EQ(completion.status, VI_ERROR_ABORT);
        EXPECT_EQ(started.erase(completion.job), 1u);
    }
    EXPECT_TRUE(started.empty());
}

TEST_P(Async, TerminateRefusesWhatIsNoJobOfTheSession)
{
    EXPECT_EQ(terminate(0x7FFFFFFF), VI_ERROR_INV_JOB_ID);
    EXPECT_EQ(viTerminate(m_session.vi, 1, VI_NULL), VI_ERROR_INV_DEGREE);
    waitForEver();
    const ViJobId job = startRead();
    EXPECT_EQ(terminate(job + 1), VI_ERROR_INV_JOB_ID);
    if (GetParam().locks != Locks::OnePortOneSession) {
        VisaSession other;
        open(other);
        EXPECT_EQ(viTerminate(other.vi, VI_NULL, job), VI_ERROR_INV_JOB_ID);
    }
    EXPECT_EQ(terminate(job), VI_SUCCESS);
    EXPECT_EQ(next().job, job);
}

TEST_P(Async, ATerminatedWriteEnds)
{
    waitForEver();
    ASSERT_EQ(m_session.write("SYST:DEL 30;*WAI;*OPC\n"), VI_SUCCESS);
    std::string block = "MMEM:DATA \"x\",#864000000"; // larger than all buffers on the way
    block.resize(block.size() + 64'000'000, 'x');
    const ViJobId job = startWrite(block);
    EXPECT_EQ(terminate(job), VI_SUCCESS);
    const Completion completion = next();
    EXPECT_EQ(completion.job, job);
    EXPECT_EQ(completion.status, VI_ERROR_ABORT);
    EXPECT_LT(completion.count, block.size());
}

TEST_P(Async, ATransferEndsAtItsTimeOut)
{
    m_session.set(VI_ATTR_TMO_VALUE, 100);
    const ViJobId job = startRead();
    const Completion completion = next();
    EXPECT_EQ(completion.job, job);
    EXPECT_EQ(completion.status, VI_ERROR_TMO);
    EXPECT_EQ(completion.count, 0u);
}

TEST_P(Async, WithoutTheEventTheTransferRunsAllTheSame)
{
    ASSERT_EQ(viDisableEvent(m_session.vi, VI_EVENT_IO_COMPLETION, VI_ALL_MECH), VI_SUCCESS);
    const std::string question = "*ESE 42;*ESE?\n";
    const ViJobId first = startWrite(question);
    EXPECT_NE(first, ViJobId{VI_NULL});
    ASSERT_EQ(m_session.read(), whole());
    EXPECT_EQ(m_session.text, "42\n");
    EXPECT_EQ(next().waited, VI_ERROR_NENABLED);
    // Once the second transfer has been seen, the first is over in every respect.
    startWrite(question);
    ASSERT_EQ(m_session.read(), whole());
    ASSERT_EQ(viEnableEvent(m_session.vi, VI_EVENT_IO_COMPLETION, VI_QUEUE, VI_NULL), VI_SUCCESS);
    const std::string last = "*CLS\n";
    const ViJobId third = startWrite(last);
    ViJobId told = VI_NULL;
    while (told != third) {
        const Completion completion = next();
        ASSERT_GE(completion.waited, VI_SUCCESS);
        told = completion.job;
        EXPECT_NE(told, first);
    }
}

TEST_P(Async, TheJobNumberIsNotObligatory)
{
    const std::string question = "*OPC?\n";
    EXPECT_EQ(viWriteAsync(m_session.vi, reinterpret_cast<ViConstBuf>(question.data()), 6, nullptr), VI_SUCCESS);
    EXPECT_EQ(viReadAsync(m_session.vi, m_buffer.data(), 16, nullptr), VI_SUCCESS);
    EXPECT_NE(next().job, ViJobId{VI_NULL});
    const Completion completion = next();
    EXPECT_EQ(text(m_buffer, completion), "1\n");
}

TEST_P(Async, TransfersOfNothingComplete)
{
    ViJobId job = VI_NULL;
    EXPECT_EQ(viReadAsync(m_session.vi, nullptr, 0, &job), VI_SUCCESS);
    EXPECT_EQ(next().status, VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(viWriteAsync(m_session.vi, nullptr, 0, &job), VI_SUCCESS);
    EXPECT_EQ(next().status, VI_SUCCESS);
    EXPECT_EQ(viReadAsync(m_session.vi, nullptr, 1, &job), VI_ERROR_USER_BUF);
    EXPECT_EQ(job, ViJobId{VI_NULL});
}

TEST_P(Async, AnotherSessionsLockIsObeyed)
{
    if (GetParam().locks == Locks::OnePortOneSession)
        return; // a port has one session, so nobody else has a lock
    VisaSession other;
    open(other);
    const std::string message = "*CLS\n";
    if (GetParam().locks == Locks::InTheDevice) {
        // The instrument keeps the others waiting: the read ends with its time, and the lock is the reason, where the
        // instrument says so soon enough.
        ASSERT_EQ(viLock(other.vi, VI_EXCLUSIVE_LOCK, 10000, nullptr, nullptr), VI_SUCCESS);
        m_session.set(VI_ATTR_TMO_VALUE, 300);
        startRead();
        const ViStatus status = next().status;
        EXPECT_TRUE(status == VI_ERROR_RSRC_LOCKED || status == VI_ERROR_TMO) << status;
        EXPECT_EQ(viUnlock(other.vi), VI_SUCCESS);
        return;
    }
    waitForEver();
    const ViJobId first = startRead();
    const ViJobId second = startWrite(message);
    ASSERT_EQ(viSetAttribute(other.vi, VI_ATTR_TMO_VALUE, 20000), VI_SUCCESS);
    ASSERT_EQ(viLock(other.vi, VI_EXCLUSIVE_LOCK, 10000, nullptr, nullptr), VI_SUCCESS);
    EXPECT_EQ(startWrite(message, VI_ERROR_RSRC_LOCKED), ViJobId{VI_NULL});
    EXPECT_EQ(startRead(VI_ERROR_RSRC_LOCKED), ViJobId{VI_NULL});
    // Whether the read had begun is for the scheduler to say; over VXI-11 the instrument ends it in either case.
    terminate(first);
    const Completion read = next();
    EXPECT_EQ(read.job, first);
    EXPECT_TRUE(read.status == VI_ERROR_ABORT || read.status == VI_ERROR_RSRC_LOCKED) << read.status;
    // What begins under the lock is refused as a call would be.
    const Completion completion = next();
    EXPECT_EQ(completion.job, second);
    EXPECT_EQ(completion.status, VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(nextCompletion(m_session.vi, VI_TMO_IMMEDIATE).waited, VI_ERROR_TMO); // the refused ones were no jobs
    EXPECT_EQ(viUnlock(other.vi), VI_SUCCESS);
}

std::size_t threadsNow()
{
    const std::filesystem::directory_iterator all("/proc/self/task");
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

TEST_P(Async, CloseEndsAllJobsAndTheirThread)
{
    waitForEver();
    std::thread([] {}).join(); // with the first one the thread sanitizer starts one of its own
    const std::size_t before = threadsNow();
    std::string block = "MMEM:DATA \"x\",#864000000";
    block.resize(block.size() + 64'000'000, 'x');
    ASSERT_EQ(m_session.write("SYST:DEL 30;*WAI;*OPC\n"), VI_SUCCESS);
    startWrite(block);
    for (int i = 0; i < 10; ++i)
        startRead();
    EXPECT_LE(threadsNow(), before + 1); // one for all jobs
    const Stopwatch watch;
    EXPECT_EQ(viClose(m_session.vi), VI_SUCCESS);
    EXPECT_LT(watch.milliseconds(), 15000);
    block.assign(block.size(), 'y');                              // nobody reads it any more: the sanitizers would see
    while (threadsNow() > before && watch.milliseconds() < 30000) // a joined thread leaves /proc a moment later
        std::this_thread::yield();
    EXPECT_LE(threadsNow(), before);
}

/// What a handler of VI_EVENT_IO_COMPLETION does, and what it found.
class Handler
{
public:
    std::function<void(ViSession, const Completion &)> work;

    static ViStatus call(ViSession session, ViEventType, ViEvent context, ViAddr user)
    {
        auto &self = *static_cast<Handler *>(user);
        Completion completion;
        test::readAttributes(context, completion);
        {
            const std::lock_guard lock(self.m_mutex);
            self.m_thread = std::this_thread::get_id();
        }
        self.work(session, completion);
        const std::lock_guard lock(self.m_mutex);
        self.m_done.push_back(completion);
        self.m_changed.notify_all();
        return VI_SUCCESS;
    }
    /// The first @p count events, once they have been handled.
    std::vector<Completion> await(std::size_t count)
    {
        std::unique_lock lock(m_mutex);
        EXPECT_TRUE(m_changed.wait_for(lock, std::chrono::seconds(60), [&] { return m_done.size() >= count; }));
        return m_done;
    }
    std::thread::id thread()
    {
        const std::lock_guard lock(m_mutex);
        return m_thread;
    }
    std::size_t count()
    {
        const std::lock_guard lock(m_mutex);
        return m_done.size();
    }

private:
    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::vector<Completion> m_done;
    std::thread::id m_thread;
};

class AsyncHandler : public Async
{
protected:
    void SetUp() override
    {
        Async::SetUp();
        if (HasFatalFailure())
            return;
        ASSERT_EQ(viInstallHandler(m_session.vi, VI_EVENT_IO_COMPLETION, Handler::call, &m_handler), VI_SUCCESS);
        ASSERT_EQ(viEnableEvent(m_session.vi, VI_EVENT_IO_COMPLETION, VI_HNDLR, VI_NULL), VI_SUCCESS);
    }

    Handler m_handler;
};

INSTANTIATE_TEST_SUITE_P(All, AsyncHandler, testing::ValuesIn(protocols()), nameOf);

TEST_P(AsyncHandler, HandlerAndQueueBothGetTheCompletion)
{
    m_handler.work = [](ViSession, const Completion &) {};
    const std::string message = "*CLS\n";
    const ViJobId job = startWrite(message);
    const auto handled = m_handler.await(1);
    ASSERT_EQ(handled.size(), 1u);
    EXPECT_EQ(handled[0].job, job);
    EXPECT_EQ(handled[0].status, VI_SUCCESS);
    EXPECT_EQ(handled[0].count, message.size());
    EXPECT_NE(m_handler.thread(), std::this_thread::get_id());
    EXPECT_EQ(next().job, job);
}

TEST_P(AsyncHandler, MayUseItsSessionInEveryWay)
{
    const std::string question = "*ESE 7;*ESE?\n";
    std::array<ViStatus, 4> statuses{};
    std::string answer(16, '\0');
    m_handler.work = [&](ViSession session, const Completion &completion) {
        if (completion.operation != "viWriteAsync")
            return;
        statuses[0] = viRead(session, reinterpret_cast<ViPBuf>(answer.data()), 16, nullptr);
        statuses[1] = viTerminate(session, VI_NULL, completion.job);
        statuses[2] = viReadAsync(session, m_buffer.data(), 16, nullptr);
        statuses[3] = viTerminate(session, VI_NULL, VI_NULL);
    };
    startWrite(question);
    const auto handled = m_handler.await(2);
    EXPECT_EQ(answer.c_str(), std::string("7\n"));
    EXPECT_EQ(statuses, (std::array<ViStatus, 4>{whole(), VI_ERROR_INV_JOB_ID, VI_SUCCESS, VI_SUCCESS}));
    ASSERT_EQ(handled.size(), 2u);
    EXPECT_EQ(handled[1].status, VI_ERROR_ABORT);
}

TEST_P(AsyncHandler, MayCloseItsSession)
{
    ViStatus closed = VI_ERROR_SYSTEM_ERROR;
    m_handler.work = [&](ViSession session, const Completion &) { closed = viClose(session); };
    const std::string message = "*CLS\n";
    startWrite(message);
    m_handler.await(1);
    EXPECT_EQ(closed, VI_SUCCESS);
    EXPECT_EQ(viClose(m_session.vi), VI_ERROR_INV_OBJECT);
}

TEST_P(AsyncHandler, IsNotCalledAfterCloseHasReturned)
{
    std::atomic<bool> closed{false};
    std::atomic<int> late{0};
    m_handler.work = [&](ViSession, const Completion &) { late += closed ? 1 : 0; };
    const std::string message = "*CLS\n";
    for (int i = 0; i < 50; ++i)
        startWrite(message);
    m_handler.await(1);
    EXPECT_EQ(viClose(m_session.vi), VI_SUCCESS);
    closed = true;
    const std::size_t handled = m_handler.count();
    EXPECT_EQ(viClose(m_session.rm), VI_SUCCESS);
    EXPECT_EQ(m_handler.count(), handled);
    EXPECT_EQ(late, 0);
}

} // namespace
} // namespace contract
