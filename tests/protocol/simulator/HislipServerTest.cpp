#include "protocol/simulator/SimulatorFixture.h"

using namespace test;
using namespace std::chrono_literals;

namespace
{

const char *const Identification = "Oltrava,KyVisaSimulator,100001,5.8.6\n";

class HislipServer : public SimulatorFixture
{
protected:
    std::uint16_t port = simulator.port("hislip");
    HislipClient client{port};
};

} // namespace

TEST_F(HislipServer, AnswersAQueryWithTheIdOfTheMessage)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.sync.send(message("4853 07 01 FFFFFF02", "*IDN?"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", Identification);
    client.sync.send(message("4853 07 01 FFFFFF04", "SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF04", "0,\"No error\"\n");
}

TEST_F(HislipServer, TakesAMessageInPieces)
{
    const std::string whole = message("4853 06 00 FFFFFF00", "*ID") + message("4853 06 00 FFFFFF02", "") +
                              message("4853 07 00 FFFFFF04", "N?");
    for (const char byte : whole)
        client.sync.send({&byte, 1});
    expectMessage(client.sync, "4853 07 00 FFFFFF04", Identification);
}

TEST_F(HislipServer, AcceptsTheEmptySubAddressAndEitherCase)
{
    HislipClient empty(port, "");
    HislipClient upper(port, "HISLIP0");
    HislipClient terminated(port, std::string_view("hislip0\0", 8));
}

TEST_F(HislipServer, RefusesAnotherSubAddressAtOnce)
{
    RawClient sync(port);
    sync.send(message("4853 00 00 0100 5A5A", "hislip1"));
    EXPECT_EQ(expectText(sync, "4853 02 03 00000000"), "there is no such sub-address");
    EXPECT_EQ(sync.receiveAll(), "");
}

TEST_F(HislipServer, GivesEachSessionAnIdOfItsOwn)
{
    RawClient first(port);
    RawClient second(port);
    first.send(message("4853 00 00 0100 5A5A"));
    second.send(message("4853 00 00 0100 5A5A"));
    const std::string one = first.receive(16);
    const std::string two = second.receive(16);
    EXPECT_NE(one.substr(6, 2), two.substr(6, 2));
    EXPECT_EQ(one.substr(0, 6), fromHex("4853 01 00 0100"));
    EXPECT_EQ(two.substr(0, 6), fromHex("4853 01 00 0100"));
}

TEST_F(HislipServer, SpeaksVersion1WithANewerClient)
{
    RawClient sync(port);
    sync.send(message("4853 00 00 0200 5A5A", "hislip0"));
    EXPECT_EQ(sync.receive(16).substr(0, 6), fromHex("4853 01 00 0100"));
}

TEST_F(HislipServer, AnswersTheMessageSizeAndKeepsToTheClients)
{
    client.async.send(message("4853 0F 00 00000000", fromHex("0000 0000 0000 0020")));
    expectMessage(client.async, "4853 10 00 00000000", fromHex("0000 0000 4001 0000"));
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
    expectMessage(client.sync, "4853 06 00 FFFFFF00", "Oltrava,KyVisaSi");
    expectMessage(client.sync, "4853 06 00 FFFFFF00", "mulator,100001,5");
    expectMessage(client.sync, "4853 07 00 FFFFFF00", ".8.6\n");
}

TEST_F(HislipServer, SendsABlockInMessagesThatTheClientTakes)
{
    std::string content(3'000'000, '\0');
    for (std::size_t i = 0; i < content.size(); ++i)
        content[i] = static_cast<char>(i * 31 + i / 1000);
    client.async.send(message("4853 0F 00 00000000", fromHex("0000 0000 0010 0000")));
    client.async.receive(24);
    client.sync.send(message("4853 07 00 FFFFFF00", "MMEM:DATA 'f',#73000000" + content));
    client.sync.send(message("4853 07 00 FFFFFF02", "MMEM:DATA? 'f'"));
    std::string response;
    for (int i = 0; i < 2; ++i) {
        const std::string part = expectText(client.sync, "4853 06 00 FFFFFF02");
        EXPECT_EQ(part.size(), 0x100000u - 16);
        response += part;
    }
    response += expectText(client.sync, "4853 07 00 FFFFFF02");
    EXPECT_TRUE(response == "#73000000" + content + "\n");
}

TEST_F(HislipServer, TellsMessageAvailableUntilItIsDelivered)
{
    client.async.send(message("4853 15 00 FFFFFEFE"));
    expectMessage(client.async, "4853 16 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.async.send(message("4853 15 00 FFFFFF00"));
    expectMessage(client.async, "4853 16 10 00000000");
    client.async.send(message("4853 15 01 FFFFFF00"));
    expectMessage(client.async, "4853 16 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF02", "*ESR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "128\n");
}

TEST_F(HislipServer, HidesMessageAvailableFromAQueryThatOvertookData)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.async.send(message("4853 15 00 FFFFFF02"));
    expectMessage(client.async, "4853 16 00 00000000");
}

TEST_F(HislipServer, KeepsMessageAvailableOfClientsApart)
{
    HislipClient other(port);
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    other.async.send(message("4853 15 00 FFFFFEFE"));
    expectMessage(other.async, "4853 16 00 00000000");
}

TEST_F(HislipServer, RequestsServiceOnceForOperationComplete)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*ESE 1;*SRE 32;*OPC\n"));
    expectMessage(client.async, "4853 14 60 00000000");
    client.async.send(message("4853 15 00 FFFFFF00"));
    expectMessage(client.async, "4853 16 60 00000000");
    client.async.send(message("4853 15 00 FFFFFF00"));
    expectMessage(client.async, "4853 16 20 00000000");
    client.sync.send(message("4853 07 00 FFFFFF02", "*OPC;*ESR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "129\n");
    client.sync.send(message("4853 07 01 FFFFFF04", "*OPC\n"));
    expectMessage(client.async, "4853 14 60 00000000");
}

TEST_F(HislipServer, RequestsServiceForAnAnswer)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*SRE 48;*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    expectMessage(client.async, "4853 14 50 00000000");
    client.async.send(message("4853 15 01 FFFFFF00"));
    expectMessage(client.async, "4853 16 00 00000000");
    EXPECT_TRUE(client.async.silentFor(50ms));
}

TEST_F(HislipServer, RequestsServiceWhenAnErrorIsQueuedByAnotherClient)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*SRE 4;*OPC?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
    EXPECT_EQ(ask("NONSENSE;*ESE?\n"), "0\n");
    expectMessage(client.async, "4853 14 54 00000000");
}

TEST_F(HislipServer, ReportsAnUnreadResponseInTheInstrumentAlone)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*CLS;*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.sync.send(message("4853 07 00 FFFFFF02", "SYST:ERR?;*ESR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "-410,\"Query INTERRUPTED\";4\n");
    EXPECT_TRUE(client.async.silentFor(50ms));
}

namespace
{

class HislipServerThatIgnoresUnread : public SimulatorFixture
{
protected:
    HislipServerThatIgnoresUnread() : SimulatorFixture({"--hislip", "0", "--socket", "0", "--hislip-ignore-unread"}) {}
};

} // namespace

TEST_F(HislipServerThatIgnoresUnread, TakesItThatTheClientNeverSaysWhatItHasRead)
{
    HislipClient client(simulator.port("hislip"));
    client.sync.send(message("4853 07 00 FFFFFF00", "*CLS;*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.sync.send(message("4853 07 00 FFFFFF02", "SYST:ERR?;*ESR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "0,\"No error\";0\n");
}

TEST_F(HislipServer, ReportsNothingWhenAStatusQueryDeliveredTheResponse)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*CLS;*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.async.send(message("4853 15 01 FFFFFF00"));
    expectMessage(client.async, "4853 16 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF02", "SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "0,\"No error\"\n");
}

TEST_F(HislipServer, InterruptsAResponseWhenTheNextMessageHasCome)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*CLS;*IDN?\n") + message("4853 07 00 FFFFFF02", "SYST:ERR?\n"));
    expectMessage(client.async, "4853 0E 00 FFFFFF02");
    expectMessage(client.sync, "4853 0D 00 FFFFFF02");
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "-410,\"Query INTERRUPTED\"\n");
}

TEST_F(HislipServer, InterruptsAResponseThatASlowOperationDelayed)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*CLS;SYST:DEL 0.2;*IDN?\n"));
    client.sync.send(message("4853 07 00 FFFFFF02", "SYST:ERR?\n"));
    expectMessage(client.async, "4853 0E 00 FFFFFF02");
    expectMessage(client.sync, "4853 0D 00 FFFFFF02");
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "-410,\"Query INTERRUPTED\"\n");
}

TEST_F(HislipServer, InterruptsAQueryInFrontOfMoreOfTheSameMessage)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n*OPC?\n"));
    expectMessage(client.async, "4853 0E 00 FFFFFF00");
    expectMessage(client.sync, "4853 0D 00 FFFFFF00");
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
}

TEST_F(HislipServer, ClearsInTheMiddleOfABlock)
{
    client.sync.send(message("4853 06 00 FFFFFF00", "*ESE 1;:MMEM:DATA 'f',#9000001000abc"));
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 00 00000000");
    client.sync.send(message("4853 06 00 FFFFFF02", "*ESE 2\n"));
    client.sync.send(message("4853 08 00 00000000"));
    expectMessage(client.sync, "4853 09 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*ESE?;:SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "1;0,\"No error\"\n");
}

TEST_F(HislipServer, ClearsInTheMiddleOfAMessageOnTheWire)
{
    const std::string half = message("4853 07 00 FFFFFF00", "*ESE 9;:MMEM:DATA 'f',#15ABCDE\n");
    client.sync.send(half.substr(0, half.size() - 4));
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 00 00000000");
    client.sync.send(half.substr(half.size() - 4) + message("4853 08 00 00000000"));
    expectMessage(client.sync, "4853 09 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*OPC?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
}

TEST_F(HislipServer, ClearsInTheMiddleOfASlowOperation)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "SYST:DEL 3600;*IDN?\n") +
                     message("4853 07 00 FFFFFF02", "*ESE 2\n"));
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 00 00000000");
    client.sync.send(message("4853 08 00 00000000"));
    expectMessage(client.sync, "4853 09 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*ESE?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "0\n");
}

TEST_F(HislipServer, ClearsAnAnswerThatIsBeingSent)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "MMEM:DATA 'f',#820000000" + std::string(20'000'000, 'x')));
    client.sync.send(message("4853 07 00 FFFFFF02", "MMEM:DATA? 'f'\n"));
    std::string part = expectText(client.sync, "4853 06 00 FFFFFF02");
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 00 00000000");
    client.sync.send(message("4853 08 00 00000000"));
    std::size_t drained = part.size();
    std::string header = client.sync.receive(16);
    while (header.substr(0, 3) == fromHex("4853 06") || header.substr(0, 3) == fromHex("4853 07")) {
        std::size_t length = 0;
        for (std::size_t i = 8; i < 16; ++i)
            length = length * 256 + static_cast<unsigned char>(header[i]);
        drained += client.sync.receive(length).size();
        header = client.sync.receive(16);
        if (header.size() < 16)
            break;
    }
    EXPECT_EQ(header, message("4853 09 00 00000000"));
    EXPECT_LT(drained, 20'000'000u) << "what was not sent yet was dropped";
    client.sync.send(message("4853 07 00 FFFFFF00", "*OPC?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
}

TEST_F(HislipServer, KeepsSettingsAcrossAClear)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*ESE 5;*SRE 3;:SOUR:VOLT 2\n"));
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 00 00000000");
    client.sync.send(message("4853 08 00 00000000"));
    expectMessage(client.sync, "4853 09 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*ESE?;*SRE?;:SOUR:VOLT?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "5;3;2.000000E+00\n");
}

TEST_F(HislipServer, Triggers)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "TRIG:SOUR BUS;:INIT\n"));
    client.sync.send(message("4853 0C 00 FFFFFF02"));
    client.sync.send(message("4853 07 00 FFFFFF04", "*WAI;:SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF04", "0,\"No error\"\n");
    client.sync.send(message("4853 0C 01 FFFFFF06"));
    client.sync.send(message("4853 07 00 FFFFFF08", "SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF08", "-211,\"Trigger ignored\"\n");
}

TEST_F(HislipServer, GoesRemoteAndLocal)
{
    EXPECT_EQ(ask("*RST;:SYST:VERS?\n"), "1999.0\n");
    const auto request = [&](const char *head) {
        client.async.send(message(head));
        expectMessage(client.async, "4853 0B 00 00000000");
    };
    const auto state = [&](const char *head) {
        client.sync.send(message(head, "SYST:REM?\n"));
        const std::string text = client.sync.receive(20);
        client.async.send(message(std::string("4853 15 01 ") + std::string(head).substr(11)));
        client.async.receive(16);
        return text.substr(16);
    };
    request("4853 0A 00 FFFFFEFE");
    EXPECT_EQ(state("4853 07 00 FFFFFF00"), "LOC\n") << "remote disabled: data does not make it remote";
    request("4853 0A 03 FFFFFF00");
    EXPECT_EQ(state("4853 07 00 FFFFFF02"), "REM\n");
    request("4853 0A 04 FFFFFF02");
    EXPECT_EQ(state("4853 07 00 FFFFFF04"), "RWL\n");
    request("4853 0A 02 FFFFFF04");
    EXPECT_EQ(state("4853 07 00 FFFFFF06"), "LOC\n");
    request("4853 0A 01 FFFFFF06");
    EXPECT_EQ(state("4853 07 00 FFFFFF08"), "REM\n") << "enabled: the query itself made it remote";
    request("4853 0A 05 FFFFFF08");
    EXPECT_EQ(state("4853 07 00 FFFFFF0A"), "RWL\n");
}

TEST_F(HislipServer, DefersGoingLocalUntilItsMessageHasCome)
{
    client.async.send(message("4853 0A 06 FFFFFF00"));
    EXPECT_TRUE(client.async.silentFor(50ms));
    client.sync.send(message("4853 07 00 FFFFFF00", "*ESE 1\n"));
    expectMessage(client.async, "4853 0B 00 00000000");
}

TEST_F(HislipServer, ServesFiftyClientsAtOnce)
{
    std::vector<std::unique_ptr<HislipClient>> clients;
    for (int i = 0; i < 50; ++i)
        clients.push_back(std::make_unique<HislipClient>(port));
    for (int round = 0; round < 20; ++round) {
        for (auto &each : clients)
            each->sync.send(message(round == 0 ? "4853 07 00 FFFFFF00" : "4853 07 01 FFFFFF00", "*IDN?\n"));
        for (auto &each : clients)
            expectMessage(each->sync, "4853 07 00 FFFFFF00", Identification);
    }
}

TEST_F(HislipServer, RefusesTheSixtyFifthClientAndTakesOneAgainWhenOneHasGone)
{
    std::vector<std::unique_ptr<HislipClient>> clients;
    for (int i = 0; i < 63; ++i)
        clients.push_back(std::make_unique<HislipClient>(port));
    RawClient tooMany(port);
    tooMany.send(message("4853 00 00 0100 5A5A", "hislip0"));
    EXPECT_EQ(expectText(tooMany, "4853 02 04 00000000"), "too many clients");
    EXPECT_EQ(tooMany.receiveAll(), "");

    clients.front()->async.close();
    EXPECT_EQ(clients.front()->sync.receiveAll(), "") << "both channels end together";
    clients.front()->sync.close();
    HislipClient again(port);
}
