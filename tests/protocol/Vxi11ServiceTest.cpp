// Service requests over VXI-11: the interrupt channel, and instruments that get it wrong.
#include "support/Vxi11Instrument.h"

#include "support/QuietFork.h"
#include "support/RawClient.h"
#include "support/Stopwatch.h"

#include <array>
#include <atomic>
#include <future>
#include <gtest/gtest.h>
#include <memory>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <vector>

using test::hex;
using test::RawClient;
using test::RpcServed;
using test::Stopwatch;
using test::takeWrite;
using test::VisaSession;
using test::Vxi11Instrument;
using test::Vxi11Peer;

namespace
{

constexpr const char *NoAbort = "00000000 00000007 00000000 00100000";

/// Takes create_intr_chan and answers it.
std::uint16_t serveCreate(RpcServed &core, const char *result = "00000000")
{
    const std::string call = core.takeCall();
    // 127.0.0.1, a port, program 0x0607B1 version 1, TCP
    EXPECT_EQ(call.substr(0, 38), "000607AF 00000001 00000019 | 7F000001 ");
    EXPECT_EQ(call.substr(46), " 000607B1 00000001 00000000");
    core.reply(result);
    return static_cast<std::uint16_t>(std::stoul(call.substr(38, 8), nullptr, 16));
}

/// Takes device_enable_srq and answers it.
std::string serveEnable(RpcServed &core, const char *result = "00000000")
{
    const std::string call = core.takeCall();
    EXPECT_EQ(call.substr(0, 56), "000607AF 00000001 00000014 | 00000007 00000001 00000008 ");
    core.reply(result);
    return hex(call.substr(56));
}

std::string request(const std::string &handle, const char *xid = "00000001")
{
    return hex("80000034") + hex(xid) + hex("00000000 00000002 000607B1 00000001 0000001E") + std::string(16, '\0') +
           hex("00000008") + handle;
}

ViStatus enable(VisaSession &session)
{
    return viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL);
}

ViStatus wait(VisaSession &session, ViUInt32 timeout = 20000)
{
    return viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, timeout, nullptr, nullptr);
}

} // namespace

TEST(Vxi11Service, ARequestBecomesAnEventAndTheStatusByteIsLeftToTheUser)
{
    std::promise<void> again;
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        const std::uint16_t port = serveCreate(core);
        const std::string handle = serveEnable(core);
        RawClient channel(port);
        channel.send(request(handle));
        again.get_future().wait();
        // 17. A library that read the status byte by itself would have stolen the request.
        EXPECT_TRUE(core.connection.silentFor(std::chrono::milliseconds(50)));
        channel.send(request(handle, "00000002"));
        EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 0000000D");
        core.reply("00000000 00000050");
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    ASSERT_EQ(enable(session), VI_SUCCESS);
    EXPECT_EQ(wait(session), VI_SUCCESS);
    again.set_value();
    EXPECT_EQ(wait(session), VI_SUCCESS);
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(status, 0x50);
}

TEST(Vxi11Service, TheChannelIsMadeOnceAndOnlyWhenSomebodyWantsToKnow)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        EXPECT_EQ(takeWrite(core).size, 1u);
        serveCreate(core);
        serveEnable(core);
        EXPECT_EQ(takeWrite(core).size, 1u);
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    ASSERT_EQ(enable(session), VI_SUCCESS);
    EXPECT_EQ(viDisableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE), VI_SUCCESS);
    EXPECT_EQ(enable(session), VI_SUCCESS);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
}

// 13. Some instruments wait for an answer to the call that has none, and do nothing else meanwhile.
TEST(Vxi11Service, AnInstrumentThatExpectsAnAnswerGetsOne)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        RawClient channel(serveCreate(core));
        const std::string handle = serveEnable(core);
        channel.send(request(handle, "0000ABCD"));
        EXPECT_EQ(channel.receive(28), hex("80000018 0000ABCD 00000001 00000000 00000000 00000000 00000000"));
        EXPECT_EQ(takeWrite(core).size, 1u);
        Vxi11Peer::endLink(core);
    });
    ASSERT_EQ(enable(instrument.session), VI_SUCCESS);
    EXPECT_EQ(wait(instrument.session), VI_SUCCESS);
    EXPECT_EQ(instrument.session.write("?"), VI_SUCCESS);
}

// 13. Records that make no sense, and strangers: the session does not notice, and requests still arrive.
TEST(Vxi11Service, NonsenseOnTheChannelBreaksNothing)
{
    const std::vector<std::string> nonsense = {
        "GET / HTTP/1.0\r\n\r\n",
        hex("80000000"),
        hex("FFFFFFFF") + std::string(100, 'x'),
        std::string(8000, '\0'),
        hex("80000008 00000001 00000001"),
        hex("8000"),
        request("another!"),
    };
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        const std::uint16_t port = serveCreate(core);
        const std::string handle = serveEnable(core);
        for (const std::string &bytes : nonsense) {
            RawClient stranger(port);
            stranger.trySend(bytes);
        }
        std::array<std::unique_ptr<RawClient>, 10> crowd;
        for (auto &one : crowd)
            one = std::make_unique<RawClient>(port);
        RawClient channel(port);
        // The procedure left out, the handle without its length: requests are known by their handle.
        channel.send(hex("80000020 00000001 00000000 00000002 000607B1 00000001 00000000") + handle);
        EXPECT_EQ(takeWrite(core).size, 1u);
        EXPECT_EQ(crowd.front()->receiveAll(), "") << "the oldest make room: there is no end of strangers";
        channel.send(request(handle));
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    ASSERT_EQ(enable(session), VI_SUCCESS);
    EXPECT_EQ(wait(session), VI_SUCCESS);
    EXPECT_EQ(wait(session, 0), VI_ERROR_TMO) << "a stranger's request is no event";
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    EXPECT_EQ(wait(session), VI_SUCCESS);
}

TEST(Vxi11Service, AChannelThatBreaksMayBeMadeAnew)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        const std::uint16_t port = serveCreate(core);
        const std::string handle = serveEnable(core);
        {
            RawClient first(port);
            first.send(request(handle));
        }
        RawClient second(port);
        second.send(request(handle));
        Vxi11Peer::endLink(core);
    });
    ASSERT_EQ(enable(instrument.session), VI_SUCCESS);
    EXPECT_GE(wait(instrument.session), VI_SUCCESS);
    EXPECT_EQ(wait(instrument.session), VI_SUCCESS);
}

// 13. An instrument that never connects, or refuses, or does not answer: the session works, and closes.
TEST(Vxi11Service, AnInstrumentThatNeverConnectsSendsNoEvents)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        serveCreate(core);
        serveEnable(core);
        EXPECT_EQ(takeWrite(core).size, 1u);
        Vxi11Peer::endLink(core);
    });
    ASSERT_EQ(enable(instrument.session), VI_SUCCESS);
    EXPECT_EQ(wait(instrument.session, 20), VI_ERROR_TMO);
    EXPECT_EQ(instrument.session.write("?"), VI_SUCCESS);
}

TEST(Vxi11Service, AnInstrumentThatHasNoServiceRequestsSaysSo)
{
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        serveCreate(core, "00000008");
        serveCreate(core);
        serveEnable(core, "00000008");
        EXPECT_EQ(takeWrite(core).size, 1u);
        Vxi11Peer::endLink(core);
    });
    EXPECT_EQ(enable(instrument.session), VI_ERROR_INV_EVENT);
    EXPECT_EQ(enable(instrument.session), VI_ERROR_INV_EVENT);
    EXPECT_EQ(wait(instrument.session, 0), VI_ERROR_NENABLED);
    EXPECT_EQ(instrument.session.write("?"), VI_SUCCESS);
}

TEST(Vxi11Service, AnInstrumentThatDoesNotAnswerTheRequestForAChannelIsATimeOut)
{
    std::string later;
    Vxi11Instrument instrument(
        [&](RpcServed &core, Vxi11Peer &) {
            core.takeCall();
            const std::string late = core.record("00000000");
            // The channel of the attempt that was given up is in the way of the next one.
            EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 00000019");
            core.connection.send(late);
            core.reply("0000001D");
            core.serve("000607AF 00000001 0000001A |", "00000000");
            RawClient channel(serveCreate(core));
            channel.send(request(serveEnable(core)));
            Vxi11Peer::endLink(core);
        },
        NoAbort, 50);
    VisaSession &session = instrument.session;
    const Stopwatch watch;
    EXPECT_EQ(enable(session), VI_ERROR_TMO);
    EXPECT_LT(watch.milliseconds(), 15000);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(enable(session), VI_SUCCESS);
    EXPECT_EQ(wait(session), VI_SUCCESS);
}

TEST(Vxi11Service, ASessionClosesWhileRequestsPourIn)
{
    std::atomic<bool> done{false};
    std::thread pouring;
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        const std::uint16_t port = serveCreate(core);
        const std::string handle = serveEnable(core);
        pouring = std::thread([&done, port, handle] {
            RawClient channel(port);
            while (!done && channel.trySend(request(handle)))
                ;
        });
        Vxi11Peer::endLink(core);
    });
    ASSERT_EQ(enable(instrument.session), VI_SUCCESS);
    EXPECT_GE(wait(instrument.session), VI_SUCCESS);
    instrument.finish();
    done = true;
    pouring.join();
}

TEST(Vxi11Service, AForkedChildThatClosesLeavesLinkAndChannelToItsParent)
{
    std::promise<void> childHasGone;
    Vxi11Instrument instrument([&](RpcServed &core, Vxi11Peer &) {
        RawClient channel(serveCreate(core));
        const std::string handle = serveEnable(core);
        channel.send(request(handle));
        childHasGone.get_future().wait();
        channel.send(request(handle));
        EXPECT_EQ(takeWrite(core).size, 1u) << "the child has said nothing";
        Vxi11Peer::endLink(core);
    });
    VisaSession &session = instrument.session;
    ASSERT_EQ(enable(session), VI_SUCCESS);
    EXPECT_EQ(wait(session), VI_SUCCESS);
    const pid_t child = test::forkWhileOthersWait();
    if (child == 0) {
        ::alarm(30); // a child that hangs ends by a signal and fails the test
        ::_exit(session.write("x") == VI_ERROR_CONN_LOST && viClose(session.rm) == VI_SUCCESS ? 0 : 1);
    }
    int status = -1;
    ::waitpid(child, &status, 0);
    EXPECT_EQ(status, 0);
    childHasGone.set_value();
    EXPECT_EQ(wait(session), VI_SUCCESS);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
}
