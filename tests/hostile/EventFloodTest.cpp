// Thousands of service requests: every one reaches the handler and has its line, what nobody fetches from the queue does not pile up.
#include "hostile/TesterSession.h"
#include "hostile/Ways.h"
#include "support/ProcessFigures.h"
#include "visa/CallBackLog.h"

#include <chrono>
#include <gtest/gtest.h>
#include <thread>
#include <unistd.h>

namespace hostile
{
namespace
{

constexpr unsigned Long = 30000; // milliseconds
constexpr unsigned Events = 5000;
constexpr unsigned QueueLength = 50;            ///< as long as nobody asks for another
constexpr std::size_t AllowedGrowth = 4 * 1024; // KiB

#ifdef __SANITIZE_ADDRESS__
constexpr bool FreedMemoryIsKept = true;
#else
constexpr bool FreedMemoryIsKept = false;
#endif

std::vector<Way> waysWithServiceRequests()
{
    std::vector<Way> some = ways();
    std::erase_if(some, [](const Way &way) { return !way.hasServiceRequests; });
    return some;
}

class EventFlood : public testing::TestWithParam<Way>
{
};

INSTANTIATE_TEST_SUITE_P(Over, EventFlood, testing::ValuesIn(waysWithServiceRequests()), nameOf);

TEST_P(EventFlood, ReachesTheHandlerAndIsBoundedInTheQueue)
{
    const Instrument instrument(GetParam());
    const auto log = std::make_unique<Log>(nullptr); // large: not on the stack
    SessionLog callbackLines{log.get(), nullptr};
    CallBackLog::createCallBackLog(&callbackLines); // its lines are shown whatever is switched off
    const std::size_t before = entries("/proc/self/fd");
    {
        TesterSession session;
        session.open(instrument.resource(), Long);
        session->setTimeout(Long);
        session->installHandler(VI_EVENT_SERVICE_REQ, CallBackLog::viEventHandler, nullptr);
        session->enableEvent(VI_EVENT_SERVICE_REQ, VI_QUEUE | VI_HNDLR, VI_NULL);
        test::ProcessFigures warm;
        for (unsigned i = 1; i <= Events; ++i) {
            session->write("*CLS;*ESE 1;*SRE 32;*OPC\n");
            const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(Long);
            while (log->getMessageQueue()->getLines() < i && std::chrono::steady_clock::now() < end)
                std::this_thread::yield();
            ASSERT_EQ(log->getMessageQueue()->getLines(), i) << "a service request is lost or doubled";
            ASSERT_EQ(session->getSTB() & 0x60, 0x60) << i;
            if (i == Events / 3)
                warm = test::figuresOf(::getpid());
        }
        if (!FreedMemoryIsKept) {
            EXPECT_LE(test::figuresOf(::getpid()).memory, warm.memory + AllowedGrowth);
        }
        unsigned queued = 0;
        while (queued <= Events &&
               TesterSession::statusOf([&] { session->waitOnEvent(VI_EVENT_SERVICE_REQ, 0, nullptr); }) >= VI_SUCCESS)
            ++queued;
        EXPECT_EQ(queued, QueueLength);
        session->disableEvent(VI_EVENT_SERVICE_REQ, VI_ALL_MECH);
        session->uninstallHandler(VI_EVENT_SERVICE_REQ, CallBackLog::viEventHandler, nullptr);
    }
    CallBackLog::forget(&callbackLines);
    EXPECT_LE(entries("/proc/self/fd"), before + 1) << "but for the file of the machine's locks";
}

} // namespace
} // namespace hostile
