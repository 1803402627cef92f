// An odd first byte: the rest is a device name of the gateway. An even one: pairs of bytes, of which the first chooses what happens on the bus.
#include "simulator/bus/Bus.h"
#include "simulator/bus/BusInstrument.h"
#include "simulator/bus/BusPlotter.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/server/GatewayName.h"
#include "tests/fuzz/Promise.h"
#include "tests/unit/simulator/HandTurnedTimers.h"

#include <algorithm>
#include <array>
#include <string>

using namespace simulator;

namespace
{

void readName(std::span<const std::uint8_t> bytes)
{
    std::optional<BusAddress> address;
    const std::string name(bytes.begin(), bytes.end());
    const wire::vxi11::Error error = parseGatewayName(name, address);
    if (error != wire::vxi11::Error::NoError || !address)
        return;
    promise(address->primary <= BusAddress::Most);
    promise(!address->secondary || *address->secondary <= BusAddress::Most);
}

void useBus(std::span<const std::uint8_t> bytes)
{
    HandTurnedTimers timers;
    Instrument first(timers, {});
    Instrument second(timers, {});
    Bus bus(timers, 21);
    const Vxi11Device::Events events{[&bus] { bus.changed(); }, [] { return false; }, [] {}};
    bus.add(std::make_unique<BusInstrument>(BusAddress{5, std::nullopt}, first, events));
    bus.add(std::make_unique<BusInstrument>(BusAddress{9, 1}, second, events));
    bus.add(std::make_unique<BusPlotter>(BusAddress{12, std::nullopt}, timers));
    for (; bytes.size() >= 2; bytes = bytes.subspan(2)) {
        const std::uint8_t value = bytes[1];
        Vxi11Response::Piece piece;
        switch (bytes[0] % 8) {
        case 0:
        case 1:
            promise(bus.command(std::array{value}) || !bus.inCharge());
            break;
        case 2:
            bus.write(std::as_bytes(bytes.subspan(1, 1)), (bytes[0] & 8) != 0);
            break;
        case 3:
            bus.beginRead();
            if (bus.read(value + 1u, std::nullopt, piece) == Bus::Transfer::Done)
                promise(piece.size > 0 && piece.size <= value + 1u);
            break;
        case 4:
            static_cast<void>(bus.setAttention(value != 0));
            break;
        case 5:
            bus.setRemoteEnable(value != 0);
            break;
        case 6:
            timers.turn(std::chrono::milliseconds(value));
            break;
        case 7:
            bus.interfaceClear();
            promise(bus.inCharge() && !bus.talker());
            break;
        }
        const auto talkers = std::count_if(bus.stations().begin(), bus.stations().end(),
                                           [](const auto &station) { return station->talking(); });
        promise(talkers + (bus.addressedToTalk() ? 1 : 0) <= 1);
        promise(!bus.addressedToTalk() || !bus.addressedToListen());
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    if (size == 0)
        return 0;
    const std::span<const std::uint8_t> rest(data + 1, size - 1);
    if (data[0] % 2 == 1)
        readName(rest);
    else
        useBus(rest);
    return 0;
}
