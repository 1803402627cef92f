// The bus, by the bytes that are on it while ATN is true.
#include "simulator/bus/Bus.h"

#include "simulator/bus/BusInstrument.h"
#include "simulator/bus/BusPlotter.h"
#include "unit/simulator/HandTurnedTimers.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>

using namespace simulator;

namespace
{

using Bytes = std::vector<std::uint8_t>;

/// What a station at @p address is after these bytes: "L" addressed to listen, "T" to talk, "P" being polled.
std::string after(BusAddress address, const Bytes &messages)
{
    BusAddressing addressing(address);
    for (const std::uint8_t message : messages)
        addressing.take(message);
    return std::string(addressing.listening() ? "L" : "") + (addressing.talking() ? "T" : "") +
           (addressing.polled() ? "P" : "");
}

constexpr BusAddress Five{5, std::nullopt};
constexpr BusAddress NineOne{9, 1};

/// An interface at 21 with instruments at 5, 7 and 9,1 and a plotter at 12, and a clock that the test turns.
class BusTest : public testing::Test
{
protected:
    BusTest()
    {
        add(first, {5, std::nullopt});
        add(second, {7, std::nullopt});
        add(third, {9, 1});
        bus.add(std::make_unique<BusPlotter>(BusAddress{12, std::nullopt}, timers));
    }

    void add(Instrument &instrument, BusAddress address)
    {
        bus.add(std::make_unique<BusInstrument>(
            address, instrument, Vxi11Device::Events{[this] { bus.changed(); }, [] { return false; }, [] {}}));
    }

    static InstrumentOptions options(const char *serial)
    {
        InstrumentOptions result;
        result.identification.serial = serial;
        result.identification.firmware = "1.0";
        return result;
    }

    bool command(const Bytes &messages) { return bus.command(messages); }
    Bus::Transfer write(std::string_view text) { return bus.write(std::as_bytes(std::span(text)), true); }
    /// What the interface reads; "later" when nothing comes now.
    std::string read(std::size_t most = 1000)
    {
        bus.beginRead();
        Vxi11Response::Piece piece;
        switch (bus.read(most, std::nullopt, piece)) {
        case Bus::Transfer::NotAddressed:
            return "not addressed";
        case Bus::Transfer::Later:
            return "later";
        case Bus::Transfer::Done:
            break;
        }
        std::string text;
        for (const Outgoing &each : piece.bytes)
            text += each.text;
        return text;
    }
    std::string query(const Bytes &listen, const Bytes &talk, std::string_view text)
    {
        EXPECT_TRUE(command(listen));
        EXPECT_EQ(write(text), Bus::Transfer::Done);
        EXPECT_TRUE(command(talk));
        return read();
    }

    HandTurnedTimers timers;
    Instrument first{timers, options("1")};
    Instrument second{timers, options("2")};
    Instrument third{timers, options("3")};
    Bus bus{timers, 21};
};

} // namespace

TEST(BusAddressing, FollowsPrimaryAddresses)
{
    EXPECT_EQ(after(Five, {}), "");
    EXPECT_EQ(after(Five, {0x25}), "L");
    EXPECT_EQ(after(Five, {0x24}), "");
    EXPECT_EQ(after(Five, {0x25, 0x27}), "L") << "several may listen";
    EXPECT_EQ(after(Five, {0x25, 0x3F}), "") << "UNL";
    EXPECT_EQ(after(Five, {0x45}), "T");
    EXPECT_EQ(after(Five, {0x45, 0x47}), "") << "one may talk";
    EXPECT_EQ(after(Five, {0x45, 0x5F}), "") << "UNT";
    EXPECT_EQ(after(Five, {0x45, 0x3F}), "T") << "UNL is not for talkers";
    EXPECT_EQ(after(Five, {0x25, 0x5F}), "L");
    EXPECT_EQ(after(Five, {0x25, 0x45}), "T") << "nobody talks to itself";
    EXPECT_EQ(after(Five, {0x45, 0x25}), "L");
    EXPECT_EQ(after(Five, {0x25, 0x01, 0x04, 0x08, 0x14, 0x11}), "L") << "commands address nobody";
    EXPECT_EQ(after({0, std::nullopt}, {0x20}), "L");
    EXPECT_EQ(after({30, std::nullopt}, {0x5E}), "T");
}

TEST(BusAddressing, FollowsSecondaryAddresses)
{
    EXPECT_EQ(after(NineOne, {0x29}), "") << "half an address";
    EXPECT_EQ(after(NineOne, {0x29, 0x61}), "L");
    EXPECT_EQ(after(NineOne, {0x29, 0x62}), "");
    EXPECT_EQ(after(NineOne, {0x61}), "");
    EXPECT_EQ(after(NineOne, {0x25, 0x61}), "") << "of another station";
    EXPECT_EQ(after(NineOne, {0x29, 0x25, 0x61}), "") << "not directly behind";
    EXPECT_EQ(after(NineOne, {0x29, 0x62, 0x61}), "L") << "several secondary addresses of one primary";
    EXPECT_EQ(after(NineOne, {0x49, 0x61}), "T");
    EXPECT_EQ(after(NineOne, {0x49, 0x61, 0x49, 0x62}), "") << "its neighbour talks";
    EXPECT_EQ(after(NineOne, {0x49, 0x61, 0x45}), "");
    EXPECT_EQ(after(NineOne, {0x29, 0x61, 0x49, 0x61}), "T");
    EXPECT_EQ(after(NineOne, {0x29, 0x61, 0x3F}), "");
    EXPECT_EQ(after(Five, {0x25, 0x61}), "L") << "who has none does not look at them";
    EXPECT_EQ(after(NineOne, {0x3F, 0x29, 0x05, 0x61}), "") << "a parallel poll configuration is no address";
}

TEST(BusAddressing, FollowsSerialPollAndInterfaceClear)
{
    EXPECT_EQ(after(Five, {0x18}), "P");
    EXPECT_EQ(after(Five, {0x18, 0x45}), "TP");
    EXPECT_EQ(after(Five, {0x18, 0x45, 0x19}), "T");
    BusAddressing addressing(Five);
    for (const std::uint8_t message : {0x18, 0x45})
        addressing.take(message);
    addressing.interfaceClear();
    EXPECT_FALSE(addressing.talking() || addressing.listening() || addressing.polled());
}

TEST_F(BusTest, CarriesDataToAndFromWhoeverIsAddressed)
{
    EXPECT_EQ(query({0x3F, 0x55, 0x27}, {0x3F, 0x35, 0x47}, "*IDN?\n"), "Oltrava,KyVisaSimulator,2,1.0\n");
    EXPECT_EQ(query({0x3F, 0x55, 0x29, 0x61}, {0x3F, 0x35, 0x49, 0x61}, "*IDN?\n"), "Oltrava,KyVisaSimulator,3,1.0\n");
    EXPECT_TRUE(command({0x3F, 0x5F}));
    EXPECT_EQ(write("*IDN?\n"), Bus::Transfer::NotAddressed);
    EXPECT_EQ(read(), "not addressed");
    EXPECT_TRUE(command({0x55}));
    EXPECT_EQ(write("*IDN?\n"), Bus::Transfer::Later) << "nobody listens";
    EXPECT_TRUE(command({0x35, 0x48}));
    EXPECT_EQ(read(), "later") << "nobody talks";
}

TEST_F(BusTest, ClearsTheSelectedOrAll)
{
    const auto available = [](Instrument &instrument) { return instrument.errors.size(); };
    ASSERT_TRUE(command({0x3F, 0x55, 0x25, 0x27}));
    ASSERT_EQ(write("*IDN?\n"), Bus::Transfer::Done);
    ASSERT_TRUE(command({0x3F, 0x27, 0x04}));
    ASSERT_TRUE(command({0x3F, 0x35, 0x47}));
    EXPECT_EQ(read(), "later") << "SDC";
    EXPECT_EQ(available(second), 1u) << "and asking for the answer was an error";
    ASSERT_TRUE(command({0x45}));
    EXPECT_EQ(read(), "Oltrava,KyVisaSimulator,1,1.0\n");
    ASSERT_TRUE(command({0x3F, 0x55, 0x25}));
    ASSERT_EQ(write("*IDN?\n"), Bus::Transfer::Done);
    ASSERT_TRUE(command({0x3F, 0x14}));
    ASSERT_TRUE(command({0x3F, 0x35, 0x45}));
    EXPECT_EQ(read(), "later") << "DCL";
}

TEST_F(BusTest, MakesRemoteWhoeverIsAddressedToListenWhileRenIsTrue)
{
    EXPECT_EQ(first.remote.name(), "LOC");
    ASSERT_TRUE(command({0x45}));
    EXPECT_EQ(first.remote.name(), "LOC") << "to talk is not enough";
    ASSERT_TRUE(command({0x25}));
    EXPECT_EQ(first.remote.name(), "REM");
    EXPECT_EQ(second.remote.name(), "LOC");
    ASSERT_TRUE(command({0x01}));
    EXPECT_EQ(first.remote.name(), "LOC") << "GTL";
    ASSERT_TRUE(command({0x11, 0x27}));
    EXPECT_EQ(second.remote.name(), "RWL") << "LLO is for all, and shows when remote";
    bus.setRemoteEnable(false);
    EXPECT_EQ(second.remote.name(), "LOC");
    ASSERT_TRUE(command({0x25, 0x11}));
    EXPECT_EQ(first.remote.name(), "LOC");
    bus.setRemoteEnable(true);
    EXPECT_EQ(first.remote.name(), "LOC") << "until it is addressed again";
    ASSERT_TRUE(command({0x25}));
    EXPECT_EQ(first.remote.name(), "REM") << "LLO without REN locks nothing out";
}

TEST_F(BusTest, TriggersThoseThatListen)
{
    ASSERT_TRUE(command({0x3F, 0x55, 0x25, 0x27, 0x29, 0x61}));
    ASSERT_EQ(write("TRIG:SOUR BUS;:INIT;*OPC\n"), Bus::Transfer::Done);
    ASSERT_TRUE(command({0x3F, 0x25, 0x29, 0x61, 0x08}));
    timers.turn(std::chrono::seconds(10));
    EXPECT_EQ(first.status.takeEvent() & 1, 1);
    EXPECT_EQ(second.status.takeEvent() & 1, 0) << "still waits";
    EXPECT_EQ(third.status.takeEvent() & 1, 1);
}

TEST_F(BusTest, PollsSerially)
{
    EXPECT_FALSE(bus.serviceRequested());
    ASSERT_TRUE(command({0x3F, 0x55, 0x27}));
    ASSERT_EQ(write("*SRE 16;*IDN?\n"), Bus::Transfer::Done);
    EXPECT_TRUE(bus.serviceRequested());
    ASSERT_TRUE(command({0x3F, 0x35, 0x18, 0x45}));
    EXPECT_EQ(read(1), std::string(1, '\0'));
    ASSERT_TRUE(command({0x4C}));
    EXPECT_EQ(read(1), "later") << "the plotter has no status byte";
    ASSERT_TRUE(command({0x47}));
    EXPECT_EQ(read(1), "\x50");
    EXPECT_EQ(read(1), "\x10") << "the request is answered";
    EXPECT_FALSE(bus.serviceRequested());
    ASSERT_TRUE(command({0x19}));
    EXPECT_EQ(read(), "Oltrava,KyVisaSimulator,2,1.0\n") << "the answer is untouched";
}

TEST_F(BusTest, LetsDataPassTheInterfaceByItself)
{
    ASSERT_TRUE(command({0x3F, 0x55, 0x25}));
    ASSERT_EQ(write("SYST:ERR?\n"), Bus::Transfer::Done);
    ASSERT_TRUE(command({0x3F, 0x45, 0x27}));
    timers.turn();
    EXPECT_EQ(second.errors.size(), 0u) << "not while ATN is true";
    ASSERT_TRUE(bus.setAttention(false));
    timers.turn();
    EXPECT_EQ(second.errors.size(), 1u) << "it has heard 0,\"No error\"";
}

TEST_F(BusTest, ShowsByNdacWhetherSomebodyIsThere)
{
    ASSERT_TRUE(command({0x3F, 0x2C}));
    EXPECT_TRUE(bus.notDataAccepted()) << "with ATN everybody";
    ASSERT_TRUE(bus.setAttention(false));
    EXPECT_TRUE(bus.notDataAccepted()) << "the plotter";
    ASSERT_TRUE(command({0x3F, 0x2D}));
    ASSERT_TRUE(bus.setAttention(false));
    EXPECT_FALSE(bus.notDataAccepted());
    ASSERT_TRUE(command({0x35}));
    ASSERT_TRUE(bus.setAttention(false));
    EXPECT_TRUE(bus.notDataAccepted()) << "the interface";
}

TEST_F(BusTest, PassesControlAndTakesItBack)
{
    EXPECT_TRUE(command({0x3F, 0x55, 0x09}));
    EXPECT_TRUE(bus.inCharge()) << "to itself";
    EXPECT_TRUE(bus.passControl(7));
    EXPECT_FALSE(bus.inCharge());
    EXPECT_FALSE(command({0x3F}));
    EXPECT_FALSE(command({}));
    EXPECT_FALSE(bus.setAttention(true));
    EXPECT_FALSE(bus.passControl(7));
    bus.interfaceClear();
    EXPECT_TRUE(bus.inCharge());
    EXPECT_FALSE(bus.addressedToTalk() || bus.addressedToListen());
    EXPECT_TRUE(command({}));
    EXPECT_FALSE(command({0x47, 0x09, 0x25})) << "nothing can be sent behind TCT";
    EXPECT_EQ(first.remote.name(), "LOC");
}

TEST_F(BusTest, DoesNotLookAtTheEighthBitOfCommands)
{
    EXPECT_EQ(query({0xBF, 0xD5, 0xA7}, {0xBF, 0xB5, 0xC7}, "*IDN?\n"), "Oltrava,KyVisaSimulator,2,1.0\n");
}

TEST_F(BusTest, SlowestListenerHoldsTheOthers)
{
    ASSERT_TRUE(command({0x3F, 0x55, 0x27}));
    ASSERT_EQ(write("SYST:DEL 5\n"), Bus::Transfer::Done);
    const std::string much(900'000, ' ');
    ASSERT_EQ(write(much), Bus::Transfer::Done);
    ASSERT_EQ(write(much), Bus::Transfer::Done);
    ASSERT_TRUE(command({0x25}));
    EXPECT_FALSE(bus.listenersHaveRoom());
    EXPECT_EQ(write("*ESE 4\n"), Bus::Transfer::Later);
    EXPECT_EQ(first.status.eventEnable(), 0) << "nobody gets what one cannot take";
    timers.turn(std::chrono::seconds(6));
    EXPECT_EQ(write("*ESE 4\n"), Bus::Transfer::Done);
    EXPECT_EQ(first.status.eventEnable(), 4);
}
