#include "log/LightSemaphore.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <future>
#include <thread>
#include <vector>

namespace
{

using namespace std::chrono_literals;

constexpr auto LongEnough = 40s; // on a loaded machine

TEST(LightSemaphore, HandsOutThePermitsThatItHas)
{
    LightSemaphore semaphore(2);
    semaphore.acquire();
    EXPECT_TRUE(semaphore.tryAcquire());
    EXPECT_FALSE(semaphore.tryAcquire());
    semaphore.release(2);
    EXPECT_TRUE(semaphore.tryAcquire());
    EXPECT_TRUE(semaphore.tryAcquire());
    EXPECT_FALSE(semaphore.tryAcquire());
}

TEST(LightSemaphore, ATakerWaitsForAPermit)
{
    LightSemaphore semaphore(0);
    std::atomic<bool> released = false;
    auto taker = std::async(std::launch::async, [&] {
        semaphore.acquire();
        return released.load();
    });
    released = true;
    semaphore.release();
    ASSERT_EQ(taker.wait_for(LongEnough), std::future_status::ready);
    EXPECT_TRUE(taker.get());
    EXPECT_FALSE(semaphore.tryAcquire());
}

TEST(LightSemaphore, OneReleaseOfManyWakesAllWhoWaitAndKeepsTheRest)
{
    constexpr int Takers = 8;
    LightSemaphore semaphore(0);
    std::vector<std::future<void>> takers;
    for (int i = 0; i < Takers; ++i)
        takers.push_back(std::async(std::launch::async, [&] { semaphore.acquire(); }));
    semaphore.release(Takers + 2);
    for (auto &taker : takers)
        ASSERT_EQ(taker.wait_for(LongEnough), std::future_status::ready);
    EXPECT_TRUE(semaphore.tryAcquire());
    EXPECT_TRUE(semaphore.tryAcquire());
    EXPECT_FALSE(semaphore.tryAcquire());
}

TEST(LightSemaphore, LosesAndInventsNoPermitBetweenManyThreads)
{
    constexpr int Threads = 4;
    constexpr int Rounds = 5000;
    LightSemaphore there(0);
    LightSemaphore back(3);
    std::vector<std::future<void>> all;
    for (int i = 0; i < Threads; ++i) {
        all.push_back(std::async(std::launch::async, [&] {
            for (int round = 0; round < Rounds; ++round) {
                back.acquire();
                there.release();
            }
        }));
        all.push_back(std::async(std::launch::async, [&] {
            for (int round = 0; round < Rounds; ++round) {
                there.acquire();
                back.release();
            }
        }));
    }
    for (auto &one : all)
        ASSERT_EQ(one.wait_for(LongEnough), std::future_status::ready);
    EXPECT_FALSE(there.tryAcquire());
    EXPECT_TRUE(back.tryAcquire());
    EXPECT_TRUE(back.tryAcquire());
    EXPECT_TRUE(back.tryAcquire());
    EXPECT_FALSE(back.tryAcquire());
}

} // namespace
