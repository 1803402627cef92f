// The configuration file as the tester's own class writes it, read by the library.
#include "config/kyconfigfile.h"
#include "support/SimulatorProcess.h"

#include <visa.h>

#include <QFile>
#include <QTemporaryDir>

#include <cstdlib>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <string>
#include <vector>

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace
{

using Names = std::vector<std::string>;

class WrittenConfiguration : public testing::Test
{
protected:
    WrittenConfiguration() { ::setenv("KYVISA_CONFIG", QFile::encodeName(path()).constData(), 1); }
    ~WrittenConfiguration() override
    {
        closeManager();
        ::unsetenv("KYVISA_CONFIG");
    }

    QString path() const { return m_folder.filePath(QStringLiteral("kyvisa.ini")); }

    void write(const std::string &content) const
    {
        QFile file(path());
        ASSERT_TRUE(file.open(QIODevice::WriteOnly | QIODevice::Truncate));
        file.write(content.data(), static_cast<qint64>(content.size()));
    }

    void openManager()
    {
        ASSERT_EQ(viOpenDefaultRM(&m_rm), VI_SUCCESS);
        // The network of the machine is not asked.
        ASSERT_EQ(viSetAttribute(m_rm, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 0), VI_SUCCESS);
    }
    void closeManager()
    {
        if (m_rm != VI_NULL)
            viClose(m_rm);
        m_rm = VI_NULL;
    }

    Names find(const char *expression)
    {
        Names names;
        ViFindList list = VI_NULL;
        ViUInt32 count = 0;
        std::string name(VI_FIND_BUFLEN, '\0');
        for (ViStatus status = viFindRsrc(m_rm, expression, &list, &count, name.data()); status == VI_SUCCESS;
             status = viFindNext(list, name.data()))
            names.emplace_back(name.c_str());
        return names;
    }

    /// What the instrument of that name says of itself, empty when it does not open.
    std::string identificationOf(const char *name)
    {
        ViSession session = VI_NULL;
        if (viOpen(m_rm, name, VI_NO_LOCK, 5000, &session) != VI_SUCCESS)
            return {};
        std::string text(256, '\0');
        ViUInt32 count = 0;
        std::string question = "*IDN?\n";
        EXPECT_EQ(viWrite(session, reinterpret_cast<ViBuf>(question.data()), 6, &count), VI_SUCCESS);
        EXPECT_EQ(viRead(session, reinterpret_cast<ViBuf>(text.data()), 256, &count), VI_SUCCESS);
        EXPECT_EQ(viClose(session), VI_SUCCESS);
        return text.substr(0, count);
    }

    QTemporaryDir m_folder;
    ViSession m_rm = VI_NULL;
};

TEST_F(WrittenConfiguration, ItsAliasesAndResourcesAreFoundAndOpened)
{
    const test::SimulatorProcess simulator{{"--hislip", "0"}};
    const std::string resource = simulator.resource("hislip"); // has a comma in it
    KyConfigFile file(path());
    ASSERT_TRUE(file.load());
    file.setListOfResource({{QString(), QString::fromStdString(resource)}});
    file.setListOfAlias({{QStringLiteral("my meter"), QString::fromStdString(resource)},
                         {QStringLiteral("m\u00fcnchen"), QString::fromStdString(resource)}});
    ASSERT_TRUE(file.save());

    openManager();
    EXPECT_THAT(find("TCPIP?*"), ElementsAre("TCPIP0" + resource.substr(5)));
    EXPECT_THAT(identificationOf("my meter"), HasSubstr("Oltrava,KyVisaSimulator"));
    EXPECT_THAT(identificationOf("m\xc3\xbcnchen"), HasSubstr("Oltrava,KyVisaSimulator"));
    EXPECT_THAT(identificationOf("no meter"), IsEmpty());
}

TEST_F(WrittenConfiguration, AFileThatWasLoadedAndSavedMeansTheSame)
{
    std::string hislip = "[HISLIP-RSRCS]\n";
    for (int i = 0; i < 12; ++i)
        hislip += "Name" + std::to_string(i) + " = TCPIP::10.0.0." + std::to_string(i + 1) + "::hislip0,4880::INSTR\n";
    write("; by hand\n"
          "[KYVISA]\nDebug = 0\n"
          "[KYVXI11-RSRCS]\nName0 = \"TCPIP::10.0.1.1::inst0::INSTR\" ; the old one\nNumOfResources = 1\n"
          "[SOCKET-RSRCS]\n  Name0   =   TCPIP::10.0.1.2::5025::SOCKET  \n" +
          hislip +
          "[KYGPIB-RSRCS]\nName0 = GPIB0::7::INSTR\n"
          "[KYGPIB-GATEWAYS]\nBoard0 = \"TCPIP::10.0.1.3::gpib0,9\"\n"
          "[ALIASES]\nAlias0 = \"'old','TCPIP::10.0.1.1::inst0::INSTR'\"\n");
    openManager();
    const Names before = find("(TCPIP|GPIB)?*");
    closeManager();
    ASSERT_EQ(before.size(), 16u) << "fourteen in the LAN, the device and the interface on the GPIB";

    KyConfigFile file(path());
    ASSERT_TRUE(file.load());
    ASSERT_TRUE(file.save());
    openManager();
    EXPECT_EQ(find("(TCPIP|GPIB)?*"), before);
    std::string name(256, '\0');
    ViUInt16 type = 0;
    ViUInt16 board = 0;
    EXPECT_EQ(viParseRsrcEx(m_rm, "old", &type, &board, nullptr, name.data(), nullptr), VI_SUCCESS);
    EXPECT_STREQ(name.c_str(), "TCPIP0::10.0.1.1::inst0::INSTR");
}

TEST_F(WrittenConfiguration, TheDebugSwitchTraces)
{
    for (const bool on : {true, false}) {
        KyConfigFile file(path());
        ASSERT_TRUE(file.load());
        file.setDebugEnable(on);
        ASSERT_TRUE(file.save());
        testing::internal::CaptureStderr();
        openManager();
        closeManager();
        const std::string trace = testing::internal::GetCapturedStderr();
        if (on)
            EXPECT_THAT(trace, HasSubstr("viSetAttribute"));
        else
            EXPECT_THAT(trace, IsEmpty());
    }
}

} // namespace
