#include "simulator/server/HttpServer.h"

#include "simulator/server/Connection.h"

#include <algorithm>
#include <array>
#include <ctime>
#include <exception>

namespace simulator
{
namespace
{

constexpr std::chrono::seconds PatienceForLastAnswer{5};

std::string_view reasonOf(int status)
{
    switch (status) {
    case 200:
        return "OK";
    case 303:
        return "See Other";
    case 400:
        return "Bad Request";
    case 403:
        return "Forbidden";
    case 404:
        return "Not Found";
    case 405:
        return "Method Not Allowed";
    case 408:
        return "Request Timeout";
    case 411:
        return "Length Required";
    case 413:
        return "Content Too Large";
    case 414:
        return "URI Too Long";
    case 417:
        return "Expectation Failed";
    case 431:
        return "Request Header Fields Too Large";
    case 500:
        return "Internal Server Error";
    case 501:
        return "Not Implemented";
    case 505:
        return "HTTP Version Not Supported";
    default:
        return "Unknown";
    }
}

/// The date as HTTP writes it (RFC 9110, 5.6.7).
std::string dateNow()
{
    constexpr std::array<const char *, 7> Days = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
    constexpr std::array<const char *, 12> Months = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                     "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
    const std::time_t now = std::time(nullptr);
    std::tm parts{};
    ::gmtime_r(&now, &parts);
    std::array<char, 64> text{};
    std::strftime(text.data(), text.size(), "%d %%s %Y %H:%M:%S GMT", &parts);
    std::string result(Days[static_cast<std::size_t>(parts.tm_wday)]);
    result.append(", ").append(text.data());
    return result.replace(result.find("%s"), 2, Months[static_cast<std::size_t>(parts.tm_mon)]);
}

std::string encoded(const HttpResponse &response, bool withBody, bool keepAlive)
{
    std::string text = "HTTP/1.1 " + std::to_string(response.status) + " ";
    text.append(reasonOf(response.status)).append("\r\nDate: ").append(dateNow());
    text += "\r\nContent-Length: " + std::to_string(response.body.size());
    if (!response.body.empty())
        text += "\r\nContent-Type: " + response.type;
    for (const auto &[name, value] : response.fields)
        text.append("\r\n").append(name).append(": ").append(value);
    // What a page shows is true now and not later, and comes from here or not at all.
    text += "\r\nCache-Control: no-store"
            "\r\nContent-Security-Policy: default-src 'none'; style-src 'self'; script-src 'self'; connect-src 'self'; "
            "img-src 'self'; form-action 'self'; base-uri 'none'; frame-ancestors 'none'"
            "\r\nX-Content-Type-Options: nosniff"
            "\r\nReferrer-Policy: same-origin";
    text += keepAlive ? "\r\nConnection: keep-alive\r\n\r\n" : "\r\nConnection: close\r\n\r\n";
    if (withBody)
        text += response.body;
    return text;
}

} // namespace

HttpResponse HttpResponse::seeOther(std::string location)
{
    return {.status = 303, .type = {}, .body = {}, .fields = {{"Location", std::move(location)}}};
}

HttpResponse HttpResponse::message(int status, const std::string &sentence)
{
    return {.status = status, .type = "text/plain; charset=utf-8", .body = sentence + "\n", .fields = {}};
}

class HttpServer::Client final : Connection::Owner
{
public:
    Client(HttpServer &server, FileDescriptor socket, std::uint64_t number)
        : m_number(number), m_server(server), m_connection(server.m_loop, std::move(socket), *this)
    {
        wait(Awaited::Request);
    }
    ~Client() { m_server.m_loop.cancel(m_timer); }

    /// Since when the server waits for it, counted in waits.
    std::uint64_t waitsSince() const { return m_since; }

private:
    /// What the patience timer waits for.
    enum class Awaited { Request, RestOfRequest, Taking };

    void received() override
    {
        while (!m_closing && m_connection.unsent() == 0 && !m_connection.input().empty()) {
            std::span<const std::byte> bytes = m_connection.input();
            const std::size_t before = bytes.size();
            const HttpRequestReader::Progress progress = m_reader.read(bytes);
            m_connection.consume(before - bytes.size());
            switch (progress) {
            case HttpRequestReader::Progress::NeedsMore:
                if (m_reader.takeExpectation())
                    m_connection.send("HTTP/1.1 100 Continue\r\n\r\n");
                if (m_reader.begun() && m_awaited == Awaited::Request)
                    wait(Awaited::RestOfRequest);
                break;
            case HttpRequestReader::Progress::Complete:
                answer(m_reader.take());
                break;
            case HttpRequestReader::Progress::Failed:
                refuse(m_reader.failure());
                break;
            }
        }
        if (!m_closing && m_connection.inputEnded() && m_connection.input().empty() && m_connection.unsent() == 0)
            close(PatienceForLastAnswer);
    }

    void answer(const HttpRequest &request)
    {
        m_connection.send(encoded(m_server.answer(request), request.method != "HEAD", request.keepAlive));
        if (!request.keepAlive)
            close(m_server.m_patience.answer);
        else
            wait(m_connection.unsent() > 0 ? Awaited::Taking : Awaited::Request);
    }

    void refuse(int status)
    {
        const std::string sentence = std::to_string(status) + " " + std::string(reasonOf(status));
        m_connection.send(encoded(HttpResponse::message(status, sentence), true, false));
        close(PatienceForLastAnswer);
    }

    void drained() override
    {
        if (!m_closing && m_awaited == Awaited::Taking)
            wait(Awaited::Request);
        received();
    }

    void closed() override { m_server.forget(m_number); }

    void close(std::chrono::milliseconds patience)
    {
        m_closing = true;
        m_server.m_loop.cancel(std::exchange(m_timer, Timers::None));
        m_connection.closeAfterSending(patience);
    }

    void wait(Awaited awaited)
    {
        m_awaited = awaited;
        m_since = ++m_server.m_waits;
        m_server.m_loop.cancel(m_timer);
        const Patience &patience = m_server.m_patience;
        const std::chrono::milliseconds span = awaited == Awaited::Request         ? patience.idle
                                               : awaited == Awaited::RestOfRequest ? patience.request
                                                                                   : patience.answer;
        m_timer = m_server.m_loop.after(span, [this] {
            m_timer = Timers::None;
            if (m_awaited == Awaited::RestOfRequest)
                refuse(408);
            else
                close({});
        });
    }

    const std::uint64_t m_number;
    HttpServer &m_server;
    HttpRequestReader m_reader;
    Connection m_connection;
    Awaited m_awaited = Awaited::Request;
    std::uint64_t m_since = 0;
    bool m_closing = false;
    Timers::Id m_timer = Timers::None;
};

HttpServer::HttpServer(EventLoop &loop, Patience patience) : m_loop(loop), m_patience(patience) {}

HttpServer::~HttpServer() = default;

void HttpServer::add(const std::string &method, const std::string &path, Page page)
{
    m_pages[path][method] = std::move(page);
}

void HttpServer::accept(FileDescriptor socket)
{
    if (m_clients.size() >= MaxClients) {
        const auto longest = std::min_element(m_clients.begin(), m_clients.end(), [](const auto &a, const auto &b) {
            return a.second->waitsSince() < b.second->waitsSince();
        });
        forget(longest->first);
    }
    const std::uint64_t number = ++m_lastClient;
    m_clients.emplace(number, std::make_shared<Client>(*this, std::move(socket), number));
}

void HttpServer::forget(std::uint64_t client)
{
    const auto found = m_clients.find(client);
    if (found == m_clients.end())
        return;
    m_loop.destroyLater(found->second);
    m_clients.erase(found);
}

HttpResponse HttpServer::answer(const HttpRequest &request) const
{
    const auto pages = m_pages.find(request.path);
    if (pages == m_pages.end())
        return HttpResponse::message(404, "There is no such page here.");
    const auto page = pages->second.find(request.method == "HEAD" ? "GET" : request.method);
    if (page == pages->second.end()) {
        HttpResponse refusal = HttpResponse::message(405, "This page does not do that.");
        std::string allowed;
        for (const auto &[method, unused] : pages->second)
            allowed += (allowed.empty() ? "" : ", ") + (method == "GET" ? "GET, HEAD" : method);
        refusal.fields.emplace_back("Allow", allowed);
        return refusal;
    }
    const std::string_view origin = request.field("origin");
    if (request.method != "GET" && request.method != "HEAD" && !origin.empty() &&
        origin != "http://" + std::string(request.field("host")))
        return HttpResponse::message(403, "Another site's page must not change anything here.");
    try {
        return page->second(request);
    } catch (const std::exception &error) {
        return HttpResponse::message(500, std::string("This page failed: ") + error.what());
    }
}

} // namespace simulator
