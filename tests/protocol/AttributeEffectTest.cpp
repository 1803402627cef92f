// What setting an attribute does: seen on the wire and in the system's sockets, not by reading it back.
#include "support/HislipPeer.h"
#include "support/SocketOptions.h"
#include "support/VisaSession.h"

#include <chrono>
#include <future>
#include <gtest/gtest.h>

using test::acceptHislip;
using test::hex;
using test::HislipConnections;
using test::PeerConnection;
using test::ScriptedPeer;
using test::socketOption;
using test::socketsTo;
using test::VisaSession;

namespace
{

/// Runs @p user on a raw socket session that stays open until it is done; the peer follows @p script meanwhile.
template <typename Script, typename User>
void overSocket(Script script, User user)
{
    ScriptedPeer peer([&](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        script(client);
        client.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open("TCPIP::127.0.0.1::" + std::to_string(peer.port()) + "::SOCKET", 20000), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    user(session, socketsTo(peer.port()));
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

template <typename Script, typename User>
void overHislip(Script script, User user)
{
    ScriptedPeer peer([&](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        script(client);
        client.sync.expectClosed();
    });
    VisaSession session;
    const std::string name = "TCPIP::127.0.0.1::hislip0," + std::to_string(peer.port()) + "::INSTR";
    ASSERT_EQ(session.open(name, 20000), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    user(session, socketsTo(peer.port()));
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

void switchSocketOptions(VisaSession &session, const std::vector<int> &sockets, std::size_t howMany)
{
    ASSERT_EQ(sockets.size(), howMany);
    for (const int descriptor : sockets) {
        EXPECT_NE(socketOption(descriptor, IPPROTO_TCP, TCP_NODELAY), 0) << "the standard's default";
        EXPECT_EQ(socketOption(descriptor, SOL_SOCKET, SO_KEEPALIVE), 0) << "the standard's default";
    }
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_KEEPALIVE, VI_TRUE), VI_SUCCESS);
    for (const int descriptor : sockets) {
        EXPECT_NE(socketOption(descriptor, SOL_SOCKET, SO_KEEPALIVE), 0);
        EXPECT_LT(socketOption(descriptor, IPPROTO_TCP, TCP_KEEPIDLE), 300) << "firewalls forget after five minutes";
    }
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_KEEPALIVE, VI_FALSE), VI_SUCCESS);
    for (const int descriptor : sockets)
        EXPECT_EQ(socketOption(descriptor, SOL_SOCKET, SO_KEEPALIVE), 0);
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_NODELAY, VI_FALSE), VI_SUCCESS);
    // HiSLIP's second connection carries short requests alone and keeps sending them at once.
    EXPECT_EQ(socketOption(sockets.front(), IPPROTO_TCP, TCP_NODELAY), 0);
    EXPECT_EQ(session.set(VI_ATTR_TCPIP_NODELAY, VI_TRUE), VI_SUCCESS);
    EXPECT_NE(socketOption(sockets.front(), IPPROTO_TCP, TCP_NODELAY), 0);
}

TEST(AttributeEffect, KeepAliveAndNoDelayReachARawSocket)
{
    overSocket([](PeerConnection &) {},
               [](VisaSession &session, const std::vector<int> &sockets) { switchSocketOptions(session, sockets, 1); });
}

TEST(AttributeEffect, KeepAliveAndNoDelayReachTheConnectionsOfHislip)
{
    overHislip([](HislipConnections &) {},
               [](VisaSession &session, const std::vector<int> &sockets) { switchSocketOptions(session, sockets, 2); });
}

TEST(AttributeEffect, WriteBufferThatIsFlushedOnAccessSendsEachPrint)
{
    std::promise<void> hasCome;
    overSocket(
        [&](PeerConnection &client) {
            client.expect("no line end"); // with the line end of the next one it would come later
            hasCome.set_value();
            client.expect("kept and now a line\n");
        },
        [&](VisaSession &session, const std::vector<int> &) {
            EXPECT_EQ(session.set(VI_ATTR_WR_BUF_OPER_MODE, VI_FLUSH_ON_ACCESS), VI_SUCCESS);
            EXPECT_EQ(viPrintf(session.vi, "no line end"), VI_SUCCESS);
            EXPECT_EQ(hasCome.get_future().wait_for(std::chrono::seconds(30)), std::future_status::ready);
            EXPECT_EQ(session.set(VI_ATTR_WR_BUF_OPER_MODE, VI_FLUSH_WHEN_FULL), VI_SUCCESS);
            EXPECT_EQ(viPrintf(session.vi, "kept"), VI_SUCCESS);
            EXPECT_EQ(viPrintf(session.vi, " and now a line\n"), VI_SUCCESS);
        });
}

TEST(AttributeEffect, ReadBufferThatIsFlushedOnAccessForgetsTheRest)
{
    overSocket(
        [](PeerConnection &client) {
            client.expect("?\n");
            client.send("1 2\n");
            client.expect("?\n");
            client.send("3 4\n");
            client.expect("?\n");
            client.send("5\n");
        },
        [](VisaSession &session, const std::vector<int> &) {
            session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
            int number = 0;
            EXPECT_EQ(session.write("?\n"), VI_SUCCESS);
            EXPECT_EQ(viScanf(session.vi, "%d", &number), VI_SUCCESS);
            EXPECT_EQ(number, 1);
            EXPECT_EQ(viScanf(session.vi, "%d", &number), VI_SUCCESS);
            EXPECT_EQ(number, 2);
            EXPECT_EQ(viFlush(session.vi, VI_READ_BUF_DISCARD), VI_SUCCESS);
            EXPECT_EQ(session.set(VI_ATTR_RD_BUF_OPER_MODE, VI_FLUSH_ON_ACCESS), VI_SUCCESS);
            EXPECT_EQ(session.write("?\n"), VI_SUCCESS);
            EXPECT_EQ(viScanf(session.vi, "%d", &number), VI_SUCCESS);
            EXPECT_EQ(number, 3);
            EXPECT_EQ(session.write("?\n"), VI_SUCCESS);
            EXPECT_EQ(viScanf(session.vi, "%d", &number), VI_SUCCESS);
            EXPECT_EQ(number, 5) << "the 4 was forgotten";
        });
}

TEST(AttributeEffect, QueueLengthIsTheNumberOfEventsThatAreKept)
{
    overHislip(
        [](HislipConnections &client) {
            client.async.expect(hex("48530401 00000000 0000000000000000")); // the lock says that events are enabled
            for (int i = 0; i < 3; ++i)
                client.async.send(hex("48531440 00000000 0000000000000000"));
            client.async.send(hex("48530501 00000000 0000000000000000"));
        },
        [](VisaSession &session, const std::vector<int> &) {
            EXPECT_EQ(session.set(VI_ATTR_MAX_QUEUE_LENGTH, 2), VI_SUCCESS);
            ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
            ASSERT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 0, nullptr, nullptr), VI_SUCCESS);
            const auto next = [&] {
                return viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_TMO_IMMEDIATE, nullptr, nullptr);
            };
            EXPECT_EQ(next(), VI_WARN_QUEUE_OVERFLOW);
            EXPECT_EQ(next(), VI_SUCCESS);
            EXPECT_EQ(next(), VI_ERROR_TMO);
        });
}

} // namespace
