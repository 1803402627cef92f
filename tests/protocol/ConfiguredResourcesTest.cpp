// What the configuration file names is found and opened by the programs that use the library.
#include "support/SimulatorProcess.h"

#include <visa.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <string>
#include <unistd.h>
#include <vector>

using test::SimulatorProcess;

namespace
{

class ConfiguredResources : public testing::Test
{
protected:
    ConfiguredResources()
    {
        std::ofstream(m_file) << "[HISLIP-RSRCS]\nName0 = \"" << m_resource << "\"\n[ALIASES]\nAlias0 = \"'my meter','"
                              << m_resource << "'\"\n[KYGPIB-RSRCS]\nName0 = GPIB0::7::INSTR\n";
        ::setenv("KYVISA_CONFIG", m_file.c_str(), 1);
        EXPECT_EQ(viOpenDefaultRM(&m_rm), VI_SUCCESS);
        // The network of the machine is not asked.
        EXPECT_EQ(viSetAttribute(m_rm, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 0), VI_SUCCESS);
    }
    ~ConfiguredResources() override
    {
        viClose(m_rm);
        ::unsetenv("KYVISA_CONFIG");
        std::filesystem::remove(m_file);
    }

    std::vector<std::string> find(const char *expression, ViStatus expected = VI_SUCCESS)
    {
        std::vector<std::string> names;
        ViFindList list = VI_NULL;
        ViUInt32 count = 0;
        std::string name(VI_FIND_BUFLEN, '\0');
        EXPECT_EQ(viFindRsrc(m_rm, expression, &list, &count, name.data()), expected);
        if (expected < VI_SUCCESS)
            return names;
        do
            names.emplace_back(name.c_str());
        while (viFindNext(list, name.data()) == VI_SUCCESS);
        EXPECT_EQ(viFindNext(list, name.data()), VI_ERROR_RSRC_NFOUND);
        EXPECT_EQ(names.size(), count);
        EXPECT_EQ(viClose(list), VI_SUCCESS);
        return names;
    }

    SimulatorProcess m_simulator{{"--hislip", "0"}};
    const std::string m_resource = m_simulator.resource("hislip");
    const std::string m_file = testing::TempDir() + "configured-" + std::to_string(::getpid()) + ".ini";
    ViSession m_rm = VI_NULL;
};

using Names = std::vector<std::string>;

TEST_F(ConfiguredResources, AreFoundByExpressions)
{
    const std::string full = "TCPIP0" + m_resource.substr(5);
    const Names all = find("?*");
    EXPECT_EQ(std::count(all.begin(), all.end(), full), 1);
    EXPECT_EQ(std::count(all.begin(), all.end(), "GPIB0::7::INSTR"), 1);
    EXPECT_EQ(find("TCPIP?*INSTR"), Names{full});
    EXPECT_EQ(find("GPIB?*{VI_ATTR_GPIB_PRIMARY_ADDR == 7}"), Names{"GPIB0::7::INSTR"});
    EXPECT_EQ(find("USB?*", VI_ERROR_RSRC_NFOUND), Names{});
    EXPECT_EQ(viFindRsrc(m_rm, "TCPIP?*", nullptr, nullptr, nullptr), VI_SUCCESS);
}

TEST_F(ConfiguredResources, OpenByTheirAliases)
{
    ViSession session = VI_NULL;
    ASSERT_EQ(viOpen(m_rm, "MY METER", VI_NO_LOCK, 5000, &session), VI_SUCCESS);
    std::string name(256, '\0');
    EXPECT_EQ(viGetAttribute(session, VI_ATTR_RSRC_NAME, name.data()), VI_SUCCESS);
    EXPECT_STREQ(name.c_str(), ("TCPIP0" + m_resource.substr(5)).c_str());
    EXPECT_EQ(viOpen(m_rm, "no meter", VI_NO_LOCK, 5000, &session), VI_ERROR_INV_RSRC_NAME);
}

TEST_F(ConfiguredResources, TellTheirAliases)
{
    ViUInt16 type = 0;
    ViUInt16 board = 9;
    std::string resourceClass(256, '\0');
    std::string name(256, '\0');
    std::string alias(256, '\0');
    EXPECT_EQ(viParseRsrcEx(m_rm, m_resource.c_str(), &type, &board, resourceClass.data(), name.data(), alias.data()),
              VI_SUCCESS);
    EXPECT_EQ(type, VI_INTF_TCPIP);
    EXPECT_EQ(board, 0);
    EXPECT_STREQ(alias.c_str(), "my meter");
    EXPECT_EQ(viParseRsrcEx(m_rm, "my meter", &type, &board, nullptr, name.data(), nullptr), VI_SUCCESS);
    EXPECT_STREQ(name.c_str(), ("TCPIP0" + m_resource.substr(5)).c_str());
    EXPECT_EQ(viParseRsrc(m_rm, "my meter", &type, &board), VI_SUCCESS);
}

} // namespace
