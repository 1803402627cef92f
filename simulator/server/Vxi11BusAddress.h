#pragma once

#include "simulator/bus/Bus.h"
#include "simulator/instrument/LockTable.h"
#include "simulator/server/Vxi11Target.h"

namespace simulator
{

/**
 * An address of the bus as a device name of its gateway, whether a station is there or not. Each call addresses it by the commands that
 * IEEE 488.2 names for that, and so does each attempt of a call that has to wait: the bus is free in between.
 *
 * Nobody there: nothing can be written or read, which is a time-out in the end; a serial poll answers 0.
 */
class Vxi11BusAddress final : public Vxi11Target
{
public:
    Vxi11BusAddress(Bus &bus, BusAddress address, Timers &timers);

    LockTable &locks() override;
    Vxi11Device *device() override;
    std::optional<Error> write(std::span<const std::byte> bytes, bool end) override;
    void beginRead() override;
    std::optional<Reading> read(std::size_t most, std::optional<std::uint8_t> termination) override;
    std::optional<Error> trigger() override;
    Error clear() override;
    Error remote() override;
    Error local() override;
    wire::vxi11::ReadStbResult poll() override;
    /// Bus commands are for the interface.
    std::optional<Error> command(const wire::vxi11::DocmdCall &, std::vector<std::byte> &) override;

private:
    BusStation *station() const;
    /// Commands from the interface as talker to this listener, then @p command if there is one.
    bool tell(std::optional<std::uint8_t> command = std::nullopt);
    /// Makes it the talker for the interface, after @p command if there is one.
    bool ask(std::optional<std::uint8_t> command = std::nullopt);

    Bus &m_bus;
    const BusAddress m_address;
    LockTable m_locks; ///< while there is no station
};

} // namespace simulator
