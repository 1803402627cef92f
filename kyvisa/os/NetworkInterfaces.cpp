#include "kyvisa/os/NetworkInterfaces.h"

#include "kyvisa/os/SystemCalls.h"

#include <ifaddrs.h>
#include <net/if.h>

#include <memory>

namespace kyvisa::os
{
namespace
{

in_addr ipv4Of(const sockaddr *address)
{
    return reinterpret_cast<const sockaddr_in *>(address)->sin_addr;
}

} // namespace

std::vector<NetworkInterface> networkInterfaces()
{
    std::vector<NetworkInterface> found;
    ifaddrs *all = nullptr;
    if (systemCalls().getifaddrs(&all) != 0)
        return found;
    const std::unique_ptr<ifaddrs, decltype(&::freeifaddrs)> owner(all, &::freeifaddrs);
    for (const ifaddrs *entry = all; entry; entry = entry->ifa_next) {
        if (!entry->ifa_addr || entry->ifa_addr->sa_family != AF_INET || (entry->ifa_flags & IFF_UP) == 0)
            continue;
        NetworkInterface &interface = found.emplace_back();
        const bool loopback = (entry->ifa_flags & IFF_LOOPBACK) != 0;
        interface.address = ipv4Of(entry->ifa_addr);
        interface.broadcast = interface.address;
        if (!loopback && (entry->ifa_flags & IFF_BROADCAST) != 0 && entry->ifa_broadaddr)
            interface.broadcast = ipv4Of(entry->ifa_broadaddr);
        interface.canBroadcast = loopback || (entry->ifa_flags & IFF_BROADCAST) != 0;
        // Loopback interfaces rarely say that they can, and do.
        interface.canMulticast = loopback || (entry->ifa_flags & IFF_MULTICAST) != 0;
    }
    return found;
}

} // namespace kyvisa::os
