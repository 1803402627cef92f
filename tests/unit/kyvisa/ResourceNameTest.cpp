#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"

#include <gtest/gtest.h>

using namespace kyvisa;

namespace
{

struct Good {
    const char *text;
    const char *canonical;
    ViUInt16 type;
    ViUInt16 board;
};

class GoodName : public testing::TestWithParam<Good>
{
};

TEST_P(GoodName, HasOneFullForm)
{
    ResourceName name;
    ASSERT_EQ(parseResourceName(GetParam().text, name), VI_SUCCESS);
    EXPECT_EQ(name.canonical(), GetParam().canonical);
    EXPECT_EQ(name.interfaceType, GetParam().type);
    EXPECT_EQ(name.board, GetParam().board);
    ResourceName again;
    ASSERT_EQ(parseResourceName(name.canonical(), again), VI_SUCCESS);
    EXPECT_EQ(again.canonical(), GetParam().canonical);
}

INSTANTIATE_TEST_SUITE_P(
    ResourceName, GoodName,
    testing::Values(Good{"TCPIP::10.0.0.1", "TCPIP0::10.0.0.1::inst0::INSTR", 6, 0},
                    Good{"tcpip2::Box.lan::INSTR", "TCPIP2::Box.lan::inst0::INSTR", 6, 2},
                    Good{"TCPIP::box::hislip0", "TCPIP0::box::hislip0::INSTR", 6, 0},
                    Good{"TCPIP::box::HiSLIP0,4880::INSTR", "TCPIP0::box::HiSLIP0::INSTR", 6, 0},
                    Good{"TCPIP::box::hislip3,4881", "TCPIP0::box::hislip3,4881::INSTR", 6, 0},
                    Good{"TCPIP::[fe80::1]::hislip0::instr", "TCPIP0::[fe80::1]::hislip0::INSTR", 6, 0},
                    Good{"TCPIP0::[::1]::5025::SOCKET", "TCPIP0::[::1]::5025::SOCKET", 6, 0},
                    Good{"TCPIP::box::5025::socket", "TCPIP0::box::5025::SOCKET", 6, 0},
                    Good{"TCPIP::box::gpib0,5::INSTR", "TCPIP0::box::gpib0,5::INSTR", 6, 0},
                    Good{"TCPIP::SERVANT", "TCPIP0::inst0::SERVANT", 6, 0}, Good{"GPIB::5", "GPIB0::5::INSTR", 1, 0},
                    Good{"gpib1::5::3::instr", "GPIB1::5::3::INSTR", 1, 1}, Good{"GPIB2::INTFC", "GPIB2::INTFC", 1, 2},
                    Good{"ASRL1", "ASRL1::INSTR", 4, 1}, Good{"ASRL::INSTR", "ASRL0::INSTR", 4, 0},
                    Good{"asrl/dev/ttyUSB0", "ASRL/dev/ttyUSB0::INSTR", 4, 0},
                    Good{"ASRL/dev/pts/3::instr", "ASRL/dev/pts/3::INSTR", 4, 0},
                    Good{"USB::0x1234::0x5678::A22-5", "USB0::0x1234::0x5678::A22-5::INSTR", 7, 0},
                    Good{"USB::0x1234::125::A22-5::1::INSTR", "USB0::0x1234::125::A22-5::1::INSTR", 7, 0},
                    Good{"VXI0::1::INSTR", "VXI0::1::INSTR", 2, 0}, Good{"VXI::MEMACC", "VXI0::MEMACC", 2, 0},
                    Good{"GPIB-VXI::9::INSTR", "GPIB-VXI0::9::INSTR", 3, 0},
                    Good{"PXI0::3-18::INSTR", "PXI0::3-18::INSTR", 5, 0},
                    Good{"PXI0::CHASSIS1::SLOT3::INSTR", "PXI0::CHASSIS1::SLOT3::INSTR", 5, 0}));

class BadName : public testing::TestWithParam<const char *>
{
};

TEST_P(BadName, IsRefused)
{
    ResourceName name;
    EXPECT_EQ(parseResourceName(GetParam(), name), VI_ERROR_INV_RSRC_NAME);
}

INSTANTIATE_TEST_SUITE_P(
    ResourceName, BadName,
    testing::Values("", "::", "X", "TCPIP", "TCPIP::", "TCPIP::::INSTR", "TCPIP::INSTR", "TCPIPx::box::INSTR",
                    "TCPIP99999::box", "TCPIP::box::SOCKET", "TCPIP::box::0::SOCKET", "TCPIP::box::70000::SOCKET",
                    "TCPIP::box::-1::SOCKET", "TCPIP::box::5025x::SOCKET", "TCPIP::box::hislip0,::INSTR",
                    "TCPIP::box::hislip0,0::INSTR", "TCPIP::box::hislip0,99999", "TCPIP::box::hislip0::extra::INSTR",
                    "TCPIP::box::hislip0:", "TCPIP::box::hislip0:,4880", "TCPIP::me@you@box::hislip0",
                    "VXI0::24::I\x1F", "USB::1::2::S\n", "TCPIP::box:::inst0", "TCPIP::[::1::hislip0",
                    "TCPIP::[box]::hislip0", "TCPIP::fe80:1::hislip0", "TCPIP::a b::hislip0", "TCPIP::box::INTFC",
                    "GPIB::31", "GPIB::5::32", "GPIB", "GPIB::x", "GPIB::5::INTFC", "ASRL1::x",
                    "ASRL/dev/tty S0::INSTR", "ASRL/etc/passwd::INSTR", "ASRL/dev/ttyS0::x::INSTR",
                    "USB::0x1234::INSTR", "USB::0xZZ::0x1::S", "VXI::SOCKET", "PXI::x::INSTR"));

TEST(ResourceName, KeepsHostAndCredentialsApart)
{
    ResourceName name;
    ASSERT_EQ(parseResourceName("TCPIP::#user@[::1]::hislip0", name), VI_SUCCESS);
    EXPECT_TRUE(name.secure);
    EXPECT_EQ(name.host, "::1");
    EXPECT_EQ(name.port, 4880);
}

TEST(ResourceName, StaysWithinTheBuffersOfTheInterface)
{
    ResourceName name;
    EXPECT_EQ(parseResourceName("TCPIP::" + std::string(300, 'h'), name), VI_ERROR_INV_RSRC_NAME);
    // Short enough as given, too long in its full form.
    EXPECT_EQ(parseResourceName("TCPIP::" + std::string(245, 'h'), name), VI_ERROR_INV_RSRC_NAME);
    EXPECT_EQ(parseResourceName("TCPIP::" + std::string(200, 'h'), name), VI_SUCCESS);
}

} // namespace
