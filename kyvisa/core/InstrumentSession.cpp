#include "kyvisa/core/InstrumentSession.h"

#include "kyvisa/core/EventContext.h"
#include "kyvisa/core/Library.h"
#include "kyvisa/core/ResourceDescription.h"
#include "kyvisa/core/ResourceLocks.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/WaitLimit.h"
#include "kyvisa/transport/GpibController.h"
#include "kyvisa/transport/Transport.h"
#include "kyvisa/transport/TransportFactory.h"

#include <array>
#include <cstring>

namespace kyvisa
{
namespace
{

constexpr std::size_t MaxAccessKey = 256;

constexpr std::array<ViEventType, 3> InstrumentEvents = {VI_EVENT_IO_COMPLETION, VI_EVENT_EXCEPTION,
                                                         VI_EVENT_SERVICE_REQ};

/// A raw socket and a serial port have no way to ask for service.
std::span<const ViEventType> possibleEvents(std::uint16_t sessionKind)
{
    return std::span(InstrumentEvents).first((sessionKind & (kind::Socket | kind::Serial)) != 0 ? 2 : 3);
}

EventHub::Contexts contextsIn(Library &library, ViSession resourceManager)
{
    return {[&library, resourceManager](const Event &event) {
                return library.handles.insert(std::make_shared<EventContext>(event), resourceManager);
            },
            [&library](ViEvent context) { library.handles.remove(context); }};
}

} // namespace

InstrumentSession::InstrumentSession(Library &library, const ResourceName &name, std::uint16_t sessionKind,
                                     ViSession resourceManager)
    : m_name(name), m_attributes(sessionKind),
      m_locks(library.locks.locksOf(lockName(name)), m_interruptions,
              [this](os::Deadline enterBy, const SessionLocks::DeviceCall &call) {
                  return inTurn(enterBy, CallWatch(m_interruptions),
                                [&](const os::WaitLimit &limit) { return call(*m_transport, limit.wakeup); });
              }),
      m_events(std::make_shared<EventHub>(possibleEvents(sessionKind), contextsIn(library, resourceManager))),
      m_jobs(
          m_gate, m_wakeup,
          [this](const AsyncTransfers::Job &job, const std::atomic<bool> &cancelled, std::size_t &count) {
              return carryOut(job, cancelled, count);
          },
          [this](const Event &event) { m_events->post(event); })
{
    describeResource(name, m_attributes);
    m_attributes.setNumber(VI_ATTR_RM_SESSION, resourceManager);
}

InstrumentSession::~InstrumentSession() = default;

ViStatus InstrumentSession::open(ViSession handle, ViAccessMode accessMode, ViUInt32 timeout, os::Deadline connectBy)
{
    if (!m_wakeup.valid())
        return VI_ERROR_ALLOC;
    m_events->setSession(handle);
    const auto deadline = os::Deadline::afterVisaTimeout(timeout == VI_TMO_IMMEDIATE ? DefaultOpenTimeout : timeout);
    {
        if (m_gate.enter(deadline) != IoGate::Entered::Yes)
            return VI_ERROR_INV_OBJECT;
        const GateTurn turn(m_gate);
        const ViStatus status =
            openTransport(m_name, {deadline.orEarlier(connectBy), m_wakeup}, m_attributes, m_transport);
        if (status < VI_SUCCESS)
            return status;
        m_locks.setDevice(m_transport->deviceLocks());
        m_opened.store(true);
    }
    if ((accessMode & VI_EXCLUSIVE_LOCK) != 0) {
        std::string key;
        const ViUInt32 left = timeout == VI_TMO_IMMEDIATE ? timeout : deadline.visaTimeoutLeft();
        const ViStatus locked = m_locks.lock(VI_EXCLUSIVE_LOCK, left, {}, key);
        // The caller asked for a resource and a lock at once: the lock, not the connection, is what was not to be had.
        if (locked == VI_ERROR_TMO)
            return VI_ERROR_RSRC_LOCKED;
        if (locked < VI_SUCCESS)
            return locked;
    }
    return (accessMode & VI_LOAD_CONFIG) != 0 ? VI_WARN_CONFIG_NLOADED : VI_SUCCESS;
}

ViStatus InstrumentSession::mayTransfer()
{
    if (inherited())
        return VI_ERROR_CONN_LOST;
    if (!m_opened.load())
        return VI_ERROR_INV_OBJECT;
    return m_locks.shutOut() ? VI_ERROR_RSRC_LOCKED : VI_SUCCESS;
}

/// What came of waiting for the turn. With VI_SUCCESS it is the caller's, and the wake-up is armed.
ViStatus InstrumentSession::entered(IoGate::Entered entered, const CallWatch &watch)
{
    switch (entered) {
    case IoGate::Entered::TimedOut:
        return VI_ERROR_TMO;
    case IoGate::Entered::Closed:
        return VI_ERROR_INV_OBJECT;
    case IoGate::Entered::Cancelled:
        return VI_ERROR_ABORT;
    case IoGate::Entered::Yes:
        break;
    }
    // A viTerminate that comes from here on finds the wake-up armed; one that came while this call waited is in the watch.
    m_wakeup.rearm();
    if (watch.interrupted()) {
        m_gate.leave();
        return watch.status();
    }
    return VI_SUCCESS;
}

os::Deadline InstrumentSession::operationDeadline() const
{
    return os::Deadline::afterVisaTimeout(static_cast<ViUInt32>(m_attributes.number(VI_ATTR_TMO_VALUE)));
}

template <typename Operation>
ViStatus InstrumentSession::perform(os::Deadline deadline, const Operation &operation)
{
    const CallWatch watch(m_interruptions);
    if (const ViStatus status = mayTransfer(); status != VI_SUCCESS)
        return status;
    bool waited = false;
    if (const ViStatus status = entered(m_gate.enter(deadline, &waited), watch); status != VI_SUCCESS)
        return status;
    const GateTurn turn(m_gate);
    // Another session may have got its lock meanwhile.
    if (const ViStatus status = waited ? mayTransfer() : VI_SUCCESS; status != VI_SUCCESS)
        return status;
    return operation(os::WaitLimit{deadline, m_wakeup});
}

template <typename Operation>
ViStatus InstrumentSession::inTurn(os::Deadline deadline, const CallWatch &watch, const Operation &operation)
{
    if (const ViStatus status = entered(m_gate.enter(deadline), watch); status != VI_SUCCESS)
        return status;
    const GateTurn turn(m_gate);
    return operation({deadline, m_wakeup});
}

TransferMode InstrumentSession::transferMode() const
{
    TransferMode mode;
    mode.termCharEnabled = m_attributes.number(VI_ATTR_TERMCHAR_EN) != 0;
    mode.termChar = static_cast<ViUInt8>(m_attributes.number(VI_ATTR_TERMCHAR));
    mode.suppressEnd = m_attributes.number(VI_ATTR_SUPPRESS_END_EN) != 0;
    mode.sendEnd = m_attributes.number(VI_ATTR_SEND_END_EN) != 0;
    mode.protocol = static_cast<ViUInt16>(m_attributes.number(VI_ATTR_IO_PROT));
    return mode;
}

ViStatus InstrumentSession::read(std::span<std::byte> buffer, std::size_t &count)
{
    return read(buffer, count, operationDeadline());
}

ViStatus InstrumentSession::read(std::span<std::byte> buffer, std::size_t &count, os::Deadline deadline)
{
    count = 0;
    if (buffer.empty())
        return VI_SUCCESS_MAX_CNT;
    return perform(deadline,
                   [&](const os::WaitLimit &limit) { return m_transport->read(buffer, transferMode(), limit, count); });
}

ViStatus InstrumentSession::write(std::span<const std::byte> data, std::size_t &count)
{
    return write(data, count, operationDeadline(), true);
}

ViStatus InstrumentSession::write(std::span<const std::byte> data, std::size_t &count, os::Deadline deadline, bool end)
{
    count = 0;
    return perform(deadline, [&](const os::WaitLimit &limit) { return transfer(data, end, limit, count); });
}

ViStatus InstrumentSession::transfer(std::span<const std::byte> data, bool end, const os::WaitLimit &limit,
                                     std::size_t &count)
{
    TransferMode mode = transferMode();
    mode.sendEnd = mode.sendEnd && end;
    return data.empty() ? VI_SUCCESS : m_transport->write(data, mode, limit, count);
}

ViStatus InstrumentSession::readAsync(std::span<std::byte> buffer, ViJobId *job)
{
    return startJob(true, buffer, job);
}

ViStatus InstrumentSession::writeAsync(std::span<const std::byte> data, ViJobId *job)
{
    return startJob(false, {const_cast<std::byte *>(data.data()), data.size()}, job);
}

ViStatus InstrumentSession::startJob(bool reads, std::span<std::byte> buffer, ViJobId *job)
{
    const ViStatus status = mayTransfer();
    return status == VI_SUCCESS ? m_jobs.start(reads, buffer, job) : status;
}

/// On the thread of the jobs. Time-out, attributes and locks are those that hold when the job's turn to begin has come.
ViStatus InstrumentSession::carryOut(const AsyncTransfers::Job &job, const std::atomic<bool> &cancelled,
                                     std::size_t &count)
{
    const CallWatch watch(m_interruptions);
    if (const ViStatus status = mayTransfer(); status != VI_SUCCESS)
        return status;
    if (job.reads && job.buffer.empty())
        return VI_SUCCESS_MAX_CNT;
    const os::Deadline deadline = operationDeadline();
    if (const ViStatus status = entered(m_gate.enterAt(job.place, deadline, cancelled), watch); status != VI_SUCCESS)
        return status;
    const GateTurn turn(m_gate);
    const AsyncTransfers::Talking talking(m_jobs);
    if (cancelled.load())
        return VI_ERROR_ABORT;
    if (const ViStatus status = mayTransfer(); status != VI_SUCCESS)
        return status;
    const os::WaitLimit limit{deadline, m_wakeup};
    return job.reads ? m_transport->read(job.buffer, transferMode(), limit, count)
                     : transfer(job.buffer, true, limit, count);
}

ViStatus InstrumentSession::readStatusByte(ViUInt16 &status)
{
    if (isInterface())
        return VI_ERROR_NSUP_OPER;
    return perform(operationDeadline(), [&](const os::WaitLimit &limit) {
        return m_transport->readStatusByte(transferMode(), limit, status);
    });
}

ViStatus InstrumentSession::assertTrigger(ViUInt16 protocol)
{
    if (protocol != VI_TRIG_PROT_DEFAULT)
        return VI_ERROR_INV_PROT;
    return perform(operationDeadline(),
                   [&](const os::WaitLimit &limit) { return m_transport->trigger(transferMode(), limit); });
}

ViStatus InstrumentSession::clear()
{
    if (isInterface())
        return VI_ERROR_NSUP_OPER;
    m_formatted.forget();
    return perform(operationDeadline(), [&](const os::WaitLimit &limit) { return m_transport->clear(limit); });
}

ViStatus InstrumentSession::controlRemote(ViUInt16 mode)
{
    if ((m_attributes.kind() & (kind::Socket | kind::Serial)) != 0)
        return VI_ERROR_NSUP_OPER;
    if (mode > VI_GPIB_REN_ADDRESS_GTL)
        return VI_ERROR_INV_MODE;
    return perform(operationDeadline(),
                   [&](const os::WaitLimit &limit) { return m_transport->controlRemote(mode, limit); });
}

bool InstrumentSession::isInterface() const
{
    return m_attributes.kind() == kind::GpibIntfc;
}

ViStatus InstrumentSession::controlAttention(ViUInt16 mode)
{
    if (!isInterface())
        return VI_ERROR_NSUP_OPER;
    if (mode > VI_GPIB_ATN_ASSERT_IMMEDIATE)
        return VI_ERROR_INV_MODE;
    return perform(operationDeadline(), [&](const os::WaitLimit &limit) {
        return m_transport->gpibController()->controlAttention(mode, limit);
    });
}

ViStatus InstrumentSession::clearInterface()
{
    if (!isInterface())
        return VI_ERROR_NSUP_OPER;
    return perform(operationDeadline(),
                   [&](const os::WaitLimit &limit) { return m_transport->gpibController()->clearInterface(limit); });
}

ViStatus InstrumentSession::sendCommands(std::span<const std::byte> commands, std::size_t &count)
{
    count = 0;
    if (!isInterface())
        return VI_ERROR_NSUP_OPER;
    return perform(operationDeadline(), [&](const os::WaitLimit &limit) {
        return m_transport->gpibController()->sendCommands(commands, limit, count);
    });
}

ViStatus InstrumentSession::passControl(ViUInt16 primary, ViUInt16 secondary)
{
    constexpr ViUInt16 LastAddress = 30;
    if (!isInterface())
        return VI_ERROR_NSUP_OPER;
    if (primary > LastAddress || (secondary > LastAddress && secondary != VI_NO_SEC_ADDR))
        return VI_ERROR_INV_PARAMETER;
    return perform(operationDeadline(), [&](const os::WaitLimit &limit) {
        return m_transport->gpibController()->passControl(primary, secondary, limit);
    });
}

ViStatus InstrumentSession::flushLine(ViUInt16 mask)
{
    return perform(operationDeadline(),
                   [&](const os::WaitLimit &limit) { return m_transport->flushLine(mask, limit); });
}

ViStatus InstrumentSession::resizeLine(ViUInt16 mask, std::size_t size)
{
    return perform(operationDeadline(), [&](const os::WaitLimit &) { return m_transport->resizeLine(mask, size); });
}

ViStatus InstrumentSession::terminate(ViUInt16 degree, ViJobId job)
{
    if (degree != VI_NULL)
        return VI_ERROR_INV_DEGREE;
    if (inherited())
        return VI_ERROR_CONN_LOST;
    if (job != VI_NULL)
        return m_jobs.terminate(job);
    ++m_interruptions.terminations;
    m_wakeup.terminate();
    m_locks.wake();
    m_events->terminate();
    m_jobs.terminateAll();
    return VI_SUCCESS;
}

ViStatus InstrumentSession::lock(ViAccessMode type, ViUInt32 timeout, const ViChar *requestedKey, ViChar *accessKey)
{
    if (type != VI_EXCLUSIVE_LOCK && type != VI_SHARED_LOCK)
        return VI_ERROR_INV_LOCK_TYPE;
    if (inherited())
        return VI_ERROR_CONN_LOST;
    if (!m_opened.load())
        return VI_ERROR_INV_OBJECT;
    std::string requested;
    if (type == VI_SHARED_LOCK && requestedKey) {
        requested.assign(requestedKey, ::strnlen(requestedKey, MaxAccessKey));
        if (requested.size() >= MaxAccessKey)
            return VI_ERROR_INV_ACCESS_KEY;
    }
    std::string granted;
    const ViStatus status = m_locks.lock(type, timeout, requested, granted);
    if (status >= VI_SUCCESS && accessKey)
        std::memcpy(accessKey, granted.c_str(), granted.size() + 1);
    return status;
}

ViStatus InstrumentSession::unlock()
{
    return inherited() ? VI_ERROR_CONN_LOST : m_locks.unlock();
}

ViStatus InstrumentSession::enableEvent(ViEventType type, ViUInt16 mechanism, ViEventFilter filter)
{
    if (inherited())
        return VI_ERROR_CONN_LOST;
    const ViStatus status = m_events->enable(type, mechanism, filter);
    if (status < VI_SUCCESS || type != VI_EVENT_SERVICE_REQ)
        return status;
    // Events ignore locks, so this takes the turn without asking for them.
    const auto deadline = os::Deadline::afterVisaTimeout(static_cast<ViUInt32>(m_attributes.number(VI_ATTR_TMO_VALUE)));
    const ViStatus turned = entered(m_gate.enter(deadline), CallWatch(m_interruptions));
    if (turned != VI_SUCCESS) {
        m_events->disable(type, VI_ALL_MECH);
        return turned;
    }
    const GateTurn turn(m_gate);
    const auto notify = [events = std::weak_ptr(m_events)] {
        if (const auto hub = events.lock())
            hub->post({.type = VI_EVENT_SERVICE_REQ});
    };
    const ViStatus watching = m_transport->watchServiceRequests(notify, {deadline, m_wakeup});
    if (watching < VI_SUCCESS)
        m_events->disable(type, VI_ALL_MECH);
    return watching < VI_SUCCESS ? watching : status;
}

ViStatus InstrumentSession::getAttribute(ViAttr attribute, void *value)
{
    if (attribute == VI_ATTR_RSRC_LOCK_STATE && value && !inherited() && m_opened.load()) {
        const ViAccessMode state = m_locks.state();
        std::memcpy(value, &state, sizeof state);
        return VI_SUCCESS;
    }
    if (value && !inherited() && m_opened.load() && m_transport->isLive(attribute)) {
        ViUInt64 number = 0;
        const ViStatus status =
            inTurn(operationDeadline(), CallWatch(m_interruptions),
                   [&](const os::WaitLimit &limit) { return m_transport->readAttribute(attribute, limit, number); });
        if (status < VI_SUCCESS)
            return status;
        m_attributes.setNumber(attribute, number);
    }
    return m_attributes.get(attribute, value);
}

ViStatus InstrumentSession::setAttribute(ViAttr attribute, ViAttrState state)
{
    const AttributeRow *row;
    std::int64_t value;
    const ViStatus status = m_attributes.check(attribute, state, row, value);
    if (attribute == VI_ATTR_IO_PROT && state == VI_PROT_HS488 && m_attributes.kind() == kind::GpibInstr)
        return VI_WARN_NSUP_ATTR_STATE; // a wish that a bus without it may leave open
    if (status < VI_SUCCESS)
        return status;
    const bool address = attribute == VI_ATTR_GPIB_PRIMARY_ADDR || attribute == VI_ATTR_GPIB_SECONDARY_ADDR;
    if (address && !isInterface())
        return VI_ERROR_ATTR_READONLY; // an instrument's is part of its name
    if (row->scope == Scope::Global && m_locks.shutOut())
        return VI_ERROR_RSRC_LOCKED;
    switch (attribute) {
    case VI_ATTR_GPIB_SECONDARY_ADDR: // the gateway can give the interface neither
        return value == VI_NO_SEC_ADDR ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
    case VI_ATTR_DEV_STATUS_BYTE:
        return value == 0 ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
    case VI_ATTR_MAX_QUEUE_LENGTH:
        if (!m_events->setQueueLength(static_cast<ViUInt32>(value)))
            return VI_ERROR_ATTR_READONLY;
        break;
    case VI_ATTR_DMA_ALLOW_EN:
        return value == VI_TRUE ? VI_WARN_NSUP_ATTR_STATE : VI_SUCCESS;
    case VI_ATTR_GPIB_PRIMARY_ADDR:
    case VI_ATTR_GPIB_UNADDR_EN:
    case VI_ATTR_TCPIP_NODELAY:
    case VI_ATTR_TCPIP_KEEPALIVE:
    case VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB:
    case VI_ATTR_TCPIP_HISLIP_OVERLAP_EN:
    case VI_ATTR_ASRL_BAUD:
    case VI_ATTR_ASRL_DATA_BITS:
    case VI_ATTR_ASRL_PARITY:
    case VI_ATTR_ASRL_STOP_BITS:
    case VI_ATTR_ASRL_FLOW_CNTRL:
    case VI_ATTR_ASRL_END_IN:
    case VI_ATTR_ASRL_END_OUT:
    case VI_ATTR_ASRL_REPLACE_CHAR:
    case VI_ATTR_ASRL_XON_CHAR:
    case VI_ATTR_ASRL_XOFF_CHAR:
    case VI_ATTR_ASRL_DTR_STATE:
    case VI_ATTR_ASRL_RTS_STATE: {
        if (inherited())
            return VI_ERROR_CONN_LOST;
        // Local attributes ignore the locks of others, so this takes the turn without asking for them.
        const auto timeout = static_cast<ViUInt32>(m_attributes.number(VI_ATTR_TMO_VALUE));
        const ViStatus applied = inTurn(
            os::Deadline::afterVisaTimeout(timeout), CallWatch(m_interruptions), [&](const os::WaitLimit &limit) {
                return m_transport->applyAttribute(attribute, static_cast<ViUInt64>(value), limit);
            });
        if (applied != VI_SUCCESS)
            return applied;
        break;
    }
    default:
        break;
    }
    m_attributes.setNumber(attribute, static_cast<ViUInt64>(value));
    return VI_SUCCESS;
}

ViStatus InstrumentSession::close()
{
    m_jobs.stop();
    m_interruptions.closing.store(true);
    m_wakeup.close();
    m_gate.close();
    m_formatted.close();
    m_locks.wake();
    m_jobs.close();
    m_events->close();
    m_gate.awaitEmpty();
    if (m_transport)
        m_transport->close();
    m_locks.close();
    return VI_SUCCESS;
}

void InstrumentSession::abandon()
{
    if (m_transport)
        m_transport->abandon();
    m_wakeup.abandon();
}

} // namespace kyvisa
