// Every call that blocks ends when it is terminated or when its session is closed under it, over every protocol.
#include "contract/Contract.h"
#include "support/Stopwatch.h"

#include <atomic>
#include <thread>

using test::Stopwatch;

namespace contract
{
namespace
{

class Cancel : public Contract
{
protected:
    /// Runs @p call on a thread and ends it by closing the session.
    template <typename Call>
    void closeUnder(Call call)
    {
        std::thread blocked(call);
        std::this_thread::sleep_for(std::chrono::milliseconds(50)); // lets it block; correct without, but tests less
        const Stopwatch watch;
        EXPECT_EQ(viClose(m_session.vi), VI_SUCCESS);
        blocked.join();
        EXPECT_LT(watch.milliseconds(), 15000);
    }
    /// The same by viTerminate, as long as that takes.
    template <typename Call>
    void terminate(Call call)
    {
        std::atomic<bool> ended{false};
        std::thread blocked([&] {
            call();
            ended = true;
        });
        const Stopwatch watch;
        while (!ended) {
            EXPECT_EQ(viTerminate(m_session.vi, VI_NULL, VI_NULL), VI_SUCCESS);
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
        blocked.join();
        EXPECT_LT(watch.milliseconds(), 15000);
    }
    /// A write that the instrument does not take: it is busy, and the message is larger than all buffers on the way.
    ViStatus writeWhatIsNotTaken()
    {
        EXPECT_EQ(m_session.write("SYST:DEL 30;*WAI;*OPC\n"), VI_SUCCESS);
        return m_session.write(largeBlock());
    }
    static std::string largeBlock()
    {
        std::string message = "MMEM:DATA \"x\",#864000000";
        message.resize(message.size() + 64'000'000, 'x');
        return message + "\n";
    }

    ViByte m_byte = 0;
};

INSTANTIATE_TEST_SUITE_P(All, Cancel, testing::ValuesIn(protocols()), nameOf);

TEST_P(Cancel, CloseEndsARead)
{
    m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    closeUnder([&] { EXPECT_EQ(m_session.read(), VI_ERROR_INV_OBJECT); });
}

TEST_P(Cancel, TerminateEndsAReadAndTheSessionGoesOn)
{
    m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    terminate([&] { EXPECT_EQ(m_session.read(), VI_ERROR_ABORT); });
    m_session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(viClear(m_session.vi), VI_SUCCESS);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_P(Cancel, CloseEndsAWrite)
{
    m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    closeUnder([&] { EXPECT_EQ(writeWhatIsNotTaken(), VI_ERROR_INV_OBJECT); });
}

TEST_P(Cancel, TerminateEndsAWriteAndAClearMakesTheSessionUsable)
{
    m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    EXPECT_EQ(m_session.write("SYST:DEL 30;*WAI;*OPC\n"), VI_SUCCESS);
    const std::string block = largeBlock();
    terminate([&] { EXPECT_EQ(m_session.write(block), VI_ERROR_ABORT); });
    m_session.set(VI_ATTR_TMO_VALUE, 20000);
    if (!GetParam().clearReachesDevice)
        return; // the instrument has half a block and no way to be told
    EXPECT_EQ(viClear(m_session.vi), VI_SUCCESS);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_P(Cancel, CloseEndsTheCallsThatWaitForTheirTurn)
{
    m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    closeUnder([&] {
        std::thread reader([&] { EXPECT_EQ(viRead(m_session.vi, &m_byte, 1, nullptr), VI_ERROR_INV_OBJECT); });
        std::thread writer([&] {
            const ViStatus status = viWrite(m_session.vi, reinterpret_cast<ViConstBuf>("*CLS\n"), 5, nullptr);
            EXPECT_TRUE(status == VI_ERROR_INV_OBJECT || status == VI_SUCCESS) << status; // it may have come first
        });
        std::thread poller([&] {
            ViUInt16 byte = 0;
            const ViStatus status = viReadSTB(m_session.vi, &byte);
            EXPECT_TRUE(status == VI_ERROR_INV_OBJECT || status >= VI_SUCCESS) << status;
        });
        reader.join();
        writer.join();
        poller.join();
    });
}

TEST_P(Cancel, CloseAndTerminateEndAWaitForAnEvent)
{
    ASSERT_EQ(viEnableEvent(m_session.vi, VI_EVENT_IO_COMPLETION, VI_QUEUE, 0), VI_SUCCESS);
    const auto wait = [&] {
        return viWaitOnEvent(m_session.vi, VI_EVENT_IO_COMPLETION, VI_TMO_INFINITE, nullptr, nullptr);
    };
    terminate([&] { EXPECT_EQ(wait(), VI_ERROR_ABORT); });
    closeUnder([&] { EXPECT_EQ(wait(), VI_ERROR_INV_OBJECT); });
}

TEST_P(Cancel, ClosingTheResourceManagerEndsEverything)
{
    m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    std::thread blocked([&] { EXPECT_EQ(m_session.read(), VI_ERROR_INV_OBJECT); });
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    EXPECT_EQ(viClose(m_session.rm), VI_SUCCESS);
    blocked.join();
    EXPECT_EQ(viClose(m_session.vi), VI_ERROR_INV_OBJECT);
}

} // namespace
} // namespace contract
