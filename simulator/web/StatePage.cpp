#include "simulator/web/StatePage.h"

#include "simulator/web/InstrumentState.h"
#include "simulator/web/Markup.h"

#include <array>
#include <cstdio>

namespace simulator
{
namespace
{

std::string cell(const std::string &text)
{
    return "<td>" + text + "</td>";
}

std::string numberCell(const std::string &text)
{
    return "<td class=\"number\">" + text + "</td>";
}

/// A cell that carries its column's name, for screens on which a row becomes a list.
std::string named(const char *column, const std::string &text, const char *kind = "")
{
    const std::string classes = *kind == '\0' ? std::string() : std::string(" class=\"") + kind + "\"";
    return "<td" + classes + " data-name=\"" + column + "\"><span>" + text + "</span></td>";
}

std::string chip(const std::string &text, const char *kind = "")
{
    const std::string classes = *kind == '\0' ? "chip" : std::string("chip ") + kind;
    return "<span class=\"" + classes + "\">" + markup(text) + "</span> ";
}

std::string number(double value, const char *unit)
{
    std::array<char, 48> text{};
    std::snprintf(text.data(), text.size(), "%.6g %s", value, unit);
    return text.data();
}

std::string bytes(std::uint64_t count)
{
    constexpr std::uint64_t KiB = 1024;
    constexpr std::uint64_t MiB = KiB * 1024;
    constexpr std::uint64_t GiB = MiB * 1024;
    const auto part = [count](std::uint64_t unit) { return static_cast<double>(count) / static_cast<double>(unit); };
    if (count < KiB)
        return std::to_string(count) + " B";
    std::array<char, 48> text{};
    const char *unit = count < MiB ? "KiB" : count < GiB ? "MiB" : "GiB";
    std::snprintf(text.data(), text.size(), "%.1f %s", part(count < MiB ? KiB : count < GiB ? MiB : GiB), unit);
    return text.data();
}

/// A table row of name and value.
std::string row(const char *name, const std::string &value)
{
    return std::string("<tr><th scope=\"row\">") + name + "</th>" + cell(value) + "</tr>\n";
}

std::string services(const InstrumentState &state)
{
    std::string text = "<section>\n<h2>Services</h2>\n<table>\n";
    for (const ServedAt &service : state.services)
        text += row(markup(service.service).c_str(), "<code>" + markup(service.resource) + "</code>");
    if (state.services.empty())
        text += row("none", "this page alone");
    return text + "</table>\n</section>\n";
}

std::string channels(const InstrumentState &state)
{
    std::string text =
        "<section class=\"wide\">\n<h2>Channels</h2>\n<table class=\"fields\">\n<thead><tr><th>Channel</th>"
        "<th>Output</th>";
    for (const char *name : {"Voltage set", "Current limit", "Load", "Voltage now", "Current now"})
        text += std::string("<th class=\"number\">") + name + "</th>";
    text += "</tr></thead>\n<tbody>\n";
    int index = 0;
    for (const InstrumentState::Channel &channel : state.channels)
        text += "<tr><th scope=\"row\">" + std::to_string(++index) + "</th>" +
                named("Output", chip(channel.output ? "on" : "off", channel.output ? "on" : "") +
                                    (channel.limited ? chip("current limit", "warn") : "")) +
                named("Voltage set", number(channel.voltage, "V"), "number") +
                named("Current limit", number(channel.currentLimit, "A"), "number") +
                named("Load", number(channel.load, "&Omega;"), "number") +
                named("Voltage now", number(channel.presentVoltage, "V"), "number") +
                named("Current now", number(channel.presentCurrent, "A"), "number") + "</tr>\n";
    return text + "</tbody>\n</table>\n</section>\n";
}

std::string settings(const InstrumentState &state)
{
    std::string text = "<section class=\"wide\">\n<h2>Settings</h2>\n<table>\n";
    for (const auto &[header, value] : state.settings)
        text += row(markup(header).c_str(), "<code>" + markup(value) + "</code>");
    return text + "</table>\n</section>\n";
}

std::string condition(const InstrumentState &state)
{
    std::string locks = state.exclusivelyLocked ? chip("exclusive", "warn") : "";
    if (state.lockHolders > 0)
        locks += std::to_string(state.lockHolders) + (state.lockHolders == 1 ? " holder" : " holders");
    else
        locks += "none";
    const std::string remote = state.remote == "REM"   ? "remote"
                               : state.remote == "RWL" ? "remote with local lockout"
                                                       : "local";
    return "<section>\n<h2>Condition</h2>\n<table>\n" + row("Acquisition", markup(state.acquisition)) +
           row("Operated", remote) +
           row("Error queue", state.errors == 0 ? "empty" : chip(std::to_string(state.errors) + " waiting", "warn")) +
           row("Locks", locks) + "</table>\n</section>\n";
}

std::string hex(unsigned value)
{
    std::array<char, 16> text{};
    std::snprintf(text.data(), text.size(), value > 0xFF ? "0x%04X" : "0x%02X", value);
    return text.data();
}

std::string bits(const std::vector<std::string> &names)
{
    std::string text;
    for (const std::string &name : names)
        text += chip(name, "on");
    return text;
}

std::string registers(const InstrumentState &state)
{
    std::string text = "<section class=\"wide\">\n<h2>Status registers</h2>\n<table class=\"fields\">\n<thead><tr>"
                       "<th>Register</th><th>Now</th><th>Events</th><th>Enabled</th></tr></thead>\n<tbody>\n";
    for (const InstrumentState::Register &entry : state.registers)
        text += "<tr><th scope=\"row\">" + markup(entry.name) + "</th>" +
                named("Now", "<code>" + hex(entry.value) + "</code> " + bits(entry.bits)) +
                (entry.latched ? named("Events", "<code>" + hex(entry.event) + "</code> " + bits(entry.events))
                               : named("Events", "", "same")) +
                named("Enabled", "<code>" + hex(entry.enable) + "</code>") + "</tr>\n";
    return text + "</tbody>\n</table>\n</section>\n";
}

std::string files(const InstrumentState &state)
{
    std::string text = "<section>\n<h2>Mass memory</h2>\n<p class=\"faint\">" + bytes(state.memoryUsed) + " used, " +
                       bytes(state.memoryFree) + " free</p>\n<table>\n";
    for (const InstrumentState::File &file : state.files)
        text += "<tr><td><code>" + markup(file.name) + "</code></td>" + numberCell(bytes(file.size)) + "</tr>\n";
    if (state.files.empty())
        text += "<tr><td>no files</td></tr>\n";
    if (state.fileCount > state.files.size())
        text += "<tr><td>and " + std::to_string(state.fileCount - state.files.size()) + " more</td></tr>\n";
    return text + "</table>\n</section>\n";
}

std::string clients(const InstrumentState &state)
{
    std::string text = "<section>\n<h2>Connected clients</h2>\n<table>\n";
    for (const InstrumentState::Client &client : state.clients)
        text += "<tr>" + cell(markup(client.protocol)) + cell("<code>" + markup(client.name) + "</code>") +
                numberCell(std::to_string(client.messages) + (client.messages == 1 ? " message" : " messages")) +
                "</tr>\n";
    if (state.clients.empty())
        text += "<tr><td>nobody</td></tr>\n";
    return text + "</table>\n</section>\n";
}

std::string messages(const InstrumentState &state)
{
    std::string text = "<section class=\"wide\">\n<h2>Last messages</h2>\n<table class=\"lines\">\n";
    for (auto line = state.messages.rbegin(); line != state.messages.rend(); ++line)
        text += "<tr>" + cell("<code>" + line->time + "</code>") + cell(markup(line->protocol)) +
                cell("<code>" + markup(line->client) + "</code>") + cell("<code>" + markup(line->arrow) + "</code>") +
                cell("<code>" + markup(line->text) + "</code>") + "</tr>\n";
    if (state.messages.empty())
        text += "<tr><td>none yet</td></tr>\n";
    return text + "</table>\n</section>\n";
}

} // namespace

std::string statePage(const InstrumentState &state)
{
    return services(state) + condition(state) + (state.channels.empty() ? "" : channels(state)) +
           (state.settings.empty() ? "" : settings(state)) + registers(state) + clients(state) + files(state) +
           messages(state);
}

} // namespace simulator
