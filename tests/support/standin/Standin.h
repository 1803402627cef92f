#pragma once

#include <visatype.h>

#include <chrono>
#include <condition_variable>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

/**
 * A VISA library for tests that does what it is told and remembers what it was asked.
 *
 * Untold, it is a friendly instrument: the resource manager is handle 1, sessions count from 2, find lists from 1001,
 * event contexts from 2001; a handle that is not open answers VI_ERROR_INV_OBJECT; writes take everything; a read
 * answers what setReply() promised for the last write, or times out; searches find addResource()'s resources;
 * attributes stick.
 *
 *     standin::reset();
 *     standin::script("viRead", {.status = VI_SUCCESS_TERM_CHAR, .bytes = "1.5\n"});
 *     ... the code under test reads ...
 *     EXPECT_EQ(standin::calls("viRead").at(0).numbers, ...);
 *
 * Every function may be called from any thread.
 */
namespace standin
{

/// Holds a call inside the library until the test lets it go.
class Gate
{
public:
    void open();
    /// Waits until a call stands at the gate. False when none came in time.
    bool waitForArrival(std::chrono::milliseconds timeout = std::chrono::seconds(10));

    void pass(); ///< called by the stand-in

private:
    std::mutex m_mutex;
    std::condition_variable m_changed;
    bool m_open = false;
    int m_arrived = 0;
};

/**
 * What one call does: wait, then answer.
 *
 * Without a status, or with one that is not negative and no outputs, the friendly behaviour follows (with that status).
 * Otherwise only the outputs given here are written, in the order of the operation's parameters; the others stay
 * untouched. Bytes are the data of viRead, the text of a text attribute, a description, an access key or the input of
 * viVScanf and viVQueryf. viRead counts the bytes itself unless numbers say otherwise, however false that is.
 */
struct Answer {
    std::optional<ViStatus> status = std::nullopt;
    std::string bytes = {};
    std::vector<std::uint64_t> numbers = {};
    std::chrono::microseconds delay{0};
    std::shared_ptr<Gate> gate = nullptr;
    std::function<void()> then = nullptr; ///< something that happens during the call, after the waiting
};

/// One call as it came in.
struct Call {
    std::string operation;
    std::uint32_t handle = 0;                ///< the first argument
    std::vector<std::uint64_t> numbers = {}; ///< the other input numbers and addresses, in order
    std::vector<std::string> texts = {};     ///< input texts and bytes, in order; viVPrintf: format, then the text made
    std::vector<std::uint64_t> outputsBefore =
        {}; ///< what the output numbers held on entry; the first byte of texts and attributes
};

/// A resource that searches find, with the text attributes that its find list answers.
struct Resource {
    std::string name;
    std::map<ViAttr, std::string> texts = {};
};

/// Back to a friendly instrument with nothing scripted, recorded or open.
void reset();

/// Forgets the calls recorded so far and nothing else.
void forgetCalls();

/// Queues an answer for the next call of @p operation that finds none queued before it.
void script(const std::string &operation, Answer answer);
/// Answers of @p operation that no call has taken yet.
std::size_t pending(const std::string &operation);

/// A read after a write of @p command (without its line end) answers @p reply.
void setReply(const std::string &command, const std::string &reply);
void addResource(Resource resource);
/// @p width: bytes that viGetAttribute writes, as the attribute's type has them.
void setAttribute(ViAttr attribute, std::uint64_t value, unsigned width = 4);
void setTextAttribute(ViAttr attribute, const std::string &text);

/// Calls the handlers installed for @p type on @p vi, on a thread of its own; returns when they have returned.
void fireEvent(ViSession vi, ViEventType type);

std::vector<Call> calls();
std::vector<Call> calls(const std::string &operation);
/// Names of the operations called, in order.
std::vector<std::string> operations();
/// Waits until @p operation was called @p count times. False when it was not in time.
bool waitForCalls(const std::string &operation, std::size_t count,
                  std::chrono::milliseconds timeout = std::chrono::seconds(10));
/// Handles that are open now, the resource manager once for each time it was opened.
std::size_t openObjects();

} // namespace standin
