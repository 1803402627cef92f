#include "protocol/simulator/SerialPort.h"
#include "protocol/simulator/SimulatorFixture.h"
#include "support/Stopwatch.h"

using namespace test;

namespace
{

/// TearDown() shows that the next client is served well, nextClient() that one of the port is.
class SerialFault : public SimulatorFixture
{
protected:
    SerialFault() : SimulatorFixture({"--socket", "0", "--serial"}) {}

    std::string nameOfPort() const
    {
        const std::string resource = simulator.resource("serial");
        return resource.substr(4, resource.size() - 11);
    }
    void add(const std::string &spec)
    {
        EXPECT_EQ(ask("DIAG:FAUL:ADD '" + spec + "';*OPC?\n"), "1\n");
        EXPECT_EQ(ask("SYST:ERR?\n"), "0,\"No error\"\n") << spec;
    }
    void nextClient()
    {
        client.close();
        SerialPort next(nameOfPort());
        next.send("*ESE 9;*ESE?\n");
        EXPECT_EQ(next.receive(2), "9\n");
    }

    SerialPort client{nameOfPort()};
};

} // namespace

TEST_F(SerialFault, DelayHoldsTheAnswerAndWhatIsBehindIt)
{
    add("serial:delay=0.3:nth=1");
    const Stopwatch watch;
    client.send("*ESE 5;*ESE?\n*ESE 6;*ESE?\n");
    EXPECT_EQ(client.receive(4), "5\n6\n");
    EXPECT_GE(watch.milliseconds(), 300);
    nextClient();
}

TEST_F(SerialFault, DelayedAnswerIsGoneWithItsClient)
{
    add("serial:delay=3600:nth=1");
    client.send("*ESE 5;*ESE?\n");
    EXPECT_EQ(client.receive(1, PortBrief), "");
    nextClient();
}

TEST_F(SerialFault, DropReplyLosesOneAnswer)
{
    add("serial:drop-reply:nth=1");
    client.send("*ESE 1;*ESE?\n*ESE 2;*ESE?\n");
    EXPECT_EQ(client.receive(2), "2\n");
    nextClient();
}

TEST_F(SerialFault, GarbageComesInsteadOfTheAnswer)
{
    add("serial:garbage=4:nth=1");
    client.send("*ESE 123;*ESE?\n*ESE 124;*ESE?\n");
    EXPECT_NE(client.receive(4), "123\n");
    EXPECT_EQ(client.receive(4), "124\n");
    nextClient();
}

TEST_F(SerialFault, ChangeByteInvertsTheLowestBitOfOneByte)
{
    add("serial:change-byte=2:nth=1");
    client.send("*ESE 123;*ESE?\n");
    EXPECT_EQ(client.receive(4), "122\n");
    nextClient();
}

TEST_F(SerialFault, NoEndLeavesOutTheLineFeed)
{
    add("serial:no-end:nth=1");
    client.send("*ESE 12;*ESE?\n*ESE 34;*ESE?\n");
    EXPECT_EQ(client.receive(5), "1234\n");
    nextClient();
}

TEST_F(SerialFault, FillErrorsOverflowsTheErrorQueue)
{
    add("serial:fill-errors:nth=1");
    client.send("*ESE 12;*ESE?\n");
    EXPECT_EQ(client.receive(3), "12\n");
    EXPECT_EQ(ask("SYST:ERR:COUN?\n"), "30\n");
    nextClient();
}
