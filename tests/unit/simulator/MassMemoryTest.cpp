#include "unit/simulator/InstrumentTest.h"

using simulator::ByteBudget;
using simulator::Bytes;

namespace
{
using MassMemory = InstrumentTest;
}

TEST_F(MassMemory, GivesBackWhatWasStored)
{
    client.ask("MMEM:DATA 'Test.dat',#15a\n;\"b\n");
    EXPECT_EQ(client.ask("MMEM:DATA? 'Test.dat'\n"), "#15a\n;\"b\n");
    EXPECT_EQ(other.ask("MMEM:DATA? \"test.DAT\"\n"), "#15a\n;\"b\n") << "one memory for all, names without case";
    EXPECT_EQ(client.ask("SYST:ERR?\n"), "0,\"No error\"\n");
}

TEST_F(MassMemory, KeepsBlocksOfAnySize)
{
    for (const std::size_t size : {0u, 1u, 9u, 10u, 65535u, 65536u, 65537u, 1000000u}) {
        std::string content(size, '\0');
        for (std::size_t i = 0; i < size; ++i)
            content[i] = static_cast<char>(i * 7 + i / 256);
        const std::string length = std::to_string(size);
        const std::string block = "#" + std::to_string(length.size()) + length + content;
        client.ask("MMEM:DATA 'f'," + block + "\n");
        EXPECT_TRUE(client.ask("MMEM:DATA? 'f'\n") == block + "\n") << size;
    }
}

TEST_F(MassMemory, TakesIndefiniteAndLongBlocks)
{
    client.ask("MMEM:DATA 'a',#0x\ny\n");
    EXPECT_EQ(client.ask("MMEM:DATA? 'a'"), "#13x\ny\n");
    client.ask("MMEM:DATA 'a',#(2)zz");
    EXPECT_EQ(client.ask("MMEM:DATA? 'a'"), "#12zz\n");
}

TEST_F(MassMemory, ListsItsFiles)
{
    EXPECT_EQ(client.ask("MMEM:CAT?"), "0,3000000\n");
    client.ask("MMEM:DATA 'B.dat',#13abc;DATA 'a',#11x");
    EXPECT_EQ(client.ask("MMEM:CAT?"), "4,2999996,\"a,BIN,1\",\"B.dat,BIN,3\"\n");
    EXPECT_EQ(client.ask("MMEM:CAT? 'C:\\'"), "4,2999996,\"a,BIN,1\",\"B.dat,BIN,3\"\n");
    client.ask("MMEM:DEL 'b.DAT'");
    EXPECT_EQ(client.ask("MMEM:CAT?"), "1,2999999,\"a,BIN,1\"\n");
    client.ask("MMEM:DATA 'A',#15xxxxx");
    EXPECT_EQ(client.ask("MMEM:CAT?"), "5,2999995,\"A,BIN,5\"\n") << "replaced, not added";
}

TEST_F(MassMemory, HasOneDrive)
{
    EXPECT_EQ(client.ask("MMEM:CDIR 'C:\\';:MMEM:MSIS 'C:';:MMEM:CDIR;:MMEM:MSIS"), "");
    EXPECT_EQ(client.ask(":mmem:msis?\n"), "\"C:\"\n");
    EXPECT_EQ(client.ask(":mmem:cdir?\n"), "\"C:\\\"\n");
    EXPECT_EQ(client.ask("SYST:ERR?"), "0,\"No error\"\n");
    client.ask("MMEM:DATA 'C:\\f',#11x");
    EXPECT_EQ(client.ask("MMEM:DATA? '/F'"), "#11x\n");
}

TEST_F(MassMemory, NamesEachError)
{
    const struct {
        const char *message;
        const char *error;
    } rows[] = {
        {"MMEM:DATA? 'none'", "-256,\"File name not found;none\"\n"},
        {"MMEM:DEL 'none'", "-256,\"File name not found;none\"\n"},
        {"MMEM:DATA '',#11x", "-257,\"File name error\"\n"},
        {"MMEM:DATA '../x',#11x", "-257,\"File name error;../x\"\n"},
        {"MMEM:DATA 'a/b',#11x", "-256,\"File name not found;a/b\"\n"},
        {"MMEM:DATA '..',#11x", "-257,\"File name error;..\"\n"},
        {"MMEM:DATA 'D:x',#11x", "-252,\"Missing media;D:x\"\n"},
        {"MMEM:CDIR 'sub'", "-256,\"File name not found;sub\"\n"},
        {"MMEM:MSIS 'D:'", "-252,\"Missing media;D:\"\n"},
        {"MMEM:DATA 'x'", "-109,\"Missing parameter;MMEM:DATA\"\n"},
        {"MMEM:DATA 'x',1", "-128,\"Numeric data not allowed\"\n"},
        {"MMEM:DATA 'x',#15ab", "-161,\"Invalid block data\"\n"},
        {"MMEM:DATA x,#11a", "-148,\"Character data not allowed;X\"\n"},
    };
    for (const auto &row : rows) {
        client.ask(row.message);
        EXPECT_EQ(client.ask("SYST:ERR?"), row.error) << row.message;
    }
    EXPECT_EQ(client.ask("MMEM:CAT?"), "0,3000000\n");
}

TEST_F(MassMemory, IsFullBeforeTheMachineIs)
{
    const std::string block = "#71500000" + std::string(1500000, 'x');
    client.ask("MMEM:DATA 'a'," + block);
    client.ask("MMEM:DATA 'b'," + block);
    EXPECT_EQ(client.ask("SYST:ERR?"), "0,\"No error\"\n");
    client.ask("MMEM:DATA 'c',#11x");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-254,\"Media full;c\"\n");
    client.ask("MMEM:DATA 'a'," + block);
    EXPECT_EQ(client.ask("SYST:ERR?"), "0,\"No error\"\n") << "what is replaced makes room";
}

TEST_F(MassMemory, HoldsAThousandFiles)
{
    for (int i = 0; i < 1000; ++i)
        client.ask("MMEM:DATA 'f" + std::to_string(i) + "',#11x");
    EXPECT_EQ(client.ask("SYST:ERR?"), "0,\"No error\"\n");
    client.ask("MMEM:DATA 'one more',#11x");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-255,\"Directory full;one more\"\n");
}

TEST_F(MassMemory, KeepsAFileWholeForAnAnswerThatIsOnItsWay)
{
    client.ask("MMEM:DATA 'f',#13abc");
    EXPECT_EQ(client.ask("MMEM:DATA? 'f';DEL 'f';CAT?"), "#13abc;0,3000000\n");
}

TEST_F(MassMemory, KeepsFilesOfOneNameInEachDirectory)
{
    client.ask("MMEM:MDIR 'Sub';MDIR 'sub/Deep';DATA 'f',#11a;DATA 'SUB\\F',#12bb;DATA '/sub/deep/f',#13ccc");
    EXPECT_EQ(client.ask("SYST:ERR?"), "0,\"No error\"\n");
    EXPECT_EQ(client.ask("MMEM:DATA? 'f';DATA? 'C:/Sub/f';DATA? 'sub/./deep/../deep/f'"), "#11a;#12bb;#13ccc\n");
    EXPECT_EQ(client.ask("MMEM:CAT?"), "6,2999994,\"f,BIN,1\",\"Sub,DIR,0\"\n");
    EXPECT_EQ(client.ask("MMEM:CAT? 'sub';CAT:LENG?;LENG? 'sub'"), "6,2999994,\"Deep,DIR,0\",\"F,BIN,2\";2;2\n");
    EXPECT_EQ(client.ask("MMEM:DIR?;DIR? 'sub';DIR? 'SUB/DEEP'"), "\"f\",\"Sub\\\";\"Deep\\\",\"F\";\"f\"\n");
    EXPECT_EQ(client.ask("MMEM:DCAT?;DCAT? 'sub/deep'"), "\"Sub\";\"\"\n");
}

TEST_F(MassMemory, ShowsEachFileWithItsPath)
{
    client.ask("MMEM:MDIR 'Sub';MDIR 'Sub/Deep';DATA 'f',#11a;DATA 'SUB\\DEEP\\G',#12bb;:SIM:MED MISS");
    std::vector<std::string> files;
    instrument.massMemory.forEach(
        [&](const std::string &path, std::size_t size) { files.push_back(path + ' ' + std::to_string(size)); });
    EXPECT_EQ(files, (std::vector<std::string>{"f 1", "Sub\\Deep\\G 2"}));
}

TEST_F(MassMemory, HasACurrentDirectoryThatAllClientsShare)
{
    client.ask("MMEM:MDIR 'Sub';CDIR 'sub';MDIR 'In';CDIR 'IN'");
    EXPECT_EQ(other.ask("MMEM:CDIR?"), "\"C:\\Sub\\In\"\n");
    other.ask("MMEM:DATA 'f',#11x");
    EXPECT_EQ(client.ask("MMEM:DATA? 'C:\\Sub\\In\\f';CDIR '..';CDIR?;CDIR;CDIR?"), "#11x;\"C:\\Sub\";\"C:\\\"\n");
    client.ask("MMEM:CDIR 'sub/in';*RST");
    EXPECT_EQ(client.ask("MMEM:CDIR?;CDIR '';CDIR?;DIR?"), "\"C:\\Sub\\In\";\"C:\\\";\"Sub\\\"\n");
    client.ask("MMEM:CDIR '..'");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-257,\"File name error;..\"\n") << "no path leads out";
}

TEST_F(MassMemory, ListsWhatAWildcardMatches)
{
    client.ask("MMEM:MDIR 'd';DATA 'a.dat',#11x;DATA 'ab.dat',#11x;DATA 'b.txt',#11x;DATA 'd/a.dat',#11x");
    EXPECT_EQ(client.ask("MMEM:DIR? '*.DAT'"), "\"a.dat\",\"ab.dat\"\n");
    EXPECT_EQ(client.ask("MMEM:DIR? '?.*';DIR? '*';DIR? 'd/*a*t';DIR? 'x*'"),
              "\"a.dat\",\"b.txt\";\"a.dat\",\"ab.dat\",\"b.txt\",\"d\\\";\"a.dat\";\"\"\n");
    EXPECT_EQ(client.ask("SYST:ERR?"), "0,\"No error\"\n");
    client.ask("MMEM:DEL '*';DATA '*',#11x;COPY 'a.dat','?';MDIR '*';CAT? '*/a';DIR? 'nothing'");
    EXPECT_EQ(client.ask("SYST:ERR:ALL?"),
              "-257,\"File name error;*\",-257,\"File name error;*\",-257,\"File name error;?\","
              "-257,\"File name error;*\",-257,\"File name error;*/a\",-256,\"File name not found;nothing\"\n");
}

TEST_F(MassMemory, CopiesAndMoves)
{
    client.ask("MMEM:MDIR 'd';DATA 'a',#13abc;COPY 'a','b';COPY 'a','d';COPY 'A','a'");
    EXPECT_EQ(client.ask("MMEM:DATA? 'b';DATA? 'd/a';CAT?"),
              "#13abc;#13abc;9,2999991,\"a,BIN,3\",\"b,BIN,3\",\"d,DIR,0\"\n");
    client.ask("MMEM:MOVE 'b','d/c';MOVE 'a','D';MOVE 'd/c','d/C'");
    EXPECT_EQ(client.ask("MMEM:CAT?;CAT? 'd'"), "6,2999994,\"d,DIR,0\";6,2999994,\"a,BIN,3\",\"C,BIN,3\"\n");
    client.ask("MMEM:MDIR 'e';MDIR 'e/f';MOVE 'd','e/f'");
    EXPECT_EQ(client.ask("MMEM:DATA? 'e/f/d/a';CAT?"), "#13abc;6,2999994,\"e,DIR,0\"\n");
    client.ask("MMEM:MOVE 'e','Renamed'");
    EXPECT_EQ(client.ask("MMEM:DATA? 'renamed/f/d/c';DIR?"), "#13abc;\"Renamed\\\"\n");
    client.ask("MMEM:DEL 'renamed/f/d/a';DEL 'renamed/f/d/c';RDIR 'renamed/f/d';RDIR 'renamed/f';RDIR 'renamed'");
    EXPECT_EQ(client.ask("MMEM:CAT?;:SYST:ERR?"), "0,3000000;0,\"No error\"\n");
}

TEST_F(MassMemory, NamesEachErrorOfDirectories)
{
    client.ask("MMEM:MDIR 'd';MDIR 'd/e';DATA 'd/f',#11x;DATA 'g',#11x");
    const std::string longName(65, 'n');
    std::string deep = "d";
    for (int i = 0; i < 16; ++i)
        deep += "/d";
    const struct {
        std::string message;
        std::string error;
    } rows[] = {
        {"MMEM:MDIR 'd'", "-257,\"File name error;d\"\n"},
        {"MMEM:MDIR 'g'", "-257,\"File name error;g\"\n"},
        {"MMEM:MDIR 'x/y'", "-256,\"File name not found;x/y\"\n"},
        {"MMEM:MDIR '/'", "-257,\"File name error;/\"\n"},
        {"MMEM:MDIR 'D:x'", "-252,\"Missing media;D:x\"\n"},
        {"MMEM:MDIR '" + longName + "'", "-257,\"File name error;" + longName + "\"\n"},
        {"MMEM:MDIR 'a\tb'", "-257,\"File name error;a?b\"\n"},
        {"MMEM:MDIR '" + deep + "'", "-257,\"File name error;" + deep + "\"\n"},
        {"MMEM:RDIR 'd'", "-250,\"Mass storage error;directory not empty\"\n"},
        {"MMEM:RDIR 'g'", "-256,\"File name not found;g\"\n"},
        {"MMEM:RDIR '/'", "-250,\"Mass storage error;directory in use\"\n"},
        {"MMEM:CDIR 'd/e';RDIR '/d/e';CDIR", "-250,\"Mass storage error;directory in use\"\n"},
        {"MMEM:CDIR 'd/e';MOVE '/d','/x';CDIR", "-250,\"Mass storage error;directory in use\"\n"},
        {"MMEM:CDIR 'g'", "-256,\"File name not found;g\"\n"},
        {"MMEM:DATA 'd',#11x", "-257,\"File name error;d\"\n"},
        {"MMEM:DATA? 'd'", "-257,\"File name error;d\"\n"},
        {"MMEM:DATA 'g/h',#11x", "-256,\"File name not found;g/h\"\n"},
        {"MMEM:DATA 'd/../../h',#11x", "-257,\"File name error;d/../../h\"\n"},
        {"MMEM:DATA '/../h',#11x", "-257,\"File name error;/../h\"\n"},
        {"MMEM:DEL 'd'", "-257,\"File name error;d\"\n"},
        {"MMEM:COPY 'x','y'", "-256,\"File name not found;x\"\n"},
        {"MMEM:COPY 'd','y'", "-257,\"File name error;d\"\n"},
        {"MMEM:COPY 'g','x/y'", "-256,\"File name not found;x/y\"\n"},
        {"MMEM:MOVE 'd','d/e'", "-257,\"File name error;d/e\"\n"},
        {"MMEM:MOVE 'd','g'", "-257,\"File name error;g\"\n"},
        {"MMEM:MOVE '/','x'", "-250,\"Mass storage error;directory in use\"\n"},
    };
    for (const auto &row : rows) {
        client.ask(row.message);
        EXPECT_EQ(client.ask("SYST:ERR?"), row.error) << row.message;
    }
    EXPECT_EQ(client.ask("MMEM:CAT?;CAT? 'd'"),
              "2,2999998,\"d,DIR,0\",\"g,BIN,1\";2,2999998,\"e,DIR,0\",\"f,BIN,1\"\n");
}

TEST_F(MassMemory, PutsNothingWhereNoPathLeads)
{
    std::string deepest = "/1";
    client.ask("MMEM:MDIR '/1'");
    for (int i = 2; i <= 15; ++i) {
        deepest += "/" + std::to_string(i);
        client.ask("MMEM:MDIR '" + deepest + "'");
    }
    client.ask("MMEM:DATA '/f',#11x;COPY '/f','" + deepest + "';DEL '" + deepest + "/f'");
    deepest += "/16";
    client.ask("MMEM:MDIR '" + deepest + "'");
    EXPECT_EQ(client.ask("SYST:ERR?;:MMEM:CAT? '" + deepest + "'"), "0,\"No error\";1,2999999\n");
    for (const std::string way : {"COPY", "MOVE"}) {
        client.ask("MMEM:" + way + " '/f','" + deepest + "'");
        EXPECT_EQ(client.ask("SYST:ERR?;:MMEM:CAT? '" + deepest + "'"),
                  "-257,\"File name error;" + deepest + "\";1,2999999\n")
            << way;
        EXPECT_EQ(client.ask("MMEM:DATA? '/f'"), "#11x\n") << way;
    }
}

TEST_F(MassMemory, SuffersWhatItsMediumSuffers)
{
    client.ask("MMEM:DATA 'f',#11x;:SIM:MED PROT");
    EXPECT_EQ(client.ask("MMEM:DATA? 'f';:SIM:MED?"), "#11x;PROT\n");
    client.ask("MMEM:DATA 'f',#11y;DEL 'f';MDIR 'd'");
    EXPECT_EQ(client.ask("SYST:ERR:ALL?"),
              "-258,\"Media protected\",-258,\"Media protected\",-258,\"Media protected\"\n");
    client.ask("SIM:MED CORR;:MMEM:DATA? 'f'");
    client.ask("SIM:MED MISS;:MMEM:CAT?;:MMEM:MSIS 'C:'");
    EXPECT_EQ(client.ask("SYST:ERR:ALL?"), "-253,\"Corrupt media\",-252,\"Missing media\",-252,\"Missing media\"\n");
    EXPECT_EQ(client.ask("SIM:MED NORM;:MMEM:DATA? 'f'"), "#11x\n");
}

TEST_F(MassMemory, CountsCopiesAsFull)
{
    client.ask("MMEM:DATA 'a',#71500000" + std::string(1500000, 'x') + ";COPY 'a','b';COPY 'a','c'");
    EXPECT_EQ(client.ask("SYST:ERR?;:MMEM:CAT?"),
              "-254,\"Media full;c\";3000000,0,\"a,BIN,1500000\",\"b,BIN,1500000\"\n");
    client.ask("MMEM:COPY 'a','b';MOVE 'a','b'");
    EXPECT_EQ(client.ask("SYST:ERR?;:MMEM:CAT?"), "0,\"No error\";1500000,1500000,\"b,BIN,1500000\"\n");
}

TEST(Bytes, ReuseTheRoomOfABlockThatHasGone)
{
    const auto budget = std::make_shared<ByteBudget>(10'000'000);
    const std::byte *where = nullptr;
    {
        Bytes first(budget);
        where = first.space(200'000).data();
        first.commit(65536);
    }
    EXPECT_EQ(budget->used(), 0u);
    Bytes second(budget);
    EXPECT_EQ(second.space(200'000).data(), where);
}

TEST(Bytes, GiveUpTheKeptRoomBeforeTheyRefuse)
{
    const auto budget = std::make_shared<ByteBudget>(100'000);
    {
        Bytes first(budget);
        ASSERT_TRUE(first.append(std::vector<std::byte>(90'000), 90'000));
    }
    Bytes second(budget);
    EXPECT_TRUE(second.append(std::vector<std::byte>(80'000), 80'000));
    EXPECT_EQ(budget->used(), 80'000u);
    Bytes third(budget);
    EXPECT_FALSE(third.append(std::vector<std::byte>(80'000), 80'000));
}
