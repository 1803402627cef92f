// HiSLIP instruments that break the rules: the call ends with a status within its time-out, and nothing else notices.
#include "support/HislipPeer.h"
#include "support/Stopwatch.h"
#include "support/VisaSession.h"

#include <atomic>
#include <gtest/gtest.h>
#include <thread>

using test::acceptHislip;
using test::hex;
using test::HislipConnections;
using test::ScriptedPeer;
using test::Stopwatch;
using test::VisaSession;

namespace
{

std::string resource(const ScriptedPeer &peer)
{
    return "TCPIP::127.0.0.1::hislip0," + std::to_string(peer.port()) + "::INSTR";
}

struct Hostility {
    const char *name;
    std::string answer;
    bool closes; ///< the instrument closes after its answer
    ViStatus expected;
    std::string text; ///< what the read still delivers
};

class HislipHostility : public testing::TestWithParam<Hostility>
{
};

TEST_P(HislipHostility, ReadEndsWithAStatusAndAnotherSessionGoesOn)
{
    const Hostility &row = GetParam();
    ScriptedPeer good([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "?\n");
        client.sync.send(hex("48530700 FFFFFF00 0000000000000002") + "ok");
        client.sync.expectClosed();
    });
    std::atomic<bool> done{false};
    ScriptedPeer bad([&](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "?\n");
        client.sync.trySend(row.answer);
        if (row.closes)
            client.sync.close();
        while (!done)
            std::this_thread::yield();
    });
    VisaSession quiet;
    VisaSession session;
    ASSERT_EQ(quiet.open(resource(good)), VI_SUCCESS);
    ASSERT_EQ(session.open(resource(bad)), VI_SUCCESS);
    ASSERT_EQ(session.write("?\n"), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 200);
    const Stopwatch watch;
    EXPECT_EQ(session.read(64), row.expected);
    EXPECT_EQ(session.text, row.text);
    EXPECT_LT(watch.milliseconds(), 10000);
    if (row.expected == VI_ERROR_CONN_LOST) {
        ViUInt16 status = 0;
        EXPECT_EQ(session.read(64), VI_ERROR_CONN_LOST);
        EXPECT_EQ(session.write("?\n"), VI_ERROR_CONN_LOST);
        EXPECT_EQ(viReadSTB(session.vi, &status), VI_ERROR_CONN_LOST);
        EXPECT_EQ(viAssertTrigger(session.vi, 0), VI_ERROR_CONN_LOST);
        EXPECT_EQ(viClear(session.vi), VI_ERROR_CONN_LOST);
        EXPECT_EQ(viGpibControlREN(session.vi, 1), VI_ERROR_CONN_LOST);
        EXPECT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_ERROR_CONN_LOST);
    }
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
    done = true;
    EXPECT_EQ(quiet.write("?\n"), VI_SUCCESS);
    EXPECT_EQ(quiet.read(), VI_SUCCESS);
    EXPECT_EQ(quiet.text, "ok");
    viClose(quiet.vi);
}

INSTANTIATE_TEST_SUITE_P(
    All, HislipHostility,
    testing::Values(
        Hostility{"Garbage", std::string(64, '\xA5'), false, VI_ERROR_CONN_LOST, ""},
        Hostility{"HalfAHeader", hex("48530700 FFFF"), false, VI_ERROR_TMO, ""},
        Hostility{"HalfAHeaderThenClose", hex("48530700 FFFF"), true, VI_ERROR_CONN_LOST, ""},
        Hostility{"ImmenseLength", hex("48530700 FFFFFF00 FFFFFFFFFFFFFFFF") + "abc", false, VI_ERROR_CONN_LOST, ""},
        Hostility{"ImmenseErrorText", hex("48530300 00000000 0000000040000000"), false, VI_ERROR_CONN_LOST, ""},
        Hostility{"CutInABlock", hex("48530700 FFFFFF00 0000000000000010") + "half", true, VI_ERROR_CONN_LOST, "half"},
        Hostility{"StalledInABlock", hex("48530700 FFFFFF00 0000000000000010") + "half", false, VI_ERROR_TMO, "half"},
        Hostility{"ClosedWithoutAWord", "", true, VI_ERROR_CONN_LOST, ""},
        Hostility{"FatalError", hex("48530200 00000000 0000000000000004") + "dead", false, VI_ERROR_CONN_LOST, ""},
        Hostility{"Error", hex("48530304 00000000 0000000000000003") + "big", false, VI_ERROR_IO, ""},
        Hostility{"WrongId", hex("48530700 12345678 0000000000000003") + "abc", false, VI_ERROR_TMO, ""},
        Hostility{"EmptyDataOnly",
                  [] {
                      std::string many;
                      for (int i = 0; i < 20000; ++i)
                          many += hex("48530600 FFFFFF00 0000000000000000");
                      return many;
                  }(),
                  false, VI_ERROR_TMO, ""}),
    [](const auto &row) { return std::string(row.param.name); });

TEST(HislipHostile, GoesOnAfterAMessageThatIsNotUnderstood)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.sync.send(hex("48534D00 00000000 0000000000000003") + "???" + hex("4853FF00 00000000 0000000000000003") +
                         "???" + hex("48530700 FFFFFEFE 0000000000000002") + "ok");
        client.sync.expect(hex("48530301 00000000 0000000000000000"));
        client.sync.expect(hex("48530303 00000000 0000000000000000"));
        client.async.expect(hex("48531501 FFFFFEFE 0000000000000000"));
        client.async.send(hex("48534D00 00000000 0000000000000003") + "???" +
                          hex("48531607 00000000 0000000000000000"));
        client.async.expect(hex("48530301 00000000 0000000000000000"));
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "ok");
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(status, 7);
    viClose(session.vi);
}

TEST(HislipHostile, BadHeaderIsToldOnBothConnections)
{
    for (const bool onSync : {true, false}) {
        ScriptedPeer peer([&](ScriptedPeer &self) {
            HislipConnections client = acceptHislip(self);
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000"));
            (onSync ? client.sync : client.async).send(std::string(16, 'x'));
            if (onSync)
                client.async.send(hex("48531600 00000000 0000000000000000"));
            for (test::PeerConnection *connection : {&client.sync, &client.async}) {
                connection->expect(hex("48530201 00000000 0000000000000000"));
                connection->expectClosed();
            }
        });
        VisaSession session;
        ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
        session.set(VI_ATTR_TMO_VALUE, 20000);
        ViUInt16 status = 0;
        EXPECT_EQ(viReadSTB(session.vi, &status), onSync ? VI_SUCCESS : VI_ERROR_CONN_LOST);
        EXPECT_EQ(session.read(), VI_ERROR_CONN_LOST);
        viClose(session.vi);
    }
}

TEST(HislipHostile, TrickleDoesNotStretchTheTimeOut)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.sync.trySend(hex("48530700 FFFFFEFE 0000000000010000"));
        while (client.sync.silentFor(std::chrono::milliseconds(10)) && client.sync.trySend("x")) {
        }
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 200);
    const Stopwatch watch;
    EXPECT_EQ(session.read(65536), VI_ERROR_TMO);
    EXPECT_GE(watch.milliseconds(), 200);
    EXPECT_LT(watch.milliseconds(), 10000);
    viClose(session.vi);
}

TEST(HislipHostile, GarbageOnTheAsynchronousConnectionEndsTheSession)
{
    for (const bool watching : {false, true}) {
        SCOPED_TRACE(watching ? "read by a thread" : "read by the caller");
        ScriptedPeer peer([](ScriptedPeer &self) {
            HislipConnections client = acceptHislip(self);
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000"));
            client.async.send("this is no HiSLIP header, is it?");
            client.sync.expect(hex("48530201 00000000 0000000000000000"));
            client.sync.expectClosed();
        });
        VisaSession session;
        ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
        session.set(VI_ATTR_TMO_VALUE, 20000);
        if (watching) {
            ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
        }
        ViUInt16 status = 0;
        EXPECT_EQ(viReadSTB(session.vi, &status), VI_ERROR_CONN_LOST);
        EXPECT_EQ(session.write("?\n"), VI_ERROR_CONN_LOST);
        viClose(session.vi);
    }
}

TEST(HislipHostile, NonsenseThatAThreadReadsDoesNotMeetWhatTheCallerSends)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        // Messages of the wrong kind, while the caller asks, and at the end something that is no message at all.
        for (int i = 0; i < 200; ++i)
            client.async.trySend(hex("4853FE00 00000000 0000000000000000") + hex("48531642 00000000 0000000000000000"));
        client.async.trySend("this is no HiSLIP header, is it?");
        client.sync.expect(hex("48530201 00000000 0000000000000000"));
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 1000);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
    ViStatus status = VI_SUCCESS;
    for (int i = 0; i < 10000 && status != VI_ERROR_CONN_LOST; ++i) {
        ViUInt16 byte = 0;
        status = viReadSTB(session.vi, &byte);
    }
    EXPECT_EQ(status, VI_ERROR_CONN_LOST);
    viClose(session.vi);
}

TEST(HislipHostile, InstrumentThatDoesNotReadStopsTheWriteAndAClearRecovers)
{
    constexpr std::size_t Size = 64'000'000;
    std::atomic<bool> stuck{true};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self, "0000000010000000");
        client.sync.expect(hex("48530700 FFFFFF00 0000000003D09000"));
        while (stuck)
            std::this_thread::yield();
        // On a busy machine the clear may be asked for while the message is still being finished.
        std::thread asynchronous([&] {
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            client.async.send(hex("48531700 00000000 0000000000000000"));
        });
        client.sync.take(Size);
        asynchronous.join();
        client.sync.expect(hex("48530800 00000000 0000000000000000"));
        client.sync.send(hex("48530900 00000000 0000000000000000"));
        client.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "x");
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 100);
    const std::string block(Size, 'b');
    EXPECT_EQ(session.write(block), VI_ERROR_TMO);
    EXPECT_GT(session.count, 0u);
    EXPECT_LT(session.count, Size);
    EXPECT_EQ(session.write("x"), VI_ERROR_RAW_WR_PROT_VIOL);
    EXPECT_EQ(viAssertTrigger(session.vi, 0), VI_ERROR_RAW_WR_PROT_VIOL);
    session.set(VI_ATTR_TMO_VALUE, 30000);
    stuck = false;
    EXPECT_EQ(viClear(session.vi), VI_SUCCESS);
    EXPECT_EQ(session.write("x"), VI_SUCCESS);
    viClose(session.vi);
}

} // namespace
