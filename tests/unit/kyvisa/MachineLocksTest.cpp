// Locks between processes. Two lock files opened apart are to the system what two processes are; tests with real ones stand in
// tests/protocol.
#include "kyvisa/core/Interruptions.h"
#include "kyvisa/core/ResourceLocks.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/SystemCalls.h"
#include "support/TemporaryFolder.h"

#include <cerrno>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <thread>

using namespace kyvisa;

namespace
{

/// One process: its open lock file, the locks of one resource, and two sessions.
struct Process {
    explicit Process(const std::string &path, const std::string &resource = "resource")
        : file(std::make_shared<os::LockFile>(path)), locks(MachineLocks(file, resource))
    {
    }

    ViStatus exclusive(const int &session, ViUInt32 timeout = VI_TMO_IMMEDIATE)
    {
        return locks.lock(&session, VI_EXCLUSIVE_LOCK, timeout, {}, CallWatch(interruptions), key);
    }
    ViStatus shared(const int &session, const std::string &requested = {}, ViUInt32 timeout = VI_TMO_IMMEDIATE)
    {
        return locks.lock(&session, VI_SHARED_LOCK, timeout, requested, CallWatch(interruptions), key);
    }
    ViStatus unlock(const int &session) { return locks.unlock(&session); }
    bool shutOut(const int &session) const { return locks.heldByOther(&session); }

    std::shared_ptr<os::LockFile> file;
    ResourceLocks locks;
    Interruptions interruptions;
    std::string key;
    int a = 0;
    int b = 0;
};

class MachineLock : public testing::Test
{
protected:
    const test::TemporaryFolder m_folder;
    const std::string m_path = m_folder.file("locks");
    Process m_one{m_path};
    Process m_two{m_path};
};

constexpr auto NoLock = static_cast<ViAccessMode>(VI_NO_LOCK);
constexpr auto ExclusiveLock = static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK);
constexpr auto SharedLock = static_cast<ViAccessMode>(VI_SHARED_LOCK);

TEST_F(MachineLock, ExclusiveShutsTheOtherProcessOut)
{
    EXPECT_FALSE(m_two.shutOut(m_two.a));
    EXPECT_EQ(m_two.locks.state(), NoLock);
    ASSERT_EQ(m_one.exclusive(m_one.a), VI_SUCCESS);
    EXPECT_TRUE(m_two.shutOut(m_two.a));
    EXPECT_TRUE(m_one.shutOut(m_one.b));
    EXPECT_FALSE(m_one.shutOut(m_one.a));
    EXPECT_EQ(m_two.locks.state(), ExclusiveLock);
    EXPECT_EQ(m_two.exclusive(m_two.a), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(m_two.exclusive(m_two.a, 30), VI_ERROR_TMO);
    EXPECT_EQ(m_two.shared(m_two.a, "key"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(m_two.shared(m_two.a), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(m_one.exclusive(m_one.a), VI_SUCCESS_NESTED_EXCLUSIVE);
    EXPECT_EQ(m_one.unlock(m_one.a), VI_SUCCESS_NESTED_EXCLUSIVE);
    EXPECT_TRUE(m_two.shutOut(m_two.a));
    EXPECT_EQ(m_one.unlock(m_one.a), VI_SUCCESS);
    EXPECT_FALSE(m_two.shutOut(m_two.a));
    EXPECT_EQ(m_two.exclusive(m_two.a), VI_SUCCESS);
    EXPECT_TRUE(m_one.shutOut(m_one.a));
}

TEST_F(MachineLock, SharedNeedsTheKeyOfTheOtherProcess)
{
    ASSERT_EQ(m_one.shared(m_one.a, "key"), VI_SUCCESS);
    EXPECT_TRUE(m_two.shutOut(m_two.a));
    EXPECT_EQ(m_two.locks.state(), SharedLock);
    EXPECT_EQ(m_two.exclusive(m_two.a), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(m_two.shared(m_two.a), VI_ERROR_RSRC_LOCKED) << "without a key it waits";
    EXPECT_EQ(m_two.shared(m_two.a, "", 30), VI_ERROR_TMO);
    EXPECT_EQ(m_two.shared(m_two.a, "other"), VI_ERROR_INV_ACCESS_KEY);
    EXPECT_EQ(m_two.shared(m_two.a, "key"), VI_SUCCESS);
    EXPECT_EQ(m_two.key, "key");
    EXPECT_FALSE(m_two.shutOut(m_two.a));
    EXPECT_TRUE(m_two.shutOut(m_two.b));
    EXPECT_EQ(m_two.shared(m_two.b, "key"), VI_SUCCESS);
    EXPECT_EQ(m_one.unlock(m_one.a), VI_SUCCESS);
    EXPECT_TRUE(m_one.shutOut(m_one.a));
    EXPECT_EQ(m_two.unlock(m_two.a), VI_SUCCESS);
    EXPECT_TRUE(m_one.shutOut(m_one.a)) << "one session of the other process still shares";
    EXPECT_EQ(m_two.unlock(m_two.b), VI_SUCCESS);
    EXPECT_EQ(m_one.shared(m_one.a, "new"), VI_SUCCESS);
}

TEST_F(MachineLock, GeneratedKeyLetsTheOtherProcessIn)
{
    ASSERT_EQ(m_one.shared(m_one.a), VI_SUCCESS);
    EXPECT_EQ(m_two.shared(m_two.a, m_one.key), VI_SUCCESS);
}

TEST_F(MachineLock, ExclusiveOnTopOfSharedShutsTheOtherSharersOut)
{
    ASSERT_EQ(m_one.shared(m_one.a, "key"), VI_SUCCESS);
    ASSERT_EQ(m_two.shared(m_two.a, "key"), VI_SUCCESS);
    EXPECT_EQ(m_one.exclusive(m_one.a), VI_SUCCESS);
    EXPECT_TRUE(m_two.shutOut(m_two.a));
    EXPECT_EQ(m_two.exclusive(m_two.a), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(m_two.shared(m_two.a, "key"), VI_SUCCESS_NESTED_SHARED);
    EXPECT_EQ(m_two.shared(m_two.b, "key"), VI_SUCCESS);
    EXPECT_EQ(m_two.locks.state(), ExclusiveLock);
    EXPECT_EQ(m_one.unlock(m_one.a), VI_SUCCESS_NESTED_SHARED);
    EXPECT_FALSE(m_two.shutOut(m_two.a));
    EXPECT_EQ(m_two.locks.state(), SharedLock);
    EXPECT_EQ(m_two.exclusive(m_two.a), VI_SUCCESS);
    EXPECT_TRUE(m_one.shutOut(m_one.a));
}

TEST_F(MachineLock, NewcomerMayJoinTheSharersWhileOneOfThemIsExclusive)
{
    ASSERT_EQ(m_one.shared(m_one.a, "key"), VI_SUCCESS);
    ASSERT_EQ(m_one.exclusive(m_one.a), VI_SUCCESS);
    EXPECT_EQ(m_two.shared(m_two.a, "other"), VI_ERROR_INV_ACCESS_KEY);
    EXPECT_EQ(m_two.shared(m_two.a, "key"), VI_SUCCESS);
    EXPECT_TRUE(m_two.shutOut(m_two.a));
}

TEST_F(MachineLock, ClosingASharerKeepsWhatOthersOfItsProcessHold)
{
    ASSERT_EQ(m_one.shared(m_one.a, "key"), VI_SUCCESS);
    ASSERT_EQ(m_one.shared(m_one.b, "key"), VI_SUCCESS);
    ASSERT_EQ(m_one.exclusive(m_one.a), VI_SUCCESS);
    m_one.locks.forget(&m_one.a);
    EXPECT_EQ(m_two.locks.state(), SharedLock);
    EXPECT_EQ(m_two.exclusive(m_two.a), VI_ERROR_RSRC_LOCKED);
    m_one.locks.forget(&m_one.b);
    EXPECT_EQ(m_two.exclusive(m_two.a), VI_SUCCESS);
}

TEST_F(MachineLock, WaitEndsWhenTheOtherProcessLetsGo)
{
    ASSERT_EQ(m_one.exclusive(m_one.a), VI_SUCCESS);
    std::thread waiting([&] { EXPECT_EQ(m_two.exclusive(m_two.a, VI_TMO_INFINITE), VI_SUCCESS); });
    std::this_thread::sleep_for(std::chrono::milliseconds(30));
    EXPECT_EQ(m_one.unlock(m_one.a), VI_SUCCESS);
    waiting.join();
    EXPECT_TRUE(m_one.shutOut(m_one.a));
}

TEST_F(MachineLock, WaitEndsWhenTheOtherProcessIsGone)
{
    auto gone = std::make_unique<Process>(m_path);
    ASSERT_EQ(gone->exclusive(gone->a), VI_SUCCESS);
    std::thread waiting([&] { EXPECT_EQ(m_two.exclusive(m_two.a, VI_TMO_INFINITE), VI_SUCCESS); });
    gone.reset(); // its descriptor is closed, nothing else
    waiting.join();
}

TEST_F(MachineLock, TerminateAndCloseEndAWaitForAnotherProcess)
{
    ASSERT_EQ(m_one.exclusive(m_one.a), VI_SUCCESS);
    std::atomic<bool> ended{false};
    std::thread waiting([&] {
        EXPECT_EQ(m_two.exclusive(m_two.a, VI_TMO_INFINITE), VI_ERROR_ABORT);
        ended = true;
        EXPECT_EQ(m_two.exclusive(m_two.a, VI_TMO_INFINITE), VI_ERROR_INV_OBJECT);
    });
    while (!ended) {
        ++m_two.interruptions.terminations;
        m_two.locks.wake();
        std::this_thread::yield();
    }
    m_two.interruptions.closing = true;
    m_two.locks.wake();
    waiting.join();
}

TEST_F(MachineLock, EachResourceHasItsOwn)
{
    Process other(m_path, "another");
    ASSERT_EQ(m_one.exclusive(m_one.a), VI_SUCCESS);
    EXPECT_FALSE(other.shutOut(other.a));
    EXPECT_EQ(other.exclusive(other.a), VI_SUCCESS);
    ASSERT_EQ(m_one.unlock(m_one.a), VI_SUCCESS);
    EXPECT_EQ(m_two.exclusive(m_two.a), VI_SUCCESS);
}

TEST_F(MachineLock, FileIsEmptyAndForEverybody)
{
    ASSERT_EQ(m_one.shared(m_one.a, "secret"), VI_SUCCESS);
    struct stat status {
    };
    ASSERT_EQ(::stat(m_path.c_str(), &status), 0);
    EXPECT_EQ(status.st_size, 0);
    EXPECT_EQ(status.st_mode & 0777, 0666u);
}

TEST_F(MachineLock, HandsOverBetweenManyWithoutEverHoldingTwice)
{
    std::atomic<int> inside{0};
    const auto work = [&](Process &process, const int &session) {
        for (int i = 0; i < 20; ++i) {
            ASSERT_EQ(process.exclusive(session, 20000), VI_SUCCESS);
            EXPECT_EQ(++inside, 1);
            std::this_thread::yield();
            --inside;
            ASSERT_EQ(process.unlock(session), VI_SUCCESS);
        }
    };
    std::thread threads[] = {std::thread([&] { work(m_one, m_one.a); }), std::thread([&] { work(m_one, m_one.b); }),
                             std::thread([&] { work(m_two, m_two.a); }), std::thread([&] { work(m_two, m_two.b); })};
    for (std::thread &thread : threads)
        thread.join();
}

TEST_F(MachineLock, TwoWhoBeginToShareAtOnceWithTwoKeysAreNeverBothIn)
{
    for (int round = 0; round < 50; ++round) {
        ViStatus one = VI_SUCCESS;
        ViStatus two = VI_SUCCESS;
        std::thread other([&] { two = m_two.shared(m_two.a, "two"); });
        one = m_one.shared(m_one.a, "one");
        other.join();
        EXPECT_NE(one == VI_SUCCESS, two == VI_SUCCESS) << one << " " << two;
        m_one.unlock(m_one.a);
        m_two.unlock(m_two.a);
    }
}

// ---- Where there is no file

int refuseToOpen(const char *, int, mode_t)
{
    errno = EACCES;
    return -1;
}

TEST_F(MachineLock, WithoutAFileLocksAreRefusedAndTransfersAreNot)
{
    os::SystemCalls calls = os::realSystemCalls();
    calls.open = refuseToOpen;
    const os::ReplacedSystemCalls replaced(calls);
    EXPECT_EQ(m_one.exclusive(m_one.a), VI_ERROR_SYSTEM_ERROR);
    EXPECT_EQ(m_one.shared(m_one.a, "key"), VI_ERROR_SYSTEM_ERROR);
    EXPECT_EQ(m_one.unlock(m_one.a), VI_ERROR_SESN_NLOCKED);
    EXPECT_FALSE(m_one.shutOut(m_one.a));
}

TEST_F(MachineLock, SomethingElseInItsPlaceIsNotUsed)
{
    ASSERT_EQ(::mkfifo(m_path.c_str(), 0666), 0);
    EXPECT_EQ(m_one.exclusive(m_one.a), VI_ERROR_SYSTEM_ERROR);
    ASSERT_EQ(::unlink(m_path.c_str()), 0);
    ASSERT_EQ(::symlink(m_folder.file("elsewhere").c_str(), m_path.c_str()), 0);
    EXPECT_EQ(m_one.exclusive(m_one.a), VI_ERROR_SYSTEM_ERROR);
}

} // namespace
