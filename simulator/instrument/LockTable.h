#pragma once

#include "simulator/traffic/TrafficLog.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <list>
#include <map>
#include <string>

namespace simulator
{

class Timers;

/**
 * The locks of the instrument, for the clients of all protocols: an exclusive one, and one that the owners of the same key share. A holder of the
 * shared lock may take the exclusive one on top of it; then the other sharers are shut out too.
 *
 * Requests that cannot be granted wait in the order in which they came. Answers to requests that waited, and the word that somebody's input may
 * go on, come from a timer, never from inside a call.
 */
class LockTable
{
public:
    using Owner = std::uint64_t;
    enum class Answer : std::uint8_t { Failed, Granted, Error };
    enum class Released : std::uint8_t { Nothing, Exclusive, Shared };
    using AnswerAction = std::function<void(Answer)>;

    explicit LockTable(Timers &timers) : m_timers(timers) {}

    /// A client comes. @p changed is called after each change of the locks; @p traffic, when there is one, is told of this client's.
    Owner join(std::function<void()> changed, TrafficLog::Client *traffic = nullptr);
    /// It goes: what it holds is free, what it waits for is forgotten.
    void leave(Owner owner);

    /// Asks for the exclusive lock (empty @p key) or a shared one. Error: held already, or another request still waits.
    void request(Owner owner, const std::string &key, std::chrono::milliseconds timeout, AnswerAction answer);
    /// Ends a wait before its time: Failed.
    void endWait(Owner owner);
    /// Gives up the exclusive lock, or when there is none the shared one.
    Released release(Owner owner);

    /// False while another client's lock shuts this one out.
    bool allows(Owner owner) const;
    bool exclusivelyLocked() const { return m_exclusive != NoOwner; }
    std::size_t holders() const;

private:
    static constexpr Owner NoOwner = 0;

    struct Client {
        std::function<void()> changed;
        TrafficLog::Client *traffic = nullptr;
        bool shares = false;
    };
    struct Wait {
        Owner owner;
        std::string key;
        std::uint64_t timer;
        AnswerAction answer;
    };

    void tell(Owner owner, const std::string &key, Answer answer) const;
    void tellRelease(Owner owner, const std::string &key) const;
    bool isFree(Owner owner, const std::string &key) const;
    bool grant(Owner owner, const std::string &key);
    bool overtakes(const std::string &key) const;
    void changed();
    void tellChange();
    std::list<Wait>::iterator waitOf(Owner owner);

    Timers &m_timers;
    Owner m_lastOwner = NoOwner;
    std::map<Owner, Client> m_clients;
    Owner m_exclusive = NoOwner;
    std::string m_key;
    std::size_t m_sharers = 0;
    std::list<Wait> m_waits;
    bool m_changeIsDue = false;
};

} // namespace simulator
