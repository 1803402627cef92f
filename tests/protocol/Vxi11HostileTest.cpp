// VXI-11 instruments that break the rules: the call ends with a status within its time, and nothing else notices.
#include "support/Vxi11Instrument.h"

#include "support/Stopwatch.h"

#include <atomic>
#include <gtest/gtest.h>
#include <ostream>
#include <thread>

using test::hex;
using test::RpcServed;
using test::ScriptedPeer;
using test::Stopwatch;
using test::takeWrite;
using test::VisaSession;
using test::Vxi11Instrument;
using test::Vxi11Peer;

namespace
{

constexpr const char *NoAbort = "00000000 00000007 00000000 00100000";
constexpr long Patience = 15000; // milliseconds

const std::string TransactionId = "<id>"; // four bytes, as the real one

struct Hostility {
    const char *name;
    std::string answer; ///< instead of a reply; `TransactionId` stands for the call's own
    ViStatus expected;
    std::string text; ///< what the read still delivers
};

/// Keeps addresses and bytes out of the names of the tests.
void PrintTo(const Hostility &row, std::ostream *out)
{
    *out << row.name;
}

class Vxi11Hostility : public testing::TestWithParam<Hostility>
{
};

TEST_P(Vxi11Hostility, ReadEndsWithAStatusAndAnotherSessionGoesOn)
{
    const Hostility &row = GetParam();
    std::atomic<bool> done{false};
    Vxi11Instrument good([&](RpcServed &core, Vxi11Peer &) {
        takeWrite(core);
        Vxi11Peer::endLink(core);
    });
    Vxi11Instrument bad(
        [&](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            std::string answer = row.answer;
            for (std::size_t at = 0; (at = answer.find(TransactionId, at)) != answer.npos; at += core.xid.size())
                answer.replace(at, TransactionId.size(), core.xid);
            core.connection.trySend(answer);
            while (!done)
                std::this_thread::yield();
        },
        NoAbort, 100);
    const Stopwatch watch;
    EXPECT_EQ(bad.session.read(16), row.expected);
    EXPECT_EQ(bad.session.text, row.text);
    EXPECT_LT(watch.milliseconds(), Patience);
    EXPECT_EQ(good.session.write("?"), VI_SUCCESS);
    done = true;
}

const std::string Accepted = hex("00000001 00000000 00000000 00000000 00000000");

INSTANTIATE_TEST_SUITE_P(
    All, Vxi11Hostility,
    testing::Values(
        Hostility{"Nothing", "", VI_ERROR_TMO, ""}, Hostility{"HalfAMark", hex("8000"), VI_ERROR_TMO, ""},
        Hostility{"Text", "HTTP/1.1 400 Bad Request\r\nServer: nobody at home\r\n\r\n", VI_ERROR_CONN_LOST, ""},
        Hostility{"EmptyRecord", hex("80000000"), VI_ERROR_CONN_LOST, ""},
        Hostility{"RecordShorterThanAHeader", hex("80000008") + TransactionId + hex("00000001"), VI_ERROR_CONN_LOST,
                  ""},
        Hostility{"ResultsMissing", hex("80000018") + TransactionId + Accepted, VI_ERROR_CONN_LOST, ""},
        Hostility{"DataShorterThanItsLength",
                  hex("80000026") + TransactionId + Accepted + hex("00000000 00000004 00000008") + "ab",
                  VI_ERROR_CONN_LOST, "ab"},
        Hostility{"ACallInsteadOfAReply",
                  hex("80000028") + TransactionId + hex("00000000 00000002 000607AF 00000001 0000000C") +
                      std::string(16, '\0'),
                  VI_ERROR_CONN_LOST, ""},
        Hostility{"NeitherAcceptedNorDenied",
                  hex("80000018") + TransactionId + hex("00000001 00000002") + std::string(12, '\0'),
                  VI_ERROR_CONN_LOST, ""},
        Hostility{"LongVerifier", hex("80000400") + TransactionId + hex("00000001 00000000 00000000 7FFFFFFF"),
                  VI_ERROR_CONN_LOST, ""},
        Hostility{"MoreThanWasAskedFor",
                  hex("80000038") + TransactionId + Accepted + hex("00000000 00000004 00000011") + std::string(20, 'x'),
                  VI_ERROR_CONN_LOST, ""},
        Hostility{"LengthNear4GiB",
                  hex("FFFFFFFF") + TransactionId + Accepted + hex("00000000 00000004 FFFFFFFF") +
                      std::string(100, 'x'),
                  VI_ERROR_CONN_LOST, ""},
        Hostility{"RecordOf2GiBThatNeverComes",
                  hex("FFFFFFFF") + TransactionId + Accepted + hex("00000000 00000004 00000003") + "abc", VI_SUCCESS,
                  "abc"},
        Hostility{"OtherTransaction", hex("80000028") + "none" + Accepted + hex("00000000 00000004 00000003") + "bad?",
                  VI_ERROR_TMO, ""},
        Hostility{"EmptyFragmentsWithoutEnd", std::string(4000, '\0'), VI_ERROR_CONN_LOST, ""},
        Hostility{"AuthenticationAsked", hex("80000014") + TransactionId + hex("00000001 00000001 00000001 00000001"),
                  VI_ERROR_IO, ""},
        Hostility{"OtherRpcVersion",
                  hex("80000018") + TransactionId + hex("00000001 00000001 00000000 00000003 00000003"), VI_ERROR_IO,
                  ""},
        Hostility{"NoSuchProgram",
                  hex("80000018") + TransactionId + hex("00000001 00000000 00000000 00000000 00000001"),
                  VI_ERROR_NSUP_OPER, ""},
        Hostility{"NoSuchProcedure",
                  hex("80000018") + TransactionId + hex("00000001 00000000 00000000 00000000 00000003"),
                  VI_ERROR_NSUP_OPER, ""},
        Hostility{"GarbageArguments",
                  hex("80000018") + TransactionId + hex("00000001 00000000 00000000 00000000 00000004"), VI_ERROR_IO,
                  ""}),
    [](const auto &row) { return std::string(row.param.name); });

} // namespace

TEST(Vxi11Hostile, AnAnswerCutAtAnyByteIsALostConnection)
{
    // 24 bytes of header, 12 of the read's head, four of data: with the mark 44.
    for (std::size_t bytes = 0; bytes < 44; ++bytes) {
        Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            const std::string reply = core.record("00000000 00000004 00000004", "abcd");
            ASSERT_EQ(reply.size(), 44u);
            core.connection.send(reply.substr(0, bytes));
            core.connection.close();
        });
        EXPECT_EQ(instrument.session.read(16), VI_ERROR_CONN_LOST) << bytes;
        EXPECT_EQ(instrument.session.text, std::string("abcd").substr(0, bytes < 40 ? 0 : bytes - 40)) << bytes;
        EXPECT_EQ(instrument.session.write("?"), VI_ERROR_CONN_LOST) << bytes;
    }
}

TEST(Vxi11Hostile, ACutWhileOpeningIsAResourceThatIsNotThere)
{
    for (std::size_t bytes = 0; bytes < 44; ++bytes) {
        ScriptedPeer peer([&](ScriptedPeer &scripted) {
            Vxi11Peer vxi11(scripted);
            vxi11.answerPort();
            RpcServed core = vxi11.accept();
            core.takeCall();
            const std::string reply = core.record(NoAbort);
            ASSERT_EQ(reply.size(), 44u);
            core.connection.send(reply.substr(0, bytes));
        });
        test::usePortmapper(peer.port());
        VisaSession session;
        EXPECT_EQ(session.open("TCPIP::127.0.0.1::inst0::INSTR", 20000), VI_ERROR_RSRC_NFOUND) << bytes;
    }
}

TEST(Vxi11Hostile, TrickleDoesNotStretchTheTimeOut)
{
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            // A record of 1 MiB of data, byte by byte.
            bool taken =
                core.connection.trySend(hex("80100024") + core.xid + Accepted + hex("00000000 00000004 00100000"));
            while (taken) {
                taken = core.connection.trySend("x");
                std::this_thread::sleep_for(std::chrono::milliseconds(2));
            }
        },
        NoAbort, 100);
    const Stopwatch watch;
    EXPECT_EQ(instrument.session.read(1 << 20), VI_ERROR_TMO);
    EXPECT_LT(watch.milliseconds(), Patience);
    EXPECT_GT(instrument.session.count, 0u);
}

TEST(Vxi11Hostile, RepliesToOthersWithoutEndDoNotStretchTheTimeOut)
{
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            core.xid = "none";
            while (core.connection.trySend(core.record("00000000 00000004 00000003", "bad")))
                ;
        },
        NoAbort, 100);
    const Stopwatch watch;
    EXPECT_EQ(instrument.session.read(), VI_ERROR_TMO);
    EXPECT_EQ(instrument.session.write("?"), VI_ERROR_TMO);
    EXPECT_LT(watch.milliseconds(), Patience);
}

TEST(Vxi11Hostile, ARecordWithoutEndDoesNotStretchTheTimeOut)
{
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            std::string record = core.record("00000000 00000004 00000003", "abc");
            record[0] = '\0'; // not the last fragment
            core.connection.send(record);
            while (core.connection.trySend(hex("00000004") + "more"))
                ;
        },
        NoAbort, 100);
    const Stopwatch watch;
    EXPECT_EQ(instrument.session.read(), VI_SUCCESS);
    EXPECT_EQ(instrument.session.text, "abc");
    EXPECT_EQ(instrument.session.read(), VI_ERROR_TMO) << "the next reply is behind what never ends";
    EXPECT_LT(watch.milliseconds(), Patience);
}
