#include "simulator/server/HttpServer.h"
#include "simulator/server/Listener.h"
#include "support/RawClient.h"

#include <gmock/gmock.h>

#include <optional>
#include <stdexcept>
#include <thread>

using namespace simulator;
using test::RawClient;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

namespace
{

constexpr std::chrono::milliseconds Short{50};
constexpr std::chrono::milliseconds Long = std::chrono::minutes{10};

/// A server with pages of the test's own, on a loop of its own.
class HttpPages : public testing::Test
{
protected:
    void serve(HttpServer::Patience patience)
    {
        m_server.emplace(m_loop, patience);
        m_server->add("GET", "/large",
                      [](const HttpRequest &) { return HttpResponse{.body = std::string(64 << 20, 'x')}; });
        m_server->add("GET", "/throws",
                      [](const HttpRequest &) -> HttpResponse { throw std::runtime_error("no luck"); });
        m_server->add("POST", "/form", [this](const HttpRequest &request) {
            m_posted += request.body;
            return HttpResponse::seeOther("/after");
        });
        m_server->add("GET", "/posted", [this](const HttpRequest &) { return HttpResponse{.body = m_posted}; });
        m_server->add("GET", "/stop", [this](const HttpRequest &) {
            m_loop.stop();
            return HttpResponse{};
        });
        m_listener.emplace(m_loop, ListenAddress{"127.0.0.1", false}, 0,
                           [this](FileDescriptor socket) { m_server->accept(std::move(socket)); });
        m_thread = std::thread([this] { m_loop.run(); });
    }

    void TearDown() override
    {
        ask("GET /stop", "");
        m_thread.join();
    }

    std::uint16_t port() const { return m_listener->port(); }

    std::string ask(const std::string &request, const std::string &fields, const std::string &body = {}) const
    {
        RawClient client(port());
        client.send(request + " HTTP/1.1\r\nHost: here:80\r\nConnection: close\r\n" + fields + "\r\n" + body);
        return client.receiveAll();
    }

private:
    EventLoop m_loop;
    std::optional<HttpServer> m_server;
    std::optional<Listener> m_listener;
    std::thread m_thread;
    std::string m_posted; ///< of the loop's thread
};

} // namespace

TEST_F(HttpPages, DropAClientThatAsksNothing)
{
    serve({.idle = Short, .request = Long, .answer = Long});
    EXPECT_EQ(RawClient(port()).receiveAll(), "");
}

TEST_F(HttpPages, DropAClientThatNeverEndsItsRequest)
{
    serve({.idle = Long, .request = Short, .answer = Long});
    for (const char *part :
         {"G", "GET / HTTP/1.1\r\nHost: a\r\n", "POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 2\r\n\r\na"}) {
        RawClient client(port());
        client.send(part);
        EXPECT_THAT(client.receiveAll(), StartsWith("HTTP/1.1 408 Request Timeout\r\n")) << part;
    }
}

TEST_F(HttpPages, DropAClientThatDripsItsRequest)
{
    serve({.idle = Long, .request = Short, .answer = Long});
    RawClient client(port());
    client.send("GET / HTTP/1.1\r\n");
    while (client.silentFor(std::chrono::milliseconds{1}))
        client.trySend("A"); // each byte comes in time, the whole does not
    EXPECT_THAT(client.receiveAll(), StartsWith("HTTP/1.1 408 "));
}

TEST_F(HttpPages, DropAClientThatDoesNotTakeItsAnswer)
{
    serve({.idle = Long, .request = Long, .answer = Short});
    RawClient client(port());
    client.send("GET /large HTTP/1.1\r\nHost: a\r\n\r\n");
    std::this_thread::sleep_for(Short * 4); // what is tested is that nobody takes it for longer than the patience
    EXPECT_LT(client.receiveAll().size(), std::size_t{64} << 20);
}

TEST_F(HttpPages, GiveALargeAnswerToWhoTakesIt)
{
    serve({.idle = Long, .request = Long, .answer = Long});
    const std::string answer = ask("GET /large", "");
    EXPECT_EQ(answer.size() - answer.find("\r\n\r\n"), (std::size_t{64} << 20) + 4);
}

TEST_F(HttpPages, MayFailWithoutHarm)
{
    serve({.idle = Long, .request = Long, .answer = Long});
    EXPECT_THAT(ask("GET /throws", ""), StartsWith("HTTP/1.1 500 Internal Server Error\r\n"));
}

TEST_F(HttpPages, TakeFormsAndLeadToAPage)
{
    serve({.idle = Long, .request = Long, .answer = Long});
    const std::string answer = ask("POST /form", "Content-Length: 3\r\nOrigin: http://here:80\r\n", "a=b");
    EXPECT_THAT(answer, StartsWith("HTTP/1.1 303 See Other\r\n"));
    EXPECT_THAT(answer, HasSubstr("Location: /after\r\n"));
    EXPECT_THAT(ask("GET /posted", ""), HasSubstr("a=b"));
}

TEST_F(HttpPages, TakeNoFormFromAnotherSite)
{
    serve({.idle = Long, .request = Long, .answer = Long});
    for (const char *origin : {"http://elsewhere", "null", "https://here:80", "http://here:81"})
        EXPECT_THAT(ask("POST /form", "Content-Length: 3\r\nOrigin: " + std::string(origin) + "\r\n", "a=b"),
                    StartsWith("HTTP/1.1 403 Forbidden\r\n"))
            << origin;
    EXPECT_THAT(ask("GET /posted", ""), Not(HasSubstr("a=b")));
}

TEST_F(HttpPages, ChangeNothingWhenTheyAreOnlyLookedAt)
{
    serve({.idle = Long, .request = Long, .answer = Long});
    EXPECT_THAT(ask("GET /form?a=b", ""), StartsWith("HTTP/1.1 405 "));
    EXPECT_THAT(ask("GET /form?a=b", ""), HasSubstr("Allow: POST\r\n"));
}
