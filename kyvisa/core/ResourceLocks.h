#pragma once

#include "kyvisa/core/MachineLocks.h"
#include "kyvisa/include/visatype.h"
#include "kyvisa/os/Deadline.h"

#include <atomic>
#include <condition_variable>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace kyvisa
{

class CallWatch;

/// Identifies a lock holder; a session's address serves.
using LockHolder = const void *;

/**
 * The locks of one resource on this machine. Each holder has an exclusive and a shared count; the resource has one key while
 * it is shared-locked.
 *
 * Between the sessions of this process this class decides; between processes MachineLocks does. A lock needs both, and the
 * second is only asked, never waited for, while the first is held: so the two cannot block each other. Who waits is woken by
 * this process's sessions and looks for the others' every few milliseconds.
 *
 * heldByOther() is asked before each transfer: one system call, a fraction of a microsecond.
 */
class ResourceLocks
{
public:
    explicit ResourceLocks(MachineLocks machine) : m_machine(std::move(machine)) {}

    /// @param type VI_EXCLUSIVE_LOCK or VI_SHARED_LOCK.
    /// @param requested the key asked for; empty is none.
    /// @param watch ends the wait when it is interrupted; asked again after each wake().
    /// @param granted receives the key of a shared lock.
    ViStatus lock(LockHolder holder, ViAccessMode type, ViUInt32 timeout, const std::string &requested,
                  const CallWatch &watch, std::string &granted);
    ViStatus unlock(LockHolder holder);

    /// Gives up everything that @p holder holds.
    void forget(LockHolder holder);
    void wake();

    bool heldByOther(LockHolder holder) const;
    int exclusiveCount(LockHolder holder) const;

    /// VI_NO_LOCK, VI_EXCLUSIVE_LOCK or VI_SHARED_LOCK.
    ViAccessMode state() const;

private:
    struct Counts {
        int exclusive = 0;
        int shared = 0;
    };
    enum class Verdict { Granted, Wait, WaitForAnotherProcess, Locked, InvalidKey, NoLockFile };

    Verdict judge(LockHolder holder, ViAccessMode type, const std::string &requested) const;
    Verdict acquire(LockHolder holder, ViAccessMode type, const std::string &requested);
    ViStatus grant(LockHolder holder, ViAccessMode type, std::string &granted);
    bool shutOut(LockHolder holder) const;
    bool anyShared() const;
    void afterRelease(LockHolder holder);
    void publish();

    mutable std::mutex m_mutex;
    std::condition_variable m_changed;
    unsigned m_changes = 0; ///< tells a wait that something happened
    MachineLocks m_machine;
    std::map<LockHolder, Counts> m_holders;
    LockHolder m_exclusive = nullptr; ///< the one holder with an exclusive lock
    std::string m_key;
    std::atomic<bool> m_anyLock{false};
};

/// Finds the locks of a resource by its name, without case. They live as long as a session uses them, and so does
/// the file that all of them share.
class LockRegistry
{
public:
    explicit LockRegistry(std::string lockFile = os::LockFile::standardPath()) : m_path(std::move(lockFile)) {}

    std::shared_ptr<ResourceLocks> locksOf(const std::string &canonicalName);

    void lockForFork() { m_mutex.lock(); }
    void unlockAfterFork() { m_mutex.unlock(); }
    /// In the child, while locked: the parent's locks are the parent's.
    void forgetAll();

private:
    std::mutex m_mutex;
    const std::string m_path;
    std::weak_ptr<os::LockFile> m_file;
    std::map<std::string, std::weak_ptr<ResourceLocks>> m_locks;
};

} // namespace kyvisa
