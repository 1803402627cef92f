#include "kyvisa/discovery/HostCollection.h"

#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"
#include "wire/Hislip.h"

#include <arpa/inet.h>

#include <algorithm>
#include <strings.h>

namespace kyvisa
{
namespace
{

std::uint32_t number(const std::string &address)
{
    in_addr parsed{};
    ::inet_pton(AF_INET, address.c_str(), &parsed);
    return ntohl(parsed.s_addr);
}

LxiTexts textsOf(const std::string &address, const FoundHost &host)
{
    LxiTexts texts = host.announced;
    fillIn(texts, host.document.texts);
    if (texts.hostName.empty())
        texts.hostName = address;
    return texts;
}

/// What the host's own document lists, where it is about this host: such names are not to be guessed.
void addDocumented(const std::string &address, const FoundHost &host, std::vector<std::string> &names)
{
    for (const std::string &resource : host.document.resources) {
        ResourceName name;
        if (parseResourceName(resource, name) == VI_SUCCESS && name.interfaceType == VI_INTF_TCPIP &&
            name.host == address && !name.secure)
            names.push_back(name.canonical());
    }
}

int rank(const std::string &text)
{
    ResourceName name;
    parseResourceName(text, name);
    return name.resourceClass == ResourceName::Class::Socket ? 2 : name.isHislip() ? 0 : 1;
}

std::vector<std::string> namesOf(const std::string &address, const FoundHost &host)
{
    const std::string beginning = "TCPIP0::" + address + "::";
    std::vector<std::string> names;
    if (host.hislipPort) {
        const bool usual = *host.hislipPort == wire::hislip::DefaultPort;
        names.push_back(beginning + "hislip0" + (usual ? "" : "," + std::to_string(*host.hislipPort)) + "::INSTR");
    }
    if (!host.vxi11Device.empty())
        names.push_back(beginning + host.vxi11Device + "::INSTR");
    if (host.socketPort)
        names.push_back(beginning + std::to_string(*host.socketPort) + "::SOCKET");
    addDocumented(address, host, names);
    // Whoever told of it, HiSLIP comes first and the raw socket last.
    std::stable_sort(names.begin(), names.end(),
                     [](const std::string &a, const std::string &b) { return rank(a) < rank(b); });
    return names;
}

/// Resource names differ by more than case.
bool sameName(const std::string &a, const std::string &b)
{
    return ::strcasecmp(a.c_str(), b.c_str()) == 0;
}

} // namespace

bool AddressOrder::operator()(const std::string &a, const std::string &b) const
{
    return number(a) != number(b) ? number(a) < number(b) : a < b;
}

std::vector<FoundResource> resourcesOf(const FoundHosts &hosts)
{
    std::vector<FoundResource> found;
    for (const auto &[address, host] : hosts) {
        const auto first = static_cast<std::ptrdiff_t>(found.size());
        for (std::string &name : namesOf(address, host))
            if (std::none_of(found.begin() + first, found.end(),
                             [&](const FoundResource &other) { return sameName(other.name, name); }))
                found.push_back({std::move(name), textsOf(address, host)});
    }
    return found;
}

} // namespace kyvisa
