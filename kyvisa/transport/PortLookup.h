#pragma once

#include "kyvisa/include/visatype.h"

#include <cstdint>
#include <string>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}

/// Where an instrument serves a program.
struct ProgramAddress {
    std::string host; ///< the address that answered, in numbers: a name may have several
    std::uint16_t port = 0;
};

/// Where portmappers listen: 111, or what the environment variable KYVISA_PORTMAPPER_PORT says, for tests and tunnels.
std::uint16_t portmapperPort();

/**
 * Asks the portmapper of @p host for the TCP port of VXI-11's core program. IPv4 first: the protocol was made for it.
 *
 * @return VI_ERROR_RSRC_NFOUND where there is no portmapper or it does not know the program.
 */
ViStatus lookUpCorePort(const std::string &host, const os::WaitLimit &limit, ProgramAddress &found);

} // namespace kyvisa
