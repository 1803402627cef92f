#pragma once

#include "simulator/bus/BusAddress.h"
#include "wire/Vxi11.h"

#include <optional>
#include <string_view>

namespace simulator
{

/**
 * Takes apart a device name of a LAN/GPIB gateway (VXI-11.2): `gpib0` is the interface, `gpib0,5` an address of its bus and `gpib0,9,1` one with a
 * secondary address, which may be written as the byte on the bus as well (96 to 126).
 *
 * @p address stays empty for the interface. Errors: Syntax for what is no such name, NotAccessible for another interface, InvalidAddress for
 * numbers that no instrument can have.
 */
wire::vxi11::Error parseGatewayName(std::string_view name, std::optional<BusAddress> &address);

} // namespace simulator
