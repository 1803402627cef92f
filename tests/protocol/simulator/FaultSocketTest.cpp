#include "protocol/simulator/SimulatorFixture.h"
#include "support/Stopwatch.h"

using namespace test;
using namespace std::chrono_literals;

namespace
{

/// TearDown() shows that the next client is served well.
class SocketFault : public SimulatorFixture
{
protected:
    void add(const char *spec) { client.send(std::string("DIAG:FAUL:ADD '") + spec + "'\n"); }

    RawClient client{simulator.port("socket")};
};

} // namespace

TEST_F(SocketFault, DelayHoldsTheAnswerAndWhatIsBehindIt)
{
    add("socket:delay=0.3:nth=1");
    const Stopwatch watch;
    client.send("*ESE 5;*ESE?\n*ESE 6;*ESE?\n");
    EXPECT_EQ(client.receiveLine(), "5\n");
    EXPECT_GE(watch.milliseconds(), 300);
    EXPECT_EQ(client.receiveLine(), "6\n");
}

TEST_F(SocketFault, DelayLeavesOthersTheirTurn)
{
    add("socket:delay=3600:nth=1");
    client.send("*ESE?\n");
    EXPECT_EQ(ask("*OPC?\n"), "1\n");
    EXPECT_TRUE(client.silentFor(50ms));
}

TEST_F(SocketFault, DropReplyLosesOneAnswer)
{
    add("socket:drop-reply:nth=2");
    client.send("*ESE 1;*ESE?\n*ESE 2;*ESE?\n*ESE 3;*ESE?\n");
    EXPECT_EQ(client.receiveLine(), "1\n");
    EXPECT_EQ(client.receiveLine(), "3\n");
}

TEST_F(SocketFault, CutSendsHalfOfTheAnswerAndCloses)
{
    add("socket:cut:nth=1");
    client.send("*ESE 123;*ESE?\n*ESE?\n");
    EXPECT_EQ(client.receiveAll(), "12");
}

TEST_F(SocketFault, CutSendsAsManyBytesAsAskedFor)
{
    add("socket:cut=3:nth=1");
    client.send("*ESE 123;*ESE?\n");
    EXPECT_EQ(client.receiveAll(), "123");
    RawClient next(simulator.port("socket"));
    next.send("DIAG:FAUL:ADD 'socket:cut=0:nth=1';*ESE?\n");
    EXPECT_EQ(next.receiveAll(), "");
}

TEST_F(SocketFault, CutReachesIntoABlock)
{
    const std::string block = "#3600" + std::string(600, 'x');
    client.send("MMEM:DATA 'a'," + block + "\n");
    add("socket:cut=305:nth=1");
    client.send("MMEM:DATA? 'a'\n");
    EXPECT_EQ(client.receiveAll(), "#3600" + std::string(300, 'x'));
}

TEST_F(SocketFault, GarbageComesInsteadOfTheAnswer)
{
    add("socket:garbage=5:nth=1");
    client.send("*ESE 123;*ESE?\n*ESE 124;*ESE?\n");
    EXPECT_NE(client.receive(5), "123\n1");
    EXPECT_EQ(client.receiveLine(), "124\n");
}

TEST_F(SocketFault, GarbageIsAsLongAsTheAnswer)
{
    add("socket:garbage:nth=1");
    client.send("*IDN?\n*ESE 124;*ESE?\n");
    const std::string truth = ask("*IDN?\n");
    EXPECT_NE(client.receive(truth.size()), truth);
    EXPECT_EQ(client.receiveLine(), "124\n");
}

TEST_F(SocketFault, ChangeByteInvertsTheLowestBitOfOneByte)
{
    add("socket:change-byte=1:nth=1");
    client.send("*ESE 123;*ESE?\n*ESE?\n");
    EXPECT_EQ(client.receiveLine(), "133\n");
    EXPECT_EQ(client.receiveLine(), "123\n");
}

TEST_F(SocketFault, ChangeByteLeavesTheStoredBlockAsItIs)
{
    client.send("MMEM:DATA 'a',#15aaaaa\n");
    add("socket:change-byte=5:nth=1");
    client.send("MMEM:DATA? 'a'\nMMEM:DATA? 'a'\n");
    EXPECT_EQ(client.receiveLine(), "#15aa`aa\n");
    EXPECT_EQ(client.receiveLine(), "#15aaaaa\n");
}

TEST_F(SocketFault, ChangeByteChoosesAPlaceWhenNoneIsGiven)
{
    const std::string truth = ask("*IDN?\n");
    add("socket:change-byte:nth=1");
    client.send("*IDN?\n");
    const std::string changed = client.receive(truth.size());
    int differences = 0;
    for (std::size_t i = 0; i < truth.size(); ++i)
        if (changed[i] != truth[i]) {
            ++differences;
            EXPECT_EQ(changed[i] ^ truth[i], 1);
        }
    EXPECT_EQ(differences, 1);
    EXPECT_EQ(changed.back(), '\n');
}

TEST_F(SocketFault, NoEndLeavesOutTheLineFeed)
{
    add("socket:no-end:nth=1");
    client.send("*ESE 12;*ESE?\n*ESE 34;*ESE?\n");
    EXPECT_EQ(client.receiveLine(), "1234\n");
}

TEST_F(SocketFault, FillErrorsOverflowsTheErrorQueue)
{
    add("socket:fill-errors:nth=1");
    client.send("*ESE 12;*ESE?\n");
    EXPECT_EQ(client.receiveLine(), "12\n");
    EXPECT_EQ(ask("SYST:ERR:COUN?\n"), "30\n");
    EXPECT_EQ(ask("SYST:ERR?\n"), "-310,\"System error\"\n");
}

TEST_F(SocketFault, AnyStrikesHereToo)
{
    add("any:drop-reply:nth=1");
    client.send("*ESE 1;*ESE?\n*ESE 2;*ESE?\n");
    EXPECT_EQ(client.receiveLine(), "2\n");
}

TEST_F(SocketFault, EndsWhenItIsDeleted)
{
    add("socket:drop-reply");
    client.send("*ESE 1;*ESE?\nDIAG:FAUL:DEL ALL\n*ESE 2;*ESE?\n");
    EXPECT_EQ(client.receiveLine(), "2\n");
}
