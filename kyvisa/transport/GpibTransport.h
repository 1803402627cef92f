#pragma once

#include "kyvisa/transport/GpibBus.h"
#include "kyvisa/transport/GpibController.h"
#include "kyvisa/transport/Vxi11Transport.h"

#include <optional>

namespace kyvisa
{

/**
 * An instrument on GPIB, or the interface itself, through a LAN/GPIB gateway (VXI-11.2).
 *
 * Data, status byte, trigger and clear are those of VXI-11: the gateway addresses the instrument. What concerns the whole
 * bus goes to the interface: an interface session has that link, an instrument session makes it on the same connection when
 * it is first needed.
 */
class GpibTransport : public Vxi11Transport, private GpibController
{
public:
    static ViStatus connect(const ResourceName &name, const os::WaitLimit &limit,
                            std::unique_ptr<Transport> &transport);

    GpibTransport(std::unique_ptr<Vxi11Core> core, const wire::vxi11::CreateLinkResult &link, const ResourceName &name);
    ~GpibTransport() override;

    ViStatus read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                  std::size_t &count) override;
    ViStatus write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                   std::size_t &count) override;
    ViStatus controlRemote(ViUInt16 mode, const os::WaitLimit &limit) override;
    ViStatus applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit) override;
    bool isLive(ViAttr attribute) const override;
    ViStatus readAttribute(ViAttr attribute, const os::WaitLimit &limit, ViUInt64 &value) override;
    GpibController *gpibController() override { return m_isInterface ? this : nullptr; }
    void close() override;

private:
    ViStatus controlAttention(ViUInt16 mode, const os::WaitLimit &limit) override;
    ViStatus clearInterface(const os::WaitLimit &limit) override;
    ViStatus sendCommands(std::span<const std::byte> commands, const os::WaitLimit &limit, std::size_t &count) override;
    ViStatus passControl(ViUInt16 primary, ViUInt16 secondary, const os::WaitLimit &limit) override;

    ViStatus reachBus(const os::WaitLimit &limit);
    ViStatus lockOut(const os::WaitLimit &limit);
    ViStatus readAddressing(const os::WaitLimit &limit, ViUInt64 &value);
    ViStatus afterTransfer(ViStatus status, const os::WaitLimit &limit);

    const bool m_isInterface;
    const std::string m_interfaceName; ///< that of the gateway, "gpib0"
    std::optional<GpibBus> m_bus;
    bool m_unaddress = false; ///< VI_ATTR_GPIB_UNADDR_EN
};

} // namespace kyvisa
