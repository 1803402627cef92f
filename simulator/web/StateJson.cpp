#include "simulator/web/StateJson.h"

#include "simulator/web/InstrumentState.h"

#include <nlohmann/json.hpp>

namespace simulator
{

std::string stateJson(const InstrumentState &state)
{
    using nlohmann::ordered_json;
    ordered_json document;
    document["identification"] = {{"manufacturer", state.identity.manufacturer},
                                  {"model", state.identity.model},
                                  {"serial", state.identity.serial},
                                  {"firmware", state.identity.firmware}};
    document["services"] = ordered_json::array();
    for (const ServedAt &service : state.services)
        document["services"].push_back({{"service", service.service}, {"resource", service.resource}});
    if (!state.settings.empty())
        for (const auto &[header, value] : state.settings)
            document["settings"][header] = value;
    document["channels"] = ordered_json::array();
    for (const InstrumentState::Channel &channel : state.channels)
        document["channels"].push_back({{"output", channel.output},
                                        {"voltage", channel.voltage},
                                        {"currentLimit", channel.currentLimit},
                                        {"load", channel.load},
                                        {"presentVoltage", channel.presentVoltage},
                                        {"presentCurrent", channel.presentCurrent},
                                        {"limited", channel.limited}});
    document["acquisition"] = state.acquisition;
    document["remote"] = state.remote;
    document["registers"] = ordered_json::array();
    for (const InstrumentState::Register &entry : state.registers)
        document["registers"].push_back({{"name", entry.name},
                                         {"value", entry.value},
                                         {"event", entry.event},
                                         {"enable", entry.enable},
                                         {"bits", entry.bits},
                                         {"events", entry.events}});
    document["errors"] = state.errors;
    document["locks"] = {{"exclusive", state.exclusivelyLocked}, {"holders", state.lockHolders}};
    document["clients"] = ordered_json::array();
    for (const InstrumentState::Client &client : state.clients)
        document["clients"].push_back(
            {{"protocol", client.protocol}, {"name", client.name}, {"messages", client.messages}});
    document["messages"] = ordered_json::array();
    for (const RecentTraffic::Line &line : state.messages)
        document["messages"].push_back({{"time", line.time},
                                        {"protocol", line.protocol},
                                        {"client", line.client},
                                        {"direction", line.arrow},
                                        {"text", line.text}});
    document["memory"] = {{"used", state.memoryUsed}, {"free", state.memoryFree}, {"count", state.fileCount}};
    document["files"] = ordered_json::array();
    for (const InstrumentState::File &file : state.files)
        document["files"].push_back({{"name", file.name}, {"size", file.size}});
    return document.dump(2, ' ', false, ordered_json::error_handler_t::replace) + "\n";
}

} // namespace simulator
