// Counts what the program allocates: in a program of its own, because it replaces operator new.
#include "unit/visa/SessionFixture.h"

#include <cstdlib>
#include <new>

namespace
{

thread_local std::size_t s_allocations = 0;

} // namespace

void *operator new(std::size_t size)
{
    ++s_allocations;
    void *memory = std::malloc(size != 0 ? size : 1);
    if (memory == nullptr)
        throw std::bad_alloc();
    return memory;
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

class SessionAllocation : public SessionTest
{
protected:
    SessionAllocation() { openSession(); }

    /// What 50 runs of @p operation allocate. The stand-in records what it is called with, always in the same way: a
    /// first round makes its room, the second is counted.
    template <typename Operation>
    static std::size_t allocations(Operation operation)
    {
        std::size_t counted = 0;
        for (int round = 0; round < 2; ++round) {
            const std::size_t before = s_allocations;
            for (int i = 0; i < 50; ++i)
                operation();
            counted = s_allocations - before;
            standin::forgetCalls();
        }
        return counted;
    }
};

} // namespace

TEST_F(SessionAllocation, IsNoneForLoggingWhileNobodyListens)
{
    m_sessionLog.showLog(false);
    const std::string data(300, 'x');
    const auto bare = allocations([&] { viWrite(2, reinterpret_cast<ViConstBuf>(data.data()), 300, nullptr); });
    EXPECT_EQ(allocations([&] { m_session->write(data.data(), 300); }), bare);
    const auto bareClear = allocations([&] { viClear(2); });
    EXPECT_EQ(allocations([&] { m_session->clear(); }), bareClear);
}

TEST_F(SessionAllocation, IsNoneForALineWithoutTransferredBytes)
{
    const auto bare = allocations([&] { viClear(2); });
    EXPECT_EQ(allocations([&] { m_session->clear(); }), bare);
}

TEST_F(SessionAllocation, IsOneTextForEachTransferThatIsLogged)
{
    const std::string data(300, '\x01');
    const auto bare = allocations([&] { viWrite(2, reinterpret_cast<ViConstBuf>(data.data()), 300, nullptr); });
    EXPECT_EQ(allocations([&] { m_session->write(data.data(), 300); }), bare + 50);
}
