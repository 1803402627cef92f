// Debug = 1 in the configuration file: every call, with its arguments, its status and its duration, on standard error.
#include "support/SimulatorProcess.h"

#include <visa.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sstream>
#include <string>
#include <unistd.h>
#include <vector>

using test::SimulatorProcess;
using testing::ElementsAre;
using testing::MatchesRegex;

namespace
{

class Trace : public testing::Test
{
protected:
    void TearDown() override
    {
        // What a resource manager session says holds for the process until the next one is opened.
        configure("");
        ViSession rm = VI_NULL;
        viOpenDefaultRM(&rm);
        viClose(rm);
        ::unsetenv("KYVISA_CONFIG");
        std::filesystem::remove(m_file);
    }
    void configure(const std::string &text)
    {
        std::ofstream(m_file) << text;
        ::setenv("KYVISA_CONFIG", m_file.c_str(), 1);
    }
    std::vector<std::string> captured()
    {
        std::istringstream text(testing::internal::GetCapturedStderr());
        std::vector<std::string> lines;
        for (std::string line; std::getline(text, line);)
            lines.push_back(line);
        return lines;
    }

    SimulatorProcess m_simulator{{"--hislip", "0"}};
    const std::string m_file = testing::TempDir() + "trace-" + std::to_string(::getpid()) + ".ini";
};

TEST_F(Trace, TellsEveryCallInOneLine)
{
    configure("[KYVISA]\nDebug = 1\n");
    testing::internal::CaptureStderr();
    ViSession rm = VI_NULL;
    ViSession vi = VI_NULL;
    ViUInt32 count = 0;
    std::string answer(100, '\0');
    viOpenDefaultRM(&rm);
    viOpen(rm, m_simulator.resource("hislip").c_str(), VI_NO_LOCK, 5000, &vi);
    viWrite(vi, reinterpret_cast<ViConstBuf>("*ESE 5;*ESE?\n"), 13, &count);
    viRead(vi, reinterpret_cast<ViPBuf>(answer.data()), 100, &count);
    viSetAttribute(vi, VI_ATTR_TMO_VALUE, 1);
    viRead(vi, reinterpret_cast<ViPBuf>(answer.data()), 100, nullptr);
    viPrintf(vi, "*CLS\n");
    viIn32(vi, 1, 0, nullptr);
    viStatusDesc(vi, VI_SUCCESS, answer.data());
    viClose(rm);
    viClose(rm);
    const std::string manager = std::to_string(rm);
    const std::string session = std::to_string(vi);
    EXPECT_THAT(
        captured(),
        ElementsAre(
            // Of a length that such a call can have, though nothing was traced when it began.
            MatchesRegex("viOpenDefaultRM\\(" + manager + "\\) = VI_SUCCESS, [0-9]{1,5}\\.[0-9]{3} ms"),
            MatchesRegex("viOpen\\(" + manager + ", \"TCPIP::127.0.0.1::hislip0,[0-9]+::INSTR\", 0, 5000, " + session +
                         "\\) = VI_SUCCESS, .* ms"),
            MatchesRegex("viWrite\\(" + session + ", \"\\*ESE 5;\\*ESE\\?\\\\n\", 13, 13\\) = VI_SUCCESS, .* ms"),
            MatchesRegex("viRead\\(" + session + ", \"5\\\\n\", 100, 2\\) = VI_SUCCESS, .* ms"),
            MatchesRegex("viSetAttribute\\(" + session + ", 1073676314, 1\\) = VI_SUCCESS, .* ms"),
            MatchesRegex("viRead\\(" + session + ", 0x[0-9a-f]+, 100, NULL\\) = VI_ERROR_TMO, .* ms"),
            MatchesRegex("viPrintf\\(" + session + ", \"\\*CLS\\\\n\"\\) = VI_SUCCESS, .* ms"),
            MatchesRegex("viIn32\\(" + session + "\\) = VI_ERROR_NSUP_OPER, .* ms"),
            MatchesRegex("viStatusDesc\\(" + session + ", 0, \"Operation completed\\.\"\\) = VI_SUCCESS, .* ms"),
            MatchesRegex("viClose\\(" + manager + "\\) = VI_SUCCESS, .* ms"),
            MatchesRegex("viClose\\(" + manager + "\\) = VI_ERROR_INV_OBJECT, .* ms")));
}

TEST_F(Trace, PrintsNothingUnlessAskedTo)
{
    configure("[KYVISA]\nDebug = 0\nrubbish\n");
    testing::internal::CaptureStderr();
    ViSession rm = VI_NULL;
    ViSession vi = VI_NULL;
    viOpenDefaultRM(&rm);
    viOpen(rm, m_simulator.resource("hislip").c_str(), VI_NO_LOCK, 5000, &vi);
    viPrintf(vi, "*CLS\n");
    viClose(rm);
    EXPECT_THAT(captured(), ElementsAre());
}

TEST_F(Trace, CutsWhatIsLongAndEscapesWhatIsNotReadable)
{
    configure("[KYVISA]\nDebug = 1\n");
    testing::internal::CaptureStderr();
    ViSession rm = VI_NULL;
    viOpenDefaultRM(&rm);
    const std::string data = "\x01\"\\\r\xFF" + std::string(100, 'x');
    viWrite(rm, reinterpret_cast<ViConstBuf>(data.data()), 105, nullptr);
    viWrite(rm, nullptr, 0, nullptr);
    const std::vector<std::string> lines = captured();
    ASSERT_EQ(lines.size(), 3u);
    EXPECT_THAT(lines[1],
                testing::HasSubstr(", \"\\x01\\\"\\\\\\r\\xff" + std::string(75, 'x') + "\"..., 105, NULL) = "));
    EXPECT_THAT(lines[2], testing::HasSubstr(", NULL, 0, NULL) = VI_ERROR_NSUP_OPER"));
    viClose(rm);
}

} // namespace
