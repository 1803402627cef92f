#include "kyvisa/core/ResourceLocks.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/os/UniqueText.h"

#include <algorithm>

namespace kyvisa
{

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

ViStatus ResourceLocks::grant(LockHolder holder, ViAccessMode type, const std::string &requested, std::string &granted)
{
    Counts &counts = m_holders[holder];
    if (type == VI_EXCLUSIVE_LOCK) {
        m_exclusive = holder;
        publish();
        return ++counts.exclusive == 1 ? VI_SUCCESS : VI_SUCCESS_NESTED_EXCLUSIVE;
    }
    if (m_key.empty())
        m_key = requested.empty() ? os::uniqueText() : requested;
    granted = m_key;
    publish();
    return ++counts.shared == 1 ? VI_SUCCESS : VI_SUCCESS_NESTED_SHARED;
}

ViStatus ResourceLocks::lock(LockHolder holder, ViAccessMode type, ViUInt32 timeout, const std::string &requested,
                             const std::atomic<bool> &closing, std::string &granted)
{
    const os::Deadline deadline = os::Deadline::afterVisaTimeout(timeout);
    std::unique_lock lock(m_mutex);
    Verdict verdict = judge(holder, type, requested);
    if (verdict == Verdict::Wait) {
        if (timeout == VI_TMO_IMMEDIATE)
            return VI_ERROR_RSRC_LOCKED;
        const bool decided = os::waitUntil(m_changed, lock, deadline, [&] {
            verdict = judge(holder, type, requested);
            return verdict != Verdict::Wait || closing.load();
        });
        if (!decided)
            return VI_ERROR_TMO;
    }
    if (closing.load())
        return VI_ERROR_INV_OBJECT;
    switch (verdict) {
    case Verdict::Locked:
        return VI_ERROR_RSRC_LOCKED;
    case Verdict::InvalidKey:
        return VI_ERROR_INV_ACCESS_KEY;
    default:
        return grant(holder, type, requested, granted);
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
    const bool anyShared =
        std::any_of(m_holders.begin(), m_holders.end(), [](const auto &entry) { return entry.second.shared > 0; });
    if (!anyShared)
        m_key.clear();
    publish();
    m_changed.notify_all();
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
        return false;
    const std::lock_guard lock(m_mutex);
    return shutOut(holder);
}

bool ResourceLocks::awaitAccess(LockHolder holder, os::Deadline deadline, const std::function<bool()> &givenUp)
{
    std::unique_lock lock(m_mutex);
    os::waitUntil(m_changed, lock, deadline, [&] { return !shutOut(holder) || givenUp(); });
    return !shutOut(holder);
}

ViAccessMode ResourceLocks::state() const
{
    const std::lock_guard lock(m_mutex);
    if (m_exclusive)
        return VI_EXCLUSIVE_LOCK;
    return m_holders.empty() ? VI_NO_LOCK : VI_SHARED_LOCK;
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
    auto locks = std::make_shared<ResourceLocks>();
    m_locks[key] = locks;
    return locks;
}

} // namespace kyvisa
