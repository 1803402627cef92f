#pragma once

#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"
#include "simulator/server/HttpRequest.h"

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace simulator
{

struct HttpResponse {
    int status = 200;
    std::string type = "text/html; charset=utf-8";
    std::string body = {};
    std::vector<std::pair<std::string, std::string>> fields = {}; ///< besides those that every response has

    /// After a POST: the browser shows this page, and reloading it does not post again.
    static HttpResponse seeOther(std::string location);
    /// A page of one sentence.
    static HttpResponse message(int status, const std::string &sentence);
};

/**
 * A small HTTP/1.1 server (RFC 9110, 9112). Pages are functions:
 *
 *     server.add("GET", "/faults", [&](const HttpRequest &) { return HttpResponse{.body = page()}; });
 *     server.add("POST", "/faults", [&](const HttpRequest &request) {
 *         add(formValues(request.body)["spec"]);
 *         return HttpResponse::seeOther("/faults");
 *     });
 *
 * A GET changes nothing, and answers HEAD too. A POST that another site's page sent (its Origin is not this Host) is refused before it gets here, and
 * what a page throws becomes a 500. Responses tell browsers to load nothing from anywhere else.
 *
 * A client has one request at a time; the next one is read when its answer is gone. Whoever takes longer than the patience for it loses the connection.
 * When there are too many, the one that has kept the server waiting longest gives way to a new one.
 */
class HttpServer
{
public:
    using Page = std::function<HttpResponse(const HttpRequest &)>;

    static constexpr std::size_t MaxClients = 64;

    struct Patience {
        std::chrono::milliseconds idle{std::chrono::seconds{60}};    ///< between requests
        std::chrono::milliseconds request{std::chrono::seconds{10}}; ///< from a request's first byte to its last
        std::chrono::milliseconds answer{std::chrono::seconds{30}};  ///< for the client to take the answer
    };

    explicit HttpServer(EventLoop &loop) : HttpServer(loop, Patience{}) {}
    HttpServer(EventLoop &loop, Patience patience);
    ~HttpServer();

    void add(const std::string &method, const std::string &path, Page page);
    void accept(FileDescriptor socket);

private:
    class Client;

    void forget(std::uint64_t client);
    HttpResponse answer(const HttpRequest &request) const;

    EventLoop &m_loop;
    const Patience m_patience;
    std::map<std::string, std::map<std::string, Page>> m_pages; ///< by path, then method
    std::map<std::uint64_t, std::shared_ptr<Client>> m_clients; ///< by their number
    std::uint64_t m_lastClient = 0;
    std::uint64_t m_waits = 0; ///< how often the server has begun to wait for a client
};

} // namespace simulator
