#include "protocol/simulator/RpcCaller.h"
#include "protocol/simulator/SimulatorFixture.h"

#include "simulator/server/Listener.h"
#include "simulator/traffic/LogPrinter.h"

#include <gmock/gmock.h>

#include <fcntl.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <fstream>
#include <regex>
#include <sstream>
#include <thread>

using simulator::EventLoop;
using simulator::FileDescriptor;
using simulator::LogPrinter;
using simulator::TrafficLog;
using testing::HasSubstr;
using testing::MatchesRegex;

namespace test
{
namespace
{

/// A printer at one end of a pipe, a socket pair or a file, and the test at the other.
class LogPrinting : public testing::Test
{
protected:
    LogPrinting() { std::signal(SIGPIPE, SIG_IGN); }

    void open(bool asSocket = false)
    {
        std::array<int, 2> ends{};
        ASSERT_EQ(asSocket ? ::socketpair(AF_UNIX, SOCK_STREAM, 0, ends.data()) : ::pipe(ends.data()), 0);
        m_reader = FileDescriptor(ends[0]);
        m_writer = FileDescriptor(ends[1]);
    }

    /// Everything that is to be had by the time the loop has nothing more to do.
    std::string readAll()
    {
        ::fcntl(m_reader.get(), F_SETFL, O_NONBLOCK);
        std::string text;
        std::vector<char> piece(65536);
        for (int quiet = 0; quiet < 3; ++quiet) {
            turn();
            for (ssize_t got = 0; (got = ::read(m_reader.get(), piece.data(), piece.size())) > 0; quiet = 0)
                text.append(piece.data(), static_cast<std::size_t>(got));
        }
        return text;
    }

    /// Lets the loop do what it can do now.
    void turn()
    {
        m_loop.after(std::chrono::milliseconds{1}, [this] { m_loop.stop(); });
        m_loop.run();
    }

    EventLoop m_loop;
    TrafficLog m_log;
    FileDescriptor m_reader;
    FileDescriptor m_writer;
};

void expectNothingLost(const std::string &text, unsigned long events)
{
    std::istringstream lines(text);
    unsigned long expected = 0;
    unsigned long gaps = 0;
    for (std::string line; std::getline(lines, line);) {
        unsigned long count = 0;
        if (std::sscanf(line.c_str(), "(%lu lines left out)", &count) == 1) {
            expected += count;
            ++gaps;
            continue;
        }
        const std::string number = line.substr(line.rfind(' ') + 1);
        EXPECT_EQ(line.substr(12), " socket me -- event " + number) << "a whole line";
        EXPECT_EQ(std::stoul(number), expected++);
    }
    EXPECT_EQ(expected, events) << "each line printed or counted";
    EXPECT_GE(gaps, 1u);
}

} // namespace

TEST_F(LogPrinting, PrintsOneLineAnEntry)
{
    open();
    LogPrinter printer(m_loop, m_log, m_writer.get());
    TrafficLog::Client client(m_log, "socket", "127.0.0.1:4000");
    client.received(std::as_bytes(std::span("*IDN?\n", 6)));
    client.messageEnds();
    client.answered({{"Oltrava\n", nullptr}});
    const std::string text = readAll();
    EXPECT_TRUE(std::regex_match(text, std::regex("..:..:..\\.... socket 127\\.0\\.0\\.1:4000 -- connected\n"
                                                  "..:..:..\\.... socket 127\\.0\\.0\\.1:4000 -> \\*IDN\\?\\\\n\n"
                                                  "..:..:..\\.... socket 127\\.0\\.0\\.1:4000 <- Oltrava\\\\n\n")))
        << text;
}

TEST_F(LogPrinting, WaitsForNobodyAndSaysWhatItLeftOut)
{
    for (const bool asSocket : {false, true}) {
        open(asSocket);
        LogPrinter printer(m_loop, m_log, m_writer.get());
        EXPECT_EQ(::fcntl(m_writer.get(), F_GETFL) & O_NONBLOCK, 0) << "others may share the descriptor";
        TrafficLog::Client client(m_log, "socket", "me");
        readAll();
        constexpr unsigned long Events = 50'000;
        for (unsigned long i = 0; i < Events; ++i) {
            client.event("event " + std::to_string(i));
            if (i % 10'000 == 0)
                turn();
        }
        expectNothingLost(readAll(), Events);
        client.event("goes on");
        EXPECT_THAT(readAll(), HasSubstr(" -- goes on\n"));
    }
}

TEST_F(LogPrinting, SurvivesTheEndOfItsReader)
{
    open();
    LogPrinter printer(m_loop, m_log, m_writer.get());
    TrafficLog::Client client(m_log, "socket", "me");
    m_reader = FileDescriptor();
    turn();
    client.event("for nobody");
    turn();
}

TEST_F(LogPrinting, PrintsTheRestWhenItEnds)
{
    open();
    {
        LogPrinter printer(m_loop, m_log, m_writer.get());
        TrafficLog::Client client(m_log, "socket", "me");
        client.event("last words");
    }
    EXPECT_THAT(readAll(), HasSubstr(" -- last words\n"));
}

TEST_F(LogPrinting, WritesToAFileToo)
{
    const std::string path = testing::TempDir() + "kyvisa-log-" + std::to_string(::getpid());
    m_writer = FileDescriptor(::open(path.c_str(), O_CREAT | O_WRONLY | O_APPEND | O_CLOEXEC, 0600));
    {
        LogPrinter printer(m_loop, m_log, m_writer.get());
        TrafficLog::Client client(m_log, "socket", "me");
        for (int i = 0; i < 5'000; ++i)
            client.event("event " + std::to_string(i));
        turn();
        turn();
    }
    std::ifstream file(path);
    const std::string text{std::istreambuf_iterator<char>(file), {}};
    EXPECT_THAT(text, HasSubstr(" -- event 0\n"));
    EXPECT_THAT(text, HasSubstr(" -- event 4999\n"));
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 5'002);
    ::unlink(path.c_str());
}

class SimulatorLog : public SimulatorFixture
{
protected:
    explicit SimulatorLog(const std::vector<std::string> &more = {}) : SimulatorFixture(options(more)) {}

    /// Waits for the next line; without time, and with the client's port as #.
    std::string line()
    {
        const std::string text = simulator.nextLine();
        EXPECT_TRUE(std::regex_search(text, std::regex("^[0-9]{2}:[0-9]{2}:[0-9]{2}\\.[0-9]{3} "))) << text;
        return std::regex_replace(text.substr(std::min<std::size_t>(13, text.size())), std::regex(":[0-9]+ "), ":# ");
    }

private:
    static std::vector<std::string> options(std::vector<std::string> more)
    {
        more.insert(more.end(), {"--hislip", "0", "--socket", "0", "--log"});
        return more;
    }
};

TEST_F(SimulatorLog, ShowsWhatASocketClientSaysAndHears)
{
    RawClient client(simulator.port("socket"));
    client.send("MMEM:DATA 'f',#220" + std::string(20, '\n') + ";DATA? 'f'\n");
    client.receive(25);
    EXPECT_EQ(line(), "socket 127.0.0.1:# -- connected");
    EXPECT_EQ(line(), "socket 127.0.0.1:# -> MMEM:DATA 'f',#220<20 bytes>;DATA? 'f'\\n");
    EXPECT_EQ(line(), "socket 127.0.0.1:# <- #220<20 bytes>\\n");
    client.close();
    EXPECT_EQ(line(), "socket 127.0.0.1:# -- disconnected");
}

TEST_F(SimulatorLog, ShowsALargeBlockByItsLength)
{
    RawClient client(simulator.port("socket"));
    client.send("MMEM:DATA 'f',#73000000" + std::string(3'000'000, 'x') + "\n*OPC?\n");
    EXPECT_EQ(client.receiveLine(), "1\n");
    line();
    EXPECT_EQ(line(), "socket 127.0.0.1:# -> MMEM:DATA 'f',#73000000<3000000 bytes>\\n");
    EXPECT_EQ(line(), "socket 127.0.0.1:# -> *OPC?\\n");
    EXPECT_EQ(line(), "socket 127.0.0.1:# <- 1\\n");
}

TEST_F(SimulatorLog, ShowsWhatHislipDoesBesideMessages)
{
    HislipClient client(simulator.port("hislip"));
    client.sync.send(message("4853 07 00 FFFFFF00", "*SRE 16;*IDN?")); // DataEND
    expectMessage(client.async, "4853 14 50 00000000");                // AsyncServiceRequest
    EXPECT_EQ(line(), "hislip 127.0.0.1:# -- connected");
    EXPECT_EQ(line(), "hislip 127.0.0.1:# -> *SRE 16;*IDN?");
    EXPECT_THAT(line(), MatchesRegex("hislip 127\\.0\\.0\\.1:# <- Oltrava,KyVisaSimulator,.*"));
    EXPECT_EQ(line(), "hislip 127.0.0.1:# -- service request 0x50");
    client.async.send(message("4853 15 00 FFFFFF00")); // AsyncStatusQuery
    EXPECT_EQ(line(), "hislip 127.0.0.1:# -- serial poll 0x50");
    client.async.send(message("4853 13 00 00000000")); // AsyncDeviceClear
    EXPECT_EQ(line(), "hislip 127.0.0.1:# -- device clear");
    client.sync.send(message("4853 08 00 00000000")); // DeviceClearComplete
    client.async.send(message("4853 04 01 00000000", "key"));
    EXPECT_EQ(line(), "hislip 127.0.0.1:# -- lock shared 'key': granted");
    client.sync.send(message("4853 0C 00 FFFFFF00")); // Trigger
    EXPECT_EQ(line(), "hislip 127.0.0.1:# -- trigger");
}

/// Calls of the core channel by literal words, on a link to @p device.
class LogOverVxi11 : public SimulatorLog
{
protected:
    LogOverVxi11() : SimulatorLog({"--vxi11", "0", "--portmapper", "0", "--gpib"}) {}

    std::uint16_t corePort()
    {
        RpcCaller portmapper(static_cast<std::uint16_t>(std::stoi(simulator.resource("portmapper"))), "000186A0");
        portmapper.send("00000003", "000607AF 00000001 00000006 00000000", {}, "00000002");
        return static_cast<std::uint16_t>(std::stoul(portmapper.results(), nullptr, 16));
    }

    void talk(std::string_view device, const std::string &shownAs)
    {
        RpcCaller core(corePort(), "000607AF");
        const std::string length = RpcCaller::digits(RpcCaller::word(static_cast<std::uint32_t>(device.size())));
        const std::string link = core.call("0000000A", "00000000 00000000 00000000" + length, device).substr(9, 8);
        core.call("0000000B", link + "00002710 00000000 00000008 00000006", "*OPC?\n"); // device_write with END
        core.call("0000000C", link + "00000100 00002710 00000000 00000000 00000000");   // device_read
        core.call("0000000D", link + "00000000 00000000 00002710");                     // device_readstb
        core.call("0000000F", link + "00000000 00000000 00002710");                     // device_clear
        core.call("00000012", link + "00000000 00000000");                              // device_lock
        core.call("00000017", link);                                                    // destroy_link
        EXPECT_EQ(line(), shownAs + " 127.0.0.1:# -- connected");
        EXPECT_EQ(line(), shownAs + " 127.0.0.1:# -> *OPC?\\n");
        EXPECT_EQ(line(), shownAs + " 127.0.0.1:# <- 1\\n");
        EXPECT_EQ(line(), shownAs + " 127.0.0.1:# -- serial poll 0x00");
        EXPECT_EQ(line(), shownAs + " 127.0.0.1:# -- device clear");
        EXPECT_EQ(line(), shownAs + " 127.0.0.1:# -- lock exclusive: granted");
        EXPECT_EQ(line(), shownAs + " 127.0.0.1:# -- unlock exclusive");
        EXPECT_EQ(line(), shownAs + " 127.0.0.1:# -- disconnected");
    }
};

TEST_F(LogOverVxi11, ShowsWhatALinkDoes)
{
    talk("inst0", "vxi11");
}

TEST_F(LogOverVxi11, ShowsWhatALinkToAnAddressOfTheBusDoes)
{
    talk("gpib0,5", "gpib0,5");
}

TEST_F(SimulatorLog, GoesOnWhenNobodyReadsIt)
{
    RawClient client(simulator.port("socket"));
    for (int i = 0; i < 3000; ++i) {
        client.send("SYST:VERS?\n");
        ASSERT_EQ(client.receiveLine(), "1999.0\n") << i;
    }
}

TEST_F(SimulatorLog, OutlivesItsReader)
{
    simulator.closeOutput();
    RawClient client(simulator.port("socket"));
    for (int i = 0; i < 3; ++i) {
        client.send("SYST:VERS?\n");
        EXPECT_EQ(client.receiveLine(), "1999.0\n");
    }
}

TEST(QuietSimulatorLog, LeavesOutTheStartLinesAndNotTheLog)
{
    // Without start lines nobody is told a free port: one that was free a moment ago has to do.
    EventLoop loop;
    std::uint16_t port = 0;
    {
        const simulator::Listener listener(loop, {"127.0.0.1", false}, 0, [](FileDescriptor) {});
        port = listener.port();
    }
    const std::string command = "timeout --preserve-status 60 " SIMULATOR_FILE " --quiet --log --socket " +
                                std::to_string(port) + " & echo $!; wait $!";
    FILE *out = ::popen(command.c_str(), "r");
    std::array<char, 200> line{};
    ASSERT_NE(std::fgets(line.data(), line.size(), out), nullptr);
    const pid_t process = std::stoi(line.data());
    while (true) {
        const FileDescriptor socket(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(port);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        if (::connect(socket.get(), reinterpret_cast<const sockaddr *>(&address), sizeof address) == 0)
            break;
        std::this_thread::sleep_for(std::chrono::milliseconds{5}); // until it listens; ctest ends an endless wait
    }
    ASSERT_NE(std::fgets(line.data(), line.size(), out), nullptr);
    EXPECT_THAT(line.data(), HasSubstr(" socket 127.0.0.1:")) << "the first line is one of the log";
    EXPECT_THAT(line.data(), HasSubstr(" -- connected\n"));
    ::kill(process, SIGTERM);
    EXPECT_EQ(::pclose(out), 0);
}

} // namespace test
