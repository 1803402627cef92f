#include "protocol/simulator/SimulatorFixture.h"

using namespace test;
using namespace std::chrono_literals;

namespace
{

const char *const Identification = "Oltrava,KyVisaSimulator,100001,5.8.6\n";

class SocketServer : public SimulatorFixture
{
protected:
    std::uint16_t port = simulator.port("socket");
    RawClient client{port};
};

} // namespace

TEST_F(SocketServer, AnswersLines)
{
    client.send("*IDN?\n");
    EXPECT_EQ(client.receiveLine(), Identification);
    client.send("*IDN?\r\n*OPC?\n");
    EXPECT_EQ(client.receiveLine(), Identification);
    EXPECT_EQ(client.receiveLine(), "1\n");
}

TEST_F(SocketServer, AnswersOverIpv6ToThoseWhoResolveLocalhostThatWay)
{
    RawClient ipv6(port, true);
    ipv6.send("*IDN?\n");
    EXPECT_EQ(ipv6.receiveLine(), Identification);
}

TEST_F(SocketServer, KeepsUnreadAnswersAndReportsNoInterruption)
{
    client.send("*CLS\n*IDN?\n");
    client.send("*OPC?\n");
    client.send("SYST:ERR?\n");
    EXPECT_EQ(client.receiveLine(), Identification);
    EXPECT_EQ(client.receiveLine(), "1\n");
    EXPECT_EQ(client.receiveLine(), "0,\"No error\"\n");
}

TEST_F(SocketServer, TakesAMessageByteByByteAndFromTwoClientsAtOnce)
{
    RawClient other(port);
    const std::string message = ":MMEM:DATA 'f',#15a\nb\nc;:MMEM:DATA? 'f'\n";
    for (std::size_t i = 0; i < message.size(); ++i) {
        client.send(message.substr(i, 1));
        other.send(message.substr(message.size() - 1 - i, 0));
    }
    other.send("*OPC?\n");
    EXPECT_EQ(other.receiveLine(), "1\n");
    EXPECT_EQ(client.receive(9), "#15a\nb\nc\n");
}

TEST_F(SocketServer, AnswersAClientThatHasSaidAll)
{
    client.send("SYST:DEL 0.1;*IDN?\n*OPC?\n");
    client.finishSending();
    EXPECT_EQ(client.receiveAll(), std::string(Identification) + "1\n");
}

TEST_F(SocketServer, WritesAndReads64MiB)
{
    const std::size_t size = 64u << 20;
    std::string content(size, '\0');
    for (std::size_t i = 0; i < size; i += 4093)
        content[i] = static_cast<char>(i);
    client.send("MMEM:DATA 'f',#867108864" + content + "\n");
    client.send("MMEM:DATA? 'f'\n");
    EXPECT_EQ(client.receive(10), "#867108864");
    EXPECT_TRUE(client.receive(size) == content);
    EXPECT_EQ(client.receive(1), "\n");
}

TEST_F(SocketServer, HoldsOneClientAndNobodyElse)
{
    client.send("SYST:DEL 3600\n*IDN?\n");
    EXPECT_EQ(ask("*OPC?\n"), "1\n");
    EXPECT_TRUE(client.silentFor(20ms));
}

TEST_F(SocketServer, StopsReadingFromAClientThatDoesNotRead)
{
    client.send("MMEM:DATA 'f',#71000000" + std::string(1'000'000, 'x') + "\n");
    std::string asking;
    for (int i = 0; i < 300; ++i)
        asking += "MMEM:DATA? 'f'\n";
    client.send(asking);
    EXPECT_EQ(ask("*OPC?\n"), "1\n");
    for (int i = 0; i < 300; ++i)
        EXPECT_EQ(client.receive(1'000'010).size(), 1'000'010u);
}

TEST_F(SocketServer, SurvivesGarbage)
{
    std::string garbage;
    unsigned value = 12345;
    for (int i = 0; i < 300'000; ++i) {
        value = value * 1103515245 + 12345;
        garbage += static_cast<char>(value >> 16);
    }
    client.send(garbage);
    client.close();
    EXPECT_EQ(ask("*CLS;*OPC?\n"), "1\n");
}

TEST_F(SocketServer, ClosesWhatComesBeyondItsClients)
{
    std::vector<RawClient> clients;
    for (int i = 0; i < 63; ++i) {
        clients.emplace_back(port);
        clients.back().send("*OPC?\n");
        EXPECT_EQ(clients.back().receiveLine(), "1\n");
    }
    client.send("*OPC?\n");
    EXPECT_EQ(client.receiveLine(), "1\n");
    RawClient tooMany(port);
    EXPECT_EQ(tooMany.receiveAll(), "");
    for (RawClient &each : clients) {
        each.finishSending();
        EXPECT_EQ(each.receiveAll(), "");
    }
}
