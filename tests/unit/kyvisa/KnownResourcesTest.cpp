#include "kyvisa/core/KnownResources.h"
#include "kyvisa/core/Configuration.h"
#include "kyvisa/include/visa.h"

#include <gtest/gtest.h>

using namespace kyvisa;

namespace
{

Configuration configurationOf(std::string_view text)
{
    std::vector<int> damaged;
    return parseConfiguration(text, damaged);
}

std::vector<std::string> names(const std::vector<FoundResource> &resources)
{
    std::vector<std::string> result;
    for (const FoundResource &resource : resources)
        result.push_back(resource.name);
    return result;
}

using Names = std::vector<std::string>;

TEST(KnownResources, AreThoseOfTheFileInFullWithoutRepetition)
{
    const Configuration configuration =
        configurationOf("[HISLIP-RSRCS]\nName0 = \"TCPIP::b::hislip0\"\n"
                        "[KYVXI11-RSRCS]\nName0 = TCPIP::a\nName1 = rubbish\nName2 = tcpip0::A::inst0\n"
                        "[SOCKET-RSRCS]\nName0 = TCPIP::c::5025::SOCKET\n"
                        "[KYGPIB-RSRCS]\nName0 = GPIB::5\n"
                        "[KYGPIB-GATEWAYS]\nBoard1 = \"TCPIP::g::gpib0\"\n");
    EXPECT_EQ(names(knownResources(configuration, 2)),
              (Names{"TCPIP0::a::inst0::INSTR", "TCPIP0::c::5025::SOCKET", "TCPIP0::b::hislip0::INSTR",
                     "GPIB0::5::INSTR", "GPIB1::INTFC", "ASRL1::INSTR", "ASRL2::INSTR"}));
    EXPECT_EQ(names(knownResources({}, 0)), Names{});
}

TEST(KnownResources, TakeTheTextsThatASearchFound)
{
    std::vector<FoundResource> found{{"TCPIP0::a::inst0::INSTR", {}}};
    FoundResource again{"TCPIP0::A::inst0::INSTR", {}};
    again.texts.model = "M";
    addResources(found, {again, {"TCPIP0::b::inst0::INSTR", {}}});
    EXPECT_EQ(names(found), (Names{"TCPIP0::a::inst0::INSTR", "TCPIP0::b::inst0::INSTR"}));
    EXPECT_EQ(found[0].texts.model, "M");
}

TEST(Aliases, StandForResourcesWithoutCase)
{
    const Configuration configuration = configurationOf("[ALIASES]\nAlias0 = \"'Meter','TCPIP::10.0.0.1::INSTR'\"\n");
    ResourceName name;
    EXPECT_EQ(parseNameOrAlias("mETER", configuration, name), VI_SUCCESS);
    EXPECT_EQ(name.canonical(), "TCPIP0::10.0.0.1::inst0::INSTR");
    EXPECT_EQ(parseNameOrAlias("TCPIP::x", configuration, name), VI_SUCCESS);
    EXPECT_EQ(parseNameOrAlias("other", configuration, name), VI_ERROR_INV_RSRC_NAME);
    EXPECT_EQ(aliasOf("TCPIP0::10.0.0.1::inst0::INSTR", configuration), "Meter");
    EXPECT_EQ(aliasOf("TCPIP0::10.0.0.2::inst0::INSTR", configuration), "");
}

} // namespace
