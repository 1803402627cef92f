#include "ConfigFixture.h"

#include <gmock/gmock.h>

#include <sys/stat.h>

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::UnorderedElementsAre;
using Type = KyConfigFile::ResourceType;

TEST_F(ConfigFile, NamesTheSectionsOfTheFiveTypes)
{
    EXPECT_EQ(KyConfigFile::typeToString(Type::Vxi11), "KYVXI11-RSRCS");
    EXPECT_EQ(KyConfigFile::typeToString(Type::Socket), "SOCKET-RSRCS");
    EXPECT_EQ(KyConfigFile::typeToString(Type::Hislip), "HISLIP-RSRCS");
    EXPECT_EQ(KyConfigFile::typeToString(Type::Kyib), "KYIB-RSRCS");
    EXPECT_EQ(KyConfigFile::typeToString(Type::Gpib), "KYGPIB-RSRCS");
    EXPECT_EQ(KyConfigFile::typeToString(static_cast<Type>(5)), "");
    EXPECT_EQ(KyConfigFile::typeToString(static_cast<Type>(-1)), "");
}

TEST_F(ConfigFile, LoadsAMissingFileAsEmpty)
{
    KyConfigFile file(path());
    EXPECT_TRUE(file.load());
    EXPECT_FALSE(file.debugEnable());
    EXPECT_THAT(file.listOfResources(), IsEmpty());
    EXPECT_THAT(file.listOfAlias(), IsEmpty());
    EXPECT_FALSE(QFile::exists(path()));
}

TEST_F(ConfigFile, LoadsWhatCannotBeReadAsEmpty)
{
    KyConfigFile folderInstead(folder());
    EXPECT_TRUE(folderInstead.load());
    EXPECT_THAT(folderInstead.listOfAlias(), IsEmpty());
    EXPECT_FALSE(folderInstead.save());

    KyConfigFile nothing{QString()};
    EXPECT_TRUE(nothing.load());
    EXPECT_THAT(nothing.listOfAlias(), IsEmpty());
    EXPECT_FALSE(nothing.save());
}

TEST_F(ConfigFile, ReadsTheDebugSwitchInAllItsSpellings)
{
    const std::pair<const char *, bool> rows[] = {
        {"Debug = 1", true},     {"Debug=1", true},      {"Debug = true", true},
        {"Debug = \"1\"", true}, {"Debug = 0", false},   {"Debug = false", false},
        {"Debug =", false},      {"; Debug = 1", false}, {"Other = 1", false},
    };
    for (const auto &[line, expected] : rows) {
        write(std::string("[KYVISA]\n") + line + "\n");
        KyConfigFile file(path());
        file.setDebugEnable(!expected);
        file.load();
        EXPECT_EQ(file.debugEnable(), expected) << line;
    }
}

TEST_F(ConfigFile, LoadsTheThreeNetworkSectionsIntoOneListAndTheOthersNot)
{
    write("[KYIB-RSRCS]\nName0 = \"KYIB::localhost::INSTR\"\n"
          "[KYGPIB-RSRCS]\nName0 = \"GPIB0::5::INSTR\"\n"
          "[HISLIP-RSRCS]\nName0 = \"TCPIP::c::hislip0\"\n"
          "[SOCKET-RSRCS]\nName0 = \"TCPIP::b::5025::SOCKET\"\n"
          "[KYVXI11-RSRCS]\nName0 = \"TCPIP::a::inst0::INSTR\"\n");
    KyConfigFile file(path());
    file.load();
    EXPECT_THAT(seconds(file.listOfResources()),
                ElementsAre("TCPIP::a::inst0::INSTR", "TCPIP::b::5025::SOCKET", "TCPIP::c::hislip0"));
    const auto first = file.listOfResources().first();
    EXPECT_EQ(first.first, "Name0");
    EXPECT_EQ(first.section, "KYVXI11-RSRCS");
    EXPECT_EQ(first.key, "Name0");
}

TEST_F(ConfigFile, LoadsEveryKeyOfASectionTheCountToo)
{
    write("[SOCKET-RSRCS]\nName0 = A\nNote = B\nNumOfResources = 1\n[ALIASES]\nAlias0 = \"'a','A'\"\nNumAliases = 1\n");
    KyConfigFile file(path());
    file.load();
    EXPECT_THAT(seconds(file.listOfResources()), ElementsAre("A", "B", "1"));
    ASSERT_EQ(file.listOfAlias().size(), 2);
    EXPECT_EQ(file.listOfAlias()[1].first, "1");
    EXPECT_EQ(file.listOfAlias()[1].second, "");
}

TEST_F(ConfigFile, SplitsAliasesHoweverTheyAreQuoted)
{
    write("[ALIASES]\n"
          "Alias0 = \"'local','TCPIP::localhost::inst0::INSTR'\"\n"
          "Alias1 = 'bare','TCPIP::h::hislip0,4880::INSTR'\n"
          "Alias2='tight','ASRL1::INSTR'\n"
          "Alias3 = lonely\n"
          "Alias4 = \"'a','b','c'\"\n"
          "Alias5 =\n");
    KyConfigFile file(path());
    file.load();
    const std::pair<const char *, const char *> expected[] = {
        {"local", "TCPIP::localhost::inst0::INSTR"},
        {"bare", "TCPIP::h::hislip0,4880::INSTR"},
        {"tight", "ASRL1::INSTR"},
        {"lonely", ""},
        {"a", "b"},
        {"", ""},
    };
    ASSERT_EQ(file.listOfAlias().size(), 6);
    for (int i = 0; i < 6; ++i) {
        EXPECT_EQ(file.listOfAlias()[i].first, expected[i].first);
        EXPECT_EQ(file.listOfAlias()[i].second, expected[i].second);
    }
}

TEST_F(ConfigFile, WritesTheLayoutThatTheLibraryReads)
{
    KyConfigFile file(path());
    file.load();
    file.setDebugEnable(true);
    file.setListOfAlias({{"local", "TCPIP::localhost::inst0::INSTR"}});
    EXPECT_TRUE(file.save());

    EXPECT_THAT(section("KYVISA"), ElementsAre(Pair("Debug", "true")));
    EXPECT_THAT(section("ALIASES"),
                ElementsAre(Pair("Alias0", "'local','TCPIP::localhost::inst0::INSTR'"), Pair("NumAliases", "1")));
    for (const char *name : {"KYVXI11-RSRCS", "SOCKET-RSRCS", "HISLIP-RSRCS"})
        EXPECT_THAT(section(name), ElementsAre(Pair("NumOfResources", "0"))) << name;
    EXPECT_EQ(content().find("KYIB"), std::string::npos);
    EXPECT_EQ(content().find("KYGPIB"), std::string::npos);
}

TEST_F(ConfigFile, WritesARecordMadeByHandIntoEverySavedSection)
{
    KyConfigFile file(path());
    file.load();
    file.setListOfResource({{"", "TCPIP::new::INSTR"}});
    EXPECT_TRUE(file.save());
    for (const char *name : {"KYVXI11-RSRCS", "SOCKET-RSRCS", "HISLIP-RSRCS"})
        EXPECT_THAT(section(name), ElementsAre(Pair("Name0", "TCPIP::new::INSTR"), Pair("NumOfResources", "1")))
            << name;
}

TEST_F(ConfigFile, AppendsARecordMadeByHandBehindTheLoadedOnes)
{
    write("[SOCKET-RSRCS]\nName0 = A\nName1 = B\nNumOfResources = 2\n");
    KyConfigFile file(path());
    file.load();
    auto records = file.listOfResources();
    records.prepend({"", "C"});
    file.setListOfResource(records);
    EXPECT_TRUE(file.save());
    EXPECT_THAT(section("SOCKET-RSRCS"),
                ElementsAre(Pair("Name0", "A"), Pair("Name1", "B"), Pair("Name2", "C"), Pair("NumOfResources", "3")));
}

TEST_F(ConfigFile, RenumbersAfterAnAliasWasRemoved)
{
    write("[ALIASES]\nAlias0 = \"'a','A'\"\nAlias1 = \"'b','B'\"\nAlias2 = \"'c','C'\"\nNumAliases = 3\n");
    KyConfigFile file(path());
    file.load();
    auto aliases = file.listOfAlias();
    aliases.removeAt(1);
    file.setListOfAlias(aliases);
    EXPECT_TRUE(file.save());
    EXPECT_THAT(section("ALIASES"),
                ElementsAre(Pair("Alias0", "'a','A'"), Pair("Alias1", "'c','C'"), Pair("NumAliases", "2")));
}

TEST_F(ConfigFile, WritesAnAliasThatWasChanged)
{
    write("[ALIASES]\nAlias0 = \"'a','A'\"\nAlias1 = lonely\n");
    KyConfigFile file(path());
    file.load();
    auto aliases = file.listOfAlias();
    aliases[0].first = "renamed";
    aliases[1].second = "ASRL1::INSTR";
    file.setListOfAlias(aliases);
    EXPECT_TRUE(file.save());
    EXPECT_THAT(section("ALIASES"), ElementsAre(Pair("Alias0", "'renamed','A'"),
                                                Pair("Alias1", "'lonely','ASRL1::INSTR'"), Pair("NumAliases", "2")));
}

TEST_F(ConfigFile, RefusesToSaveBeforeItWasLoaded)
{
    write("[KYVISA]\nDebug = 1\n");
    KyConfigFile file(path());
    EXPECT_FALSE(file.save());
    file.load(Type::Socket);
    file.save(Type::Socket);
    file.loadDebug();
    file.saveDebug();
    file.loadAlias();
    file.saveAlias();
    EXPECT_EQ(content(), "[KYVISA]\nDebug = 1\n");
}

TEST_F(ConfigFile, RefusesToSaveAReadOnlyFileAndLeavesItAlone)
{
    const std::string before = "[KYVISA]\nDebug = 1\n\n[SOCKET-RSRCS]\nName0 = A\n";
    write(before);
    ASSERT_EQ(chmod(folder().toLocal8Bit().constData(), 0755), 0);
    ASSERT_EQ(chmod(path().toLocal8Bit().constData(), 0444), 0);
    const QString name = path();
    const int answer = asNobody([&name] {
        KyConfigFile file(name);
        file.load();
        file.setDebugEnable(false);
        file.setListOfResource({});
        const bool loaded = file.listOfAlias().isEmpty() && file.load() && file.listOfResources().size() == 1;
        return (loaded ? 0 : 2) + (file.save() ? 1 : 0);
    });
    EXPECT_EQ(answer, 0);
    EXPECT_EQ(content(), before);
}

TEST_F(ConfigFile, ASaveThatWasRefusedLeavesNothingToBeWrittenLater)
{
    const std::string before = "[SOCKET-RSRCS]\nName0 = A\n";
    write(before);
    const QByteArray name = path().toLocal8Bit();
    ASSERT_EQ(chmod(folder().toLocal8Bit().constData(), 0755), 0);
    ASSERT_TRUE(geteuid() != 0 || chown(name.constData(), 65534, 65534) == 0);
    ASSERT_EQ(chmod(name.constData(), 0444), 0);
    const int answer = asNobody([&name] {
        KyConfigFile file(QString::fromLocal8Bit(name));
        file.load();
        file.setListOfResource({});
        const bool saved = file.save();
        const bool unlocked = chmod(name.constData(), 0644) == 0;
        file.load();
        return (saved ? 1 : 0) + (unlocked ? 0 : 2) + (file.listOfResources().size() == 1 ? 0 : 4);
    });
    EXPECT_EQ(answer, 0);
    EXPECT_EQ(content(), before);
}

TEST_F(ConfigFile, SavesAWritableFileInAFolderThatIsNot)
{
    write("[SOCKET-RSRCS]\nName0 = A\n");
    ASSERT_EQ(chmod(folder().toLocal8Bit().constData(), 0555), 0);
    ASSERT_EQ(chmod(path().toLocal8Bit().constData(), 0666), 0);
    const QString name = path();
    const int answer = asNobody([&name] {
        KyConfigFile file(name);
        file.load();
        return file.save() ? 1 : 0;
    });
    chmod(folder().toLocal8Bit().constData(), 0755);
    EXPECT_EQ(answer, 1);
    EXPECT_THAT(section("SOCKET-RSRCS"), ElementsAre(Pair("Name0", "A"), Pair("NumOfResources", "1")));
}

TEST_F(ConfigFile, TakesANewPathWithTheNextLoad)
{
    write("[ALIASES]\nAlias0 = \"'a','A'\"\n");
    KyConfigFile file(folder() + "/other.ini");
    file.setFilePath(path());
    file.load();
    EXPECT_THAT(seconds(file.listOfAlias()), ElementsAre("A"));
}

TEST_F(ConfigFile, LoadsAndSavesOneSectionByItsType)
{
    write("[KYGPIB-RSRCS]\nName0 = \"GPIB0::5::INSTR\"\nName7 = \"GPIB0::7::INSTR\"\n");
    KyConfigFile file(path());
    file.load();
    file.load(Type::Gpib);
    EXPECT_THAT(seconds(file.listOfResources()), ElementsAre("GPIB0::5::INSTR", "GPIB0::7::INSTR"));
    file.save(Type::Gpib);
    EXPECT_TRUE(file.save());
    EXPECT_THAT(section("KYGPIB-RSRCS"), ElementsAre(Pair("Name0", "GPIB0::5::INSTR"), Pair("Name1", "GPIB0::7::INSTR"),
                                                     Pair("NumOfResources", "2")));
    EXPECT_THAT(section("SOCKET-RSRCS"), ElementsAre(Pair("NumOfResources", "0")));
}
