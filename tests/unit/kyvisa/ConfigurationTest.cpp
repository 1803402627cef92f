#include "kyvisa/core/Configuration.h"
#include "support/TemporaryFolder.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

using namespace kyvisa;
using List = Configuration::List;
using Texts = std::vector<std::string>;

namespace
{

Configuration parse(std::string_view text, const std::vector<int> &expectedDamage = {})
{
    std::vector<int> damaged;
    Configuration configuration = parseConfiguration(text, damaged);
    EXPECT_EQ(damaged, expectedDamage);
    return configuration;
}

/// A folder of its own, gone at the end. The library's places are in it.
class ConfigurationFiles : public testing::Test
{
protected:
    void SetUp() override
    {
        ::unsetenv("KYVISA_CONFIG");
        ::unsetenv("XDG_CONFIG_HOME");
        ::setenv("HOME", (m_folder / "home").c_str(), 1);
    }
    void write(const std::filesystem::path &file, const std::string &text)
    {
        std::filesystem::create_directories((m_folder / file).parent_path());
        std::ofstream(m_folder / file) << text;
    }
    static std::string board0() { return readConfiguration().gateways[0]; }

    test::TemporaryFolder m_temporary;
    const std::filesystem::path m_folder = m_temporary.file("");
};

} // namespace

TEST(Configuration, ReadsTheFileThatOtherProgramsWrite)
{
    const Configuration configuration = parse("[KYVISA]\n"
                                              "Debug=true\n"
                                              "\n"
                                              "[KYVXI11-RSRCS]\n"
                                              "Name0=TCPIP::localhost::inst0::INSTR\n"
                                              "Name1=TCPIP::192.169.0.1::INSTR\n"
                                              "NumOfResources=2\n"
                                              "[SOCKET-RSRCS]\n"
                                              "Name0=TCPIP::localhost::13217::SOCKET\n"
                                              "NumOfResources=1\n"
                                              "[HISLIP-RSRCS]\n"
                                              "Name0=\"TCPIP::localhost::hislip2,13218::INSTR\"\n"
                                              "[KYIB-RSRCS]\n"
                                              "Name0=KYIB::localhost::INSTR\n"
                                              "[KYGPIB-RSRCS]\n"
                                              "Name0=GPIB0::5::INSTR\n"
                                              "[ALIASES]\n"
                                              "Alias0=\"'local','TCPIP::localhost::inst0::INSTR'\"\n"
                                              "NumAliases=1\n"
                                              "[KYGPIB-GATEWAYS]\n"
                                              "Board0 = \"TCPIP::192.168.1.9::gpib0\"\n"
                                              "Board12=TCPIP::10.0.0.1::gpib1\n");
    EXPECT_TRUE(configuration.debug);
    EXPECT_EQ(configuration.resourcesOf(List::Vxi11),
              (Texts{"TCPIP::localhost::inst0::INSTR", "TCPIP::192.169.0.1::INSTR"}));
    EXPECT_EQ(configuration.resourcesOf(List::Socket), Texts{"TCPIP::localhost::13217::SOCKET"});
    EXPECT_EQ(configuration.resourcesOf(List::Hislip), Texts{"TCPIP::localhost::hislip2,13218::INSTR"});
    EXPECT_EQ(configuration.resourcesOf(List::Gpib), Texts{"GPIB0::5::INSTR"});
    ASSERT_EQ(configuration.aliases.size(), 1u);
    EXPECT_EQ(configuration.aliases[0].name, "local");
    EXPECT_EQ(configuration.aliases[0].resource, "TCPIP::localhost::inst0::INSTR");
    ASSERT_NE(configuration.resourceOf("LOCAL"), nullptr);
    EXPECT_EQ(*configuration.resourceOf("LOCAL"), "TCPIP::localhost::inst0::INSTR");
    EXPECT_EQ(configuration.resourceOf("remote"), nullptr);
    EXPECT_EQ(configuration.gateways.size(), 2u);
    EXPECT_EQ(configuration.gateways.at(0), "TCPIP::192.168.1.9::gpib0");
    EXPECT_EQ(configuration.gateways.at(12), "TCPIP::10.0.0.1::gpib1");
}

TEST(Configuration, TakesTrueFalseOneAndZeroQuotedOrNot)
{
    for (const char *on : {"1", "true", "True", "\"1\"", "\"true\"", " 1 ", "TRUE"})
        EXPECT_TRUE(parse(std::string("[KYVISA]\nDebug=") + on + "\n").debug) << on;
    for (const char *off : {"0", "false", "\"0\"", "\"FALSE\"", "yes please", "2"})
        EXPECT_FALSE(parse(std::string("[KYVISA]\nDebug = ") + off + "\n").debug) << off;
    EXPECT_FALSE(parse("[OTHER]\nDebug=1\n").debug);
    EXPECT_FALSE(parse("").debug);
}

TEST(Configuration, EntriesCountByTheirNumbersAndIndentedLinesAreLines)
{
    const Configuration configuration = parse("[socket-rsrcs]\r\n"
                                              "  name10 = ten\r\n"
                                              "\tName9 = nine\r\n"
                                              "  Name1 =one ; the first\r\n"
                                              "  Named = nobody\r\n"
                                              "  Name = nobody\r\n"
                                              "  Name1x = nobody\r\n"
                                              "; Name2 = two\r\n"
                                              "# Name3 = three\r\n");
    EXPECT_EQ(configuration.resourcesOf(List::Socket), (Texts{"one", "nine", "ten"}));
}

TEST(Configuration, AnAliasWithoutItsResourceIsNone)
{
    const Configuration configuration = parse("[ALIASES]\n"
                                              "Alias0='one'\n"
                                              "Alias1=\"'','TCPIP::a::INSTR'\"\n"
                                              "Alias2='two','TCPIP::b::INSTR'\n"
                                              "Alias3=\"'it\\\"s','TCPIP::c::INSTR'\"\n");
    ASSERT_EQ(configuration.aliases.size(), 2u);
    EXPECT_EQ(configuration.aliases[0].name, "two");
    EXPECT_EQ(configuration.aliases[0].resource, "TCPIP::b::INSTR");
    EXPECT_EQ(configuration.aliases[1].name, "it\"s");
}

TEST(Configuration, SkipsDamagedLinesAndSaysWhichTheyAre)
{
    std::string text = "no sense at all\n"
                       "[KYGPIB-GATEWAYS\n"
                       "[KYGPIB-GATEWAYS]\n"
                       "Board0 TCPIP\n"
                       "Board1 = good\n"
                       "Board2 = " +
                       std::string(5000, 'x') +
                       "\n"
                       "Board3 = good\n"
                       "Board4 = ";
    text += '\0';
    text += "\nBoard99999 = far\nBoard-1 = negative\n";
    const Configuration configuration = parse(text, {1, 2, 4, 6, 8});
    EXPECT_EQ(configuration.gateways.size(), 2u);
    EXPECT_EQ(configuration.gateways.at(1), "good");
    EXPECT_EQ(configuration.gateways.at(3), "good");
}

TEST(Configuration, SurvivesAnyBytes)
{
    std::vector<int> damaged;
    unsigned state = 1;
    for (int round = 0; round < 200; ++round) {
        std::string text;
        for (int i = 0; i < 2000; ++i) {
            state = state * 1664525u + 1013904223u;
            constexpr char Some[] = "[]=:;\"'\\\n \tNameBoard0KYVISA\r#,";
            text += state >> 31 ? static_cast<char>(state >> 16) : Some[(state >> 20) % (sizeof Some - 1)];
        }
        parseConfiguration(text, damaged);
    }
    parseConfiguration(std::string(3 * LongestConfiguration, '\n'), damaged);
    parseConfiguration(std::string(LongestConfiguration, '['), damaged);
    EXPECT_EQ(damaged, std::vector<int>{1});
}

TEST_F(ConfigurationFiles, TheFirstPlaceThatHasAFileCounts)
{
    EXPECT_EQ(board0(), "") << "without any file";
    write("home/.config/Oltrava/kyvisa.ini", "[KYGPIB-GATEWAYS]\nBoard0=home\n");
    EXPECT_EQ(board0(), "home");
    ::setenv("XDG_CONFIG_HOME", (m_folder / "xdg").c_str(), 1);
    EXPECT_EQ(board0(), "") << "the other folder takes the place of ~/.config";
    write("xdg/Oltrava/kyvisa.ini", "[KYGPIB-GATEWAYS]\nBoard0=xdg\n");
    EXPECT_EQ(board0(), "xdg");
    ::setenv("KYVISA_CONFIG", (m_folder / "own.ini").c_str(), 1);
    EXPECT_EQ(board0(), "xdg") << "a file that is not there is passed over";
    write("own.ini", "[KYGPIB-GATEWAYS]\nBoard0=own\n");
    EXPECT_EQ(board0(), "own");
    ::setenv("KYVISA_CONFIG", "", 1);
    EXPECT_EQ(board0(), "xdg");
}

TEST_F(ConfigurationFiles, WhatIsNoFileIsPassedOver)
{
    write("home/.config/Oltrava/kyvisa.ini", "[KYGPIB-GATEWAYS]\nBoard0=home\n");
    ::setenv("KYVISA_CONFIG", m_folder.c_str(), 1);
    EXPECT_EQ(board0(), "home") << "a folder";
    ASSERT_EQ(::mkfifo((m_folder / "pipe").c_str(), 0600), 0);
    ::setenv("KYVISA_CONFIG", (m_folder / "pipe").c_str(), 1);
    EXPECT_EQ(board0(), "home") << "a pipe that nobody writes";
}

TEST_F(ConfigurationFiles, DamagedLinesAreToldWithDebugOnAlone)
{
    ::setenv("KYVISA_CONFIG", (m_folder / "own.ini").c_str(), 1);
    write("own.ini", "nonsense\n[KYVISA]\nDebug=0\n");
    testing::internal::CaptureStderr();
    readConfiguration();
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
    write("own.ini", "nonsense\n[KYVISA]\nDebug=1\nmore nonsense\n");
    testing::internal::CaptureStderr();
    EXPECT_TRUE(readConfiguration().debug);
    const std::string file = (m_folder / "own.ini").string();
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "kyvisa: " + file + ":1: this line makes no sense and is skipped\n" + "kyvisa: " + file +
                  ":4: this line makes no sense and is skipped\n");
}
