// The C interface without an instrument: resource manager, handles, names, texts, argument checks.
#include <visa.h>

#include <array>
#include <gtest/gtest.h>
#include <string>

namespace
{

class Interface : public testing::Test
{
protected:
    void SetUp() override { ASSERT_EQ(viOpenDefaultRM(&m_rm), VI_SUCCESS); }
    void TearDown() override { viClose(m_rm); }

    std::string text(ViAttr attribute)
    {
        std::array<char, 256> buffer{};
        EXPECT_EQ(viGetAttribute(m_rm, attribute, buffer.data()), VI_SUCCESS);
        return buffer.data();
    }
    template <typename Number>
    Number number(ViAttr attribute)
    {
        Number value{};
        EXPECT_EQ(viGetAttribute(m_rm, attribute, &value), VI_SUCCESS);
        return value;
    }

    ViSession m_rm = VI_NULL;
};

TEST_F(Interface, GivesADistinctResourceManagerAtEachCall)
{
    ViSession second = VI_NULL;
    ASSERT_EQ(viGetDefaultRM(&second), VI_SUCCESS);
    EXPECT_NE(second, VI_NULL);
    EXPECT_NE(second, m_rm);
    EXPECT_EQ(viClose(second), VI_SUCCESS);
}

TEST_F(Interface, RefusesNoPlaceForTheSession)
{
    EXPECT_EQ(viOpenDefaultRM(nullptr), VI_ERROR_INV_PARAMETER);
    EXPECT_EQ(viOpen(m_rm, "TCPIP::localhost::hislip0", 0, 0, nullptr), VI_ERROR_INV_PARAMETER);
}

TEST_F(Interface, ClosesAHandleOnceOnly)
{
    ViSession second = VI_NULL;
    ASSERT_EQ(viOpenDefaultRM(&second), VI_SUCCESS);
    EXPECT_EQ(viClose(second), VI_SUCCESS);
    EXPECT_EQ(viClose(second), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(number<ViUInt16>(VI_ATTR_RSRC_MANF_ID), 4015);
}

TEST_F(Interface, WarnsWhenNothingIsClosed)
{
    EXPECT_EQ(viClose(VI_NULL), 0x3FFF0082);
}

TEST_F(Interface, DescribesItself)
{
    EXPECT_EQ(text(VI_ATTR_RSRC_MANF_NAME), "Oltrava");
    EXPECT_EQ(text(VI_ATTR_RSRC_NAME), "");
    EXPECT_EQ(number<ViUInt16>(VI_ATTR_RSRC_MANF_ID), 0x0FAF);
    EXPECT_EQ(number<ViUInt32>(VI_ATTR_RSRC_IMPL_VERSION), 0x00500806u);
    EXPECT_EQ(number<ViUInt32>(VI_ATTR_RSRC_SPEC_VERSION), 0x00700200u);
    EXPECT_EQ(number<ViUInt32>(VI_ATTR_RM_SESSION), 0u);
    EXPECT_EQ(number<ViUInt32>(VI_KY_ATTR_TCPIP_FIND_RSRC_TMO), 2000u);
    EXPECT_EQ(number<ViUInt32>(VI_KY_ATTR_TCPIP_FIND_RSRC_MODE), 6u);
}

TEST_F(Interface, RemembersTheSearchSettings)
{
    EXPECT_EQ(viSetAttribute(m_rm, VI_KY_ATTR_TCPIP_FIND_RSRC_TMO, 600000), VI_SUCCESS);
    EXPECT_EQ(viSetAttribute(m_rm, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 2), VI_SUCCESS);
    EXPECT_EQ(number<ViUInt32>(VI_KY_ATTR_TCPIP_FIND_RSRC_TMO), 600000u);
    EXPECT_EQ(number<ViUInt32>(VI_KY_ATTR_TCPIP_FIND_RSRC_MODE), 2u);
}

TEST_F(Interface, WritesNoByteBeyondTheWidthOfAnAttribute)
{
    std::array<unsigned char, 8> bytes;
    bytes.fill(0xEE);
    ASSERT_EQ(viGetAttribute(m_rm, VI_ATTR_RSRC_MANF_ID, bytes.data()), VI_SUCCESS);
    const std::array<unsigned char, 8> expected = {0xAF, 0x0F, 0xEE, 0xEE, 0xEE, 0xEE, 0xEE, 0xEE};
    EXPECT_EQ(bytes, expected);
}

TEST_F(Interface, RefusesAttributesByTheTable)
{
    ViUInt32 value = 0;
    EXPECT_EQ(viGetAttribute(m_rm, VI_ATTR_TMO_VALUE, &value), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(viGetAttribute(m_rm, 0x12345678, &value), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(viGetAttribute(m_rm, VI_ATTR_RSRC_MANF_ID, nullptr), VI_ERROR_INV_PARAMETER);
    EXPECT_EQ(viSetAttribute(m_rm, VI_ATTR_RSRC_MANF_ID, 1), VI_ERROR_ATTR_READONLY);
    EXPECT_EQ(viSetAttribute(m_rm, VI_ATTR_RSRC_NAME, 1), VI_ERROR_ATTR_READONLY);
    EXPECT_EQ(viSetAttribute(m_rm, VI_ATTR_MAX_QUEUE_LENGTH, 0), VI_ERROR_NSUP_ATTR_STATE);
}

TEST_F(Interface, KeepsAllBitsOfTheUserData)
{
    EXPECT_EQ(viSetAttribute(m_rm, VI_ATTR_USER_DATA, 0xFEDCBA9876543210u), VI_SUCCESS);
    EXPECT_EQ(number<ViUInt64>(VI_ATTR_USER_DATA), 0xFEDCBA9876543210u);
}

TEST_F(Interface, RefusesUnknownHandlesBeforeAnythingElse)
{
    const ViSession unknown = 0xDEADBEEF;
    ViUInt32 value = 0;
    EXPECT_EQ(viOpen(unknown, nullptr, 99, 0, nullptr), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viRead(unknown, nullptr, 1, nullptr), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viWrite(unknown, nullptr, 1, nullptr), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viReadSTB(unknown, nullptr), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viClear(unknown), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viLock(unknown, 99, 0, nullptr, nullptr), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viEnableEvent(unknown, 1, 99, 1), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viGpibSendIFC(unknown), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viIn32(unknown, 99, 0, nullptr), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viPrintf(unknown, nullptr), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viGetAttribute(unknown, VI_ATTR_RSRC_MANF_ID, &value), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viFindNext(unknown, nullptr), VI_ERROR_INV_OBJECT);
}

TEST_F(Interface, AnswersNotSupportedForInstrumentOperationsOnTheResourceManager)
{
    EXPECT_EQ(viRead(m_rm, nullptr, 1, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viClear(m_rm), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibControlREN(m_rm, 0), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viIn32(m_rm, 1, 0, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viEnableEvent(m_rm, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_ERROR_INV_EVENT);
}

TEST_F(Interface, PutsTextToEveryStatus)
{
    std::array<char, 256> description{};
    EXPECT_EQ(viStatusDesc(m_rm, VI_ERROR_TMO, description.data()), VI_SUCCESS);
    EXPECT_STREQ(description.data(), "Time-out expired before completion.");
    EXPECT_EQ(viStatusDesc(VI_NULL, VI_SUCCESS, description.data()), VI_SUCCESS);
    EXPECT_STREQ(description.data(), "Operation completed.");
    EXPECT_EQ(viStatusDesc(m_rm, 0x12345678, description.data()), VI_WARN_UNKNOWN_STATUS);
    EXPECT_STREQ(description.data(), "Unknown status 0x12345678.");
    EXPECT_EQ(viStatusDesc(m_rm, 0, nullptr), VI_ERROR_INV_PARAMETER);
}

TEST_F(Interface, RefusesBadNamesAndModes)
{
    ViSession session = 77;
    EXPECT_EQ(viOpen(m_rm, nullptr, 0, 0, &session), VI_ERROR_INV_RSRC_NAME);
    EXPECT_EQ(session, VI_NULL);
    EXPECT_EQ(viOpen(m_rm, "", 0, 0, &session), VI_ERROR_INV_RSRC_NAME);
    EXPECT_EQ(viOpen(m_rm, std::string(5000, 'T').c_str(), 0, 0, &session), VI_ERROR_INV_RSRC_NAME);
    EXPECT_EQ(viOpen(m_rm, "TCPIP::localhost::hislip0", 2, 0, &session), VI_ERROR_INV_ACC_MODE);
    EXPECT_EQ(viOpen(m_rm, "TCPIP::localhost::hislip0", 8, 0, &session), VI_ERROR_INV_ACC_MODE);
    EXPECT_EQ(viOpen(m_rm, "GPIB0::5::INSTR", 0, 0, &session), VI_ERROR_INTF_NUM_NCONFIG);
    EXPECT_EQ(viOpen(m_rm, "USB0::0x1234::0x5678::SN1::INSTR", 0, 0, &session), VI_ERROR_INTF_NUM_NCONFIG);
    EXPECT_EQ(viOpen(m_rm, "TCPIP::someone@localhost::hislip0", 0, 0, &session), VI_ERROR_INV_PROT);
    EXPECT_EQ(viOpen(m_rm, "TCPIP::SERVANT", 0, 0, &session), VI_ERROR_RSRC_NFOUND);
}

TEST_F(Interface, ParsesNamesWithoutOpeningThem)
{
    ViUInt16 type = 0;
    ViUInt16 board = 0;
    EXPECT_EQ(viParseRsrc(m_rm, "gpib3::5", &type, &board), VI_SUCCESS);
    EXPECT_EQ(type, 1);
    EXPECT_EQ(board, 3);
    std::array<char, 256> resourceClass{};
    std::array<char, 256> name{};
    std::array<char, 256> alias{};
    alias.fill('x');
    EXPECT_EQ(viParseRsrcEx(m_rm, "tcpip::10.0.0.7", &type, &board, resourceClass.data(), name.data(), alias.data()),
              VI_SUCCESS);
    EXPECT_STREQ(resourceClass.data(), "INSTR");
    EXPECT_STREQ(name.data(), "TCPIP0::10.0.0.7::inst0::INSTR");
    EXPECT_STREQ(alias.data(), "");
    EXPECT_EQ(viParseRsrc(m_rm, "nonsense", &type, &board), VI_ERROR_INV_RSRC_NAME);
    EXPECT_EQ(viParseRsrc(m_rm, "GPIB0::5", nullptr, &board), VI_ERROR_INV_PARAMETER);
}

TEST_F(Interface, SearchesOnTheResourceManagerAlone)
{
    ViFindList list = 5;
    ViUInt32 count = 5;
    std::array<char, 256> description{};
    EXPECT_EQ(viFindRsrc(m_rm, "(?*", &list, &count, description.data()), VI_ERROR_INV_EXPR);
    EXPECT_EQ(viFindRsrc(m_rm, nullptr, &list, &count, description.data()), VI_ERROR_INV_EXPR);
    EXPECT_EQ(list, VI_NULL);
    EXPECT_EQ(count, 0u);
    EXPECT_EQ(viFindNext(m_rm, description.data()), VI_ERROR_NSUP_OPER);
}

} // namespace
