#pragma once

#include "kyvisa/include/visatype.h"
#include "wire/Docmd.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}
class Vxi11Core;

/**
 * The bus behind a LAN/GPIB gateway, as its interface link lets one control it (VXI-11.2, device_docmd).
 *
 * Gateways were seen that refuse every command: then each of these answers VI_ERROR_NSUP_OPER. One that cannot carry a
 * command out says "I/O error"; who is in charge of the bus is then asked, so that the status says why.
 */
class GpibBus
{
public:
    /// @param link to the interface itself, not to an instrument.
    GpibBus(Vxi11Core &core, wire::vxi11::LinkId link) : m_core(core), m_link(link) {}

    wire::vxi11::LinkId link() const { return m_link; }

    ViStatus ask(wire::vxi11::BusQuestion question, const os::WaitLimit &limit, std::uint16_t &answer);
    /// Bytes with ATN true, any number. @param count receives how many went out, also on errors.
    ViStatus sendCommands(std::span<const std::byte> commands, const os::WaitLimit &limit, std::size_t &count);
    ViStatus setAttention(bool on, const os::WaitLimit &limit);
    ViStatus setRemoteEnable(bool on, const os::WaitLimit &limit);
    ViStatus passControl(std::uint32_t address, const os::WaitLimit &limit);
    ViStatus setAddress(std::uint32_t address, const os::WaitLimit &limit);
    ViStatus clearInterface(const os::WaitLimit &limit);

private:
    ViStatus order(wire::vxi11::Command command, std::size_t elementSize, std::span<const std::byte> data,
                   const os::WaitLimit &limit);
    ViStatus perform(wire::vxi11::Command command, std::size_t elementSize, std::span<const std::byte> data,
                     const os::WaitLimit &limit, std::vector<std::byte> &answer);

    Vxi11Core &m_core;
    const wire::vxi11::LinkId m_link;
};

} // namespace kyvisa
