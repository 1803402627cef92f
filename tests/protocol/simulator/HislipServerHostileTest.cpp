#include "protocol/simulator/SimulatorFixture.h"

#include <functional>

using namespace test;
using namespace std::chrono_literals;

namespace
{

class HostileHislip : public SimulatorFixture
{
protected:
    HostileHislip() : SimulatorFixture({"--hislip", "0", "--socket", "0", "--max-message", "100000"}) {}

    std::uint16_t port = simulator.port("hislip");
};

} // namespace

TEST_F(HostileHislip, EndsBothChannelsOnAPoorlyFormedHeader)
{
    for (const bool onAsync : {false, true}) {
        HislipClient client(port);
        (onAsync ? client.async : client.sync).send(fromHex("5348 0700 FFFFFF00 0000000000000000"));
        EXPECT_EQ(expectText(client.sync, "4853 02 01 00000000"), "poorly formed message header");
        EXPECT_EQ(expectText(client.async, "4853 02 01 00000000"), "poorly formed message header");
        EXPECT_EQ(client.sync.receiveAll(), "");
        EXPECT_EQ(client.async.receiveAll(), "");
    }
}

TEST_F(HostileHislip, EndsAConnectionThatDoesNotIntroduceItself)
{
    const struct {
        std::string bytes;
        const char *answer;
    } rows[] = {
        {"GET / HTTP/1.1\r\n\r\n", "4853 02 01 00000000"},
        {message("4853 07 00 FFFFFF00", "*IDN?\n"), "4853 02 03 00000000"},
        {message("4853 11 00 00007777"), "4853 02 03 00000000"},
        {message("4853 11 00 00017777"), "4853 02 03 00000000"},
        {message("4853 00 00 01005A5A", std::string(300, 'h')), "4853 02 03 00000000"},
        {fromHex("4853 00 00 01005A5A FFFFFFFFFFFFFFFF"), "4853 02 03 00000000"},
    };
    for (const auto &row : rows) {
        RawClient client(port);
        client.send(row.bytes);
        expectText(client, row.answer);
        EXPECT_EQ(client.receiveAll(), "");
    }
}

TEST_F(HostileHislip, RefusesDataBeforeTheSecondConnection)
{
    RawClient sync(port);
    sync.send(message("4853 00 00 01005A5A", "hislip0"));
    sync.receive(16);
    sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
    expectText(sync, "4853 02 02 00000000");
    EXPECT_EQ(sync.receiveAll(), "");
}

TEST_F(HostileHislip, RefusesDataThatCameWithTheInitialization)
{
    RawClient sync(port);
    sync.send(message("4853 00 00 01005A5A", "hislip0") + message("4853 07 00 FFFFFF00", "*IDN?\n"));
    EXPECT_EQ(sync.receive(16).substr(0, 4), fromHex("4853 01 00"));
    expectText(sync, "4853 02 02 00000000");
    EXPECT_EQ(sync.receiveAll(), "");
}

TEST_F(HostileHislip, RefusesAThirdConnectionAndASecondInitialization)
{
    RawClient sync(port);
    sync.send(message("4853 00 00 01005A5A", "hislip0"));
    const std::string id = sync.receive(16).substr(6, 2);
    const std::string initialize = fromHex("4853 11 00 0000") + id + fromHex("0000000000000000");
    RawClient async(port);
    async.send(initialize);
    async.receive(16);
    RawClient third(port);
    third.send(initialize);
    expectText(third, "4853 02 03 00000000");
    sync.send(message("4853 00 00 01005A5A", "hislip0"));
    expectText(sync, "4853 02 03 00000000");
    expectText(async, "4853 02 03 00000000");
}

TEST_F(HostileHislip, AnswersAnErrorToWhatItDoesNotKnowAndGoesOn)
{
    HislipClient client(port);
    client.sync.send(message("4853 27 00 00000000", "payload"));
    expectText(client.sync, "4853 03 01 00000000");
    client.sync.send(message("4853 80 00 00000000", "payload"));
    expectText(client.sync, "4853 03 03 00000000");
    client.async.send(message("4853 1A 00 00000000"));
    expectText(client.async, "4853 03 01 00000000");
    client.async.send(message("4853 C8 00 00000000", "x"));
    expectText(client.async, "4853 03 03 00000000");
    client.async.send(message("4853 04 07 00000000"));
    expectText(client.async, "4853 03 02 00000000");
    client.async.send(message("4853 0A 07 FFFFFEFE"));
    expectText(client.async, "4853 03 02 00000000");
    client.async.send(message("4853 0F 00 00000000", std::string(1000, 'x')));
    expectText(client.async, "4853 03 04 00000000");
    client.sync.send(message("4853 08 00 00000000"));
    expectText(client.sync, "4853 03 00 00000000");
    client.sync.send(message("4853 07 00 FFFFFF00", "*OPC?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
}

TEST_F(HostileHislip, EndsWithAFatalErrorOfTheClientOnEitherChannel)
{
    for (const bool onAsync : {false, true}) {
        HislipClient client(port);
        client.async.send(message("4853 04 01 00000000"));
        expectMessage(client.async, "4853 05 01 00000000");
        (onAsync ? client.async : client.sync).send(message("4853 02 80 00000000", "out of paper"));
        EXPECT_EQ(client.sync.receiveAll(), "");
        EXPECT_EQ(client.async.receiveAll(), "");
        EXPECT_EQ(ask("*OPC?\n"), "1\n") << "its lock is free";
    }
}

TEST_F(HostileHislip, TakesAnErrorOfTheClientForWhatItIs)
{
    HislipClient client(port);
    for (RawClient *channel : {&client.sync, &client.async})
        channel->send(message("4853 03 01 00000000", "what was that?"));
    client.sync.send(message("4853 07 00 FFFFFF00", "SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "0,\"No error\"\n");
    EXPECT_TRUE(client.async.silentFor(50ms));
}

TEST_F(HostileHislip, RefusesAMessageSizeThatIsNoNumberOf8Bytes)
{
    HislipClient client(port);
    client.async.send(message("4853 0F 00 00000000", "1234567"));
    expectText(client.async, "4853 02 01 00000000");
    EXPECT_EQ(client.async.receiveAll(), "");
}

TEST_F(HostileHislip, DrainsAMessageThatIsTooLarge)
{
    HislipClient client(port);
    client.sync.send(message("4853 07 00 FFFFFF00", std::string(100'001, 'x')));
    EXPECT_EQ(expectText(client.sync, "4853 03 04 00000000"), "message too large");
    client.sync.send(message("4853 07 00 FFFFFF02", "SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF02", "0,\"No error\"\n");
}

TEST_F(HostileHislip, CountsAMessageThatIsTooLargeAsCome)
{
    HislipClient client(port);
    client.sync.send(message("4853 07 00 FFFFFF00", "*CLS;*OPC?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
    client.async.send(message("4853 04 01 00000000"));
    expectMessage(client.async, "4853 05 01 00000000");
    client.sync.send(message("4853 07 01 FFFFFF02", std::string(100'001, 'x')));
    expectText(client.sync, "4853 03 04 00000000");
    client.async.send(message("4853 04 00 FFFFFF02"));
    expectMessage(client.async, "4853 05 01 00000000");
    client.sync.send(message("4853 07 00 FFFFFF04", "SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF04", "0,\"No error\"\n");
}

TEST_F(HostileHislip, KeepsAFewServiceRequestsForAClientThatSleeps)
{
    HislipClient sleeping(port);
    sleeping.sync.send(message("4853 07 00 FFFFFF00", "*ESE 1;*SRE 32;*ESE?\n"));
    expectMessage(sleeping.sync, "4853 07 00 FFFFFF00", "1\n");
    RawClient busy(simulator.port("socket"));
    // 16 bytes each: four times what the connection itself holds.
    constexpr std::size_t Rounds = 200;
    constexpr std::size_t RequestsPerRound = 5000;
    std::string toggles;
    for (std::size_t i = 0; i < RequestsPerRound; ++i)
        toggles += "*OPC;*ESR?;";
    for (std::size_t i = 0; i < Rounds; ++i) {
        busy.send(toggles + "*CLS\n");
        busy.receive(2 * RequestsPerRound);
    }
    sleeping.sync.send(message("4853 07 01 FFFFFF02", "*SRE 0;*OPC?\n"));
    expectMessage(sleeping.sync, "4853 07 00 FFFFFF02", "1\n");
    sleeping.async.send(message("4853 15 01 FFFFFF02"));
    std::size_t requests = 0;
    std::string header = sleeping.async.receive(16);
    for (; header.starts_with("HS\x14"); header = sleeping.async.receive(16))
        ++requests;
    EXPECT_EQ(header, message("4853 16 00 00000000")) << "it can still talk";
    EXPECT_GT(requests, 0u);
    EXPECT_LT(requests, Rounds * RequestsPerRound / 2);
}

TEST_F(HostileHislip, StoresNoMoreOfEndlessDataThanItsLimit)
{
    HislipClient client(port);
    for (int i = 0; i < 50; ++i)
        client.sync.send(message("4853 06 00 FFFFFF00", std::string(50'000, 'x')));
    client.sync.send(message("4853 07 00 FFFFFF02", ";*OPC?\n"));
    client.sync.send(message("4853 07 00 FFFFFF04", "SYST:ERR?\n"));
    expectMessage(client.sync, "4853 07 00 FFFFFF04", "-363,\"Input buffer overrun\"\n");
}

TEST_F(HostileHislip, SurvivesAConnectionThatEndsAnywhere)
{
    const std::string conversation = message("4853 07 00 FFFFFF00", "*CLS;:MMEM:DATA 'f',#15abcde;:MMEM:DATA? 'f'\n");
    for (std::size_t at = 0; at <= conversation.size(); ++at) {
        HislipClient client(port);
        client.sync.send(std::string_view{conversation}.substr(0, at));
        (at % 2 == 0 ? client.sync : client.async).close();
    }
    RawClient half(port);
    half.send("HS");
    half.close();
}

TEST_F(HostileHislip, EndsAClientThatProvokesErrorsAndNeverReads)
{
    HislipClient client(port);
    std::string flood;
    for (int i = 0; i < 1000; ++i)
        flood += message("4853 27 00 00000000");
    constexpr std::size_t Rounds = 1000;
    for (std::size_t i = 0; i < Rounds && client.sync.trySend(flood); ++i)
        continue;
    // 16 bytes asked, more than 16 answered: less than that means that it gave up answering.
    EXPECT_LT(client.sync.receiveAll().size(), Rounds * flood.size());
    EXPECT_EQ(client.async.receiveAll(), "");
}

TEST_F(HostileHislip, SurvivesAClientThatAsksAndNeverReads)
{
    HislipClient client(port);
    client.sync.send(message("4853 07 00 FFFFFF00", "MMEM:DATA 'f',#590000" + std::string(90'000, 'x')));
    for (int i = 0; i < 2000; ++i)
        client.sync.send(message("4853 07 00 FFFFFF02", "MMEM:DATA? 'f'\n"));
    EXPECT_EQ(ask("*OPC?\n"), "1\n");
}

TEST_F(HostileHislip, AnswersOthersWhileOneFloods)
{
    HislipClient flooding(port);
    HislipClient client(port);
    std::string flood;
    for (int i = 0; i < 1000; ++i)
        flood += message("4853 07 00 FFFFFF00", "*ESE 1;*ESE 2;*ESE 3\n");
    for (int i = 0; i < 20; ++i) {
        flooding.sync.send(flood);
        client.sync.send(message(i == 0 ? "4853 07 00 FFFFFF00" : "4853 07 01 FFFFFF00", "*OPC?\n"));
        expectMessage(client.sync, "4853 07 00 FFFFFF00", "1\n");
    }
}
