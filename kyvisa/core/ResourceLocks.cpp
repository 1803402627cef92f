#include "kyvisa/core/ResourceLocks.h"

#include "kyvisa/core/Interruptions.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/UniqueText.h"

#include <algorithm>
#include <chrono>

namespace kyvisa
{
namespace
{

/// How often a wait looks whether another process has let go.
constexpr std::chrono::milliseconds BetweenLooks{10};

} // namespace

ResourceLocks::Verdict ResourceLocks::judge(LockHolder holder, ViAccessMode type, const std::string &requested) const
{
    const auto own = m_holders.find(holder);
    const Counts counts = own == m_holders.end() ? Counts{} : own->second;
    const bool othersHold = m_holders.size() > (own == m_holders.end() ? 0u : 1u);

    if (type == VI_EXCLUSIVE_LOCK) {
        if (counts.exclusive > 0)
            return Verdict::Granted;
        if (counts.shared > 0)
            return m_exclusive ? Verdict::Wait : Verdict::Granted;
        return othersHold ? Verdict::Wait : Verdict::Granted;
    }
    if (counts.exclusive > 0)
        return Verdict::Locked;
    if (counts.shared > 0)
        return requested.empty() || requested == m_key ? Verdict::Granted : Verdict::InvalidKey;
    if (!othersHold)
        return Verdict::Granted;
    if (m_key.empty()) // exclusive only
        return Verdict::Wait;
    if (requested.empty())
        return Verdict::Wait;
    return requested == m_key ? Verdict::Granted : Verdict::InvalidKey;
}

/// Judges, and where this process's sessions have nothing against it, takes from the other processes what this one lacks.
ResourceLocks::Verdict ResourceLocks::acquire(LockHolder holder, ViAccessMode type, const std::string &requested)
{
    const Verdict verdict = judge(holder, type, requested);
    if (verdict != Verdict::Granted)
        return verdict;
    MachineLocks::Answer answer = MachineLocks::Answer::Granted;
    const bool sharing = anyShared();
    if (type == VI_EXCLUSIVE_LOCK && !m_exclusive) {
        answer = m_machine.takeExclusive(sharing);
    } else if (type == VI_SHARED_LOCK && !sharing) {
        std::string key = requested.empty() ? os::uniqueText() : requested;
        answer = m_machine.share(key, !requested.empty());
        if (answer == MachineLocks::Answer::Granted)
            m_key = std::move(key);
    }
    switch (answer) {
    case MachineLocks::Answer::Granted:
        return Verdict::Granted;
    case MachineLocks::Answer::Held:
        return Verdict::WaitForAnotherProcess;
    case MachineLocks::Answer::OtherKey:
        return Verdict::InvalidKey;
    case MachineLocks::Answer::Unavailable:
        break;
    }
    return Verdict::NoLockFile;
}

ViStatus ResourceLocks::grant(LockHolder holder, ViAccessMode type, std::string &granted)
{
    Counts &counts = m_holders[holder];
    publish();
    if (type == VI_EXCLUSIVE_LOCK) {
        m_exclusive = holder;
        return ++counts.exclusive == 1 ? VI_SUCCESS : VI_SUCCESS_NESTED_EXCLUSIVE;
    }
    granted = m_key;
    return ++counts.shared == 1 ? VI_SUCCESS : VI_SUCCESS_NESTED_SHARED;
}

ViStatus ResourceLocks::lock(LockHolder holder, ViAccessMode type, ViUInt32 timeout, const std::string &requested,
                             const CallWatch &watch, std::string &granted)
{
    const os::Deadline deadline = os::Deadline::afterVisaTimeout(timeout);
    std::unique_lock lock(m_mutex);
    for (;;) {
        if (watch.interrupted())
            return watch.status();
        const Verdict verdict = acquire(holder, type, requested);
        switch (verdict) {
        case Verdict::Granted:
            return grant(holder, type, granted);
        case Verdict::Locked:
            return VI_ERROR_RSRC_LOCKED;
        case Verdict::InvalidKey:
            return VI_ERROR_INV_ACCESS_KEY;
        case Verdict::NoLockFile:
            return VI_ERROR_SYSTEM_ERROR;
        case Verdict::Wait:
        case Verdict::WaitForAnotherProcess:
            break;
        }
        if (timeout == VI_TMO_IMMEDIATE)
            return VI_ERROR_RSRC_LOCKED;
        if (deadline.expired())
            return VI_ERROR_TMO;
        const bool look = verdict == Verdict::WaitForAnotherProcess;
        const os::Deadline until = look ? deadline.orEarlier(os::Deadline::after(BetweenLooks)) : deadline;
        os::waitUntil(m_changed, lock, until,
                      [&, before = m_changes] { return m_changes != before || watch.interrupted(); });
    }
}

ViStatus ResourceLocks::unlock(LockHolder holder)
{
    const std::lock_guard lock(m_mutex);
    const auto own = m_holders.find(holder);
    if (own == m_holders.end())
        return VI_ERROR_SESN_NLOCKED;
    Counts &counts = own->second;
    --(counts.exclusive > 0 ? counts.exclusive : counts.shared);
    const Counts left = counts;
    afterRelease(holder);
    if (left.exclusive > 0)
        return VI_SUCCESS_NESTED_EXCLUSIVE;
    return left.shared > 0 ? VI_SUCCESS_NESTED_SHARED : VI_SUCCESS;
}

void ResourceLocks::forget(LockHolder holder)
{
    const std::lock_guard lock(m_mutex);
    const auto own = m_holders.find(holder);
    if (own == m_holders.end())
        return;
    own->second = {};
    afterRelease(holder);
}

void ResourceLocks::afterRelease(LockHolder holder)
{
    const auto own = m_holders.find(holder);
    if (own->second.exclusive == 0 && m_exclusive == holder)
        m_exclusive = nullptr;
    if (own->second.exclusive == 0 && own->second.shared == 0)
        m_holders.erase(own);
    if (!anyShared())
        m_key.clear();
    m_machine.keep(m_exclusive != nullptr, anyShared());
    publish();
    ++m_changes;
    m_changed.notify_all();
}

bool ResourceLocks::anyShared() const
{
    return std::any_of(m_holders.begin(), m_holders.end(), [](const auto &entry) { return entry.second.shared > 0; });
}

void ResourceLocks::publish()
{
    m_anyLock.store(!m_holders.empty(), std::memory_order_release);
}

void ResourceLocks::wake()
{
    const std::lock_guard lock(m_mutex);
    m_changed.notify_all();
}

bool ResourceLocks::shutOut(LockHolder holder) const
{
    if (m_exclusive)
        return m_exclusive != holder;
    return !m_holders.empty() && m_holders.find(holder) == m_holders.end();
}

bool ResourceLocks::heldByOther(LockHolder holder) const
{
    if (!m_anyLock.load(std::memory_order_acquire))
        return m_machine.shutsOut(false);
    const std::lock_guard lock(m_mutex);
    if (shutOut(holder))
        return true;
    return m_exclusive != holder && m_machine.shutsOut(m_holders.find(holder) != m_holders.end());
}

int ResourceLocks::exclusiveCount(LockHolder holder) const
{
    const std::lock_guard lock(m_mutex);
    const auto own = m_holders.find(holder);
    return own == m_holders.end() ? 0 : own->second.exclusive;
}

ViAccessMode ResourceLocks::state() const
{
    const std::lock_guard lock(m_mutex);
    if (m_exclusive || m_machine.othersHoldExclusive())
        return VI_EXCLUSIVE_LOCK;
    return !m_holders.empty() || m_machine.othersShare() ? VI_SHARED_LOCK : VI_NO_LOCK;
}

std::shared_ptr<ResourceLocks> LockRegistry::locksOf(const std::string &canonicalName)
{
    std::string key = canonicalName;
    for (char &c : key)
        if (c >= 'A' && c <= 'Z')
            c = static_cast<char>(c - 'A' + 'a');
    const std::lock_guard lock(m_mutex);
    std::erase_if(m_locks, [](const auto &entry) { return entry.second.expired(); });
    if (auto known = m_locks[key].lock())
        return known;
    auto file = m_file.lock();
    if (!file) {
        file = std::make_shared<os::LockFile>(m_path);
        m_file = file;
    }
    auto locks = std::make_shared<ResourceLocks>(MachineLocks(file, key));
    m_locks[key] = locks;
    return locks;
}

void LockRegistry::forgetAll()
{
    m_locks.clear();
    if (const auto file = m_file.lock())
        file->abandon();
    m_file.reset();
}

} // namespace kyvisa
