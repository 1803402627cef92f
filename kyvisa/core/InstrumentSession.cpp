#include "kyvisa/core/InstrumentSession.h"

#include "kyvisa/core/EventContext.h"
#include "kyvisa/core/Library.h"
#include "kyvisa/core/ResourceLocks.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/WaitLimit.h"
#include "kyvisa/transport/Transport.h"
#include "kyvisa/transport/TransportFactory.h"

#include <array>
#include <cstring>

namespace kyvisa
{
namespace
{

constexpr ViUInt32 DefaultOpenTimeout = 2000;
constexpr std::size_t MaxAccessKey = 256;

constexpr std::array<ViEventType, 3> InstrumentEvents = {VI_EVENT_IO_COMPLETION, VI_EVENT_EXCEPTION,
                                                         VI_EVENT_SERVICE_REQ};

/// A raw socket has no way to ask for service.
std::span<const ViEventType> possibleEvents(std::uint16_t sessionKind)
{
    return std::span(InstrumentEvents).first(sessionKind == kind::Socket ? 2 : 3);
}

EventHub::Contexts contextsIn(Library &library, ViSession resourceManager)
{
    return {[&library, resourceManager](const Event &event) {
                return library.handles.insert(std::make_shared<EventContext>(event), resourceManager);
            },
            [&library](ViEvent context) { library.handles.remove(context); }};
}

/// Leaves the gate when the operation is over, also by an exception.
class Turn
{
public:
    explicit Turn(IoGate &gate) : m_gate(gate) {}
    ~Turn() { m_gate.leave(); }
    Turn(const Turn &) = delete;
    Turn &operator=(const Turn &) = delete;

private:
    IoGate &m_gate;
};

} // namespace

InstrumentSession::InstrumentSession(Library &library, const ResourceName &name, std::uint16_t sessionKind,
                                     ViSession resourceManager)
    : m_name(name), m_attributes(sessionKind), m_locks(library.locks.locksOf(name.canonical())),
      m_events(std::make_shared<EventHub>(possibleEvents(sessionKind), contextsIn(library, resourceManager)))
{
    describe(name, resourceManager);
}

InstrumentSession::~InstrumentSession() = default;

void InstrumentSession::describe(const ResourceName &name, ViSession resourceManager)
{
    m_attributes.setText(VI_ATTR_RSRC_NAME, name.canonical());
    m_attributes.setText(VI_ATTR_RSRC_CLASS, name.className());
    m_attributes.setText(VI_ATTR_RSRC_MANF_NAME, "Oltrava");
    m_attributes.setNumber(VI_ATTR_RM_SESSION, resourceManager);
    m_attributes.setNumber(VI_ATTR_INTF_TYPE, name.interfaceType);
    m_attributes.setNumber(VI_ATTR_INTF_NUM, name.board);
    m_attributes.setText(VI_ATTR_TCPIP_HOSTNAME, name.host);
    m_attributes.setText(VI_ATTR_TCPIP_DEVICE_NAME, name.deviceName);
    m_attributes.setNumber(VI_ATTR_TCPIP_PORT, name.port);
    m_attributes.setNumber(VI_ATTR_TCPIP_IS_HISLIP, name.isHislip() ? VI_TRUE : VI_FALSE);
    m_attributes.setText(VI_ATTR_INTF_INST_NAME, "TCPIP" + std::to_string(name.board) + " (" + name.host + ")");
}

ViStatus InstrumentSession::open(ViSession handle, ViAccessMode accessMode, ViUInt32 timeout)
{
    if (!m_wakeup.valid())
        return VI_ERROR_ALLOC;
    m_events->setSession(handle);
    const auto deadline = os::Deadline::afterVisaTimeout(timeout == VI_TMO_IMMEDIATE ? DefaultOpenTimeout : timeout);
    {
        if (m_gate.enter(deadline) != IoGate::Entered::Yes)
            return VI_ERROR_INV_OBJECT;
        const Turn turn(m_gate);
        const ViStatus status = openTransport(m_name, {deadline, m_wakeup}, m_attributes, m_transport);
        if (status < VI_SUCCESS)
            return status;
        m_opened.store(true);
    }
    if ((accessMode & VI_EXCLUSIVE_LOCK) != 0) {
        std::string key;
        const ViUInt32 left = timeout == VI_TMO_IMMEDIATE ? timeout : deadline.visaTimeoutLeft();
        const ViStatus locked = m_locks->lock(this, VI_EXCLUSIVE_LOCK, left, {}, m_closing, key);
        // The caller asked for a resource and a lock at once: the lock, not the connection, is what was not to be had.
        if (locked == VI_ERROR_TMO)
            return VI_ERROR_RSRC_LOCKED;
        if (locked < VI_SUCCESS)
            return locked;
    }
    return (accessMode & VI_LOAD_CONFIG) != 0 ? VI_WARN_CONFIG_NLOADED : VI_SUCCESS;
}

ViStatus InstrumentSession::mayTransfer(os::Deadline deadline)
{
    if (inherited())
        return VI_ERROR_CONN_LOST;
    if (!m_opened.load())
        return VI_ERROR_INV_OBJECT;
    if (!m_locks->heldByOther(this))
        return VI_SUCCESS;
    const unsigned before = m_terminations.load();
    const auto terminated = [&] { return m_terminations.load() != before; };
    if (m_transport->deviceHasLocks() &&
        m_locks->awaitAccess(this, deadline, [&] { return m_closing.load() || terminated(); }))
        return VI_SUCCESS;
    if (terminated() && !m_closing.load())
        return VI_ERROR_ABORT;
    return m_closing.load() ? VI_ERROR_INV_OBJECT : VI_ERROR_RSRC_LOCKED;
}

ViStatus InstrumentSession::enterGate(os::Deadline deadline)
{
    switch (m_gate.enter(deadline)) {
    case IoGate::Entered::TimedOut:
        return VI_ERROR_TMO;
    case IoGate::Entered::Closed:
        return VI_ERROR_INV_OBJECT;
    case IoGate::Entered::Yes:
        break;
    }
    m_wakeup.rearm();
    return VI_SUCCESS;
}

template <typename Operation>
ViStatus InstrumentSession::perform(const Operation &operation)
{
    const auto timeout = static_cast<ViUInt32>(m_attributes.number(VI_ATTR_TMO_VALUE));
    const auto deadline = os::Deadline::afterVisaTimeout(timeout);
    const ViStatus status = mayTransfer(deadline);
    return status == VI_SUCCESS ? inTurn(deadline, operation) : status;
}

template <typename Operation>
ViStatus InstrumentSession::inTurn(os::Deadline deadline, const Operation &operation)
{
    const ViStatus entered = enterGate(deadline);
    if (entered != VI_SUCCESS)
        return entered;
    const Turn turn(m_gate);
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
    count = 0;
    if (buffer.empty())
        return VI_SUCCESS_MAX_CNT;
    return perform([&](const os::WaitLimit &limit) { return m_transport->read(buffer, transferMode(), limit, count); });
}

ViStatus InstrumentSession::write(std::span<const std::byte> data, std::size_t &count)
{
    count = 0;
    return perform([&](const os::WaitLimit &limit) {
        return data.empty() ? VI_SUCCESS : m_transport->write(data, transferMode(), limit, count);
    });
}

ViStatus InstrumentSession::readAsync(std::span<std::byte> buffer, ViJobId &job)
{
    job = ++m_lastJob;
    Event done{.type = VI_EVENT_IO_COMPLETION, .operation = "viReadAsync", .job = job, .buffer = buffer.data()};
    std::size_t count = 0;
    done.status = read(buffer, count);
    done.count = count;
    m_events->post(done);
    return VI_SUCCESS_SYNC;
}

ViStatus InstrumentSession::writeAsync(std::span<const std::byte> data, ViJobId &job)
{
    job = ++m_lastJob;
    Event done{.type = VI_EVENT_IO_COMPLETION, .operation = "viWriteAsync", .job = job};
    done.buffer = const_cast<std::byte *>(data.data());
    std::size_t count = 0;
    done.status = write(data, count);
    done.count = count;
    m_events->post(done);
    return VI_SUCCESS_SYNC;
}

ViStatus InstrumentSession::readStatusByte(ViUInt16 &status)
{
    return perform(
        [&](const os::WaitLimit &limit) { return m_transport->readStatusByte(transferMode(), limit, status); });
}

ViStatus InstrumentSession::assertTrigger(ViUInt16 protocol)
{
    if (protocol != VI_TRIG_PROT_DEFAULT)
        return VI_ERROR_INV_PROT;
    return perform([&](const os::WaitLimit &limit) { return m_transport->trigger(transferMode(), limit); });
}

ViStatus InstrumentSession::clear()
{
    return perform([&](const os::WaitLimit &limit) { return m_transport->clear(limit); });
}

ViStatus InstrumentSession::controlRemote(ViUInt16 mode)
{
    if (m_attributes.kind() == kind::Socket)
        return VI_ERROR_NSUP_OPER;
    if (mode > VI_GPIB_REN_ADDRESS_GTL)
        return VI_ERROR_INV_MODE;
    return perform([&](const os::WaitLimit &limit) { return m_transport->controlRemote(mode, limit); });
}

ViStatus InstrumentSession::terminate(ViUInt16 degree, ViJobId job)
{
    if (degree != VI_NULL)
        return VI_ERROR_INV_DEGREE;
    if (job != VI_NULL)
        return VI_ERROR_INV_JOB_ID;
    if (inherited())
        return VI_ERROR_CONN_LOST;
    ++m_terminations;
    m_wakeup.terminate();
    m_locks->wake();
    return VI_SUCCESS;
}

ViStatus InstrumentSession::lock(ViAccessMode type, ViUInt32 timeout, const ViChar *requestedKey, ViChar *accessKey)
{
    if (type != VI_EXCLUSIVE_LOCK && type != VI_SHARED_LOCK)
        return VI_ERROR_INV_LOCK_TYPE;
    if (inherited())
        return VI_ERROR_CONN_LOST;
    std::string requested;
    if (type == VI_SHARED_LOCK && requestedKey) {
        requested.assign(requestedKey, ::strnlen(requestedKey, MaxAccessKey));
        if (requested.size() >= MaxAccessKey)
            return VI_ERROR_INV_ACCESS_KEY;
    }
    std::string granted;
    const ViStatus status = m_locks->lock(this, type, timeout, requested, m_closing, granted);
    if (status >= VI_SUCCESS && accessKey)
        std::memcpy(accessKey, granted.c_str(), granted.size() + 1);
    return status;
}

ViStatus InstrumentSession::unlock()
{
    return inherited() ? VI_ERROR_CONN_LOST : m_locks->unlock(this);
}

ViStatus InstrumentSession::enableEvent(ViEventType type, ViUInt16 mechanism, ViEventFilter filter)
{
    if (inherited())
        return VI_ERROR_CONN_LOST;
    const ViStatus status = m_events->enable(type, mechanism, filter);
    if (status < VI_SUCCESS || type != VI_EVENT_SERVICE_REQ)
        return status;
    // Events ignore locks, so this takes the turn without asking for them.
    const ViStatus entered =
        enterGate(os::Deadline::afterVisaTimeout(static_cast<ViUInt32>(m_attributes.number(VI_ATTR_TMO_VALUE))));
    if (entered != VI_SUCCESS) {
        m_events->disable(type, VI_ALL_MECH);
        return entered;
    }
    const Turn turn(m_gate);
    const ViStatus watching = m_transport->watchServiceRequests([events = std::weak_ptr(m_events)] {
        if (const auto hub = events.lock())
            hub->post({.type = VI_EVENT_SERVICE_REQ});
    });
    if (watching < VI_SUCCESS)
        m_events->disable(type, VI_ALL_MECH);
    return watching < VI_SUCCESS ? watching : status;
}

ViStatus InstrumentSession::getAttribute(ViAttr attribute, void *value)
{
    if (attribute == VI_ATTR_RSRC_LOCK_STATE && value && !inherited()) {
        const ViAccessMode state = m_locks->state();
        std::memcpy(value, &state, sizeof state);
        return VI_SUCCESS;
    }
    return m_attributes.get(attribute, value);
}

ViStatus InstrumentSession::setAttribute(ViAttr attribute, ViAttrState state)
{
    const AttributeRow *row;
    std::int64_t value;
    const ViStatus status = m_attributes.check(attribute, state, row, value);
    if (status < VI_SUCCESS)
        return status;
    if (row->scope == Scope::Global && m_locks->heldByOther(this))
        return VI_ERROR_RSRC_LOCKED;
    switch (attribute) {
    case VI_ATTR_MAX_QUEUE_LENGTH:
        if (!m_events->setQueueLength(static_cast<ViUInt32>(value)))
            return VI_ERROR_ATTR_READONLY;
        break;
    case VI_ATTR_DMA_ALLOW_EN:
        return value == VI_TRUE ? VI_WARN_NSUP_ATTR_STATE : VI_SUCCESS;
    case VI_ATTR_TCPIP_NODELAY:
    case VI_ATTR_TCPIP_KEEPALIVE:
    case VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB:
    case VI_ATTR_TCPIP_HISLIP_OVERLAP_EN: {
        if (inherited())
            return VI_ERROR_CONN_LOST;
        // Local attributes ignore the locks of others, so this takes the turn without asking for them.
        const auto timeout = static_cast<ViUInt32>(m_attributes.number(VI_ATTR_TMO_VALUE));
        const ViStatus applied = inTurn(os::Deadline::afterVisaTimeout(timeout), [&](const os::WaitLimit &limit) {
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
    m_closing.store(true);
    m_wakeup.close();
    m_gate.close();
    m_locks->wake();
    m_events->close();
    m_gate.awaitEmpty();
    if (m_transport)
        m_transport->close();
    m_locks->forget(this);
    return VI_SUCCESS;
}

void InstrumentSession::abandon()
{
    if (m_transport)
        m_transport->abandon();
}

} // namespace kyvisa
