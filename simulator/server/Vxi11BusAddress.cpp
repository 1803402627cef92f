#include "simulator/server/Vxi11BusAddress.h"

#include "simulator/bus/InterfaceMessages.h"

#include <algorithm>
#include <array>

namespace simulator
{

Vxi11BusAddress::Vxi11BusAddress(Bus &bus, BusAddress address, Timers &timers)
    : m_bus(bus), m_address(address), m_locks(timers)
{
}

BusStation *Vxi11BusAddress::station() const
{
    const auto found = std::find_if(m_bus.stations().begin(), m_bus.stations().end(),
                                    [this](const auto &each) { return each->address() == m_address; });
    return found == m_bus.stations().end() ? nullptr : found->get();
}

LockTable &Vxi11BusAddress::locks()
{
    BusStation *there = station();
    return there == nullptr ? m_locks : there->locks();
}

Vxi11Device *Vxi11BusAddress::device()
{
    BusStation *there = station();
    return there == nullptr ? nullptr : there->device();
}

bool Vxi11BusAddress::tell(std::optional<std::uint8_t> command)
{
    std::vector<std::uint8_t> messages{bus::Unlisten, bus::talk(m_bus.address()), bus::listen(m_address.primary)};
    if (m_address.secondary)
        messages.push_back(bus::secondary(*m_address.secondary));
    if (command)
        messages.push_back(*command);
    return m_bus.command(messages);
}

bool Vxi11BusAddress::ask(std::optional<std::uint8_t> command)
{
    std::vector<std::uint8_t> messages{bus::Unlisten, bus::listen(m_bus.address())};
    if (command)
        messages.push_back(*command);
    messages.push_back(bus::talk(m_address.primary));
    if (m_address.secondary)
        messages.push_back(bus::secondary(*m_address.secondary));
    return m_bus.command(messages);
}

std::optional<Vxi11Target::Error> Vxi11BusAddress::write(std::span<const std::byte> bytes, bool end)
{
    if (!tell())
        return Error::IoError;
    if (m_bus.write(bytes, end) != Bus::Transfer::Done)
        return std::nullopt;
    return Error::NoError;
}

void Vxi11BusAddress::beginRead()
{
    if (ask())
        m_bus.beginRead();
}

std::optional<Vxi11Target::Reading> Vxi11BusAddress::read(std::size_t most, std::optional<std::uint8_t> termination)
{
    if (!ask())
        return Reading{Error::IoError, {}};
    Reading reading;
    if (m_bus.read(most, termination, reading.piece) != Bus::Transfer::Done)
        return std::nullopt;
    return reading;
}

std::optional<Vxi11Target::Error> Vxi11BusAddress::trigger()
{
    if (!tell())
        return Error::IoError;
    if (!m_bus.listenersHaveRoom())
        return std::nullopt;
    return m_bus.command(std::array{bus::GroupExecuteTrigger}) ? Error::NoError : Error::IoError;
}

Vxi11Target::Error Vxi11BusAddress::clear()
{
    return tell(bus::SelectedDeviceClear) ? Error::NoError : Error::IoError;
}

Vxi11Target::Error Vxi11BusAddress::remote()
{
    m_bus.setRemoteEnable(true);
    return tell() ? Error::NoError : Error::IoError;
}

Vxi11Target::Error Vxi11BusAddress::local()
{
    return tell(bus::GoToLocal) ? Error::NoError : Error::IoError;
}

wire::vxi11::ReadStbResult Vxi11BusAddress::poll()
{
    if (!ask(bus::SerialPollEnable))
        return {Error::IoError, 0};
    BusStation *station = m_bus.talker();
    const std::uint8_t byte = station ? station->poll() : 0;
    const bool ended = m_bus.command(std::array{bus::SerialPollDisable, bus::Untalk});
    return {ended ? Error::NoError : Error::IoError, byte};
}

std::optional<Vxi11Target::Error> Vxi11BusAddress::command(const wire::vxi11::DocmdCall &, std::vector<std::byte> &)
{
    return Error::NotSupported;
}

} // namespace simulator
