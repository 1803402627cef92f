#include "simulator/web/WebSite.h"

#include "simulator/server/HttpServer.h"
#include "simulator/web/InstrumentState.h"
#include "simulator/web/LxiIdentification.h"
#include "simulator/web/Markup.h"
#include "simulator/web/PageStyle.h"
#include "simulator/web/StateJson.h"
#include "simulator/web/StatePage.h"

namespace simulator
{

WebSite::WebSite(HttpServer &server, Instrument &instrument)
    : m_server(server), m_instrument(instrument), m_recent(instrument.traffic)
{
    addPage({"/", "Instrument", true}, [this](const HttpRequest &) { return statePage(state()); });
    m_server.add("GET", "/state.json", [this](const HttpRequest &) {
        return HttpResponse{.type = "application/json", .body = stateJson(state())};
    });
    m_server.add("GET", "/lxi/identification", [this](const HttpRequest &request) {
        return HttpResponse{
            .type = "text/xml; charset=utf-8",
            .body = lxiIdentification(m_instrument.identification(), servicesIn(m_startLines), hostOf(request))};
    });
    const auto addFile = [this](const char *path, const char *type, std::string_view content) {
        m_server.add("GET", path,
                     [=](const HttpRequest &) { return HttpResponse{.type = type, .body = std::string(content)}; });
    };
    addFile("/page.css", "text/css; charset=utf-8", PageStyle);
    addFile("/page.js", "text/javascript; charset=utf-8", PageScript);
    addFile("/icon.svg", "image/svg+xml", PageIcon);
}

InstrumentState WebSite::state() const
{
    InstrumentState state = stateOf(m_instrument, m_startLines);
    state.messages.assign(m_recent.lines().begin(), m_recent.lines().end());
    return state;
}

std::string WebSite::hostOf(const HttpRequest &request) const
{
    constexpr std::string_view Mine = "http http://";
    if (const std::string_view host = request.field("host"); !host.empty())
        return std::string(host);
    for (const std::string &line : m_startLines)
        if (line.starts_with(Mine))
            return line.substr(Mine.size(), line.size() - Mine.size() - 1); // without the slash at its end
    return {};
}

void WebSite::addPage(Page page, Content content)
{
    m_pages.push_back(page);
    m_server.add("GET", page.path, [this, page, content = std::move(content)](const HttpRequest &request) {
        return HttpResponse{.body = framed(page, content(request))};
    });
}

std::string WebSite::framed(const Page &page, const std::string &content) const
{
    const Identification &identity = m_instrument.identification();
    std::string text = "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
                       "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n";
    if (page.refreshes)
        text += "<noscript><meta http-equiv=\"refresh\" content=\"5\"></noscript>\n";
    text += "<title>" + markup(identity.model + " " + identity.serial) + " - " + markup(page.title) + "</title>\n";
    text += "<link rel=\"stylesheet\" href=\"/page.css\">\n<link rel=\"icon\" href=\"/icon.svg\">\n"
            "<script src=\"/page.js\" defer></script>\n</head>\n<body>\n<header>\n";
    text += "<h1>" + markup(identity.model) + "</h1>\n";
    text += "<p class=\"faint\">" + markup(identity.manufacturer) + " &middot; serial number " +
            markup(identity.serial) + " &middot; firmware " + markup(identity.firmware) + "</p>\n<nav>\n";
    for (const Page &other : m_pages)
        text += "<a href=\"" + markup(other.path) + "\"" + (other.path == page.path ? " aria-current=\"page\"" : "") +
                ">" + markup(other.title) + "</a>\n";
    text +=
        "<a href=\"/lxi/identification\">LXI identification</a>\n<a href=\"/state.json\">JSON</a>\n</nav>\n</header>\n";
    text += page.refreshes ? "<main data-refresh=\"2000\">\n" : "<main>\n";
    text += content + "</main>\n<footer>A simulated instrument: there is no hardware behind this page.</footer>\n"
                      "</body>\n</html>\n";
    return text;
}

} // namespace simulator
