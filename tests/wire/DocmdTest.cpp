#include "wire/Docmd.h"

#include "wire/Hex.h"

#include <gtest/gtest.h>

using namespace wire;
using namespace wire::vxi11;

namespace
{

DocmdCall callWith(const std::vector<std::byte> &data, bool networkOrder, std::int32_t dataSize)
{
    DocmdCall call;
    call.networkOrder = networkOrder;
    call.dataSize = dataSize;
    call.data = data;
    return call;
}

template <typename Number>
void expectBothWays(Number value, std::string_view networkOrder, std::string_view otherOrder)
{
    for (const bool network : {true, false}) {
        const auto expected = hex(network ? networkOrder : otherOrder);
        std::vector<std::byte> written = hex("EE");
        appendNumber(written, value, network);
        EXPECT_EQ(written.front(), std::byte{0xEE}) << "it is appended";
        written.erase(written.begin());
        EXPECT_EQ(written, expected);

        Number read = 0;
        EXPECT_TRUE(takeNumber(callWith(expected, network, sizeof(Number)), read));
        EXPECT_EQ(read, value);
    }
}

template <typename Number>
void expectRefused(const std::vector<std::byte> &data, std::int32_t dataSize)
{
    Number read = 77;
    EXPECT_FALSE(takeNumber(callWith(data, true, dataSize), read)) << data.size() << " bytes of " << dataSize;
    EXPECT_EQ(read, 77u) << "what was there stays";
}

} // namespace

TEST(Docmd, HasTheNumbersOfTheStandard)
{
    EXPECT_EQ(MaxBusCommands, 128u);
    EXPECT_EQ(MaxBusAddress, 30u);
    EXPECT_EQ(static_cast<int>(BusQuestion::RemoteEnable), 1);
    EXPECT_EQ(static_cast<int>(BusQuestion::ServiceRequest), 2);
    EXPECT_EQ(static_cast<int>(BusQuestion::NotDataAccepted), 3);
    EXPECT_EQ(static_cast<int>(BusQuestion::SystemController), 4);
    EXPECT_EQ(static_cast<int>(BusQuestion::ControllerInCharge), 5);
    EXPECT_EQ(static_cast<int>(BusQuestion::Talker), 6);
    EXPECT_EQ(static_cast<int>(BusQuestion::Listener), 7);
    EXPECT_EQ(static_cast<int>(BusQuestion::Address), 8);
}

TEST(Docmd, NumbersOfTwoBytesInBothOrders)
{
    expectBothWays<std::uint16_t>(1, "00 01", "01 00");
    expectBothWays<std::uint16_t>(0x1234, "12 34", "34 12");
    expectBothWays<std::uint16_t>(0xFF80, "FF 80", "80 FF");
}

TEST(Docmd, NumbersOfFourBytesInBothOrders)
{
    expectBothWays<std::uint32_t>(21, "00 00 00 15", "15 00 00 00");
    expectBothWays<std::uint32_t>(0x89ABCDEF, "89 AB CD EF", "EF CD AB 89");
}

TEST(Docmd, NumbersOfAnotherLengthAreNone)
{
    const auto bytes = hex("00 00 00 01 00");
    for (std::size_t length = 0; length <= bytes.size(); ++length) {
        const std::vector<std::byte> cut(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(length));
        if (length != 2)
            expectRefused<std::uint16_t>(cut, 2);
        if (length != 4)
            expectRefused<std::uint32_t>(cut, 4);
    }
    for (const std::int32_t size : {-1, 0, 1, 3, 4, 0x7FFFFFFF})
        expectRefused<std::uint16_t>(hex("00 01"), size);
    for (const std::int32_t size : {-1, 0, 1, 2, 3, 5, 0x7FFFFFFF})
        expectRefused<std::uint32_t>(hex("00 00 00 01"), size);
}

TEST(Docmd, BytesForTheBusAreAtMost128)
{
    xdr::Bytes bytes;
    const auto commands = hex("3F 25");
    EXPECT_TRUE(takeBytes(callWith(commands, false, 1), bytes));
    EXPECT_EQ(bytes.data(), commands.data()) << "a view";
    EXPECT_EQ(bytes.size(), 2u);
    EXPECT_TRUE(takeBytes(callWith({}, true, 1), bytes));
    EXPECT_TRUE(bytes.empty());
    EXPECT_TRUE(takeBytes(callWith(std::vector<std::byte>(128), true, 1), bytes));
    EXPECT_FALSE(takeBytes(callWith(std::vector<std::byte>(129), true, 1), bytes));
    EXPECT_FALSE(takeBytes(callWith(commands, true, 2), bytes)) << "not of single bytes";
    EXPECT_FALSE(takeBytes(callWith(commands, true, 0), bytes));
    EXPECT_EQ(bytes.size(), 128u) << "what was there stays";
}
