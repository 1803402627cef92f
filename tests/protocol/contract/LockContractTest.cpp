// Locks between sessions, over every protocol: the rows of the table of VPP-4.3 that two sessions can see, and what becomes of
// transfers while somebody else holds a lock.
#include "contract/Contract.h"

#include <array>
#include <atomic>
#include <thread>

using test::VisaSession;

namespace contract
{
namespace
{

std::vector<Protocol> protocolsWithSeveralSessions()
{
    std::vector<Protocol> several = protocols();
    std::erase_if(several, [](const Protocol &protocol) { return protocol.locks == Locks::OnePortOneSession; });
    return several;
}

class Locking : public Contract
{
protected:
    void SetUp() override
    {
        Contract::SetUp();
        open(m_other);
    }
    static ViStatus exclusive(VisaSession &session, ViUInt32 timeout = VI_TMO_IMMEDIATE)
    {
        return viLock(session.vi, VI_EXCLUSIVE_LOCK, timeout, nullptr, nullptr);
    }
    ViStatus shared(VisaSession &session, const char *key, ViUInt32 timeout = VI_TMO_IMMEDIATE)
    {
        m_key.fill('\0');
        return viLock(session.vi, VI_SHARED_LOCK, timeout, key, m_key.data());
    }
    static ViAccessMode state(VisaSession &session) { return session.get<ViAccessMode>(VI_ATTR_RSRC_LOCK_STATE); }

    /// What @p session cannot do while the other one holds a lock, in the way of its protocol.
    void expectShutOut(VisaSession &session)
    {
        if (GetParam().locks == Locks::OnThisMachine) {
            EXPECT_EQ(session.write("*OPC?\n"), VI_ERROR_RSRC_LOCKED);
            EXPECT_EQ(session.read(), VI_ERROR_RSRC_LOCKED);
            EXPECT_EQ(viClear(session.vi), VI_ERROR_RSRC_LOCKED);
            return;
        }
        EXPECT_EQ(session.write("*OPC?\n"), VI_SUCCESS) << "the instrument's input takes it";
        session.set(VI_ATTR_TMO_VALUE, 100);
        EXPECT_EQ(session.read(), VI_ERROR_RSRC_LOCKED);
        session.set(VI_ATTR_TMO_VALUE, 20000);
    }
    void expectWelcome(VisaSession &session)
    {
        if (GetParam().locks == Locks::InTheDevice) {
            EXPECT_EQ(session.read(), VI_SUCCESS) << "the answer to what waited in the instrument's input";
            EXPECT_EQ(session.text, "1\n");
        }
        EXPECT_EQ(query(session, "*OPC?"), "1\n");
    }

    VisaSession m_other;
    std::array<ViChar, 256> m_key{};
};

INSTANTIATE_TEST_SUITE_P(All, Locking, testing::ValuesIn(protocolsWithSeveralSessions()), nameOf);

TEST_P(Locking, ExclusiveKeepsOthersOut)
{
    EXPECT_EQ(state(m_session), static_cast<ViAccessMode>(VI_NO_LOCK));
    ASSERT_EQ(exclusive(m_session), VI_SUCCESS);
    EXPECT_EQ(state(m_session), static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK));
    EXPECT_EQ(state(m_other), static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK));
    EXPECT_EQ(exclusive(m_other), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(exclusive(m_other, 40), VI_ERROR_TMO);
    EXPECT_EQ(shared(m_other, "key"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viUnlock(m_other.vi), VI_ERROR_SESN_NLOCKED);
    EXPECT_EQ(query("*OPC?"), "1\n");
    expectShutOut(m_other);
    EXPECT_EQ(viUnlock(m_session.vi), VI_SUCCESS);
    expectWelcome(m_other);
}

TEST_P(Locking, ExclusiveNestsAndUnwinds)
{
    ASSERT_EQ(exclusive(m_session), VI_SUCCESS);
    EXPECT_EQ(exclusive(m_session), VI_SUCCESS_NESTED_EXCLUSIVE);
    EXPECT_EQ(shared(m_session, "key"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viUnlock(m_session.vi), VI_SUCCESS_NESTED_EXCLUSIVE);
    EXPECT_EQ(exclusive(m_other), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viUnlock(m_session.vi), VI_SUCCESS);
    EXPECT_EQ(viUnlock(m_session.vi), VI_ERROR_SESN_NLOCKED);
    EXPECT_EQ(exclusive(m_other), VI_SUCCESS);
}

TEST_P(Locking, SharedLetsInWhoHasTheKey)
{
    ASSERT_EQ(shared(m_session, nullptr), VI_SUCCESS);
    const std::string key = m_key.data();
    EXPECT_FALSE(key.empty());
    EXPECT_EQ(state(m_other), static_cast<ViAccessMode>(VI_SHARED_LOCK));
    EXPECT_EQ(exclusive(m_other), VI_ERROR_RSRC_LOCKED);
    // HiSLIP instruments do not say why they refuse.
    EXPECT_EQ(shared(m_other, "another"),
              GetParam().locks == Locks::InTheDevice ? VI_ERROR_RSRC_LOCKED : VI_ERROR_INV_ACCESS_KEY);
    EXPECT_EQ(shared(m_other, nullptr), VI_ERROR_RSRC_LOCKED) << "no key is no right one";
    EXPECT_EQ(shared(m_other, key.c_str()), VI_SUCCESS);
    EXPECT_EQ(m_key.data(), key);
    EXPECT_EQ(query(m_other, "*OPC?"), "1\n");
    EXPECT_EQ(query("*OPC?"), "1\n");
    EXPECT_EQ(shared(m_other, nullptr), VI_SUCCESS_NESTED_SHARED);
    EXPECT_EQ(shared(m_other, "another"), VI_ERROR_INV_ACCESS_KEY);
    EXPECT_EQ(viUnlock(m_other.vi), VI_SUCCESS_NESTED_SHARED);
    EXPECT_EQ(viUnlock(m_other.vi), VI_SUCCESS);
}

TEST_P(Locking, SharerMayTakeTheExclusiveOneOnTop)
{
    ASSERT_EQ(shared(m_session, "key"), VI_SUCCESS);
    ASSERT_EQ(shared(m_other, "key"), VI_SUCCESS);
    EXPECT_EQ(exclusive(m_session), VI_SUCCESS);
    EXPECT_EQ(exclusive(m_other), VI_ERROR_RSRC_LOCKED);
    expectShutOut(m_other);
    EXPECT_EQ(viUnlock(m_session.vi), VI_SUCCESS_NESTED_SHARED);
    expectWelcome(m_other);
    EXPECT_EQ(viUnlock(m_session.vi), VI_SUCCESS);
}

TEST_P(Locking, CloseGivesTheLockToWhoWaits)
{
    ASSERT_EQ(exclusive(m_session), VI_SUCCESS);
    std::thread waiting([&] { EXPECT_EQ(exclusive(m_other, VI_TMO_INFINITE), VI_SUCCESS); });
    std::this_thread::sleep_for(std::chrono::milliseconds(30)); // lets it wait; correct without, but then it tests less
    EXPECT_EQ(viClose(m_session.vi), VI_SUCCESS);
    waiting.join();
    EXPECT_EQ(query(m_other, "*OPC?"), "1\n");
}

TEST_P(Locking, TerminateAndCloseEndAWait)
{
    ASSERT_EQ(exclusive(m_session), VI_SUCCESS);
    std::atomic<bool> terminated{false};
    std::thread waiting([&] {
        EXPECT_EQ(exclusive(m_other, VI_TMO_INFINITE), VI_ERROR_ABORT);
        terminated = true;
        EXPECT_EQ(exclusive(m_other, VI_TMO_INFINITE), VI_ERROR_INV_OBJECT);
    });
    while (!terminated) {
        EXPECT_EQ(viTerminate(m_other.vi, VI_NULL, VI_NULL), VI_SUCCESS);
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(30));
    EXPECT_EQ(viClose(m_other.vi), VI_SUCCESS);
    waiting.join();
    EXPECT_EQ(query("*OPC?"), "1\n");
    EXPECT_EQ(viUnlock(m_session.vi), VI_SUCCESS);
    VisaSession third; // nothing that was given up has been granted meanwhile
    open(third);
    EXPECT_EQ(exclusive(third, 5000), VI_SUCCESS);
}

TEST_P(Locking, OpeningWithALockWaitsForItAndLeavesNothingOpen)
{
    ASSERT_EQ(exclusive(m_session), VI_SUCCESS);
    VisaSession third;
    EXPECT_EQ(third.open(resource(), 300, VI_EXCLUSIVE_LOCK), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(third.vi, VI_NULL);
    EXPECT_EQ(viUnlock(m_session.vi), VI_SUCCESS);
    EXPECT_EQ(third.open(resource(), 10000, VI_EXCLUSIVE_LOCK), VI_SUCCESS);
    EXPECT_EQ(exclusive(m_session), VI_ERROR_RSRC_LOCKED);
}

TEST_P(Locking, AnotherInstrumentIsAnotherResource)
{
    ASSERT_EQ(exclusive(m_session), VI_SUCCESS);
    const test::SimulatorProcess simulator(GetParam().options);
    ::setenv("KYVISA_PORTMAPPER_PORT", simulator.resource("portmapper").c_str(), 1);
    VisaSession elsewhere;
    ASSERT_EQ(elsewhere.open(simulator.resource(GetParam().service), 10000), VI_SUCCESS);
    EXPECT_EQ(exclusive(elsewhere), VI_SUCCESS);
}

TEST_P(Locking, ManySessionsTakeTurns)
{
    std::atomic<int> inside{0};
    const auto work = [&](VisaSession &session) {
        for (int i = 0; i < 20; ++i) {
            ASSERT_EQ(exclusive(session, 20000), VI_SUCCESS);
            EXPECT_EQ(++inside, 1);
            --inside;
            ASSERT_EQ(viUnlock(session.vi), VI_SUCCESS);
        }
    };
    VisaSession third;
    open(third);
    std::thread one([&] { work(m_other); });
    std::thread two([&] { work(third); });
    work(m_session);
    one.join();
    two.join();
}

} // namespace
} // namespace contract
