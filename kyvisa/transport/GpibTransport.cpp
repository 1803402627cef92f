#include "kyvisa/transport/GpibTransport.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/transport/PortLookup.h"

#include <array>

namespace kyvisa
{

using namespace wire::vxi11;

namespace
{

// IEEE 488.1 interface messages.
constexpr std::byte TakeControl{0x09};
constexpr std::byte LocalLockout{0x11};
constexpr std::byte Unlisten{0x3F};
constexpr std::byte TalkAddresses{0x40};
constexpr std::byte Untalk{0x5F};
constexpr std::byte SecondaryAddresses{0x60};

std::string deviceName(const ResourceName &name)
{
    std::string device = name.gatewayInterface;
    if (name.resourceClass == ResourceName::Class::Instr) {
        device += "," + std::to_string(name.primaryAddress);
        if (name.secondaryAddress != VI_NO_SEC_ADDR)
            device += "," + std::to_string(name.secondaryAddress);
    }
    return device;
}

} // namespace

ViStatus GpibTransport::connect(const ResourceName &name, const os::WaitLimit &limit,
                                std::unique_ptr<Transport> &transport)
{
    std::unique_ptr<Vxi11Core> core;
    CreateLinkResult link;
    if (const ViStatus status = connectLink(name.gatewayHost, deviceName(name), limit, core, link); status < VI_SUCCESS)
        return status;
    transport = std::make_unique<GpibTransport>(std::move(core), link, name);
    return VI_SUCCESS;
}

GpibTransport::GpibTransport(std::unique_ptr<Vxi11Core> core, const CreateLinkResult &link, const ResourceName &name)
    : Vxi11Transport(std::move(core), link), m_isInterface(name.resourceClass == ResourceName::Class::Intfc),
      m_interfaceName(name.gatewayInterface)
{
    if (m_isInterface)
        m_bus.emplace(this->core(), this->link());
}

GpibTransport::~GpibTransport()
{
    GpibTransport::close();
}

/// Makes sure that there is a link to the interface.
ViStatus GpibTransport::reachBus(const os::WaitLimit &limit)
{
    if (!core().isOpen())
        return VI_ERROR_CONN_LOST;
    if (m_bus)
        return VI_SUCCESS;
    CreateLinkResult result;
    if (const ViStatus status = core().createLink(m_interfaceName, limit, result); status < VI_SUCCESS)
        return status == VI_ERROR_TMO || status == VI_ERROR_CONN_LOST ? status : VI_ERROR_NSUP_OPER;
    m_bus.emplace(core(), result.link);
    return VI_SUCCESS;
}

ViStatus GpibTransport::afterTransfer(ViStatus status, const os::WaitLimit &limit)
{
    if (status < VI_SUCCESS || !m_unaddress)
        return status;
    std::size_t count = 0;
    const ViStatus sent = m_bus->sendCommands(std::array{Unlisten, Untalk}, limit, count);
    return sent < VI_SUCCESS ? sent : status;
}

ViStatus GpibTransport::read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                             std::size_t &count)
{
    return afterTransfer(Vxi11Transport::read(buffer, mode, limit, count), limit);
}

ViStatus GpibTransport::write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                              std::size_t &count)
{
    return afterTransfer(Vxi11Transport::write(data, mode, limit, count), limit);
}

ViStatus GpibTransport::lockOut(const os::WaitLimit &limit)
{
    std::size_t count = 0;
    return m_bus->sendCommands(std::array{LocalLockout}, limit, count);
}

ViStatus GpibTransport::controlRemote(ViUInt16 mode, const os::WaitLimit &limit)
{
    const bool addressed = mode == VI_GPIB_REN_DEASSERT_GTL || mode == VI_GPIB_REN_ASSERT_ADDRESS ||
                           mode == VI_GPIB_REN_ASSERT_ADDRESS_LLO || mode == VI_GPIB_REN_ADDRESS_GTL;
    if (m_isInterface && addressed)
        return VI_ERROR_INV_MODE; // there is nobody to address
    if (addressed) {
        const ViStatus status = Vxi11Transport::controlRemote(mode, limit);
        if (status < VI_SUCCESS || mode == VI_GPIB_REN_ASSERT_ADDRESS || mode == VI_GPIB_REN_ADDRESS_GTL)
            return status;
    }
    if (const ViStatus status = reachBus(limit); status < VI_SUCCESS)
        return status;
    switch (mode) {
    case VI_GPIB_REN_ASSERT_ADDRESS_LLO:
        return lockOut(limit);
    case VI_GPIB_REN_ASSERT_LLO: {
        const ViStatus status = m_bus->setRemoteEnable(true, limit);
        return status < VI_SUCCESS ? status : lockOut(limit);
    }
    default:
        return m_bus->setRemoteEnable(mode == VI_GPIB_REN_ASSERT, limit);
    }
}

ViStatus GpibTransport::controlAttention(ViUInt16 mode, const os::WaitLimit &limit)
{
    // The gateway knows on and off; how ATN is taken and left is its own business.
    if (mode != VI_GPIB_ATN_ASSERT && mode != VI_GPIB_ATN_DEASSERT)
        return VI_ERROR_NSUP_MODE;
    return m_bus->setAttention(mode == VI_GPIB_ATN_ASSERT, limit);
}

ViStatus GpibTransport::clearInterface(const os::WaitLimit &limit)
{
    return m_bus->clearInterface(limit);
}

ViStatus GpibTransport::sendCommands(std::span<const std::byte> commands, const os::WaitLimit &limit,
                                     std::size_t &count)
{
    return m_bus->sendCommands(commands, limit, count);
}

ViStatus GpibTransport::passControl(ViUInt16 primary, ViUInt16 secondary, const os::WaitLimit &limit)
{
    if (secondary == VI_NO_SEC_ADDR)
        return m_bus->passControl(primary, limit);
    // The gateway's own command has no room for a secondary address.
    const std::array commands = {TalkAddresses | std::byte(primary), SecondaryAddresses | std::byte(secondary),
                                 TakeControl};
    std::size_t count = 0;
    return m_bus->sendCommands(commands, limit, count);
}

ViStatus GpibTransport::applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit)
{
    switch (attribute) {
    case VI_ATTR_GPIB_UNADDR_EN: {
        if (value != 0) {
            // A gateway that takes no commands can be found out now instead of in the middle of a transfer.
            std::uint16_t inCharge = 0;
            ViStatus status = reachBus(limit);
            if (status == VI_SUCCESS)
                status = m_bus->ask(BusQuestion::ControllerInCharge, limit, inCharge);
            if (status < VI_SUCCESS)
                return status == VI_ERROR_NSUP_OPER ? VI_ERROR_NSUP_ATTR_STATE : status;
        }
        m_unaddress = value != 0;
        return VI_SUCCESS;
    }
    case VI_ATTR_GPIB_PRIMARY_ADDR: {
        const ViStatus status = m_bus->setAddress(static_cast<std::uint32_t>(value), limit);
        return status == VI_ERROR_NSUP_OPER || status == VI_ERROR_INV_SETUP ? VI_ERROR_NSUP_ATTR_STATE : status;
    }
    default:
        return VI_SUCCESS;
    }
}

ViStatus GpibTransport::readAddressing(const os::WaitLimit &limit, ViUInt64 &value)
{
    std::uint16_t talker = 0;
    std::uint16_t listener = 0;
    ViStatus status = m_bus->ask(BusQuestion::Talker, limit, talker);
    if (status == VI_SUCCESS)
        status = m_bus->ask(BusQuestion::Listener, limit, listener);
    value = talker != 0 ? VI_GPIB_TALKER : listener != 0 ? VI_GPIB_LISTENER : VI_GPIB_UNADDRESSED;
    return status;
}

bool GpibTransport::isLive(ViAttr attribute) const
{
    switch (attribute) {
    case VI_ATTR_GPIB_REN_STATE:
        return true;
    case VI_ATTR_GPIB_SRQ_STATE:
    case VI_ATTR_GPIB_NDAC_STATE:
    case VI_ATTR_GPIB_SYS_CNTRL_STATE:
    case VI_ATTR_GPIB_CIC_STATE:
    case VI_ATTR_GPIB_ADDR_STATE:
    case VI_ATTR_GPIB_PRIMARY_ADDR: // of an instrument it is part of the name
        return m_isInterface;
    default:
        return false;
    }
}

ViStatus GpibTransport::readAttribute(ViAttr attribute, const os::WaitLimit &limit, ViUInt64 &value)
{
    BusQuestion question;
    bool mayBeUnknown = false;
    switch (attribute) {
    case VI_ATTR_GPIB_REN_STATE:
        question = BusQuestion::RemoteEnable;
        mayBeUnknown = true;
        break;
    case VI_ATTR_GPIB_SRQ_STATE:
        question = BusQuestion::ServiceRequest;
        mayBeUnknown = true;
        break;
    case VI_ATTR_GPIB_NDAC_STATE:
        question = BusQuestion::NotDataAccepted;
        mayBeUnknown = true;
        break;
    case VI_ATTR_GPIB_SYS_CNTRL_STATE:
        question = BusQuestion::SystemController;
        break;
    case VI_ATTR_GPIB_CIC_STATE:
        question = BusQuestion::ControllerInCharge;
        break;
    case VI_ATTR_GPIB_PRIMARY_ADDR:
        question = BusQuestion::Address;
        break;
    case VI_ATTR_GPIB_ADDR_STATE:
        question = BusQuestion::Talker;
        break;
    default:
        return VI_ERROR_NSUP_ATTR;
    }
    std::uint16_t answer = 0;
    ViStatus status = reachBus(limit);
    if (status == VI_SUCCESS)
        status =
            attribute == VI_ATTR_GPIB_ADDR_STATE ? readAddressing(limit, value) : m_bus->ask(question, limit, answer);
    if (status == VI_ERROR_NSUP_OPER) { // a gateway that takes no commands: nobody knows
        value = static_cast<ViUInt64>(VI_STATE_UNKNOWN);
        return mayBeUnknown ? VI_SUCCESS : VI_ERROR_NSUP_ATTR;
    }
    if (attribute != VI_ATTR_GPIB_ADDR_STATE)
        value = attribute == VI_ATTR_GPIB_PRIMARY_ADDR ? answer : (answer != 0 ? 1 : 0);
    return status;
}

void GpibTransport::close()
{
    if (m_bus && !m_isInterface)
        core().destroyLink(m_bus->link());
    m_bus.reset();
    Vxi11Transport::close();
}

} // namespace kyvisa
