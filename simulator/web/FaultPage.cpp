#include "simulator/web/FaultPage.h"

#include "simulator/fault/Faults.h"
#include "simulator/server/HttpServer.h"
#include "simulator/web/Markup.h"
#include "simulator/web/WebSite.h"

#include <charconv>
#include <optional>

namespace simulator
{
namespace
{

constexpr const char *Path = "/faults";
constexpr int BadRequest = 400;

std::string removeForm(const std::string &which, const char *label)
{
    return "<form method=\"post\" action=\"/faults/remove\"><input type=\"hidden\" name=\"number\" value=\"" + which +
           "\"><button>" + label + "</button></form>";
}

std::string table(const Faults &faults)
{
    if (!faults.any())
        return "<p class=\"faint\">None: the instrument behaves.</p>\n";
    std::string text =
        "<table>\n<thead><tr><th class=\"number\">Number</th><th>Fault</th>"
        "<th class=\"number\">Seen</th><th class=\"number\">Struck</th><th></th></tr></thead>\n<tbody>\n";
    for (const Faults::Entry &entry : faults.entries()) {
        const std::string number = std::to_string(entry.number);
        text += "<tr><td class=\"number\">" + number + "</td><td><code>" + markup(entry.spec.text) +
                "</code></td><td class=\"number\">" + std::to_string(entry.seen) + "</td><td class=\"number\">" +
                std::to_string(entry.struck) + "</td><td>" + removeForm(number, "Remove") + "</td></tr>\n";
    }
    return text + "</tbody>\n</table>\n" + removeForm("all", "Remove all") + "\n";
}

template <typename Number>
std::optional<Number> numberIn(const std::string &text)
{
    Number value{};
    const auto result = std::from_chars(text.data(), text.data() + text.size(), value);
    if (result.ec != std::errc{} || result.ptr != text.data() + text.size())
        return std::nullopt;
    return value;
}

HttpResponse add(Faults &faults, const HttpRequest &request)
{
    try {
        if (!faults.add(parseFaultSpec(formValues(request.body)["spec"])))
            return HttpResponse::message(BadRequest, "There are too many faults already.");
    } catch (const FaultSpecError &error) {
        return HttpResponse::message(BadRequest, std::string("This is no fault: ") + error.what() + ".");
    }
    return HttpResponse::seeOther(Path);
}

HttpResponse remove(Faults &faults, const HttpRequest &request)
{
    const std::string which = formValues(request.body)["number"];
    const auto number = numberIn<unsigned>(which);
    if (which == "all")
        faults.clear();
    else if (!number || !faults.remove(*number))
        return HttpResponse::message(BadRequest, "There is no such fault.");
    return HttpResponse::seeOther(Path);
}

HttpResponse seed(Faults &faults, const HttpRequest &request)
{
    const auto number = numberIn<std::uint64_t>(formValues(request.body)["seed"]);
    if (!number)
        return HttpResponse::message(BadRequest, "A seed is a whole number.");
    faults.restart(*number);
    return HttpResponse::seeOther(Path);
}

} // namespace

std::string faultPage(const Faults &faults)
{
    return "<section class=\"wide\">\n<h2>Faults switched on</h2>\n" + table(faults) +
           "</section>\n"
           "<section>\n<h2>Add a fault</h2>\n<form method=\"post\" action=\"/faults/add\">\n"
           "<p><label>PROTOCOL:KIND:CONDITION<br><input name=\"spec\" size=\"40\" required maxlength=\"200\" "
           "placeholder=\"hislip:drop-reply:p=0.01\"></label></p>\n<button>Add</button>\n</form>\n"
           "<p class=\"faint\">Protocols: any hislip hislip-async socket vxi11 gpib serial. Kinds: delay=SECONDS "
           "drop-reply cut short-header oversized-header garbage change-byte stale-id no-end refuse-lock withhold-srq "
           "repeat-srq nonsense-status fill-errors. Conditions: p=0.01, nth=10, every=100, on=all.</p>\n</section>\n"
           "<section>\n<h2>Begin afresh</h2>\n<form method=\"post\" action=\"/faults/seed\">\n"
           "<p><label>Seed of the random numbers<br><input name=\"seed\" inputmode=\"numeric\" value=\"" +
           std::to_string(faults.seed()) +
           "\" required></label></p>\n<button>Restart all counts</button>\n</form>\n</section>\n";
}

void addFaultPage(WebSite &site, HttpServer &server, Faults &faults)
{
    site.addPage({Path, "Faults", false}, [&faults](const HttpRequest &) { return faultPage(faults); });
    server.add("POST", "/faults/add", [&faults](const HttpRequest &request) { return add(faults, request); });
    server.add("POST", "/faults/remove", [&faults](const HttpRequest &request) { return remove(faults, request); });
    server.add("POST", "/faults/seed", [&faults](const HttpRequest &request) { return seed(faults, request); });
}

} // namespace simulator
