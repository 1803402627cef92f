#include "kyvisa/core/SessionLocks.h"

#include "kyvisa/core/Interruptions.h"
#include "kyvisa/core/ResourceLocks.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/Poll.h"
#include "kyvisa/os/UniqueText.h"
#include "kyvisa/os/WaitLimit.h"
#include "kyvisa/transport/Transport.h"

#include <algorithm>
#include <array>
#include <chrono>

namespace kyvisa
{
namespace
{

using std::chrono::milliseconds;

/// The longest single request for a lock.
constexpr milliseconds Slice{500};
/// What an answer may take beyond the time that the instrument was given.
constexpr milliseconds WayBack{2000};
/// Between two requests that were refused at once.
constexpr milliseconds Pause{20};
/// For a look at the lock state while another thread has the session's turn.
constexpr milliseconds PatienceForState{200};

milliseconds patience(os::Deadline deadline, bool immediate)
{
    if (immediate)
        return milliseconds::zero();
    return deadline.isNever() ? Slice : std::min(Slice, std::chrono::ceil<milliseconds>(deadline.remaining()));
}

} // namespace

SessionLocks::SessionLocks(std::shared_ptr<ResourceLocks> resource, const Interruptions &interruptions, Turn turn)
    : m_resource(std::move(resource)), m_interruptions(interruptions), m_turn(std::move(turn)),
      m_device(DeviceLocks::None)
{
}

SessionLocks::~SessionLocks() = default;

void SessionLocks::setDevice(DeviceLocks device)
{
    m_device.store(device);
}

ViStatus SessionLocks::lock(ViAccessMode type, ViUInt32 timeout, const std::string &requested, std::string &granted)
{
    const CallWatch watch(m_interruptions);
    if (m_device == DeviceLocks::All)
        return lockInDevice(type, os::Deadline::afterVisaTimeout(timeout), timeout == VI_TMO_IMMEDIATE, requested,
                            watch, granted);
    if (m_device == DeviceLocks::Exclusive && type == VI_EXCLUSIVE_LOCK)
        return lockOnTop(timeout, watch);
    return m_resource->lock(this, type, timeout, requested, watch, granted);
}

/// What the session's own counts decide; nothing when the instrument has to be asked.
std::optional<ViStatus> SessionLocks::judge(ViAccessMode type, const std::string &requested, std::string &granted)
{
    const std::lock_guard lock(m_mutex);
    if (type == VI_EXCLUSIVE_LOCK) {
        if (m_counts.exclusive == 0)
            return std::nullopt;
        ++m_counts.exclusive;
        return VI_SUCCESS_NESTED_EXCLUSIVE;
    }
    if (m_counts.exclusive > 0)
        return VI_ERROR_RSRC_LOCKED;
    if (m_counts.shared == 0)
        return std::nullopt;
    if (!requested.empty() && requested != m_counts.key)
        return VI_ERROR_INV_ACCESS_KEY;
    ++m_counts.shared;
    granted = m_counts.key;
    return VI_SUCCESS_NESTED_SHARED;
}

ViStatus SessionLocks::count(ViAccessMode type, const std::string &key, std::string &granted)
{
    const std::lock_guard lock(m_mutex);
    if (type == VI_EXCLUSIVE_LOCK) {
        ++m_counts.exclusive;
        return VI_SUCCESS;
    }
    ++m_counts.shared;
    m_counts.key = granted = key;
    return VI_SUCCESS;
}

ViStatus SessionLocks::lockInDevice(ViAccessMode type, os::Deadline deadline, bool immediate,
                                    const std::string &requested, const CallWatch &watch, std::string &granted)
{
    const bool shared = type == VI_SHARED_LOCK;
    const std::string key = !shared ? std::string() : requested.empty() ? os::uniqueText() : requested;
    return askDevice(
        key, deadline, immediate, watch, [&] { return judge(type, requested, granted); },
        [&] { return count(type, key, granted); });
}

/// Asks until the instrument grants the lock or the time is up. @p before may settle it at first and each time the turn has come.
ViStatus SessionLocks::askDevice(const std::string &key, os::Deadline deadline, bool immediate, const CallWatch &watch,
                                 const std::function<std::optional<ViStatus>()> &before,
                                 const std::function<ViStatus()> &granted)
{
    // What needs no instrument does not wait for the turn.
    if (const auto settled = before())
        return *settled;
    for (;;) {
        bool refused = false;
        const auto enterBy = immediate ? os::Deadline::after(WayBack) : deadline;
        const ViStatus status = m_turn(enterBy, [&](Transport &transport, const os::Wakeup &wakeup) -> ViStatus {
            if (watch.interrupted())
                return watch.status();
            if (const auto settled = before())
                return *settled;
            const milliseconds wait = patience(deadline, immediate);
            const auto earliest = os::Deadline::after(std::min(wait, Pause));
            const ViStatus answer = transport.lockDevice(key, wait, {os::Deadline::after(wait + WayBack), wakeup});
            if (answer == VI_SUCCESS)
                return granted();
            refused = answer == VI_ERROR_RSRC_LOCKED;
            if (refused && !immediate) { // some instruments refuse at once
                std::array<pollfd, 1> nothing{};
                os::pollWithin(nothing, {os::Deadline::never(), wakeup}, earliest);
            }
            return answer;
        });
        if (!refused || immediate)
            return status;
        if (watch.interrupted())
            return watch.status();
        if (deadline.expired())
            return VI_ERROR_TMO;
    }
}

/// The exclusive lock of an instrument that has no other: behind the machine's.
ViStatus SessionLocks::lockOnTop(ViUInt32 timeout, const CallWatch &watch)
{
    const bool immediate = timeout == VI_TMO_IMMEDIATE;
    const auto deadline = os::Deadline::afterVisaTimeout(timeout);
    switch (m_exclusiveInDevice.enter(immediate ? os::Deadline::after(WayBack) : deadline)) {
    case IoGate::Entered::TimedOut:
        return VI_ERROR_TMO;
    case IoGate::Entered::Closed:
    case IoGate::Entered::Cancelled:
        return VI_ERROR_INV_OBJECT;
    case IoGate::Entered::Yes:
        break;
    }
    const GateTurn inside(m_exclusiveInDevice);
    std::string noKey;
    const ViUInt32 left = immediate ? timeout : deadline.visaTimeoutLeft();
    const ViStatus onMachine = m_resource->lock(this, VI_EXCLUSIVE_LOCK, left, {}, watch, noKey);
    if (onMachine != VI_SUCCESS)
        return onMachine;
    const ViStatus inDevice = askDevice(
        {}, deadline, immediate, watch, [] { return std::nullopt; }, [] { return VI_SUCCESS; });
    if (inDevice < VI_SUCCESS)
        m_resource->unlock(this);
    return inDevice;
}

ViStatus SessionLocks::unlock()
{
    if (m_device == DeviceLocks::All)
        return unlockInDevice();
    if (m_device == DeviceLocks::None || m_resource->exclusiveCount(this) != 1)
        return m_resource->unlock(this);
    switch (m_exclusiveInDevice.enter(os::Deadline::after(WayBack))) {
    case IoGate::Entered::TimedOut:
        return VI_ERROR_TMO;
    case IoGate::Entered::Closed:
    case IoGate::Entered::Cancelled:
        return VI_ERROR_INV_OBJECT;
    case IoGate::Entered::Yes:
        break;
    }
    const GateTurn inside(m_exclusiveInDevice);
    bool asked = false;
    const ViStatus inDevice = m_turn(os::Deadline::after(WayBack), [&](Transport &transport, const os::Wakeup &wakeup) {
        asked = true;
        return transport.unlockDevice({os::Deadline::after(WayBack), wakeup});
    });
    if (!asked) // another thread talks all the time: both locks stay, so that the caller can try again
        return inDevice;
    const ViStatus onMachine = m_resource->unlock(this);
    return inDevice < VI_SUCCESS ? inDevice : onMachine;
}

/// As judge(), for an unlock.
std::optional<ViStatus> SessionLocks::judgeUnlock()
{
    const std::lock_guard lock(m_mutex);
    if (m_counts.exclusive + m_counts.shared == 0)
        return VI_ERROR_SESN_NLOCKED;
    int &nested = m_counts.exclusive > 0 ? m_counts.exclusive : m_counts.shared;
    if (nested == 1)
        return std::nullopt;
    --nested;
    return m_counts.exclusive > 0 ? VI_SUCCESS_NESTED_EXCLUSIVE : VI_SUCCESS_NESTED_SHARED;
}

ViStatus SessionLocks::unlockInDevice()
{
    if (const auto settled = judgeUnlock())
        return *settled;
    return m_turn(os::Deadline::after(WayBack), [this](Transport &transport, const os::Wakeup &wakeup) -> ViStatus {
        if (const auto settled = judgeUnlock()) // another thread has unlocked while this one waited
            return *settled;
        // Given back or lost with the connection: in neither case is it held any more, and nobody nests in it meanwhile.
        const ViStatus left = countDown();
        const ViStatus released = transport.unlockDevice({os::Deadline::after(WayBack), wakeup});
        return released < VI_SUCCESS ? released : left;
    });
}

/// The session holds one lock less. @return what viUnlock() answers for that.
ViStatus SessionLocks::countDown()
{
    const std::lock_guard lock(m_mutex);
    --(m_counts.exclusive > 0 ? m_counts.exclusive : m_counts.shared);
    if (m_counts.exclusive > 0)
        return VI_SUCCESS_NESTED_EXCLUSIVE;
    return m_counts.shared > 0 ? VI_SUCCESS_NESTED_SHARED : VI_SUCCESS;
}

bool SessionLocks::shutOut() const
{
    return m_device != DeviceLocks::All && m_resource->heldByOther(this);
}

ViAccessMode SessionLocks::state()
{
    if (m_device != DeviceLocks::All)
        return m_resource->state();
    ViAccessMode own = VI_NO_LOCK;
    {
        const std::lock_guard lock(m_mutex);
        if (m_counts.exclusive > 0)
            return VI_EXCLUSIVE_LOCK;
        if (m_counts.shared > 0)
            own = VI_SHARED_LOCK;
    }
    ViAccessMode told = own;
    const ViStatus status =
        m_turn(os::Deadline::after(PatienceForState), [&](Transport &transport, const os::Wakeup &wakeup) {
            return transport.readLockState({os::Deadline::after(WayBack), wakeup}, told);
        });
    if (status < VI_SUCCESS || told == VI_NO_LOCK)
        return own;
    return told;
}

void SessionLocks::wake()
{
    m_resource->wake();
}

void SessionLocks::close()
{
    m_exclusiveInDevice.close();
    m_resource->forget(this);
}

} // namespace kyvisa
