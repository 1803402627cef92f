// A program that speaks German: its numbers have a decimal comma and a dot between the thousands, in C and in C++. Instruments,
// names and files do not.
#include "support/SimulatorProcess.h"
#include "support/TemporaryFolder.h"
#include "support/VisaSession.h"

#include <array>
#include <clocale>
#include <cstdlib>
#include <fstream>
#include <gtest/gtest.h>
#include <locale>
#include <sstream>
#ifdef __SANITIZE_ADDRESS__
#include <sanitizer/lsan_interface.h>
#endif

using test::SimulatorProcess;
using test::VisaSession;

namespace
{

class GermanHost : public testing::Test
{
protected:
    void SetUp() override
    {
        ::setenv("LOCPATH", LOCALES, 1);
        becomeGerman();
        std::ostringstream number;
        number << 1234.5;
        ASSERT_EQ(number.str(), "1.234,5");
        ASSERT_STREQ(std::localeconv()->decimal_point, ",");
    }
    void TearDown() override
    {
        std::locale::global(std::locale::classic());
        ::unsetenv("LOCPATH");
        ::unsetenv("KYVISA_CONFIG");
    }

    static void becomeGerman()
    {
#ifdef __SANITIZE_ADDRESS__
        const __lsan::ScopedDisabler theCLibraryKeepsTheFolders;
#endif
        std::locale::global(std::locale("de_DE.UTF-8")); // and with it that of C
    }

    test::TemporaryFolder m_folder;
    SimulatorProcess m_simulator{{"--hislip", "0", "--socket", "0"}};
};

TEST_F(GermanHost, PrintsAndScansNumbersAsInstrumentsDo)
{
    for (const char *service : {"hislip", "socket"}) {
        VisaSession session;
        ASSERT_EQ(session.open(m_simulator.resource(service), 20000), VI_SUCCESS);
        session.set(VI_ATTR_TMO_VALUE, 20000);
        session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
        double voltage = 0;
        EXPECT_EQ(viPrintf(session.vi, "SOUR:VOLT %.2f\n", 3.25), VI_SUCCESS);
        EXPECT_EQ(viQueryf(session.vi, "SOUR:VOLT?\n", "%lf", &voltage), VI_SUCCESS);
        EXPECT_EQ(voltage, 3.25);
        EXPECT_EQ(viPrintf(session.vi, "SOUR:VOLT %@3lf\n", 4.5), VI_SUCCESS);
        std::array<char, 64> text{};
        EXPECT_EQ(viQueryf(session.vi, "SOUR:VOLT?;:SYST:ERR?\n", "%t", text.data()), VI_SUCCESS);
        EXPECT_EQ(std::strtod(text.data(), nullptr), 4.0) << "strtod speaks German here, so it stops at the point";
        EXPECT_NE(std::string(text.data()).find(";0,\"No error\""), std::string::npos) << text.data();
        std::array<ViByte, 256> buffer{};
        const std::array<double, 3> values = {1234567.5, -0.25, 1e-7};
        EXPECT_EQ(viSPrintf(session.vi, buffer.data(), "%,3lg|%,3lf|%d", values.data(), values.data(), 1234567),
                  VI_SUCCESS);
        EXPECT_STREQ(reinterpret_cast<const char *>(buffer.data()),
                     "1.23457e+06,-0.25,1e-07|1234567.500000,-0.250000,0.000000|1234567");
        std::array<double, 3> read{};
        EXPECT_EQ(viSScanf(session.vi, reinterpret_cast<ViConstBuf>("1234.5,-2.5E3,.5"), "%,3lf", read.data()),
                  VI_SUCCESS);
        EXPECT_EQ(read, (std::array{1234.5, -2500.0, 0.5}));
    }
}

TEST_F(GermanHost, ReadsNamesAndFilesAsEverybodyElse)
{
    const std::string resource = m_simulator.resource("hislip");
    const std::string file = m_folder.file("kyvisa.ini");
    std::ofstream(file) << "[GENERAL]\nTulipTimeout = 1500\n[HISLIP-RSRCS]\nNumberOfRsrc = 1\nName0 = \"" << resource
                        << "\"\n[ALIASES]\nAlias0 = \"'Me\xC3\x9Fger\xC3\xA4t','" << resource << "'\"\n";
    ::setenv("KYVISA_CONFIG", file.c_str(), 1);
    VisaSession session;
    ASSERT_EQ(session.open("Me\xC3\x9Fger\xC3\xA4t", 20000), VI_SUCCESS);
    EXPECT_EQ(session.getText(VI_ATTR_RSRC_NAME).find(resource.substr(resource.find("::"))), 6u)
        << session.getText(VI_ATTR_RSRC_NAME);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_PORT), m_simulator.port("hislip"));
    EXPECT_EQ(viSetAttribute(session.rm, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 0), VI_SUCCESS); // the network is not asked
    std::array<char, VI_FIND_BUFLEN> found{};
    ViUInt32 count = 0;
    const std::string expression = "TCPIP?*{VI_ATTR_TCPIP_PORT == " + std::to_string(m_simulator.port("hislip")) + "}";
    EXPECT_EQ(viFindRsrc(session.rm, expression.c_str(), nullptr, &count, found.data()), VI_SUCCESS) << expression;
    EXPECT_EQ(count, 1u);
    EXPECT_EQ(session.getText(VI_ATTR_RSRC_NAME), found.data());
    std::array<ViByte, 256> buffer{};
    EXPECT_EQ(viSPrintf(session.vi, buffer.data(), "%s", "\xC3\xA4"), VI_SUCCESS);
    EXPECT_STREQ(reinterpret_cast<const char *>(buffer.data()), "\xC3\xA4");
}

TEST_F(GermanHost, KeepsItsLocale)
{
    VisaSession session;
    ASSERT_EQ(session.open(m_simulator.resource("hislip"), 20000), VI_SUCCESS);
    EXPECT_EQ(viPrintf(session.vi, "SOUR:VOLT %.2f\n", 3.25), VI_SUCCESS);
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
    EXPECT_STREQ(std::setlocale(LC_ALL, nullptr), "de_DE.UTF-8");
    EXPECT_EQ(std::locale().name(), "de_DE.UTF-8");
}

} // namespace
