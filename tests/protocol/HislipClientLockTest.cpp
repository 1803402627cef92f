// HiSLIP locks, seen from the client: what goes to the instrument, what is only counted, and what becomes of an answer that
// comes too late. The bytes are those of the tables of IVI-6.1.
#include "support/HislipConversation.h"
#include "support/QuietFork.h"
#include "support/Stopwatch.h"

#include <array>
#include <atomic>
#include <gtest/gtest.h>
#include <thread>

using test::acceptHislip;
using test::converse;
using test::hex;
using test::HislipConnections;
using test::hislipResource;
using test::ScriptedPeer;
using test::Stopwatch;
using test::VisaSession;

namespace
{

const std::string Granted = hex("48530501 00000000 0000000000000000");
const std::string Failed = hex("48530500 00000000 0000000000000000");
const std::string ExclusiveReleased = hex("48530501 00000000 0000000000000000");
const std::string SharedReleased = hex("48530502 00000000 0000000000000000");

ViStatus lockExclusively(VisaSession &session, ViUInt32 timeout)
{
    return viLock(session.vi, VI_EXCLUSIVE_LOCK, timeout, nullptr, nullptr);
}

TEST(HislipLocking, ExclusiveLockIsTheInstrumentsAndNestedOnesAreCountedHere)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(Granted);
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "x");
            client.async.expect(hex("48530400 FFFFFF00 0000000000000000")); // behind the message that was sent last
            client.async.send(ExclusiveReleased);
        },
        [](VisaSession &session) {
            std::array<ViChar, 256> key{"?"};
            EXPECT_EQ(viUnlock(session.vi), VI_ERROR_SESN_NLOCKED);
            EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, VI_TMO_IMMEDIATE, nullptr, key.data()), VI_SUCCESS);
            EXPECT_STREQ(key.data(), "");
            EXPECT_EQ(lockExclusively(session, VI_TMO_IMMEDIATE), VI_SUCCESS_NESTED_EXCLUSIVE);
            EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, "key", nullptr), VI_ERROR_RSRC_LOCKED);
            EXPECT_EQ(session.get<ViAccessMode>(VI_ATTR_RSRC_LOCK_STATE), static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK));
            EXPECT_EQ(session.write("x"), VI_SUCCESS);
            EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS_NESTED_EXCLUSIVE);
            EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS);
            EXPECT_EQ(viUnlock(session.vi), VI_ERROR_SESN_NLOCKED);
        });
}

TEST(HislipLocking, SharedLockSendsItsKeyAndTheExclusiveOneComesOnTop)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48530401 00000000 0000000000000003") + "key");
            client.async.send(Granted);
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(Granted);
            client.async.expect(hex("48530400 FFFFFEFE 0000000000000000")); // nothing was sent yet
            client.async.send(ExclusiveReleased);
            client.async.expect(hex("48530400 FFFFFEFE 0000000000000000"));
            client.async.send(SharedReleased);
        },
        [](VisaSession &session) {
            std::array<ViChar, 256> key{};
            EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, "key", key.data()), VI_SUCCESS);
            EXPECT_STREQ(key.data(), "key");
            key.fill('\0');
            EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, nullptr, key.data()), VI_SUCCESS_NESTED_SHARED);
            EXPECT_STREQ(key.data(), "key");
            EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, "other", nullptr), VI_ERROR_INV_ACCESS_KEY);
            EXPECT_EQ(lockExclusively(session, 0), VI_SUCCESS);
            EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS_NESTED_SHARED); // the exclusive one goes first
            EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS_NESTED_SHARED);
            EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS);
        });
}

TEST(HislipLocking, MakesAKeyForASharedLockWithoutOne)
{
    std::string sent;
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48530401 00000000 0000000000000027"));
            sent = client.async.take(0x27);
            client.async.send(Granted);
        },
        [&](VisaSession &session) {
            std::array<ViChar, 256> key{};
            EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, "", key.data()), VI_SUCCESS);
            EXPECT_EQ(sent, key.data());
        });
}

TEST(HislipLocking, RefusalIsLockedAtOnceAndATimeOutAfterWaiting)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(Failed);
            client.async.expect(hex("48530401"));
            const std::string patience = client.async.take(4);
            EXPECT_EQ(patience.substr(0, 3), std::string(3, '\0')) << "no more than the 60 ms that were asked for";
            client.async.expect(hex("0000000000000000"));
            std::this_thread::sleep_for(std::chrono::milliseconds(80)); // the instrument's wait
            client.async.send(Failed);
        },
        [](VisaSession &session) {
            EXPECT_EQ(lockExclusively(session, VI_TMO_IMMEDIATE), VI_ERROR_RSRC_LOCKED);
            EXPECT_EQ(lockExclusively(session, 60), VI_ERROR_TMO);
        });
}

TEST(HislipLocking, LongWaitIsCutIntoShortRequests)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48530401 000001F4 0000000000000000"));
            client.async.send(Failed);
            client.async.expect(hex("48530401 000001F4 0000000000000000"));
            client.async.send(Granted);
        },
        [](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 1); // the wait for a lock has its own time
            EXPECT_EQ(lockExclusively(session, VI_TMO_INFINITE), VI_SUCCESS);
        });
}

TEST(HislipLocking, InstrumentThatRefusesAtOnceIsNotAskedInAnEndlessHurry)
{
    std::atomic<int> requests{0};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        while (client.async.takeUntilClosed(16).size() == 16) {
            ++requests;
            client.async.trySend(Failed);
        }
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(hislipResource(peer), 20000), VI_SUCCESS);
    EXPECT_EQ(lockExclusively(session, 200), VI_ERROR_TMO);
    viClose(session.vi);
    EXPECT_LT(requests, 30);
}

TEST(HislipLocking, AnswerThatIsNeitherGrantedNorFailedIsAnError)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(hex("48530503 00000000 0000000000000000"));
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(hex("48530301 00000000 0000000000000000")); // unknown message type
        },
        [](VisaSession &session) {
            EXPECT_EQ(lockExclusively(session, 0), VI_ERROR_IO);
            EXPECT_EQ(lockExclusively(session, 0), VI_ERROR_NSUP_OPER);
            EXPECT_EQ(viUnlock(session.vi), VI_ERROR_SESN_NLOCKED);
        });
}

TEST(HislipLocking, LockStateIsThatOfTheInstrument)
{
    converse(
        [](HislipConnections &client) {
            for (const char *answer : {"48531900 00000000", "48531900 00000002", "48531901 00000001"}) {
                client.async.expect(hex("48531800 00000000 0000000000000000"));
                client.async.send(hex(answer) + hex("0000000000000000"));
            }
        },
        [](VisaSession &session) {
            EXPECT_EQ(session.get<ViAccessMode>(VI_ATTR_RSRC_LOCK_STATE), static_cast<ViAccessMode>(VI_NO_LOCK));
            EXPECT_EQ(session.get<ViAccessMode>(VI_ATTR_RSRC_LOCK_STATE), static_cast<ViAccessMode>(VI_SHARED_LOCK));
            EXPECT_EQ(session.get<ViAccessMode>(VI_ATTR_RSRC_LOCK_STATE), static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK));
        });
}

struct ForeignLock {
    const char *name;
    const char *info; ///< AsyncLockInfoResponse without its length
    ViStatus expected;
};

class HislipForeignLock : public testing::TestWithParam<ForeignLock>
{
};

TEST_P(HislipForeignLock, IsNamedWhenAReadTimesOut)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "?\n");
            client.async.expect(hex("48531800 00000000 0000000000000000"));
            client.async.send(hex(GetParam().info) + hex("0000000000000000"));
        },
        [](VisaSession &session) {
            EXPECT_EQ(session.write("?\n"), VI_SUCCESS); // the instrument queues it
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(session.read(), GetParam().expected);
        });
}

INSTANTIATE_TEST_SUITE_P(All, HislipForeignLock,
                         testing::Values(ForeignLock{"None", "48531900 00000000", VI_ERROR_TMO},
                                         ForeignLock{"Exclusive", "48531901 00000001", VI_ERROR_RSRC_LOCKED},
                                         ForeignLock{"ExclusiveNotCounted", "48531901 00000000", VI_ERROR_RSRC_LOCKED},
                                         ForeignLock{"Shared", "48531900 00000001", VI_ERROR_RSRC_LOCKED},
                                         ForeignLock{"NotAnswered", "48530301 00000000", VI_ERROR_TMO}),
                         [](const auto &row) { return std::string(row.param.name); });

TEST(HislipLocking, OpeningWithALockIsOpenThenLock)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.async.expect(hex("48530401 00000000 0000000000000000"));
        client.async.send(Failed);
        client.sync.expectClosed();
    });
    VisaSession session;
    EXPECT_EQ(session.open(hislipResource(peer), VI_TMO_IMMEDIATE, VI_EXCLUSIVE_LOCK), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(session.vi, VI_NULL);
}

TEST(HislipLocking, WaitWhileOpeningEndsWithTheTimeOutOfTheWholeCall)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        while (client.async.takeUntilClosed(16).size() == 16) {
            std::this_thread::sleep_for(std::chrono::milliseconds(150)); // the instrument's wait
            client.async.trySend(Failed);
        }
        client.sync.expectClosed();
    });
    VisaSession session;
    const Stopwatch watch;
    EXPECT_EQ(session.open(hislipResource(peer), 700, VI_EXCLUSIVE_LOCK), VI_ERROR_RSRC_LOCKED);
    EXPECT_GE(watch.milliseconds(), 700);
    EXPECT_LT(watch.milliseconds(), 10000);
}

TEST(HislipLocking, NestedLockDoesNotWaitForAnotherThreadsRead)
{
    std::atomic<bool> nested{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(Granted);
            while (!nested)
                std::this_thread::yield();
            client.sync.send(hex("48530700 FFFFFEFE 0000000000000001") + "!");
        },
        [&](VisaSession &session) {
            ASSERT_EQ(lockExclusively(session, VI_TMO_IMMEDIATE), VI_SUCCESS);
            std::atomic<pid_t> reader{0};
            std::thread reading([&] {
                reader = ::gettid();
                ViByte byte = 0;
                EXPECT_EQ(viRead(session.vi, &byte, 1, nullptr), VI_SUCCESS);
            });
            while (reader == 0)
                std::this_thread::yield();
            test::awaitWaiting(reader);
            EXPECT_EQ(lockExclusively(session, VI_TMO_IMMEDIATE), VI_SUCCESS_NESTED_EXCLUSIVE);
            EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS_NESTED_EXCLUSIVE);
            nested = true;
            reading.join();
        });
}

TEST(HislipLocking, TwoThreadsThatUnlockAtOnceGiveBackTwoLocks)
{
    std::atomic<pid_t> second{0};
    std::atomic<bool> asked{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48530401 00000000 0000000000000003") + "key");
            client.async.send(Granted);
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(Granted);
            client.async.expect(hex("48530400 FFFFFEFE 0000000000000000"));
            asked = true;
            while (second == 0)
                std::this_thread::yield();
            test::awaitWaiting(second); // for its turn
            client.async.send(ExclusiveReleased);
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000")); // and no release before the last one
            client.async.send(hex("48531600 00000000 0000000000000000"));
            client.async.expect(hex("48530400 FFFFFEFE 0000000000000000"));
            client.async.send(SharedReleased);
        },
        [&](VisaSession &session) {
            EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, "key", nullptr), VI_SUCCESS);
            EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, "key", nullptr), VI_SUCCESS_NESTED_SHARED);
            EXPECT_EQ(lockExclusively(session, 0), VI_SUCCESS);
            std::thread first([&] { EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS_NESTED_SHARED); });
            while (!asked)
                std::this_thread::yield();
            second = ::gettid();
            EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS_NESTED_SHARED);
            first.join();
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS);
        });
}

// ---- Given up -------------------------------------------------------------------------------------------------------

/// Waits for a lock until @p asked, then terminates that.
void giveUpALock(VisaSession &session, const std::atomic<bool> &asked)
{
    std::thread waiting([&] { EXPECT_EQ(lockExclusively(session, VI_TMO_INFINITE), VI_ERROR_ABORT); });
    while (!asked)
        std::this_thread::yield();
    EXPECT_EQ(viTerminate(session.vi, VI_NULL, VI_NULL), VI_SUCCESS);
    waiting.join();
    EXPECT_EQ(viUnlock(session.vi), VI_ERROR_SESN_NLOCKED);
}

TEST(HislipLocking, LockThatIsGrantedTooLateIsGivenBackAtOnce)
{
    std::atomic<bool> asked{false};
    std::atomic<bool> givenUp{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48530401 000001F4 0000000000000000"));
            asked = true;
            while (!givenUp)
                std::this_thread::yield();
            client.async.send(Granted);
            client.async.expect(hex("48530400 FFFFFEFE 0000000000000000")); // though nobody calls the library
            client.async.send(ExclusiveReleased);
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(Granted);
        },
        [&](VisaSession &session) {
            giveUpALock(session, asked);
            givenUp = true;
            EXPECT_EQ(lockExclusively(session, VI_TMO_IMMEDIATE), VI_SUCCESS);
        });
}

TEST(HislipLocking, NextLockWaitsForTheAnswerToTheOneThatWasGivenUp)
{
    std::atomic<bool> asked{false};
    std::atomic<bool> givenUp{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48530401 000001F4 0000000000000000"));
            asked = true;
            while (!givenUp)
                std::this_thread::yield();
            EXPECT_TRUE(client.async.silentFor(std::chrono::milliseconds(100)));
            client.async.send(Failed);
            client.async.expect(hex("48530401 00000000 0000000000000000"));
            client.async.send(Granted);
        },
        [&](VisaSession &session) {
            giveUpALock(session, asked);
            givenUp = true;
            EXPECT_EQ(lockExclusively(session, VI_TMO_IMMEDIATE), VI_SUCCESS);
        });
}

TEST(HislipLocking, CloseEndsAWaitForALockWithoutEnd)
{
    std::atomic<bool> asked{false};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.async.expect(hex("48530401 000001F4 0000000000000000"));
        asked = true;
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(hislipResource(peer), 20000), VI_SUCCESS);
    std::thread waiting([&] { EXPECT_EQ(lockExclusively(session, VI_TMO_INFINITE), VI_ERROR_INV_OBJECT); });
    while (!asked)
        std::this_thread::yield();
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
    waiting.join();
}

TEST(HislipLocking, OtherThreadsHaveTheirTurnWhileOneWaitsForALock)
{
    std::atomic<bool> asked{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48530401 000001F4 0000000000000000"));
            asked = true;
            std::string request;
            do {
                client.async.send(Failed);
                request = client.async.take(16);
            } while (request[2] == '\x04');
            EXPECT_EQ(request, hex("48531500 FFFFFEFE 0000000000000000"));
            client.async.send(hex("48531642 00000000 0000000000000000"));
            client.async.expect(hex("48530401 000001F4 0000000000000000"));
            client.async.send(Granted);
        },
        [&](VisaSession &session) {
            std::thread waiting([&] { EXPECT_EQ(lockExclusively(session, VI_TMO_INFINITE), VI_SUCCESS); });
            while (!asked)
                std::this_thread::yield();
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 0x42);
            waiting.join();
        });
}

} // namespace
