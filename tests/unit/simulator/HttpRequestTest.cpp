#include "simulator/server/HttpRequest.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace simulator;
using Progress = HttpRequestReader::Progress;

namespace
{

std::span<const std::byte> bytesOf(std::string_view text)
{
    return std::as_bytes(std::span(text.data(), text.size()));
}

/// Reads the text in one piece, and again in pieces of one byte: both have to come to the same.
Progress read(HttpRequestReader &reader, std::string_view text)
{
    HttpRequestReader slow;
    Progress piecewise = Progress::NeedsMore;
    for (std::size_t i = 0; i < text.size() && piecewise == Progress::NeedsMore; ++i) {
        auto byte = bytesOf(text.substr(i, 1));
        piecewise = slow.read(byte);
    }
    auto bytes = bytesOf(text);
    const Progress whole = reader.read(bytes);
    EXPECT_EQ(piecewise, whole) << text;
    EXPECT_EQ(slow.failure(), reader.failure()) << text;
    if (whole == Progress::Complete) {
        HttpRequestReader copy = reader;
        const HttpRequest one = copy.take();
        const HttpRequest other = slow.take();
        EXPECT_EQ(one.method, other.method);
        EXPECT_EQ(one.path, other.path);
        EXPECT_EQ(one.fields, other.fields);
        EXPECT_EQ(one.body, other.body);
    }
    return whole;
}

HttpRequest good(std::string_view text)
{
    HttpRequestReader reader;
    EXPECT_EQ(read(reader, text), Progress::Complete) << text << " fails with " << reader.failure();
    return reader.take();
}

int failureOf(std::string_view text)
{
    HttpRequestReader reader;
    EXPECT_EQ(read(reader, text), Progress::Failed) << text;
    return reader.failure();
}

} // namespace

TEST(HttpRequest, IsReadWithItsFields)
{
    const HttpRequest request = good("GET /lxi/identification?a=1 HTTP/1.1\r\nHost: 127.0.0.1:8080\r\n"
                                     "User-Agent:  some browser \t\r\naccept: a\r\nAccept: b\r\n\r\n");
    EXPECT_EQ(request.method, "GET");
    EXPECT_EQ(request.path, "/lxi/identification");
    EXPECT_EQ(request.query, "a=1");
    EXPECT_EQ(request.field("host"), "127.0.0.1:8080");
    EXPECT_EQ(request.field("user-agent"), "some browser");
    EXPECT_EQ(request.field("accept"), "a, b");
    EXPECT_EQ(request.field("absent"), "");
    EXPECT_EQ(request.body, "");
    EXPECT_TRUE(request.keepAlive);
}

TEST(HttpRequest, IsReadWithItsBody)
{
    EXPECT_EQ(good("POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 5\r\n\r\na\r\n\r\n").body, "a\r\n\r\n");
    EXPECT_EQ(good("POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 0\r\n\r\n").body, "");
    EXPECT_EQ(good("POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 2\r\nContent-Length: 2\r\n\r\nab").body, "ab");
}

TEST(HttpRequest, LeavesTheNextOneWhereItIs)
{
    HttpRequestReader reader;
    auto bytes = bytesOf("POST /1 HTTP/1.1\r\nHost: a\r\nContent-Length: 1\r\n\r\nxGET /2 HTTP/1.1\r\nHost: a\r\n\r\n");
    ASSERT_EQ(reader.read(bytes), Progress::Complete);
    EXPECT_EQ(reader.take().path, "/1");
    EXPECT_FALSE(reader.begun());
    ASSERT_EQ(reader.read(bytes), Progress::Complete);
    EXPECT_EQ(reader.take().path, "/2");
    EXPECT_TRUE(bytes.empty());
}

TEST(HttpRequest, MayEndLinesWithALineFeedAloneAndBeginWithEmptyOnes)
{
    EXPECT_EQ(good("\r\n\nGET /a HTTP/1.1\nHost: b\n\n").path, "/a");
}

TEST(HttpRequest, KeepsTheConnectionAsItsVersionSays)
{
    EXPECT_FALSE(good("GET / HTTP/1.1\r\nHost: a\r\nConnection: Close\r\n\r\n").keepAlive);
    EXPECT_FALSE(good("GET / HTTP/1.1\r\nHost: a\r\nConnection: x, close\r\n\r\n").keepAlive);
    EXPECT_TRUE(good("GET / HTTP/1.1\r\nHost: a\r\nConnection: closet\r\n\r\n").keepAlive);
    EXPECT_FALSE(good("GET / HTTP/1.0\r\n\r\n").keepAlive);
    EXPECT_TRUE(good("GET / HTTP/1.0\r\nConnection: Keep-Alive\r\n\r\n").keepAlive);
}

TEST(HttpRequest, ResolvesItsTarget)
{
    EXPECT_EQ(good("GET /a%20b%2F%c3%A4 HTTP/1.1\r\nHost: a\r\n\r\n").path, "/a b/\xC3\xA4");
    EXPECT_EQ(good("GET http://host:1/a?b HTTP/1.1\r\nHost: a\r\n\r\n").path, "/a");
    EXPECT_EQ(good("GET HTTP://host HTTP/1.1\r\nHost: a\r\n\r\n").path, "/");
    EXPECT_EQ(good("OPTIONS * HTTP/1.1\r\nHost: a\r\n\r\n").path, "*");
}

TEST(HttpRequest, IsRefusedWhenItIsNone)
{
    const struct {
        const char *text;
        int status;
    } rows[] = {
        {"*IDN?\n", 400},
        {"GET /\r\n", 400},
        {"GET / HTTP/1.1 \r\n", 400},
        {"GET  HTTP/1.1\r\n", 400},
        {"GET a HTTP/1.1\r\n", 400},
        {"GET /a b HTTP/1.1\r\n", 400},
        {"GET /\x80 HTTP/1.1\r\n", 400},
        {"GET /%4 HTTP/1.1\r\n", 400},
        {"GET /%zz HTTP/1.1\r\n", 400},
        {"G(T / HTTP/1.1\r\n", 400},
        {" / HTTP/1.1\r\n", 400},
        {"GET / http/1.1\r\n", 400},
        {"GET / HTTP/2.0\r\n", 505},
        {"GET / HTTP/0.9\r\n", 505},
        {"GET / HTTP/1.1\r\n\r\n", 400}, // no Host
        {"GET / HTTP/1.1\r\nHost: a\r\nHost: a\r\n", 400},
        {"GET / HTTP/1.1\r\nHost : a\r\n", 400},
        {"GET / HTTP/1.1\r\nHost: a\r\n folded\r\n", 400},
        {"GET / HTTP/1.1\r\n: a\r\n", 400},
        {"GET / HTTP/1.1\r\nHost\r\n", 400},
        {"GET / HTTP/1.1\r\nHost: a\rb\r\n", 400},
        {"POST / HTTP/1.1\r\nHost: a\r\nContent-Length: -1\r\n\r\n", 400},
        {"POST / HTTP/1.1\r\nHost: a\r\nContent-Length: +1\r\n\r\n", 400},
        {"POST / HTTP/1.1\r\nHost: a\r\nContent-Length:\r\n\r\n", 400},
        {"POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 1x\r\n\r\n", 400},
        {"POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 1\r\nContent-Length: 2\r\n", 400},
        {"POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 65537\r\n\r\n", 413},
        {"POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 99999999999999999999999\r\n\r\n", 413},
        {"POST / HTTP/1.1\r\nHost: a\r\nTransfer-Encoding: chunked\r\n\r\n", 411},
        {"POST / HTTP/1.1\r\nHost: a\r\nTransfer-Encoding: chunked\r\nContent-Length: 1\r\n\r\n", 400},
        {"POST / HTTP/1.1\r\nHost: a\r\nExpect: wonders\r\n\r\n", 417},
    };
    for (const auto &row : rows)
        EXPECT_EQ(failureOf(row.text), row.status) << row.text;
    EXPECT_EQ(failureOf(std::string_view("GET / HTTP/1.1\r\nHost: a\0b\r\n", 28)), 400);
}

TEST(HttpRequest, IsNeverLongerThanItsLimits)
{
    EXPECT_EQ(good("GET /" + std::string(8000, 'a') + " HTTP/1.1\r\nHost: a\r\n\r\n").path.size(), 8001u);
    EXPECT_EQ(failureOf("GET /" + std::string(8192, 'a')), 414);
    EXPECT_EQ(failureOf("GET / HTTP/1.1\r\nHost: a\r\nLong: " + std::string(8192, 'a')), 431);
    std::string many = "GET / HTTP/1.1\r\nHost: a\r\n";
    while (many.size() < 16 * 1024)
        many += "A: b\r\n";
    EXPECT_EQ(failureOf(many), 431);
    EXPECT_EQ(failureOf(std::string(16 * 1024 + 1, '\n')), 414);
    const std::string body(64 * 1024, 'x');
    EXPECT_EQ(good("POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 65536\r\n\r\n" + body).body, body);
}

TEST(HttpRequest, AsksOnceForTheWordBeforeItsBody)
{
    HttpRequestReader reader;
    auto bytes = bytesOf("POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 2\r\nExpect: 100-Continue\r\n\r\n");
    ASSERT_EQ(reader.read(bytes), Progress::NeedsMore);
    EXPECT_TRUE(reader.takeExpectation());
    EXPECT_FALSE(reader.takeExpectation());
    bytes = bytesOf("ab");
    ASSERT_EQ(reader.read(bytes), Progress::Complete);
    EXPECT_EQ(reader.take().body, "ab");
}

TEST(HttpForm, GivesNamesAndValues)
{
    const auto values = formValues("spec=hislip%3Acut+x&n=1&n=2&empty=&bare&=nameless&bad=%zz&");
    EXPECT_EQ(values.at("spec"), "hislip:cut x");
    EXPECT_EQ(values.at("n"), "1");
    EXPECT_EQ(values.at("empty"), "");
    EXPECT_EQ(values.at("bare"), "");
    EXPECT_EQ(values.at(""), "nameless");
    EXPECT_EQ(values.at("bad"), "%zz");
    EXPECT_EQ(values.size(), 6u);
    EXPECT_TRUE(formValues("").empty());
    EXPECT_TRUE(formValues("&&").empty());
}
