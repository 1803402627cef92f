// HiSLIP sessions after something went wrong: a clear that timed out, an interruption whose other half never comes, an
// instrument that does not look at its input.
#include "support/HislipConversation.h"
#include "support/Stopwatch.h"

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

TEST(HislipRecovery, WriteBehindAClearThatTimedOutFinishesTheClearFirst)
{
    std::atomic<bool> timedOut{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            while (!timedOut)
                std::this_thread::yield();
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530800 00000000 0000000000000000")); // or what follows would be discarded
            client.sync.send(hex("48530900 00000000 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "x");
        },
        [&](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(viClear(session.vi), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            timedOut = true;
            EXPECT_EQ(session.write("x"), VI_SUCCESS);
        });
}

TEST(HislipRecovery, WriteBehindAClearWhoseEndWasNotConfirmedWaitsForThat)
{
    std::atomic<bool> timedOut{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530800 00000000 0000000000000000"));
            while (!timedOut)
                std::this_thread::yield();
            EXPECT_TRUE(client.sync.silentFor(std::chrono::milliseconds(50)));
            client.sync.send(hex("48530900 00000000 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "x");
        },
        [&](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(viClear(session.vi), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            timedOut = true;
            EXPECT_EQ(session.write("x"), VI_SUCCESS);
        });
}

TEST(HislipRecovery, FlushBehindAClearThatTimedOutDoesNotTakeItsEndAway)
{
    std::atomic<bool> timedOut{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530800 00000000 0000000000000000"));
            while (!timedOut)
                std::this_thread::yield();
            client.sync.send(hex("48530600 FFFFFF00 0000000000000003") + "old" +
                             hex("48530900 00000000 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "x");
        },
        [&](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(viClear(session.vi), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            timedOut = true;
            EXPECT_EQ(viFlush(session.vi, VI_IO_IN_BUF_DISCARD), VI_SUCCESS);
            EXPECT_EQ(session.write("x"), VI_SUCCESS);
        });
}

TEST(HislipRecovery, SecondClearGoesOnWithTheFirst)
{
    std::atomic<bool> timedOut{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            while (!timedOut)
                std::this_thread::yield();
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530800 00000000 0000000000000000"));
            client.sync.send(hex("48530900 00000000 0000000000000000"));
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000")); // no second request for a clear
            client.async.send(hex("48531600 00000000 0000000000000000"));
        },
        [&](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(viClear(session.vi), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            timedOut = true;
            EXPECT_EQ(viClear(session.vi), VI_SUCCESS);
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
        });
}

TEST(HislipRecovery, ClearOfAnInstrumentThatDoesNotLookAtItsInputIsAskedForFirst)
{
    constexpr std::size_t Size = 64'000'000;
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000")); // the input has not been touched
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530600 FFFFFF00 00000000000FFFF0"));
            client.sync.take(0xFFFF0);
            std::string header;
            while ((header = client.sync.take(16))[2] != '\x08')
                client.sync.take(0xFFFF0);
            EXPECT_EQ(header, hex("48530800 00000000 0000000000000000"));
            client.sync.send(hex("48530900 00000000 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "x");
        },
        [](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 100);
            EXPECT_EQ(session.write(std::string(Size, 'b')), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 30000);
            EXPECT_EQ(viClear(session.vi), VI_SUCCESS);
            EXPECT_EQ(session.write("x"), VI_SUCCESS);
        });
}

TEST(HislipRecovery, ShortTimeOutIsEnoughToAskForAClear)
{
    std::atomic<bool> asked{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000")); // the input has not been touched
            asked = true;
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530600 FFFFFF00 00000000000FFFF0"));
            client.sync.take(0xFFFF0);
            std::string header;
            while ((header = client.sync.take(16))[2] != '\x08')
                client.sync.take(0xFFFF0);
            client.sync.send(hex("48530900 00000000 0000000000000000"));
        },
        [&](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 400); // shorter than what an instrument is given to look at its input
            EXPECT_EQ(session.write(std::string(64'000'000, 'b')), VI_ERROR_TMO);
            ViStatus status = VI_ERROR_TMO;
            while (!asked && status == VI_ERROR_TMO)
                status = viClear(session.vi);
            session.set(VI_ATTR_TMO_VALUE, 30000);
            EXPECT_EQ(status == VI_ERROR_TMO ? viClear(session.vi) : status, VI_SUCCESS);
        });
}

TEST(HislipRecovery, ModeThatIsTakenBackBehindATimeOutIsTheLastOneAskedFor)
{
    std::atomic<bool> timedOut{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530801 00000000 0000000000000000")); // asks for overlap
            while (!timedOut)
                std::this_thread::yield();
            client.sync.send(hex("48530901 00000000 0000000000000000"));
            client.async.expect(hex("48531300 00000000 0000000000000000")); // and back
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530800 00000000 0000000000000000"));
            client.sync.send(hex("48530900 00000000 0000000000000000"));
        },
        [&](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(session.set(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, VI_TRUE), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            timedOut = true;
            EXPECT_EQ(session.set(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, VI_FALSE), VI_SUCCESS);
            EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN), VI_FALSE);
        });
}

TEST(HislipRecovery, ModeThatIsReachedBehindATimeOutIsShown)
{
    std::atomic<bool> timedOut{false};
    converse(
        [&](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            while (!timedOut)
                std::this_thread::yield();
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530801 00000000 0000000000000000"));
            client.sync.send(hex("48530901 00000000 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "x");
        },
        [&](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(session.set(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, VI_TRUE), VI_ERROR_TMO);
            EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN), VI_FALSE);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            timedOut = true;
            EXPECT_EQ(session.write("x"), VI_SUCCESS);
            EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN), VI_TRUE);
        });
}

TEST(HislipRecovery, InterruptedWithoutItsCounterpartDoesNotStopTheWritesForEver)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000003") + "1?\n");
            client.sync.send(hex("48530D00 FFFFFF00 0000000000000000") + hex("48530700 FFFFFF00 0000000000000003") +
                             "one");
            client.sync.expect(hex("48530701 FFFFFF02 0000000000000003") + "2?\n");
            client.async.send(hex("48530E00 FFFFFF00 0000000000000000")); // now that nobody waits for it
            client.async.expect(hex("48531500 FFFFFF02 0000000000000000"));
            client.async.send(hex("48531600 00000000 0000000000000000"));
            client.sync.send(hex("48530700 FFFFFF02 0000000000000003") + "two");
        },
        [](VisaSession &session) {
            session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
            ASSERT_EQ(session.write("1?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "one");
            const Stopwatch watch;
            EXPECT_EQ(session.write("2?\n"), VI_SUCCESS);
            EXPECT_LT(watch.milliseconds(), 20000);
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "two");
        });
}

TEST(HislipRecovery, AsyncInterruptedWithoutItsCounterpartDoesNotSpoilTheNextAnswer)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000003") + "1?\n");
            client.async.expect(hex("48531500 FFFFFF00 0000000000000000"));
            client.async.send(hex("48530E00 FFFFFF00 0000000000000000") + hex("48531600 00000000 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF02 0000000000000003") + "2?\n");
            client.sync.send(hex("48530700 FFFFFF02 0000000000000003") + "two");
        },
        [](VisaSession &session) {
            ASSERT_EQ(session.write("1?\n"), VI_SUCCESS);
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            ASSERT_EQ(session.write("2?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "two");
        });
}

TEST(HislipRecovery, ServiceRequestLeavesTheStatusByteToTheUser)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "go");
            client.async.send(hex("48531442 00000000 0000000000000000"));
            EXPECT_TRUE(client.async.silentFor(std::chrono::milliseconds(200))) << "that question is the user's";
            client.async.send(hex("48531442 00000000 0000000000000000"));
            client.async.expect(hex("48531500 FFFFFF00 0000000000000000"));
            client.async.send(hex("48531642 00000000 0000000000000000"));
        },
        [](VisaSession &session) {
            ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
            ASSERT_EQ(session.write("go"), VI_SUCCESS);
            for (int request = 0; request < 2; ++request) {
                EXPECT_GE(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 20000, nullptr, nullptr), VI_SUCCESS);
            }
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 0x42);
        });
}

TEST(HislipRecovery, TerminateEndsAWaitForAnEventWithoutEnd)
{
    std::atomic<bool> ended{false};
    converse([](HislipConnections &) {},
             [&](VisaSession &session) {
                 ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
                 std::thread waiting([&] {
                     EXPECT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_TMO_INFINITE, nullptr, nullptr),
                               VI_ERROR_ABORT);
                     ended = true;
                 });
                 while (!ended) {
                     EXPECT_EQ(viTerminate(session.vi, VI_NULL, VI_NULL), VI_SUCCESS);
                     std::this_thread::sleep_for(std::chrono::milliseconds(5));
                 }
                 waiting.join();
                 EXPECT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 0, nullptr, nullptr), VI_ERROR_TMO);
             });
}

} // namespace
