// The message exchange of IEEE 488.2 and the rules of SCPI-99, the same over every protocol, however the bytes arrive.
#include "protocol/simulator/Door.h"
#include "protocol/simulator/SimulatorFixture.h"

#include <algorithm>
#include <thread>

using namespace test;
using namespace std::string_literals;

namespace
{

const std::string Identification = "Oltrava,KyVisaSimulator,100001,5.8.6\n";

struct Row {
    std::string message;
    std::string answer;
};

std::string repeated(const std::string &text, int times)
{
    std::string result;
    for (int i = 0; i < times; ++i)
        result += text;
    return result;
}

/// Each on an instrument after *RST;*CLS, and without *SRE: what is asked must not depend on the protocol.
const std::vector<Row> &rows()
{
    static const std::vector<Row> all{
        {"*IDN?\n", Identification},
        {"*ESE 48;*SRE 255;*ESE?;*SRE?;*SRE 0\n", "48;191\n"},
        {"*ESE 32;*SRE 32;NONSENSE;*STB?;*SRE 0\n", "100\n"},
        {"NONSENSE;*STB?;*ESR?;*ESR?\n", "4;32;0\n"},
        {"NONSENSE;*CLS;*ESR?;:SYST:ERR?\n", "0;0,\"No error\"\n"},
        {"*ESE 3;*CLS;*ESE?\n", "3\n"},
        {"*ESE?;*CLS;*SRE?\n", "0;0\n"},
        {repeated("N;", 40) + "SYST:ERR:COUN?;CODE?\n", "30;-113\n"},
        {repeated("N;", 31) + repeated(":SYST:ERR:CODE?;", 29) + ":SYST:ERR?\n",
         repeated("-113;", 29) + "-350,\"Queue overflow\"\n"},
        {"*OPC;*ESR?\n", "1\n"},
        {"*OPC?\n", "1\n"},
        {"SENS:APER 0.01;:INIT;*OPC?;:STAT:OPER:COND?\n", "1;0\n"},
        {"SENS:APER 0.01;:INIT;*WAI;:STAT:OPER:COND?;EVEN?\n", "0;16\n"},
        {"SENS:APER 0.01;:INIT;*OPC;*WAI;*ESR?\n", "1\n"},
        {"TRIG:SOUR BUS;:INIT;:STAT:OPER:COND?;*TRG;:STAT:OPER:COND?;*WAI;:SYST:ERR?\n", "32;16;0,\"No error\"\n"},
        {"*TST?\n", "0\n"},
        {"*OPT?\n", "0\n"},
        {"*PSC 0;*PSC?;*PSC 1;*PSC?\n", "0;1\n"},
        {"VOLT 3;*SAV 2;*RST;*RCL 2;VOLT?\n", "3.000000E+00\n"},
        {"*IDN?;*ESE?\n", Identification},
        {":system:error?;error?;err?;error?\n", "0,\"No error\";0,\"No error\";0,\"No error\";0,\"No error\"\n"},
        {":syst:err?;     err?;\t :syst:err?\n", "0,\"No error\";0,\"No error\";0,\"No error\"\n"},
        {"*ESE?;NONSENSE;*ESE?;:SYST:ERR?\n", "0;0;-113,\"Undefined header;NONSENSE\"\n"},
        {"SOUR:VOLT 5;CURR 200 mA;:SOUR:VOLT?;CURR? MAX;CURR?\n", "5.000000E+00;3.000000E+00;2.000000E-01\n"},
        {"VOLT 5,6;VOLT;SOUR3:VOLT 1;:VOLT 31;VOLT ON;:SYST:ERR:CODE:ALL?\n", "-108,-109,-114,-222,-148\n"},
        {"DISP:TEXT 'a;b\n\"c''';TEXT?\n", "\"a;b\n\"\"c'\"\n"},
        {"MMEM:DATA 'f',#15a\n;'\0;DATA? 'f'\n"s, "#15a\n;'\0\n"s},
        {"MMEM:DATA 'f',#10;DATA? 'f'\n", "#10\n"},
        {"MMEM:DATA 'f',#3001\n;DATA? \"F\"\n", "#11\n\n"},
        {"MMEM:CDIR;DATA? 'none';:SYST:ERR?\n", "-256,\"File name not found;none\"\n"},
        {"MMEM:MSIS?;MSIS 'C:';CDIR 'C:\\';CDIR?\n", "\"C:\";\"C:\\\"\n"},
        {"MMEM:MDIR 'every';CDIR 'every';DATA 'x',#11y;DIR?;:MMEM:DEL 'x';CDIR;RDIR 'every';:SYST:ERR?\n",
         "\"x\";0,\"No error\"\n"},
        {"STAT:OPER:ENAB 48;PTR 0;NTR 16;:STAT:OPER:ENAB?;PTR?;NTR?;:STAT:PRES;:STAT:OPER:ENAB?;PTR?;NTR?\n",
         "48;0;16;0;32767;0\n"},
        {"SIM:LOAD 10;:VOLT 5;:OUTP ON;:STAT:QUES:COND?;:SIM:LOAD 1000;:STAT:QUES:COND?;EVEN?\n", "1;0;1\n"},
        {"  \t*ESE\t\t 7 ; *ESE? \r\n", "7\n"},
        {";;*ESE?;;\n", "0\n"},
        {"*ESE #H1F;*ESE?;*ESE #B101;*ESE?;*ESE #Q17;*ESE?\n", "31;5;15\n"},
    };
    return all;
}

const char *const Reset = "*RST;*CLS;*ESE 0;*SRE 0;:STAT:PRES\n";

class EveryDoor : public SimulatorFixture, public testing::WithParamInterface<std::string>
{
protected:
    EveryDoor() : SimulatorFixture(doorServices()) {}

    /// Forgets what a row left behind. The answer makes sure that nothing of it comes later.
    void reset() { EXPECT_EQ(door->ask(Reset + "*OPC?\n"s, 2), "1\n"); }

    std::unique_ptr<Door> open(const std::string &name) const { return openDoor(name, simulator); }

    std::unique_ptr<Door> door = open(GetParam());
};

/// What raw sockets and serial ports do not have.
class StatusDoor : public EveryDoor
{
};

/// Where an unread answer does not stay.
class InterruptingDoor : public EveryDoor
{
};

/// The network protocols, where a hundred megabytes take no longer than a moment.
class LargeBlocks : public EveryDoor
{
};

} // namespace

TEST_P(EveryDoor, AnswersTheSame)
{
    for (const Row &row : rows()) {
        reset();
        EXPECT_EQ(door->ask(row.message, row.answer.size()), row.answer) << row.message;
    }
}

TEST_P(EveryDoor, AnswersTheSameWhereverAMessageIsSplit)
{
    for (const Row &row : rows()) {
        if (row.message.size() > 150)
            continue; // the others have every kind of boundary
        for (std::size_t at = 1; at < row.message.size(); ++at) {
            reset();
            door->send(std::string_view{row.message}.substr(0, at), false);
            door->send(std::string_view{row.message}.substr(at), true);
            ASSERT_EQ(door->receive(row.answer.size()), row.answer) << row.message << "split at " << at;
        }
    }
}

TEST_P(EveryDoor, AnswersTheSameInOneWriteWithItsNeighbours)
{
    for (const Row &row : rows()) {
        reset();
        door->send("*WAI\n;\n\n" + row.message, true);
        EXPECT_EQ(door->receive(row.answer.size()), row.answer) << row.message;
        // Where it may stand behind an unread one, an answer with the status byte tells of that.
        if (door->interrupts() || (door->hasStatus() && row.message.find("*STB?") != std::string::npos))
            continue;
        reset();
        door->send(row.message + "*WAI\n" + Reset + row.message, true);
        EXPECT_EQ(door->receive(row.answer.size()), row.answer) << row.message;
        EXPECT_EQ(door->receive(row.answer.size()), row.answer) << row.message;
        EXPECT_EQ(door->poll() & 0x10u, 0u) << "all has been read";
    }
}

TEST_P(EveryDoor, AnswersTheSameWhileOthersAreInTheMiddleOfAMessage)
{
    for (const std::string &name : doorNames()) {
        if (name == GetParam() || (name == "Gpib" && GetParam() == "Vxi11"))
            continue;
        const std::unique_ptr<Door> other = open(name);
        for (const Row &row : rows()) {
            reset();
            const std::size_t half = row.message.size() / 2;
            door->send(std::string_view{row.message}.substr(0, half), false);
            ASSERT_EQ(other->ask("*IDN?\n", Identification.size()), Identification) << name;
            other->send("*ID", false);
            door->send(std::string_view{row.message}.substr(half), true);
            ASSERT_EQ(door->receive(row.answer.size()), row.answer) << row.message << name;
            other->send("N?\n", true);
            ASSERT_EQ(other->receive(Identification.size()), Identification) << name;
        }
    }
}

TEST_P(EveryDoor, ShowsWhatAnotherOneChanged)
{
    for (const std::string &name : doorNames()) {
        const std::unique_ptr<Door> other = open(name);
        const std::string text = "\"by " + name + "\"\n";
        EXPECT_EQ(other->ask("DISP:TEXT 'by " + name + "';:SOUR2:VOLT 7;*ESE 12;:MMEM:DATA 'f',#13" +
                                 name.substr(0, 3) + ";:NONSENSE;*OPC?\n",
                             2),
                  "1\n");
        EXPECT_EQ(door->ask("DISP:TEXT?\n", text.size()), text);
        const std::string expected =
            "7.000000E+00;12;#13" + name.substr(0, 3) + ";-113,\"Undefined header;:NONSENSE\"\n";
        EXPECT_EQ(door->ask("SOUR2:VOLT?;*ESE?;:MMEM:DATA? 'f';:SYST:ERR?\n", expected.size()), expected);
        reset();
    }
}

TEST_P(EveryDoor, ServesTwoAtOnce)
{
    const auto talk = [](Door &own) {
        for (int i = 0; i < 200; ++i)
            ASSERT_EQ(own.ask("*OPC?;*IDN?\n", 2 + Identification.size()), "1;" + Identification);
    };
    // A port and a VXI-11 device have one message exchange, whoever uses it.
    const bool alone = GetParam() == "Serial" || GetParam() == "Vxi11" || GetParam() == "Gpib";
    const std::unique_ptr<Door> other = open(alone ? "Socket" : GetParam());
    std::thread thread([&] { talk(*other); });
    talk(*door);
    thread.join();
}

TEST_P(EveryDoor, StoresBlocksOfAllSizes)
{
    for (const std::size_t size : {std::size_t{1}, std::size_t{65535}, std::size_t{65536}, std::size_t{65537},
                                   GetParam() == "Serial" ? std::size_t{100'000} : std::size_t{3'000'000}}) {
        std::string content(size, '\0');
        for (std::size_t i = 0; i < size; ++i)
            content[i] = static_cast<char>(i * 31 + i / 253);
        const std::string length = std::to_string(size);
        const std::string block = "#" + std::to_string(length.size()) + length + content;
        door->command("MMEM:DATA 'Test.dat'," + block + "\n");
        EXPECT_TRUE(door->ask("MMEM:DATA? 'Test.dat'\n", block.size() + 1) == block + "\n") << size;
    }
    EXPECT_EQ(door->ask("SYST:ERR?\n", 13), "0,\"No error\"\n");
}

TEST_P(LargeBlocks, GoInAndComeOut)
{
    // The sanitizers make it slow, and their own memory is large.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    constexpr std::size_t Size = 8'000'000;
    const std::string header = "#78000000";
#else
    constexpr std::size_t Size = 100'000'000;
    const std::string header = "#9100000000";
#endif
    std::string message = "MMEM:DATA 'large'," + header;
    const std::size_t from = message.size();
    message.resize(from + Size);
    for (std::size_t i = 0; i < Size; ++i)
        message[from + i] = static_cast<char>(i * 31 + i / 253);
    door->command(message + "\n");
    const std::string answer = door->ask("MMEM:DATA? 'large'\n", header.size() + Size + 1);
    ASSERT_EQ(answer.size(), header.size() + Size + 1);
    EXPECT_EQ(answer.substr(0, header.size()), header);
    EXPECT_TRUE(std::equal(message.begin() + static_cast<std::ptrdiff_t>(from), message.end(),
                           answer.begin() + static_cast<std::ptrdiff_t>(header.size())));
    EXPECT_EQ(answer.back(), '\n');
    EXPECT_EQ(door->ask("MMEM:DEL 'large';:SYST:ERR?\n", 13), "0,\"No error\"\n");
}

TEST_P(EveryDoor, TreatsAnUnreadAnswerAsItsProtocolDoes)
{
    reset();
    door->command("*IDN?\n");
    EXPECT_TRUE(!door->hasStatus() || (door->poll() & 0x10u) != 0) << "it is there";
    door->command("SYST:ERR?;*ESR?\n");
    if (door->interrupts()) {
        EXPECT_EQ(door->receive(0), "-410,\"Query INTERRUPTED\";4\n");
    } else {
        EXPECT_EQ(door->receive(Identification.size()), Identification);
        EXPECT_EQ(door->receive(15), "0,\"No error\";0\n");
    }
}

TEST_P(InterruptingDoor, ForgetsAnUnreadAnswerWithAClearStatusThatBeginsItsMessage)
{
    reset();
    door->command("*SRE 16;*IDN?\n");
    EXPECT_NE(door->poll() & 0x10u, 0u);
    door->command("*CLS\n");
    EXPECT_EQ(door->poll(), 0u);
    EXPECT_EQ(door->ask("SYST:ERR?;*ESR?\n", 0), "0,\"No error\";0\n");
}

TEST_P(StatusDoor, RequestsServiceOnceForEachReason)
{
    reset();
    door->command("*ESE 1;*SRE 32;*OPC\n");
    EXPECT_EQ(door->poll(), 0x60u);
    EXPECT_EQ(door->poll(), 0x20u);
    EXPECT_EQ(door->ask("*STB?\n", 0), "96\n") << "the master summary stays";
    EXPECT_EQ(door->ask("*ESR?\n", 0), "1\n");
    EXPECT_EQ(door->poll(), 0u);
    door->command("*SRE 16;*IDN?\n");
    EXPECT_EQ(door->poll(), 0x50u);
    EXPECT_EQ(door->poll(), 0x10u) << "a poll answers the request and leaves the message";
    EXPECT_EQ(door->receive(0), Identification);
    EXPECT_EQ(door->poll(), 0u);
    door->command("*SRE 4;NONSENSE\n");
    EXPECT_EQ(door->poll(), 0x44u);
    EXPECT_EQ(door->ask("*CLS;*SRE 0;*STB?\n", 0), "0\n");
}

TEST_P(StatusDoor, ClearsInTheMiddleOfAnything)
{
    const std::string block(5000, 'x');
    const Row beginnings[] = {
        {"", ""},
        {"*ESE 2", ""},
        {"*ESE 33;", ""},
        {"MMEM:DATA 'f", ""},
        {"MMEM:DATA 'f',#9000100000" + block, ""},
        {"MMEM:DATA 'f',#0" + block, ""},
        {"*IDN?;", ""},
        {"SYST:DEL 3600;*IDN?\n", "end"},
        {"SENS:APER 60;:INIT;*OPC?\n", "end"},
        {"SENS:APER 60;:INIT;*WAI;*IDN?\n", "end"},
        {"SENS:APER 60;:INIT;*OPC\n", "end"},
        {"*IDN?\n", "end"},
        {"*TST?\n", "end"},
        {"READ?\n", "end"},
    };
    for (const Row &row : beginnings) {
        reset();
        door->command("*ESE 33;*SRE 0;:VOLT 4;:NONSENSE\n");
        if (!row.message.empty())
            door->send(row.message, !row.answer.empty());
        door->clear();
        EXPECT_EQ(door->poll() & ~0x20u, 4u) << row.message << ": MAV is gone, the error is not";
        EXPECT_EQ(door->ask("*ESE?;:VOLT?;:SYST:ERR?;*ESR?\n", 0),
                  "33;4.000000E+00;-113,\"Undefined header;:NONSENSE\";32\n")
            << row.message;
        door->clear();
        EXPECT_EQ(door->ask("ABOR;*OPC?\n", 0), "1\n");
    }
}

TEST_P(StatusDoor, TriggersAsItsProtocolDoes)
{
    reset();
    door->command("SENS:APER 0.001;:TRIG:SOUR BUS;:INIT\n");
    door->trigger();
    EXPECT_EQ(door->ask("*WAI;:STAT:OPER:COND?;:SYST:ERR?\n", 0), "0;0,\"No error\"\n");
    door->trigger();
    EXPECT_EQ(door->ask("SYST:ERR?\n", 0), "-211,\"Trigger ignored\"\n");
}

INSTANTIATE_TEST_SUITE_P(All, EveryDoor, testing::ValuesIn(doorNames()), [](const auto &name) { return name.param; });
INSTANTIATE_TEST_SUITE_P(All, InterruptingDoor, testing::Values("Hislip", "Vxi11", "Gpib"),
                         [](const auto &name) { return name.param; });
INSTANTIATE_TEST_SUITE_P(All, LargeBlocks, testing::Values("Socket", "Hislip", "Vxi11"),
                         [](const auto &name) { return name.param; });
INSTANTIATE_TEST_SUITE_P(All, StatusDoor, testing::Values("Hislip", "HislipOverlapped", "Vxi11", "Gpib"),
                         [](const auto &name) { return name.param; });
