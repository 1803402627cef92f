// The simulator's serial port, by a client that opens the pseudo terminal as it would a port.
#include "protocol/simulator/SerialPort.h"
#include "protocol/simulator/SimulatorFixture.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <functional>
#include <thread>

using namespace test;

namespace
{

class SerialServer : public SimulatorFixture
{
protected:
    SerialServer() : SimulatorFixture({"--socket", "0", "--serial"}) {}

    std::string nameOfPort() const
    {
        const std::string resource = simulator.resource("serial");
        EXPECT_EQ(resource.substr(0, 13), "ASRL/dev/pts/");
        EXPECT_EQ(resource.substr(resource.size() - 7), "::INSTR");
        return resource.substr(4, resource.size() - 11);
    }

    /// Waits until the simulator has executed everything that came by the port so far, and seen who has closed it.
    void expectSoon(const char *query, const std::string &expected)
    {
        std::string got;
        for (int i = 0; i < 1000 && got != expected; ++i) {
            got = ask(query);
            std::this_thread::sleep_for(std::chrono::milliseconds(got == expected ? 0 : 5));
        }
        EXPECT_EQ(got, expected) << query;
    }

    /// Opens the port again and again until what is expected there is true. The simulator learns a little later that a client has gone.
    testing::AssertionResult soonAtTheNextOpen(const std::function<bool(const SerialPort &)> &expected) const
    {
        for (int i = 0; i < 1000; ++i) {
            if (expected(SerialPort(name)))
                return testing::AssertionSuccess();
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
        return testing::AssertionFailure();
    }

    const std::string name = nameOfPort();
};

const std::string Identification = "Oltrava,KyVisaSimulator,100001,5.8.6\n";

} // namespace

TEST_F(SerialServer, AnswersLinesWithLines)
{
    SerialPort port(name);
    EXPECT_EQ(port.ask("*IDN?\n"), Identification);
    EXPECT_EQ(port.ask("*IDN?\r\n"), Identification);
    EXPECT_EQ(port.ask("*OPC?;*ESE?\n"), "1;0\n");
    port.send("SOUR:VOLT 4\n");
    EXPECT_EQ(port.ask("SOUR:VOLT?\n"), "4.000000E+00\n");
    EXPECT_EQ(ask("SOUR:VOLT?\n"), "4.000000E+00\n") << "the same instrument over the raw socket";
    EXPECT_EQ(port.ask("SYST:REM?\n"), "REM\n");
}

TEST_F(SerialServer, TakesMessagesByteByByteAndSeveralAtOnce)
{
    SerialPort port(name);
    for (const char byte : std::string("*IDN?\n"))
        port.send({&byte, 1});
    EXPECT_EQ(port.receiveLine(), Identification);
    port.send("*OPC?\n*ESE?\nSYST:VERS?\n");
    EXPECT_EQ(port.receiveLine(), "1\n");
    EXPECT_EQ(port.receiveLine(), "0\n");
    EXPECT_EQ(port.receiveLine(), "1999.0\n");
}

TEST_F(SerialServer, KeepsUnreadAnswersAndReportsNoInterruption)
{
    SerialPort port(name);
    port.send("*IDN?\n");
    port.send("*OPC?\n");
    EXPECT_EQ(port.receiveLine(), Identification);
    EXPECT_EQ(port.receiveLine(), "1\n");
    EXPECT_EQ(port.ask("SYST:ERR?\n"), "0,\"No error\"\n");
}

TEST_F(SerialServer, IsRawSoThatBlocksPassBothWays)
{
    SerialPort port(name);
    const termios settings = port.settings();
    EXPECT_EQ(settings.c_lflag & (ICANON | ECHO | ISIG | IEXTEN), 0u);
    EXPECT_EQ(settings.c_iflag & (IXON | IXOFF | ICRNL | INLCR | ISTRIP), 0u);
    EXPECT_EQ(settings.c_oflag & OPOST, 0u);
    EXPECT_EQ(settings.c_cflag & CSIZE, static_cast<tcflag_t>(CS8));
    std::string content;
    for (int i = 0; i < 100000; ++i)
        content += static_cast<char>(i * 7 + i / 256);
    port.send("MMEM:DATA 'f',#6100000" + content + "\n");
    port.send("MMEM:DATA? 'f'\n");
    EXPECT_TRUE(port.receive(100009) == "#6100000" + content + "\n");
}

TEST_F(SerialServer, ServesOneClientAfterTheOther)
{
    for (int i = 0; i < 50; ++i) {
        SerialPort port(name);
        ASSERT_EQ(port.ask("*IDN?\n"), Identification) << i;
    }
}

TEST_F(SerialServer, ForgetsWhatAClientDidNotReadBeforeItClosed)
{
    for (int i = 0; i < 50; ++i) {
        SerialPort first(name);
        first.send("*IDN?\n*IDN?\n");
        first.receive(1);
        first.close();
        ASSERT_TRUE(soonAtTheNextOpen([](const SerialPort &port) {
            int unread = -1;
            return ::ioctl(port.get(), FIONREAD, &unread) == 0 && unread == 0;
        }));
        SerialPort second(name);
        ASSERT_EQ(second.ask("*OPC?\n"), "1\n") << i;
    }
}

TEST_F(SerialServer, TakesWhatAClientWroteBeforeItClosed)
{
    SerialPort(name, O_WRONLY).send("SOUR:VOLT 7;*IDN?\n");
    expectSoon("SOUR:VOLT?\n", "7.000000E+00\n");
    SerialPort port(name);
    EXPECT_EQ(port.ask("*OPC?\n"), "1\n") << "the answer to nobody is gone";
}

TEST_F(SerialServer, ForgetsTheMessageThatItsSenderDidNotEnd)
{
    {
        SerialPort port(name);
        port.send("*SRE 8\nMMEM:DATA 'f',#800100000 and so on");
        expectSoon("*SRE?\n", "8\n");
    }
    SerialPort(name).send("\n");
    // A client that comes while the simulator has not seen the first one go would be taken for it.
    for (int i = 0; i < 1000; ++i) {
        SerialPort port(name);
        port.send("*OPC?\n");
        if (port.receiveLine(PortBrief) == "1\n")
            return;
    }
    FAIL() << "the block swallows what others send";
}

TEST_F(SerialServer, LetsAClientSetItsTerminalAndSetsItBackAfterIt)
{
    {
        SerialPort port(name);
        termios settings = port.settings();
        ::cfsetspeed(&settings, B19200);
        settings.c_iflag |= IXON;
        settings.c_lflag |= ICANON;
        ASSERT_EQ(::tcsetattr(port.get(), TCSANOW, &settings), 0);
        EXPECT_EQ(port.ask("*IDN?\n"), Identification);
        EXPECT_NE(port.settings().c_lflag & ICANON, 0u) << "left alone while it is there";
    }
    EXPECT_TRUE(soonAtTheNextOpen([](const SerialPort &port) {
        return (port.settings().c_lflag & ICANON) == 0 && (port.settings().c_iflag & IXON) == 0;
    })) << "raw again for the next one";
}

TEST_F(SerialServer, StopsAndStartsByXoffAndXonWhereAClientUsesThem)
{
    SerialPort port(name);
    port.useXonXoff();
    port.send("\x13");
    port.send("*OPC?\n");
    expectSoon("*OPC?\n", "1\n");
    EXPECT_EQ(port.receiveLine(PortBrief), "") << "stopped";
    port.send("SOUR:VOLT 2\n");
    expectSoon("SOUR:VOLT?\n", "2.000000E+00\n");
    port.send("\x11");
    EXPECT_EQ(port.receiveLine(), "1\n");
    EXPECT_EQ(::tcflow(port.get(), TCIOFF), 0) << "what a terminal sends by itself";
    port.send("*ESE?\n");
    EXPECT_EQ(port.receiveLine(PortBrief), "");
    EXPECT_EQ(::tcflow(port.get(), TCION), 0);
    EXPECT_EQ(port.receiveLine(), "0\n");
    EXPECT_EQ(port.ask("SYST:ERR?\n"), "0,\"No error\"\n") << "they are no input";
}

TEST_F(SerialServer, TakesXoffForDataWhereNobodyUsesIt)
{
    SerialPort port(name);
    port.send("MMEM:DATA 'f',#15\x13\x11\x13\x13\x11\n");
    EXPECT_EQ(port.ask("MMEM:DATA? 'f'\n"), "#15\x13\x11\x13\x13\x11\n");
}

TEST_F(SerialServer, AStoppedClientThatGoesLeavesARunningLine)
{
    {
        SerialPort port(name);
        port.useXonXoff();
        port.send("\x13*ESE 5;*IDN?\n");
        expectSoon("*ESE?\n", "5\n");
    }
    SerialPort port(name);
    EXPECT_EQ(port.ask("*OPC?\n"), "1\n");
}

TEST_F(SerialServer, GivesAClaimedPortToTheNextOne)
{
    for (int i = 0; i < 20; ++i) {
        SerialPort port(name);
        ASSERT_EQ(::ioctl(port.get(), TIOCEXCL), 0);
        ASSERT_EQ(port.ask("*OPC?\n"), "1\n");
    }
    EXPECT_TRUE(soonAtTheNextOpen([](const SerialPort &port) {
        int claimed = 1;
        return ::ioctl(port.get(), TIOCGEXCL, &claimed) == 0 && claimed == 0;
    })) << "the claim does not outlive the client that made it";
}

TEST_F(SerialServer, BreakDoesNotReachItOverAPseudoTerminal)
{
    SerialPort port(name);
    port.send("*ESE 3\n*ID");
    expectSoon("*ESE?\n", "3\n");
    EXPECT_EQ(::tcsendbreak(port.get(), 0), 0);
    EXPECT_EQ(port.ask("N?\n"), Identification);
}

TEST_F(SerialServer, StopsListeningToAClientThatNeverReads)
{
    SerialPort port(name);
    std::string queries;
    for (int i = 0; i < 200000; ++i)
        queries += "*IDN?\n";
    const std::size_t sent = port.sendWhatGoes(queries);
    EXPECT_LT(sent, queries.size()) << "1 MiB of answers, and no more queries are taken";
    EXPECT_EQ(ask("*OPC?\n"), "1\n") << "others notice nothing";
    for (int i = 0; i < 1000; ++i)
        ASSERT_EQ(port.receiveLine(), Identification) << i;
}

TEST_F(SerialServer, SurvivesGarbage)
{
    SerialPort port(name);
    std::string garbage;
    for (int i = 0; i < 300000; ++i)
        garbage += static_cast<char>((i * 1103515245u + 12345u) >> 16);
    port.send(garbage);
    port.send("\n");
    expectSoon("*OPC?\n", "1\n");
}

TEST_F(SerialServer, ACommandThatWaitsKeepsNobodyElse)
{
    SerialPort port(name);
    port.send("SYST:DEL 0.1;*IDN?\n");
    EXPECT_EQ(ask("*OPC?\n"), "1\n");
    EXPECT_EQ(port.receiveLine(), Identification);
}
