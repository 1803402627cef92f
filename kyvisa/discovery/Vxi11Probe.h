#pragma once

#include <cstdint>
#include <string>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}

/**
 * Which device the VXI-11 server of a host leads to: "inst0" for an instrument, "gpib0" for a LAN/GPIB gateway, nothing
 * where no link comes about. A portmapper that knows the program is not an instrument yet.
 *
 * @param port of the core channel; 0 asks the portmapper for it.
 */
std::string probeVxi11(const std::string &host, std::uint16_t port, const os::WaitLimit &limit);

} // namespace kyvisa
