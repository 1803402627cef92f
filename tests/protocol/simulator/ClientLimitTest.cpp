// What happens to others when somebody opens more connections than there is room for.
#include "protocol/simulator/SimulatorFixture.h"

using namespace test;
using namespace std::chrono_literals;

namespace
{

class ClientLimit : public SimulatorFixture
{
protected:
    ClientLimit()
        : SimulatorFixture({"--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0", "--max-clients", "3",
                            "--handshake-timeout", "3600"})
    {
    }

    std::uint16_t hislip = simulator.port("hislip");
    std::uint16_t socket = simulator.port("socket");
};

/// What begins and does not go on. None of it may keep others out.
std::vector<std::unique_ptr<RawClient>> flood(std::uint16_t port, std::string_view beginning)
{
    std::vector<std::unique_ptr<RawClient>> clients;
    for (int i = 0; i < 300; ++i) {
        clients.push_back(std::make_unique<RawClient>(port));
        clients.back()->trySend(beginning);
    }
    return clients;
}

} // namespace

TEST_F(ClientLimit, HalfOpenHislipConnectionsKeepNobodyOut)
{
    HislipClient before(hislip);
    for (const std::string &beginning : {std::string(), std::string("H"), message("4853 00 00 01005A5A", "hislip0"),
                                         std::string("GET / HTTP/1.1\r\n")}) {
        const auto flooding = flood(hislip, beginning);
        HislipClient client(hislip);
        client.sync.send(message("4853 07 00 FFFFFF00", "*OPC?\n"));
        expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
    }
    before.sync.send(message("4853 07 00 FFFFFF00", "*OPC?\n"));
    expectMessage(before.sync, "4853 07 00 FFFFFF00", "1\n");
}

TEST_F(ClientLimit, HislipClientsThatStandAreNotGivenUpForNewOnes)
{
    HislipClient one(hislip);
    HislipClient two(hislip);
    HislipClient three(hislip);
    RawClient tooMany(hislip);
    tooMany.send(message("4853 00 00 01005A5A", "hislip0"));
    EXPECT_EQ(expectText(tooMany, "4853 02 04 00000000"), "too many clients");
    for (HislipClient *each : {&one, &two, &three}) {
        each->sync.send(message("4853 07 00 FFFFFF00", "*OPC?\n"));
        expectMessage(each->sync, "4853 07 00 FFFFFF00", "1\n");
    }
}

TEST_F(ClientLimit, SilentSocketsKeepNobodyOut)
{
    RawClient before(socket);
    before.send("*OPC?\n");
    EXPECT_EQ(before.receiveLine(), "1\n");
    const auto flooding = flood(socket, "");
    EXPECT_EQ(ask("*IDN?\n").substr(0, 8), "Oltrava,");
    before.send("*OPC?\n");
    EXPECT_EQ(before.receiveLine(), "1\n") << "who has said something stays";
}

TEST_F(ClientLimit, SocketsThatHaveSaidAllAndDoNotReadKeepNobodyOut)
{
    const std::string size = "16000000"; // more than the system keeps for a client
    ask("MMEM:DATA \"b\",#8" + size + std::string(16'000'000, 'b') + ";*OPC?\n");
    std::vector<std::unique_ptr<RawClient>> clients;
    for (int i = 0; i < 3; ++i) {
        clients.push_back(std::make_unique<RawClient>(socket));
        clients.back()->send("MMEM:DATA? \"b\"\n");
        clients.back()->finishSending();
        EXPECT_EQ(clients.back()->receive(2), "#8");
    }
    EXPECT_EQ(ask("*OPC?\n"), "1\n");
}

TEST_F(ClientLimit, SocketsThatSpeakAreNotGivenUpForNewOnes)
{
    {
        std::vector<std::unique_ptr<RawClient>> clients;
        for (int i = 0; i < 3; ++i) {
            clients.push_back(std::make_unique<RawClient>(socket));
            clients.back()->send("*OPC?\n");
            EXPECT_EQ(clients.back()->receiveLine(), "1\n");
        }
        RawClient tooMany(socket);
        EXPECT_EQ(tooMany.receiveAll(), "");
        clients.front()->send("*OPC?\n");
        EXPECT_EQ(clients.front()->receiveLine(), "1\n");
        for (auto &each : clients) {
            each->finishSending();
            EXPECT_EQ(each->receiveAll(), "");
        }
    }
    EXPECT_EQ(ask("*OPC?\n"), "1\n") << "there is room again";
}
