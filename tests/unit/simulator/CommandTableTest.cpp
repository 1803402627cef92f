#include "simulator/instrument/CommandTable.h"
#include "simulator/instrument/InputBuffer.h"
#include "simulator/instrument/Parser.h"
#include "simulator/instrument/ScpiError.h"

#include <gtest/gtest.h>

#include <memory>

using namespace simulator;

namespace
{

class Table : public testing::Test
{
protected:
    Table()
    {
        for (const char *pattern :
             {"*CLS", "SYSTem:ERRor[:NEXT]?", "SYSTem:ERRor:COUNt?", "SENSe:FREQuency:STARt", "SENSe:FREQuency:STOP",
              "SOURce#:VOLTage[:LEVel][:IMMediate]", "OUTPut#[:STATe]?", "OUTPut#[:STATe]"}) {
            table.add(pattern, {patterns.size(), 0}, {});
            patterns.emplace_back(pattern);
        }
    }

    /// The pattern that answers to the header, or the number of the error.
    std::string find(const std::string &text)
    {
        MessageUnit unit{text, {}, false};
        const ParsedUnit parsed = parseUnit(unit);
        try {
            CommandTable::Match match = table.find(parsed.header, path, pathSuffixes);
            path = match.path;
            pathSuffixes = match.pathSuffixes;
            suffixes = match.suffixes;
            return patterns[match.entry->arity.least];
        } catch (const ScpiError &error) {
            return std::to_string(error.number);
        }
    }
    void newMessage()
    {
        path = nullptr;
        pathSuffixes.clear();
    }

    CommandTable table;
    const CommandTable::Node *path = nullptr;
    std::vector<unsigned> pathSuffixes;
    std::vector<unsigned> suffixes;
    std::vector<std::string> patterns; ///< an entry's arity is its place here
};

} // namespace

TEST_F(Table, FindsShortAndLongFormsAndNothingBetween)
{
    for (const char *header : {"SYST:ERR?", "SYSTEM:ERROR?", "system:err:next?", ":Syst:Error:NEXT?"}) {
        newMessage();
        EXPECT_EQ(find(header), "SYSTem:ERRor[:NEXT]?") << header;
    }
    for (const char *header :
         {"SYSTE:ERR?", "SYS:ERR?", "SYST:ERRO?", "SYSTEMS:ERR?", "SYST?", "SYST:ERR", "SYST:ERR:NEXT:X?"}) {
        newMessage();
        EXPECT_EQ(find(header), "-113") << header;
    }
}

TEST_F(Table, LeavesOutOptionalMnemonics)
{
    for (const char *header : {"SOUR:VOLT", "SOUR:VOLT:LEV", "SOUR:VOLT:IMM", "SOUR:VOLT:LEV:IMM"}) {
        newMessage();
        EXPECT_EQ(find(header), "SOURce#:VOLTage[:LEVel][:IMMediate]") << header;
    }
    newMessage();
    EXPECT_EQ(find("SOUR:LEV"), "-113");
}

TEST_F(Table, ContinuesBehindASemicolonWhereTheLastMnemonicStood)
{
    EXPECT_EQ(find("SENS:FREQ:STAR"), "SENSe:FREQuency:STARt");
    EXPECT_EQ(find("STOP"), "SENSe:FREQuency:STOP");
    EXPECT_EQ(find("SENS:FREQ:STOP"), "-113");
    EXPECT_EQ(find(":SENS:FREQ:STOP"), "SENSe:FREQuency:STOP");
}

TEST_F(Table, KeepsTheCurrentPathAcrossACommonCommand)
{
    EXPECT_EQ(find("SENS:FREQ:STAR"), "SENSe:FREQuency:STARt");
    EXPECT_EQ(find("*CLS"), "*CLS");
    EXPECT_EQ(find("STOP"), "SENSe:FREQuency:STOP");
}

TEST_F(Table, TakesThePathAsSentAndNotAsItCouldHaveBeenSent)
{
    EXPECT_EQ(find("SYST:ERR?"), "SYSTem:ERRor[:NEXT]?");
    EXPECT_EQ(find("ERR:COUN?"), "SYSTem:ERRor:COUNt?");
    EXPECT_EQ(find("NEXT?"), "SYSTem:ERRor[:NEXT]?");
}

TEST_F(Table, ReadsNumericSuffixes)
{
    EXPECT_EQ(find("SOUR:VOLT"), "SOURce#:VOLTage[:LEVel][:IMMediate]");
    EXPECT_EQ(suffixes, std::vector<unsigned>{1});
    EXPECT_EQ(find(":SOURCE12:VOLT"), "SOURce#:VOLTage[:LEVel][:IMMediate]");
    EXPECT_EQ(suffixes, std::vector<unsigned>{12});
    EXPECT_EQ(find("VOLT"), "SOURce#:VOLTage[:LEVel][:IMMediate]");
    EXPECT_EQ(suffixes, std::vector<unsigned>{12}) << "the path keeps its suffix";
    EXPECT_EQ(find(":OUTP0?"), "OUTPut#[:STATe]?");
    EXPECT_EQ(suffixes, std::vector<unsigned>{0});
    EXPECT_EQ(find(":SYST2:ERR?"), "-114") << "it takes none";
    EXPECT_EQ(find(":SYST:ERR1?"), "-114");
    EXPECT_EQ(find(":NONE2:ERR?"), "-113");
}
