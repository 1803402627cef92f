// HiSLIP: what the instrument says, and the exact bytes that the library must have sent, from the tables of IVI-6.1.
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
using test::PeerConnection;
using test::ScriptedPeer;
using test::Stopwatch;
using test::VisaSession;

namespace
{

/// Behind a read that timed out without a byte: does another client hold a lock? Nobody does.
void answerLockInfo(HislipConnections &client)
{
    client.async.expect(hex("48531800 00000000 0000000000000000"));
    client.async.send(hex("48531900 00000000 0000000000000000"));
}

TEST(Hislip, DescribesItself)
{
    converse([](HislipConnections &) {},
             [](VisaSession &session) {
                 EXPECT_EQ(session.get<ViUInt32>(VI_ATTR_TCPIP_HISLIP_VERSION), 0x00100000u);
                 EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_IS_HISLIP), VI_TRUE);
                 EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN), VI_FALSE);
                 EXPECT_EQ(session.get<ViUInt32>(VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB), 1024u);
                 EXPECT_EQ(session.getText(VI_ATTR_TCPIP_DEVICE_NAME), "hislip0");
                 EXPECT_EQ(session.getText(VI_ATTR_RSRC_CLASS), "INSTR");
                 EXPECT_EQ(session.getText(VI_ATTR_TCPIP_ADDR), "127.0.0.1");
             });
}

TEST(Hislip, IsReachedByAnIpv6Address)
{
    ScriptedPeer peer(
        [](ScriptedPeer &self) {
            HislipConnections client = acceptHislip(self);
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "x");
            client.sync.expectClosed();
        },
        true);
    VisaSession session;
    ASSERT_EQ(session.open("TCPIP::[::1]::hislip0," + std::to_string(peer.port()) + "::INSTR", 20000), VI_SUCCESS);
    EXPECT_EQ(session.getText(VI_ATTR_TCPIP_ADDR), "::1");
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_PORT), peer.port());
    EXPECT_EQ(session.write("x"), VI_SUCCESS);
    viClose(session.vi);
}

TEST(Hislip, CountsMessagesByTwoAndReportsDeliveryOnce)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000006") + "*IDN?\n");
            client.sync.send(hex("48530700 FFFFFF00 0000000000000004") + "A,B\n");
            client.sync.expect(hex("48530701 FFFFFF02 0000000000000005") + "*RST\n");
            client.sync.expect(hex("48530700 FFFFFF04 0000000000000005") + "*CLS\n");
            client.sync.expect(hex("48530C00 FFFFFF06 0000000000000000"));
        },
        [](VisaSession &session) {
            EXPECT_EQ(session.write("*IDN?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "A,B\n");
            EXPECT_EQ(session.write("*RST\n"), VI_SUCCESS);
            EXPECT_EQ(session.write("*CLS\n"), VI_SUCCESS);
            EXPECT_EQ(viAssertTrigger(session.vi, 0), VI_SUCCESS);
            EXPECT_EQ(viAssertTrigger(session.vi, 5), VI_ERROR_INV_PROT);
        });
}

TEST(Hislip, LeavesTheEndOutWhereTheUserWantsThat)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530600 FFFFFF00 0000000000000003") + "*ID");
            client.sync.expect(hex("48530700 FFFFFF02 0000000000000003") + "N?\n");
        },
        [](VisaSession &session) {
            session.set(VI_ATTR_SEND_END_EN, VI_FALSE);
            EXPECT_EQ(session.write("*ID"), VI_SUCCESS);
            session.set(VI_ATTR_SEND_END_EN, VI_TRUE);
            EXPECT_EQ(session.write("N?\n"), VI_SUCCESS);
            EXPECT_EQ(session.write(""), VI_SUCCESS);
        });
}

TEST(Hislip, KeepsEachMessageBelowTheInstrumentsSize)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self, "0000000000000014"); // 20 bytes, the header included
        client.sync.expect(hex("48530600 FFFFFF00 0000000000000004") + "0123");
        client.sync.expect(hex("48530600 FFFFFF02 0000000000000004") + "4567");
        client.sync.expect(hex("48530700 FFFFFF04 0000000000000002") + "89");
        // The other direction has a limit of its own.
        client.sync.send(hex("48530700 FFFFFF04 000000000000000A") + "abcdefghij");
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(hislipResource(peer)), VI_SUCCESS);
    EXPECT_EQ(session.write("0123456789"), VI_SUCCESS);
    EXPECT_EQ(session.count, 10u);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "abcdefghij");
    viClose(session.vi);
}

struct ReadEnd {
    const char *name;
    std::uint32_t size;
    bool termCharEnabled;
    bool suppressEnd;
    const char *message; ///< type and payload length of the response
    std::string payload;
    ViStatus expected;
    std::string text;
};

class HislipReadEnd : public testing::TestWithParam<ReadEnd>
{
};

TEST_P(HislipReadEnd, IsDecidedByPriority)
{
    const ReadEnd &row = GetParam();
    converse(
        [&](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "?\n");
            client.sync.send(hex(row.message) + row.payload);
        },
        [&](VisaSession &session) {
            session.set(VI_ATTR_TERMCHAR_EN, row.termCharEnabled ? VI_TRUE : VI_FALSE);
            session.set(VI_ATTR_SUPPRESS_END_EN, row.suppressEnd ? VI_TRUE : VI_FALSE);
            ASSERT_EQ(session.write("?\n"), VI_SUCCESS);
            if (row.expected == VI_ERROR_TMO)
                session.set(VI_ATTR_TMO_VALUE, 100);
            EXPECT_EQ(session.read(row.size), row.expected);
            EXPECT_EQ(session.text, row.text);
        });
}

INSTANTIATE_TEST_SUITE_P(
    All, HislipReadEnd,
    testing::Values(
        ReadEnd{"EndWins", 4, true, false, "48530700 FFFFFF00 0000000000000004", "abc\n", VI_SUCCESS, "abc\n"},
        ReadEnd{"TermCharWinsOverCount", 4, true, true, "48530700 FFFFFF00 0000000000000004", "abc\n",
                VI_SUCCESS_TERM_CHAR, "abc\n"},
        ReadEnd{"CountAlone", 4, false, true, "48530700 FFFFFF00 0000000000000004", "abc\n", VI_SUCCESS_MAX_CNT,
                "abc\n"},
        ReadEnd{"CountBeforeEnd", 2, false, false, "48530700 FFFFFF00 0000000000000004", "abc\n", VI_SUCCESS_MAX_CNT,
                "ab"},
        ReadEnd{"TermCharInTheMiddle", 9, true, false, "48530700 FFFFFF00 0000000000000004", "a\nc\n",
                VI_SUCCESS_TERM_CHAR, "a\n"},
        ReadEnd{"TermCharIgnoredWhenOff", 9, false, false, "48530700 FFFFFF00 0000000000000004", "a\nc\n", VI_SUCCESS,
                "a\nc\n"},
        ReadEnd{"SuppressedEndGoesOn", 9, false, true, "48530700 FFFFFF00 0000000000000004", "abc\n", VI_ERROR_TMO,
                "abc\n"},
        ReadEnd{"EmptyEnd", 9, false, false, "48530700 FFFFFF00 0000000000000000", "", VI_SUCCESS, ""},
        ReadEnd{"DataWithoutEnd", 9, false, false, "48530600 FFFFFF00 0000000000000004", "abcd", VI_ERROR_TMO, "abcd"},
        ReadEnd{"UnknownIdIsOurs", 4, false, false, "48530600 FFFFFFFF 0000000000000004", "abcd", VI_SUCCESS_MAX_CNT,
                "abcd"}),
    [](const auto &row) { return std::string(row.param.name); });

TEST(Hislip, ReadsAMessageInPieces)
{
    converse(
        [](HislipConnections &client) {
            client.sync.send(hex("48530600 FFFFFEFE 0000000000000004") + "abcd" +
                             hex("48530700 FFFFFEFE 0000000000000003") + "efg");
        },
        [](VisaSession &session) {
            EXPECT_EQ(session.read(3), VI_SUCCESS_MAX_CNT);
            EXPECT_EQ(session.text, "abc");
            EXPECT_EQ(session.read(3), VI_SUCCESS_MAX_CNT);
            EXPECT_EQ(session.text, "def");
            EXPECT_EQ(session.read(3), VI_SUCCESS);
            EXPECT_EQ(session.text, "g");
        });
}

TEST(Hislip, NeverReturnsTheAnswerToAnEarlierQuestion)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000003") + "1?\n");
            answerLockInfo(client);
            client.sync.expect(hex("48530700 FFFFFF02 0000000000000003") + "2?\n");
            client.sync.send(hex("48530600 FFFFFF00 0000000000000003") + "one" +
                             hex("48530600 FFFFFFFF 0000000000000003") + "one" +
                             hex("48530700 FFFFFF00 0000000000000004") + "one\n" +
                             hex("48530700 FFFFFF02 0000000000000004") + "two\n");
        },
        [](VisaSession &session) {
            ASSERT_EQ(session.write("1?\n"), VI_SUCCESS);
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(session.read(), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            ASSERT_EQ(session.write("2?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "two\n");
        });
}

TEST(Hislip, DropsTheUnreadRestOfAnAnswerWhenSomethingNewIsAsked)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000003") + "1?\n");
            client.sync.send(hex("48530700 FFFFFF00 0000000000000008") + "12345678");
            client.sync.expect(hex("48530700 FFFFFF02 0000000000000003") + "2?\n");
            client.sync.send(hex("48530700 FFFFFF02 0000000000000002") + "ok");
        },
        [](VisaSession &session) {
            ASSERT_EQ(session.write("1?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(2), VI_SUCCESS_MAX_CNT);
            ASSERT_EQ(session.write("2?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "ok");
        });
}

TEST(Hislip, InterruptedFirstWaitsForItsCounterpartBeforeSending)
{
    std::atomic<bool> read{false};
    converse(
        [&](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000003") + "1?\n");
            client.sync.send(hex("48530600 FFFFFF00 0000000000000003") + "one" +
                             hex("48530D00 FFFFFF00 0000000000000000"));
            answerLockInfo(client);
            while (!read)
                std::this_thread::yield();
            EXPECT_TRUE(client.sync.silentFor(std::chrono::milliseconds(100)));
            client.async.send(hex("48530E00 FFFFFF00 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF02 0000000000000003") + "2?\n");
            client.sync.send(hex("48530700 FFFFFF02 0000000000000003") + "two");
        },
        [&](VisaSession &session) {
            ASSERT_EQ(session.write("1?\n"), VI_SUCCESS);
            session.set(VI_ATTR_TMO_VALUE, 100);
            EXPECT_EQ(session.read(), VI_ERROR_TMO);
            EXPECT_EQ(session.text, ""); // the piece that had come is no answer any more
            session.set(VI_ATTR_TMO_VALUE, 20000);
            read = true;
            ASSERT_EQ(session.write("2?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "two");
        });
}

TEST(Hislip, AsyncInterruptedFirstDiscardsUntilItsCounterpart)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000003") + "1?\n");
            client.async.expect(hex("48531500 FFFFFF00 0000000000000000"));
            client.async.send(hex("48530E00 FFFFFF00 0000000000000000") + hex("48531610 00000000 0000000000000000"));
            client.sync.send(hex("48530700 FFFFFF00 0000000000000005") + "stale" +
                             hex("48530D00 FFFFFF00 0000000000000000") + hex("48530700 FFFFFF00 0000000000000005") +
                             "fresh");
        },
        [](VisaSession &session) {
            ASSERT_EQ(session.write("1?\n"), VI_SUCCESS);
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 0x10);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "fresh");
        });
}

TEST(Hislip, InterruptedFirstLeavesTheAnswerBehindItAlone)
{
    std::atomic<bool> read{false};
    converse(
        [&](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000003") + "1?\n");
            client.sync.send(hex("48530D00 FFFFFF00 0000000000000000"));
            answerLockInfo(client);
            while (!read)
                std::this_thread::yield();
            client.async.expect(hex("48531500 FFFFFF00 0000000000000000"));
            client.async.send(hex("48530E00 FFFFFF00 0000000000000000") + hex("48531610 00000000 0000000000000000"));
            client.sync.send(hex("48530700 FFFFFF00 0000000000000005") + "fresh");
        },
        [&](VisaSession &session) {
            ASSERT_EQ(session.write("1?\n"), VI_SUCCESS);
            session.set(VI_ATTR_TMO_VALUE, 100);
            EXPECT_EQ(session.read(), VI_ERROR_TMO); // takes the one half
            session.set(VI_ATTR_TMO_VALUE, 20000);
            read = true;
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS); // and the other one on its way
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "fresh");
        });
}

TEST(Hislip, AsksForTheStatusByte)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000")); // nothing was sent yet
            client.async.send(hex("48531641 00000000 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "?\n");
            client.sync.send(hex("48530700 FFFFFF00 0000000000000002") + "1\n");
            client.async.expect(hex("48531501 FFFFFF00 0000000000000000")); // delivered
            client.async.send(hex("485316FF 00000000 0000000000000000"));
            client.async.expect(hex("48531500 FFFFFF00 0000000000000000")); // and that was said already
            client.async.send(hex("48531600 00000000 0000000000000000"));
        },
        [](VisaSession &session) {
            ViUInt16 status = 0xEEEE;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 0x0041);
            session.write("?\n");
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 0x00FF);
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 0x0000);
        });
}

TEST(Hislip, LateStatusIsNotTakenForTheNextOne)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000"));
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000"));
            client.async.send(hex("48531601 00000000 0000000000000000") + hex("48531602 00000000 0000000000000000"));
        },
        [](VisaSession &session) {
            ViUInt16 status = 0;
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 2);
        });
}

TEST(Hislip, StatusQueriesRecoverFromAnAnswerThatNeverCame)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000"));
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000"));
            client.async.send(hex("48531602 00000000 0000000000000000"));
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000"));
            client.async.send(hex("48531603 00000000 0000000000000000"));
        },
        [](VisaSession &session) {
            ViUInt16 status = 0;
            session.set(VI_ATTR_TMO_VALUE, 50);
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_ERROR_TMO);
            session.set(VI_ATTR_TMO_VALUE, 500);
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 2);
            session.set(VI_ATTR_TMO_VALUE, 20000);
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 3);
        });
}

TEST(Hislip, ControlsRemoteInAllSevenModes)
{
    converse(
        [](HislipConnections &client) {
            for (const char *mode : {"00", "01", "02", "03", "04", "05", "06"}) {
                client.async.expect(hex("48530A") + hex(mode) + hex("FFFFFEFE 0000000000000000"));
                client.async.send(hex("48530B00 00000000 0000000000000000"));
            }
        },
        [](VisaSession &session) {
            for (ViUInt16 mode = 0; mode <= 6; ++mode)
                EXPECT_EQ(viGpibControlREN(session.vi, mode), VI_SUCCESS);
            EXPECT_EQ(viGpibControlREN(session.vi, 7), VI_ERROR_INV_MODE);
            EXPECT_EQ(viGpibControlATN(session.vi, 0), VI_ERROR_NSUP_OPER);
        });
}

TEST(Hislip, ClearsAndCountsAnew)
{
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "?\n");
            client.sync.send(hex("48530700 FFFFFF00 0000000000000005") + "stale");
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530800 00000000 0000000000000000"));
            client.sync.send(hex("48530600 FFFFFF00 0000000000000003") + "old" +
                             hex("48530900 00000000 0000000000000000"));
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "?\n");
            client.sync.send(hex("48530700 FFFFFF00 0000000000000003") + "new");
        },
        [](VisaSession &session) {
            ASSERT_EQ(session.write("?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(2), VI_SUCCESS_MAX_CNT);
            EXPECT_EQ(viClear(session.vi), VI_SUCCESS);
            ASSERT_EQ(session.write("?\n"), VI_SUCCESS);
            EXPECT_EQ(session.read(), VI_SUCCESS);
            EXPECT_EQ(session.text, "new");
        });
}

TEST(Hislip, KeepsAnswersInOverlappedMode)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client =
            acceptHislip(self, "0000000000100000", "48530101 01001234 0000000000000000"); // prefers overlap
        client.sync.expect(hex("48530700 FFFFFF00 0000000000000003") + "1?\n");
        client.sync.expect(hex("48530700 FFFFFF02 0000000000000003") + "2?\n");
        client.sync.send(hex("48530700 FFFFFF00 0000000000000003") + "one" + hex("48530700 FFFFFF02 0000000000000003") +
                         "two");
        client.async.expect(hex("48531501 FFFFFF02 0000000000000000")); // the last one received
        client.async.send(hex("48531600 00000000 0000000000000000"));
        client.async.expect(hex("48531300 00000000 0000000000000000"));
        client.async.send(hex("48531701 00000000 0000000000000000"));
        client.sync.expect(hex("48530800 00000000 0000000000000000")); // asks for synchronized mode
        client.sync.send(hex("48530900 00000000 0000000000000000"));
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(hislipResource(peer), 20000), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN), VI_TRUE);
    ASSERT_EQ(session.write("1?\n"), VI_SUCCESS);
    ASSERT_EQ(session.write("2?\n"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "one");
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "two");
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN), VI_FALSE);
    viClose(session.vi);
}

TEST(Hislip, StaysInTheModeThatTheInstrumentInsistsOn)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48531300 00000000 0000000000000000"));
            client.async.send(hex("48531700 00000000 0000000000000000"));
            client.sync.expect(hex("48530801 00000000 0000000000000000")); // asks for overlap
            client.sync.send(hex("48530900 00000000 0000000000000000"));   // and does not get it
        },
        [](VisaSession &session) {
            EXPECT_EQ(session.set(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, VI_TRUE), VI_ERROR_NSUP_ATTR_STATE);
            EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN), VI_FALSE);
        });
}

TEST(Hislip, AgreesOnANewMessageSize)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48530F00 00000000 0000000000000008 0000000000004000"));
            client.async.send(hex("48531000 00000000 0000000000000008 0000000000000012"));
            client.sync.expect(hex("48530600 FFFFFF00 0000000000000002") + "ab" +
                               hex("48530700 FFFFFF02 0000000000000001") + "c");
        },
        [](VisaSession &session) {
            EXPECT_EQ(session.set(VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB, 16), VI_SUCCESS);
            EXPECT_EQ(session.get<ViUInt32>(VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB), 16u);
            EXPECT_EQ(session.write("abc"), VI_SUCCESS);
        });
}

// ---- Service requests -----------------------------------------------------------------------------------------------

TEST(Hislip, QueuesServiceRequestsAlsoInTheMiddleOfATransaction)
{
    converse(
        [](HislipConnections &client) {
            client.async.expect(hex("48531500 FFFFFEFE 0000000000000000"));
            client.async.send(hex("48531442 00000000 0000000000000000") + hex("48531642 00000000 0000000000000000"));
            client.async.expect(hex("48530A01 FFFFFEFE 0000000000000000"));
            client.async.send(hex("48531444 00000000 0000000000000000") + hex("48530B00 00000000 0000000000000000"));
        },
        [](VisaSession &session) {
            ViEventType type = 0;
            ViEvent context = 0;
            EXPECT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 0, nullptr, nullptr), VI_ERROR_NENABLED);
            ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
            EXPECT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS_EVENT_EN);
            EXPECT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 0, &type, &context), VI_ERROR_TMO);
            EXPECT_EQ(session.set(VI_ATTR_MAX_QUEUE_LENGTH, 10), VI_ERROR_ATTR_READONLY);
            ViUInt16 status = 0;
            EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
            EXPECT_EQ(status, 0x42);
            EXPECT_EQ(viGpibControlREN(session.vi, 1), VI_SUCCESS);
            EXPECT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 20000, &type, &context), VI_SUCCESS_QUEUE_NEMPTY);
            EXPECT_EQ(type, VI_EVENT_SERVICE_REQ);
            ViEventType told = 0;
            EXPECT_EQ(viGetAttribute(context, VI_ATTR_EVENT_TYPE, &told), VI_SUCCESS);
            EXPECT_EQ(told, VI_EVENT_SERVICE_REQ);
            EXPECT_EQ(viClose(context), VI_SUCCESS);
            EXPECT_EQ(viClose(context), VI_ERROR_INV_OBJECT);
            EXPECT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 20000, nullptr, nullptr), VI_SUCCESS);
        });
}

struct HandlerLog {
    std::atomic<int> calls{0};
    ViUInt16 status = 0;
    bool close = false;
};

ViStatus onServiceRequest(ViSession vi, ViEventType type, ViEvent context, ViAddr user)
{
    auto &log = *static_cast<HandlerLog *>(user);
    ViEventType told = 0;
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_EVENT_TYPE, &told), VI_SUCCESS);
    EXPECT_EQ(told, type);
    if (log.close) {
        EXPECT_EQ(viClose(vi), VI_SUCCESS);
    } else {
        EXPECT_EQ(viReadSTB(vi, &log.status), VI_SUCCESS);
    }
    ++log.calls;
    return VI_SUCCESS;
}

void awaitCalls(const HandlerLog &log, int calls)
{
    const Stopwatch watch;
    while (log.calls < calls && watch.milliseconds() < 20000)
        std::this_thread::yield();
    EXPECT_EQ(log.calls, calls);
}

TEST(Hislip, HandlerMayAskForTheStatusByte)
{
    HandlerLog log;
    converse(
        [](HislipConnections &client) {
            client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "go");
            client.async.send(hex("48531442 00000000 0000000000000000"));
            client.async.expect(hex("48531500 FFFFFF00 0000000000000000"));
            client.async.send(hex("48531642 00000000 0000000000000000"));
        },
        [&](VisaSession &session) {
            EXPECT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_HNDLR, 0), VI_ERROR_HNDLR_NINSTALLED);
            ASSERT_EQ(viInstallHandler(session.vi, VI_EVENT_SERVICE_REQ, onServiceRequest, &log), VI_SUCCESS);
            ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_HNDLR, 0), VI_SUCCESS);
            session.write("go");
            awaitCalls(log, 1);
            EXPECT_EQ(log.status, 0x42);
            EXPECT_EQ(viUninstallHandler(session.vi, VI_EVENT_SERVICE_REQ, onServiceRequest, &log), VI_SUCCESS);
        });
}

TEST(Hislip, HandlerMayCloseItsSession)
{
    HandlerLog log;
    log.close = true;
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "go");
        client.async.send(hex("48531442 00000000 0000000000000000"));
        client.async.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(hislipResource(peer)), VI_SUCCESS);
    ASSERT_EQ(viInstallHandler(session.vi, VI_EVENT_SERVICE_REQ, onServiceRequest, &log), VI_SUCCESS);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_HNDLR, 0), VI_SUCCESS);
    session.write("go");
    awaitCalls(log, 1);
    EXPECT_EQ(viClose(session.vi), VI_ERROR_INV_OBJECT);
}

ViStatus onException(ViSession, ViEventType, ViEvent context, ViAddr user)
{
    auto &log = *static_cast<HandlerLog *>(user);
    ViStatus status = 0;
    std::array<char, 256> operation{};
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_STATUS, &status), VI_SUCCESS);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_OPER_NAME, operation.data()), VI_SUCCESS);
    EXPECT_EQ(status, VI_ERROR_INV_MODE);
    EXPECT_STREQ(operation.data(), "viGpibControlREN");
    ++log.calls;
    return VI_SUCCESS;
}

TEST(Hislip, ExceptionHandlerRunsInTheCallThatFailed)
{
    HandlerLog log;
    converse([](HislipConnections &) {},
             [&](VisaSession &session) {
                 ASSERT_EQ(viInstallHandler(session.vi, VI_EVENT_EXCEPTION, onException, &log), VI_SUCCESS);
                 EXPECT_EQ(viEnableEvent(session.vi, VI_EVENT_EXCEPTION, VI_QUEUE, 0), VI_ERROR_NSUP_MECH);
                 ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_EXCEPTION, VI_HNDLR, 0), VI_SUCCESS);
                 EXPECT_EQ(viGpibControlREN(session.vi, 9), VI_ERROR_INV_MODE);
                 EXPECT_EQ(log.calls, 1);
             });
}

// ---- Refusals while opening -----------------------------------------------------------------------------------------

struct Refusal {
    const char *name;
    std::string answer;
    ViStatus expected;
};

class HislipRefusal : public testing::TestWithParam<Refusal>
{
};

TEST_P(HislipRefusal, EndsTheOpenPromptly)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        test::PeerConnection sync = self.accept();
        sync.expect(hex("48530000 01005A5A 0000000000000007") + "hislip0");
        sync.send(GetParam().answer);
        if (GetParam().answer.empty())
            sync.close();
        else
            sync.expectClosed();
    });
    VisaSession session;
    const Stopwatch watch;
    EXPECT_EQ(session.open(hislipResource(peer), 30000), GetParam().expected);
    EXPECT_LT(watch.milliseconds(), 10000);
    EXPECT_EQ(session.vi, VI_NULL);
}

INSTANTIATE_TEST_SUITE_P(
    All, HislipRefusal,
    testing::Values(Refusal{"FatalError", hex("48530203 00000000 000000000000000B") + "no such one",
                            VI_ERROR_RSRC_NFOUND},
                    Refusal{"TooManyClients", hex("48530204 00000000 0000000000000000"), VI_ERROR_RSRC_BUSY},
                    Refusal{"NeedsSecureConnection", hex("48530205 00000000 0000000000000000"), VI_ERROR_INV_PROT},
                    Refusal{"EncryptionMandatory", hex("48530102 02001234 0000000000000000"), VI_ERROR_INV_PROT},
                    Refusal{"InitialEncryption", hex("48530104 02001234 0000000000000000"), VI_ERROR_INV_PROT},
                    Refusal{"Error", hex("48530301 00000000 0000000000000000"), VI_ERROR_RSRC_NFOUND},
                    Refusal{"Closed", "", VI_ERROR_RSRC_NFOUND}),
    [](const auto &row) { return std::string(row.param.name); });

/// The answer to the introduction of the second connection instead.
class HislipLateRefusal : public testing::TestWithParam<Refusal>
{
};

TEST_P(HislipLateRefusal, EndsTheOpenPromptly)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        test::PeerConnection sync = self.accept();
        sync.expect(hex("48530000 01005A5A 0000000000000007") + "hislip0");
        sync.send(hex("48530100 01001234 0000000000000000"));
        test::PeerConnection async = self.accept();
        async.expect(hex("48531100 00001234 0000000000000000"));
        async.send(GetParam().answer);
        async.takeUntilClosed(24); // it may already be asking for the largest message
        async.expectClosed();
        sync.expectClosed();
    });
    VisaSession session;
    const Stopwatch watch;
    EXPECT_EQ(session.open(hislipResource(peer), 30000), GetParam().expected);
    EXPECT_LT(watch.milliseconds(), 10000);
    EXPECT_EQ(session.vi, VI_NULL);
}

INSTANTIATE_TEST_SUITE_P(
    All, HislipLateRefusal,
    testing::Values(Refusal{"FatalError", hex("48530203 00000000 0000000000000000"), VI_ERROR_RSRC_NFOUND},
                    Refusal{"TooManyClients", hex("48530204 00000000 0000000000000000"), VI_ERROR_RSRC_BUSY},
                    Refusal{"NeedsSecureConnection", hex("48530205 00000000 0000000000000000"), VI_ERROR_INV_PROT},
                    Refusal{"TooManyClientsBehindTheAnswer",
                            hex("48531200 00005858 0000000000000000") + hex("48530204 00000000 0000000000000000"),
                            VI_ERROR_RSRC_BUSY}),
    [](const auto &row) { return std::string(row.param.name); });

TEST(Hislip, SomethingElseAnswersOnThePort)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        test::PeerConnection client = self.accept();
        client.take(23);
        client.send("SSH-2.0-Something\r\n");
        client.expect(hex("48530201 00000000 0000000000000000")); // "bad header"
    });
    VisaSession session;
    EXPECT_EQ(session.open(hislipResource(peer), 30000), VI_ERROR_RSRC_NFOUND);
}

TEST(Hislip, SilenceWhileOpeningEndsWithTheTimeOut)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        test::PeerConnection client = self.accept();
        client.take(23);
        client.expectClosed();
    });
    VisaSession session;
    const Stopwatch watch;
    EXPECT_EQ(session.open(hislipResource(peer), 100), VI_ERROR_TMO);
    EXPECT_GE(watch.milliseconds(), 100);
    EXPECT_LT(watch.milliseconds(), 10000);
}

TEST(Hislip, OpenTimeOutOfZeroMeansTwoSeconds)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        test::PeerConnection client = self.accept();
        client.take(23);
        client.expectClosed();
    });
    VisaSession session;
    const Stopwatch watch;
    EXPECT_EQ(session.open(hislipResource(peer), 0), VI_ERROR_TMO);
    EXPECT_GE(watch.milliseconds(), 2000);
    EXPECT_LT(watch.milliseconds(), 15000);
}

TEST(Hislip, ClosingTheResourceManagerEndsAnOpenThatHangs)
{
    std::atomic<bool> hanging{false};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        test::PeerConnection client = self.accept();
        client.take(23);
        hanging = true;
        client.expectClosed();
    });
    VisaSession session;
    std::thread opener([&] { EXPECT_EQ(session.open(hislipResource(peer), VI_TMO_INFINITE), VI_ERROR_INV_OBJECT); });
    while (!hanging)
        std::this_thread::yield();
    EXPECT_EQ(viClose(session.rm), VI_SUCCESS);
    opener.join();
}

} // namespace
