// The library in programs that treat it roughly. Each is a program of its own, which says what did not hold and ends with status 1.
#include "support/SimulatorProcess.h"

#include <cstdlib>
#include <filesystem>
#include <gtest/gtest.h>
#include <spawn.h>
#include <string>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

extern char **environ;

namespace
{

/// Status of the program, which ends by itself; 1000 and the signal's number when one ended it.
int run(std::vector<std::string> words)
{
    std::vector<char *> arguments;
    for (std::string &word : words)
        arguments.push_back(word.data());
    arguments.push_back(nullptr);
    pid_t process = -1;
    if (::posix_spawn(&process, arguments[0], nullptr, nullptr, arguments.data(), environ) != 0)
        return -1;
    int status = -1;
    ::waitpid(process, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : 1000 + WTERMSIG(status);
}

class Host : public testing::Test
{
protected:
    void SetUp() override
    {
        ::setenv("KYVISA_PORTMAPPER_PORT", m_simulator.resource("portmapper").c_str(), 1);
        ::setenv("KYVISA_CONFIG", "/nonexistent", 1);
    }
    std::string at(const std::string &service) const { return m_simulator.resource(service); }

    test::SimulatorProcess m_simulator{
        {"--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0", "--gpib"}};
};

TEST_F(Host, MayUnloadTheLibraryAtAnyTimeAndLoadItAgain)
{
    EXPECT_EQ(run({RELOADING_HOST, LIBRARY_FILE, at("hislip"), at("socket"), at("vxi11")}), 0);
}

TEST_F(Host, MayHaveTheLibraryTwiceUnderTwoNames)
{
    const std::string copy = testing::TempDir() + "libkyvisa-copy-" + std::to_string(::getpid()) + ".so";
    std::filesystem::copy_file(LIBRARY_FILE, copy, std::filesystem::copy_options::overwrite_existing);
    EXPECT_EQ(run({TWO_COPIES_HOST, LIBRARY_FILE, copy, at("socket"), at("hislip"), at("socket")}), 0);
    std::filesystem::remove(copy);
}

#ifdef FORKING_HOST
TEST_F(Host, MayForkInTheMiddleOfCalls)
{
    // Links to one instrument share its answers: over the bus, children talk to another one.
    EXPECT_EQ(run({FORKING_HOST, at("hislip"), at("socket"), "TCPIP::127.0.0.1::gpib0,7::INSTR", "--", at("hislip"),
                   at("socket"), "TCPIP::127.0.0.1::gpib0,9,1::INSTR"}),
              0);
}
#endif

} // namespace
