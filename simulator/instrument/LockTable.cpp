#include "simulator/instrument/LockTable.h"

#include "simulator/instrument/Timers.h"

#include <algorithm>
#include <utility>

namespace simulator
{

LockTable::Owner LockTable::join(std::function<void()> changed, TrafficLog::Client *traffic)
{
    m_clients.emplace(++m_lastOwner, Client{std::move(changed), traffic});
    return m_lastOwner;
}

void LockTable::leave(Owner owner)
{
    if (const auto wait = waitOf(owner); wait != m_waits.end()) {
        m_timers.cancel(wait->timer);
        m_waits.erase(wait);
    }
    while (release(owner) != Released::Nothing)
        continue;
    m_clients.erase(owner);
}

void LockTable::tell(Owner owner, const std::string &key, Answer answer) const
{
    if (TrafficLog::Client *traffic = m_clients.at(owner).traffic)
        traffic->lock("lock", key,
                      answer == Answer::Granted  ? "granted"
                      : answer == Answer::Failed ? "not granted"
                                                 : "held or asked for already");
}

void LockTable::tellRelease(Owner owner, const std::string &key) const
{
    if (TrafficLog::Client *traffic = m_clients.at(owner).traffic)
        traffic->lock("unlock", key, {});
}

void LockTable::request(Owner owner, const std::string &key, std::chrono::milliseconds timeout, AnswerAction answer)
{
    const Client &client = m_clients.at(owner);
    const auto told = [&](Answer result) {
        tell(owner, key, result);
        answer(result);
    };
    const bool held = m_exclusive == owner || (!key.empty() && client.shares);
    if (held || waitOf(owner) != m_waits.end())
        return told(Answer::Error);
    if (!overtakes(key) && grant(owner, key))
        return told(Answer::Granted);
    if (timeout.count() <= 0)
        return told(Answer::Failed);
    const Timers::Id timer = m_timers.after(timeout, [this, owner] { endWait(owner); });
    m_waits.push_back({owner, key, timer, std::move(answer)});
}

void LockTable::endWait(Owner owner)
{
    const auto wait = waitOf(owner);
    if (wait == m_waits.end())
        return;
    m_timers.cancel(wait->timer);
    const AnswerAction answer = std::move(wait->answer);
    tell(owner, wait->key, Answer::Failed);
    m_waits.erase(wait);
    answer(Answer::Failed);
}

LockTable::Released LockTable::release(Owner owner)
{
    if (m_exclusive == owner) {
        m_exclusive = NoOwner;
        tellRelease(owner, {});
        changed();
        return Released::Exclusive;
    }
    Client &client = m_clients.at(owner);
    if (!client.shares)
        return Released::Nothing;
    client.shares = false;
    --m_sharers;
    tellRelease(owner, m_key);
    changed();
    return Released::Shared;
}

bool LockTable::isFree(Owner owner, const std::string &key) const
{
    if (m_exclusive != NoOwner)
        return false;
    return m_sharers == 0 || (key.empty() ? m_clients.at(owner).shares : key == m_key);
}

/// The lock has come free for somebody who waits, and the word of it is still on its way.
bool LockTable::overtakes(const std::string &key) const
{
    return std::any_of(m_waits.begin(), m_waits.end(), [&](const Wait &wait) {
        const bool together = !key.empty() && wait.key == key;
        return !together && isFree(wait.owner, wait.key);
    });
}

bool LockTable::grant(Owner owner, const std::string &key)
{
    if (!isFree(owner, key))
        return false;
    if (key.empty()) {
        m_exclusive = owner;
        return true;
    }
    m_key = key;
    m_clients.at(owner).shares = true;
    ++m_sharers;
    return true;
}

void LockTable::changed()
{
    if (std::exchange(m_changeIsDue, true))
        return;
    m_timers.after({}, [this] { tellChange(); });
}

void LockTable::tellChange()
{
    m_changeIsDue = false;
    for (auto wait = m_waits.begin(); wait != m_waits.end();) {
        if (!grant(wait->owner, wait->key)) {
            ++wait;
            continue;
        }
        m_timers.cancel(wait->timer);
        const AnswerAction answer = std::move(wait->answer);
        tell(wait->owner, wait->key, Answer::Granted);
        m_waits.erase(wait);
        answer(Answer::Granted);
        wait = m_waits.begin(); // the answer may have changed the list
    }
    // A client that is told may leave, or let others leave.
    for (auto client = m_clients.begin(); client != m_clients.end();) {
        const Owner owner = client->first;
        const std::function<void()> tell = client->second.changed;
        tell();
        client = m_clients.upper_bound(owner);
    }
}

bool LockTable::allows(Owner owner) const
{
    if (m_exclusive != NoOwner)
        return m_exclusive == owner;
    return m_sharers == 0 || m_clients.at(owner).shares;
}

std::size_t LockTable::holders() const
{
    const bool alone = m_exclusive != NoOwner && !m_clients.at(m_exclusive).shares;
    return m_sharers + (alone ? 1 : 0);
}

std::list<LockTable::Wait>::iterator LockTable::waitOf(Owner owner)
{
    return std::find_if(m_waits.begin(), m_waits.end(), [=](const Wait &wait) { return wait.owner == owner; });
}

} // namespace simulator
