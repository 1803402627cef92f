#include "log/StringMessageQueue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <dlfcn.h>
#include <pthread.h>

#include <atomic>
#include <cerrno>
#include <memory>
#include <system_error>
#include <thread>
#include <vector>

namespace
{
thread_local const pthread_mutex_t *lastLocked = nullptr; // by this thread
thread_local int lockError = 0;                           // answered instead of locking when it is not 0
} // namespace

/// Notes which mutex this thread locks, or refuses to lock it.
extern "C" int pthread_mutex_lock(pthread_mutex_t *mutex) noexcept
{
    using Lock = int (*)(pthread_mutex_t *);
    static std::atomic<Lock> original{nullptr};
    if (!original)
        original = reinterpret_cast<Lock>(dlsym(RTLD_NEXT, "pthread_mutex_lock"));
    lastLocked = mutex;
    return lockError != 0 ? lockError : original.load()(mutex);
}

namespace
{

using Lines = std::vector<std::uint64_t>;

/// A span of line numbers, both ends included.
struct Span {
    std::uint64_t first;
    std::uint64_t last;
};

Lines lines(std::initializer_list<Span> spans)
{
    Lines result;
    for (const Span &span : spans) {
        for (std::uint64_t line = span.first; line <= span.last; ++line)
            result.push_back(line);
    }
    return result;
}

/// A ring on the heap; it has no room on the stack.
class LineRing : public testing::Test
{
protected:
    void add(std::uint64_t first, std::uint64_t last)
    {
        FastBuffer line{};
        for (line.line = first; line.line <= last; ++line.line)
            m_ring->addMessage(&line);
    }

    Lines copy(unsigned max)
    {
        std::vector<FastBuffer> copied(StringMessageQueue::Capacity + 1);
        const unsigned n = m_ring->copyFromQueue(copied.data(), max);
        Lines result;
        for (unsigned i = 0; i < n; ++i)
            result.push_back(copied[i].line);
        return result;
    }

    const std::unique_ptr<StringMessageQueue> m_ring = std::make_unique<StringMessageQueue>();
};

struct Row {
    std::uint64_t additions;
    unsigned max;
    Lines expected;
};

class LineRingTable : public LineRing, public testing::WithParamInterface<Row>
{
};

TEST_P(LineRingTable, ShowsTheseLines)
{
    add(1, GetParam().additions);
    EXPECT_EQ(copy(GetParam().max), GetParam().expected);
    EXPECT_EQ(m_ring->getLines(), GetParam().additions);
}

TEST_P(LineRingTable, ShowsTheSameLinesAfterAClear)
{
    add(100001, 112345);
    m_ring->clear();
    add(1, GetParam().additions);
    EXPECT_EQ(copy(GetParam().max), GetParam().expected);
    EXPECT_EQ(m_ring->getLines(), GetParam().additions + 12345);
}

constexpr unsigned All = 8192;

INSTANTIATE_TEST_SUITE_P(
    Additions, LineRingTable,
    testing::Values(Row{1, All, lines({{1, 1}})}, Row{1, 1, lines({{1, 1}})}, Row{2, 1, lines({{2, 2}})},
                    Row{5, 3, lines({{3, 5}})}, Row{8191, All, lines({{1, 8191}})}, Row{8191, 1, lines({{8191, 8191}})},
                    Row{8191, 10, lines({{8182, 8191}})}, Row{8191, 1024, lines({{7168, 8191}})},
                    Row{8192, All, lines({{1, 8192}})}, Row{8192, 1, lines({{8192, 8192}})},
                    Row{8192, 10, lines({{8183, 8192}})}, Row{8192, 1024, lines({{7169, 8192}})},
                    Row{8193, All, lines({{2, 8192}, {1, 1}})}, Row{8193, 1, lines({{1, 1}})},
                    Row{8193, 10, lines({{8184, 8192}, {1, 1}})}, Row{8193, 1024, lines({{7170, 8192}, {1, 1}})},
                    Row{8194, All, lines({{3, 8192}, {1, 1}, {8194, 8194}})}, Row{8194, 1, lines({{8194, 8194}})},
                    Row{8194, 10, lines({{8185, 8192}, {1, 1}, {8194, 8194}})},
                    Row{8194, 1024, lines({{7171, 8192}, {1, 1}, {8194, 8194}})},
                    Row{9216, All, lines({{1025, 8192}, {1, 1}, {8194, 9216}})}, Row{9216, 1, lines({{9216, 9216}})},
                    Row{9216, 10, lines({{9207, 9216}})}, Row{9216, 1024, lines({{1, 1}, {8194, 9216}})},
                    Row{16384, All, lines({{1, 1}, {8194, 16384}})}, Row{16384, 1, lines({{16384, 16384}})},
                    Row{16384, 10, lines({{16375, 16384}})}, Row{16384, 1024, lines({{15361, 16384}})},
                    Row{16385, All, lines({{8194, 16384}, {1, 1}})}, Row{16385, 1, lines({{1, 1}})},
                    Row{16385, 10, lines({{16376, 16384}, {1, 1}})}, Row{16385, 1024, lines({{15362, 16384}, {1, 1}})}),
    [](const testing::TestParamInfo<Row> &row) {
        return std::to_string(row.param.additions) + "Max" + std::to_string(row.param.max);
    });

TEST_F(LineRing, CopiesNothingWhenItIsEmpty)
{
    FastBuffer untouched{};
    untouched.line = 77;
    EXPECT_EQ(m_ring->copyFromQueue(&untouched, 1), 0u);
    EXPECT_EQ(untouched.line, 77u);
    EXPECT_EQ(m_ring->getLines(), 0u);
}

TEST_F(LineRing, WritesNoMoreThanWasAskedFor)
{
    add(1, 100);
    std::vector<FastBuffer> copied(11);
    copied[10].line = 77;
    EXPECT_EQ(m_ring->copyFromQueue(copied.data(), 10), 10u);
    EXPECT_EQ(copied[9].line, 100u);
    EXPECT_EQ(copied[10].line, 77u);
    EXPECT_EQ(m_ring->copyFromQueue(copied.data(), 0), 0u);
}

TEST_F(LineRing, ClearForgetsTheLinesButKeepsTheirTotal)
{
    add(1, 9000);
    m_ring->clear();
    EXPECT_THAT(copy(All), testing::IsEmpty());
    EXPECT_EQ(m_ring->getLines(), 9000u);
    add(9001, 9001);
    EXPECT_EQ(copy(All), lines({{9001, 9001}}));
    EXPECT_EQ(m_ring->getLines(), 9001u);
}

TEST_F(LineRing, CopiesTheWholeRecord)
{
    FastBuffer line{};
    std::fill_n(line.text, sizeof line.text, 'x');
    line.status = -1073807339;
    line.duration = 2000000000;
    line.line = 12;
    line.visaLine = true;
    m_ring->addMessage(&line);

    FastBuffer copied{};
    ASSERT_EQ(m_ring->copyFromQueue(&copied, 1), 1u);
    EXPECT_EQ(std::string(copied.text, sizeof copied.text), std::string(450, 'x'));
    EXPECT_EQ(copied.status, -1073807339);
    EXPECT_EQ(copied.duration, 2000000000u);
    EXPECT_EQ(copied.line, 12u);
    EXPECT_TRUE(copied.visaLine);
}

TEST_F(LineRing, IgnoresNullPointers)
{
    m_ring->addMessage(nullptr);
    EXPECT_EQ(m_ring->getLines(), 0u);
    add(1, 1);
    EXPECT_EQ(m_ring->copyFromQueue(nullptr, 1), 0u);
}

TEST_F(LineRing, SharesOneMutexWithAllOtherRings)
{
    const auto other = std::make_unique<StringMessageQueue>();
    FastBuffer line{};
    m_ring->addMessage(&line);
    const pthread_mutex_t *const mine = lastLocked;
    ASSERT_NE(mine, nullptr);
    for (int operation = 0; operation < 3; ++operation) {
        lastLocked = nullptr;
        if (operation == 0)
            other->addMessage(&line);
        else if (operation == 1)
            other->copyFromQueue(&line, 1);
        else
            other->clear();
        EXPECT_EQ(lastLocked, mine) << operation;
    }
    lastLocked = nullptr;
    EXPECT_EQ(other->getLines(), 1u);
    EXPECT_EQ(lastLocked, nullptr) << "the total is read without it";
}

TEST_F(LineRing, ThrowsTheErrorOfALockThatFails)
{
    FastBuffer line{};
    int thrown = 0;
    lockError = EDEADLK;
    try {
        m_ring->addMessage(&line);
    } catch (const std::system_error &error) {
        thrown = error.code().value();
    }
    lockError = 0;
    EXPECT_EQ(thrown, EDEADLK);
    EXPECT_EQ(m_ring->getLines(), 0u);
}

TEST_F(LineRing, NeverShowsAHalfWrittenLine)
{
    constexpr int Additions = 20000;
    std::vector<std::thread> writers;
    for (const char mark : {'a', 'b', 'c'}) {
        writers.emplace_back([this, mark] {
            FastBuffer line{};
            std::fill_n(line.text, sizeof line.text - 1, mark);
            line.line = static_cast<std::uint64_t>(mark);
            for (int i = 0; i < Additions; ++i)
                m_ring->addMessage(&line);
        });
    }
    std::vector<FastBuffer> copied(1024);
    while (m_ring->getLines() < 3u * Additions) {
        const unsigned n = m_ring->copyFromQueue(copied.data(), 1024);
        for (unsigned i = 0; i < n; ++i) {
            const char mark = static_cast<char>(copied[i].line);
            ASSERT_EQ(std::string(copied[i].text), std::string(449, mark));
        }
    }
    for (std::thread &writer : writers)
        writer.join();
    EXPECT_EQ(m_ring->getLines(), 3u * Additions);
}

} // namespace
