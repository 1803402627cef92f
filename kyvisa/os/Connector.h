#pragma once

#include "kyvisa/os/StreamSocket.h"

#include <cstdint>
#include <string>

namespace kyvisa::os
{

/// Which of a host's addresses are tried first. All of them are tried in the end.
enum class AddressOrder { System, Ipv4First };

/**
 * Connects to @p host by whichever of its addresses answers first, inside one limit.
 *
 * Addresses are tried in order. One that refuses makes room for the next at once; one that stays silent keeps trying while
 * the next one starts a quarter of a second later. The socket comes without delay (TCP_NODELAY), closed on exec.
 */
IoResult connectStream(const std::string &host, std::uint16_t port, const WaitLimit &limit, StreamSocket &connected,
                       AddressOrder order = AddressOrder::System);

} // namespace kyvisa::os
