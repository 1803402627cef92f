#include "finder/DeviceKey.h"

#include <QString>

#include <gtest/gtest.h>

namespace
{
struct Row {
    const char *resource;
    const char *key;
};

template <std::size_t N>
void expectKeys(const Row (&rows)[N])
{
    for (const Row &row : rows)
        EXPECT_EQ(deviceKey(QString::fromUtf8(row.resource)).toStdString(), row.key) << row.resource;
}
} // namespace

TEST(DeviceKey, EndsWithTheSerialNumberForUsb)
{
    expectKeys({{"USB0::0x0AAD::0x0119::100123::INSTR", "USB0::0x0AAD::0x0119::100123"},
                {"usb::0xAAD::0x119::100123::INSTR", "usb::0xAAD::0x119::100123"},
                {"USB0::0x0AAD::0x0119::100123::0::INSTR", "USB0::0x0AAD::0x0119::100123"}});
}

TEST(DeviceKey, IsFourCharactersForGpibAndSerial)
{
    expectKeys({{"GPIB0::5::INSTR", "GPIB"}, {"GPIB1::7::3::INSTR", "GPIB"}, {"ASRL1::INSTR", "ASRL"}});
}

TEST(DeviceKey, IsAnExactMatchForUsbAndNoneForGpib)
{
    expectKeys({{"Usb0::0x0AAD::0x0119::100123::INSTR", "Usb0::0x0AAD"},
                {"xUSB0::1::2::3::4", "xUSB0::1"},
                {"gpib0::5::INSTR", "gpib"},
                {"GpIb0::5::INSTR", "GpIb"},
                {"asrl/dev/ttyUSB0::INSTR", "asrl"}});
}

TEST(DeviceKey, IsInterfaceAndHostForOthers)
{
    expectKeys({{"TCPIP::192.168.1.9::hislip0::INSTR", "TCPIP::192.168.1.9"},
                {"TCPIP0::localhost::5025::SOCKET", "TCPIP0::localhost"},
                {"TCPIP::localhost::hislip0", "TCPIP::localhost"},
                {"VXI0::1::INSTR", "VXI0::1"},
                {"TCPIP::m\xc3\xbcnchen::INSTR", "TCPIP::m\xc3\xbcnchen"},
                {"a:::b::c", "a:::b"},
                {"::::", "::"}});
}

TEST(DeviceKey, IsTheWholeStringWhenASeparatorIsMissing)
{
    expectKeys({{"USB0::0x0AAD::0x0119::100123", "USB0::0x0AAD::0x0119::100123"},
                {"USB0::0x0AAD", "USB0::0x0AAD"},
                {"USB0", "USB0"},
                {"TCPIP::localhost", "TCPIP::localhost"},
                {"TCPIP", "TCPIP"},
                {"::", "::"},
                {"", ""}});
}
