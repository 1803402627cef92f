// A file that is loaded and saved and that nobody touched in between keeps its entries.
#include "ConfigFixture.h"

#include <gmock/gmock.h>

using testing::ElementsAre;
using testing::Pair;

namespace
{
class ConfigFileRoundTrip : public ConfigFile
{
protected:
    void loadAndSave() const
    {
        KyConfigFile file(path());
        ASSERT_TRUE(file.load());
        ASSERT_TRUE(file.save());
    }
};
} // namespace

TEST_F(ConfigFileRoundTrip, KeepsAFileThatWasWrittenByHand)
{
    write("; a comment\n"
          "[KYVISA]\n"
          "Debug = 0\n"
          "\n"
          "[KYVXI11-RSRCS]\n"
          "Name0 = \"TCPIP::localhost::inst0::INSTR\"\n"
          "Name1=TCPIP::192.168.1.9::INSTR ; the old one\n"
          "NumOfResources = 2\n"
          "[SOCKET-RSRCS]\n"
          "[HISLIP-RSRCS]\n"
          "Name0 = \"TCPIP::localhost::hislip2,13218::INSTR\"\n"
          "Name1 = TCPIP::localhost::hislip0,4880::INSTR\n"
          "  Name2   =   TCPIP::localhost::hislip1  \n"
          "NumOfResources = 3\n"
          "[ALIASES]\n"
          "Alias0 = \"'local','TCPIP::localhost::inst0::INSTR'\"\n"
          "Alias1 = 'fast','TCPIP::localhost::hislip0,4880::INSTR'\n"
          "NumAliases = 2\n");
    for (int pass = 0; pass < 2; ++pass) {
        loadAndSave();
        EXPECT_THAT(section("KYVISA"), ElementsAre(Pair("Debug", "false")));
        EXPECT_THAT(section("KYVXI11-RSRCS"),
                    ElementsAre(Pair("Name0", "TCPIP::localhost::inst0::INSTR"),
                                Pair("Name1", "TCPIP::192.168.1.9::INSTR"), Pair("NumOfResources", "2")));
        EXPECT_THAT(section("SOCKET-RSRCS"), ElementsAre(Pair("NumOfResources", "0")));
        EXPECT_THAT(section("HISLIP-RSRCS"),
                    ElementsAre(Pair("Name0", "TCPIP::localhost::hislip2,13218::INSTR"),
                                Pair("Name1", "TCPIP::localhost::hislip0,4880::INSTR"),
                                Pair("Name2", "TCPIP::localhost::hislip1"), Pair("NumOfResources", "3")));
        EXPECT_THAT(section("ALIASES"), ElementsAre(Pair("Alias0", "'local','TCPIP::localhost::inst0::INSTR'"),
                                                    Pair("Alias1", "'fast','TCPIP::localhost::hislip0,4880::INSTR'"),
                                                    Pair("NumAliases", "2")));
    }
}

TEST_F(ConfigFileRoundTrip, KeepsTheOrderOfMoreThanTenEntries)
{
    std::string text = "[SOCKET-RSRCS]\n";
    std::string aliases = "[ALIASES]\n";
    for (int i = 0; i < 23; ++i) {
        text += "Name" + std::to_string(i) + " = R" + std::to_string(i) + "\n";
        aliases += "Alias" + std::to_string(i) + " = \"'a" + std::to_string(i) + "','R'\"\n";
    }
    write(text + "NumOfResources = 23\n" + aliases + "NumAliases = 23\n");
    loadAndSave();
    const Section resources = section("SOCKET-RSRCS");
    const Section names = section("ALIASES");
    EXPECT_EQ(resources.size(), 24U);
    EXPECT_EQ(names.size(), 24U);
    for (int i = 0; i < 23; ++i) {
        EXPECT_EQ(resources.at("Name" + std::to_string(i)), "R" + std::to_string(i));
        EXPECT_EQ(names.at("Alias" + std::to_string(i)), "'a" + std::to_string(i) + "','R'");
    }
    EXPECT_EQ(resources.at("NumOfResources"), "23");
    EXPECT_EQ(names.at("NumAliases"), "23");
}

TEST_F(ConfigFileRoundTrip, CorrectsACountThatIsWrongOrMissing)
{
    write("[SOCKET-RSRCS]\nName0 = A\nName1 = B\nNumOfResources = 7\n[ALIASES]\nAlias0 = \"'a','A'\"\n");
    loadAndSave();
    EXPECT_THAT(section("SOCKET-RSRCS"),
                ElementsAre(Pair("Name0", "A"), Pair("Name1", "B"), Pair("NumOfResources", "2")));
    EXPECT_THAT(section("ALIASES"), ElementsAre(Pair("Alias0", "'a','A'"), Pair("NumAliases", "1")));
}

TEST_F(ConfigFileRoundTrip, LeavesTheOtherSectionsAlone)
{
    write("[KYIB-RSRCS]\nName0 = \"KYIB::localhost::INSTR\"\nNumOfResources = 9\n"
          "[KYGPIB-RSRCS]\nName3 = \"GPIB0::5::INSTR\"\nName1 = TCPIP::h::hislip0,4880::INSTR\n"
          "[KYGPIB-GATEWAYS]\nBoard0 = \"TCPIP::192.168.1.9::gpib0\"\n"
          "[SOMEBODY-ELSE]\nKey = value with blanks\n");
    loadAndSave();
    EXPECT_THAT(section("KYIB-RSRCS"),
                ElementsAre(Pair("Name0", "KYIB::localhost::INSTR"), Pair("NumOfResources", "9")));
    EXPECT_THAT(section("KYGPIB-RSRCS"),
                ElementsAre(Pair("Name1", "TCPIP::h::hislip0,4880::INSTR"), Pair("Name3", "GPIB0::5::INSTR")));
    EXPECT_THAT(section("KYGPIB-GATEWAYS"), ElementsAre(Pair("Board0", "TCPIP::192.168.1.9::gpib0")));
    EXPECT_THAT(section("SOMEBODY-ELSE"), ElementsAre(Pair("Key", "value with blanks")));
}

TEST_F(ConfigFileRoundTrip, KeepsAnAliasThatCannotBeSplit)
{
    write("[ALIASES]\nAlias0 = \"'a', 'A'\"\nAlias1 = lonely\n");
    loadAndSave();
    EXPECT_THAT(section("ALIASES"),
                ElementsAre(Pair("Alias0", "'a', 'A'"), Pair("Alias1", "lonely"), Pair("NumAliases", "2")));
}

TEST_F(ConfigFileRoundTrip, KeepsEveryByteBehindAscii)
{
    // UTF-8, then the same umlaut in Latin-1, which is no UTF-8.
    for (const std::string umlaut : {"\xc3\xbc", "\xfc"}) {
        write("[SOCKET-RSRCS]\nName0 = \"TCPIP::m" + umlaut + "nchen::5025::SOCKET\"\n");
        loadAndSave();
        EXPECT_THAT(section("SOCKET-RSRCS"), ElementsAre(Pair("Name0", "TCPIP::m" + umlaut + "nchen::5025::SOCKET"),
                                                         Pair("NumOfResources", "1")));
    }
}

TEST_F(ConfigFileRoundTrip, ReadsUtf8)
{
    write("[SOCKET-RSRCS]\nName0 = \"m\xc3\xbcnchen\"\n");
    KyConfigFile file(path());
    file.load();
    EXPECT_EQ(file.listOfResources().first().second, QStringLiteral("m\u00fcnchen"));
}

TEST_F(ConfigFileRoundTrip, StartsAfreshWithEachLoad)
{
    write("[SOCKET-RSRCS]\nName0 = A\n[ALIASES]\nAlias0 = \"'a','A'\"\n");
    KyConfigFile file(path());
    file.load();
    write("[KYVISA]\nDebug = 1\n[SOCKET-RSRCS]\nName0 = Another\n");
    file.load();
    EXPECT_TRUE(file.debugEnable());
    EXPECT_THAT(seconds(file.listOfResources()), ElementsAre("Another"));
    EXPECT_TRUE(file.listOfAlias().isEmpty());
    EXPECT_TRUE(file.save());
    EXPECT_THAT(section("SOCKET-RSRCS"), ElementsAre(Pair("Name0", "Another"), Pair("NumOfResources", "1")));
}

TEST_F(ConfigFileRoundTrip, SavingTwiceChangesNothingMore)
{
    write("[SOCKET-RSRCS]\nName0 = A\nName1 = B,C\n");
    KyConfigFile file(path());
    file.load();
    EXPECT_TRUE(file.save());
    const std::string once = content();
    EXPECT_TRUE(file.save());
    EXPECT_EQ(content(), once);
}

TEST_F(ConfigFileRoundTrip, LosesComments)
{
    write("; who did this\n[SOCKET-RSRCS]\n;Name0 = A\nName0 = B\n");
    loadAndSave();
    EXPECT_EQ(content().find(';'), std::string::npos);
    EXPECT_THAT(section("SOCKET-RSRCS"), ElementsAre(Pair("Name0", "B"), Pair("NumOfResources", "1")));
}

TEST_F(ConfigFileRoundTrip, SurvivesADamagedFile)
{
    write(
        std::string("[SOCKET-RSRCS\nName0 A\n=\n\"\n[ALIASES]\nAlias0 = \"'a','A\nAlias1 = 'b','B'\n\0\xff\xfe[[", 70));
    KyConfigFile file(path());
    EXPECT_TRUE(file.load());
    EXPECT_TRUE(file.save());
    EXPECT_TRUE(file.load());
}
