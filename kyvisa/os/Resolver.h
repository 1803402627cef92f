#pragma once

#include "kyvisa/os/WaitLimit.h"

#include <cstdint>
#include <string>
#include <sys/socket.h>
#include <vector>

namespace kyvisa::os
{

struct Address {
    sockaddr_storage storage{};
    socklen_t length = 0;

    const sockaddr *get() const { return reinterpret_cast<const sockaddr *>(&storage); }
};

/**
 * Turns a host name into its addresses, IPv6 and IPv4, in the system's order of preference.
 *
 * Addresses in numbers and "localhost" are answered at once. Anything else is asked on a thread of its own, because the
 * system's resolver cannot be interrupted: when the limit ends the wait first, that thread finishes alone and its answer
 * is dropped.
 */
IoResult resolve(const std::string &host, std::uint16_t port, const WaitLimit &limit, std::vector<Address> &addresses);

} // namespace kyvisa::os
