#include "kyvisa/core/FindExpression.h"

#include <gtest/gtest.h>
#include <string>

using kyvisa::FindExpression;

namespace
{

bool matches(std::string_view expression, std::string_view resource)
{
    const auto parsed = FindExpression::parse(expression);
    EXPECT_TRUE(parsed.has_value()) << expression;
    return parsed && parsed->matches(resource);
}

class GoodExpression : public testing::TestWithParam<const char *>
{
};
TEST_P(GoodExpression, IsValid)
{
    EXPECT_TRUE(FindExpression::parse(GetParam()).has_value());
}
INSTANTIATE_TEST_SUITE_P(FindExpression, GoodExpression,
                         testing::Values("?*", "?*INSTR", "GPIB[0-9]*::?*INSTR", "(TCPIP|USB)?*", "ASRL[^3-9]+::INSTR",
                                         "a\\*b", "a\\{b", "ASRL?*INSTR{VI_ATTR_ASRL_BAUD == 9600}",
                                         "?*{VI_ATTR_INTF_NUM >= 0x1F && !(VI_ATTR_MANF_NAME != \"a b\")}",
                                         "?*{VI_ATTR_SLOT == -1 || VI_ATTR_VXI_LA<5}"));

class BadExpression : public testing::TestWithParam<const char *>
{
};
TEST_P(BadExpression, IsRefused)
{
    EXPECT_FALSE(FindExpression::parse(GetParam()).has_value());
}
INSTANTIATE_TEST_SUITE_P(FindExpression, BadExpression,
                         testing::Values("", "*", "+a", "(a", "a)", "[a", "[]", "[z-a]", "a|", "|a", "a\\", "a**", "a}",
                                         "{VI_ATTR_SLOT == 1}", "?*{", "?*{}", "?*{VI_ATTR_SLOT}",
                                         "?*{VI_ATTR_SLOT = 1}", "?*{VI_ATTR_SLOT == x}", "?*{VI_ATTR_SLOT == 1 &&}",
                                         "?*{SLOT == 1}", "?*{VI_ATTR_SLOT == 99999999999999999999}",
                                         "?*{VI_ATTR_TMO_VALUE == 2000}", "?*{VI_ATTR_MANF_NAME < \"a\"}",
                                         "?*{(VI_ATTR_SLOT == 1}", "?*{VI_ATTR_SLOT == 1}x"));

TEST(FindExpression, RefusesWhatIsNestedTooDeeply)
{
    EXPECT_TRUE(FindExpression::parse(std::string(60, '(') + "a" + std::string(60, ')')).has_value());
    EXPECT_FALSE(FindExpression::parse(std::string(100'000, '(') + "a" + std::string(100'000, ')')).has_value());
    EXPECT_FALSE(FindExpression::parse("?*{" + std::string(100'000, '!') + "VI_ATTR_SLOT == 1}").has_value());
}

TEST(FindPattern, CoversTheWholeName)
{
    EXPECT_TRUE(matches("?*", "TCPIP0::host::INSTR"));
    EXPECT_TRUE(matches("?*INSTR", "TCPIP0::host::INSTR"));
    EXPECT_FALSE(matches("?*INSTR", "TCPIP0::host::5025::SOCKET"));
    EXPECT_FALSE(matches("TCPIP", "TCPIP0::host::INSTR"));
    EXPECT_FALSE(matches("host", "TCPIP0::host::INSTR"));
}

TEST(FindPattern, IgnoresCase)
{
    EXPECT_TRUE(matches("tcpip?*instr", "TCPIP0::Host::INSTR"));
    EXPECT_TRUE(matches("TCPIP[0-9]::[A-H]?*", "tcpip0::host::instr"));
    EXPECT_FALSE(matches("TCPIP0::[^h]?*", "TCPIP0::Host::INSTR"));
}

TEST(FindPattern, MeansWhatTheStandardsExamplesSay)
{
    EXPECT_TRUE(matches("GPIB?*INSTR", "GPIB-VXI0::1::INSTR"));
    EXPECT_FALSE(matches("GPIB[0-9]*::?*INSTR", "GPIB-VXI0::1::INSTR"));
    EXPECT_TRUE(matches("GPIB[0-9]*::?*INSTR", "GPIB0::2::INSTR"));
    EXPECT_TRUE(matches("GPIB[0-9]*::?*INSTR", "GPIB::2::INSTR"));
    EXPECT_TRUE(matches("ASRL1+::INSTR", "ASRL1::INSTR"));
    EXPECT_TRUE(matches("ASRL1+::INSTR", "ASRL11::INSTR"));
    EXPECT_FALSE(matches("ASRL1+::INSTR", "ASRL12::INSTR"));
    EXPECT_FALSE(matches("ASRL1+::INSTR", "ASRL::INSTR"));
    EXPECT_TRUE(matches("ASRL[^0]::INSTR", "ASRL1::INSTR"));
    EXPECT_FALSE(matches("ASRL[^0]::INSTR", "ASRL0::INSTR"));
}

TEST(FindPattern, ReadsRepetitionBeforeSequenceBeforeAlternative)
{
    EXPECT_TRUE(matches("ab*|cd", "abbb"));
    EXPECT_TRUE(matches("ab*|cd", "cd"));
    EXPECT_FALSE(matches("ab*|cd", "abab"));
    EXPECT_FALSE(matches("ab*|cd", "acd"));
    EXPECT_TRUE(matches("(ab)*", ""));
    EXPECT_TRUE(matches("(ab)+c", "ababc"));
    EXPECT_FALSE(matches("(ab)+c", "c"));
    EXPECT_TRUE(matches("(a|b)+", "abba"));
    EXPECT_TRUE(matches("x(VXI|GPIB-VXI)y", "xgpib-vxiy"));
    EXPECT_TRUE(matches("a|b|c", "b"));
}

TEST(FindPattern, TakesTheNextCharacterLiterally)
{
    EXPECT_TRUE(matches("a\\?b", "a?b"));
    EXPECT_FALSE(matches("a\\?b", "axb"));
    EXPECT_TRUE(matches("[\\]\\-]+", "]-"));
    EXPECT_TRUE(matches("a.b", "a.b"));
    EXPECT_FALSE(matches("a.b", "axb"));
}

TEST(FindPattern, TakesNoLongerForAHostilePattern)
{
    std::string pattern;
    for (int i = 0; i < 30; ++i)
        pattern += "(a*)*";
    EXPECT_FALSE(matches(pattern + "b", std::string(255, 'a')));
}

TEST(FindPattern, TellsWhetherABeginningMayMatch)
{
    const auto may = [](std::string_view expression) {
        return FindExpression::parse(expression).value().mayMatch("TCPIP");
    };
    EXPECT_TRUE(may("?*"));
    EXPECT_TRUE(may("tcpip?*INSTR"));
    EXPECT_TRUE(may("(GPIB|TCPIP)?*"));
    EXPECT_FALSE(may("GPIB?*"));
    EXPECT_FALSE(may("ASRL[0-9]*::INSTR"));
}

TEST(FindCondition, ComparesAttributesOfTheName)
{
    const std::string_view socket = "TCPIP1::host::5025::SOCKET";
    EXPECT_TRUE(matches("?*{VI_ATTR_TCPIP_PORT == 5025}", socket));
    EXPECT_FALSE(matches("?*{VI_ATTR_TCPIP_PORT != 5025}", socket));
    EXPECT_TRUE(matches("?*{VI_ATTR_INTF_NUM >= 1 && VI_ATTR_INTF_NUM < 0x2}", socket));
    EXPECT_TRUE(matches("?*{VI_ATTR_INTF_NUM > 0}", socket));
    EXPECT_FALSE(matches("?*{VI_ATTR_INTF_NUM <= 0}", socket));
    EXPECT_TRUE(matches("?*{VI_ATTR_TCPIP_HOSTNAME == \"host\"}", socket));
    EXPECT_TRUE(matches("?*{VI_ATTR_RSRC_CLASS != \"INSTR\"}", socket));
    EXPECT_TRUE(matches("ASRL?*INSTR{VI_ATTR_ASRL_BAUD == 9600}", "ASRL1::INSTR"));
    EXPECT_TRUE(matches("GPIB?*{VI_ATTR_GPIB_PRIMARY_ADDR == 5}", "GPIB0::5::INSTR"));
    EXPECT_TRUE(matches("?*{VI_ATTR_TCPIP_IS_HISLIP == 1}", "TCPIP0::host::hislip0::INSTR"));
}

TEST(FindCondition, JoinsAndBeforeOr)
{
    const std::string_view name = "GPIB2::5::INSTR";
    EXPECT_TRUE(matches("?*{VI_ATTR_INTF_NUM == 2 || VI_ATTR_INTF_NUM == 3 && VI_ATTR_INTF_NUM == 4}", name));
    EXPECT_FALSE(matches("?*{(VI_ATTR_INTF_NUM == 2 || VI_ATTR_INTF_NUM == 3) && VI_ATTR_INTF_NUM == 4}", name));
    EXPECT_TRUE(matches("?*{!VI_ATTR_INTF_NUM == 3 && !(VI_ATTR_INTF_NUM == 4)}", name));
}

TEST(FindCondition, FailsWhereTheResourceHasNoSuchAttribute)
{
    EXPECT_FALSE(matches("?*{VI_ATTR_ASRL_BAUD == 9600}", "GPIB2::5::INSTR"));
    EXPECT_FALSE(matches("?*{VI_ATTR_ASRL_BAUD != 9600}", "GPIB2::5::INSTR"));
    EXPECT_FALSE(matches("?*{VI_ATTR_INTF_NUM == \"2\"}", "GPIB2::5::INSTR"));
    EXPECT_FALSE(matches("?*{VI_ATTR_SLOT == 1}", "GPIB2::5::INSTR"));
}

} // namespace
