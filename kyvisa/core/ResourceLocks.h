#pragma once

#include "kyvisa/include/visatype.h"
#include "kyvisa/os/Deadline.h"

#include <atomic>
#include <condition_variable>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace kyvisa
{

/// Identifies a lock holder; a session's address serves.
using LockHolder = const void *;

/**
 * The locks of one resource within this process. Each holder has an exclusive and a shared count; the resource has one key
 * while it is shared-locked.
 *
 * heldByOther() is asked before each transfer and costs one atomic load while nobody holds a lock.
 */
class ResourceLocks
{
public:
    /// @param type VI_EXCLUSIVE_LOCK or VI_SHARED_LOCK.
    /// @param requested the key asked for; empty is none.
    /// @param closing set by whoever calls wake(): ends the wait with INV_OBJECT.
    /// @param granted receives the key of a shared lock.
    ViStatus lock(LockHolder holder, ViAccessMode type, ViUInt32 timeout, const std::string &requested,
                  const std::atomic<bool> &closing, std::string &granted);
    ViStatus unlock(LockHolder holder);

    /// Gives up everything that @p holder holds.
    void forget(LockHolder holder);
    void wake();

    bool heldByOther(LockHolder holder) const;
    /// Waits until no other holder shuts @p holder out. False when the deadline came first, or @p givenUp, which is asked
    /// again after each wake().
    bool awaitAccess(LockHolder holder, os::Deadline deadline, const std::function<bool()> &givenUp);

    /// VI_NO_LOCK, VI_EXCLUSIVE_LOCK or VI_SHARED_LOCK.
    ViAccessMode state() const;

private:
    struct Counts {
        int exclusive = 0;
        int shared = 0;
    };
    enum class Verdict { Granted, Wait, Locked, InvalidKey };

    Verdict judge(LockHolder holder, ViAccessMode type, const std::string &requested) const;
    ViStatus grant(LockHolder holder, ViAccessMode type, const std::string &requested, std::string &granted);
    bool shutOut(LockHolder holder) const;
    void afterRelease(LockHolder holder);
    void publish();

    mutable std::mutex m_mutex;
    std::condition_variable m_changed;
    std::map<LockHolder, Counts> m_holders;
    LockHolder m_exclusive = nullptr; ///< the one holder with an exclusive lock
    std::string m_key;
    std::atomic<bool> m_anyLock{false};
};

/// Finds the locks of a resource by its canonical name, without case. They live as long as a session uses them.
class LockRegistry
{
public:
    std::shared_ptr<ResourceLocks> locksOf(const std::string &canonicalName);

    void lockForFork() { m_mutex.lock(); }
    void unlockAfterFork() { m_mutex.unlock(); }
    /// In the child, while locked: the parent's locks are the parent's.
    void forgetAll() { m_locks.clear(); }

private:
    std::mutex m_mutex;
    std::map<std::string, std::weak_ptr<ResourceLocks>> m_locks;
};

} // namespace kyvisa
