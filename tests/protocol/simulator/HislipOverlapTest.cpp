// Overlapped mode of HiSLIP, by literal messages.
#include "protocol/simulator/SimulatorFixture.h"

using namespace test;
using namespace std::chrono_literals;

namespace
{

const char *const Identification = "Oltrava,KyVisaSimulator,100001,5.8.6\n";

class HislipOverlap : public SimulatorFixture
{
protected:
    HislipOverlap() : SimulatorFixture({"--hislip", "0", "--hislip-overlap", "--socket", "0"}) {}

    std::uint16_t port = simulator.port("hislip");
    HislipClient client{port, "hislip0", "4853 01 01 0100"};
};

class HislipModes : public SimulatorFixture
{
protected:
    /// Device clear in which the client wishes @p wish and is given @p mode.
    static void clear(HislipClient &client, const char *preferred, const char *wish, const char *mode)
    {
        client.async.send(message("4853 13 00 00000000"));
        expectMessage(client.async, preferred);
        client.sync.send(message(wish));
        expectMessage(client.sync, mode);
    }
};

} // namespace

TEST_F(HislipOverlap, CountsTheMessagesOfItsAnswersInOneRow)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.sync.send(message("4853 07 01 FFFFFF02", "*ESE 1\n") + message("4853 07 00 FFFFFF04", "*ESE?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "1\n");
    client.async.send(message("4853 0F 00 00000000", fromHex("0000 0000 0000 0020")));
    client.async.receive(24);
    client.sync.send(message("4853 07 01 FFFFFF06", "*IDN?\n"));
    expectMessage(client.sync, "4853 06 00 FFFFFF04", "Oltrava,KyVisaSi");
    expectMessage(client.sync, "4853 06 00 FFFFFF06", "mulator,100001,5");
    expectMessage(client.sync, "4853 07 00 FFFFFF08", ".8.6\n");
}

TEST_F(HislipOverlap, KeepsTheAnswersOfManyQueriesInOrder)
{
    std::string queries;
    for (int i = 0; i < 100; ++i)
        queries += message("4853 07 00 FFFFFF00", "*ESE " + std::to_string(i) + ";*ESE?\n");
    client.sync.send(queries);
    for (int i = 0; i < 100; ++i) {
        const std::string header = client.sync.receive(16);
        EXPECT_EQ(client.sync.receive(i < 10 ? 2 : 3), std::to_string(i) + "\n");
    }
    EXPECT_EQ(ask("SYST:ERR?\n"), "0,\"No error\"\n");
    EXPECT_TRUE(client.async.silentFor(50ms)) << "nothing is interrupted";
}

TEST_F(HislipOverlap, AnswersEachOfTwoProgramMessagesInOneDataEnd)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n*OPC?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "1\n");
    EXPECT_EQ(ask("SYST:ERR?\n"), "0,\"No error\"\n");
}

TEST_F(HislipOverlap, HoldsTheNextAnswerUntilALongOneIsSent)
{
    const std::string content(8'000'000, 'x');
    client.sync.send(message("4853 07 00 FFFFFF00", "MMEM:DATA 'f',#78000000" + content));
    client.sync.send(message("4853 07 00 FFFFFF02", "MMEM:DATA? 'f'\n") + message("4853 07 00 FFFFFF04", "*OPC?\n") +
                     message("4853 07 00 FFFFFF06", "MMEM:DATA? 'f';*ESE?\n"));
    std::string text;
    for (std::uint32_t id = 0xFFFFFF00u; text.size() < 16'000'024; id += 2) {
        const std::string header = client.sync.receive(16);
        ASSERT_EQ(header.size(), 16u);
        EXPECT_EQ(static_cast<unsigned char>(header[7]), id & 0xFF);
        std::size_t length = 0;
        for (std::size_t i = 8; i < 16; ++i)
            length = length * 256 + static_cast<unsigned char>(header[i]);
        text += client.sync.receive(length);
    }
    EXPECT_TRUE(text == "#78000000" + content + "\n1\n#78000000" + content + ";0\n");
}

TEST_F(HislipOverlap, TellsMessageAvailableUntilTheLastMessageIsNamed)
{
    client.async.send(message("4853 15 00 FFFFFEFE"));
    expectMessage(client.async, "4853 16 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n") + message("4853 07 00 FFFFFF02", "*ESE?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "0\n");
    client.async.send(message("4853 15 00 FFFFFEFE"));
    expectMessage(client.async, "4853 16 10 00000000");
    client.async.send(message("4853 15 01 FFFFFF00"));
    expectMessage(client.async, "4853 16 10 00000000");
    client.async.send(message("4853 15 01 FFFFFF02"));
    expectMessage(client.async, "4853 16 00 00000000");
}

TEST_F(HislipOverlap, TellsNoMessageAvailableWhileAClearForgetsTheUnread)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 01 00000000");
    client.async.send(message("4853 15 00 FFFFFEFE"));
    expectMessage(client.async, "4853 16 00 00000000");
}

TEST_F(HislipOverlap, RequestsServiceForEachAnswerThatAReadingClientGets)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*SRE 16;*ESE?\n"));
    for (const char *query : {"4853 07 01 FFFFFF02", "4853 07 01 FFFFFF04", "4853 07 01 FFFFFF06"}) {
        expectMessage(client.async, "4853 14 50 00000000");
        client.async.send(message("4853 15 00 FFFFFEFE"));
        expectMessage(client.async, "4853 16 50 00000000");
        EXPECT_EQ(client.sync.receive(18).substr(16), "0\n");
        client.sync.send(message(query, "*ESE?\n"));
    }
}

TEST_F(HislipOverlap, InterruptsNothingThatIsUnread)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "*CLS;*IDN?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    client.sync.send(message("4853 07 00 FFFFFF02", "SYST:ERR?;*ESR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "0,\"No error\";0\n");
}

TEST_F(HislipOverlap, ClearsAnswersThatWaitBehindOneAnother)
{
    const std::string content(20'000'000, 'x');
    client.sync.send(message("4853 07 00 FFFFFF00", "MMEM:DATA 'f',#820000000" + content));
    client.sync.send(message("4853 07 00 FFFFFF02", "MMEM:DATA? 'f'\n") + message("4853 07 00 FFFFFF04", "*IDN?\n"));
    expectText(client.sync, "4853 06 00 FFFFFF00");
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 01 00000000");
    client.sync.send(message("4853 08 01 00000000"));
    std::string header = client.sync.receive(16);
    std::size_t drained = 0;
    while (header.substr(0, 3) == fromHex("4853 06") || header.substr(0, 3) == fromHex("4853 07")) {
        std::size_t length = 0;
        for (std::size_t i = 8; i < 16; ++i)
            length = length * 256 + static_cast<unsigned char>(header[i]);
        drained += client.sync.receive(length).size();
        header = client.sync.receive(16);
    }
    EXPECT_EQ(header, message("4853 09 01 00000000"));
    EXPECT_LT(drained, content.size());
    client.sync.send(message("4853 07 00 FFFFFF00", "*OPC?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
}

TEST_F(HislipOverlap, TriggersAndReleasesLocksBehindTheirMessages)
{
    client.async.send(message("4853 04 01 00000000"));
    expectMessage(client.async, "4853 05 01 00000000");
    client.async.send(message("4853 04 00 FFFFFF04"));
    EXPECT_TRUE(client.async.silentFor(50ms));
    client.sync.send(message("4853 07 00 FFFFFF00", "TRIG:SOUR BUS;:INIT\n") + message("4853 0C 00 FFFFFF02") +
                     message("4853 07 00 FFFFFF04", "*WAI;:SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "0,\"No error\"\n");
    expectMessage(client.async, "4853 05 01 00000000");
}

TEST_F(HislipOverlap, SurvivesAClientThatAsksAndNeverReads)
{
    client.sync.send(message("4853 07 00 FFFFFF00", "MMEM:DATA 'f',#590000" + std::string(90'000, 'x')));
    std::string flood;
    for (int i = 0; i < 1000; ++i)
        flood += message("4853 07 00 FFFFFF02", "MMEM:DATA? 'f'\n");
    client.sync.send(flood);
    EXPECT_EQ(ask("*OPC?\n"), "1\n");
    client.async.send(message("4853 13 00 00000000"));
    expectMessage(client.async, "4853 17 01 00000000");
}

TEST_F(HislipModes, TheClientsWishInAClearDecides)
{
    HislipClient client(simulator.port("hislip"));
    clear(client, "4853 17 00 00000000", "4853 08 01 00000000", "4853 09 01 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n") + message("4853 07 00 FFFFFF02", "*ESE?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", Identification);
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "0\n");

    clear(client, "4853 17 00 00000000", "4853 08 00 00000000", "4853 09 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n") + message("4853 07 00 FFFFFF02", "*ESE?\n"));
    expectMessage(client.async, "4853 0E 00 FFFFFF02");
    expectMessage(client.sync, "4853 0D 00 FFFFFF02");
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "0\n");
}

TEST_F(HislipModes, GrantsNoFeatureThatItDoesNotHave)
{
    HislipClient client(simulator.port("hislip"));
    clear(client, "4853 17 00 00000000", "4853 08 FF 00000000", "4853 09 01 00000000");
    clear(client, "4853 17 00 00000000", "4853 08 FE 00000000", "4853 09 00 00000000");
}

TEST_F(HislipModes, ClientsOfBothModesShareOneInstrument)
{
    HislipClient overlapped(simulator.port("hislip"));
    HislipClient synchronized(simulator.port("hislip"));
    clear(overlapped, "4853 17 00 00000000", "4853 08 01 00000000", "4853 09 01 00000000");
    overlapped.sync.send(message("4853 07 00 FFFFFF00", "*ESE 7;*OPC?\n"));
    expectMessage(overlapped.sync, "4853 07 00 FFFFFF00", "1\n");
    synchronized.sync.send(message("4853 07 00 FFFFFF00", "*ESE?\n"));
    expectMessage(synchronized.sync, "4853 07 00 FFFFFF00", "7\n");
}
