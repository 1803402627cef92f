#pragma once

#include "simulator/server/HttpRequest.h"
#include "simulator/traffic/RecentTraffic.h"

#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace simulator
{

class HttpServer;
class Instrument;
struct HttpResponse;
struct InstrumentState;

/**
 * The pages about the instrument: `/` for people, `/state.json` and `/lxi/identification` for programs. Other parts of the simulator add theirs:
 *
 *     site.addPage({"/faults", "Faults", false}, [&](const HttpRequest &) { return "<section class=\"wide\">...</section>"; });
 *     server.add("POST", "/faults", ...);
 *
 * A page's content is a row of <section>s; texts go through markup(). All pages share a head with links to each other.
 */
class WebSite
{
public:
    struct Page {
        std::string path;
        std::string title;
        bool refreshes; ///< brings itself up to date; not for a page with a form that somebody fills in
    };
    using Content = std::function<std::string(const HttpRequest &)>;

    WebSite(HttpServer &server, Instrument &instrument);

    /// The lines that the simulator prints when it starts; the services that they name are shown.
    void setStartLines(std::vector<std::string> lines) { m_startLines = std::move(lines); }
    void addPage(Page page, Content content);

private:
    InstrumentState state() const;
    /// How the client calls this host: as it says, or as the line of this service does.
    std::string hostOf(const HttpRequest &request) const;
    std::string framed(const Page &page, const std::string &content) const;

    HttpServer &m_server;
    const Instrument &m_instrument;
    RecentTraffic m_recent;
    std::vector<std::string> m_startLines;
    std::vector<Page> m_pages;
};

} // namespace simulator
