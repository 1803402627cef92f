#include "log/MessageQueue.h"

#include <gtest/gtest.h>

#include <dlfcn.h>
#include <pthread.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <thread>
#include <vector>

namespace
{
thread_local int lastSharing = -1; // process sharing of the last mutex made on this thread
}

/// Notes how a mutex is made, then makes it.
extern "C" int pthread_mutex_init(pthread_mutex_t *mutex, const pthread_mutexattr_t *attributes) noexcept
{
    if (attributes)
        pthread_mutexattr_getpshared(attributes, &lastSharing);
    using Init = int (*)(pthread_mutex_t *, const pthread_mutexattr_t *);
    return reinterpret_cast<Init>(dlsym(RTLD_NEXT, "pthread_mutex_init"))(mutex, attributes);
}

namespace
{

using namespace std::chrono_literals;

/// Waits until @p condition holds; false when it does not within a time that only a broken queue needs.
bool eventually(const std::function<bool()> &condition)
{
    const auto end = std::chrono::steady_clock::now() + 20s;
    while (!condition()) {
        if (std::chrono::steady_clock::now() > end)
            return false;
        std::this_thread::sleep_for(1ms);
    }
    return true;
}

class FileQueue : public testing::Test
{
protected:
    void push(std::uint64_t first, std::uint64_t last)
    {
        FastBuffer line{};
        for (line.line = first; line.line <= last; ++line.line)
            ASSERT_TRUE(m_queue->push(line));
    }

    std::uint64_t pop()
    {
        FastBuffer line{};
        return m_queue->pop(line) ? line.line : 0;
    }

    const std::unique_ptr<MessageQueue> m_queue = std::make_unique<MessageQueue>();
};

TEST_F(FileQueue, DeliversLinesInOrderManyTimesRoundTheRing)
{
    std::uint64_t expected = 0;
    for (std::uint64_t first = 1; first <= 60000; first += 10000) {
        push(first, first + 9999);
        for (int i = 0; i < 10000; ++i)
            ASSERT_EQ(pop(), ++expected);
    }
}

TEST_F(FileQueue, TakesExactly16383LinesAndThenWaitsForOneToLeave)
{
    push(1, 16383);
    std::atomic<int> pushed{0};
    std::thread producer([&] {
        push(16384, 16384);
        ++pushed;
    });
    // A producer that does not wait is through at once; give it the time to show that it is wrong.
    std::this_thread::sleep_for(100ms);
    EXPECT_EQ(pushed, 0);

    EXPECT_EQ(pop(), 1u);
    EXPECT_TRUE(eventually([&] { return pushed == 1; }));
    producer.join();
    for (std::uint64_t line = 2; line <= 16384; ++line)
        ASSERT_EQ(pop(), line);
}

TEST_F(FileQueue, LosesAndRepeatsNothingWithSeveralProducers)
{
    constexpr std::uint64_t Lines = 30000;
    std::vector<std::thread> producers;
    for (std::uint64_t id = 0; id < 3; ++id)
        producers.emplace_back([this, id] { push(id * Lines + 1, (id + 1) * Lines); });

    std::uint64_t last[3] = {0, Lines, 2 * Lines};
    for (std::uint64_t i = 0; i < 3 * Lines; ++i) {
        const std::uint64_t line = pop();
        const std::uint64_t id = (line - 1) / Lines;
        ASSERT_LT(id, 3u);
        ASSERT_EQ(line, ++last[id]);
    }
    for (std::thread &producer : producers)
        producer.join();
}

TEST_F(FileQueue, StopWakesTheWaitingConsumer)
{
    std::atomic<int> answer{-1};
    std::thread consumer([&] {
        FastBuffer line;
        answer = m_queue->pop(line);
    });
    m_queue->stop();
    EXPECT_TRUE(eventually([&] { return answer == 0; }));
    consumer.join();
}

TEST_F(FileQueue, StopDropsTheLinesThatStillWait)
{
    push(1, 10);
    EXPECT_EQ(pop(), 1u);
    m_queue->stop();
    FastBuffer line{};
    line.line = 77;
    EXPECT_FALSE(m_queue->pop(line));
    EXPECT_EQ(line.line, 77u);
}

TEST_F(FileQueue, EveryPopAfterAStopAnswersFalseAtOnce)
{
    m_queue->stop();
    FastBuffer line;
    for (int i = 0; i < 1000; ++i)
        ASSERT_FALSE(m_queue->pop(line));
}

TEST_F(FileQueue, StopWakesAHundredWaitingProducersAndMore)
{
    push(1, 16383);
    std::atomic<int> through{0};
    std::vector<std::thread> producers;
    producers.reserve(130);
    for (int i = 0; i < 130; ++i) {
        producers.emplace_back([&] {
            push(1, 1);
            ++through;
        });
    }
    m_queue->stop();
    EXPECT_TRUE(eventually([&] { return through == 130; }));
    for (std::thread &producer : producers)
        producer.join();
}

TEST_F(FileQueue, NeverBlocksAProducerOnceItIsStopped)
{
    m_queue->stop();
    push(1, 40000);
    SUCCEED();
}

TEST_F(FileQueue, MakesItsMutexShareableBetweenProcesses)
{
    lastSharing = -1;
    const auto queue = std::make_unique<MessageQueue>();
    EXPECT_EQ(lastSharing, PTHREAD_PROCESS_SHARED);
}

TEST_F(FileQueue, EndsWithLinesInIt)
{
    push(1, 16383);
}

} // namespace
