// The library when the system says no: each system call fails once, wherever in an ordinary conversation it comes, with each error that it
// is known for. The calls of that conversation succeed or say clearly what happened, nothing is left behind, the next session works.
#include "hostile/Ways.h"
#include "kyvisa/os/SystemCalls.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <gtest/gtest.h>
#include <string_view>
#include <thread>

namespace hostile
{
namespace
{

using kyvisa::os::realSystemCalls;
using kyvisa::os::ReplacedSystemCalls;
using kyvisa::os::SystemCalls;

constexpr ViUInt32 Long = 30000;   // milliseconds
constexpr int MostOccasions = 400; ///< of one call in a conversation

/// What is to fail next, and whether it has.
struct Plan {
    std::atomic<int> left{0}; ///< calls until the one that fails; 0: none does
    std::atomic<int> error{0};
    std::atomic<bool> afterwards{false}; ///< the call does its work and says otherwise
    std::atomic<bool> struck{false};
} g_plan;

template <auto Member>
struct Failing;
template <typename Result, typename... Arguments, Result (*SystemCalls::*Member)(Arguments...)>
struct Failing<Member> {
    static Result call(Arguments... arguments)
    {
        const auto real = realSystemCalls().*Member;
        if (g_plan.left == 0 || --g_plan.left != 0)
            return real(arguments...);
        g_plan.struck = true;
        if (g_plan.afterwards)
            real(arguments...);
        errno = g_plan.error;
        return static_cast<Result>(-1);
    }
    static void install(SystemCalls &calls) { calls.*Member = call; }
};

struct Row {
    const char *name;
    void (*install)(SystemCalls &calls);
    std::vector<int> errors;
    bool afterwards = false;
};

const std::vector<Row> Rows = {
    {"socket", Failing<&SystemCalls::socket>::install, {EMFILE, ENFILE, ENOBUFS, ENOMEM, EACCES}},
    {"connect", Failing<&SystemCalls::connect>::install, {ECONNREFUSED, ENETUNREACH, ETIMEDOUT, EADDRNOTAVAIL, EACCES}},
    {"connect, interrupted", Failing<&SystemCalls::connect>::install, {EINTR}, true},
    {"poll", Failing<&SystemCalls::poll>::install, {EINTR, ENOMEM}},
    {"recv", Failing<&SystemCalls::recv>::install, {EINTR, EAGAIN, ECONNRESET, ETIMEDOUT, ENOMEM, ENOBUFS}},
    {"sendmsg", Failing<&SystemCalls::sendmsg>::install, {EINTR, EAGAIN, ECONNRESET, EPIPE, ENOMEM, ENOBUFS}},
    {"setsockopt", Failing<&SystemCalls::setsockopt>::install, {ENOPROTOOPT, ENOMEM}},
    {"getsockopt", Failing<&SystemCalls::getsockopt>::install, {ENOBUFS}},
    {"eventfd", Failing<&SystemCalls::eventfd>::install, {EMFILE, ENFILE, ENOMEM}},
    {"shutdown", Failing<&SystemCalls::shutdown>::install, {ENOTCONN}},
    {"close", Failing<&SystemCalls::close>::install, {EINTR, EIO}, true},
    {"bind", Failing<&SystemCalls::bind>::install, {EADDRINUSE, EACCES}},
    {"listen", Failing<&SystemCalls::listen>::install, {EADDRINUSE}},
    {"accept4", Failing<&SystemCalls::accept4>::install, {EINTR, ECONNABORTED, EMFILE, ENOMEM}},
    {"open", Failing<&SystemCalls::open>::install, {EINTR, EMFILE, EACCES, EIO}},
    {"ioctl", Failing<&SystemCalls::ioctl>::install, {EINTR, EIO, ENOTTY}},
    {"read", Failing<&SystemCalls::read>::install, {EINTR, EAGAIN, EIO}},
    {"write", Failing<&SystemCalls::write>::install, {EINTR, EAGAIN, EIO}},
    {"flock", Failing<&SystemCalls::flock>::install, {EINTR, ENOLCK}},
    {"lockFile", Failing<&SystemCalls::lockFile>::install, {EINTR, ENOLCK, EAGAIN}},
    {"getaddrinfo", Failing<&SystemCalls::getaddrinfo>::install, {ENOMEM}},
};

/// Neither a signal nor a call that would have to wait is an error.
bool isNone(int error)
{
    return error == EINTR || error == EAGAIN;
}

/// @param what the call that answered it
bool isClear(ViStatus status, const std::string &what)
{
    // A lock that no other process would see is worse than none, and there is no better status for it.
    if (status == VI_ERROR_SYSTEM_ERROR)
        return what == "viLock";
    constexpr std::array Clear = {VI_ERROR_ALLOC,       VI_ERROR_IO,        VI_ERROR_CONN_LOST, VI_ERROR_RSRC_NFOUND,
                                  VI_ERROR_NPERMISSION, VI_ERROR_INV_SETUP, VI_ERROR_RSRC_BUSY};
    return std::find(Clear.begin(), Clear.end(), status) != Clear.end();
}

class FailingSystemCalls : public testing::TestWithParam<Way>
{
protected:
    FailingSystemCalls() { EXPECT_EQ(viOpenDefaultRM(&m_manager), VI_SUCCESS); }
    ~FailingSystemCalls() override { viClose(m_manager); }

    /// Takes a status of the conversation. False when that ends it.
    bool went(const char *what, ViStatus status)
    {
        m_last = what;
        m_status = status;
        return status >= VI_SUCCESS;
    }

    bool query(ViSession session)
    {
        const std::string question = "*IDN?\n";
        if (!went("viWrite", viWrite(session, reinterpret_cast<ViConstBuf>(question.data()),
                                     static_cast<ViUInt32>(question.size()), nullptr)))
            return false;
        char text[1024];
        ViUInt32 count = 0;
        if (!went("viRead", viRead(session, reinterpret_cast<ViPBuf>(text), sizeof text, &count)))
            return false;
        EXPECT_TRUE(std::string(text, count).starts_with("Oltrava,KyVisaSimulator,")) << std::string(text, count);
        return true;
    }

    bool talk(ViSession session)
    {
        if (!went("viSetAttribute", viSetAttribute(session, VI_ATTR_TMO_VALUE, Long)))
            return false;
        if (!GetParam().hasEnd &&
            (!went("viSetAttribute", viSetAttribute(session, VI_ATTR_TERMCHAR_EN, VI_TRUE)) ||
             !went("viSetAttribute", viSetAttribute(session, VI_ATTR_IO_PROT, VI_PROT_4882_STRS))))
            return false;
        ViUInt16 byte = 0;
        if (!query(session) || !went("viReadSTB", viReadSTB(session, &byte)) ||
            (m_clears && !went("viClear", viClear(session))) ||
            !went("viAssertTrigger", viAssertTrigger(session, VI_TRIG_PROT_DEFAULT)))
            return false;
        if (!went("viLock", viLock(session, VI_EXCLUSIVE_LOCK, Long, nullptr, nullptr)) ||
            !went("viUnlock", viUnlock(session)))
            return false;
        if (GetParam().hasServiceRequests &&
            !went("viEnableEvent", viEnableEvent(session, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL)))
            return false;
        return query(session);
    }

    /// Opens, talks until a call fails, closes. The status of the last call.
    ViStatus converse()
    {
        ViSession session = VI_NULL;
        if (went("viOpen", viOpen(m_manager, m_instrument.resource().c_str(), VI_NULL, Long, &session))) {
            talk(session);
            const ViStatus closed = viClose(session);
            EXPECT_EQ(closed, VI_SUCCESS) << "viClose";
        }
        return m_status;
    }

    /// On a serial line an answer that nobody took may come to whoever is next: takes what comes up to a word of its own.
    void settleLine()
    {
        ViSession session = VI_NULL;
        ASSERT_EQ(viOpen(m_manager, m_instrument.resource().c_str(), VI_NULL, Long, &session), VI_SUCCESS);
        viSetAttribute(session, VI_ATTR_TMO_VALUE, Long);
        const std::string question = "\n*ESE 77;*ESE?\n";
        EXPECT_EQ(viWrite(session, reinterpret_cast<ViConstBuf>(question.data()),
                          static_cast<ViUInt32>(question.size()), nullptr),
                  VI_SUCCESS);
        std::string line;
        for (int i = 0; i < 10 && line != "77\n"; ++i) {
            char text[1024];
            ViUInt32 count = 0;
            EXPECT_GE(viRead(session, reinterpret_cast<ViPBuf>(text), sizeof text, &count), VI_SUCCESS);
            line.assign(text, count);
        }
        EXPECT_EQ(line, "77\n");
        viClose(session);
    }

    /// Lets the row's call fail with @p error, the first time that it is made, then the second, and so on.
    void failEach(const Row &row, int error)
    {
        static SystemCalls calls;
        calls = realSystemCalls();
        row.install(calls);
        const std::size_t descriptors = entries("/proc/self/fd");
        for (int nth = 1; nth <= MostOccasions; ++nth) {
            SCOPED_TRACE(std::string(row.name) + " fails with " + std::to_string(error) + " at time " +
                         std::to_string(nth));
            m_clears = !isSerial() || std::string_view(row.name) == "ioctl";
            m_instrument.awaitSerialLine();
            g_plan.struck = false;
            g_plan.error = error;
            g_plan.afterwards = row.afterwards;
            g_plan.left = nth;
            ViStatus status = VI_SUCCESS;
            {
                const ReplacedSystemCalls replaced(calls);
                status = converse();
                g_plan.left = 0;
            }
            if (isNone(error) || !g_plan.struck) {
                EXPECT_GE(status, VI_SUCCESS) << m_last << std::hex << " " << status;
            } else {
                EXPECT_TRUE(status >= VI_SUCCESS || isClear(status, m_last))
                    << m_last << " answers " << std::hex << status;
            }
            EXPECT_EQ(entries("/proc/self/fd"), descriptors);
            if (!g_plan.struck)
                return;
            m_clears = !isSerial();
            if (isSerial()) {
                m_instrument.awaitSerialLine();
                settleLine();
                m_instrument.awaitSerialLine();
            }
            EXPECT_GE(converse(), VI_SUCCESS) << "the next session: " << m_last;
            if (HasFailure())
                return;
        }
    }

    /// A clear sends a break there, which takes a quarter of a second each time.
    static bool isSerial() { return std::string_view(GetParam().service) == "serial"; }

    Instrument m_instrument{GetParam()};
    ViSession m_manager = VI_NULL;
    bool m_clears = true;
    const char *m_last = "";
    ViStatus m_status = VI_SUCCESS;
};

INSTANTIATE_TEST_SUITE_P(Over, FailingSystemCalls, testing::ValuesIn(ways()), nameOf);

TEST_P(FailingSystemCalls, EndAConversationClearlyAndLeaveNothing)
{
    ASSERT_GE(converse(), VI_SUCCESS) << m_last; // makes what is made once
    int occasions = 0;
    for (const Row &row : Rows)
        for (const int error : row.errors) {
            failEach(row, error);
            occasions += g_plan.struck ? 1 : 0;
        }
    EXPECT_EQ(occasions, 0) << "some call is made more often than was tried";
}

} // namespace
} // namespace hostile
