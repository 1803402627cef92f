#include "kyvisa/core/KnownResources.h"

#include "kyvisa/core/Configuration.h"
#include "kyvisa/include/visa.h"

#include <algorithm>
#include <cctype>
#include <string>
#include <unordered_map>

namespace kyvisa
{
namespace
{

constexpr std::size_t LongestAlias = 255; // what viParseRsrcEx has room for

/// Resource names differ by more than case.
std::string keyOf(std::string name)
{
    std::transform(name.begin(), name.end(), name.begin(), [](unsigned char c) { return std::tolower(c); });
    return name;
}

} // namespace

std::vector<FoundResource> knownResources(const Configuration &configuration, std::size_t serialPorts)
{
    std::vector<FoundResource> listed;
    for (const std::vector<std::string> &list : configuration.resources)
        for (const std::string &text : list) {
            ResourceName name;
            if (parseResourceName(text, name) == VI_SUCCESS)
                listed.push_back({name.canonical(), {}});
        }
    for (const auto &[board, gateway] : configuration.gateways)
        listed.push_back({"GPIB" + std::to_string(board) + "::INTFC", {}});
    for (std::size_t port = 1; port <= serialPorts; ++port)
        listed.push_back({"ASRL" + std::to_string(port) + "::INSTR", {}});
    std::vector<FoundResource> known;
    addResources(known, std::move(listed));
    return known;
}

void addResources(std::vector<FoundResource> &found, std::vector<FoundResource> more)
{
    std::unordered_map<std::string, std::size_t> places;
    for (std::size_t place = 0; place < found.size(); ++place)
        places.emplace(keyOf(found[place].name), place);
    for (FoundResource &resource : more) {
        const auto [entry, isNew] = places.emplace(keyOf(resource.name), found.size());
        if (isNew)
            found.push_back(std::move(resource));
        else
            fillIn(found[entry->second].texts, resource.texts);
    }
}

ViStatus parseNameOrAlias(std::string_view text, const Configuration &configuration, ResourceName &name)
{
    const std::string *resource = configuration.resourceOf(text);
    return parseResourceName(resource ? std::string_view(*resource) : text, name);
}

std::string aliasOf(const std::string &canonicalName, const Configuration &configuration)
{
    for (const Configuration::Alias &alias : configuration.aliases) {
        ResourceName name;
        if (parseResourceName(alias.resource, name) == VI_SUCCESS && keyOf(name.canonical()) == keyOf(canonicalName))
            return alias.name.substr(0, LongestAlias);
    }
    return {};
}

} // namespace kyvisa
