#include "simulator/instrument/Parser.h"
#include "simulator/instrument/Arguments.h"
#include "simulator/instrument/InputBuffer.h"
#include "simulator/instrument/ScpiError.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>

using namespace simulator;

namespace
{

/// A unit as the input buffer makes it.
MessageUnit unitOf(std::string_view text)
{
    InputBuffer buffer(std::make_shared<ByteBudget>(10000), {10000, 10000}, true);
    std::span<const std::byte> bytes = std::as_bytes(std::span{text});
    buffer.scan(bytes);
    buffer.end();
    return std::move(buffer.unit());
}

/// Number of the error that parsing @p text throws, 0 for none.
int errorOf(std::string_view text)
{
    MessageUnit unit = unitOf(text);
    try {
        parseUnit(unit);
        return 0;
    } catch (const ScpiError &error) {
        return error.number;
    }
}

/// Parses `X <parameters>` and hands the arguments to @p take; number of the error, 0 for none.
int take(const std::string &parameters, const std::function<void(Arguments &)> &take)
{
    MessageUnit unit = unitOf("X " + parameters);
    try {
        Arguments arguments(parseUnit(unit).parameters);
        take(arguments);
        return 0;
    } catch (const ScpiError &error) {
        return error.number;
    }
}

constexpr Numeric Volts{"V", -1000, 1000, 7};

double volts(const std::string &parameter)
{
    double value = -1e99;
    EXPECT_EQ(take(parameter, [&](Arguments &arguments) { value = arguments.number(Volts); }), 0) << parameter;
    return value;
}

int voltsError(const std::string &parameter)
{
    return take(parameter, [](Arguments &arguments) { arguments.number(Volts); });
}

} // namespace

TEST(Parser, SplitsTheHeader)
{
    MessageUnit unit = unitOf(":SOUR2:VOLT?");
    const ParsedUnit parsed = parseUnit(unit);
    EXPECT_TRUE(parsed.header.absolute);
    EXPECT_TRUE(parsed.header.query);
    EXPECT_FALSE(parsed.header.common);
    ASSERT_EQ(parsed.header.mnemonics.size(), 2u);
    EXPECT_EQ(parsed.header.mnemonics[0], "SOUR2");
    EXPECT_EQ(parsed.header.mnemonics[1], "VOLT");
}

TEST(Parser, TellsTheKindsOfDataApart)
{
    MessageUnit unit = unitOf("X 12.5 mV , ON,'it''s',\"a\"\"b\",#13xyz,(@1,3:5),#HfF,#Q17,#B101");
    const std::vector<Parameter> p = parseUnit(unit).parameters;
    ASSERT_EQ(p.size(), 9u);
    EXPECT_EQ(p[0].kind, Parameter::Kind::Number);
    EXPECT_EQ(p[0].number, 12.5);
    EXPECT_EQ(p[0].suffix, "MV");
    EXPECT_EQ(p[1].kind, Parameter::Kind::Character);
    EXPECT_EQ(p[1].text, "ON");
    EXPECT_EQ(p[2].kind, Parameter::Kind::String);
    EXPECT_EQ(p[2].text, "it's");
    EXPECT_EQ(p[3].text, "a\"b");
    EXPECT_EQ(p[4].kind, Parameter::Kind::Block);
    EXPECT_EQ(p[4].block->bytes.size(), 3u);
    EXPECT_EQ(p[5].kind, Parameter::Kind::Expression);
    EXPECT_EQ(p[5].text, "(@1,3:5)");
    EXPECT_EQ(p[6].number, 255);
    EXPECT_EQ(p[7].number, 15);
    EXPECT_EQ(p[8].number, 5);
}

TEST(Parser, NamesEachSyntaxError)
{
    const struct {
        const char *text;
        int number;
    } rows[] = {
        {"*", -102},
        {":", -102},
        {"A::B", -102},
        {"A:", -102},
        {"1A", -102},
        {"A?B", -102},
        {"A\x80", -101},
        {"A!", -101},
        {"\x80", -101},
        {"ABCDEFGHIJKLM", -112},
        {"A 1,,2", -109},
        {"A 1,", -109},
        {"A 1 2", -103},
        {"A 'x' 'y'", -103},
        {"A +", -121},
        {"A 1E40000", -123},
        {"A 1.2.3", -131},
        {"A 12$", -121},
        {"A 1 ABCDEFGHIJKLM", -131},
        {"A #H", -121},
        {"A #HG", -121},
        {"A #Q8", -121},
        {"A #B2", -121},
        {"A #X", -161},
        {"A #2x", -161},
        {"A #15ab", -161},
        {"A 'x", -151},
        {"A (1", -171},
        {"A ABCDEFGHIJKLM", -141},
        {"A B$", -141},
        {"A $", -101},
        {"A #HFFFFFFFFFFFFFFFFFF", -124},
    };
    for (const auto &row : rows)
        EXPECT_EQ(errorOf(row.text), row.number) << row.text;
    EXPECT_EQ(errorOf("A " + std::string(256, '1')), -124);
    EXPECT_EQ(errorOf("A " + std::string(255, '1')), 0);
}

TEST(Parser, UnderstandsEveryFormOfANumber)
{
    EXPECT_EQ(volts("1"), 1);
    EXPECT_EQ(volts("+1.5"), 1.5);
    EXPECT_EQ(volts("-.5"), -0.5);
    EXPECT_EQ(volts("2."), 2);
    EXPECT_EQ(volts("1E2"), 100);
    EXPECT_EQ(volts("1.5e-1"), 0.15);
    EXPECT_EQ(volts("1 E +2"), 100);
    EXPECT_EQ(volts("1E-32000"), 0);
    EXPECT_EQ(volts("MIN"), -1000);
    EXPECT_EQ(volts("maximum"), 1000);
    EXPECT_EQ(volts("def"), 7);
}

TEST(Parser, UnderstandsUnitsAndMultipliers)
{
    EXPECT_EQ(volts("5V"), 5);
    EXPECT_EQ(volts("5 mv"), 0.005);
    EXPECT_EQ(volts("0.5 KV"), 500);
    EXPECT_DOUBLE_EQ(volts("5UV"), 5e-6);
    EXPECT_DOUBLE_EQ(volts("1e-4 MAV"), 100);
    EXPECT_EQ(voltsError("1EXV"), -222) << "1e18 V: the E of a suffix is no exponent";
}

TEST(Parser, NamesEachErrorOfANumber)
{
    EXPECT_EQ(voltsError(""), -109);
    EXPECT_EQ(voltsError("1001"), -222);
    EXPECT_EQ(voltsError("1E999"), -222);
    EXPECT_EQ(voltsError("INF"), -222);
    EXPECT_EQ(voltsError("5A"), -131);
    EXPECT_EQ(voltsError("5QV"), -131);
    EXPECT_EQ(voltsError("'5'"), -158);
    EXPECT_EQ(voltsError("FIVE"), -148);
    EXPECT_EQ(voltsError("#11a"), -168);
    EXPECT_EQ(voltsError("(1)"), -178);
}

TEST(Parser, TakesMegaForMBeforeHertzAndOhm)
{
    double value = 0;
    const Numeric hertz{"HZ", 0, 1e12, 0};
    EXPECT_EQ(take("2MHZ", [&](Arguments &arguments) { value = arguments.number(hertz); }), 0);
    EXPECT_EQ(value, 2e6);
}

TEST(Parser, TakesBooleansIntegersAndChoices)
{
    const auto boolean = [](const char *text, bool expected) {
        EXPECT_EQ(take(text, [=](Arguments &arguments) { EXPECT_EQ(arguments.boolean(), expected) << text; }), 0);
    };
    boolean("ON", true);
    boolean("off", false);
    boolean("1", true);
    boolean("0", false);
    boolean("-3", true);
    boolean("0.4", false);
    EXPECT_EQ(take("MAYBE", [](Arguments &a) { a.boolean(); }), -224);
    EXPECT_EQ(take("'ON'", [](Arguments &a) { a.boolean(); }), -158);
    EXPECT_EQ(take("1V", [](Arguments &a) { a.boolean(); }), -138);

    EXPECT_EQ(take("31.6", [](Arguments &a) { EXPECT_EQ(a.integer(0, 32), 32); }), 0);
    EXPECT_EQ(take("256", [](Arguments &a) { a.integer(0, 255); }), -222);
    EXPECT_EQ(take("-1", [](Arguments &a) { a.integer(0, 255); }), -222);

    EXPECT_EQ(take("imm", [](Arguments &a) { EXPECT_EQ(a.choice({"IMMediate", "BUS"}), 0u); }), 0);
    EXPECT_EQ(take("BUS", [](Arguments &a) { EXPECT_EQ(a.choice({"IMMediate", "BUS"}), 1u); }), 0);
    EXPECT_EQ(take("IMMED", [](Arguments &a) { a.choice({"IMMediate", "BUS"}); }), -224);
    EXPECT_EQ(take("1", [](Arguments &a) { a.choice({"IMMediate", "BUS"}); }), -128);
}
