#include "kyvisa/discovery/TaskPool.h"

#include <atomic>
#include <gtest/gtest.h>
#include <latch>

using kyvisa::TaskPool;

namespace
{

TEST(TaskPool, RunsTasksSideBySide)
{
    std::latch allThere(4);
    TaskPool pool(4);
    for (int i = 0; i < 4; ++i)
        pool.add([&] { allThere.arrive_and_wait(); });
    pool.finish(); // would wait for ever if they ran one after the other
}

TEST(TaskPool, RunsMoreTasksThanThreads)
{
    std::atomic<int> done{0};
    {
        TaskPool pool(3);
        for (int i = 0; i < 1000; ++i)
            pool.add([&] { ++done; });
    }
    EXPECT_EQ(done, 1000);
}

TEST(TaskPool, StartsNoThreadWithoutATask)
{
    TaskPool pool(3);
    pool.finish();
}

} // namespace
