#pragma once

#include "wire/Vxi11.h"

#include <cstdint>
#include <string>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}

/**
 * The abort channel of VXI-11: ends the call that an instrument is executing for @p link. It is a connection of its own, made
 * for this one call: it is rarely needed, and instruments have few connections to give away.
 *
 * Some instruments accept the connection and never answer, so @p limit is what ends this. False when the abort was not confirmed.
 */
bool abortLink(const std::string &host, std::uint16_t port, wire::vxi11::LinkId link, const os::WaitLimit &limit);

} // namespace kyvisa
