#pragma once

#include <netinet/in.h>

#include <vector>

namespace kyvisa::os
{

/// An IPv4 address of a network interface that is up.
struct NetworkInterface {
    in_addr address{};
    in_addr broadcast{}; ///< where to reach everybody on it: of a loopback interface the address itself
    bool canBroadcast = false;
    bool canMulticast = false;
};

/// All of them; empty where the system does not say.
std::vector<NetworkInterface> networkInterfaces();

} // namespace kyvisa::os
