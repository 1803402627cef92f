#include "support/RawClient.h"
#include "support/SimulatorProcess.h"

#include <gtest/gtest.h>

#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <fstream>
#include <regex>
#include <sstream>
#include <thread>

using namespace test;

namespace
{

struct Outcome {
    int status;
    std::string out;
    std::string error;
};

/// Runs the program until it ends by itself, or is asked to after so many seconds.
Outcome run(const std::string &options, int seconds = 60)
{
    const std::string errors = testing::TempDir() + "kyvisa-simulator-" + std::to_string(::getpid()) + ".err";
    const std::string command =
        "timeout --preserve-status " + std::to_string(seconds) + " " + SIMULATOR_FILE + " " + options + " 2>" + errors;
    FILE *out = ::popen(command.c_str(), "r");
    Outcome result;
    char piece[4096];
    while (const std::size_t got = std::fread(piece, 1, sizeof piece, out))
        result.out.append(piece, got);
    const int status = ::pclose(out);
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : 256;
    std::ifstream file(errors);
    result.error = {std::istreambuf_iterator<char>(file), {}};
    std::remove(errors.c_str());
    return result;
}

} // namespace

TEST(SimulatorProgram, TellsWhereItIsReached)
{
    SimulatorProcess simulator({"--hislip", "0", "--socket", "0"});
    EXPECT_TRUE(
        std::regex_match(simulator.resource("hislip"), std::regex("TCPIP::127\\.0\\.0\\.1::hislip0,[0-9]+::INSTR")))
        << simulator.resource("hislip");
    EXPECT_TRUE(std::regex_match(simulator.resource("socket"), std::regex("TCPIP::127\\.0\\.0\\.1::[0-9]+::SOCKET")))
        << simulator.resource("socket");
}

TEST(SimulatorProgram, ServesOnlyWhatItIsAskedFor)
{
    SimulatorProcess simulator({"--socket", "0"});
    EXPECT_EQ(simulator.resource("hislip"), "");
    EXPECT_NE(simulator.resource("socket"), "");
}

TEST(SimulatorProgram, ListensOnTheAddressesThatItIsGiven)
{
    SimulatorProcess simulator({"--listen", "::1", "--socket", "0"});
    EXPECT_TRUE(std::regex_match(simulator.resource("socket"), std::regex("TCPIP::\\[::1\\]::[0-9]+::SOCKET")))
        << simulator.resource("socket");
    RawClient client(simulator.port("socket"), true);
    client.send("*OPC?\n");
    EXPECT_EQ(client.receiveLine(), "1\n");
}

TEST(SimulatorProgram, EndsWithStatus0OnItsSignals)
{
    for (const int signal : {SIGTERM, SIGINT}) {
        SimulatorProcess simulator({"--socket", "0"});
        EXPECT_EQ(simulator.stop(signal), 0);
    }
}

TEST(SimulatorProgram, EndsAtOnceUnderLoad)
{
    SimulatorProcess simulator({"--socket", "0"});
    RawClient client(simulator.port("socket"));
    client.send("MMEM:DATA 'f',#71000000" + std::string(1'000'000, 'x') + "\n");
    std::thread load([&] {
        const std::string flood(100'000, ';');
        while (client.trySend(flood))
            continue;
    });
    EXPECT_EQ(simulator.stop(SIGTERM), 0);
    load.join();
}

TEST(SimulatorProgram, PrintsHelpAndVersion)
{
    EXPECT_EQ(run("--version").out, "KyVisaSimulator 5.8.6\n");
    EXPECT_EQ(run("--version").status, 0);
    const Outcome help = run("--help");
    EXPECT_EQ(help.status, 0);
    EXPECT_EQ(help.error, "");
    for (const char *option : {"--listen ADDRESS", "--hislip PORT", "--socket PORT", "--max-message BYTES", "--quiet",
                               "--help", "--version"})
        EXPECT_NE(help.out.find(option), std::string::npos) << option << " in:\n" << help.out;
}

TEST(SimulatorProgram, SaysNothingWhenQuiet)
{
    const Outcome result = run("--quiet --hislip 0 --socket 0", 1);
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.error, "");
}

TEST(SimulatorProgram, NamesABadOption)
{
    const struct {
        const char *options;
        const char *named;
    } rows[] = {
        {"--nonsense", "--nonsense"},         {"--hislip", "--hislip"},     {"--hislip x", "--hislip"},
        {"--socket 65536", "--socket"},       {"--socket -1", "--socket"},  {"--listen nowhere", "--listen"},
        {"--max-message 0", "--max-message"}, {"--quiet=maybe", "--quiet"}, {"word", "word"},
    };
    for (const auto &row : rows) {
        const Outcome result = run(row.options);
        EXPECT_EQ(result.status, 2) << row.options;
        EXPECT_NE(result.error.find(row.named), std::string::npos) << row.options << ": " << result.error;
        EXPECT_EQ(result.out, "") << row.options;
    }
}

TEST(SimulatorProgram, SignsItsErrorsWhenAsked)
{
    SimulatorProcess simulator({"--socket", "0", "--signed-errors"});
    RawClient client(simulator.port("socket"));
    client.send("SYST:ERR?;:NONSENSE;:SYST:ERR?;ERR:ALL?;CODE?;COUN?\n");
    EXPECT_EQ(client.receiveLine(), "+0,\"No error\";-113,\"Undefined header;:NONSENSE\";+0,\"No error\";+0;0\n");
}

TEST(SimulatorProgram, NamesAPortThatIsInUse)
{
    SimulatorProcess first({"--socket", "0"});
    const std::string port = std::to_string(first.port("socket"));
    const Outcome second = run("--hislip " + port);
    EXPECT_EQ(second.status, 1);
    EXPECT_NE(second.error.find("port " + port), std::string::npos) << second.error;
    EXPECT_EQ(second.out, "");
}

TEST(SimulatorProgram, UsesNoProcessorTimeWhenIdle)
{
    SimulatorProcess simulator({"--hislip", "0", "--socket", "0"});
    RawClient client(simulator.port("socket"));
    client.send("SYST:DEL 3600\n");
    RawClient idle(simulator.port("hislip"));
    const auto ticks = [&] {
        std::ifstream stat("/proc/" + std::to_string(simulator.id()) + "/stat");
        std::string text{std::istreambuf_iterator<char>(stat), {}};
        std::istringstream fields(text.substr(text.rfind(')') + 2));
        std::string skipped;
        for (int i = 0; i < 11; ++i)
            fields >> skipped;
        long user = 0;
        long system = 0;
        fields >> user >> system;
        return user + system;
    };
    std::this_thread::sleep_for(std::chrono::milliseconds(100)); // what the start still costs
    const long before = ticks();
    std::this_thread::sleep_for(std::chrono::milliseconds(1000)); // the span that is measured
    EXPECT_LE(ticks() - before, 2) << "hundredths of a second in one second";
}
