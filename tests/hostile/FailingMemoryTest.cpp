// The library when memory runs out: the first, the second, the third allocation of every call fails, and so on until the call needs no
// more. A program of its own: it replaces the allocation functions, for the library too.
#include "hostile/Ways.h"

#include <atomic>
#include <cstdlib>
#include <functional>
#include <gtest/gtest.h>
#include <new>

namespace
{

thread_local long s_left = -1; ///< allocations of this thread that still succeed; negative: all of them
thread_local bool s_failed = false;

void *allocate(std::size_t size)
{
    if (s_left == 0) {
        s_left = -1;
        s_failed = true;
        return nullptr;
    }
    if (s_left > 0)
        --s_left;
    return std::malloc(size != 0 ? size : 1);
}

} // namespace

void *operator new(std::size_t size)
{
    void *memory = allocate(size);
    if (!memory)
        throw std::bad_alloc();
    return memory;
}
void *operator new[](std::size_t size)
{
    return operator new(size);
}
void *operator new(std::size_t size, const std::nothrow_t &) noexcept
{
    return allocate(size);
}
void *operator new[](std::size_t size, const std::nothrow_t &) noexcept
{
    return allocate(size);
}
void operator delete(void *memory) noexcept
{
    std::free(memory);
}
void operator delete(void *memory, std::size_t) noexcept
{
    std::free(memory);
}
void operator delete[](void *memory) noexcept
{
    std::free(memory);
}
void operator delete[](void *memory, std::size_t) noexcept
{
    std::free(memory);
}

namespace hostile
{
namespace
{

constexpr ViUInt32 Long = 30000; // milliseconds
constexpr int MostAllocations = 2000;

class FailingMemory : public testing::TestWithParam<Way>
{
protected:
    FailingMemory() { EXPECT_EQ(viOpenDefaultRM(&m_manager), VI_SUCCESS); }
    ~FailingMemory() override { viClose(m_manager); }

    ViStatus open(ViSession &session)
    {
        return viOpen(m_manager, m_instrument.resource().c_str(), VI_NULL, Long, &session);
    }

    /// An open session that reads whole answers.
    ViSession opened()
    {
        ViSession session = VI_NULL;
        EXPECT_EQ(open(session), VI_SUCCESS);
        EXPECT_EQ(viSetAttribute(session, VI_ATTR_TMO_VALUE, Long), VI_SUCCESS);
        if (!GetParam().hasEnd) {
            EXPECT_EQ(viSetAttribute(session, VI_ATTR_TERMCHAR_EN, VI_TRUE), VI_SUCCESS);
            EXPECT_EQ(viSetAttribute(session, VI_ATTR_IO_PROT, VI_PROT_4882_STRS), VI_SUCCESS);
        }
        return session;
    }

    static ViStatus write(ViSession session, const std::string &text)
    {
        return viWrite(session, reinterpret_cast<ViConstBuf>(text.data()), static_cast<ViUInt32>(text.size()), nullptr);
    }
    static std::string read(ViSession session)
    {
        std::string text(1024, '\0');
        ViUInt32 count = 0;
        EXPECT_GE(viRead(session, reinterpret_cast<ViPBuf>(text.data()), 1024, &count), VI_SUCCESS);
        return text.substr(0, count);
    }

    /// Runs @p call with its first allocation failing, then its second, until it gets all it asks for.
    /// @p before and @p after set the stage each time; what @p call answers with all its memory must be a success.
    void failEach(const char *what, const std::function<void()> &before, const std::function<ViStatus()> &call,
                  const std::function<void(ViStatus)> &after)
    {
        for (int allowed = 0; allowed < MostAllocations; ++allowed) {
            m_instrument.awaitSerialLine();
            before();
            s_failed = false;
            s_left = allowed;
            const ViStatus status = call();
            s_left = -1;
            const bool failed = s_failed;
            s_failed = false;
            if (failed) { // what is not needed may be done without
                EXPECT_TRUE(status == VI_ERROR_ALLOC || status >= VI_SUCCESS)
                    << what << " answers " << std::hex << status << " when allocation " << std::dec << allowed + 1
                    << " fails";
            } else {
                EXPECT_GE(status, VI_SUCCESS) << what;
            }
            after(status);
            if (!failed)
                return;
        }
        ADD_FAILURE() << what << " never has enough";
    }

    /// The same for a call on an open session, which must work afterwards.
    void failEachOnSession(const char *what, const std::function<void(ViSession)> &before,
                           const std::function<ViStatus(ViSession)> &call)
    {
        ViSession session = VI_NULL;
        failEach(
            what,
            [&] {
                session = opened();
                before(session);
            },
            [&] { return call(session); },
            [&](ViStatus) {
                viUnlock(session); // where there was a lock
                EXPECT_EQ(viClear(session), VI_SUCCESS) << what;
                EXPECT_EQ(write(session, "*ESE 5;*ESE?\n"), VI_SUCCESS) << what;
                std::string answer = read(session);
                // On a stream the answer to what was cleared may still come.
                for (int i = 0; i < 3 && answer != "5\n" && !GetParam().hasEnd; ++i)
                    answer = read(session);
                EXPECT_EQ(answer, "5\n") << what;
                EXPECT_EQ(viClose(session), VI_SUCCESS) << what;
            });
    }

    Instrument m_instrument{GetParam()};
    ViSession m_manager = VI_NULL;
};

const auto Nothing = [](ViSession) {};

INSTANTIATE_TEST_SUITE_P(Over, FailingMemory, testing::ValuesIn(ways()), nameOf);

TEST_P(FailingMemory, OpeningAndClosingLeaveNothingBehind)
{
    ViSession session = opened();
    EXPECT_EQ(viClose(session), VI_SUCCESS);
    const std::size_t descriptors = entries("/proc/self/fd");
    failEach(
        "viOpen", [] {}, [&] { return open(session); },
        [&](ViStatus status) {
            if (status >= VI_SUCCESS) {
                EXPECT_EQ(viClose(session), VI_SUCCESS);
            }
            EXPECT_EQ(entries("/proc/self/fd"), descriptors);
        });
    failEach(
        "viClose", [&] { session = opened(); }, [&] { return viClose(session); },
        [&](ViStatus status) {
            if (status < VI_SUCCESS) {
                EXPECT_EQ(viClose(session), VI_SUCCESS);
            }
            EXPECT_EQ(entries("/proc/self/fd"), descriptors);
        });
    ViSession manager = VI_NULL;
    failEach(
        "viOpenDefaultRM", [] {}, [&] { return viOpenDefaultRM(&manager); },
        [&](ViStatus status) {
            if (status >= VI_SUCCESS) {
                EXPECT_EQ(viClose(manager), VI_SUCCESS);
            }
        });
}

TEST_P(FailingMemory, MessagesFailAloneAndTheSessionGoesOn)
{
    failEachOnSession("viWrite", Nothing, [](ViSession session) { return write(session, "*CLS\n"); });
    failEachOnSession(
        "viRead", [](ViSession session) { EXPECT_EQ(write(session, "*IDN?\n"), VI_SUCCESS); },
        [](ViSession session) {
            char text[256];
            return viRead(session, reinterpret_cast<ViPBuf>(text), sizeof text, nullptr);
        });
    failEachOnSession("viReadSTB", Nothing, [](ViSession session) {
        ViUInt16 status = 0;
        return viReadSTB(session, &status);
    });
    failEachOnSession("viAssertTrigger", Nothing,
                      [](ViSession session) { return viAssertTrigger(session, VI_TRIG_PROT_DEFAULT); });
    failEachOnSession("viClear", Nothing, [](ViSession session) { return viClear(session); });
}

TEST_P(FailingMemory, FormattedMessagesFailAloneAndTheSessionGoesOn)
{
    failEachOnSession("viPrintf", Nothing, [](ViSession session) {
        return viPrintf(session, const_cast<ViString>("*ESE %d;*SRE %s\n"), 4, "0");
    });
    failEachOnSession(
        "viScanf", [](ViSession session) { EXPECT_EQ(write(session, "*ESE 17;*ESE?\n"), VI_SUCCESS); },
        [](ViSession session) {
            int value = 0;
            return viScanf(session, const_cast<ViString>("%d"), &value);
        });
    failEachOnSession("viQueryf", Nothing, [](ViSession session) {
        char text[256] = "";
        return viQueryf(session, const_cast<ViString>("*IDN?\n"), const_cast<ViString>("%255s"), text);
    });
}

TEST_P(FailingMemory, LocksFailAloneAndAreFreeAfterwards)
{
    failEachOnSession("viLock", Nothing,
                      [](ViSession session) { return viLock(session, VI_EXCLUSIVE_LOCK, Long, nullptr, nullptr); });
    failEachOnSession("viLock shared", Nothing, [](ViSession session) {
        char key[256] = "";
        return viLock(session, VI_SHARED_LOCK, Long, const_cast<ViString>("key"), key);
    });
    failEachOnSession(
        "viUnlock",
        [](ViSession session) { EXPECT_EQ(viLock(session, VI_EXCLUSIVE_LOCK, Long, nullptr, nullptr), VI_SUCCESS); },
        [](ViSession session) { return viUnlock(session); });
}

TEST_P(FailingMemory, EventsFailAloneAndTheSessionGoesOn)
{
    if (!GetParam().hasServiceRequests)
        return; // and so no events that an instrument makes
    failEachOnSession("viEnableEvent", Nothing, [](ViSession session) {
        return viEnableEvent(session, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL);
    });
    failEachOnSession(
        "viWaitOnEvent",
        [](ViSession session) {
            EXPECT_EQ(viEnableEvent(session, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL), VI_SUCCESS);
            EXPECT_EQ(write(session, "*CLS;*ESE 1;*SRE 32;*OPC\n"), VI_SUCCESS);
        },
        [](ViSession session) {
            ViEvent context = VI_NULL;
            const ViStatus status = viWaitOnEvent(session, VI_EVENT_SERVICE_REQ, Long, nullptr, &context);
            if (status >= VI_SUCCESS)
                viClose(context);
            ViUInt16 byte = 0;
            s_left = -1; // the rest sets the stage for the next one
            write(session, "*CLS;*SRE 0\n");
            viReadSTB(session, &byte);
            return status;
        });
}

TEST_P(FailingMemory, AttributesFailAloneAndTheSessionGoesOn)
{
    failEachOnSession("viGetAttribute", Nothing, [](ViSession session) {
        char text[256];
        return viGetAttribute(session, VI_ATTR_RSRC_NAME, text);
    });
    failEachOnSession("viSetAttribute", Nothing,
                      [](ViSession session) { return viSetAttribute(session, VI_ATTR_USER_DATA, 7); });
    failEachOnSession("viStatusDesc", Nothing, [](ViSession session) {
        char text[256];
        return viStatusDesc(session, VI_ERROR_TMO, text);
    });
}

} // namespace
} // namespace hostile
