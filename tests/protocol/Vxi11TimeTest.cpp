// VXI-11: times, late answers, what other threads end.
#include "support/Vxi11Instrument.h"

#include "support/Stopwatch.h"

#include <future>
#include <gtest/gtest.h>
#include <thread>
#include <unistd.h>

using test::hex;
using test::RpcServed;
using test::ScriptedPeer;
using test::Stopwatch;
using test::takeWrite;
using test::VisaSession;
using test::Vxi11Instrument;
using test::Vxi11Peer;
using test::withoutTime;

namespace
{

constexpr const char *AbortOnPort = "00000000 00000007 <port> 00100000";
constexpr const char *NoAbort = "00000000 00000007 00000000 00100000";
constexpr long Patience = 15000; // milliseconds: far above what the library grants, for busy machines

/// Serves a write and a read that answers @p text.
void serveQuery(RpcServed &core, const std::string &text)
{
    takeWrite(core);
    EXPECT_EQ(core.takeCall().substr(0, 28), "000607AF 00000001 0000000C |");
    core.reply("00000000 00000004" + RpcServed::digits(RpcServed::word(static_cast<std::uint32_t>(text.size()))), text);
}

/// Reads on a thread until the script has seen the call, then does @p what.
template <typename What>
ViStatus readWhile(VisaSession &session, std::promise<void> &seen, const What &what)
{
    auto reading = std::async(std::launch::async, [&] { return session.read(); });
    EXPECT_EQ(seen.get_future().wait_for(std::chrono::seconds(20)), std::future_status::ready);
    what();
    return reading.get();
}

} // namespace

// 9, 12. The instrument's time is what is left of the caller's, and never 0, which means one thing to some and the other to others.
TEST(Vxi11Time, TheInstrumentIsToldWhatIsLeftAndNeverZero)
{
    std::array<std::uint32_t, 4> times{};
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        for (std::uint32_t &time : times) {
            // 12. No time and no flag for locks.
            EXPECT_EQ(withoutTime(core.takeCall(), 2, &time),
                      "000607AF 00000001 0000000C | 00000007 00000400 ........ 00000000 00000000 00000000");
            core.reply("00000000 00000004 00000000");
        }
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    session.set(VI_ATTR_TMO_VALUE, 5000);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 1);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, VI_TMO_IMMEDIATE);
    EXPECT_EQ(session.read(), VI_SUCCESS) << "what is there at once is not too late";
    session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    instrument.finish();
    EXPECT_GT(times[0], 0u);
    EXPECT_LE(times[0], 5000u);
    EXPECT_EQ(times[1], 1u);
    EXPECT_EQ(times[2], 1u);
    EXPECT_EQ(times[3], 0x7FFFFFFFu) << "no negative number to those who read one";
}

// 3. The time of a call is one, however many pieces it takes.
TEST(Vxi11Time, PiecesShareTheTimeOfTheCall)
{
    std::uint32_t first = 0;
    std::uint32_t second = 0;
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            withoutTime(core.takeCall(), 1, &first);
            std::this_thread::sleep_for(std::chrono::milliseconds(60));
            core.reply("00000000 00000400");
            withoutTime(core.takeCall(), 1, &second);
            core.reply("00000000 00000400");
            Vxi11Peer::endLink(core);
        },
        "00000000 00000007 00000000 00000400");
    EXPECT_EQ(instrument.session.write(std::string(2048, 'x')), VI_SUCCESS);
    instrument.finish();
    EXPECT_LE(second + 60, first);
}

TEST(Vxi11Time, AnAnswerThatTheInstrumentGivesAtTheEndOfItsTimeStillCounts)
{
    Vxi11Instrument instrument(
        [](RpcServed &core, Vxi11Peer &) {
            std::uint32_t time = 0;
            withoutTime(core.takeCall(), 2, &time);
            std::this_thread::sleep_for(std::chrono::milliseconds(time + 170)); // as a gateway was seen to do
            core.reply("0000000F 00000000 00000003", "abc");
            serveQuery(core, "next");
            Vxi11Peer::endLink(core);
        },
        NoAbort, 100);
    VisaSession &session = instrument.session;
    EXPECT_EQ(session.read(), VI_ERROR_TMO);
    EXPECT_EQ(session.text, "abc");
    session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "next");
}

// 4. What was asked before a time-out is never the answer to what was asked after it.
TEST(Vxi11Time, ALateAnswerIsDropped)
{
    Vxi11Instrument instrument(
        [](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            const std::string late = core.record("00000000 00000004 00000003", "old");
            EXPECT_EQ(core.takeCall().substr(0, 28), "000607AF 00000001 0000000B |");
            core.connection.send(late);
            core.reply("00000000 00000001");
            core.takeCall();
            core.reply("00000000 00000004 00000003", "new");
            Vxi11Peer::endLink(core);
        },
        NoAbort, 50);
    VisaSession &session = instrument.session;
    const Stopwatch watch;
    EXPECT_EQ(session.read(), VI_ERROR_TMO);
    EXPECT_GE(watch.milliseconds(), 50);
    EXPECT_LT(watch.milliseconds(), Patience);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "new");
}

TEST(Vxi11Time, TheRestOfAnAnswerThatStoppedInTheMiddleIsSkipped)
{
    Vxi11Instrument instrument(
        [](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            const std::string late = core.record("00000000 00000004 00000008", "abcdefgh");
            core.connection.send(late.substr(0, late.size() - 5));
            EXPECT_EQ(core.takeCall().substr(0, 28), "000607AF 00000001 0000000B |");
            core.connection.send(late.substr(late.size() - 5));
            core.reply("00000000 00000001");
            core.takeCall();
            core.reply("00000000 00000004 00000003", "new");
            Vxi11Peer::endLink(core);
        },
        NoAbort, 50);
    VisaSession &session = instrument.session;
    EXPECT_EQ(session.read(), VI_ERROR_TMO);
    EXPECT_EQ(session.text, "abc");
    session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "new");
}

TEST(Vxi11Time, TerminateAbortsTheCallInTheInstrument)
{
    std::promise<void> seen;
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &peer) {
            core.takeCall();
            seen.set_value();
            RpcServed abort = peer.accept();
            abort.serve("000607B0 00000001 00000001 | 00000007", "00000000");
            core.reply("00000017 00000000 00000000");
            abort.connection.expectClosed();
            serveQuery(core, "next");
            Vxi11Peer::endLink(core);
        },
        AbortOnPort);
    VisaSession &session = instrument.session;
    EXPECT_EQ(readWhile(session, seen, [&] { EXPECT_EQ(viTerminate(session.vi, VI_NULL, VI_NULL), VI_SUCCESS); }),
              VI_ERROR_ABORT);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.text, "next");
}

TEST(Vxi11Time, AnAbortChannelThatNeverAnswersDoesNotHoldTheCall)
{
    std::promise<void> seen;
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &peer) {
            core.takeCall();
            const std::string late = core.record("00000000 00000004 00000003", "old");
            seen.set_value();
            RpcServed abort = peer.accept();
            abort.takeCall();
            abort.connection.expectClosed();
            EXPECT_EQ(core.takeCall().substr(0, 28), "000607AF 00000001 0000000B |");
            core.connection.send(late);
            core.reply("00000000 00000001");
            Vxi11Peer::endLink(core);
        },
        AbortOnPort);
    VisaSession &session = instrument.session;
    const Stopwatch watch;
    EXPECT_EQ(readWhile(session, seen, [&] { viTerminate(session.vi, VI_NULL, VI_NULL); }), VI_ERROR_ABORT);
    EXPECT_LT(watch.milliseconds(), Patience);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
}

// 5. The link is given back also when the session is closed in the middle of a call.
TEST(Vxi11Time, ClosingWhileBlockedAbortsAndDestroysTheLink)
{
    std::promise<void> seen;
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &peer) {
            core.takeCall();
            seen.set_value();
            peer.accept().serve("000607B0 00000001 00000001 | 00000007", "00000000");
            core.reply("00000017 00000000 00000000");
            Vxi11Peer::endLink(core);
        },
        AbortOnPort);
    VisaSession &session = instrument.session;
    const ViSession vi = std::exchange(session.vi, VI_NULL);
    auto reading = std::async(std::launch::async, [&] {
        std::array<ViByte, 16> buffer{};
        return viRead(vi, buffer.data(), buffer.size(), nullptr);
    });
    seen.get_future().wait();
    EXPECT_EQ(viClose(vi), VI_SUCCESS);
    EXPECT_EQ(reading.get(), VI_ERROR_INV_OBJECT);
}

TEST(Vxi11Time, ASilentInstrumentIsToldOfTheEndAndHoldsTheCloseForAMomentOnly)
{
    Vxi11Instrument instrument(
        [](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            EXPECT_EQ(core.takeCall(), "000607AF 00000001 00000017 | 00000007");
            core.connection.expectClosed();
        },
        NoAbort, 50);
    EXPECT_EQ(instrument.session.read(), VI_ERROR_TMO);
    const Stopwatch watch;
    instrument.finish();
    EXPECT_LT(watch.milliseconds(), Patience);
}

TEST(Vxi11Time, OpeningEndsInItsTimeWhereverTheHostFallsSilent)
{
    ScriptedPeer portmapper([](ScriptedPeer &scripted) {
        RpcServed client(scripted.accept());
        client.takeCall();
        client.connection.expectClosed();
    });
    test::usePortmapper(portmapper.port());
    VisaSession session;
    Stopwatch watch;
    EXPECT_EQ(session.open("TCPIP::127.0.0.1::inst0::INSTR", 100), VI_ERROR_TMO);
    EXPECT_GE(watch.milliseconds(), 100);
    EXPECT_LT(watch.milliseconds(), Patience);

    ScriptedPeer core([](ScriptedPeer &scripted) {
        Vxi11Peer peer(scripted);
        peer.answerPort();
        RpcServed client = peer.accept();
        client.takeCall();
        client.connection.expectClosed(); // the link that may have come about ends with its connection
    });
    test::usePortmapper(core.port());
    EXPECT_EQ(session.open("TCPIP::127.0.0.1::inst0::INSTR", 100), VI_ERROR_TMO);
}

namespace
{

/// An address of this machine that no other test uses, so that a protocol's own port is free there.
std::string addressOfThisProcess()
{
    const int id = ::getpid();
    return "127." + std::to_string(64 + id / 62500 % 64) + "." + std::to_string(1 + id / 250 % 250) + "." +
           std::to_string(1 + id % 250);
}

} // namespace

TEST(Vxi11Time, ANameWithoutDeviceIsTriedAsVxi11First)
{
    ScriptedPeer peer([](ScriptedPeer &scripted) {
        RpcServed core = Vxi11Peer(scripted).acceptLink(NoAbort);
        Vxi11Peer::endLink(core);
    });
    test::usePortmapper(peer.port());
    VisaSession session;
    ASSERT_EQ(session.open("TCPIP::127.0.0.1::INSTR"), VI_SUCCESS);
    EXPECT_EQ(session.getText(VI_ATTR_RSRC_NAME), "TCPIP0::127.0.0.1::inst0::INSTR");
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

TEST(Vxi11Time, ANameWithoutDeviceIsTriedAsHislipWhenVxi11Refuses)
{
    const std::string address = addressOfThisProcess();
    ScriptedPeer hislip([](ScriptedPeer &scripted) { scripted.accept().take(16); }, address.c_str(), 4880);
    test::usePortmapper(1); // nobody listens there
    VisaSession session;
    const Stopwatch watch;
    EXPECT_EQ(session.open("TCPIP::" + address + "::INSTR", 60000), VI_ERROR_RSRC_NFOUND);
    EXPECT_LT(watch.milliseconds(), Patience) << "refused by the one, hung up on by the other";
}

TEST(Vxi11Time, ASilentPortmapperLeavesHalfOfTheTimeToHislip)
{
    const std::string address = addressOfThisProcess();
    ScriptedPeer portmapper(
        [](ScriptedPeer &scripted) {
            RpcServed client(scripted.accept());
            client.takeCall();
            client.connection.expectClosed();
        },
        address.c_str(), 0);
    const Stopwatch watch;
    long reached = 0;
    ScriptedPeer hislip(
        [&](ScriptedPeer &scripted) {
            scripted.accept().expect(hex("48530000 01005A5A 0000000000000007") + "hislip0");
            reached = watch.milliseconds();
        },
        address.c_str(), 4880);
    test::usePortmapper(portmapper.port());
    VisaSession session;
    EXPECT_EQ(session.open("TCPIP::" + address + "::INSTR", 2000), VI_ERROR_RSRC_NFOUND);
    hislip.finish();
    EXPECT_GE(reached, 900);
    EXPECT_LT(reached, Patience);
}

// 9. The time for the lock is the lock's: neither the session's time-out nor a slow answer ends the wait for it.
TEST(Vxi11Time, ALockThatTakesLongerThanTheSessionsTimeOutIsWaitedFor)
{
    Vxi11Instrument instrument(
        [](RpcServed &core, Vxi11Peer &) {
            std::uint32_t time = 0;
            // Wait for the lock, and for how long.
            EXPECT_EQ(withoutTime(core.takeCall(), 2, &time),
                      "000607AF 00000001 00000012 | 00000007 00000001 ........");
            EXPECT_GT(time, 0u);
            std::this_thread::sleep_for(std::chrono::milliseconds(time + 100));
            core.reply("0000000B");
            EXPECT_EQ(core.takeCall().substr(0, 46), "000607AF 00000001 00000012 | 00000007 00000001");
            core.reply("00000000");
            // 12. Who holds the lock does not wait for it.
            EXPECT_EQ(withoutTime(core.takeCall(), 1),
                      "000607AF 00000001 0000000B | 00000007 ........ 00000000 00000008 00000001 3F000000");
            core.reply("00000000 00000001");
            core.serve("000607AF 00000001 00000013 | 00000007", "00000000");
            Vxi11Peer::endLink(core);
        },
        NoAbort, 10);
    VisaSession &session = instrument.session;
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 20000, VI_NULL, VI_NULL), VI_SUCCESS);
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 20000, VI_NULL, VI_NULL), VI_SUCCESS_NESTED_EXCLUSIVE);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS_NESTED_EXCLUSIVE);
    EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS);
}

TEST(Vxi11Time, ALockThatIsNotWaitedForAsksWithoutTime)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) {
        core.serve("000607AF 00000001 00000012 | 00000007 00000000 00000000", "0000000B");
        Vxi11Peer::endLink(core);
    });
    EXPECT_EQ(viLock(instrument.session.vi, VI_EXCLUSIVE_LOCK, VI_TMO_IMMEDIATE, VI_NULL, VI_NULL),
              VI_ERROR_RSRC_LOCKED);
}

TEST(Vxi11Time, SharedLocksAndInstrumentsWithoutLocksAreTheMachinesBusiness)
{
    Vxi11Instrument instrument([](RpcServed &core, Vxi11Peer &) {
        EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 00000012");
        core.reply("00000008");
        EXPECT_EQ(takeWrite(core).size, 1u);
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    EXPECT_EQ(viLock(session.vi, VI_SHARED_LOCK, 1000, "key", VI_NULL), VI_SUCCESS);
    EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS);
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 1000, VI_NULL, VI_NULL), VI_SUCCESS);
    EXPECT_EQ(session.get<ViAccessMode>(VI_ATTR_RSRC_LOCK_STATE), ViAccessMode(VI_EXCLUSIVE_LOCK));
    EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
}

TEST(Vxi11Time, ALockThatWasGivenUpIsGivenBack)
{
    std::promise<void> seen;
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        core.takeCall();
        const std::string late = core.record("00000000");
        seen.set_value();
        EXPECT_EQ(core.takeCall(), "000607AF 00000001 00000013 | 00000007");
        core.connection.send(late);
        core.reply("00000000");
        EXPECT_EQ(takeWrite(core).size, 1u);
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    auto locking = std::async(std::launch::async,
                              [&] { return viLock(session.vi, VI_EXCLUSIVE_LOCK, VI_TMO_INFINITE, VI_NULL, VI_NULL); });
    seen.get_future().wait();
    EXPECT_EQ(viTerminate(session.vi, VI_NULL, VI_NULL), VI_SUCCESS);
    EXPECT_EQ(locking.get(), VI_ERROR_ABORT);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
}

TEST(Vxi11Time, AnUnlockThatDoesNotGetItsTurnLeavesTheLockWhereItIs)
{
    std::promise<void> reading;
    std::promise<void> given;
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 00000012");
        core.reply("00000000");
        core.takeCall();
        reading.set_value();
        given.get_future().wait();
        core.reply("00000000 00000004 00000001", "x");
        core.serve("000607AF 00000001 00000013 | 00000007", "00000000");
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    EXPECT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 20000, VI_NULL, VI_NULL), VI_SUCCESS);
    EXPECT_EQ(readWhile(session, reading,
                        [&] {
                            EXPECT_EQ(viUnlock(session.vi), VI_ERROR_TMO);
                            EXPECT_EQ(session.get<ViAccessMode>(VI_ATTR_RSRC_LOCK_STATE),
                                      ViAccessMode(VI_EXCLUSIVE_LOCK));
                            given.set_value();
                        }),
              VI_SUCCESS);
    EXPECT_EQ(viUnlock(session.vi), VI_SUCCESS);
    EXPECT_EQ(viUnlock(session.vi), VI_ERROR_SESN_NLOCKED);
}

TEST(Vxi11Time, OpeningWithALockIsOpenThenLock)
{
    ScriptedPeer peer([](ScriptedPeer &scripted) {
        RpcServed core = Vxi11Peer(scripted).acceptLink(NoAbort);
        EXPECT_EQ(core.takeCall().substr(0, 46), "000607AF 00000001 00000012 | 00000007 00000001");
        core.reply("00000000");
        Vxi11Peer::endLink(core);
        RpcServed second = Vxi11Peer(scripted).acceptLink(NoAbort);
        second.serve("000607AF 00000001 00000012 | 00000007 00000000 00000000", "0000000B");
        Vxi11Peer::endLink(second); // the link goes where the lock was not to be had
    });
    test::usePortmapper(peer.port());
    VisaSession session;
    ASSERT_EQ(session.open("TCPIP::127.0.0.1::inst0::INSTR", 10000, VI_EXCLUSIVE_LOCK), VI_SUCCESS);
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
    EXPECT_EQ(session.open("TCPIP::127.0.0.1::inst0::INSTR", VI_TMO_IMMEDIATE, VI_EXCLUSIVE_LOCK),
              VI_ERROR_RSRC_LOCKED);
}
