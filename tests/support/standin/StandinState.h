#pragma once

#include "support/standin/Standin.h"

#include <deque>
#include <set>

/// What lies behind Standin.h. One instance; every access holds its mutex.
namespace standin
{

struct AttributeValue {
    std::uint64_t number = 0;
    unsigned width = 4;
    std::string text = {};
};

struct FindList {
    std::size_t position = 0; ///< of the resource found last
};

struct Handler {
    ViSession vi;
    ViEventType type;
    ViHndlr handler;
    ViAddr userHandle;
};

struct State {
    static State &instance();

    void clear();
    bool isOpen(ViObject object) const;
    /// The value that @p object has for @p attribute, or null.
    const AttributeValue *attribute(ViObject object, ViAttr attribute);

    std::mutex mutex;
    std::condition_variable called;

    std::map<std::string, std::deque<Answer>> scripts;
    std::vector<Call> calls;

    unsigned managers;                         ///< times the resource manager is open
    std::map<ViSession, std::string> sessions; ///< with the resource name given
    std::map<ViFindList, FindList> findLists;
    std::set<ViEvent> contexts;
    ViSession nextSession;
    ViFindList nextFindList;
    ViEvent nextContext;

    std::vector<Resource> resources;
    std::map<std::string, std::string> replies;
    std::string unread; ///< what the next read answers
    std::map<ViAttr, AttributeValue> attributes;
    AttributeValue scratch; ///< holds an answer that is made up on the spot
    std::vector<Handler> handlers;

private:
    State() { clear(); }
};

/// Records @p call, then waits as its answer says. An answer without a status is one that was not scripted.
Answer enter(Call call);

/// True when the friendly behaviour is to follow.
inline bool isFriendly(const Answer &answer)
{
    return !answer.status || (*answer.status >= 0 && answer.bytes.empty() && answer.numbers.empty());
}

/// Hook of the shared library, called on entry of every operation before anything else. Does nothing when linked
/// statically.
void entered(const char *operation);

inline std::string textOf(const char *text)
{
    return text != nullptr ? text : "";
}

/// Writes the n-th scripted number, if there is one.
template <typename Number>
void putNumber(Number *target, const Answer &answer, std::size_t n)
{
    if (target != nullptr && n < answer.numbers.size())
        *target = static_cast<Number>(answer.numbers[n]);
}

/// Copies @p text with its terminating zero.
void copyText(ViChar *target, const std::string &text);

} // namespace standin
