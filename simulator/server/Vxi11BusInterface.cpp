#include "simulator/server/Vxi11BusInterface.h"

#include "simulator/bus/InterfaceMessages.h"
#include "wire/Docmd.h"

#include <algorithm>
#include <array>

namespace simulator
{

using namespace wire;
using vxi11::Command;
using vxi11::DocmdCall;

Vxi11BusInterface::Vxi11BusInterface(Bus &bus, Timers &timers, bool refuseCommands)
    : m_bus(bus), m_locks(timers), m_refuseCommands(refuseCommands)
{
}

std::optional<Vxi11Target::Error> Vxi11BusInterface::write(std::span<const std::byte> bytes, bool end)
{
    switch (m_bus.write(bytes, end)) {
    case Bus::Transfer::Done:
        return Error::NoError;
    case Bus::Transfer::NotAddressed:
        return Error::IoError;
    case Bus::Transfer::Later:
        break;
    }
    return std::nullopt;
}

std::optional<Vxi11Target::Reading> Vxi11BusInterface::read(std::size_t most, std::optional<std::uint8_t> termination)
{
    Reading reading;
    switch (m_bus.read(most, termination, reading.piece)) {
    case Bus::Transfer::Done:
        return reading;
    case Bus::Transfer::NotAddressed:
        return Reading{Error::IoError, {}};
    case Bus::Transfer::Later:
        break;
    }
    return std::nullopt;
}

std::optional<Vxi11Target::Error> Vxi11BusInterface::trigger()
{
    if (!m_bus.listenersHaveRoom())
        return std::nullopt;
    return m_bus.command(std::array{bus::GroupExecuteTrigger}) ? Error::NoError : Error::IoError;
}

Vxi11Target::Error Vxi11BusInterface::clear()
{
    return m_bus.command(std::array{bus::DeviceClear}) ? Error::NoError : Error::IoError;
}

Vxi11Target::Error Vxi11BusInterface::remote()
{
    m_bus.setRemoteEnable(true);
    return Error::NoError;
}

Vxi11Target::Error Vxi11BusInterface::local()
{
    m_bus.setRemoteEnable(false);
    return Error::NoError;
}

std::optional<Vxi11Target::Error> Vxi11BusInterface::command(const DocmdCall &call, Answer &answer)
{
    if (m_refuseCommands)
        return Error::NotSupported;
    switch (static_cast<Command>(call.command)) {
    case Command::SendCommand:
        return sendCommand(call, answer);
    case Command::BusStatus:
        return busStatus(call, answer);
    case Command::AtnControl:
        return attention(call, answer);
    case Command::RenControl:
        return remoteEnable(call, answer);
    case Command::PassControl:
        return passControl(call, answer);
    case Command::BusAddress:
        return busAddress(call, answer);
    case Command::IfcControl:
        return interfaceClear(call);
    }
    return Error::NotSupported;
}

std::optional<Vxi11Target::Error> Vxi11BusInterface::sendCommand(const DocmdCall &call, Answer &answer)
{
    xdr::Bytes bytes;
    if (!vxi11::takeBytes(call, bytes))
        return Error::Parameter;
    std::vector<std::uint8_t> messages(bytes.size());
    std::transform(bytes.begin(), bytes.end(), messages.begin(),
                   [](std::byte byte) { return std::to_integer<std::uint8_t>(byte); });
    if (!m_bus.command(messages))
        return Error::IoError;
    answer.assign(bytes.begin(), bytes.end());
    return Error::NoError;
}

Vxi11Target::Error Vxi11BusInterface::busStatus(const DocmdCall &call, Answer &answer) const
{
    std::uint16_t number = 0;
    if (!vxi11::takeNumber(call, number))
        return Error::Parameter;
    unsigned value = 0;
    switch (static_cast<vxi11::BusQuestion>(number)) {
    case vxi11::BusQuestion::RemoteEnable:
        value = m_bus.remoteEnable();
        break;
    case vxi11::BusQuestion::ServiceRequest:
        value = m_bus.serviceRequested();
        break;
    case vxi11::BusQuestion::NotDataAccepted:
        value = m_bus.notDataAccepted();
        break;
    case vxi11::BusQuestion::SystemController:
        value = 1;
        break;
    case vxi11::BusQuestion::ControllerInCharge:
        value = m_bus.inCharge();
        break;
    case vxi11::BusQuestion::Talker:
        value = m_bus.addressedToTalk();
        break;
    case vxi11::BusQuestion::Listener:
        value = m_bus.addressedToListen();
        break;
    case vxi11::BusQuestion::Address:
        value = m_bus.address();
        break;
    default:
        return Error::Parameter;
    }
    vxi11::appendNumber(answer, static_cast<std::uint16_t>(value), call.networkOrder);
    return Error::NoError;
}

Vxi11Target::Error Vxi11BusInterface::attention(const DocmdCall &call, Answer &answer)
{
    std::uint16_t on = 0;
    if (!vxi11::takeNumber(call, on))
        return Error::Parameter;
    if (!m_bus.setAttention(on != 0))
        return Error::IoError;
    answer.assign(call.data.begin(), call.data.end());
    return Error::NoError;
}

Vxi11Target::Error Vxi11BusInterface::remoteEnable(const DocmdCall &call, Answer &answer)
{
    std::uint16_t on = 0;
    if (!vxi11::takeNumber(call, on))
        return Error::Parameter;
    m_bus.setRemoteEnable(on != 0);
    answer.assign(call.data.begin(), call.data.end());
    return Error::NoError;
}

Vxi11Target::Error Vxi11BusInterface::passControl(const DocmdCall &call, Answer &answer)
{
    std::uint32_t address = 0;
    if (!vxi11::takeNumber(call, address) || address > vxi11::MaxBusAddress)
        return Error::Parameter;
    if (!m_bus.passControl(static_cast<std::uint8_t>(address)))
        return Error::IoError;
    answer.assign(call.data.begin(), call.data.end());
    return Error::NoError;
}

Vxi11Target::Error Vxi11BusInterface::busAddress(const DocmdCall &call, Answer &answer)
{
    std::uint32_t address = 0;
    if (!vxi11::takeNumber(call, address) || address > vxi11::MaxBusAddress)
        return Error::Parameter;
    m_bus.setAddress(static_cast<std::uint8_t>(address));
    answer.assign(call.data.begin(), call.data.end());
    return Error::NoError;
}

Vxi11Target::Error Vxi11BusInterface::interfaceClear(const DocmdCall &call)
{
    if (!call.data.empty())
        return Error::Parameter;
    m_bus.interfaceClear();
    return Error::NoError;
}

} // namespace simulator
