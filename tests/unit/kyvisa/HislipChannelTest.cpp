// The two connections of a HiSLIP session when the system takes less than it was given: what was cut is finished, what never
// left has used up nothing.
#include "kyvisa/include/visa.h"
#include "kyvisa/os/SystemCalls.h"
#include "kyvisa/transport/HislipAsyncChannel.h"
#include "kyvisa/transport/HislipTransport.h"
#include "support/ScriptedPeer.h"

#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>

using namespace kyvisa;
using namespace wire::hislip;
using test::hex;

namespace
{

constexpr std::size_t Unlimited = SIZE_MAX;
/// Bytes that the system takes before it says that it is full. The channel's thread looks too.
std::atomic<std::size_t> g_room{Unlimited};

ssize_t sendIntoRoom(int descriptor, const msghdr *message, int flags)
{
    if (g_room == Unlimited)
        return ::sendmsg(descriptor, message, flags);
    if (g_room == 0) {
        errno = EAGAIN;
        return -1;
    }
    iovec first = message->msg_iov[0];
    first.iov_len = std::min(first.iov_len, g_room.load());
    g_room -= first.iov_len;
    msghdr shorter{};
    shorter.msg_iov = &first;
    shorter.msg_iovlen = 1;
    return ::sendmsg(descriptor, &shorter, flags);
}

/// Full sockets stay full.
int pollThatFindsThemFull(pollfd *descriptors, nfds_t count, const timespec *timeout)
{
    if (g_room != Unlimited && descriptors[0].events == POLLOUT) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
        return 0;
    }
    return os::realSystemCalls().poll(descriptors, count, timeout);
}

os::SystemCalls narrow()
{
    os::SystemCalls calls = os::realSystemCalls();
    calls.sendmsg = sendIntoRoom;
    calls.poll = pollThatFindsThemFull;
    return calls;
}

/// Both ends of a connection; the library's is non-blocking.
class Line
{
public:
    Line()
    {
        EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM, 0, m_ends.data()), 0);
        EXPECT_EQ(::fcntl(m_ends[0], F_SETFL, O_NONBLOCK), 0);
    }
    os::StreamSocket near() const { return os::StreamSocket(m_ends[0]); }
    test::PeerConnection far() const { return test::PeerConnection(m_ends[1]); }

private:
    std::array<int, 2> m_ends{-1, -1};
};

class HislipCut : public testing::Test
{
protected:
    HislipCut() { g_room = Unlimited; }
    ~HislipCut() override { g_room = Unlimited; }

    os::WaitLimit within(int milliseconds) const
    {
        return {os::Deadline::after(std::chrono::milliseconds(milliseconds)), m_nobody};
    }

    const os::SystemCalls m_calls = narrow();
    const os::ReplacedSystemCalls m_replaced{m_calls};
    os::Wakeup m_nobody;
};

TEST_F(HislipCut, RequestOnTheOtherChannelIsFinishedByTheNextAndItsAnswerDropped)
{
    const Line line;
    HislipAsyncChannel channel(line.near());
    test::PeerConnection peer = line.far();
    HislipAsyncChannel::Reply reply;
    const Header query{MessageType::AsyncStatusQuery, 0, 0xFFFFFEFE, 0};

    g_room = 5;
    EXPECT_EQ(channel.transact(query, {}, MessageType::AsyncStatusResponse, reply, within(20)), VI_ERROR_TMO);
    g_room = Unlimited;
    peer.send(hex("48531611 00000000 0000000000000000") + hex("48531622 00000000 0000000000000000"));
    EXPECT_EQ(channel.transact(query, {}, MessageType::AsyncStatusResponse, reply, within(20000)), VI_SUCCESS);
    EXPECT_EQ(reply.header.control, 0x22);
    peer.expect(hex("48531500 FFFFFEFE 0000000000000000") + hex("48531500 FFFFFEFE 0000000000000000"));
}

TEST_F(HislipCut, RequestThatNeverLeftIsNotAnswered)
{
    const Line line;
    HislipAsyncChannel channel(line.near());
    test::PeerConnection peer = line.far();
    HislipAsyncChannel::Reply reply;
    const Header query{MessageType::AsyncStatusQuery, 0, 0xFFFFFEFE, 0};

    g_room = 0;
    EXPECT_EQ(channel.transact(query, {}, MessageType::AsyncStatusResponse, reply, within(20)), VI_ERROR_TMO);
    g_room = Unlimited;
    peer.send(hex("48531611 00000000 0000000000000000"));
    EXPECT_EQ(channel.transact(query, {}, MessageType::AsyncStatusResponse, reply, within(20000)), VI_SUCCESS);
    EXPECT_EQ(reply.header.control, 0x11);
    peer.expect(hex("48531500 FFFFFEFE 0000000000000000"));
}

TEST_F(HislipCut, ShortPayloadIsFinishedAsItWasMeant)
{
    const Line line;
    HislipAsyncChannel channel(line.near());
    test::PeerConnection peer = line.far();
    HislipAsyncChannel::Reply reply;
    const auto size = encodeSize(0x100000);

    g_room = 18; // two bytes into the payload
    EXPECT_EQ(channel.transact({MessageType::AsyncMaximumMessageSize, 0, 0, 8}, size,
                               MessageType::AsyncMaximumMessageSizeResponse, reply, within(20)),
              VI_ERROR_TMO);
    g_room = Unlimited;
    peer.send(hex("48531000 00000000 0000000000000008 0000000000000400") + hex("48531611 00000000 0000000000000000"));
    EXPECT_EQ(channel.transact({MessageType::AsyncStatusQuery, 0, 0, 0}, {}, MessageType::AsyncStatusResponse, reply,
                               within(20000)),
              VI_SUCCESS);
    peer.expect(hex("48530F00 00000000 0000000000000008 0000000000100000"));
}

TEST_F(HislipCut, LockRequestThatWasCutIsGivenBackWhenItIsGranted)
{
    const Line line;
    HislipAsyncChannel channel(line.near());
    test::PeerConnection peer = line.far();
    std::uint8_t control = 0;
    const std::array key = {std::byte{'k'}, std::byte{'e'}, std::byte{'y'}};

    g_room = 17;
    EXPECT_EQ(channel.requestLock(std::chrono::milliseconds(7), key, 0xFFFFFF00, control, within(20)), VI_ERROR_TMO);
    g_room = Unlimited;
    std::thread instrument([&] {
        peer.expect(hex("48530401 00000007 0000000000000003") + "key");
        peer.send(hex("48530501 00000000 0000000000000000"));
        peer.expect(hex("48530400 FFFFFF00 0000000000000000"));
        peer.send(hex("48530502 00000000 0000000000000000"));
        peer.expect(hex("48530401 00000008 0000000000000000"));
        peer.send(hex("48530501 00000000 0000000000000000"));
    });
    EXPECT_EQ(channel.requestLock(std::chrono::milliseconds(8), {}, 0xFFFFFF02, control, within(20000)), VI_SUCCESS);
    EXPECT_EQ(control, 1);
    instrument.join();
    channel.close();
}

TEST_F(HislipCut, ReleaseThatNeverLeftFollowsBehindTheNextRequest)
{
    const Line line;
    HislipAsyncChannel channel(line.near());
    test::PeerConnection peer = line.far();
    std::uint8_t control = 0;
    peer.send(hex("48530501 00000000 0000000000000000"));
    ASSERT_EQ(channel.requestLock(std::chrono::milliseconds(7), {}, 0xFFFFFF00, control, within(20000)), VI_SUCCESS);

    g_room = 0;
    EXPECT_EQ(channel.releaseLock(0xFFFFFF02, control, within(20)), VI_ERROR_TMO);
    g_room = Unlimited;
    std::thread instrument([&] {
        peer.expect(hex("48530401 00000007 0000000000000000"));
        peer.expect(hex("48530400 FFFFFF02 0000000000000000")); // or the lock would be nobody's for ever
        peer.send(hex("48530501 00000000 0000000000000000"));
        peer.expect(hex("48530401 00000008 0000000000000000"));
        peer.send(hex("48530501 00000000 0000000000000000"));
    });
    EXPECT_EQ(channel.requestLock(std::chrono::milliseconds(8), {}, 0xFFFFFF02, control, within(20000)), VI_SUCCESS);
    instrument.join();
    channel.close();
}

TEST_F(HislipCut, ReleaseBehindAnUnansweredRequestWaitsForItsAnswer)
{
    const Line line;
    HislipAsyncChannel channel(line.near());
    test::PeerConnection peer = line.far();
    std::uint8_t control = 0;
    const std::array key = {std::byte{'k'}};
    peer.send(hex("48530501 00000000 0000000000000000"));
    ASSERT_EQ(channel.requestLock(std::chrono::milliseconds(7), key, 0xFFFFFF00, control, within(20000)), VI_SUCCESS);
    EXPECT_NE(channel.requestLock(std::chrono::milliseconds(9), {}, 0xFFFFFF00, control, within(20)), VI_SUCCESS);
    EXPECT_EQ(channel.releaseLock(0xFFFFFF02, control, within(20)), VI_ERROR_TMO);
    channel.forgetPast(); // a device clear: both counts begin anew, and what is owed stays owed
    std::thread instrument([&] {
        peer.expect(hex("48530401 00000007 0000000000000001") + "k" + hex("48530401 00000009 0000000000000000") +
                    hex("48531500 00000000 0000000000000000") + hex("48530400 FFFFFEFE 0000000000000000"));
        peer.send(hex("48531600 00000000 0000000000000000"));
    });
    HislipAsyncChannel::Reply reply;
    EXPECT_EQ(channel.transact({MessageType::AsyncStatusQuery, 0, 0, 0}, {}, MessageType::AsyncStatusResponse, reply,
                               within(20000)),
              VI_SUCCESS);
    instrument.join();
    channel.close();
}

/// A session whose two connections end in this test.
struct Session {
    explicit Session(std::chrono::milliseconds patienceForClear = std::chrono::seconds(60))
        : transport(HislipChannel(syncLine.near(), 1024), std::make_unique<HislipAsyncChannel>(asyncLine.near()), false,
                    patienceForClear)
    {
    }

    Line syncLine;
    Line asyncLine;
    HislipTransport transport;
    test::PeerConnection sync = syncLine.far();
    test::PeerConnection async = asyncLine.far();
};

std::span<const std::byte> bytes(std::string_view text)
{
    return std::as_bytes(std::span(text));
}

void agreeOnSizes(Session &session, const os::WaitLimit &limit)
{
    session.async.send(hex("48531000 00000000 0000000000000008 0000000000100000"));
    ASSERT_EQ(session.transport.agreeOnSizes(0x100000, limit), VI_SUCCESS);
}

TEST_F(HislipCut, MessageThatNeverLeftHasNotUsedUpItsNumberNorTheWordOfDelivery)
{
    Session session;
    agreeOnSizes(session, within(20000));
    std::array<std::byte, 4> answer;
    std::size_t count = 0;
    ASSERT_EQ(session.transport.write(bytes("?"), {}, within(20000), count), VI_SUCCESS);
    session.sync.send(hex("48530700 FFFFFF00 0000000000000001") + "!");
    count = 0;
    ASSERT_EQ(session.transport.read(answer, {}, within(20000), count), VI_SUCCESS);

    g_room = 0;
    count = 0;
    EXPECT_EQ(session.transport.write(bytes("late"), {}, within(20), count), VI_ERROR_TMO);
    EXPECT_EQ(count, 0u);
    EXPECT_EQ(session.transport.trigger({}, within(20)), VI_ERROR_TMO);
    g_room = Unlimited;
    EXPECT_EQ(session.transport.write(bytes("x"), {}, within(20000), count), VI_SUCCESS);
    session.sync.expect(hex("48530700 FFFFFF00 0000000000000001") + "?" + hex("48530701 FFFFFF02 0000000000000001") +
                        "x");
}

TEST_F(HislipCut, StatusQueryThatNeverLeftHasNotUsedUpTheWordOfDelivery)
{
    Session session;
    agreeOnSizes(session, within(20000));
    std::array<std::byte, 4> answer;
    std::size_t count = 0;
    session.sync.send(hex("48530700 FFFFFEFE 0000000000000001") + "!");
    ASSERT_EQ(session.transport.read(answer, {}, within(20000), count), VI_SUCCESS);

    g_room = 0;
    ViUInt16 status = 0;
    EXPECT_EQ(session.transport.readStatusByte({}, within(20), status), VI_ERROR_TMO);
    g_room = Unlimited;
    count = 0;
    EXPECT_EQ(session.transport.write(bytes("x"), {}, within(20000), count), VI_SUCCESS);
    session.sync.expect(hex("48530701 FFFFFF00 0000000000000001") + "x");
}

TEST_F(HislipCut, ClearThatIsNeverAnsweredIsALostConnectionInTheEnd)
{
    for (const bool acknowledged : {false, true}) {
        Session session(std::chrono::milliseconds(acknowledged ? 2000 : 1));
        agreeOnSizes(session, within(20000));
        session.async.expect(hex("48530F00 00000000 0000000000000008 0000000000100000"));
        if (acknowledged)
            session.async.send(hex("48531700 00000000 0000000000000000"));
        ViStatus status = session.transport.clear(within(20));
        for (int i = 0; i < 1000 && status == VI_ERROR_TMO; ++i)
            status = session.transport.clear(within(20));
        EXPECT_EQ(status, VI_ERROR_CONN_LOST);
        session.async.expect(hex("48531300 00000000 0000000000000000") + hex("48530200 00000000 0000000000000000"));
        if (acknowledged)
            session.sync.expect(hex("48530800 00000000 0000000000000000"));
        session.sync.expect(hex("48530200 00000000 0000000000000000"));
        session.sync.expectClosed();
    }
}

TEST_F(HislipCut, MessageThatWasCutHasUsedUpItsNumber)
{
    Session session;
    agreeOnSizes(session, within(20000));
    std::size_t count = 0;
    g_room = 18;
    EXPECT_EQ(session.transport.write(bytes("late"), {}, within(20), count), VI_ERROR_TMO);
    EXPECT_EQ(count, 2u);
    g_room = Unlimited;
    EXPECT_EQ(session.transport.write(bytes("x"), {}, within(20000), count), VI_ERROR_RAW_WR_PROT_VIOL);
    session.async.send(hex("48531700 00000000 0000000000000000"));
    session.sync.send(hex("48530900 00000000 0000000000000000"));
    EXPECT_EQ(session.transport.clear(within(20000)), VI_SUCCESS);
    session.sync.expect(hex("48530700 FFFFFF00 0000000000000004") + "late" + hex("48530800 00000000 0000000000000000"));
}

} // namespace
