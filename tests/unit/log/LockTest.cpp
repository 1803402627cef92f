#include "log/Lock.h"

#include <gtest/gtest.h>

namespace
{

TEST(Lock, ExcludesNobodyWhoLocksTheOriginal)
{
    pthread_mutex_t mutex = PTHREAD_MUTEX_INITIALIZER;
    {
        const Lock lock(mutex);
        ASSERT_EQ(pthread_mutex_trylock(&mutex), 0);
        pthread_mutex_unlock(&mutex);
    }
    EXPECT_EQ(pthread_mutex_trylock(&mutex), 0);
    pthread_mutex_unlock(&mutex);
    pthread_mutex_destroy(&mutex);
}

TEST(Lock, CanBeTakenAgainByTheThreadThatHoldsIt)
{
    pthread_mutex_t mutex = PTHREAD_MUTEX_INITIALIZER;
    const Lock outer(mutex);
    const Lock inner(mutex);
    SUCCEED();
}

} // namespace
