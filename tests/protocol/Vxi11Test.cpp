// VXI-11, byte by byte, against scripted instruments: opening, transfers, attributes, the calls without data.
#include "support/SocketOptions.h"
#include "support/Vxi11Instrument.h"

#include <gtest/gtest.h>

using test::hex;
using test::RpcServed;
using test::ScriptedPeer;
using test::TakenWrite;
using test::takeWrite;
using test::VisaSession;
using test::Vxi11Instrument;
using test::Vxi11Peer;
using test::withoutTime;

namespace
{

constexpr std::size_t MiB = 1024 * 1024;

std::string link7(const char *largestWrite)
{
    return std::string("00000000 00000007 00000000 ") + largestWrite;
}

/// Serves one device_read of link 7: size and flags asked for, the result.
void serveRead(RpcServed &core, const std::string &size, const std::string &flagsAndChar, const std::string &result,
               const std::string &data = {})
{
    EXPECT_EQ(withoutTime(core.takeCall(), 2),
              "000607AF 00000001 0000000C | 00000007 " + size + " ........ 00000000 " + flagsAndChar);
    core.reply(result, data);
}

constexpr const char *NoTermChar = "00000000 00000000";

/// Waits for a device_write of one byte.
void expectQuestion(RpcServed &core)
{
    EXPECT_EQ(takeWrite(core).size, 1u);
}

} // namespace

TEST(Vxi11, OpensWritesReadsAndDestroysItsLink)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) {
        EXPECT_EQ(withoutTime(core.takeCall(), 1),
                  "000607AF 00000001 0000000B | 00000007 ........ 00000000 00000008 00000006 2A49444E 3F0A0000");
        core.reply("00000000 00000006");
        EXPECT_EQ(withoutTime(core.takeCall(), 2),
                  "000607AF 00000001 0000000C | 00000007 00000400 ........ 00000000 00000000 00000000");
        core.reply("00000000 00000004 00000005", "Oak,1");
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    EXPECT_EQ(session.write("*IDN?\n"), VI_SUCCESS);
    EXPECT_EQ(session.count, 6u);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "Oak,1");
    EXPECT_EQ(session.getText(VI_ATTR_RSRC_NAME), "TCPIP0::127.0.0.1::inst0::INSTR");
    EXPECT_EQ(session.getText(VI_ATTR_TCPIP_ADDR), "127.0.0.1");
    EXPECT_EQ(session.getText(VI_ATTR_TCPIP_DEVICE_NAME), "inst0");
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_IS_HISLIP), VI_FALSE);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_INTF_TYPE), VI_INTF_TCPIP);
}

class Vxi11Links : public testing::TestWithParam<const char *>
{
};

// 5. Instruments choose their link ids as they like, and each one must be given back.
TEST_P(Vxi11Links, AnyLinkIdIsUsedAndDestroyed)
{
    const std::string link = GetParam();
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            EXPECT_EQ(withoutTime(core.takeCall(), 3),
                      "000607AF 00000001 0000000F | " + link + " 00000000 00000000 ........");
            core.reply("00000000");
            Vxi11Peer::endLink(core, link);
        },
        "00000000 " + link + " 00000000 00000400");
    EXPECT_EQ(viClear(instrument.session.vi), VI_SUCCESS);
}

INSTANTIATE_TEST_SUITE_P(All, Vxi11Links, testing::Values("00000000", "00000001", "7FFFFFFF", "80000000", "FFFFFFFF"));

// 11. No piece is longer than the instrument takes, and only the last one carries END.
TEST(Vxi11, SplitsAWriteAtWhatTheInstrumentTakesAndEndsOnlyTheLastPiece)
{
    std::vector<TakenWrite> pieces;
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            for (int i = 0; i < 3 + 2; ++i)
                pieces.push_back(takeWrite(core));
            Vxi11Peer::endLink(core);
        },
        link7("00000400"));
    EXPECT_EQ(instrument.session.write(std::string(2500, 'x')), VI_SUCCESS);
    EXPECT_EQ(instrument.session.count, 2500u);
    EXPECT_EQ(instrument.session.write(std::string(2048, 'y')), VI_SUCCESS);
    instrument.finish();
    ASSERT_EQ(pieces.size(), 5u);
    EXPECT_EQ(pieces[0].size, 1024u);
    EXPECT_EQ(pieces[0].flags, "00000000");
    EXPECT_EQ(pieces[1].size, 1024u);
    EXPECT_EQ(pieces[1].flags, "00000000");
    EXPECT_EQ(pieces[2].size, 452u);
    EXPECT_EQ(pieces[2].flags, "00000008");
    EXPECT_EQ(pieces[3].size, 1024u);
    EXPECT_EQ(pieces[3].flags, "00000000");
    EXPECT_EQ(pieces[4].size, 1024u) << "an exact multiple ends with its last full piece";
    EXPECT_EQ(pieces[4].flags, "00000008");
}

struct Announced {
    const char *size;
    std::size_t expected;
};

class Vxi11Sizes : public testing::TestWithParam<Announced>
{
};

TEST_P(Vxi11Sizes, NonsenseForTheLargestWriteIsSurvived)
{
    std::size_t first = 0;
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            first = takeWrite(core).size;
            for (std::size_t size = first; size < 3 * MiB;)
                size += takeWrite(core).size;
            Vxi11Peer::endLink(core);
        },
        link7(GetParam().size));
    EXPECT_EQ(instrument.session.write(std::string(3 * MiB, 'x')), VI_SUCCESS);
    instrument.finish();
    EXPECT_EQ(first, GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(All, Vxi11Sizes,
                         testing::Values(Announced{"00000000", 1024}, Announced{"00000001", 1024},
                                         Announced{"000003FF", 1024}, Announced{"00004000", 16384},
                                         Announced{"80000000", MiB}, Announced{"FFFFFFFF", MiB}));

TEST(Vxi11, GoesOnBehindWhatTheInstrumentTookOfAPiece)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) {
        EXPECT_EQ(withoutTime(core.takeCall(), 1),
                  "000607AF 00000001 0000000B | 00000007 ........ 00000000 00000008 00000004 41424344");
        core.reply("00000000 00000001");
        EXPECT_EQ(withoutTime(core.takeCall(), 1),
                  "000607AF 00000001 0000000B | 00000007 ........ 00000000 00000008 00000003 42434400");
        core.reply("00000000 00000003");
        core.takeCall();
        core.reply("00000000 00000000"); // not even one byte: it would go on like this
        core.takeCall();
        core.reply("00000000 FFFFFFFF"); // more than there was
        Vxi11Peer::endLink(core);
    });
    EXPECT_EQ(instrument.session.write("ABCD"), VI_SUCCESS);
    EXPECT_EQ(instrument.session.count, 4u);
    EXPECT_EQ(instrument.session.write("EFGH"), VI_ERROR_IO);
    EXPECT_EQ(instrument.session.count, 0u);
    EXPECT_EQ(instrument.session.write("IJ"), VI_SUCCESS);
    EXPECT_EQ(instrument.session.count, 2u);
}

TEST(Vxi11, AWriteThatTimedOutTellsWhatWasTaken)
{
    Vxi11Instrument instrument(
        [](RpcServed &core, Vxi11Peer &) {
            takeWrite(core);
            core.takeCall();
            core.reply("0000000F 00000010");
            Vxi11Peer::endLink(core);
        },
        link7("00000400"));
    EXPECT_EQ(instrument.session.write(std::string(2000, 'x')), VI_ERROR_TMO);
    EXPECT_EQ(instrument.session.count, 1024u + 16u);
}

TEST(Vxi11, SendsNoEndWhenThatIsSwitchedOff)
{
    std::vector<TakenWrite> pieces;
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        pieces.push_back(takeWrite(core));
        pieces.push_back(takeWrite(core));
        Vxi11Peer::endLink(core);
    });
    instrument.session.set(VI_ATTR_SEND_END_EN, VI_FALSE);
    EXPECT_EQ(instrument.session.write("*ID"), VI_SUCCESS);
    instrument.session.set(VI_ATTR_SEND_END_EN, VI_TRUE);
    EXPECT_EQ(instrument.session.write("N?"), VI_SUCCESS);
    instrument.finish();
    EXPECT_EQ(pieces[0].flags, "00000000");
    EXPECT_EQ(pieces[1].flags, "00000008");
}

// 10. A length that is an exact multiple of the piece: END comes with the last piece, or with an empty one behind it.
TEST(Vxi11, ExactMultipleOfThePieceKeepsItsEnd)
{
    const std::string piece(MiB, 'x');
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        serveRead(core, "00100000", NoTermChar, "00000000 00000001 00100000", piece);
        serveRead(core, "00100000", NoTermChar, "00000000 00000005 00100000", piece);
        serveRead(core, "00100000", NoTermChar, "00000000 00000001 00100000", piece);
        serveRead(core, "00100000", NoTermChar, "00000000 00000004 00000000");
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    EXPECT_EQ(session.read(4 * MiB), VI_SUCCESS);
    EXPECT_EQ(session.count, 2 * MiB);
    EXPECT_EQ(session.read(4 * MiB), VI_SUCCESS);
    EXPECT_EQ(session.count, MiB);
}

TEST(Vxi11, AsksForTheWholeBufferAndFillsItExactly)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        serveRead(core, "00000005", NoTermChar, "00000000 00000001 00000005", "12345");
        serveRead(core, "00000005", NoTermChar, "00000000 00000005 00000005", "67890");
        serveRead(core, "00010000", NoTermChar, "00000000 00000000 00000003", "abc"); // its own buffer was full
        serveRead(core, "0000FFFD", NoTermChar, "00000000 00000004 00000001", "d");
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    EXPECT_EQ(session.read(5), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(session.read(5), VI_SUCCESS) << "END counts more than the count";
    EXPECT_EQ(session.text, "67890");
    EXPECT_EQ(session.read(65536), VI_SUCCESS);
    EXPECT_EQ(session.text, "abcd");
    EXPECT_EQ(session.read(0), VI_SUCCESS_MAX_CNT) << "nothing is asked of the instrument";
}

TEST(Vxi11, TerminationCharacterGoesToTheInstrument)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        serveRead(core, "00000400", "00000080 0000003B", "00000000 00000002 00000003", "ab;");
        serveRead(core, "00000400", "00000080 0000003B", "00000000 00000006 00000002", "c;");
        serveRead(core, "00000400", "00000080 000000FF", "00000000 00000000 00000002", "d\xFF");
        // Not asked for: what the character means to the instrument does not count.
        serveRead(core, "00000400", NoTermChar, "00000000 00000002 00000002", "e\xFF");
        serveRead(core, "000003FE", NoTermChar, "00000000 00000004 00000001", "f");
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    session.set(VI_ATTR_TERMCHAR, ';');
    session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
    EXPECT_EQ(session.read(), VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(session.text, "ab;");
    EXPECT_EQ(session.read(), VI_SUCCESS) << "END counts more than the character";
    session.set(VI_ATTR_TERMCHAR, 0xFF);
    EXPECT_EQ(session.read(), VI_SUCCESS_TERM_CHAR) << "an instrument that forgets to say why it stopped";
    EXPECT_EQ(session.text, "d\xFF");
    session.set(VI_ATTR_TERMCHAR_EN, VI_FALSE);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "e\xFF"
                            "f");
}

TEST(Vxi11, SuppressedEndDoesNotEndARead)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        serveRead(core, "00000006", NoTermChar, "00000000 00000004 00000002", "ab");
        serveRead(core, "00000004", NoTermChar, "00000000 00000005 00000004", "cdef");
        Vxi11Peer::endLink(core);
    });
    instrument.session.set(VI_ATTR_SUPPRESS_END_EN, VI_TRUE);
    EXPECT_EQ(instrument.session.read(6), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(instrument.session.text, "abcdef");
}

TEST(Vxi11, BytesThatCameBeforeATimeOutAreKept)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        serveRead(core, "00000400", NoTermChar, "0000000F 00000000 00000003", "abc");
        Vxi11Peer::endLink(core);
    });
    EXPECT_EQ(instrument.session.read(), VI_ERROR_TMO);
    EXPECT_EQ(instrument.session.text, "abc");
}

TEST(Vxi11, EmptyFragmentsAreLegal)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        core.takeCall();
        core.connection.send(hex("00000000 00000000 00000000"));
        core.reply("00000000 00000004 00000002", "hi");
        Vxi11Peer::endLink(core);
    });
    EXPECT_EQ(instrument.session.read(), VI_SUCCESS);
    EXPECT_EQ(instrument.session.text, "hi");
}

TEST(Vxi11, OneByteAFragmentIsAReply)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        core.takeCall();
        const std::string record = core.record("00000000 00000004 00000007", "abcdefg");
        for (std::size_t i = 4; i < record.size(); ++i)
            core.connection.send(hex(i + 1 == record.size() ? "80000001" : "00000001") + record[i]);
        Vxi11Peer::endLink(core);
    });
    EXPECT_EQ(instrument.session.read(), VI_SUCCESS);
    EXPECT_EQ(instrument.session.text, "abcdefg");
}

TEST(Vxi11, LargeDataSurvivesBothWays)
{
    std::string data(5 * MiB + 3, '\0');
    for (std::size_t i = 0; i < data.size(); ++i)
        data[i] = static_cast<char>(i * 7 + i / 251);
    std::string arrived;
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            while (arrived.size() < data.size()) {
                const std::string mark = core.connection.take(4);
                const std::string body = core.connection.take(RpcServed::number(mark) & 0x7FFFFFFF);
                core.xid = body.substr(0, 4);
                const std::uint32_t size = RpcServed::number(body.substr(56));
                arrived += body.substr(60, size);
                core.reply("00000000" + RpcServed::digits(RpcServed::word(size)));
            }
            for (std::size_t sent = 0; sent < data.size();) {
                const std::string call = core.takeCall();
                const std::size_t asked = std::stoul(call.substr(29 + 9, 8), nullptr, 16);
                const std::string piece = data.substr(sent, std::min<std::size_t>(asked, 700'001));
                sent += piece.size();
                core.reply(std::string("00000000 ") + (sent == data.size() ? "00000004" : "00000000") +
                               RpcServed::digits(RpcServed::word(static_cast<std::uint32_t>(piece.size()))),
                           piece);
            }
            Vxi11Peer::endLink(core);
        },
        link7("00080001"));
    EXPECT_EQ(instrument.session.write(data), VI_SUCCESS);
    EXPECT_EQ(instrument.session.read(8 * MiB), VI_SUCCESS);
    EXPECT_TRUE(instrument.session.text == data);
    instrument.finish();
    EXPECT_TRUE(arrived == data);
}

TEST(Vxi11, CallsWithoutDataHaveTheirTimesTheOtherWayRound)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) {
        for (const char *procedure : {"0000000D", "0000000E", "0000000F", "00000010", "00000011"}) {
            std::uint32_t time = 0;
            EXPECT_EQ(withoutTime(core.takeCall(), 3, &time),
                      std::string("000607AF 00000001 ") + procedure + " | 00000007 00000000 00000000 ........");
            EXPECT_GT(time, 0u);
            EXPECT_LE(time, 20000u);
            core.reply(procedure == std::string("0000000D") ? "00000000 00000150" : "00000000");
        }
        Vxi11Peer::endLink(core);
    });
    const ViSession vi = instrument.session.vi;
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(vi, &status), VI_SUCCESS);
    EXPECT_EQ(status, 0x50) << "one byte, whatever stands in front of it";
    EXPECT_EQ(viAssertTrigger(vi, VI_TRIG_PROT_DEFAULT), VI_SUCCESS);
    EXPECT_EQ(viClear(vi), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT_ADDRESS), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ADDRESS_GTL), VI_SUCCESS);
}

TEST(Vxi11, StatusByteAndTriggerAreCallsWhicheverProtocolIsSet)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) {
        for (const char *procedure : {"0000000D", "0000000E"}) {
            EXPECT_EQ(core.takeCall().substr(0, 26), std::string("000607AF 00000001 ") + procedure);
            core.reply("00000000 00000004");
        }
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    EXPECT_EQ(session.set(VI_ATTR_IO_PROT, VI_PROT_4882_STRS), VI_SUCCESS);
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(status, 4);
    EXPECT_EQ(viAssertTrigger(session.vi, VI_TRIG_PROT_DEFAULT), VI_SUCCESS);
}

TEST(Vxi11, RemoteControlKnowsFourOfTheSevenModes)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) {
        for (const char *procedure : {"00000011", "00000010", "00000010", "00000011"}) {
            EXPECT_EQ(core.takeCall().substr(0, 26), std::string("000607AF 00000001 ") + procedure);
            core.reply("00000000");
        }
        Vxi11Peer::endLink(core);
    });
    const ViSession vi = instrument.session.vi;
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_DEASSERT), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_DEASSERT_GTL), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT_ADDRESS), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT_LLO), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT_ADDRESS_LLO), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ADDRESS_GTL), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, 7), VI_ERROR_INV_MODE);
}

TEST(Vxi11, OperationsOfOtherInterfacesAreNotSupported)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) { Vxi11Peer::endLink(core); });
    const ViSession vi = instrument.session.vi;
    const ViByte command[] = {0x3F};
    EXPECT_EQ(viGpibSendIFC(vi), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibControlATN(vi, VI_GPIB_ATN_ASSERT), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibCommand(vi, command, 1, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibPassControl(vi, 3, VI_NO_SEC_ADDR), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viAssertTrigger(vi, VI_TRIG_PROT_ON), VI_ERROR_INV_PROT);
}

struct Refusal {
    const char *error;
    ViStatus status;
};

class Vxi11Errors : public testing::TestWithParam<Refusal>
{
};

TEST_P(Vxi11Errors, OfACallBecomeAStatus)
{
    const bool lost = GetParam().status == VI_ERROR_CONN_LOST;
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        expectQuestion(core);
        core.takeCall();
        core.reply(std::string(GetParam().error) + " 00000000 00000000");
        if (lost)
            core.connection.expectClosed();
        else
            Vxi11Peer::endLink(core);
    });
    EXPECT_EQ(instrument.session.write("?"), VI_SUCCESS);
    EXPECT_EQ(instrument.session.read(), GetParam().status);
    EXPECT_EQ(lost ? instrument.session.read() : VI_ERROR_CONN_LOST, VI_ERROR_CONN_LOST);
}

INSTANTIATE_TEST_SUITE_P(All, Vxi11Errors,
                         testing::Values(Refusal{"00000003", VI_ERROR_IO}, Refusal{"00000004", VI_ERROR_CONN_LOST},
                                         Refusal{"00000005", VI_ERROR_INV_SETUP},
                                         Refusal{"00000008", VI_ERROR_NSUP_OPER}, Refusal{"00000009", VI_ERROR_ALLOC},
                                         Refusal{"0000000B", VI_ERROR_RSRC_LOCKED}, Refusal{"0000000F", VI_ERROR_TMO},
                                         Refusal{"00000011", VI_ERROR_IO}, Refusal{"00000017", VI_ERROR_ABORT},
                                         Refusal{"00000063", VI_ERROR_IO}));

class Vxi11Opening : public testing::TestWithParam<Refusal>
{
};

TEST_P(Vxi11Opening, ARefusedLinkIsAStatusAndTheConnectionIsClosed)
{
    ScriptedPeer peer([](ScriptedPeer &scripted) {
        RpcServed core = Vxi11Peer(scripted).acceptLink(std::string(GetParam().error) + " 00000007 00000000 00000400");
        core.connection.expectClosed(); // and nothing before: there is no link to destroy
    });
    test::usePortmapper(peer.port());
    VisaSession session;
    EXPECT_EQ(session.open("TCPIP::127.0.0.1::inst0::INSTR"), GetParam().status);
}

INSTANTIATE_TEST_SUITE_P(
    All, Vxi11Opening,
    testing::Values(Refusal{"00000001", VI_ERROR_INV_RSRC_NAME}, Refusal{"00000003", VI_ERROR_RSRC_NFOUND},
                    Refusal{"00000009", VI_ERROR_RSRC_BUSY}, Refusal{"0000000B", VI_ERROR_RSRC_LOCKED},
                    Refusal{"00000015", VI_ERROR_INV_RSRC_NAME}, Refusal{"00000011", VI_ERROR_RSRC_NFOUND}));

TEST(Vxi11, APortmapperWithoutTheProgramOrWithoutSenseIsAResourceThatIsNotThere)
{
    const std::vector<std::string> answers = {
        hex("8000001C 00000000 00000001 00000000 00000000 00000000 00000000 00000000"), // overwritten with its id
        hex("80000018 00000000 00000001 00000000 00000000 00000000 00000001"),          // no such program
        hex("80000014 00000000 00000001 00000001 00000000 00000002 00000002"),          // denied
        hex("8000001C 00000000 00000001 00000000 00000000 00000000 00000000 00020000"), // no port at all
        "HTTP/1.0 400 Bad Request\r\n\r\n",
        ""};
    ScriptedPeer peer([&](ScriptedPeer &scripted) {
        for (std::string answer : answers) {
            RpcServed portmapper(scripted.accept());
            portmapper.takeCall();
            if (answer.size() > 8 && answer[0] == '\x80')
                answer.replace(4, 4, portmapper.xid);
            portmapper.connection.trySend(answer);
            portmapper.connection.close();
        }
    });
    test::usePortmapper(peer.port());
    VisaSession session;
    for (std::size_t i = 0; i < answers.size(); ++i)
        EXPECT_EQ(session.open("TCPIP::127.0.0.1::inst0::INSTR"), VI_ERROR_RSRC_NFOUND) << i;
}

TEST(Vxi11, KeepAliveAndNoDelayReachTheSocket)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) { Vxi11Peer::endLink(core); });
    VisaSession &session = instrument.session;
    const std::vector<int> sockets = test::socketsTo(instrument.port());
    ASSERT_FALSE(sockets.empty());
    const int descriptor = sockets.back();
    // 7. Firewalls forget a link that is idle for five minutes, so this one shows signs of life from the beginning.
    EXPECT_EQ(test::socketOption(descriptor, SOL_SOCKET, SO_KEEPALIVE), 1);
    EXPECT_LT(test::socketOption(descriptor, IPPROTO_TCP, TCP_KEEPIDLE), 300);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_KEEPALIVE), VI_TRUE);
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_KEEPALIVE, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(test::socketOption(descriptor, SOL_SOCKET, SO_KEEPALIVE), 0);
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_KEEPALIVE, VI_TRUE), VI_SUCCESS);
    EXPECT_EQ(test::socketOption(descriptor, SOL_SOCKET, SO_KEEPALIVE), 1);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_NODELAY), VI_TRUE);
    EXPECT_NE(test::socketOption(descriptor, IPPROTO_TCP, TCP_NODELAY), 0);
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_NODELAY, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(test::socketOption(descriptor, IPPROTO_TCP, TCP_NODELAY), 0);
}

TEST(Vxi11, IsReachedOverIpv6WhereTheInstrumentListensThere)
{
    ScriptedPeer peer(
        [](ScriptedPeer &scripted) {
            RpcServed core = Vxi11Peer(scripted).acceptLink("00000000 00000007 00000000 00000400");
            expectQuestion(core);
            Vxi11Peer::endLink(core);
        },
        true);
    test::usePortmapper(peer.port());
    VisaSession session;
    ASSERT_EQ(session.open("TCPIP::[::1]::inst0::INSTR"), VI_SUCCESS);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    // The instrument is told an address of 32 bits to connect to, and there is none.
    EXPECT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_ERROR_INV_EVENT);
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}
