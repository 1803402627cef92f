#pragma once

#include "kyvisa/core/ResourceName.h"
#include "kyvisa/transport/Transport.h"
#include "kyvisa/transport/Vxi11Core.h"

#include <memory>

namespace kyvisa
{

class AttributeStore;
class Vxi11Interrupt;

/**
 * VXI-11: one core connection and one link on it for each session.
 *
 * Times and flags for locks are sent only while the user waits for a lock: instruments were seen that reject every call that
 * carries them. An answer that comes after its call was given up is recognised and dropped, so a read never returns what was
 * meant for the one before.
 *
 * The link is destroyed on every way out: instruments have few of them, and some keep them until their power is cut.
 */
class Vxi11Transport : public Transport
{
public:
    static ViStatus connect(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                            std::unique_ptr<Transport> &transport);

    Vxi11Transport(std::unique_ptr<Vxi11Core> core, const wire::vxi11::CreateLinkResult &link);
    ~Vxi11Transport() override;

    ViStatus read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                  std::size_t &count) override;
    ViStatus write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                   std::size_t &count) override;
    ViStatus readStatusByte(const TransferMode &mode, const os::WaitLimit &limit, ViUInt16 &status) override;
    ViStatus trigger(const TransferMode &mode, const os::WaitLimit &limit) override;
    ViStatus clear(const os::WaitLimit &limit) override;
    ViStatus controlRemote(ViUInt16 mode, const os::WaitLimit &limit) override;
    ViStatus applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit) override;
    DeviceLocks deviceLocks() const override { return DeviceLocks::Exclusive; }
    ViStatus lockDevice(const std::string &key, std::chrono::milliseconds patience,
                        const os::WaitLimit &limit) override;
    ViStatus unlockDevice(const os::WaitLimit &limit) override;
    ViStatus watchServiceRequests(std::function<void()> notify, const os::WaitLimit &limit) override;
    void close() override;
    void abandon() override;

protected:
    /// Finds the core program of @p host and makes a link to @p device there.
    static ViStatus connectLink(const std::string &host, const std::string &device, const os::WaitLimit &limit,
                                std::unique_ptr<Vxi11Core> &core, wire::vxi11::CreateLinkResult &link);

    Vxi11Core &core() { return *m_core; }
    wire::vxi11::LinkId link() const { return m_link; }

private:
    ViStatus generic(wire::vxi11::Procedure procedure, const os::WaitLimit &limit);

    const std::unique_ptr<Vxi11Core> m_core;
    const wire::vxi11::LinkId m_link;
    const std::size_t m_largestWrite;
    bool m_holdsLock = false;                    ///< in the instrument
    std::unique_ptr<Vxi11Interrupt> m_interrupt; ///< once somebody wants to know of service requests
};

} // namespace kyvisa
