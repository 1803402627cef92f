#include "protocol/simulator/Vxi11Client.h"
#include "support/ScriptedPeer.h"
#include "support/Stopwatch.h"

#include <future>

using namespace test;
using namespace std::chrono_literals;

namespace
{

/// The reply to a device_read that brings "123\n" with END, from the record mark on.
constexpr const char *Read = "80000028 11223344 00000001 00000000 00000000 00000000 00000000 "
                             "00000000 00000004 00000004 3132330A";
constexpr std::size_t ReadSize = 44; ///< with the mark

/// TearDown() shows that the next client is served well; nextClient() that one over VXI-11 is.
class Vxi11Fault : public Vxi11Fixture
{
protected:
    void add(const std::string &spec)
    {
        EXPECT_EQ(ask("DIAG:FAUL:ADD '" + spec + "';*OPC?\n"), "1\n");
        EXPECT_EQ(ask("SYST:ERR?\n"), "0,\"No error\"\n") << spec;
    }
    /// Asks for "123\n" and leaves the reply to be looked at.
    void query()
    {
        client.write("*ESE 123;*ESE?\n");
        client.core.send("0000000C", client.link + "00000400 00007530 00000000 00000000 00000000");
    }
    std::string received(std::size_t count) { return RpcCaller::digits(client.core.client().receive(count)); }
    void nextClient()
    {
        client.core.client().close();
        EXPECT_EQ(Vxi11Client(port).query("*ESE 123;*ESE?\n"), "123\n");
    }

    Vxi11Client client{port};
};

} // namespace

TEST_F(Vxi11Fault, WithoutOneTheReplyIsTheOneThatIsDamagedBelow)
{
    query();
    EXPECT_EQ(client.core.client().receive(ReadSize), fromHex(Read));
}

TEST_F(Vxi11Fault, DelayHoldsTheReply)
{
    add("vxi11:delay=0.3:nth=1");
    const Stopwatch watch;
    query();
    EXPECT_EQ(client.core.client().receive(ReadSize), fromHex(Read));
    EXPECT_GE(watch.milliseconds(), 300);
    nextClient();
}

TEST_F(Vxi11Fault, DropReplyLosesTheReplyAndTheNextCallIsAnswered)
{
    add("vxi11:drop-reply:nth=1");
    query();
    EXPECT_TRUE(client.core.client().silentFor(100ms));
    EXPECT_EQ(client.query("*ESE?\n"), "123\n");
    nextClient();
}

TEST_F(Vxi11Fault, CutEndsInTheMiddleOfTheReply)
{
    add("vxi11:cut:nth=1");
    query();
    EXPECT_EQ(client.core.client().receiveAll(), fromHex(Read).substr(0, 22));
    nextClient();
}

TEST_F(Vxi11Fault, ShortHeaderLacksItsEnd)
{
    add("vxi11:short-header=2:nth=1");
    query();
    EXPECT_EQ(received(18), "80000000 00000000 00040000 00043132 330A");
    nextClient();
}

TEST_F(Vxi11Fault, OversizedHeaderAnnouncesWhatNeverComes)
{
    add("vxi11:oversized-header:nth=1");
    query();
    EXPECT_EQ(received(8), "FFFFFFFF 11223344 ");
    received(36);
    add("vxi11:oversized-header=48:nth=1");
    client.write("*ESE?\n");
    client.core.send("0000000C", client.link + "00000400 00007530 00000000 00000000 00000000");
    EXPECT_EQ(received(8), "80000030 11223344 ");
    nextClient();
}

TEST_F(Vxi11Fault, GarbageComesInsteadOfTheReply)
{
    add("vxi11:garbage=9:nth=1");
    query();
    EXPECT_NE(client.core.client().receive(9), fromHex(Read).substr(0, 9));
    EXPECT_EQ(client.query("*ESE?\n"), "123\n");
    nextClient();
}

TEST_F(Vxi11Fault, ChangeByteTouchesTheDataAlone)
{
    add("vxi11:change-byte=2:nth=1");
    query();
    EXPECT_EQ(received(ReadSize), "80000028 11223344 00000001 00000000 00000000 00000000 00000000 "
                                  "00000000 00000004 00000004 3132320A ");
    nextClient();
}

TEST_F(Vxi11Fault, StaleIdIsThatOfTheCallBefore)
{
    add("vxi11:stale-id:nth=1");
    query();
    EXPECT_EQ(received(8), "80000028 11223343 ");
    nextClient();
}

TEST_F(Vxi11Fault, NoEndLeavesOutTheReason)
{
    add("vxi11:no-end:nth=1");
    query();
    EXPECT_EQ(received(ReadSize), "80000028 11223344 00000001 00000000 00000000 00000000 00000000 "
                                  "00000000 00000000 00000004 3132330A ");
    nextClient();
}

TEST_F(Vxi11Fault, NoEndKeepsTheOtherReasons)
{
    add("vxi11:no-end:nth=1");
    client.write("*ESE 123;*ESE?\n");
    // A request of exactly four bytes that ends at a line feed.
    EXPECT_EQ(client.core.call("0000000C", client.link + "00000004 00007530 00000000 00000080 0000000A"),
              "00000000 00000003 00000004 3132330A ");
    nextClient();
}

TEST_F(Vxi11Fault, RefuseLockAnswersThatAnotherLinkHoldsIt)
{
    add("vxi11:refuse-lock:nth=1");
    EXPECT_EQ(client.core.call("00000012", client.link + "00000000 00000000"), "0000000B ");
    EXPECT_EQ(client.core.call("00000012", client.link + "00000000 00000000"), "00000000 ");
    EXPECT_EQ(client.core.call("00000013", client.link), "00000000 ");
    nextClient();
}

TEST_F(Vxi11Fault, NonsenseStatusTellsAnotherByteThanTheTruth)
{
    add("vxi11:nonsense-status:nth=1");
    EXPECT_NE(client.statusByte(), "00000000 00000000 ");
    EXPECT_EQ(client.statusByte(), "00000000 00000000 ");
    add("vxi11:nonsense-status=171:nth=1");
    EXPECT_EQ(client.statusByte(), "00000000 000000AB ");
    nextClient();
}

TEST_F(Vxi11Fault, FillErrorsOverflowsTheErrorQueue)
{
    add("vxi11:fill-errors:nth=1");
    EXPECT_EQ(client.query("*ESE 123;*ESE?\n"), "123\n");
    EXPECT_EQ(ask("SYST:ERR:COUN?\n"), "30\n");
    nextClient();
}

TEST_F(Vxi11Fault, OnAllStrikesTheReplyToCreateLink)
{
    add("vxi11:cut=4:on=all:nth=1");
    RpcCaller core(port, "000607AF");
    core.send("0000000A", "00000001 00000000 00000000 00000005", "inst0");
    EXPECT_EQ(core.client().receiveAll().size(), 4u);
    nextClient();
}

namespace
{

/// A controller that listens to service requests.
class Vxi11SrqFault : public Vxi11Fault
{
protected:
    /// Service requests for two reasons; @p channel sees what comes.
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
    }
    static void expectRequest(PeerConnection &channel, const char *xid)
    {
        channel.expect(
            hex("80000030") + hex(xid) +
            hex("00000000 00000002 000607B1 00000001 0000001E 00000000 00000000 00000000 00000000 00000004") + "srq1");
    }
};

} // namespace

TEST_F(Vxi11SrqFault, WithholdSrqSaysNothing)
{
    add("vxi11:withhold-srq:nth=1");
    ScriptedPeer controller([](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        expectRequest(channel, "00000001"); // of the second reason
        channel.expectClosed();
    });
    request(controller);
    EXPECT_EQ(client.core.call("0000001A"), "00000000 ");
    nextClient();
}

TEST_F(Vxi11SrqFault, RepeatSrqSaysItTwice)
{
    add("vxi11:repeat-srq:nth=1");
    ScriptedPeer controller([](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        expectRequest(channel, "00000001");
        expectRequest(channel, "00000002");
        expectRequest(channel, "00000003"); // of the second reason
        channel.expectClosed();
    });
    request(controller);
    EXPECT_EQ(client.core.call("0000001A"), "00000000 ");
    nextClient();
}
