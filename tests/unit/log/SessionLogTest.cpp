#include "log/SessionLog.h"

#include "log/Log.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdlib>
#include <iterator>
#include <new>
#include <thread>
#include <vector>

namespace
{
thread_local std::uint64_t allocations = 0;
}

void *operator new(std::size_t size)
{
    ++allocations;
    if (void *memory = std::malloc(size ? size : 1))
        return memory;
    throw std::bad_alloc();
}

void operator delete(void *memory) noexcept
{
    std::free(memory);
}

void operator delete(void *memory, std::size_t) noexcept
{
    std::free(memory);
}

namespace
{

class SessionLogTest : public testing::Test
{
protected:
    /// Lines in the display ring, oldest first.
    std::vector<FastBuffer> shown()
    {
        std::vector<FastBuffer> lines(64);
        lines.resize(m_log->getMessageQueue()->copyFromQueue(lines.data(), 64));
        return lines;
    }

    /// Takes what waits for the file. A mark is pushed behind it, so that nothing has to be waited for.
    std::vector<FastBuffer> forFile()
    {
        FastBuffer line{};
        line.status = 4711;
        m_log->getFileMessageQueue()->push(line);
        std::vector<FastBuffer> lines;
        while (m_log->getFileMessageQueue()->pop(line) && line.status != 4711)
            lines.push_back(line);
        return lines;
    }

    const std::unique_ptr<Log> m_log = std::make_unique<Log>(nullptr);
    SessionLog m_session{m_log.get(), nullptr};
    FastBuffer m_line{};
};

TEST_F(SessionLogTest, StartsWithBothSwitchesOff)
{
    EXPECT_FALSE(m_session.isLogging());
    m_session.emitWriteMessage(&m_line);
    EXPECT_TRUE(shown().empty());
    EXPECT_TRUE(forFile().empty());
}

TEST_F(SessionLogTest, LogsWhenEitherSwitchIsOn)
{
    m_session.showLog(true);
    EXPECT_TRUE(m_session.isLogging());
    m_session.writeLogFile(true);
    EXPECT_TRUE(m_session.isLogging());
    m_session.showLog(false);
    EXPECT_TRUE(m_session.isLogging());
    m_session.writeLogFile(false);
    EXPECT_FALSE(m_session.isLogging());
}

TEST_F(SessionLogTest, SendsAVisaLineWhereTheSwitchesSay)
{
    struct {
        bool show, write;
        std::size_t shownLines, fileLines;
    } const rows[] = {{false, false, 0, 0}, {true, false, 1, 0}, {false, true, 0, 1}, {true, true, 1, 1}};
    for (const auto &row : rows) {
        m_log->getMessageQueue()->clear();
        m_session.showLog(row.show);
        m_session.writeLogFile(row.write);
        m_session.emitWriteMessage(&m_line);
        EXPECT_EQ(shown().size(), row.shownLines) << row.show << row.write;
        EXPECT_EQ(forFile().size(), row.fileLines) << row.show << row.write;
    }
}

TEST_F(SessionLogTest, AlwaysShowsFreeText)
{
    struct {
        bool show, write;
        std::size_t fileLines;
    } const rows[] = {{false, false, 0}, {true, false, 0}, {false, true, 1}, {true, true, 1}};
    for (const auto &row : rows) {
        m_log->getMessageQueue()->clear();
        m_session.showLog(row.show);
        m_session.writeLogFile(row.write);
        m_session.forceEmitWriteMessage(&m_line);
        EXPECT_EQ(shown().size(), 1u) << row.show << row.write;
        EXPECT_EQ(forFile().size(), row.fileLines) << row.show << row.write;
    }
}

TEST_F(SessionLogTest, MarksVisaLinesAndFreeText)
{
    m_session.showLog(true);
    m_session.writeLogFile(true);
    m_line.visaLine = false;
    m_session.emitWriteMessage(&m_line);
    m_line.visaLine = true;
    m_session.forceEmitWriteMessage(&m_line);
    for (const std::vector<FastBuffer> &lines : {shown(), forFile()}) {
        ASSERT_EQ(lines.size(), 2u);
        EXPECT_TRUE(lines[0].visaLine);
        EXPECT_FALSE(lines[1].visaLine);
    }
}

TEST_F(SessionLogTest, NumbersALineBeforeItGoesAnywhere)
{
    m_session.showLog(true);
    m_session.writeLogFile(true);
    const std::uint64_t before = Log::s_line;
    m_session.emitWriteMessage(&m_line);
    m_session.forceEmitWriteMessage(&m_line);
    for (const std::vector<FastBuffer> &lines : {shown(), forFile()}) {
        ASSERT_EQ(lines.size(), 2u);
        EXPECT_EQ(lines[0].line, before + 1);
        EXPECT_EQ(lines[1].line, before + 2);
    }
}

TEST_F(SessionLogTest, TakesANumberAlsoWhenNobodyListens)
{
    const std::uint64_t before = Log::s_line;
    m_session.emitWriteMessage(&m_line);
    EXPECT_EQ(m_line.line, before + 1);
    EXPECT_EQ(Log::s_line, before + 1);
    m_session.forceEmitWriteMessage(&m_line);
    EXPECT_EQ(m_line.line, before + 2);
}

TEST_F(SessionLogTest, NumbersTheLinesOfAllSessionsInOneSequence)
{
    const auto otherLog = std::make_unique<Log>(nullptr);
    SessionLog other(otherLog.get(), nullptr);
    SessionLog testLog(m_log.get(), nullptr);
    const std::uint64_t before = Log::s_line;
    for (std::uint64_t i = 1; i <= 30; i += 3) {
        m_session.emitWriteMessage(&m_line);
        EXPECT_EQ(m_line.line, before + i);
        other.emitWriteMessage(&m_line);
        EXPECT_EQ(m_line.line, before + i + 1);
        testLog.forceEmitWriteMessage(&m_line);
        EXPECT_EQ(m_line.line, before + i + 2);
    }
}

TEST_F(SessionLogTest, FeedsOneLogFromTwoFronts)
{
    SessionLog testLog(m_log.get(), nullptr);
    m_session.showLog(true);
    testLog.showLog(true);
    m_line.status = 1;
    m_session.emitWriteMessage(&m_line);
    m_line.status = 2;
    testLog.emitWriteMessage(&m_line);
    const std::vector<FastBuffer> lines = shown();
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_EQ(lines[0].status, 1);
    EXPECT_EQ(lines[1].status, 2);
}

TEST_F(SessionLogTest, AllocatesNothingWhenItEmits)
{
    m_session.showLog(true);
    m_session.writeLogFile(true);
    const std::uint64_t before = allocations;
    ::operator delete(::operator new(1));
    ASSERT_EQ(allocations, before + 1) << "the counter must count";

    const std::uint64_t start = allocations;
    for (int i = 0; i < 8000; ++i) {
        m_session.emitWriteMessage(&m_line);
        m_session.forceEmitWriteMessage(&m_line);
    }
    EXPECT_EQ(allocations, start);
}

TEST_F(SessionLogTest, LosesNoNumberWhenSeveralThreadsEmit)
{
    const std::uint64_t before = Log::s_line;
    std::vector<std::thread> threads;
    threads.reserve(3);
    for (int i = 0; i < 3; ++i) {
        threads.emplace_back([this] {
            FastBuffer line{};
            for (int n = 0; n < 10000; ++n)
                m_session.emitWriteMessage(&line);
        });
    }
    for (std::thread &thread : threads)
        thread.join();
    EXPECT_EQ(Log::s_line, before + 30000);
}

TEST(LineCounter, MayGiveTwoThreadsTheLaterNumberAtTheSameInstant)
{
    using Clock = std::chrono::steady_clock;
    constexpr int Numbers = 20000;
    std::vector<std::uint64_t> mine(Numbers), theirs(Numbers), both;
    for (const auto end = Clock::now() + std::chrono::seconds(40); both.empty() && Clock::now() < end;) {
        std::atomic<bool> go{false};
        std::thread other([&] {
            while (!go)
                std::this_thread::yield();
            for (std::uint64_t &number : theirs)
                number = Log::getNewLine();
        });
        go = true;
        for (std::uint64_t &number : mine)
            number = Log::getNewLine();
        other.join();
        std::set_intersection(mine.begin(), mine.end(), theirs.begin(), theirs.end(), std::back_inserter(both));
    }
    EXPECT_FALSE(both.empty());
}

} // namespace
