#include "kyvisa/discovery/HttpGet.h"
#include "kyvisa/os/WaitLimit.h"
#include "support/ScriptedPeer.h"

#include <gtest/gtest.h>

using kyvisa::httpGet;
using test::PeerConnection;
using test::ScriptedPeer;

namespace
{

const std::string Request = "GET /lxi/identification HTTP/1.1\r\nHost: 127.0.0.1\r\n"
                            "Accept: text/xml, application/xml\r\nConnection: close\r\n\r\n";

class HttpGet : public testing::Test
{
protected:
    std::optional<std::string> get(const ScriptedPeer &peer,
                                   std::chrono::milliseconds within = std::chrono::seconds(20), std::size_t most = 1000)
    {
        return httpGet("127.0.0.1", peer.port(), "/lxi/identification", most,
                       {kyvisa::os::Deadline::after(within), m_wakeup});
    }
    /// What comes of this answer, after which the server closes.
    std::optional<std::string> answered(const std::string &answer)
    {
        ScriptedPeer peer([&](ScriptedPeer &self) {
            PeerConnection client = self.accept();
            client.expect(Request);
            client.send(answer);
        });
        return get(peer);
    }

    kyvisa::os::Wakeup m_wakeup;
};

TEST_F(HttpGet, TakesTheBody)
{
    EXPECT_EQ(answered("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\n\r\n<a>\r\n\r\n</a>"), "<a>\r\n\r\n</a>");
    EXPECT_EQ(answered("HTTP/1.0 200 OK\r\n\r\n"), "");
}

TEST_F(HttpGet, JoinsABodyInChunks)
{
    EXPECT_EQ(
        answered("HTTP/1.1 200 OK\r\ntransfer-encoding:  chunked \r\n\r\n3\r\nabc\r\nA;x=1\r\n0123456789\r\n0\r\n\r\n"),
        "abc0123456789");
    for (const char *chunks : {"", "5\r\nabc", "x\r\n", "3\r\nabcdef\r\n", "FFFFFFFFFFFFFFFFFFFF\r\nabc\r\n", "3"})
        EXPECT_EQ(answered(std::string("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n") + chunks), std::nullopt)
            << chunks;
}

TEST_F(HttpGet, RefusesEverythingButSuccess)
{
    for (const char *answer :
         {"HTTP/1.1 404 Not Found\r\n\r\nno", "SSH-2.0-x\r\n\r\n", "HTTP/1.1 200 OK\r\n", "", "HTTP/1.1",
          "HTTP/1.1 301 Moved\r\n\r\n", "HTTP/1.1 302 Found\r\nLocation: http://elsewhere/\r\n\r\n",
          "HTTP/1.1 302 Found\r\nLocation: //elsewhere/x\r\n\r\n"})
        EXPECT_EQ(answered(answer), std::nullopt) << answer;
}

TEST_F(HttpGet, FollowsARedirectionOnTheSameHost)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        {
            PeerConnection client = self.accept();
            client.expect(Request);
            client.send("HTTP/1.1 301 Moved\r\nLOCATION: /Lxi/Identification\r\n\r\n");
        }
        PeerConnection client = self.accept();
        client.expect("GET /Lxi/Identification HTTP/1.1\r\n");
        client.take(Request.size() - 34);
        client.send("HTTP/1.1 200 OK\r\n\r\nfound");
    });
    EXPECT_EQ(get(peer), "found");
}

TEST_F(HttpGet, GivesUpOnACircle)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        for (int i = 0; i < 4; ++i) {
            PeerConnection client = self.accept();
            client.expect(Request);
            client.send("HTTP/1.1 302 Found\r\nLocation: /lxi/identification\r\n\r\n");
        }
    });
    EXPECT_EQ(get(peer), std::nullopt);
}

TEST_F(HttpGet, RefusesABodyThatIsTooLarge)
{
    EXPECT_EQ(answered("HTTP/1.1 200 OK\r\n\r\n" + std::string(5000, 'x')), std::nullopt);
}

TEST_F(HttpGet, EndsAtItsLimit)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        PeerConnection client = self.accept();
        client.expect(Request);
        client.send("HTTP/1.1 200 OK\r\n\r\nsome");
        client.expectClosed();
    });
    EXPECT_EQ(get(peer, std::chrono::milliseconds(50)), std::nullopt);
}

} // namespace
