#include "simulator/instrument/InputBuffer.h"

#include <gtest/gtest.h>

#include <rapidcheck/gtest.h>

#include <string>
#include <vector>

using simulator::Block;
using simulator::ByteBudget;
using simulator::InputBuffer;

namespace
{

struct Unit {
    std::string text;
    std::vector<std::string> blocks;
    bool endsMessage;
    bool whole = true; ///< no block cut short or refused, no overrun

    bool operator==(const Unit &) const = default;
};

std::ostream &operator<<(std::ostream &out, const Unit &unit)
{
    out << '\'' << unit.text << '\'' << (unit.endsMessage ? " (end)" : "") << (unit.whole ? "" : " (not whole)");
    for (const std::string &block : unit.blocks)
        out << " block '" << block << '\'';
    return out;
}

class Reader
{
public:
    explicit Reader(bool hasEnd = true, simulator::InputLimits limits = {1000, 100}, std::size_t budget = 100'000)
        : m_buffer(std::make_shared<ByteBudget>(budget), limits, hasEnd)
    {
    }

    void send(std::string_view text)
    {
        std::span<const std::byte> bytes = std::as_bytes(std::span{text});
        while (!bytes.empty())
            take(m_buffer.scan(bytes));
    }
    void end() { take(m_buffer.end()); }

    InputBuffer &buffer() { return m_buffer; }
    std::vector<Unit> units;

private:
    void take(InputBuffer::Found found)
    {
        if (found == InputBuffer::Found::Nothing)
            return;
        Unit unit{m_buffer.unit().text, {}, found == InputBuffer::Found::Message, !m_buffer.unit().overrun};
        for (const Block &block : m_buffer.unit().blocks) {
            unit.blocks.emplace_back(reinterpret_cast<const char *>(block.bytes.view().data()), block.bytes.size());
            unit.whole = unit.whole && block.complete && !block.refused;
        }
        units.push_back(unit);
        m_buffer.nextUnit();
    }

    InputBuffer m_buffer;
};

struct Row {
    const char *name;
    std::string message;
    bool end; ///< END comes with the last byte
    std::vector<Unit> units;
};

/// In place of its bytes, in which addresses differ from run to run.
void PrintTo(const Row &row, std::ostream *out)
{
    *out << row.name;
}

const Row Rows[] = {
    {"LineFeedEnds", "*IDN?\n", false, {{"*IDN?", {}, true}}},
    {"EndAloneEnds", "*IDN?", true, {{"*IDN?", {}, true}}},
    {"LineFeedWithEndEndsOnce", "*IDN?\n", true, {{"*IDN?", {}, true}}},
    {"CarriageReturnIsWhiteSpace", "*IDN?\r\n", true, {{"*IDN?\r", {}, true}}},
    {"SemicolonSeparates", "*CLS;*IDN?\n", false, {{"*CLS", {}, false}, {"*IDN?", {}, true}}},
    {"TwoMessages", "*CLS\n*IDN?\n", false, {{"*CLS", {}, true}, {"*IDN?", {}, true}}},
    {"LeadingWhiteSpaceGoes", " \t*CLS; *RST\n", false, {{"*CLS", {}, false}, {"*RST", {}, true}}},
    {"LineFeedInString", "A 'x\ny;z',\"q\n\"\n", false, {{"A 'x\ny;z',\"q\n\"", {}, true}}},
    {"DoubledQuoteStaysInside", "A 'x'';\n'';y'\n", false, {{"A 'x'';\n'';y'", {}, true}}},
    {"QuoteInHeaderIsNoString", "don't\n*CLS\n", false, {{"don't", {}, true}, {"*CLS", {}, true}}},
    {"OtherQuoteInside",
     "A 'it is \"so';B \"can't\"\n",
     false,
     {{"A 'it is \"so'", {}, false}, {"B \"can't\"", {}, true}}},
    {"DefiniteBlock", "D 'f',#14a\n;b;E\n", false, {{"D 'f',#", {"a\n;b"}, false}, {"E", {}, true}}},
    {"EmptyBlock", "D #10\n", false, {{"D #", {""}, true}}},
    {"LeadingZerosOfLength", "D #40003abc\n", false, {{"D #", {"abc"}, true}}},
    {"TwoBlocks", "D #12ab,#13cde\n", false, {{"D #,#", {"ab", "cde"}, true}}},
    {"LongFormOfLength", "D #(3)a\nc\n", false, {{"D #", {"a\nc"}, true}}},
    {"IndefiniteBlockEndsWithEnd", "D #0a\nb;c\n", true, {{"D #", {"a\nb;c"}, true}}},
    {"IndefiniteBlockWithoutLineFeed", "D #0abc", true, {{"D #", {"abc"}, true}}},
    {"EmptyIndefiniteBlock", "D #0", true, {{"D #", {""}, true}}},
    {"EndInsideBlock", "D #15ab", true, {{"D #", {"ab"}, true, false}}},
    {"EndInsideBlockHeader", "D #3", true, {{"D #3", {}, true}}},
    {"EndInsideString", "A 'x", true, {{"A 'x", {}, true}}},
    {"BrokenLengthIsText", "D #2x\n", false, {{"D #2x", {}, true}}},
    {"NonDecimalNumberIsText", "A #HFF,#B1;B #Q7\n", false, {{"A #HFF,#B1", {}, false}, {"B #Q7", {}, true}}},
    {"HashInHeaderIsText", "A#19;B\n", false, {{"A#19", {}, false}, {"B", {}, true}}},
    {"HashInsideDataIsText", "A x#15;B\n", false, {{"A x#15", {}, false}, {"B", {}, true}}},
    {"HashInString", "A '#19';B\n", false, {{"A '#19'", {}, false}, {"B", {}, true}}},
    {"ZeroBytesInBlock", std::string("D #14\0\n\0\n\n", 10), false, {{"D #", {std::string("\0\n\0\n", 4)}, true}}},
    {"EmptyMessages", "\n\n;\n", false, {{"", {}, true}, {"", {}, true}, {"", {}, false}, {"", {}, true}}},
};

class InputBufferRows : public testing::TestWithParam<Row>
{
};

} // namespace

TEST_P(InputBufferRows, CutsTheMessageInOnePiece)
{
    Reader reader;
    reader.send(GetParam().message);
    if (GetParam().end)
        reader.end();
    EXPECT_EQ(reader.units, GetParam().units);
}

TEST_P(InputBufferRows, CutsItAlikeWhenSplitAtAnyByte)
{
    for (std::size_t at = 0; at <= GetParam().message.size(); ++at) {
        Reader reader;
        reader.send(GetParam().message.substr(0, at));
        reader.send(GetParam().message.substr(at));
        if (GetParam().end)
            reader.end();
        EXPECT_EQ(reader.units, GetParam().units) << "split at " << at;
    }
}

TEST_P(InputBufferRows, CutsItAlikeByteByByte)
{
    Reader reader;
    for (const char c : GetParam().message)
        reader.send({&c, 1});
    if (GetParam().end)
        reader.end();
    EXPECT_EQ(reader.units, GetParam().units);
}

TEST_P(InputBufferRows, CutsItAlikeBetweenItsNeighbours)
{
    Reader reader;
    reader.send("*CLS\n" + GetParam().message);
    if (GetParam().end)
        reader.end();
    reader.send("*RST\n");
    std::vector<Unit> expected = GetParam().units;
    expected.insert(expected.begin(), {"*CLS", {}, true});
    expected.push_back({"*RST", {}, true});
    EXPECT_EQ(reader.units, expected);
}

INSTANTIATE_TEST_SUITE_P(InputBuffer, InputBufferRows, testing::ValuesIn(Rows),
                         [](const auto &row) { return std::string{row.param.name}; });

TEST(InputBuffer, LeavesAnIndefiniteBlockToTheParserWhereThereIsNoEnd)
{
    Reader reader(false);
    reader.send("D #0abc\n*IDN?\n");
    EXPECT_EQ(reader.units, (std::vector<Unit>{{"D #0abc", {}, true}, {"*IDN?", {}, true}}));
}

TEST(InputBuffer, IgnoresAnEndWithoutMessage)
{
    Reader reader;
    reader.end();
    EXPECT_TRUE(reader.units.empty());
}

TEST(InputBuffer, TakesBlockContentDirectly)
{
    Reader reader;
    reader.send("D #16ab");
    const std::span<std::byte> space = reader.buffer().blockSpace();
    ASSERT_EQ(space.size(), 4u) << "room for the rest of the block and not for what follows";
    for (std::size_t i = 0; i < 4; ++i)
        space[i] = static_cast<std::byte>("cdef"[i]);
    reader.buffer().blockFilled(4);
    EXPECT_TRUE(reader.buffer().blockSpace().empty());
    reader.send(";E\n");
    EXPECT_EQ(reader.units, (std::vector<Unit>{{"D #", {"abcdef"}, false}, {"E", {}, true}}));
}

TEST(InputBuffer, DropsABlockThatTheBudgetDoesNotAllow)
{
    Reader reader(true, {1'000'000, 100}, 1000);
    reader.send("D #42000" + std::string(2000, 'x') + "\n*CLS\n");
    ASSERT_EQ(reader.units.size(), 2u);
    EXPECT_FALSE(reader.units[0].whole);
    EXPECT_EQ(reader.units[1], (Unit{"*CLS", {}, true}));
}

TEST(InputBuffer, AllocatesNothingForWhatABlockOnlyAnnounces)
{
    const auto budget = std::make_shared<ByteBudget>(2'000'000'000);
    InputBuffer buffer(budget, {2'000'000'000, 100}, true);
    const std::string_view text = "D #9999999999ab";
    std::span<const std::byte> bytes = std::as_bytes(std::span{text});
    buffer.scan(bytes);
    EXPECT_LE(budget->used(), 65536u);
}

TEST(InputBuffer, MarksAUnitThatIsTooLong)
{
    Reader reader(true, {1000, 10});
    reader.send("*CLS;ABCDEFGHIJKLMN;*RST\n");
    ASSERT_EQ(reader.units.size(), 3u);
    EXPECT_TRUE(reader.units[0].whole);
    EXPECT_FALSE(reader.units[1].whole);
    EXPECT_TRUE(reader.units[2].whole);
}

TEST(InputBuffer, KeepsNoMoreBlocksThanAUnitMayHaveParameters)
{
    const auto budget = std::make_shared<ByteBudget>(1'000'000);
    InputBuffer buffer(budget, {100'000'000, 10'000}, true);
    std::string text = "D #11a";
    for (int i = 0; i < 50'000; ++i)
        text += i % 2 == 0 ? ",#10" : ",#11b";
    std::span<const std::byte> bytes = std::as_bytes(std::span{text});
    EXPECT_EQ(buffer.scan(bytes), InputBuffer::Found::Nothing);
    EXPECT_LE(buffer.unit().blocks.size(), 1024u);
    EXPECT_TRUE(buffer.unit().overrun);
    EXPECT_EQ(buffer.end(), InputBuffer::Found::Message);
    buffer.nextUnit();
    bytes = std::as_bytes(std::span{std::string_view{"D #11c\n"}});
    EXPECT_EQ(buffer.scan(bytes), InputBuffer::Found::Message);
    EXPECT_FALSE(buffer.unit().overrun);
    EXPECT_EQ(buffer.unit().blocks.size(), 1u);
}

TEST(InputBuffer, MarksAMessageThatIsTooLongAndRecoversWithTheNext)
{
    Reader reader(true, {50, 100}, 1000);
    reader.send("D #260" + std::string(60, 'x') + "\n*RST\n");
    ASSERT_EQ(reader.units.size(), 2u);
    EXPECT_FALSE(reader.units[0].whole);
    EXPECT_EQ(reader.units[1], (Unit{"*RST", {}, true}));
}

TEST(InputBuffer, ForgetsEverythingWhenCleared)
{
    for (const char *beginning : {"*ID", "A 'x", "D #1", "D #15a", "D #0a", " "}) {
        Reader reader;
        reader.send(beginning);
        reader.buffer().clear();
        EXPECT_FALSE(reader.buffer().inMessage());
        reader.send("*CLS\n");
        EXPECT_EQ(reader.units, (std::vector<Unit>{{"*CLS", {}, true}})) << beginning;
    }
}

RC_GTEST_PROP(InputBuffer, GivesTheSameUnitsHoweverTheBytesAreSplit, ())
{
    const auto text = *rc::gen::container<std::string>(
        rc::gen::element('A', '*', ' ', '\n', ';', '\'', '"', '#', '0', '1', '3', '(', ')', ',', '\0'));
    Reader whole;
    whole.send(text);
    whole.end();

    Reader split;
    std::size_t at = 0;
    while (at < text.size()) {
        const auto count = *rc::gen::inRange<std::size_t>(1, 5);
        split.send(std::string_view{text}.substr(at, count));
        at += count;
    }
    split.end();
    RC_ASSERT(split.units == whole.units);
}
