// Raw sockets: what the instrument says, and the exact bytes that the library must have sent.
#include "support/ClosedPort.h"
#include "support/Completion.h"
#include "support/QuietFork.h"
#include "support/ScriptedPeer.h"
#include "support/Stopwatch.h"
#include "support/VisaSession.h"

#include <atomic>
#include <filesystem>
#include <future>
#include <gtest/gtest.h>
#include <thread>

using test::ClosedPort;
using test::Completion;
using test::nextCompletion;
using test::PeerConnection;
using test::ScriptedPeer;
using test::Stopwatch;
using test::VisaSession;

namespace
{

std::string resource(const ScriptedPeer &peer, const char *host = "127.0.0.1")
{
    return std::string("TCPIP::") + host + "::" + std::to_string(peer.port()) + "::SOCKET";
}

TEST(Socket, WritesAndReadsUpToTheTerminationCharacter)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.expect("*IDN?\n");
        client.send("A,B,C,1\nmore");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE), VI_SUCCESS);
    EXPECT_EQ(session.write("*IDN?\n"), VI_SUCCESS);
    EXPECT_EQ(session.count, 6u);
    EXPECT_EQ(session.read(), VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(session.text, "A,B,C,1\n");
    EXPECT_EQ(session.read(4), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(session.text, "more");
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

TEST(Socket, TermCharWinsOverTheCount)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.send("ABC\n");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE), VI_SUCCESS);
    EXPECT_EQ(session.read(4), VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(session.text, "ABC\n");
    viClose(session.vi);
}

TEST(Socket, ReadOfNothingIsCompleteAtOnce)
{
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(session.read(0), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(session.count, 0u);
    viClose(session.vi);
}

TEST(Socket, DescribesItself)
{
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    VisaSession session;
    ASSERT_EQ(session.open("tcpip::127.0.0.1::" + std::to_string(peer.port()) + "::socket"), VI_SUCCESS);
    EXPECT_EQ(session.getText(VI_ATTR_RSRC_CLASS), "SOCKET");
    EXPECT_EQ(session.getText(VI_ATTR_RSRC_NAME), "TCPIP0::127.0.0.1::" + std::to_string(peer.port()) + "::SOCKET");
    EXPECT_EQ(session.getText(VI_ATTR_TCPIP_ADDR), "127.0.0.1");
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_PORT), peer.port());
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_INTF_TYPE), 6);
    EXPECT_EQ(session.get<ViUInt32>(VI_ATTR_RM_SESSION), session.rm);
    EXPECT_EQ(session.get<ViUInt32>(VI_ATTR_TMO_VALUE), 2000u);
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_KEEPALIVE, VI_TRUE), VI_SUCCESS);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_KEEPALIVE), VI_TRUE);
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_NODELAY, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(session.set(VI_ATTR_DMA_ALLOW_EN, VI_TRUE), VI_WARN_NSUP_ATTR_STATE);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_DMA_ALLOW_EN), VI_FALSE);
    EXPECT_EQ(session.set(VI_ATTR_SUPPRESS_END_EN, VI_TRUE), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(session.set(VI_ATTR_IO_PROT, 2), VI_ERROR_NSUP_ATTR_STATE);
    viClose(session.vi);
}

TEST(Socket, TalksAboutTheStatusByteOnlyIn4882Mode)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.expect("*STB?\n");
        client.send("+68\r\n");
        client.expect("*TRG\n");
        client.expect("*STB?\n");
        client.send("nonsense\n");
        client.expectClosed();
    });
    VisaSession session;
    ViUInt16 status = 0xFFFF;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_ERROR_INV_SETUP);
    EXPECT_EQ(viAssertTrigger(session.vi, 0), VI_ERROR_INV_SETUP);
    ASSERT_EQ(session.set(VI_ATTR_IO_PROT, VI_PROT_4882_STRS), VI_SUCCESS);
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(status, 68);
    EXPECT_EQ(viAssertTrigger(session.vi, 1), VI_ERROR_INV_PROT);
    EXPECT_EQ(viAssertTrigger(session.vi, 0), VI_SUCCESS);
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_ERROR_RAW_RD_PROT_VIOL);
    viClose(session.vi);
}

TEST(Socket, StatusAnswerOfNothingButBlanksIsRefusedAndItsRestIsDropped)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.expect("*STB?\n");
        client.send(std::string(64, ' ') + "12\n");
        client.expect("*STB?\n");
        client.send("5\n");
        client.expectClosed();
    });
    VisaSession session;
    ViUInt16 status = 0;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(session.set(VI_ATTR_IO_PROT, VI_PROT_4882_STRS), VI_SUCCESS);
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_ERROR_RAW_RD_PROT_VIOL);
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(status, 5);
    viClose(session.vi);
}

TEST(Socket, RefusesWhatSocketsDoNotHave)
{
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(session.vi, 1), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibSendIFC(session.vi), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viIn32(session.vi, 1, 0, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_ERROR_INV_EVENT);
    EXPECT_EQ(viOpen(session.vi, "TCPIP::127.0.0.1::1::SOCKET", 0, 0, &session.vi), VI_ERROR_NSUP_OPER);
    viClose(session.vi);
}

TEST(Socket, DropsAnAnswerThatCameAfterItsTimeOut)
{
    std::atomic<bool> timedOut{false};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.expect("first?\n");
        while (!timedOut)
            std::this_thread::yield();
        client.send("late\n");
        client.expect("settle\n"); // what was sent before this is there by now
        client.send("second\n");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
    session.set(VI_ATTR_TMO_VALUE, 50);
    ASSERT_EQ(session.write("first?\n"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_ERROR_TMO);
    EXPECT_EQ(session.count, 0u);
    session.set(VI_ATTR_TMO_VALUE, 10000);
    timedOut = true;
    // The late answer arrives; a read of its first byte shows that, and leaves the rest behind.
    EXPECT_EQ(session.read(1), VI_SUCCESS_MAX_CNT);
    ASSERT_EQ(session.write("settle\n"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(session.text, "second\n");
    viClose(session.vi);
}

TEST(Socket, KeepsUnreadInputWhenNothingTimedOut)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.send("one\ntwo\n");
        client.expect("x");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
    EXPECT_EQ(session.read(), VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(session.write("x"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(session.text, "two\n");
    viClose(session.vi);
}

TEST(Socket, ClearDropsWhatIsHere)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.send("old old old");
        client.expect("go");
        client.send("new\n");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
    EXPECT_EQ(session.read(1), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(viClear(session.vi), VI_SUCCESS);
    EXPECT_EQ(session.write("go"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(session.text, "new\n");
    viClose(session.vi);
}

TEST(Socket, MovesLargeBlocksBothWays)
{
    const std::string block = [] {
        std::string bytes(9'000'001, '\0');
        for (std::size_t i = 0; i < bytes.size(); ++i)
            bytes[i] = static_cast<char>(i * 7 + i / 251);
        return bytes;
    }();
    ScriptedPeer peer([&](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        EXPECT_EQ(client.take(block.size()), block);
        client.send(block);
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(session.write(block), VI_SUCCESS);
    EXPECT_EQ(session.read(static_cast<std::uint32_t>(block.size())), VI_SUCCESS_MAX_CNT);
    EXPECT_TRUE(session.text == block);
    viClose(session.vi);
}

TEST(Socket, SaysHowMuchCameBeforeTheConnectionBroke)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.send("half");
        client.close();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(session.read(100), VI_ERROR_CONN_LOST);
    EXPECT_EQ(session.text, "half");
    EXPECT_EQ(session.write("x"), VI_ERROR_CONN_LOST);
    EXPECT_EQ(session.read(100), VI_ERROR_CONN_LOST);
    EXPECT_EQ(viClear(session.vi), VI_ERROR_CONN_LOST);
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

TEST(Socket, TrickleDoesNotStretchTheTimeOut)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        for (int i = 0; i < 2000; ++i) {
            if (!client.silentFor(std::chrono::milliseconds(10)) || !client.trySend("."))
                return;
        }
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 200);
    session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
    const Stopwatch watch;
    EXPECT_EQ(session.read(100000), VI_ERROR_TMO);
    EXPECT_GE(watch.milliseconds(), 200);
    EXPECT_LT(watch.milliseconds(), 5000);
    EXPECT_GT(session.count, 0u);
    viClose(session.vi);
}

TEST(Socket, FloodWithoutTerminationEndsWithTheTimeOut)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        const std::string flood(65536, 'x');
        while (client.trySend(flood)) {
        }
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 100);
    ASSERT_EQ(session.read(1), VI_SUCCESS_MAX_CNT);
    const Stopwatch watch;
    EXPECT_EQ(viClear(session.vi), VI_SUCCESS); // drops for as long as the time-out allows
    EXPECT_LT(watch.milliseconds(), 5000);
    viClose(session.vi);
}

TEST(Socket, WriteToAPeerThatDoesNotReadTimesOut)
{
    std::atomic<bool> done{false};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        while (!done)
            std::this_thread::yield();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 100);
    const std::string block(64'000'000, 'x');
    EXPECT_EQ(session.write(block), VI_ERROR_TMO);
    EXPECT_GT(session.count, 0u);
    EXPECT_LT(session.count, block.size());
    done = true;
    viClose(session.vi);
}

TEST(Socket, TimeOutOfZeroTakesWhatIsHereAndDoesNotWait)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.send("abc");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(session.read(1), VI_SUCCESS_MAX_CNT);
    session.set(VI_ATTR_TMO_VALUE, VI_TMO_IMMEDIATE);
    EXPECT_EQ(session.read(2), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(session.text, "bc");
    EXPECT_EQ(session.read(1), VI_ERROR_TMO);
    viClose(session.vi);
}

TEST(Socket, CloseFromAnotherThreadEndsABlockedRead)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.expect("waiting");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    std::atomic<bool> entered{false};
    std::thread reader([&] {
        session.write("waiting");
        entered = true;
        EXPECT_EQ(session.read(), VI_ERROR_INV_OBJECT);
    });
    while (!entered)
        std::this_thread::yield();
    std::this_thread::sleep_for(
        std::chrono::milliseconds(20)); // lets it block; correct without, but then it tests less
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
    reader.join();
    EXPECT_EQ(viClose(session.vi), VI_ERROR_INV_OBJECT);
}

TEST(Socket, ClosingTheResourceManagerEndsABlockedRead)
{
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    std::thread reader([&] { EXPECT_EQ(session.read(), VI_ERROR_INV_OBJECT); });
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    EXPECT_EQ(viClose(session.rm), VI_SUCCESS);
    reader.join();
    EXPECT_EQ(viClose(session.vi), VI_ERROR_INV_OBJECT);
}

TEST(Socket, TerminateEndsABlockedReadAndTheSessionGoesOn)
{
    std::atomic<bool> ended{false};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        while (!ended)
            std::this_thread::yield();
        client.send("z");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    std::thread reader([&] {
        EXPECT_EQ(session.read(), VI_ERROR_ABORT);
        ended = true;
    });
    while (!ended) {
        EXPECT_EQ(viTerminate(session.vi, VI_NULL, VI_NULL), VI_SUCCESS);
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    reader.join();
    EXPECT_EQ(session.read(1), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(viTerminate(session.vi, 1, VI_NULL), VI_ERROR_INV_DEGREE);
    EXPECT_EQ(viTerminate(session.vi, VI_NULL, 5), VI_ERROR_INV_JOB_ID);
    viClose(session.vi);
}

TEST(Socket, SecondThreadOfASessionWaitsForItsTurnWithinItsTimeOut)
{
    std::atomic<bool> done{false};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        while (!done)
            std::this_thread::yield();
        client.send("x");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    std::atomic<bool> started{false};
    std::thread reader([&] {
        std::array<ViByte, 1> byte;
        started = true;
        EXPECT_EQ(viRead(session.vi, byte.data(), 1, nullptr), VI_SUCCESS_MAX_CNT);
    });
    while (!started)
        std::this_thread::yield();
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    session.set(VI_ATTR_TMO_VALUE, 100);
    EXPECT_EQ(viClear(session.vi), VI_ERROR_TMO);
    done = true;
    reader.join();
    viClose(session.vi);
}

TEST(Socket, TwoSessionsNeverWaitForEachOther)
{
    ScriptedPeer silent([](ScriptedPeer &self) { self.accept().expectClosed(); });
    ScriptedPeer lively([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        for (int i = 0; i < 100; ++i) {
            client.expect("?");
            client.send("!");
        }
        client.expectClosed();
    });
    VisaSession blocked;
    VisaSession busy;
    ASSERT_EQ(blocked.open(resource(silent)), VI_SUCCESS);
    ASSERT_EQ(busy.open(resource(lively)), VI_SUCCESS);
    blocked.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    std::thread reader([&] { EXPECT_EQ(blocked.read(), VI_ERROR_INV_OBJECT); });
    for (int i = 0; i < 100; ++i) {
        ASSERT_EQ(busy.write("?"), VI_SUCCESS);
        ASSERT_EQ(busy.read(1), VI_SUCCESS_MAX_CNT);
    }
    viClose(blocked.vi);
    reader.join();
    viClose(busy.vi);
}

TEST(Socket, OpensByNameOnWhicheverFamilyTheInstrumentListens)
{
    for (const bool ipv6 : {false, true}) {
        SCOPED_TRACE(ipv6 ? "IPv6" : "IPv4");
        ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); }, ipv6);
        VisaSession session;
        EXPECT_EQ(session.open(resource(peer, "LocalHost")), VI_SUCCESS);
        EXPECT_EQ(session.getText(VI_ATTR_TCPIP_ADDR), ipv6 ? "::1" : "127.0.0.1");
        viClose(session.vi);
    }
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); }, true);
    VisaSession session;
    EXPECT_EQ(session.open(resource(peer, "[::1]")), VI_SUCCESS);
    viClose(session.vi);
}

TEST(Socket, OpeningWhereNobodyListensFailsAtOnce)
{
    const ClosedPort closed;
    VisaSession session;
    const Stopwatch watch;
    EXPECT_EQ(session.open("TCPIP::localhost::" + std::to_string(closed.number()) + "::SOCKET", 30000),
              VI_ERROR_RSRC_NFOUND);
    EXPECT_LT(watch.milliseconds(), 10000);
    EXPECT_EQ(session.vi, VI_NULL);
}

TEST(Socket, AsynchronousTransfersReturnBeforeThePeerHasSpoken)
{
    std::promise<void> maySpeak;
    ScriptedPeer peer([&](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.expect("ab");
        maySpeak.get_future().wait();
        client.send("xyz");
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(session.set(VI_ATTR_TMO_VALUE, 60000), VI_SUCCESS);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_IO_COMPLETION, VI_QUEUE, 0), VI_SUCCESS);
    ViJobId first = 0;
    ViJobId second = 0;
    std::array<ViByte, 3> buffer{};
    EXPECT_EQ(viWriteAsync(session.vi, reinterpret_cast<ViConstBuf>("ab"), 2, &first), VI_SUCCESS);
    EXPECT_EQ(viReadAsync(session.vi, buffer.data(), 3, &second), VI_SUCCESS);
    Completion completion = nextCompletion(session.vi);
    EXPECT_EQ(completion.waited, VI_SUCCESS); // the read cannot be over
    EXPECT_EQ(completion.job, first);
    EXPECT_EQ(completion.status, VI_SUCCESS);
    EXPECT_EQ(nextCompletion(session.vi, VI_TMO_IMMEDIATE).waited, VI_ERROR_TMO);
    maySpeak.set_value();
    completion = nextCompletion(session.vi);
    EXPECT_EQ(completion.job, second);
    EXPECT_EQ(completion.count, 3u);
    EXPECT_EQ(completion.buffer, buffer.data());
    EXPECT_EQ(completion.status, VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(std::string(buffer.begin(), buffer.end()), "xyz");
    viClose(session.vi);
}

TEST(Socket, AsynchronousTransfersEndWithTheirConnection)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.send("half");
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE), VI_SUCCESS);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_IO_COMPLETION, VI_QUEUE, 0), VI_SUCCESS);
    std::array<ViByte, 8> buffer{};
    for (int i = 0; i < 3; ++i)
        EXPECT_EQ(viReadAsync(session.vi, buffer.data(), 8, nullptr), VI_SUCCESS);
    const Completion cut = nextCompletion(session.vi);
    EXPECT_EQ(cut.status, VI_ERROR_CONN_LOST);
    EXPECT_EQ(cut.count, 4u);
    EXPECT_EQ(nextCompletion(session.vi).status, VI_ERROR_CONN_LOST);
    EXPECT_EQ(nextCompletion(session.vi).status, VI_ERROR_CONN_LOST);
    viClose(session.vi);
}

TEST(Socket, JobsThatWaitAreBounded)
{
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE), VI_SUCCESS);
    ViByte byte = 0;
    ViStatus status = VI_SUCCESS;
    int taken = 0;
    while (taken < 5000 && (status = viReadAsync(session.vi, &byte, 1, nullptr)) == VI_SUCCESS)
        ++taken;
    EXPECT_EQ(status, VI_ERROR_QUEUE_ERROR);
    EXPECT_GE(taken, 1024);
    EXPECT_LE(taken, 1025); // the one that runs does not wait
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

TEST(Socket, LockThatWasTakenWhileACallWaitedForItsTurnKeepsItOut)
{
    std::atomic<bool> locked{false};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        PeerConnection owner = self.accept();
        while (!locked)
            std::this_thread::yield();
        client.send("x");
        client.expectClosed(); // and nothing was written
        owner.expectClosed();
    });
    VisaSession session;
    VisaSession owner;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(owner.open(resource(peer)), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 30000);
    std::array<std::atomic<pid_t>, 2> callers{};
    std::thread reader([&] {
        callers[0] = ::gettid();
        ViByte byte = 0;
        EXPECT_EQ(viRead(session.vi, &byte, 1, nullptr), VI_SUCCESS_MAX_CNT);
    });
    while (callers[0] == 0)
        std::this_thread::yield();
    test::awaitWaiting(callers[0]);
    std::thread writer([&] {
        callers[1] = ::gettid();
        EXPECT_EQ(viWrite(session.vi, reinterpret_cast<ViConstBuf>("late"), 4, nullptr), VI_ERROR_RSRC_LOCKED);
    });
    while (callers[1] == 0)
        std::this_thread::yield();
    test::awaitWaiting(callers[1]);
    ASSERT_EQ(viLock(owner.vi, VI_EXCLUSIVE_LOCK, 0, nullptr, nullptr), VI_SUCCESS);
    locked = true;
    reader.join();
    writer.join();
    viClose(session.vi);
    viClose(owner.vi);
}

std::size_t openDescriptors()
{
    const std::filesystem::directory_iterator entries("/proc/self/fd");
    return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

TEST(Socket, LeavesNoDescriptorBehindAfter2000Sessions)
{
    constexpr int Cycles = 2000;
    ScriptedPeer peer([](ScriptedPeer &self) {
        for (int i = 0; i < Cycles; ++i)
            self.accept().expectClosed();
    });
    VisaSession session;
    const std::size_t before = openDescriptors();
    for (int i = 0; i < Cycles; ++i) {
        ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
        ASSERT_EQ(viClose(session.vi), VI_SUCCESS);
    }
    peer.finish();
    EXPECT_EQ(openDescriptors(), before);
}

TEST(Socket, ExclusiveLockOfAnotherSessionKeepsTransfersOut)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection first = self.accept();
        PeerConnection second = self.accept();
        second.expect("now");
        second.expectClosed();
    });
    VisaSession holder;
    VisaSession other;
    ASSERT_EQ(holder.open(resource(peer), 1000, VI_EXCLUSIVE_LOCK), VI_SUCCESS);
    ASSERT_EQ(other.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(other.get<ViUInt32>(VI_ATTR_RSRC_LOCK_STATE), static_cast<ViUInt32>(VI_EXCLUSIVE_LOCK));
    EXPECT_EQ(other.write("too early"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(other.read(), VI_ERROR_RSRC_LOCKED);
    // Local attributes are the session's own business, also those that mean something to its connection.
    EXPECT_EQ(other.set(VI_ATTR_TMO_VALUE, 3000), VI_SUCCESS);
    EXPECT_EQ(other.set(VI_ATTR_TCPIP_KEEPALIVE, VI_TRUE), VI_SUCCESS);
    EXPECT_EQ(other.set(VI_ATTR_TCPIP_NODELAY, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(viLock(other.vi, VI_EXCLUSIVE_LOCK, VI_TMO_IMMEDIATE, nullptr, nullptr), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viLock(other.vi, VI_EXCLUSIVE_LOCK, 30, nullptr, nullptr), VI_ERROR_TMO);
    EXPECT_EQ(viUnlock(other.vi), VI_ERROR_SESN_NLOCKED);
    viClose(holder.vi); // closing gives the lock up
    EXPECT_EQ(other.write("now"), VI_SUCCESS);
    viClose(other.vi);
}

TEST(Socket, OpeningWithALockThatCannotBeHadLeavesNothingOpen)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection first = self.accept();
        self.accept().expectClosed();
        first.expectClosed();
    });
    VisaSession holder;
    VisaSession other;
    ASSERT_EQ(holder.open(resource(peer), 1000, VI_EXCLUSIVE_LOCK | VI_LOAD_CONFIG), VI_WARN_CONFIG_NLOADED);
    EXPECT_EQ(other.open(resource(peer), 50, VI_EXCLUSIVE_LOCK), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(other.vi, VI_NULL);
    viClose(holder.vi);
}

} // namespace
