#include "simulator/server/Vxi11Gateway.h"

#include "simulator/bus/BusInstrument.h"
#include "simulator/bus/BusPlotter.h"
#include "simulator/server/GatewayName.h"

#include <algorithm>
#include <array>
#include <utility>

namespace simulator
{

using wire::vxi11::Error;

namespace
{

constexpr std::array<BusAddress, 2> MoreInstruments{{{7, std::nullopt}, {9, 1}}};
constexpr BusAddress Plotter{12, std::nullopt};
constexpr std::uint64_t MostFiles = std::uint64_t{64} << 20;

/// An instrument without a secondary address takes no notice of one: every link to its primary address leads to it.
bool leadsTo(const BusAddress &instrument, const BusAddress &link)
{
    return link.primary == instrument.primary && (!instrument.secondary || link.secondary == instrument.secondary);
}

/// The make of the main instrument, with a serial number of its own and memory for small files.
InstrumentOptions next(InstrumentOptions options, std::size_t number)
{
    options.identification.serial = std::to_string(100001 + number);
    options.seed += number;
    options.massMemory = std::min(options.massMemory, MostFiles);
    options.maxMessage = std::min<std::size_t>(options.maxMessage, MostFiles);
    return options;
}

} // namespace

Vxi11Gateway::Vxi11Gateway(Timers &timers, const Options &options, Events events)
    : m_timers(timers), m_events(std::move(events)), m_bus(timers, InterfaceAddress),
      m_interface(m_bus, timers, options.refuseCommands)
{
    addInstrument(MainInstrument, options.instrument);
    for (const BusAddress &address : MoreInstruments) {
        m_instruments.push_back(
            std::make_unique<Instrument>(timers, next(options.instrument.options(), m_instruments.size() + 1)));
        addInstrument(address, *m_instruments.back());
    }
    m_bus.add(std::make_unique<BusPlotter>(Plotter, timers));
}

void Vxi11Gateway::addInstrument(BusAddress address, Instrument &instrument)
{
    const auto changed = [this] {
        m_bus.changed();
        m_events.changed();
    };
    const auto isAwaited = [this, address] {
        return std::any_of(
                   m_addresses.begin(), m_addresses.end(),
                   [&](const auto &link) { return leadsTo(address, link.first) && m_events.isAwaited(link.second); }) ||
               (m_bus.talker() && m_bus.talker()->address() == address && m_events.isAwaited(m_interface));
    };
    const auto serviceRequest = [this, address] {
        for (const auto &[link, target] : m_addresses)
            if (leadsTo(address, link))
                m_events.serviceRequest(target);
        m_events.serviceRequest(m_interface);
    };
    m_bus.add(
        std::make_unique<BusInstrument>(address, instrument, Vxi11Device::Events{changed, isAwaited, serviceRequest}));
}

Vxi11Target &Vxi11Gateway::targetAt(BusAddress address)
{
    return m_addresses.try_emplace(address, m_bus, address, m_timers).first->second;
}

Error Vxi11Gateway::find(std::string_view device, Vxi11Target *&target)
{
    std::optional<BusAddress> address;
    const Error error = parseGatewayName(device, address);
    if (error == Error::NoError)
        target = address ? &targetAt(*address) : &m_interface;
    return error;
}

} // namespace simulator
