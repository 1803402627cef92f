// Locks between real processes, on a resource whose protocol has none: what holds, and what is left when a holder dies.
#include "support/QuietFork.h"
#include "support/ScriptedPeer.h"
#include "support/VisaSession.h"

#include <array>
#include <csignal>
#include <functional>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

using test::PeerConnection;
using test::ScriptedPeer;
using test::VisaSession;

namespace
{

std::string resource(const ScriptedPeer &peer)
{
    return "TCPIP::127.0.0.1::" + std::to_string(peer.port()) + "::SOCKET";
}

/// Another process with a session of its own. It says "ready" when @p prepare has answered true and ends by being killed.
class OtherProcess
{
public:
    OtherProcess(const std::string &name, const std::function<bool(VisaSession &)> &prepare)
    {
        std::array<int, 2> ends{};
        if (::pipe(ends.data()) != 0)
            return;
        m_process = test::forkWhileOthersWait();
        if (m_process == 0) {
            ::alarm(60);
            VisaSession session;
            const char answer = session.open(name) == VI_SUCCESS && prepare(session) ? 'y' : 'n';
            if (::write(ends[1], &answer, 1) != 1)
                ::_exit(1);
            for (;;)
                ::pause();
        }
        ::close(ends[1]);
        char answer = 'n';
        m_ready = ::read(ends[0], &answer, 1) == 1 && answer == 'y';
        ::close(ends[0]);
    }
    ~OtherProcess() { kill(); }
    OtherProcess(const OtherProcess &) = delete;
    OtherProcess &operator=(const OtherProcess &) = delete;

    bool ready() const { return m_ready; }
    void kill()
    {
        if (m_process <= 0)
            return;
        ::kill(m_process, SIGKILL);
        ::waitpid(m_process, nullptr, 0);
        m_process = -1;
    }

private:
    pid_t m_process = -1;
    bool m_ready = false;
};

bool lockExclusively(VisaSession &session)
{
    return viLock(session.vi, VI_EXCLUSIVE_LOCK, 0, nullptr, nullptr) == VI_SUCCESS;
}

TEST(MachineLocks, HoldForOtherProcessesAndEndWithTheHolder)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection holders = self.accept();
        PeerConnection ours = self.accept();
        ours.expect("mine\n");
        ours.expectClosed();
    });
    OtherProcess holder(resource(peer), lockExclusively);
    ASSERT_TRUE(holder.ready());
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(session.write("x"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(session.read(), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viClear(session.vi), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 0, nullptr, nullptr), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 30, nullptr, nullptr), VI_ERROR_TMO);
    EXPECT_EQ(session.get<ViAccessMode>(VI_ATTR_RSRC_LOCK_STATE), static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK));
    holder.kill(); // as a crash does
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 20000, nullptr, nullptr), VI_SUCCESS);
    EXPECT_EQ(session.write("mine\n"), VI_SUCCESS);
    viClose(session.vi);
}

TEST(MachineLocks, SharedKeyIsGoodInAnotherProcess)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection holders = self.accept();
        PeerConnection ours = self.accept();
        ours.expect("ours\n");
        ours.expectClosed();
    });
    OtherProcess holder(resource(peer), [](VisaSession &session) {
        return viLock(session.vi, VI_SHARED_LOCK, 0, "the key", nullptr) == VI_SUCCESS;
    });
    ASSERT_TRUE(holder.ready());
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(session.write("x"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, "another", nullptr), VI_ERROR_INV_ACCESS_KEY);
    EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 0, "the key", nullptr), VI_SUCCESS);
    EXPECT_EQ(session.write("ours\n"), VI_SUCCESS);
    viClose(session.vi);
}

TEST(MachineLocks, ForkedChildDoesNotHoldWhatItsParentHeld)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection holders = self.accept();
        PeerConnection ours = self.accept();
        ours.expectClosed();
    });
    std::array<int, 2> life{};
    ASSERT_EQ(::pipe(life.data()), 0);
    OtherProcess holder(resource(peer), [&](VisaSession &session) {
        if (!lockExclusively(session))
            return false;
        const pid_t child = ::fork();
        if (child == 0) { // survives its parent, until this test lets it go
            ::alarm(60);
            ::close(life[1]);
            char nothing;
            ::_exit(::read(life[0], &nothing, 1) == 0 ? 0 : 1);
        }
        return child > 0;
    });
    ::close(life[0]);
    ASSERT_TRUE(holder.ready());
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 0, nullptr, nullptr), VI_ERROR_RSRC_LOCKED);
    holder.kill();
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 10000, nullptr, nullptr), VI_SUCCESS);
    viClose(session.vi);
    ::close(life[1]);
}

} // namespace
