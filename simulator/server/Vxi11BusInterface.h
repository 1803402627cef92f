#pragma once

#include "simulator/bus/Bus.h"
#include "simulator/instrument/LockTable.h"
#include "simulator/server/Vxi11Target.h"

namespace simulator
{

/**
 * The bus itself as a device name of its gateway: device_docmd controls it, and the other calls address nobody. Data go to and come from whom
 * the client has addressed by SendCommand, and the interface has to be among them.
 */
class Vxi11BusInterface final : public Vxi11Target
{
public:
    /// @p refuseCommands: device_docmd is not supported, as with some gateways.
    Vxi11BusInterface(Bus &bus, Timers &timers, bool refuseCommands);

    LockTable &locks() override { return m_locks; }
    std::optional<Error> write(std::span<const std::byte> bytes, bool end) override;
    void beginRead() override { m_bus.beginRead(); }
    std::optional<Reading> read(std::size_t most, std::optional<std::uint8_t> termination) override;
    std::optional<Error> trigger() override;
    Error clear() override;
    Error remote() override;
    Error local() override;
    wire::vxi11::ReadStbResult poll() override { return {Error::NotSupported, 0}; }
    std::optional<Error> command(const wire::vxi11::DocmdCall &call, std::vector<std::byte> &answer) override;

private:
    using Answer = std::vector<std::byte>;

    std::optional<Error> sendCommand(const wire::vxi11::DocmdCall &call, Answer &answer);
    Error busStatus(const wire::vxi11::DocmdCall &call, Answer &answer) const;
    Error attention(const wire::vxi11::DocmdCall &call, Answer &answer);
    Error remoteEnable(const wire::vxi11::DocmdCall &call, Answer &answer);
    Error passControl(const wire::vxi11::DocmdCall &call, Answer &answer);
    Error busAddress(const wire::vxi11::DocmdCall &call, Answer &answer);
    Error interfaceClear(const wire::vxi11::DocmdCall &call);

    Bus &m_bus;
    LockTable m_locks;
    const bool m_refuseCommands;
};

} // namespace simulator
