#include "kyvisa/transport/RpcClient.h"

#include "kyvisa/os/Wakeup.h"

#include <array>
#include <future>
#include <gtest/gtest.h>
#include <poll.h>
#include <string>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>

using namespace kyvisa;
using namespace wire;
using os::IoResult;
using std::chrono::milliseconds;

namespace
{

std::string text(std::uint32_t word)
{
    std::string bytes;
    for (int shift = 24; shift >= 0; shift -= 8)
        bytes += static_cast<char>(word >> shift);
    return bytes;
}

std::uint32_t number(std::string_view bytes)
{
    std::uint32_t value = 0;
    for (const char byte : bytes.substr(0, 4))
        value = value << 8 | static_cast<unsigned char>(byte);
    return value;
}

/// A client at one end of a pair of sockets; the test is at the other.
class RpcClientTest : public testing::Test
{
protected:
    RpcClientTest()
    {
        std::array<int, 2> ends{};
        EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0, ends.data()), 0);
        m_far = ends[1];
        m_client = std::make_unique<RpcClient>(os::StreamSocket(ends[0]), 100, 1);
    }
    ~RpcClientTest() override { hangUp(); }

    os::WaitLimit within(int span) { return {os::Deadline::after(milliseconds(span)), m_wakeup}; }
    void hangUp()
    {
        if (m_far >= 0)
            ::close(std::exchange(m_far, -1));
    }
    void say(std::string_view bytes)
    {
        ASSERT_EQ(::send(m_far, bytes.data(), bytes.size(), MSG_NOSIGNAL), static_cast<ssize_t>(bytes.size()));
    }
    std::string hear(std::size_t count)
    {
        std::string bytes(count, '\0');
        for (std::size_t got = 0; got < count;) {
            pollfd watched{m_far, POLLIN, 0};
            const ssize_t piece = ::poll(&watched, 1, 20000) == 1 ? ::recv(m_far, &bytes[got], count - got, 0) : -1;
            if (piece <= 0) {
                ADD_FAILURE() << "the client sent " << got << " of " << count << " bytes";
                return bytes.substr(0, got);
            }
            got += static_cast<std::size_t>(piece);
        }
        return bytes;
    }
    /// A whole record of the client's.
    std::string hearRecord()
    {
        const std::string mark = hear(4);
        EXPECT_EQ(mark[0] & '\x80', '\x80');
        return hear(number(mark) & 0x7FFFFFFF);
    }
    IoResult call(std::uint32_t procedure, int span, std::span<const std::byte> data = {})
    {
        m_client->begin(procedure);
        return m_client->send(within(span), data);
    }
    static std::string record(const std::string &xid, std::string_view results)
    {
        std::string body = xid + text(1) + std::string(16, '\0');
        body += results;
        return text(0x80000000u | static_cast<std::uint32_t>(body.size())) + body;
    }
    std::string results(std::size_t size, int span = 20000)
    {
        rpc::Reply reply;
        if (m_client->receive(reply, within(span)) != IoResult::Done)
            return "no reply";
        std::string bytes(size, '\0');
        const os::Transfer got = m_client->take(std::as_writable_bytes(std::span(bytes)), within(span));
        return got.result == IoResult::Done ? bytes : "no results";
    }

    os::Wakeup m_wakeup;
    std::unique_ptr<RpcClient> m_client;
    int m_far = -1;
};

} // namespace

TEST_F(RpcClientTest, ACallThatStoppedInTheMiddleGoesOutBeforeTheNextOne)
{
    std::string data(4 * 1024 * 1024 + 1, '\0');
    for (std::size_t i = 0; i < data.size(); ++i)
        data[i] = static_cast<char>(i * 31 + i / 255);
    EXPECT_EQ(call(7, 20, std::as_bytes(std::span(data))), IoResult::TimedOut);
    EXPECT_FALSE(m_client->awaitsReply());
    const std::string sent = data;
    data.assign(data.size(), 'x'); // the caller may do with its buffer what it likes
    auto calling = std::async(std::launch::async, [&] { return call(8, 20000); });
    const std::string first = hearRecord();
    EXPECT_EQ(number(first.substr(20)), 7u);
    EXPECT_TRUE(first.substr(40, sent.size()) == sent);
    EXPECT_EQ(first.size(), 40 + sent.size() + 3);
    const std::string second = hearRecord();
    EXPECT_EQ(number(second.substr(20)), 8u);
    EXPECT_EQ(calling.get(), IoResult::Done);
    say(record(first.substr(0, 4), "late"));
    say(record(second.substr(0, 4), "good"));
    EXPECT_EQ(results(4), "good");
}

TEST_F(RpcClientTest, ATimeOutAtAnyByteOfAReplyLeavesTheNextOneWhole)
{
    for (std::size_t cut = 0; cut <= 4 + 24 + 8; ++cut) {
        ASSERT_EQ(call(1, 20000), IoResult::Done);
        const std::string late = record(hearRecord().substr(0, 4), "too late");
        say(late.substr(0, cut));
        // Half of the results are enough for some callers.
        results(8, 0);
        ASSERT_EQ(call(2, 20000), IoResult::Done);
        const std::string xid = hearRecord().substr(0, 4);
        say(late.substr(cut));
        say(record(xid, "in time!"));
        ASSERT_EQ(results(8), "in time!") << cut;
    }
}

TEST_F(RpcClientTest, AReplyMayBeAwaitedAgainWhereItStopped)
{
    for (std::size_t cut = 0; cut < 4 + 24; ++cut) {
        ASSERT_EQ(call(1, 20000), IoResult::Done);
        const std::string whole = record(hearRecord().substr(0, 4), "patience");
        say(whole.substr(0, cut));
        rpc::Reply reply;
        EXPECT_EQ(m_client->receive(reply, within(0)), IoResult::TimedOut);
        EXPECT_TRUE(m_client->awaitsReply());
        say(whole.substr(cut));
        ASSERT_EQ(results(8), "patience") << cut;
        EXPECT_FALSE(m_client->awaitsReply());
    }
}

TEST_F(RpcClientTest, ACutAtAnyByteIsAClosedConnection)
{
    ASSERT_EQ(call(1, 20000), IoResult::Done);
    say(record(hearRecord().substr(0, 4), "four").substr(0, 4 + 24 + 2));
    hangUp();
    rpc::Reply reply;
    ASSERT_EQ(m_client->receive(reply, within(20000)), IoResult::Done);
    std::array<std::byte, 4> bytes{};
    const os::Transfer got = m_client->take(bytes, within(20000));
    EXPECT_EQ(got.result, IoResult::Closed);
    EXPECT_EQ(got.count, 2u);
}

TEST_F(RpcClientTest, AWakeUpEndsTheWaitAndTheReplyIsStillRecognised)
{
    ASSERT_EQ(call(1, 20000), IoResult::Done);
    const std::string xid = hearRecord().substr(0, 4);
    rpc::Reply reply;
    m_wakeup.terminate();
    EXPECT_EQ(m_client->receive(reply, within(20000)), IoResult::Woken);
    m_wakeup.rearm();
    say(record(xid, "good"));
    EXPECT_EQ(results(4), "good");
}
