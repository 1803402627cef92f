#pragma once

#include "kyvisa/core/IoGate.h"
#include "kyvisa/include/visatype.h"
#include "kyvisa/os/Deadline.h"

#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

namespace kyvisa
{

class CallWatch;
class ResourceLocks;
class Transport;
enum class DeviceLocks : std::uint8_t;
struct Interruptions;
namespace os
{
class Wakeup;
}

/**
 * What one session holds of its resource's locks, and how it gets them.
 *
 * Where the instrument has no locks, ResourceLocks keeps them on this machine. Where it has the exclusive one alone
 * (VXI-11), that is taken in the instrument on top of the machine's: first the machine, then the instrument, and back in
 * the other order. Where it has both kinds (HiSLIP), the instrument decides alone and this class only counts: a nested lock
 * never reaches the wire.
 *
 * A wait in the instrument is cut into short requests, and between them the session's turn is free for its other threads.
 * So no request outlives its caller by more than a moment.
 */
class SessionLocks
{
public:
    using DeviceCall = std::function<ViStatus(Transport &, const os::Wakeup &)>;
    /// Runs a call in the session's turn, entered by the given time.
    using Turn = std::function<ViStatus(os::Deadline, const DeviceCall &)>;

    SessionLocks(std::shared_ptr<ResourceLocks> resource, const Interruptions &interruptions, Turn turn);
    ~SessionLocks();

    /// Once the transport is there.
    void setDevice(DeviceLocks device);

    /// @param type VI_EXCLUSIVE_LOCK or VI_SHARED_LOCK.
    /// @param requested the key asked for; empty is none.
    /// @param granted receives the key of a shared lock.
    ViStatus lock(ViAccessMode type, ViUInt32 timeout, const std::string &requested, std::string &granted);
    ViStatus unlock();

    /// A lock on this machine keeps the session from its resource. Locks in the instrument are the instrument's to enforce.
    bool shutOut() const;
    /// VI_NO_LOCK, VI_EXCLUSIVE_LOCK or VI_SHARED_LOCK, whoever holds it.
    ViAccessMode state();

    /// Wakes who waits for a lock, to look at the interruptions.
    void wake();
    /// Gives up what is held on this machine. What is held in the instrument goes with the connection.
    void close();

private:
    struct Counts {
        int exclusive = 0;
        int shared = 0;
        std::string key;
    };

    ViStatus lockInDevice(ViAccessMode type, os::Deadline deadline, bool immediate, const std::string &requested,
                          const CallWatch &watch, std::string &granted);
    std::optional<ViStatus> judge(ViAccessMode type, const std::string &requested, std::string &granted);
    ViStatus count(ViAccessMode type, const std::string &key, std::string &granted);
    ViStatus lockOnTop(ViUInt32 timeout, const CallWatch &watch);
    ViStatus unlockInDevice();
    std::optional<ViStatus> judgeUnlock();
    ViStatus countDown();
    ViStatus askDevice(const std::string &key, os::Deadline deadline, bool immediate, const CallWatch &watch,
                       const std::function<std::optional<ViStatus>()> &before,
                       const std::function<ViStatus()> &granted);

    const std::shared_ptr<ResourceLocks> m_resource;
    const Interruptions &m_interruptions;
    const Turn m_turn;
    std::atomic<DeviceLocks> m_device;
    IoGate m_exclusiveInDevice; ///< one thread at a time takes or gives back a lock that both halves hold

    std::mutex m_mutex; ///< guards what follows
    Counts m_counts;    ///< of locks that only the instrument knows
};

} // namespace kyvisa
