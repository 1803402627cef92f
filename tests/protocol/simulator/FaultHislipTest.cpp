#include "protocol/simulator/SimulatorFixture.h"
#include "support/Stopwatch.h"

using namespace test;
using namespace std::chrono_literals;

namespace
{

constexpr const char *First = "4853 07 00 FFFFFF00";
constexpr const char *Second = "4853 07 01 FFFFFF02";
constexpr const char *SecondAnswer = "4853 07 00 FFFFFF02";

/// TearDown() shows that the next client is served well; nextClient() that one over HiSLIP is.
class HislipFault : public SimulatorFixture
{
protected:
    void add(const std::string &spec)
    {
        EXPECT_EQ(ask("DIAG:FAUL:ADD '" + spec + "';*OPC?\n"), "1\n");
        EXPECT_EQ(ask("SYST:ERR?\n"), "0,\"No error\"\n") << spec;
    }
    void query(HislipClient &of) { of.sync.send(message(First, "*ESE 123;*ESE?\n")); }
    void nextClient()
    {
        HislipClient next(simulator.port("hislip"));
        query(next);
        expectMessage(next.sync, First, "123\n");
    }
    std::uint8_t statusByte(HislipClient &of)
    {
        of.async.send(message("4853 15 00 FFFFFEFE"));
        return static_cast<std::uint8_t>(of.async.receive(16)[3]);
    }

    HislipClient client{simulator.port("hislip")};
};

} // namespace

TEST_F(HislipFault, DelayHoldsTheAnswer)
{
    add("hislip:delay=0.3:nth=1");
    const Stopwatch watch;
    query(client);
    expectMessage(client.sync, First, "123\n");
    EXPECT_GE(watch.milliseconds(), 300);
    nextClient();
}

TEST_F(HislipFault, DelayedAnswerIsForgottenByADeviceClear)
{
    add("hislip:delay=3600:nth=1");
    query(client);
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 00 00000000");
    client.sync.send(message("4853 08 00 00000000"));
    expectMessage(client.sync, "4853 09 00 00000000");
    query(client);
    expectMessage(client.sync, First, "123\n");
}

TEST_F(HislipFault, DropReplyLosesTheAnswer)
{
    add("hislip:drop-reply:nth=1");
    query(client);
    EXPECT_TRUE(client.sync.silentFor(100ms));
    client.sync.send(message("4853 07 00 FFFFFF02", "*ESE?\n"));
    expectMessage(client.sync, SecondAnswer, "123\n");
    nextClient();
}

TEST_F(HislipFault, CutEndsInTheMiddleOfTheMessage)
{
    add("hislip:cut:nth=1");
    query(client);
    EXPECT_EQ(client.sync.receiveAll(), message(First, "123\n").substr(0, 10));
    client.sync.close();
    EXPECT_EQ(client.async.receiveAll(), "") << "the session ends with it";
    nextClient();
}

TEST_F(HislipFault, ShortHeaderLacksItsEnd)
{
    add("hislip:short-header:nth=1");
    query(client);
    EXPECT_EQ(client.sync.receive(12), fromHex("4853 07 00 FFFFFF00") + "123\n");
    client.sync.send(message(Second, "*ESE?\n"));
    expectMessage(client.sync, SecondAnswer, "123\n");
    nextClient();
}

TEST_F(HislipFault, ShortHeaderKeepsAsMuchAsAskedFor)
{
    add("hislip:short-header=15:nth=1");
    query(client);
    EXPECT_EQ(client.sync.receive(19), fromHex("4853 07 00 FFFFFF00 00000000000000") + "123\n");
    nextClient();
}

TEST_F(HislipFault, OversizedHeaderAnnouncesWhatNeverComes)
{
    add("hislip:oversized-header:nth=1");
    query(client);
    EXPECT_EQ(client.sync.receive(20), fromHex("4853 07 00 FFFFFF00 FFFFFFFFFFFFFFFF") + "123\n");
    add("hislip:oversized-header=6:nth=1");
    HislipClient other(simulator.port("hislip"));
    query(other);
    EXPECT_EQ(other.sync.receive(20), fromHex("4853 07 00 FFFFFF00 0000000000000006") + "123\n");
    nextClient();
}

TEST_F(HislipFault, GarbageComesInsteadOfTheMessage)
{
    add("hislip:garbage=20:nth=1");
    query(client);
    EXPECT_NE(client.sync.receive(20), message(First, "123\n"));
    client.sync.send(message(Second, "*ESE?\n"));
    expectMessage(client.sync, SecondAnswer, "123\n");
    nextClient();
}

TEST_F(HislipFault, ChangeByteTouchesThePayloadAlone)
{
    add("hislip:change-byte=0:nth=1");
    query(client);
    expectMessage(client.sync, First, "023\n");
    nextClient();
}

TEST_F(HislipFault, StaleIdIsThatOfTheMessageBefore)
{
    add("hislip:stale-id:nth=1");
    query(client);
    expectMessage(client.sync, "4853 07 00 FFFFFEFE", "123\n");
    nextClient();
}

TEST_F(HislipFault, NoEndMakesADataOfTheDataEnd)
{
    add("hislip:no-end:nth=1");
    query(client);
    expectMessage(client.sync, "4853 06 00 FFFFFF00", "123\n");
    nextClient();
}

TEST_F(HislipFault, RefuseLockAnswersFailedToAFreeLock)
{
    add("hislip:refuse-lock:nth=1");
    client.async.send(message("4853 04 01 00000000"));
    expectMessage(client.async, "4853 05 00 00000000");
    client.async.send(message("4853 04 01 00000000"));
    expectMessage(client.async, "4853 05 01 00000000");
    client.async.send(message("4853 04 00 FFFFFEFE"));
    expectMessage(client.async, "4853 05 01 00000000");
    nextClient();
}

TEST_F(HislipFault, WithholdSrqSaysNothingAndTheStatusByteStillTells)
{
    add("hislip:withhold-srq:nth=1");
    client.sync.send(message(First, "*SRE 32;*ESE 1;*OPC\n"));
    EXPECT_TRUE(client.async.silentFor(100ms));
    EXPECT_EQ(statusByte(client), 0x60);
    client.sync.send(message(Second, "*CLS;*OPC\n"));
    expectMessage(client.async, "4853 14 60 00000000");
    EXPECT_EQ(ask("*SRE 0;*ESE 0;*OPC?\n"), "1\n");
    nextClient();
}

TEST_F(HislipFault, RepeatSrqSaysItTwice)
{
    add("hislip-async:repeat-srq:nth=1");
    client.sync.send(message(First, "*SRE 32;*ESE 1;*OPC\n"));
    expectMessage(client.async, "4853 14 60 00000000");
    expectMessage(client.async, "4853 14 60 00000000");
    EXPECT_EQ(statusByte(client), 0x60);
    EXPECT_TRUE(client.async.silentFor(50ms));
    EXPECT_EQ(ask("*SRE 0;*ESE 0;*OPC?\n"), "1\n");
}

TEST_F(HislipFault, NonsenseStatusTellsAnotherByteThanTheTruth)
{
    add("hislip:nonsense-status:nth=1");
    EXPECT_NE(statusByte(client), 0);
    EXPECT_EQ(statusByte(client), 0);
    add("hislip:nonsense-status=171:nth=1");
    EXPECT_EQ(statusByte(client), 171);
    EXPECT_EQ(statusByte(client), 0);
    nextClient();
}

TEST_F(HislipFault, FillErrorsOverflowsTheErrorQueue)
{
    add("hislip:fill-errors:nth=1");
    query(client);
    expectMessage(client.sync, First, "123\n");
    EXPECT_EQ(ask("SYST:ERR:COUN?\n"), "30\n");
    nextClient();
}

TEST_F(HislipFault, CountsAnswersAndNotAcknowledgements)
{
    add("hislip:drop-reply:nth=1");
    HislipClient fresh(simulator.port("hislip"));
    query(fresh);
    EXPECT_TRUE(fresh.sync.silentFor(100ms)) << "the handshake was no answer";
}

TEST_F(HislipFault, OnAllStrikesTheHandshakeToo)
{
    add("hislip:cut=4:on=all:nth=1");
    RawClient sync(simulator.port("hislip"));
    sync.send(message("4853 00 00 0100 5A5A", "hislip0"));
    EXPECT_EQ(sync.receiveAll(), fromHex("4853 01 00"));
    nextClient();
}

// ---- the asynchronous channel: every message counts

TEST_F(HislipFault, AsyncDelayHoldsTheStatusAnswer)
{
    add("hislip-async:delay=0.3:nth=1");
    const Stopwatch watch;
    EXPECT_EQ(statusByte(client), 0);
    EXPECT_GE(watch.milliseconds(), 300);
    nextClient();
}

TEST_F(HislipFault, AsyncDropReplyLosesTheStatusAnswer)
{
    add("hislip-async:drop-reply:nth=1");
    client.async.send(message("4853 15 00 FFFFFEFE"));
    EXPECT_TRUE(client.async.silentFor(100ms));
    EXPECT_EQ(statusByte(client), 0);
    nextClient();
}

TEST_F(HislipFault, AsyncCutEndsTheSession)
{
    add("hislip-async:cut:nth=1");
    client.async.send(message("4853 15 00 FFFFFEFE"));
    EXPECT_EQ(client.async.receiveAll(), fromHex("4853 16 00 00000000 00").substr(0, 8));
    client.async.close();
    EXPECT_EQ(client.sync.receiveAll(), "");
    nextClient();
}

TEST_F(HislipFault, AsyncShortHeaderLacksItsEnd)
{
    add("hislip-async:short-header=3:nth=1");
    client.async.send(message("4853 15 00 FFFFFEFE"));
    EXPECT_EQ(client.async.receive(3), fromHex("4853 16"));
    EXPECT_EQ(statusByte(client), 0);
    nextClient();
}

TEST_F(HislipFault, AsyncOversizedHeaderAnnouncesAPayload)
{
    add("hislip-async:oversized-header=256:nth=1");
    client.async.send(message("4853 15 00 FFFFFEFE"));
    EXPECT_EQ(client.async.receive(16), fromHex("4853 16 00 00000000 0000000000000100"));
    nextClient();
}

TEST_F(HislipFault, AsyncGarbageComesInsteadOfTheMessage)
{
    add("hislip-async:garbage:nth=1");
    client.async.send(message("4853 15 00 FFFFFEFE"));
    EXPECT_NE(client.async.receive(16), message("4853 16 00 00000000"));
    EXPECT_EQ(statusByte(client), 0);
    nextClient();
}

TEST_F(HislipFault, AsyncFillErrorsShowsInTheNextStatusByte)
{
    add("hislip-async:fill-errors:nth=1");
    EXPECT_EQ(statusByte(client), 0);
    EXPECT_EQ(statusByte(client), 4);
    nextClient();
}
