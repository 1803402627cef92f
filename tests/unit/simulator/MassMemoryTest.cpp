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

TEST_F(MassMemory, HasOneDriveWithOneDirectory)
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
        {"MMEM:DATA 'a/b',#11x", "-257,\"File name error;a/b\"\n"},
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
