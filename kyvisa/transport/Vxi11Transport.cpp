#include "kyvisa/transport/Vxi11Transport.h"

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/transport/PortLookup.h"
#include "kyvisa/transport/Vxi11Interrupt.h"

#include <algorithm>
#include <utility>

namespace kyvisa
{

using namespace wire::vxi11;

namespace
{

/// Of one call, in both directions. Larger ones gain nothing, and instruments were seen that fail at sizes near 2^31.
constexpr std::size_t LargestPiece = 1024 * 1024;

/// Instruments announce 0 or nonsense as well. What the standard grants every client is always safe.
std::size_t largestWrite(std::uint32_t announced)
{
    return std::clamp<std::size_t>(announced, MinMaxRecvSize, LargestPiece);
}

/// While opening, a connection that breaks off is a resource that is not there.
ViStatus whileOpening(ViStatus status)
{
    return status == VI_ERROR_CONN_LOST || status == VI_ERROR_IO || status == VI_ERROR_NSUP_OPER ? VI_ERROR_RSRC_NFOUND
                                                                                                 : status;
}

} // namespace

ViStatus Vxi11Transport::connectLink(const std::string &host, const std::string &device, const os::WaitLimit &limit,
                                     std::unique_ptr<Vxi11Core> &core, CreateLinkResult &link)
{
    ProgramAddress address;
    if (const ViStatus status = lookUpCorePort(host, limit, address); status < VI_SUCCESS)
        return status;
    os::StreamSocket socket;
    if (const ViStatus status = Vxi11Core::connect(address, limit, socket); status < VI_SUCCESS)
        return status;
    core = std::make_unique<Vxi11Core>(std::move(socket), address.host);
    return whileOpening(core->createLink(device, limit, link));
}

ViStatus Vxi11Transport::connect(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                                 std::unique_ptr<Transport> &transport)
{
    std::unique_ptr<Vxi11Core> core;
    CreateLinkResult link;
    if (const ViStatus status = connectLink(name.host, name.deviceName, limit, core, link); status < VI_SUCCESS)
        return status;
    attributes.setText(VI_ATTR_TCPIP_ADDR, core->host());
    attributes.setNumber(VI_ATTR_TCPIP_KEEPALIVE, VI_TRUE);
    transport = std::make_unique<Vxi11Transport>(std::move(core), link);
    return VI_SUCCESS;
}

Vxi11Transport::Vxi11Transport(std::unique_ptr<Vxi11Core> core, const CreateLinkResult &link)
    : m_core(std::move(core)), m_link(link.link), m_largestWrite(largestWrite(link.maxRecvSize))
{
}

Vxi11Transport::~Vxi11Transport()
{
    close();
}

ViStatus Vxi11Transport::read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                              std::size_t &count)
{
    if (!m_core->isOpen())
        return VI_ERROR_CONN_LOST;
    for (;;) {
        const auto room = buffer.subspan(count, std::min(buffer.size() - count, LargestPiece));
        ReadCall call;
        call.link = m_link;
        call.requestSize = static_cast<std::uint32_t>(room.size());
        call.ioTimeout = Vxi11Core::deviceTime(limit);
        call.flags = mode.termCharEnabled ? FlagTermCharSet : 0;
        call.termChar = mode.termCharEnabled ? mode.termChar : std::uint8_t{0};
        std::size_t got = 0;
        std::uint32_t reason = 0;
        const ViStatus status = m_core->read(call, room, limit, got, reason);
        count += got;
        if (status < VI_SUCCESS)
            return status;
        if ((reason & ReasonEnd) != 0 && !mode.suppressEnd)
            return VI_SUCCESS;
        const bool atTermChar = got > 0 && static_cast<std::uint8_t>(buffer[count - 1]) == mode.termChar;
        if (mode.termCharEnabled && (atTermChar || (reason & ReasonCharacter) != 0))
            return VI_SUCCESS_TERM_CHAR;
        if (count == buffer.size())
            return VI_SUCCESS_MAX_CNT;
        if (limit.deadline.expired())
            return VI_ERROR_TMO;
    }
}

ViStatus Vxi11Transport::write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                               std::size_t &count)
{
    if (!m_core->isOpen())
        return VI_ERROR_CONN_LOST;
    for (;;) {
        const auto piece = data.subspan(count, std::min(data.size() - count, m_largestWrite));
        const bool last = count + piece.size() == data.size();
        WriteCall call;
        call.link = m_link;
        call.ioTimeout = Vxi11Core::deviceTime(limit);
        call.flags = last && mode.sendEnd ? FlagEnd : 0;
        call.data = piece;
        std::size_t taken = 0;
        const ViStatus status = m_core->write(call, limit, taken);
        count += taken;
        if (status < VI_SUCCESS)
            return status;
        if (count == data.size())
            return VI_SUCCESS;
        if (taken == 0)
            return VI_ERROR_IO; // it would go on like this
        if (limit.deadline.expired())
            return VI_ERROR_TMO;
    }
}

ViStatus Vxi11Transport::readStatusByte(const TransferMode &, const os::WaitLimit &limit, ViUInt16 &status)
{
    if (!m_core->isOpen())
        return VI_ERROR_CONN_LOST;
    return m_core->readStatusByte({m_link, 0, 0, Vxi11Core::deviceTime(limit)}, limit, status);
}

ViStatus Vxi11Transport::generic(Procedure procedure, const os::WaitLimit &limit)
{
    if (!m_core->isOpen())
        return VI_ERROR_CONN_LOST;
    const GenericCall call{m_link, 0, 0, Vxi11Core::deviceTime(limit)};
    return m_core->call(procedure, call, Vxi11Core::patience(limit));
}

ViStatus Vxi11Transport::trigger(const TransferMode &, const os::WaitLimit &limit)
{
    return generic(Procedure::DeviceTrigger, limit);
}

ViStatus Vxi11Transport::clear(const os::WaitLimit &limit)
{
    return generic(Procedure::DeviceClear, limit);
}

ViStatus Vxi11Transport::controlRemote(ViUInt16 mode, const os::WaitLimit &limit)
{
    switch (mode) {
    case VI_GPIB_REN_DEASSERT_GTL:
    case VI_GPIB_REN_ADDRESS_GTL:
        return generic(Procedure::DeviceLocal, limit);
    case VI_GPIB_REN_ASSERT_ADDRESS:
    case VI_GPIB_REN_ASSERT_ADDRESS_LLO:
        return generic(Procedure::DeviceRemote, limit);
    default: // the line alone: the protocol has no call for it
        return VI_ERROR_NSUP_OPER;
    }
}

ViStatus Vxi11Transport::applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &)
{
    if (!m_core->isOpen())
        return VI_ERROR_CONN_LOST;
    const bool on = value != 0;
    os::StreamSocket &socket = m_core->socket();
    const bool applied = attribute == VI_ATTR_TCPIP_NODELAY ? socket.setNoDelay(on) : socket.setKeepAlive(on);
    return applied ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
}

ViStatus Vxi11Transport::lockDevice(const std::string &, std::chrono::milliseconds patience, const os::WaitLimit &limit)
{
    if (!m_core->isOpen())
        return VI_ERROR_CONN_LOST;
    const auto wait = static_cast<std::uint32_t>(std::clamp<std::int64_t>(patience.count(), 0, INT32_MAX));
    const LockCall call{m_link, wait > 0 ? FlagWaitLock : 0, wait};
    const ViStatus status = m_core->call(Procedure::DeviceLock, call, limit);
    if (status == VI_ERROR_NSUP_OPER) // then the lock of this machine is all there is
        return VI_SUCCESS;
    // Nobody waits for this lock any more. The instrument executes in order: if it grants it all the same, it takes it back.
    if (status == VI_ERROR_TMO || status == VI_ERROR_ABORT || status == VI_ERROR_INV_OBJECT)
        m_core->giveBackLock(m_link);
    m_holdsLock = status == VI_SUCCESS;
    return status;
}

ViStatus Vxi11Transport::unlockDevice(const os::WaitLimit &limit)
{
    if (!m_core->isOpen())
        return VI_ERROR_CONN_LOST;
    if (!std::exchange(m_holdsLock, false))
        return VI_SUCCESS;
    return m_core->call(Procedure::DeviceUnlock, Link{m_link}, limit);
}

ViStatus Vxi11Transport::watchServiceRequests(std::function<void()> notify, const os::WaitLimit &limit)
{
    if (!m_core->isOpen())
        return VI_ERROR_CONN_LOST;
    if (m_interrupt) {
        m_interrupt->setNotify(std::move(notify));
        return VI_SUCCESS;
    }
    // The call names the address to connect to in 32 bits: over IPv6 there are no service requests.
    const std::uint32_t address = m_core->socket().localIpv4Address();
    if (address == 0)
        return VI_ERROR_INV_EVENT;
    auto interrupt = std::make_unique<Vxi11Interrupt>();
    interrupt->setNotify(std::move(notify));
    if (!interrupt->start(address))
        return VI_ERROR_ALLOC;
    ViStatus status = m_core->createInterruptChannel(interrupt->where(), limit);
    if (status == VI_SUCCESS)
        status = m_core->call(Procedure::DeviceEnableSrq, EnableSrqCall{m_link, true, interrupt->handle()}, limit);
    if (status == VI_ERROR_NSUP_OPER)
        return VI_ERROR_INV_EVENT;
    if (status >= VI_SUCCESS)
        m_interrupt = std::move(interrupt);
    return status;
}

void Vxi11Transport::close()
{
    m_core->destroyLink(m_link);
    m_core->close();
    m_interrupt.reset();
}

void Vxi11Transport::abandon()
{
    if (m_interrupt)
        m_interrupt->abandon();
    m_core->close();
}

} // namespace kyvisa
