#pragma once

#include "kyvisa/discovery/FoundResource.h"

#include <vector>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}

/// Ways of finding instruments in the LAN.
struct DiscoveryMethods {
    bool mdns = false;
    bool vxi11 = false;

    bool any() const { return mdns || vxi11; }
};

/**
 * Asks by all @p methods on all network interfaces at once, until @p limit ends it: nobody knows how many will answer. What
 * is found is looked at meanwhile.
 *
 * @return what viOpen accepts, ordered by the address of the host, then HiSLIP, VXI-11, raw socket; nothing when another
 * thread ended it.
 */
std::vector<FoundResource> discoverLan(const DiscoveryMethods &methods, const os::WaitLimit &limit);

} // namespace kyvisa
