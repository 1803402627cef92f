#pragma once

#include "simulator/server/Vxi11Device.h"
#include "simulator/server/Vxi11Target.h"

namespace simulator
{

/// The instrument under its device name inst0 (VXI-11.3). Whatever a client does to it addresses it.
class Vxi11Instrument final : public Vxi11Target
{
public:
    Vxi11Instrument(Instrument &instrument, Vxi11Device::Events events);

    LockTable &locks() override { return m_instrument.locks; }
    Vxi11Device *device() override { return &m_device; }
    std::optional<Error> write(std::span<const std::byte> bytes, bool end) override;
    void beginRead() override;
    std::optional<Reading> read(std::size_t most, std::optional<std::uint8_t> termination) override;
    std::optional<Error> trigger() override;
    Error clear() override;
    Error remote() override;
    Error local() override;
    wire::vxi11::ReadStbResult poll() override;
    /// Bus commands are for gateways: an instrument refuses all of them.
    std::optional<Error> command(const wire::vxi11::DocmdCall &, std::vector<std::byte> &) override
    {
        return Error::NotSupported;
    }

private:
    Instrument &m_instrument;
    Vxi11Device m_device;
};

} // namespace simulator
