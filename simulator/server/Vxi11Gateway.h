#pragma once

#include "simulator/bus/Bus.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/server/Vxi11BusAddress.h"
#include "simulator/server/Vxi11BusInterface.h"

#include <functional>
#include <map>
#include <memory>
#include <string_view>
#include <vector>

namespace simulator
{

/**
 * A LAN/GPIB gateway (VXI-11.2) with the bus behind it:
 *
 *     5       the instrument that all protocols reach
 *     7, 9,1  two more of the same make, each with a state of its own
 *     12      a plotter, which never answers
 *     21      the interface
 *
 * Whoever links to an address that has no station finds nobody there.
 */
class Vxi11Gateway
{
public:
    static constexpr BusAddress MainInstrument{5, std::nullopt};
    static constexpr std::uint8_t InterfaceAddress = 21;

    struct Options {
        Instrument &instrument;
        bool refuseCommands = false; ///< device_docmd
    };
    /// None of them may call back.
    struct Events {
        std::function<void()> changed; ///< a call that could not be done may be possible now
        std::function<bool(const Vxi11Target &)> isAwaited;
        std::function<void(const Vxi11Target &)> serviceRequest;
    };

    Vxi11Gateway(Timers &timers, const Options &options, Events events);

    /// What a device name leads to; another error than NoError when nothing.
    wire::vxi11::Error find(std::string_view device, Vxi11Target *&target);

private:
    void addInstrument(BusAddress address, Instrument &instrument);
    Vxi11Target &targetAt(BusAddress address);

    Timers &m_timers;
    const Events m_events;
    std::vector<std::unique_ptr<Instrument>> m_instruments; ///< beside the main one
    Bus m_bus;
    Vxi11BusInterface m_interface;
    std::map<BusAddress, Vxi11BusAddress> m_addresses; ///< that were asked for; there cannot be many
};

} // namespace simulator
