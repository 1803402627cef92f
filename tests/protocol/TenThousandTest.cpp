// What stays of events, contexts and find lists when ten thousand have come and gone: nothing.
#include "support/SimulatorProcess.h"
#include "support/VisaSession.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <string>
#include <thread>
#include <unistd.h>

namespace
{

constexpr ViEventType Done = VI_EVENT_IO_COMPLETION;
constexpr ViEventType Failed = VI_EVENT_EXCEPTION;

/// The low half of a handle is its object's place in the library's table, and a place is used again once 1,024 others have
/// been free for longer. So as long as nothing stays behind, places remain this small, however many objects come and go.
constexpr ViObject MostPlaces = 2000;
constexpr int Repetitions = 10'000;

ViObject placeOf(ViObject handle)
{
    return handle & 0xFFFF;
}

ViStatus ignore(ViSession, ViEventType, ViEvent, ViAddr)
{
    return VI_SUCCESS;
}

ViStatus noteHighest(ViSession, ViEventType, ViEvent context, ViAddr user)
{
    auto &highest = *static_cast<ViObject *>(user);
    highest = std::max(highest, placeOf(context));
    return VI_SUCCESS;
}

// One protocol is enough: no object here knows which one it is.
class TenThousand : public testing::Test
{
protected:
    void SetUp() override
    {
        ASSERT_EQ(m_session.open(m_simulator.resource("hislip"), 10000), VI_SUCCESS);
        m_session.set(VI_ATTR_TMO_VALUE, 20000);
    }
    void TearDown() override { viClose(m_session.vi); }

    ViStatus enable(ViEventType type, ViUInt16 mechanism)
    {
        return viEnableEvent(m_session.vi, type, mechanism, VI_NULL);
    }

    test::SimulatorProcess m_simulator{{"--hislip", "0"}};
    test::VisaSession m_session;
};

TEST_F(TenThousand, ContextsThatAreClosedLeaveNothing)
{
    ASSERT_EQ(enable(Done, VI_QUEUE), VI_SUCCESS);
    for (int i = 0; i < Repetitions; ++i) {
        ViEvent context = VI_NULL;
        ASSERT_EQ(viReadAsync(m_session.vi, nullptr, 0, nullptr), VI_SUCCESS);
        ASSERT_EQ(viWaitOnEvent(m_session.vi, Done, 30000, nullptr, &context), VI_SUCCESS);
        ASSERT_LT(placeOf(context), MostPlaces) << i;
        ASSERT_EQ(viClose(context), VI_SUCCESS);
    }
}

TEST_F(TenThousand, EventsThatNobodyFetchesStayAsManyAsTheQueueHolds)
{
    ASSERT_EQ(viInstallHandler(m_session.vi, Done, ignore, nullptr), VI_SUCCESS);
    ASSERT_EQ(enable(Done, VI_QUEUE | VI_SUSPEND_HNDLR), VI_SUCCESS);
    for (int i = 0; i < Repetitions; ++i) {
        ViStatus started = VI_SUCCESS;
        while ((started = viReadAsync(m_session.vi, nullptr, 0, nullptr)) == VI_ERROR_QUEUE_ERROR)
            std::this_thread::yield(); // as many as may wait do
        ASSERT_EQ(started, VI_SUCCESS);
    }
    ASSERT_EQ(m_session.write("*OPC?\n"), VI_SUCCESS);
    ASSERT_EQ(m_session.read(), VI_SUCCESS);                                // behind all of them
    ASSERT_EQ(viDisableEvent(m_session.vi, Done, VI_ALL_MECH), VI_SUCCESS); // the last one may still be on its way
    int fetched = 0;
    for (ViEvent context = VI_NULL;
         viWaitOnEvent(m_session.vi, Done, VI_TMO_IMMEDIATE, nullptr, &context) >= VI_SUCCESS; ++fetched) {
        EXPECT_LT(placeOf(context), MostPlaces);
        EXPECT_EQ(viClose(context), VI_SUCCESS);
    }
    EXPECT_EQ(fetched, 50);
    EXPECT_EQ(viDiscardEvents(m_session.vi, Done, VI_SUSPEND_HNDLR), VI_SUCCESS);
    EXPECT_EQ(viDiscardEvents(m_session.vi, Done, VI_SUSPEND_HNDLR), VI_SUCCESS_QUEUE_EMPTY);
}

TEST_F(TenThousand, ContextsOfHandlersAndWaitsLeaveNothing)
{
    ViObject highest = 0;
    ASSERT_EQ(viInstallHandler(m_session.vi, Failed, noteHighest, &highest), VI_SUCCESS);
    ASSERT_EQ(enable(Failed, VI_HNDLR), VI_SUCCESS);
    for (int i = 0; i < Repetitions; ++i)
        ASSERT_EQ(viTerminate(m_session.vi, 1, VI_NULL), VI_ERROR_INV_DEGREE);
    EXPECT_GT(highest, 1u);
    EXPECT_LT(highest, MostPlaces);
}

TEST_F(TenThousand, FindListsLeaveNothingWhoeverClosesThem)
{
    ASSERT_EQ(viSetAttribute(m_session.rm, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 0), VI_SUCCESS); // asks nobody in the LAN
    const std::string file = testing::TempDir() + "ten-thousand-" + std::to_string(::getpid()) + ".ini";
    std::ofstream(file) << "[HISLIP-RSRCS]\nName0 = TCPIP::127.0.0.1::hislip0::INSTR\n";
    ::setenv("KYVISA_CONFIG", file.c_str(), 1);
    ViSession manager = VI_NULL;
    ASSERT_EQ(viOpenDefaultRM(&manager), VI_SUCCESS);
    ASSERT_EQ(viSetAttribute(manager, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 0), VI_SUCCESS);
    std::string name(VI_FIND_BUFLEN, '\0');
    for (int i = 0; i < Repetitions; ++i) {
        ViFindList list = VI_NULL;
        ASSERT_EQ(viFindRsrc(manager, "TCPIP?*", i % 2 == 0 ? &list : nullptr, nullptr, name.data()), VI_SUCCESS);
        ASSERT_LT(placeOf(list), MostPlaces) << i;
        if (i % 2 == 0) {
            ASSERT_EQ(viFindNext(list, name.data()), VI_ERROR_RSRC_NFOUND);
            ASSERT_EQ(viClose(list), VI_SUCCESS);
        }
    }
    viClose(manager);
    ::unsetenv("KYVISA_CONFIG");
    std::filesystem::remove(file);
}

} // namespace
