// VXI-11 as an instrument: literal bytes over real sockets.
#include "protocol/simulator/Vxi11Client.h"

#include <gtest/gtest.h>

using namespace test;

namespace
{

using Vxi11Server = Vxi11Fixture;

const std::string Identification = "Oltrava,KyVisaSimulator,100001,5.8.6\n";

} // namespace

TEST_F(Vxi11Server, IdentifiesItself)
{
    RpcCaller core(port, "000607AF");
    std::string portWord = RpcCaller::digits(RpcCaller::word(port));
    EXPECT_EQ(core.call("0000000A", "00000001 00000000 00000000 00000005", "inst0"),
              "00000000 00000000 " + portWord + "00100000 ")
        << "error, link 0, abort port, 1 MiB";
    EXPECT_EQ(core.call("0000000B", "00000000 000007D0 00000000 00000008 00000006", "*IDN?\n"), "00000000 00000006 ");
    EXPECT_EQ(
        core.call("0000000C", "00000000 00000400 000007D0 00000000 00000000 00000000"),
        "00000000 00000004 00000025 4F6C7472 6176612C 4B795669 73615369 6D756C61 746F722C 31303030 30312C35 2E382E36 "
        "0A000000 ");
    EXPECT_EQ(core.call("00000017", "00000000"), "00000000 ");
    EXPECT_EQ(core.call("00000017", "00000000"), "00000004 ") << "destroyed already";
    EXPECT_EQ(core.call("0000000B", "00000000 000007D0 00000000 00000008 00000006", "*IDN?\n"), "00000004 00000000 ");
}

TEST_F(Vxi11Server, KnowsTwoNamesForItsOneDevice)
{
    RpcCaller core(port, "000607AF");
    EXPECT_EQ(core.call("0000000A", "00000001 00000000 00000000 00000005", "INST0").substr(0, 9), "00000000 ");
    EXPECT_EQ(core.call("0000000A", "00000001 00000000 00000000 00000000").substr(0, 9), "00000000 ");
    for (const char *name : {"inst1", "gpib0,5", "hislip0", "inst0 ", "inst"})
        EXPECT_EQ(core.call("0000000A", "00000001 00000000 00000000" + Vxi11Client::size(name), name),
                  "00000003 00000000 00000000 00000000 ")
            << name;
}

TEST_F(Vxi11Server, SaysWhyAReadEnded)
{
    Vxi11Client client(port);
    client.write("*IDN?\n");
    const auto read = [&](const char *sizeAndRest) { return client.core.call("0000000C", client.link + sizeAndRest); };
    EXPECT_EQ(read("00000000 00007530 00000000 00000000 00000000"), "00000000 00000001 00000000 ")
        << "nothing asked for";
    EXPECT_EQ(read("00000003 00007530 00000000 00000000 00000000"), "00000000 00000001 00000003 4F6C7400 ") << "count";
    EXPECT_EQ(read("00000400 00007530 00000000 00000080 0000002C"), "00000000 00000002 00000005 72617661 2C000000 ")
        << "character";
    EXPECT_EQ(read("00000002 00007530 00000000 00000080 00000079"), "00000000 00000003 00000002 4B790000 ")
        << "count and character";
    EXPECT_EQ(read("00000400 00007530 00000000 00000000 0000002C").substr(0, 27), "00000000 00000004 0000001B ")
        << "END; the character is not asked for";
    client.write("*OPC?\n");
    EXPECT_EQ(read("00000002 00007530 00000000 00000080 0000000A"), "00000000 00000007 00000002 310A0000 ")
        << "all at once: a length that is met exactly keeps its END";
}

TEST_F(Vxi11Server, GivesALongAnswerInPiecesAndNothingIsLost)
{
    Vxi11Client client(port);
    std::string content(3'000'001, '\0');
    for (std::size_t i = 0; i < content.size(); ++i)
        content[i] = static_cast<char>(i * 7 % 251);
    const std::string message = "MMEM:DATA 'f',#73000001" + content + "\n";
    constexpr std::size_t Piece = 1024 * 1024;
    for (std::size_t at = 0; at < message.size(); at += Piece) {
        const std::string_view piece = std::string_view(message).substr(at, Piece);
        const bool last = at + Piece >= message.size();
        ASSERT_EQ(client.write(piece, last ? "00000008" : "00000000"), "00000000 " + Vxi11Client::size(piece) + " ");
    }
    client.write("MMEM:DATA? 'f'\n");
    std::string answer;
    std::uint32_t reason = 0;
    int pieces = 0;
    while ((reason & 4) == 0 && pieces < 100) {
        client.core.send("0000000C", client.link + "7FFFFFFF 00007530 00000000 00000000 00000000");
        const std::string reply = client.core.reply();
        ASSERT_EQ(RpcCaller::number(reply.substr(24)), 0u);
        reason = RpcCaller::number(reply.substr(28));
        answer += reply.substr(36, RpcCaller::number(reply.substr(32)));
        ++pieces;
    }
    EXPECT_TRUE(answer == "#73000001" + content + "\n");
    EXPECT_GT(pieces, 1) << "reason 0: read again";
}

TEST_F(Vxi11Server, ReadWithoutAQueryTimesOutAndIsAQueryError)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.core.call("0000000C", client.link + "00000400 00000032 00000000 00000000 00000000"),
              "0000000F 00000000 00000000 ");
    EXPECT_EQ(client.query("SYST:ERR?\n"), "-420,\"Query UNTERMINATED\"\n");
    EXPECT_EQ(client.query("*ESR?\n"), "132\n") << "query error, and power on";
}

TEST_F(Vxi11Server, ReadInTheMiddleOfAMessageForgetsIt)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.write("*ID", "00000000"), "00000000 00000003 ");
    EXPECT_EQ(client.core.call("0000000C", client.link + "00000400 00000032 00000000 00000000 00000000"),
              "0000000F 00000000 00000000 ");
    EXPECT_EQ(client.query("SYST:ERR:ALL?\n"), "-420,\"Query UNTERMINATED\"\n");
}

TEST_F(Vxi11Server, NewMessageEndsAnUnreadAnswer)
{
    Vxi11Client client(port);
    client.write("*IDN?\n");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
    EXPECT_EQ(client.query("SYST:ERR:ALL?\n"), "-410,\"Query INTERRUPTED\"\n");
    client.write("*IDN?\n");
    client.core.call("0000000C", client.link + "00000003 00007530 00000000 00000000 00000000");
    EXPECT_EQ(client.query("SYST:ERR:ALL?\n"), "-410,\"Query INTERRUPTED\"\n") << "also what was read in part";
    client.write("*IDN?\n");
    EXPECT_EQ(client.generic("0000000E"), "00000000 ") << "a trigger as well";
    EXPECT_EQ(client.query("SYST:ERR?\n"), "-410,\"Query INTERRUPTED\"\n");
    EXPECT_EQ(client.query("SYST:ERR?\n"), "-211,\"Trigger ignored\"\n") << "nothing waited for it";
}

TEST_F(Vxi11Server, TwoMessagesInOneWriteAreTwoMessages)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.query("*IDN?\n*OPC?\n"), "1\n");
    EXPECT_EQ(client.query("SYST:ERR?\n"), "-410,\"Query INTERRUPTED\"\n");
}

TEST_F(Vxi11Server, EndTerminatesAMessageAndAWriteOfNothingDoesNothing)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.write("*ID", "00000000"), "00000000 00000003 ");
    EXPECT_EQ(client.write("", "00000008"), "00000000 00000000 ");
    EXPECT_EQ(client.query("N?"), Identification);
}

TEST_F(Vxi11Server, SerialPollShowsAnAnswerAndClearsOnlyTheRequest)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.statusByte(), "00000000 00000000 ");
    client.write("*SRE 16\n");
    client.write("*IDN?\n");
    EXPECT_EQ(client.statusByte(), "00000000 00000050 ");
    EXPECT_EQ(client.statusByte(), "00000000 00000010 ");
    EXPECT_EQ(client.answer(), Identification);
    EXPECT_EQ(client.statusByte(), "00000000 00000000 ");
}

TEST_F(Vxi11Server, AllLinksShareOneOutputQueueAndStatusByte)
{
    Vxi11Client writer(port);
    Vxi11Client reader(port);
    EXPECT_NE(writer.link, reader.link);
    writer.write("*SRE 16\n");
    writer.write("*IDN?\n");
    EXPECT_EQ(reader.statusByte(), "00000000 00000050 ");
    EXPECT_EQ(writer.statusByte(), "00000000 00000010 ") << "the other poll has cleared the request";
    EXPECT_EQ(reader.answer(), Identification);
    EXPECT_EQ(writer.statusByte(), "00000000 00000000 ");
}

TEST_F(Vxi11Server, WaitingReadGetsTheAnswerToAnotherLinksQuery)
{
    Vxi11Client reader(port);
    Vxi11Client writer(port);
    reader.core.send("0000000C", reader.link + "00000400 00007530 00000000 00000000 00000000");
    EXPECT_TRUE(reader.core.client().silentFor(std::chrono::milliseconds(50)));
    writer.write("*OPC?\n*IDN?\n");
    EXPECT_EQ(reader.core.results(), "00000000 00000004 00000002 310A0000 ") << "before the next message can end it";
    EXPECT_EQ(writer.answer(), Identification);
    EXPECT_EQ(writer.query("SYST:ERR:ALL?\n"), "-420,\"Query UNTERMINATED\"\n") << "of the early read alone";
}

TEST_F(Vxi11Server, WritesWhileACommandWaitsAndReadsWhatItGives)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.write("SYST:DEL 0.2;*OPC?\n"), "00000000 00000013 ");
    EXPECT_EQ(client.answer(), "1\n");
    EXPECT_EQ(client.write("SYST:DEL 0.2;"), "00000000 0000000D ") << "its END waits as well";
    EXPECT_EQ(client.query("*OPC?"), "1\n");
    EXPECT_EQ(client.query("SYST:ERR?\n"), "0,\"No error\"\n");
}

TEST_F(Vxi11Server, TakesWritesAndPollsWhileACommandWaits)
{
    Vxi11Client client(port);
    client.write("SYST:DEL 60\n");
    for (int i = 0; i < 3; ++i)
        EXPECT_EQ(client.core.call("0000000B", client.link + "00000000 00000000 00000008 00000006", "*OPC?\n"),
                  "00000000 00000006 ")
            << "without waiting: the I/O time-out is 0";
    EXPECT_EQ(client.statusByte(), "00000000 00000000 ");
    EXPECT_EQ(client.generic("0000000F"), "00000000 ");
    EXPECT_EQ(client.query("SYST:ERR:ALL?\n"), "0,\"No error\"\n") << "none of them was executed";
}

TEST_F(Vxi11Server, InputOfAWaitingCommandIsBounded)
{
    Vxi11Client client(port);
    client.write("SYST:DEL 60\n");
    const std::string filler(1024 * 1024 - 1, ' ');
    EXPECT_EQ(client.write(filler, "00000000"), "00000000 000FFFFF ");
    EXPECT_EQ(client.core.call("0000000B", client.link + "00000032 00000000 00000008 00000006", "*OPC?\n"),
              "0000000F 00000000 ")
        << "no room within 50 ms";
    EXPECT_EQ(client.core.call("0000000B", client.link + "00000000 00000000 00000008 00000006", "*OPC?\n"),
              "0000000F 00000000 ")
        << "time-out 0 does not wait";
    EXPECT_EQ(client.generic("0000000F"), "00000000 ") << "device clear";
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
}

TEST_F(Vxi11Server, DeviceClearDropsAnswerAndInput)
{
    Vxi11Client client(port);
    client.write("*IDN?\n");
    client.write("SYST:DEL 60;*IDN?\n");
    EXPECT_EQ(client.generic("0000000F"), "00000000 ");
    EXPECT_EQ(client.statusByte(), "00000000 00000004 ") << "no answer; the error queue stays";
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
    client.write("MMEM:DATA 'f',#800000100abc", "00000000");
    EXPECT_EQ(client.generic("0000000F"), "00000000 ") << "in the middle of a block";
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
}

TEST_F(Vxi11Server, RemoteAndLocal)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.query("SYST:REM?\n"), "REM\n");
    HislipClient hislip(simulator.port("hislip"));
    hislip.async.send(message("4853 0A 00 FFFFFEFE")); // disable remote: from now on nothing brings it back by itself
    expectMessage(hislip.async, "4853 0B 00 00000000");
    EXPECT_EQ(client.query("SYST:REM?\n"), "LOC\n");
    EXPECT_EQ(client.generic("00000010"), "00000000 ");
    EXPECT_EQ(client.query("SYST:REM?\n"), "REM\n");
    EXPECT_EQ(client.generic("00000011"), "00000000 ");
}

TEST_F(Vxi11Server, RefusesBusCommandsAsAnInstrumentMust)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.core.call("00000016",
                               client.link + "00000000 00007530 00000000 00020000 00000001 00000001 00000001", "?"),
              "00000008 00000000 ");
    EXPECT_EQ(client.core.call("00000016", "0000FFFF 00000000 00007530 00000000 00020010 00000001 00000000 00000000"),
              "00000004 00000000 ");
}

TEST_F(Vxi11Server, RefusesAWriteAboveItsReceiveSize)
{
    Vxi11Client client(port);
    EXPECT_EQ(client.write(std::string(1024 * 1024 + 1, 'x')), "00000005 00000000 ");
    EXPECT_EQ(client.query("SYST:ERR?\n"), "0,\"No error\"\n") << "nothing was taken";
}

TEST_F(Vxi11Server, AnswersInvalidLinkForWhatIsNotTheConnectionsOwn)
{
    Vxi11Client owner(port);
    RpcCaller other(port, "000607AF");
    const std::string generic = owner.link + "00000000 00000000 00007530";
    EXPECT_EQ(other.call("0000000B", owner.link + "00007530 00000000 00000008 00000000"), "00000004 00000000 ");
    EXPECT_EQ(other.call("0000000C", owner.link + "00000400 00007530 00000000 00000000 00000000"),
              "00000004 00000000 00000000 ");
    EXPECT_EQ(other.call("0000000D", generic), "00000004 00000000 ");
    for (const char *procedure : {"0000000E", "0000000F", "00000010", "00000011"})
        EXPECT_EQ(other.call(procedure, generic), "00000004 ") << procedure;
    EXPECT_EQ(other.call("00000012", owner.link + "00000000 00000000"), "00000004 ");
    EXPECT_EQ(other.call("00000013", owner.link), "00000004 ");
    EXPECT_EQ(other.call("00000014", owner.link + "00000001 00000000"), "00000004 ");
    EXPECT_EQ(other.call("00000017", owner.link), "00000004 ");
    EXPECT_EQ(owner.query("*OPC?\n"), "1\n");
}

TEST_F(Vxi11Server, AbortEndsTheCallThatWaitsOnItsLink)
{
    Vxi11Client client(port);
    client.core.send("0000000C", client.link + "00000400 00007530 00000000 00000000 00000000");
    EXPECT_TRUE(client.core.client().silentFor(std::chrono::milliseconds(50)));
    EXPECT_EQ(client.abort(), "00000000 ");
    EXPECT_EQ(client.core.results(), "00000017 00000000 00000000 ");
    EXPECT_EQ(client.abort(), "00000000 ") << "nothing to abort";
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
    EXPECT_EQ(RpcCaller(port, "000607B0").call("00000001", "7FFFFFFF"), "00000004 ");
}

TEST_F(Vxi11Server, EndsLinksAndLocksWithTheirConnection)
{
    std::string link;
    {
        Vxi11Client first(port);
        link = first.link;
        EXPECT_EQ(first.core.call("00000012", first.link + "00000000 00000000"), "00000000 ");
    }
    Vxi11Client second(port);
    EXPECT_EQ(second.core.call("00000012", second.link + "00000001 00007530"), "00000000 ")
        << "waits until that is noticed";
    EXPECT_EQ(RpcCaller(port, "000607B0").call("00000001", link), "00000004 ");
}

TEST_F(Vxi11Server, HoldsManyLinksAndThenSaysThatThereAreTooMany)
{
    RpcCaller core(port, "000607AF");
    for (int i = 0; i < 256; ++i)
        ASSERT_EQ(core.call("0000000A", "00000001 00000000 00000000 00000005", "inst0").substr(0, 9), "00000000 ") << i;
    EXPECT_EQ(core.call("0000000A", "00000001 00000000 00000000 00000005", "inst0"),
              "00000009 00000000 00000000 00000000 ");
    EXPECT_EQ(core.call("00000017", "00000000"), "00000000 ");
    EXPECT_EQ(core.call("0000000A", "00000001 00000000 00000000 00000005", "inst0").substr(0, 9), "00000000 ");
}

TEST_F(Vxi11Server, AnswersCallsThatCameTogetherInTheirOrder)
{
    Vxi11Client client(port);
    const std::string query = client.link + "00007530 00000000 00000008 00000006";
    client.core.send("0000000B", query, "*OPC?\n");
    client.core.send("0000000C", client.link + "00000400 00007530 00000000 00000000 00000000");
    client.core.send("0000000D", client.link + "00000000 00000000 00007530");
    EXPECT_EQ(client.core.results(), "00000000 00000006 ");
    EXPECT_EQ(client.core.results(), "00000000 00000004 00000002 310A0000 ");
    EXPECT_EQ(client.core.results(), "00000000 00000000 ");
}

TEST_F(Vxi11Server, RefusesCallsThatItDoesNotKnow)
{
    RpcCaller core(port, "000607AF");
    EXPECT_EQ(core.call("00000000"), "") << "procedure 0 does nothing";
    for (const char *procedure : {"00000001", "00000009", "00000015", "00000018", "0000001B", "FFFFFFFF"}) {
        core.send(procedure);
        EXPECT_EQ(RpcCaller::digits(core.reply()), "11223344 00000001 00000000 00000000 00000000 00000003 ")
            << procedure;
    }
    core.send("0000000A", "00000001 00000000 00000000 00000005", "inst0", "00000002");
    EXPECT_EQ(RpcCaller::digits(core.reply()),
              "11223344 00000001 00000000 00000000 00000000 00000002 00000001 00000001 ");
    RpcCaller other(port, "000607B1");
    other.send("0000001E", "00000000");
    EXPECT_EQ(RpcCaller::digits(other.reply()), "11223344 00000001 00000000 00000000 00000000 00000001 ");
}

TEST_F(Vxi11Server, CallsWithoutTheirArgumentsAreGarbageAndNoMore)
{
    Vxi11Client client(port);
    for (const char *procedure : {"0000000A", "0000000B", "0000000C", "0000000D", "0000000E", "0000000F", "00000010",
                                  "00000011", "00000012", "00000013", "00000014", "00000016", "00000017", "00000019"}) {
        client.core.send(procedure, "0000");
        EXPECT_EQ(RpcCaller::digits(client.core.reply()), "11223344 00000001 00000000 00000000 00000000 00000004 ")
            << procedure;
    }
    client.core.send("00000014", client.link + "00000001 00000029", std::string(41, 'h'));
    EXPECT_EQ(RpcCaller::digits(client.core.reply()), "11223344 00000001 00000000 00000000 00000000 00000004 ")
        << "a handle of 41 bytes";
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
}

TEST_F(Vxi11Server, HostileInputCostsTheSenderItsConnectionAndNobodyElseAnything)
{
    Vxi11Client bystander(port);
    for (const char *nonsense : {"FFFFFFFF", "80400001", "80000004 00000000", "47455420 2F204854 54502F31 2E310D0A",
                                 "80000018 00000001 00000001 00000000 00000000 00000000 00000000"}) {
        RawClient hostile(port);
        hostile.send(fromHex(nonsense));
        EXPECT_EQ(hostile.receiveAll(), "") << nonsense;
    }
    RawClient half(port);
    half.send(fromHex("80000040 00000001 0000"));
    RawClient gone(port);
    gone.send(fromHex("80000040 00000001 0000"));
    gone.close();
    EXPECT_EQ(bystander.query("*OPC?\n"), "1\n");
}

TEST_F(Vxi11Server, TakesNoMoreClientsThanItCanHold)
{
    std::vector<RpcCaller> clients;
    for (int i = 0; i < 64; ++i) {
        clients.emplace_back(port, "000607AF");
        ASSERT_EQ(clients.back().call("00000000"), "");
    }
    RawClient oneMore(port);
    EXPECT_EQ(oneMore.receiveAll(), "");
    EXPECT_EQ(clients.front().call("00000000"), "");
}

TEST_F(Vxi11Server, ClientThatClosesWhileItWaitsIsForgotten)
{
    {
        Vxi11Client reader(port);
        reader.core.send("0000000C", reader.link + "00000400 00007530 00000000 00000000 00000000");
    }
    Vxi11Client client(port);
    EXPECT_EQ(client.query("*CLS;*IDN?\n"), Identification);
}
