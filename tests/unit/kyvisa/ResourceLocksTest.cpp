#include "kyvisa/core/ResourceLocks.h"
#include "kyvisa/core/Interruptions.h"
#include "kyvisa/include/visa.h"
#include "support/TemporaryFolder.h"

#include <gtest/gtest.h>
#include <thread>

using namespace kyvisa;

namespace
{

class Locks : public testing::Test
{
protected:
    ViStatus exclusive(const int &holder, ViUInt32 timeout = VI_TMO_IMMEDIATE)
    {
        return m_locks.lock(&holder, VI_EXCLUSIVE_LOCK, timeout, {}, CallWatch(m_interruptions), m_key);
    }
    ViStatus shared(const int &holder, const std::string &key = {}, ViUInt32 timeout = VI_TMO_IMMEDIATE)
    {
        return m_locks.lock(&holder, VI_SHARED_LOCK, timeout, key, CallWatch(m_interruptions), m_key);
    }
    ViStatus unlock(const int &holder) { return m_locks.unlock(&holder); }

    test::TemporaryFolder m_folder;
    ResourceLocks m_locks{MachineLocks(std::make_shared<os::LockFile>(m_folder.file("locks")), "resource")};
    Interruptions m_interruptions;
    std::string m_key;
    int m_a = 0;
    int m_b = 0;
    int m_c = 0;
};

TEST_F(Locks, ExclusiveNestsAndUnwinds)
{
    EXPECT_EQ(exclusive(m_a), VI_SUCCESS);
    EXPECT_EQ(exclusive(m_a), VI_SUCCESS_NESTED_EXCLUSIVE);
    EXPECT_EQ(m_locks.state(), static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK));
    EXPECT_EQ(unlock(m_a), VI_SUCCESS_NESTED_EXCLUSIVE);
    EXPECT_EQ(unlock(m_a), VI_SUCCESS);
    EXPECT_EQ(unlock(m_a), VI_ERROR_SESN_NLOCKED);
    EXPECT_EQ(m_locks.state(), static_cast<ViAccessMode>(VI_NO_LOCK));
}

TEST_F(Locks, ExclusiveShutsOthersOut)
{
    ASSERT_EQ(exclusive(m_a), VI_SUCCESS);
    EXPECT_EQ(exclusive(m_b), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(shared(m_b), VI_ERROR_RSRC_LOCKED);
    EXPECT_TRUE(m_locks.heldByOther(&m_b));
    EXPECT_FALSE(m_locks.heldByOther(&m_a));
}

TEST_F(Locks, SharedNeedsTheKey)
{
    ASSERT_EQ(shared(m_a, "key"), VI_SUCCESS);
    EXPECT_EQ(m_key, "key");
    EXPECT_EQ(shared(m_a), VI_SUCCESS_NESTED_SHARED);
    EXPECT_EQ(m_key, "key");
    EXPECT_EQ(shared(m_a, "other"), VI_ERROR_INV_ACCESS_KEY);
    EXPECT_EQ(shared(m_b, "other"), VI_ERROR_INV_ACCESS_KEY);
    EXPECT_EQ(shared(m_b, "key"), VI_SUCCESS);
    EXPECT_FALSE(m_locks.heldByOther(&m_b));
    EXPECT_TRUE(m_locks.heldByOther(&m_c));
    EXPECT_EQ(exclusive(m_c), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(unlock(m_a), VI_SUCCESS_NESTED_SHARED);
    EXPECT_EQ(unlock(m_a), VI_SUCCESS);
    EXPECT_EQ(unlock(m_b), VI_SUCCESS);
    EXPECT_EQ(shared(m_c, "new"), VI_SUCCESS);
}

TEST_F(Locks, NewcomerWithoutAKeyWaits)
{
    ASSERT_EQ(shared(m_a, "key"), VI_SUCCESS);
    EXPECT_EQ(shared(m_b), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(shared(m_b, "", 20), VI_ERROR_TMO);
}

TEST_F(Locks, WaitThatEndsIsATimeOutAndAnImmediateOneIsLocked)
{
    ASSERT_EQ(exclusive(m_a), VI_SUCCESS);
    EXPECT_EQ(exclusive(m_b, 20), VI_ERROR_TMO);
    EXPECT_EQ(exclusive(m_b, VI_TMO_IMMEDIATE), VI_ERROR_RSRC_LOCKED);
}

TEST_F(Locks, ExclusiveOnTopOfSharedShutsTheOtherSharersOut)
{
    ASSERT_EQ(shared(m_a, "key"), VI_SUCCESS);
    ASSERT_EQ(shared(m_b, "key"), VI_SUCCESS);
    EXPECT_EQ(exclusive(m_a), VI_SUCCESS);
    EXPECT_TRUE(m_locks.heldByOther(&m_b));
    EXPECT_EQ(exclusive(m_b), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(shared(m_b, "key"), VI_SUCCESS_NESTED_SHARED);
    EXPECT_EQ(shared(m_c, "key"), VI_SUCCESS);
    EXPECT_EQ(shared(m_a, "key"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(m_locks.state(), static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK));
    EXPECT_EQ(unlock(m_a), VI_SUCCESS_NESTED_SHARED);
    EXPECT_EQ(m_locks.state(), static_cast<ViAccessMode>(VI_SHARED_LOCK));
    EXPECT_FALSE(m_locks.heldByOther(&m_b));
}

TEST_F(Locks, MakesAKeyNobodyElseHas)
{
    ASSERT_EQ(shared(m_a), VI_SUCCESS);
    const std::string first = m_key;
    EXPECT_FALSE(first.empty());
    EXPECT_LT(first.size(), 256u);
    ASSERT_EQ(unlock(m_a), VI_SUCCESS);
    ASSERT_EQ(shared(m_b), VI_SUCCESS);
    EXPECT_NE(m_key, first);
}

TEST_F(Locks, UnlockLetsTheNextOneIn)
{
    ASSERT_EQ(exclusive(m_a), VI_SUCCESS);
    std::thread waiting([&] {
        std::string key;
        EXPECT_EQ(m_locks.lock(&m_b, VI_EXCLUSIVE_LOCK, 20000, {}, CallWatch(m_interruptions), key), VI_SUCCESS);
    });
    EXPECT_EQ(unlock(m_a), VI_SUCCESS);
    waiting.join();
    EXPECT_TRUE(m_locks.heldByOther(&m_a));
}

TEST_F(Locks, ClosingEndsAWaitWithoutEnd)
{
    ASSERT_EQ(exclusive(m_a), VI_SUCCESS);
    std::thread waiting([&] {
        std::string key;
        EXPECT_EQ(m_locks.lock(&m_b, VI_EXCLUSIVE_LOCK, VI_TMO_INFINITE, {}, CallWatch(m_interruptions), key),
                  VI_ERROR_INV_OBJECT);
    });
    m_interruptions.closing = true;
    m_locks.wake();
    waiting.join();
}

TEST_F(Locks, ForgettingAHolderFreesEverythingItHeld)
{
    ASSERT_EQ(shared(m_a, "key"), VI_SUCCESS);
    ASSERT_EQ(exclusive(m_a), VI_SUCCESS);
    m_locks.forget(&m_a);
    EXPECT_EQ(exclusive(m_b), VI_SUCCESS);
    m_locks.forget(&m_a);
    EXPECT_TRUE(m_locks.heldByOther(&m_a));
}

TEST(LockRegistry, KnowsAResourceByItsNameWithoutCase)
{
    const test::TemporaryFolder folder;
    LockRegistry registry(folder.file("locks"));
    const auto one = registry.locksOf("TCPIP0::Box::hislip0::INSTR");
    EXPECT_EQ(registry.locksOf("tcpip0::box::HISLIP0::instr"), one);
    EXPECT_NE(registry.locksOf("TCPIP0::box::hislip1::INSTR"), one);
}

} // namespace
