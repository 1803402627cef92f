// The LAN/GPIB gateway (VXI-11.2): literal bytes over real sockets.
#include "protocol/simulator/Vxi11Client.h"

#include <gtest/gtest.h>

using namespace test;

namespace
{

class Gateway : public Vxi11Fixture
{
protected:
    Gateway() : Vxi11Fixture({"--gpib"}) {}

    std::string createLink(std::string_view name)
    {
        return core.call("0000000A", "00000001 00000000 00000000" + Vxi11Client::size(name), name);
    }

    /// device_docmd on a link: error, then the data with their length. @p order: 1 for network order.
    static std::string command(Vxi11Client &client, std::string_view number, std::string_view elementSize,
                               std::string_view data, std::string_view order = "00000001")
    {
        const std::string bytes = fromHex(data);
        return client.core.call("00000016",
                                client.link + "00000000 00007530 00000000" + std::string(number) + std::string(order) +
                                    std::string(elementSize) + Vxi11Client::size(bytes),
                                bytes);
    }
    static std::string send(Vxi11Client &client, std::string_view bytes)
    {
        return command(client, "00020000", "00000001", bytes);
    }
    /// Bus status, the answer alone.
    static std::string status(Vxi11Client &client, std::string_view question)
    {
        const std::string result = command(client, "00020001", "00000002", question);
        EXPECT_EQ(result.substr(0, 18), "00000000 00000002 ") << question;
        return result.substr(18, 4);
    }
    /// A read that ends by its time-out of 50 ms.
    static std::string readInVain(Vxi11Client &client)
    {
        return client.core.call("0000000C", client.link + "00000400 00000032 00000000 00000000 00000000");
    }
    static std::string writeInVain(Vxi11Client &client, std::string_view data)
    {
        return client.core.call("0000000B", client.link + "00000032 00000000 00000008" + Vxi11Client::size(data), data);
    }

    RpcCaller core{port, "000607AF"};
};

const std::string TimedOut = "0000000F 00000000 00000000 ";
const std::string First = "Oltrava,KyVisaSimulator,100001,5.8.6\n";
const std::string Second = "Oltrava,KyVisaSimulator,100002,5.8.6\n";
const std::string Third = "Oltrava,KyVisaSimulator,100003,5.8.6\n";

} // namespace

TEST_F(Gateway, SaysWhichResourceReachesTheInstrumentOnTheBus)
{
    EXPECT_EQ(simulator.resource("gpib"), "TCPIP::127.0.0.1::gpib0,5::INSTR");
}

TEST_F(Gateway, TellsGoodNamesFromBadOnes)
{
    for (const char *name : {"inst0", "", "gpib0", "GPIB0", "gpib0,0", "gpib0,30", "gpib0,5", "gpib0,9,1", "gpib0,9,97",
                             "gpib0,9,0", "gpib0,9,30", "gpib0,9,126"})
        EXPECT_EQ(createLink(name).substr(0, 9), "00000000 ") << name;
    for (const char *name : {"gpib1", "gpib1,5", "gpi", "inst1", "hislip0", "gpib4294967295"})
        EXPECT_EQ(createLink(name), "00000003 00000000 00000000 00000000 ") << name << ": not accessible";
    for (const char *name : {"gpib0,31", "gpib0,255", "gpib0,5,31", "gpib0,5,95", "gpib0,5,127", "gpib0,4294967295"})
        EXPECT_EQ(createLink(name), "00000015 00000000 00000000 00000000 ") << name << ": invalid address";
    for (const char *name : {"gpib", "gpib,5", "gpib0,", "gpib0,5,", "gpib0,x", "gpib0,-1", "gpib0, 5", "gpib0,5,1,1",
                             "gpib0,99999999999999999999", "gpib0 "})
        EXPECT_EQ(createLink(name), "00000001 00000000 00000000 00000000 ") << name << ": syntax";
}

TEST_F(Gateway, TakesNoNameOfAnyLength)
{
    const auto link = [&](const std::string &device) {
        return core.call("0000000A", "00000001 00000000 00000000" + Vxi11Client::size(device), device).substr(0, 8);
    };
    EXPECT_EQ(link("gpib" + std::string(58, '0') + ",5"), "00000000");
    EXPECT_EQ(link("gpib" + std::string(59, '0') + ",5"), "00000001");
    EXPECT_EQ(link("gpib" + std::string(1000000, '0') + ",5"), "00000001");
}

TEST_F(Gateway, ReachesInstrumentsByTheirAddresses)
{
    EXPECT_EQ(Vxi11Client(port, "gpib0,5").query("*IDN?\n"), First);
    EXPECT_EQ(Vxi11Client(port, "gpib0,7").query("*IDN?\n"), Second);
    EXPECT_EQ(Vxi11Client(port, "gpib0,9,1").query("*IDN?\n"), Third);
    EXPECT_EQ(Vxi11Client(port, "gpib0,9,97").query("*IDN?\n"), Third) << "the secondary address as on the bus";
}

TEST_F(Gateway, HasTheSameInstrumentAsOtherProtocolsAtAddress5AndOthersElsewhere)
{
    Vxi11Client first(port, "gpib0,5");
    Vxi11Client second(port, "gpib0,7");
    first.write("SOUR:VOLT 12.5\n");
    EXPECT_EQ(ask("SOUR:VOLT?\n"), "1.250000E+01\n") << "over the raw socket";
    EXPECT_EQ(Vxi11Client(port).query("SOUR:VOLT?\n"), "1.250000E+01\n");
    EXPECT_EQ(second.query("SOUR:VOLT?\n"), "0.000000E+00\n");
    second.write("nonsense\n");
    EXPECT_EQ(first.query("SYST:ERR:COUN?\n"), "0\n");
    EXPECT_EQ(second.query("SYST:ERR:COUN?\n"), "1\n");
    first.write("*IDN?\n");
    EXPECT_EQ(Vxi11Client(port).query("*OPC?\n"), "1\n") << "inst0 has an output queue of its own";
    EXPECT_EQ(first.answer(), First);
}

TEST_F(Gateway, FindsNobodyAtAnEmptyAddress)
{
    Vxi11Client nobody(port, "gpib0,8");
    EXPECT_EQ(writeInVain(nobody, "*IDN?\n"), "0000000F 00000000 ") << "I/O time-out, nothing written";
    EXPECT_EQ(readInVain(nobody), TimedOut);
    EXPECT_EQ(nobody.statusByte(), "00000000 00000000 ");
    EXPECT_EQ(nobody.generic("0000000E"), "00000000 ") << "a trigger for nobody is sent all the same";
    EXPECT_EQ(nobody.generic("0000000F"), "00000000 ");
    EXPECT_EQ(nobody.write(""), "00000000 00000000 ") << "nothing to write";
    for (const char *name : {"gpib0,9", "gpib0,9,2", "gpib0,5,1", "gpib0,21"}) {
        Vxi11Client other(port, name);
        EXPECT_EQ(readInVain(other), TimedOut) << name;
        EXPECT_EQ(writeInVain(other, "x\n"),
                  name == std::string_view("gpib0,5,1") ? "00000000 00000002 " : "0000000F 00000000 ")
            << name << ": an instrument without a secondary address does not look at one";
    }
}

TEST_F(Gateway, HasAPlotterThatNeverAnswers)
{
    Vxi11Client plotter(port, "gpib0,12");
    EXPECT_EQ(plotter.write("*IDN?\n"), "00000000 00000006 ");
    EXPECT_EQ(readInVain(plotter), TimedOut);
    EXPECT_EQ(plotter.statusByte(), "00000000 00000000 ");
}

TEST_F(Gateway, ReadWithoutAQueryIsAQueryErrorOfThatInstrumentAlone)
{
    Vxi11Client second(port, "gpib0,7");
    EXPECT_EQ(readInVain(second), TimedOut);
    EXPECT_EQ(second.query("SYST:ERR?\n"), "-420,\"Query UNTERMINATED\"\n");
    EXPECT_EQ(Vxi11Client(port, "gpib0,5").query("SYST:ERR?\n"), "0,\"No error\"\n");
}

TEST_F(Gateway, PollsAddressesSerially)
{
    Vxi11Client second(port, "gpib0,7");
    second.write("*SRE 16\n");
    second.write("*IDN?\n");
    EXPECT_EQ(Vxi11Client(port, "gpib0,5").statusByte(), "00000000 00000000 ");
    EXPECT_EQ(second.statusByte(), "00000000 00000050 ") << "message available, and it requests service";
    EXPECT_EQ(second.statusByte(), "00000000 00000010 ") << "the poll has answered the request";
    EXPECT_EQ(second.answer(), Second);
    EXPECT_EQ(second.statusByte(), "00000000 00000000 ");
}

TEST_F(Gateway, ClearsOneAddressOrAll)
{
    Vxi11Client first(port, "gpib0,5");
    Vxi11Client second(port, "gpib0,7");
    Vxi11Client bus(port, "gpib0");
    first.write("*IDN?\n");
    second.write("*IDN?\n");
    EXPECT_EQ(second.generic("0000000F"), "00000000 ");
    EXPECT_EQ(second.statusByte(), "00000000 00000000 ");
    EXPECT_EQ(first.statusByte(), "00000000 00000010 ");
    second.write("*IDN?\n");
    EXPECT_EQ(bus.generic("0000000F"), "00000000 ") << "DCL";
    EXPECT_EQ(first.statusByte(), "00000000 00000000 ");
    EXPECT_EQ(second.statusByte(), "00000000 00000000 ");
}

TEST_F(Gateway, TriggersOneAddressOrAGroup)
{
    Vxi11Client first(port, "gpib0,5");
    Vxi11Client second(port, "gpib0,7");
    Vxi11Client bus(port, "gpib0");
    for (Vxi11Client *each : {&first, &second}) {
        each->write("*CLS;TRIG:SOUR BUS;:INIT\n");
        EXPECT_EQ(each->query("STAT:OPER:COND?\n"), "32\n") << "waits for a trigger";
    }
    EXPECT_EQ(second.generic("0000000E"), "00000000 ");
    EXPECT_EQ(first.query("STAT:OPER:COND?\n"), "32\n");
    EXPECT_EQ(second.query("*OPC?;SYST:ERR:COUN?\n"), "1;0\n") << "it has ended";
    second.write("INIT\n");
    EXPECT_EQ(send(bus, "3F 25 27"), "00000000 00000003 3F252700 ");
    EXPECT_EQ(bus.generic("0000000E"), "00000000 ") << "GET to those that listen";
    EXPECT_EQ(first.query("*OPC?;SYST:ERR:COUN?\n"), "1;0\n");
    EXPECT_EQ(second.query("*OPC?;SYST:ERR:COUN?\n"), "1;0\n");
    EXPECT_EQ(send(bus, "3F 25 27 08"), "00000000 00000004 3F252708 ") << "GET as a command";
    EXPECT_EQ(first.query("SYST:ERR?\n"), "-211,\"Trigger ignored\"\n");
    EXPECT_EQ(second.query("SYST:ERR?\n"), "-211,\"Trigger ignored\"\n");
}

TEST_F(Gateway, TriggerKeepsItsPlaceBehindInputThatWaits)
{
    Vxi11Client second(port, "gpib0,7");
    second.write("TRIG:SOUR BUS\n");
    second.write("SYST:DEL 0.2;:INIT\n");
    EXPECT_EQ(second.generic("0000000E"), "00000000 ") << "taken";
    EXPECT_EQ(second.query("*OPC?\n"), "1\n");
    EXPECT_EQ(second.query("SYST:ERR?\n"), "0,\"No error\"\n") << "it came when something waited for it";
}

TEST_F(Gateway, MakesInstrumentsRemoteAndLocalOneByOne)
{
    Vxi11Client first(port, "gpib0,5");
    Vxi11Client second(port, "gpib0,7");
    Vxi11Client bus(port, "gpib0");
    EXPECT_EQ(first.query("SYST:REM?\n"), "REM\n") << "addressed to listen, and REN is true";
    EXPECT_EQ(second.query("SYST:REM?\n"), "REM\n");
    EXPECT_EQ(send(bus, "11"), "00000000 00000001 11000000 ") << "local lockout";
    EXPECT_EQ(first.query("SYST:REM?\n"), "RWL\n");
    EXPECT_EQ(second.query("SYST:REM?\n"), "RWL\n");
    EXPECT_EQ(second.generic("00000011"), "00000000 ") << "GTL";
    EXPECT_EQ(second.statusByte(), "00000000 00000000 ") << "a poll addresses nobody to listen";
    EXPECT_EQ(command(bus, "00020003", "00000002", "0000"), "00000000 00000002 00000000 ") << "REN false";
    EXPECT_EQ(first.query("SYST:REM?\n"), "LOC\n");
    EXPECT_EQ(first.generic("00000010"), "00000000 ") << "remote: REN true";
    EXPECT_EQ(status(bus, "0001"), "0001");
    EXPECT_EQ(first.query("SYST:REM?\n"), "REM\n");
    EXPECT_EQ(bus.generic("00000011"), "00000000 ") << "local of the interface: REN false";
    EXPECT_EQ(status(bus, "0001"), "0000");
    EXPECT_EQ(second.query("SYST:REM?\n"), "LOC\n");
    EXPECT_EQ(bus.generic("00000010"), "00000000 ");
    EXPECT_EQ(status(bus, "0001"), "0001");
}

TEST_F(Gateway, AnswersTheEightQuestionsAboutTheBus)
{
    Vxi11Client bus(port, "gpib0");
    Vxi11Client second(port, "gpib0,7");
    EXPECT_EQ(status(bus, "0001"), "0001") << "REN";
    EXPECT_EQ(status(bus, "0002"), "0000") << "SRQ";
    EXPECT_EQ(status(bus, "0003"), "0000") << "NDAC: nobody listens";
    EXPECT_EQ(status(bus, "0004"), "0001") << "system controller";
    EXPECT_EQ(status(bus, "0005"), "0001") << "controller in charge";
    EXPECT_EQ(status(bus, "0006"), "0000") << "addressed to talk";
    EXPECT_EQ(status(bus, "0007"), "0000") << "addressed to listen";
    EXPECT_EQ(status(bus, "0008"), "0015") << "address 21";
    second.write("*SRE 16\n");
    second.write("*IDN?\n");
    EXPECT_EQ(status(bus, "0002"), "0001") << "somebody requests service";
    EXPECT_EQ(second.statusByte(), "00000000 00000050 ");
    EXPECT_EQ(status(bus, "0002"), "0000");
    send(bus, "3F 55");
    EXPECT_EQ(status(bus, "0006"), "0001");
    EXPECT_EQ(status(bus, "0007"), "0000");
    send(bus, "35 47");
    EXPECT_EQ(status(bus, "0006"), "0000");
    EXPECT_EQ(status(bus, "0007"), "0001");
    for (const char *question : {"0000", "0009", "FFFF"})
        EXPECT_EQ(command(bus, "00020001", "00000002", question), "00000005 00000000 ") << question;
}

TEST_F(Gateway, ShowsByNdacWhetherAListenerIsThere)
{
    Vxi11Client bus(port, "gpib0");
    const auto listens = [&](const char *address) {
        send(bus, "3F " + std::string(address));
        EXPECT_EQ(status(bus, "0003"), "0001") << "with ATN everybody listens";
        EXPECT_EQ(command(bus, "00020002", "00000002", "0000"), "00000000 00000002 00000000 ");
        return status(bus, "0003");
    };
    EXPECT_EQ(listens("25"), "0001");
    EXPECT_EQ(listens("27"), "0001");
    EXPECT_EQ(listens("2C"), "0001") << "the plotter";
    EXPECT_EQ(listens("28"), "0000");
    EXPECT_EQ(listens("29"), "0000") << "its secondary address is missing";
    EXPECT_EQ(listens("29 61"), "0001");
    EXPECT_EQ(listens("29 62"), "0000");
}

TEST_F(Gateway, HonoursBothByteOrders)
{
    Vxi11Client bus(port, "gpib0");
    EXPECT_EQ(command(bus, "00020001", "00000002", "0800", "00000000"), "00000000 00000002 15000000 ");
    EXPECT_EQ(command(bus, "00020001", "00000002", "0008", "00000000"), "00000005 00000000 ") << "question 2048";
    EXPECT_EQ(command(bus, "0002000A", "00000004", "0300 0000", "00000000"), "00000000 00000004 03000000 ");
    EXPECT_EQ(command(bus, "00020001", "00000002", "0008"), "00000000 00000002 00030000 ");
    EXPECT_EQ(command(bus, "0002000A", "00000004", "0000 0004"), "00000000 00000004 00000004 ");
    EXPECT_EQ(command(bus, "00020001", "00000002", "0008"), "00000000 00000002 00040000 ");
    EXPECT_EQ(command(bus, "00020003", "00000002", "0100", "00000000"), "00000000 00000002 01000000 ");
    EXPECT_EQ(status(bus, "0001"), "0001");
}

TEST_F(Gateway, RefusesDataThatACommandDoesNotHave)
{
    Vxi11Client bus(port, "gpib0");
    const auto refused = [&](const char *number, const char *size, const std::string &data) {
        EXPECT_EQ(command(bus, number, size, data), "00000005 00000000 ") << number << " " << data;
    };
    for (const char *number : {"00020001", "00020002", "00020003"}) {
        refused(number, "00000002", "");
        refused(number, "00000002", "01");
        refused(number, "00000002", "0000 0001");
        refused(number, "00000001", "0001");
    }
    for (const char *number : {"00020004", "0002000A"}) {
        refused(number, "00000004", "");
        refused(number, "00000004", "0001");
        refused(number, "00000004", "0000 0000 01");
        refused(number, "00000002", "0000 0001");
        refused(number, "00000004", "0000 001F");
        refused(number, "00000004", "FFFF FFFF");
    }
    std::string many;
    for (int i = 0; i < 128; ++i)
        many += "3F";
    EXPECT_EQ(send(bus, many).substr(0, 18), "00000000 00000080 ") << "128 bytes";
    refused("00020000", "00000001", many + "3F");
    refused("00020000", "00000002", "3F25");
    refused("00020010", "00000001", "00");
    EXPECT_EQ(send(bus, ""), "00000000 00000000 ") << "no command is one too";
    for (const char *number : {"00000000", "00020005", "0002000B", "FFFFFFFF"})
        EXPECT_EQ(command(bus, number, "00000001", ""), "00000008 00000000 ") << number;
    EXPECT_EQ(status(bus, "0008"), "0015") << "nothing has changed";
}

TEST_F(Gateway, TakesBusCommandsOnTheInterfaceAlone)
{
    Vxi11Client first(port, "gpib0,5");
    Vxi11Client instrument(port, "inst0");
    EXPECT_EQ(send(first, "3F"), "00000008 00000000 ");
    EXPECT_EQ(send(instrument, "3F"), "00000008 00000000 ");
    instrument.link = "00001234";
    EXPECT_EQ(send(instrument, "3F"), "00000004 00000000 ");
}

TEST_F(Gateway, CarriesDataBetweenThoseThatTheClientHasAddressed)
{
    Vxi11Client bus(port, "gpib0");
    EXPECT_EQ(bus.write("*IDN?\n"), "00000011 00000000 ") << "the interface is not addressed to talk";
    EXPECT_EQ(bus.core.call("0000000C", bus.link + "00000400 00007530 00000000 00000000 00000000"),
              "00000011 00000000 00000000 ");
    send(bus, "3F 55 27");
    EXPECT_EQ(bus.write("*IDN?\n"), "00000000 00000006 ");
    send(bus, "3F 35 47");
    EXPECT_EQ(bus.answer(), Second);
    send(bus, "3F 55 25 27 29 61");
    EXPECT_EQ(bus.write("SOUR:VOLT 3\n"), "00000000 0000000C ") << "to three at once";
    for (const char *name : {"gpib0,5", "gpib0,7", "gpib0,9,1"})
        EXPECT_EQ(Vxi11Client(port, name).query("SOUR:VOLT?\n"), "3.000000E+00\n") << name;
    send(bus, "3F 55");
    EXPECT_EQ(writeInVain(bus, "x\n"), "0000000F 00000000 ") << "nobody listens";
}

TEST_F(Gateway, GivesTheStatusByteToWhoeverPollsByHand)
{
    Vxi11Client bus(port, "gpib0");
    Vxi11Client second(port, "gpib0,7");
    second.write("*SRE 16\n");
    second.write("*IDN?\n");
    send(bus, "3F 35 18 47");
    EXPECT_EQ(bus.core.call("0000000C", bus.link + "00000001 00007530 00000000 00000000 00000000"),
              "00000000 00000001 00000001 50000000 ");
    EXPECT_EQ(status(bus, "0002"), "0000");
    send(bus, "19 5F");
    send(bus, "3F 35 47");
    EXPECT_EQ(bus.answer(), Second);
}

TEST_F(Gateway, LetsOneInstrumentTalkToAnother)
{
    Vxi11Client bus(port, "gpib0");
    Vxi11Client second(port, "gpib0,7");
    second.write("SYST:ERR?\n"); // its answer is no command
    send(bus, "3F 47 29 61");
    EXPECT_EQ(command(bus, "00020002", "00000002", "0000"), "00000000 00000002 00000000 ");
    Vxi11Client third(port, "gpib0,9,1");
    EXPECT_EQ(third.query("SYST:ERR?\n").substr(0, 4), "-102") << "it has understood that as a message";
    EXPECT_EQ(second.statusByte(), "00000000 00000000 ") << "and the answer is gone";
}

TEST_F(Gateway, LosesControlWhenItPassesItAndTakesItBackByIfc)
{
    Vxi11Client bus(port, "gpib0");
    Vxi11Client first(port, "gpib0,5");
    EXPECT_EQ(command(bus, "00020004", "00000004", "0000 0015"), "00000000 00000004 00000015 ") << "to itself";
    EXPECT_EQ(status(bus, "0005"), "0001");
    EXPECT_EQ(command(bus, "00020004", "00000004", "0000 0007"), "00000000 00000004 00000007 ");
    EXPECT_EQ(status(bus, "0005"), "0000");
    EXPECT_EQ(status(bus, "0004"), "0001");
    EXPECT_EQ(send(bus, "3F"), "00000011 00000000 ");
    EXPECT_EQ(command(bus, "00020002", "00000002", "0001"), "00000011 00000000 ");
    EXPECT_EQ(command(bus, "00020004", "00000004", "0000 0007"), "00000011 00000000 ");
    EXPECT_EQ(first.write("*IDN?\n"), "00000011 00000000 ");
    EXPECT_EQ(first.core.call("0000000C", first.link + "00000400 00007530 00000000 00000000 00000000"),
              "00000011 00000000 00000000 ");
    EXPECT_EQ(first.statusByte(), "00000011 00000000 ");
    for (const char *procedure : {"0000000E", "0000000F", "00000010", "00000011"})
        EXPECT_EQ(first.generic(procedure), "00000011 ") << procedure;
    EXPECT_EQ(command(bus, "00020003", "00000002", "0001").substr(0, 9), "00000000 ")
        << "REN is the system controller's";
    EXPECT_EQ(command(bus, "00020010", "00000001", ""), "00000000 00000000 ") << "IFC";
    EXPECT_EQ(status(bus, "0005"), "0001");
    EXPECT_EQ(first.query("*IDN?\n"), First);
    send(bus, "3F 47 09");
    EXPECT_EQ(status(bus, "0005"), "0000") << "TCT as a command";
    EXPECT_EQ(command(bus, "00020010", "7FFFFFFF", ""), "00000000 00000000 ") << "the element size does not matter";
    EXPECT_EQ(status(bus, "0005"), "0001");
}

TEST_F(Gateway, IfcUnaddressesEverybody)
{
    Vxi11Client bus(port, "gpib0");
    send(bus, "55 25");
    EXPECT_EQ(status(bus, "0006"), "0001");
    command(bus, "00020010", "00000001", "");
    EXPECT_EQ(status(bus, "0006"), "0000");
    EXPECT_EQ(command(bus, "00020002", "00000002", "0000").substr(0, 9), "00000000 ");
    EXPECT_EQ(status(bus, "0003"), "0000") << "nobody listens";
}

TEST_F(Gateway, AnswersOthersWhileAReadWaits)
{
    Vxi11Client second(port, "gpib0,7");
    second.core.send("0000000C", second.link + "00000400 00007530 00000000 00000000 00000000");
    EXPECT_EQ(Vxi11Client(port, "gpib0,5").query("*IDN?\n"), First);
    Vxi11Client same(port, "gpib0,7");
    EXPECT_EQ(same.statusByte(), "00000000 00000004 ") << "the read has found an error already";
    EXPECT_EQ(same.write("*IDN?\n"), "00000000 00000006 ");
    EXPECT_EQ(second.core.results().substr(0, 27), "00000000 00000004 00000025 ");
}

TEST_F(Gateway, LocksEachAddressByItself)
{
    Vxi11Client holder(port, "gpib0,7");
    Vxi11Client other(port, "gpib0,7");
    Vxi11Client first(port, "gpib0,5");
    Vxi11Client bus(port, "gpib0");
    EXPECT_EQ(holder.core.call("00000012", holder.link + "00000000 00000000"), "00000000 ");
    EXPECT_EQ(other.write("*IDN?\n"), "0000000B 00000000 ");
    EXPECT_EQ(other.statusByte(), "0000000B 00000000 ");
    EXPECT_EQ(holder.query("*IDN?\n"), Second);
    EXPECT_EQ(first.query("*IDN?\n"), First);
    EXPECT_EQ(status(bus, "0004"), "0001");
    EXPECT_EQ(holder.core.call("00000013", holder.link), "00000000 ");
    EXPECT_EQ(other.query("*IDN?\n"), Second);
    EXPECT_EQ(bus.core.call("00000012", bus.link + "00000000 00000000"), "00000000 ");
    Vxi11Client otherBus(port, "gpib0");
    EXPECT_EQ(send(otherBus, "3F"), "0000000B 00000000 ");
    EXPECT_EQ(first.query("*IDN?\n"), First) << "the interface's lock is no instrument's";
    Vxi11Client empty(port, "gpib0,8");
    EXPECT_EQ(empty.core.call("00000012", empty.link + "00000000 00000000"), "00000000 ");
    Vxi11Client otherEmpty(port, "gpib0,8");
    EXPECT_EQ(otherEmpty.statusByte(), "0000000B 00000000 ") << "an address can be locked with nobody there";
}

TEST_F(Gateway, SharesTheLockOfTheMainInstrumentWithItsOtherNames)
{
    Vxi11Client first(port, "gpib0,5");
    Vxi11Client instrument(port, "inst0");
    EXPECT_EQ(first.core.call("00000012", first.link + "00000000 00000000"), "00000000 ");
    EXPECT_EQ(instrument.write("*CLS\n"), "0000000B 00000000 ");
    EXPECT_EQ(first.core.call("00000013", first.link), "00000000 ");
    EXPECT_EQ(instrument.write("*CLS\n"), "00000000 00000005 ");
}

TEST_F(Gateway, KeepsABlockWholeThatHoldsEveryByte)
{
    Vxi11Client third(port, "gpib0,9,1");
    std::string content;
    for (int i = 0; i < 2048; ++i)
        content += static_cast<char>(i * 7);
    third.write("MMEM:DATA 'f',#42048" + content + "\n");
    EXPECT_EQ(third.query("MMEM:DATA? 'f'\n"), "#42048" + content + "\n");
}

namespace
{

class GatewayWithoutCommands : public Vxi11Fixture
{
protected:
    GatewayWithoutCommands() : Vxi11Fixture({"--gpib-refuse-docmd"}) {}
};

} // namespace

TEST_F(GatewayWithoutCommands, RefusesDocmdAndDoesTheRest)
{
    Vxi11Client bus(port, "gpib0");
    for (const char *number : {"00020000", "00020001", "00020002", "00020003", "00020004", "0002000A", "00020010"})
        EXPECT_EQ(bus.core.call("00000016", bus.link + "00000000 00007530 00000000" + number +
                                                "00000001 00000002 00000002 00010000"),
                  "00000008 00000000 ")
            << number;
    EXPECT_EQ(Vxi11Client(port, "gpib0,7").query("*IDN?\n"), Second);
}
