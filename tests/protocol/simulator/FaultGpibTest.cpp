// Faults on links to the bus behind the gateway: the same damage as on VXI-11, and none to the links of inst0.
#include "protocol/simulator/Vxi11Client.h"
#include "support/ScriptedPeer.h"
#include "support/Stopwatch.h"

using namespace test;
using namespace std::chrono_literals;

namespace
{

/// The reply to a device_read that brings "123\n" with END, from the record mark on.
constexpr const char *Read = "80000028 11223344 00000001 00000000 00000000 00000000 00000000 "
                             "00000000 00000004 00000004 3132330A";
constexpr std::size_t ReadSize = 44; ///< with the mark

class GpibFault : public Vxi11Fixture
{
protected:
    GpibFault() : Vxi11Fixture({"--gpib"}) {}

    void add(const std::string &spec)
    {
        EXPECT_EQ(ask("DIAG:FAUL:ADD '" + spec + "';*OPC?\n"), "1\n");
        EXPECT_EQ(ask("SYST:ERR?\n"), "0,\"No error\"\n") << spec;
        EXPECT_EQ(Vxi11Client(port).query("*ESE 7;*ESE?\n"), "7\n") << "inst0 is not on the bus";
    }
    void query()
    {
        client.write("*ESE 123;*ESE?\n");
        client.core.send("0000000C", client.link + "00000400 00007530 00000000 00000000 00000000");
    }
    std::string received(std::size_t count) { return RpcCaller::digits(client.core.client().receive(count)); }
    void nextClient()
    {
        client.core.client().close();
        EXPECT_EQ(Vxi11Client(port, "gpib0,5").query("*ESE 123;*ESE?\n"), "123\n");
    }

    Vxi11Client client{port, "gpib0,5"};
};

} // namespace

TEST_F(GpibFault, DelayHoldsTheReply)
{
    add("gpib:delay=0.3:nth=1");
    const Stopwatch watch;
    query();
    EXPECT_EQ(client.core.client().receive(ReadSize), fromHex(Read));
    EXPECT_GE(watch.milliseconds(), 300);
    nextClient();
}

TEST_F(GpibFault, DropReplyLosesTheReply)
{
    add("gpib:drop-reply:nth=1");
    query();
    EXPECT_TRUE(client.core.client().silentFor(100ms));
    EXPECT_EQ(client.query("*ESE?\n"), "123\n");
    nextClient();
}

TEST_F(GpibFault, CutEndsInTheMiddleOfTheReply)
{
    add("gpib:cut:nth=1");
    query();
    EXPECT_EQ(client.core.client().receiveAll(), fromHex(Read).substr(0, 22));
    nextClient();
}

TEST_F(GpibFault, ShortHeaderLacksItsEnd)
{
    add("gpib:short-header=2:nth=1");
    query();
    EXPECT_EQ(received(18), "80000000 00000000 00040000 00043132 330A");
    nextClient();
}

TEST_F(GpibFault, OversizedHeaderAnnouncesWhatNeverComes)
{
    add("gpib:oversized-header=100:nth=1");
    query();
    EXPECT_EQ(received(8), "80000064 11223344 ");
    nextClient();
}

TEST_F(GpibFault, GarbageComesInsteadOfTheReply)
{
    add("gpib:garbage=9:nth=1");
    query();
    EXPECT_NE(client.core.client().receive(9), fromHex(Read).substr(0, 9));
    EXPECT_EQ(client.query("*ESE?\n"), "123\n");
    nextClient();
}

TEST_F(GpibFault, ChangeByteTouchesTheDataAlone)
{
    add("gpib:change-byte=0:nth=1");
    client.write("*ESE 123;*ESE?\n");
    EXPECT_EQ(client.read(), "00000000 00000004 00000004 3032330A ");
    nextClient();
}

TEST_F(GpibFault, StaleIdIsThatOfTheCallBefore)
{
    add("gpib:stale-id:nth=1");
    query();
    EXPECT_EQ(received(8), "80000028 11223343 ");
    nextClient();
}

TEST_F(GpibFault, NoEndLeavesOutTheReason)
{
    add("gpib:no-end:nth=1");
    client.write("*ESE 123;*ESE?\n");
    EXPECT_EQ(client.read(), "00000000 00000000 00000004 3132330A ");
    nextClient();
}

TEST_F(GpibFault, RefuseLockAnswersThatAnotherLinkHoldsIt)
{
    add("gpib:refuse-lock:nth=1");
    EXPECT_EQ(client.core.call("00000012", client.link + "00000000 00000000"), "0000000B ");
    EXPECT_EQ(client.core.call("00000012", client.link + "00000000 00000000"), "00000000 ");
    EXPECT_EQ(client.core.call("00000013", client.link), "00000000 ");
    nextClient();
}

TEST_F(GpibFault, NonsenseStatusTellsAnotherByteThanTheTruth)
{
    add("gpib:nonsense-status=171:nth=1");
    EXPECT_EQ(client.statusByte(), "00000000 000000AB ");
    EXPECT_EQ(client.statusByte(), "00000000 00000000 ");
    nextClient();
}

TEST_F(GpibFault, FillErrorsOverflowsTheErrorQueue)
{
    add("gpib:fill-errors:nth=1");
    EXPECT_EQ(client.query("*ESE 123;*ESE?\n"), "123\n");
    EXPECT_EQ(ask("SYST:ERR:COUN?\n"), "30\n");
    nextClient();
}

namespace
{

/// A controller that listens to service requests of the instrument at address 5.
class GpibSrqFault : public GpibFault
{
protected:
    /// Two reasons for service, one after the other.
    void request(ScriptedPeer &controller)
    {
        ASSERT_EQ(client.core.call("00000019", "7F000001" + RpcCaller::digits(RpcCaller::word(controller.port())) +
                                                   "000607B1 00000001 00000000"),
                  "00000000 ");
        ASSERT_EQ(client.core.call("00000014", client.link + "00000001 00000004", "srq1"), "00000000 ");
        client.write("*SRE 32;*ESE 1;*OPC\n");
        EXPECT_EQ(client.statusByte(), "00000000 00000060 ");
        client.write("*CLS;*OPC\n");
        EXPECT_EQ(client.statusByte(), "00000000 00000060 ");
        client.write("*SRE 0;*ESE 0;*CLS\n");
        EXPECT_EQ(client.core.call("0000001A"), "00000000 ");
    }
    static void expectRequest(PeerConnection &channel, const char *xid)
    {
        channel.expect(
            hex("80000030") + hex(xid) +
            hex("00000000 00000002 000607B1 00000001 0000001E 00000000 00000000 00000000 00000000 00000004") + "srq1");
    }
};

} // namespace

TEST_F(GpibSrqFault, WithholdSrqSaysNothing)
{
    add("gpib:withhold-srq:nth=1");
    ScriptedPeer controller([](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        expectRequest(channel, "00000001"); // of the second reason
        channel.expectClosed();
    });
    request(controller);
    nextClient();
}

TEST_F(GpibSrqFault, RepeatSrqSaysItAgain)
{
    add("gpib:repeat-srq=3:nth=2");
    ScriptedPeer controller([](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        expectRequest(channel, "00000001");
        for (const char *xid : {"00000002", "00000003", "00000004"})
            expectRequest(channel, xid);
        channel.expectClosed();
    });
    request(controller);
    nextClient();
}

TEST_F(GpibFault, OnAllStrikesEveryReplyOfItsLinks)
{
    add("gpib:stale-id:on=all");
    client.core.send("00000013", client.link); // device_unlock
    EXPECT_EQ(received(32), "8000001C 11223343 00000001 00000000 00000000 00000000 00000000 0000000C ");
    client.core.send("00000014", client.link + "00000001 00000000"); // device_enable_srq
    EXPECT_EQ(received(32), "8000001C 11223343 00000001 00000000 00000000 00000000 00000000 00000000 ");
    client.core.client().close();
}
