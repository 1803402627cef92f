// Open, write, read, blocks, status byte, trigger, clear, time-outs: over every protocol.
#include "contract/Contract.h"
#include "support/Stopwatch.h"

#include <thread>

using test::Stopwatch;
using test::VisaSession;

namespace contract
{
namespace
{

class Transfer : public Contract
{
protected:
    /// Stores @p block in the instrument and reads it back in pieces of @p piece.
    void roundTrip(const std::string &block, std::size_t piece)
    {
        const std::string size = std::to_string(block.size());
        const std::string head = "#" + std::to_string(size.size()) + size;
        ASSERT_EQ(m_session.write("MMEM:DATA \"b\"," + head + block + "\n"), VI_SUCCESS);
        ASSERT_EQ(m_session.write("MMEM:DATA? \"b\"\n"), VI_SUCCESS);
        readBinary(m_session, true);
        const std::string expected = head + block + "\n";
        std::string got;
        got.reserve(expected.size());
        while (got.size() < expected.size()) {
            const std::size_t left = expected.size() - got.size();
            const ViStatus status = m_session.read(static_cast<std::uint32_t>(std::min(piece, left)));
            got += m_session.text;
            const bool last = got.size() == expected.size();
            ASSERT_EQ(status, last && endsBinary() ? VI_SUCCESS : VI_SUCCESS_MAX_CNT) << got.size();
        }
        EXPECT_TRUE(got == expected);
        readBinary(m_session, false);
    }
    /// The last read of binary data sees an END.
    bool endsBinary() const { return GetParam().hasEnd && GetParam().locks != Locks::OnePortOneSession; }
};

INSTANTIATE_TEST_SUITE_P(All, Transfer, testing::ValuesIn(protocols()), nameOf);

std::string bytes(std::size_t size)
{
    std::string block(size, '\0');
    for (std::size_t i = 0; i < size; ++i)
        block[i] = static_cast<char>(i + i / 253);
    return block;
}

TEST_P(Transfer, AnswersInOrder)
{
    for (int i = 0; i < 200; ++i)
        ASSERT_EQ(query("*ESE " + std::to_string(i % 256) + ";*ESE?"), std::to_string(i % 256) + "\n");
}

TEST_P(Transfer, CountEndsAReadAndTheRestStays)
{
    ASSERT_EQ(m_session.write("*ESE 123;*ESE?\n"), VI_SUCCESS);
    EXPECT_EQ(m_session.read(0), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(m_session.read(2), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(m_session.text, "12");
    EXPECT_EQ(m_session.read(2), whole()) << "the end wins over the count";
    EXPECT_EQ(m_session.text, "3\n");
}

TEST_P(Transfer, TermCharCountsWhereItIsEnabledAndOnlyThere)
{
    m_session.set(VI_ATTR_TERMCHAR, ',');
    m_session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
    ASSERT_EQ(m_session.write("*IDN?\n"), VI_SUCCESS);
    // On a serial line the termination character is the end itself (VI_ATTR_ASRL_END_IN).
    EXPECT_EQ(m_session.read(), GetParam().locks == Locks::OnePortOneSession ? VI_SUCCESS : VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(m_session.text, "Oltrava,");
    m_session.set(VI_ATTR_TERMCHAR, '\n');
    if (GetParam().hasEnd)
        m_session.set(VI_ATTR_TERMCHAR_EN, VI_FALSE);
    EXPECT_EQ(m_session.read(), whole());
    EXPECT_EQ(m_session.text.back(), '\n');
    EXPECT_GT(m_session.text.size(), 10u);
}

TEST_P(Transfer, MessageMayBeWrittenInPieces)
{
    m_session.set(VI_ATTR_SEND_END_EN, VI_FALSE);
    EXPECT_EQ(m_session.write("*ES"), VI_SUCCESS);
    EXPECT_EQ(m_session.write("E 77;*E"), VI_SUCCESS);
    m_session.set(VI_ATTR_SEND_END_EN, VI_TRUE);
    EXPECT_EQ(query("SE?"), "77\n");
}

TEST_P(Transfer, BlocksOfEverySizeAroundThePiecesOfTheProtocols)
{
    for (const std::size_t size : {0, 1, 15, 16, 17, 1023, 1024, 1025, 4095, 4096, 4097, 16383, 16384, 16385, 65535,
                                   65536, 65537, 131072, 262144 - 9})
        roundTrip(bytes(size), 1 << 20);
}

TEST_P(Transfer, BlocksReadInPiecesThatDivideThemExactly)
{
    // Head, block and line feed together are 4,096, 65,536 and 131,072 bytes.
    for (const auto &[size, piece] : {std::pair<std::size_t, std::size_t>{4096 - 7, 512},
                                      {65536 - 8, 4096},
                                      {65536 - 8, 65536},
                                      {131072 - 9, 16384}})
        roundTrip(bytes(size), piece);
}

TEST_P(Transfer, LargestBlock)
{
    roundTrip(bytes(GetParam().largestBlock), 8 << 20);
}

TEST_P(Transfer, StatusByteAndTrigger)
{
    EXPECT_EQ(query("*CLS;*ESE 1;*SRE 32;*OPC?"), "1\n");
    EXPECT_EQ(m_session.write("*OPC\n"), VI_SUCCESS);
    EXPECT_EQ(query("*OPC?"), "1\n");
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(m_session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(status & 0x60, 0x60);
    EXPECT_EQ(viAssertTrigger(m_session.vi, VI_TRIG_PROT_DEFAULT), VI_SUCCESS);
    EXPECT_EQ(viAssertTrigger(m_session.vi, VI_TRIG_PROT_ON), VI_ERROR_INV_PROT);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_P(Transfer, StatusByteAndTriggerNeedTheStringProtocolWhereThereIsNothingElse)
{
    m_session.set(VI_ATTR_IO_PROT, VI_PROT_NORMAL);
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(m_session.vi, &status), GetParam().stringsForStatus ? VI_ERROR_INV_SETUP : VI_SUCCESS);
    EXPECT_EQ(viAssertTrigger(m_session.vi, VI_TRIG_PROT_DEFAULT),
              GetParam().stringsForStatus ? VI_ERROR_INV_SETUP : VI_SUCCESS);
}

TEST_P(Transfer, TimeOutLeavesTheSessionUsable)
{
    m_session.set(VI_ATTR_TMO_VALUE, 120);
    const Stopwatch watch;
    EXPECT_EQ(m_session.read(), VI_ERROR_TMO);
    EXPECT_EQ(m_session.count, 0u);
    EXPECT_GE(watch.milliseconds(), 120);
    EXPECT_LT(watch.milliseconds(), 10000);
    m_session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(viClear(m_session.vi), VI_SUCCESS); // some have noted that they were asked for nothing
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_P(Transfer, AnswerThatCameTooLateIsNotTakenForTheNext)
{
    ASSERT_EQ(m_session.write("*ESE 11;SYST:DEL 0.4;*ESE?\n"), VI_SUCCESS);
    m_session.set(VI_ATTR_TMO_VALUE, 50);
    EXPECT_EQ(m_session.read(), VI_ERROR_TMO);
    m_session.set(VI_ATTR_TMO_VALUE, 20000);
    if (GetParam().lateAnswersMustHaveCome)
        std::this_thread::sleep_for(std::chrono::milliseconds(1200));
    const std::string expected = GetParam().answersAreKept ? "11\n" : "22\n";
    EXPECT_EQ(query("*ESE 22;*ESE?"), expected);
}

TEST_P(Transfer, ClearInTheMiddleOfABlockThatIsWritten)
{
    m_session.set(VI_ATTR_SEND_END_EN, VI_FALSE);
    ASSERT_EQ(m_session.write("MMEM:DATA \"half\",#41000" + std::string(400, 'x')), VI_SUCCESS);
    m_session.set(VI_ATTR_SEND_END_EN, VI_TRUE);
    EXPECT_EQ(viClear(m_session.vi), VI_SUCCESS);
    if (!GetParam().clearReachesDevice) {
        // The instrument still waits for the rest.
        EXPECT_EQ(m_session.write(std::string(600, 'x') + "\n"), VI_SUCCESS);
    }
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_P(Transfer, ClearInTheMiddleOfABlockThatIsRead)
{
    roundTrip(bytes(300'000), 1 << 20);
    ASSERT_EQ(m_session.write("MMEM:DATA? \"b\"\n"), VI_SUCCESS);
    readBinary(m_session, true);
    EXPECT_EQ(m_session.read(1000), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(viClear(m_session.vi), VI_SUCCESS);
    if (!GetParam().clearReachesDevice) {
        // The block goes on arriving: what has not come yet cannot be dropped, but it can be read.
        m_session.set(VI_ATTR_TMO_VALUE, 500);
        while (m_session.read(1 << 20) == VI_SUCCESS_MAX_CNT)
            continue;
        m_session.set(VI_ATTR_TMO_VALUE, 20000);
    }
    readBinary(m_session, false);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_P(Transfer, ClearInTheMiddleOfASlowCommand)
{
    const bool reaches = GetParam().clearReachesDevice;
    ASSERT_EQ(m_session.write(reaches ? "SYST:DEL 60;*IDN?\n" : "SYST:DEL 0.3;*WAI\n"), VI_SUCCESS);
    const Stopwatch watch;
    EXPECT_EQ(viClear(m_session.vi), VI_SUCCESS);
    EXPECT_EQ(query("*OPC?"), "1\n");
    EXPECT_LT(watch.milliseconds(), 20000);
}

// ---- HiSLIP alone ---------------------------------------------------------------------------------------------------

class HislipTransfer : public Transfer
{
protected:
    bool overlapped() { return m_session.get<ViBoolean>(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN) != VI_FALSE; }
};

std::vector<Protocol> hislipProtocols()
{
    std::vector<Protocol> both = protocols();
    std::erase_if(both, [](const Protocol &protocol) { return std::string(protocol.service) != "hislip"; });
    return both;
}

INSTANTIATE_TEST_SUITE_P(All, HislipTransfer, testing::ValuesIn(hislipProtocols()), nameOf);

TEST_P(HislipTransfer, AnswersAreCutToTheSizeThatWasAgreedOn)
{
    for (const ViUInt32 kilobytes : {1u, 64u, 1024u}) {
        ASSERT_EQ(m_session.set(VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB, kilobytes), VI_SUCCESS);
        for (const std::size_t size : {1000, 1008, 1016, 1024, 65519, 65520, 65536, 1048576})
            roundTrip(bytes(size), 1 << 21);
    }
}

TEST_P(HislipTransfer, ModeIsChangedBothWays)
{
    EXPECT_EQ(overlapped(), GetParam().answersAreKept);
    for (int round = 0; round < 3; ++round) {
        ASSERT_EQ(m_session.set(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, VI_TRUE), VI_SUCCESS);
        EXPECT_TRUE(overlapped());
        ASSERT_EQ(m_session.write("*ESE 1;*ESE?\n"), VI_SUCCESS);
        EXPECT_EQ(query("*ESE 2;*ESE?"), "1\n") << "nothing is interrupted";
        EXPECT_EQ(m_session.read(), VI_SUCCESS);
        EXPECT_EQ(m_session.text, "2\n");
        ASSERT_EQ(m_session.write("*ESE 3;*ESE?\n"), VI_SUCCESS);
        ASSERT_EQ(m_session.set(VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, VI_FALSE), VI_SUCCESS); // by a device clear
        EXPECT_FALSE(overlapped());
        EXPECT_EQ(query("*ESE 4;*ESE?"), "4\n");
        ASSERT_EQ(m_session.write("*ESE 5;*ESE?\n"), VI_SUCCESS);
        EXPECT_EQ(query("*ESE 6;*ESE?"), "6\n") << "the first question was interrupted";
    }
}

TEST_P(Transfer, LostConnectionSaysSoAndAnotherOneWorks)
{
    {
        test::SimulatorProcess shortLived(GetParam().options);
        ::setenv("KYVISA_PORTMAPPER_PORT", shortLived.resource("portmapper").c_str(), 1);
        VisaSession session;
        ASSERT_EQ(session.open(shortLived.resource(GetParam().service), 10000), VI_SUCCESS);
        session.set(VI_ATTR_TMO_VALUE, 20000);
        EXPECT_EQ(shortLived.stop(SIGTERM), 0);
        EXPECT_EQ(session.read(), VI_ERROR_CONN_LOST);
        EXPECT_EQ(session.read(), VI_ERROR_CONN_LOST);
        EXPECT_EQ(session.write("*OPC?\n"), VI_ERROR_CONN_LOST);
        EXPECT_EQ(viClear(session.vi), VI_ERROR_CONN_LOST);
        EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
    }
    viClose(m_session.vi);
    open(m_session);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

} // namespace
} // namespace contract
