#pragma once

#include "kyvisa/discovery/FoundResource.h"
#include "kyvisa/discovery/LxiDocument.h"

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace kyvisa
{

/// Everything that was found out about one host, whoever told it.
struct FoundHost {
    std::optional<std::uint16_t> hislipPort;
    std::string vxi11Device; ///< "inst0", "gpib0"; empty where VXI-11 leads to nothing
    std::optional<std::uint16_t> socketPort;
    LxiTexts announced; ///< by mDNS
    LxiDocument document;
    bool vxi11Asked = false;
    std::set<std::uint16_t> documentPorts; ///< where its document has been asked for
};

/// Hosts by their address in numbers: 10.0.0.9 comes before 10.0.0.10.
struct AddressOrder {
    bool operator()(const std::string &a, const std::string &b) const;
};
using FoundHosts = std::map<std::string, FoundHost, AddressOrder>;

/// The resources of all hosts in their order, without repetition. What a host announced goes before its document's text.
std::vector<FoundResource> resourcesOf(const FoundHosts &hosts);

} // namespace kyvisa
