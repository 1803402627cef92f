#pragma once

#include "wire/Vxi11.h"

#include <cstdint>
#include <vector>

/**
 * What device_docmd carries for an IEEE 488.1 bus (VXI-11.2): the data of wire::vxi11::DocmdCall and DocmdResult.
 *
 *     command       data in                        data out
 *     SendCommand   up to 128 bytes for the bus    the same bytes
 *     BusStatus     u16: a BusQuestion             u16: the answer
 *     AtnControl    u16: 0 is false                the same
 *     RenControl    u16: 0 is false                the same
 *     PassControl   u32: an address, 0 to 30       the same
 *     BusAddress    u32: an address, 0 to 30       the same
 *     IfcControl    nothing                        nothing
 *
 * Numbers have the byte order that the call names, in both directions, and DocmdCall::dataSize says how long one is.
 */
namespace wire::vxi11
{

constexpr std::size_t MaxBusCommands = 128; ///< bytes of one SendCommand
constexpr std::uint32_t MaxBusAddress = 30;

/// Each is answered by 0 or 1, Address by an address.
enum class BusQuestion : std::uint16_t {
    RemoteEnable = 1,
    ServiceRequest = 2,
    NotDataAccepted = 3,
    SystemController = 4,
    ControllerInCharge = 5,
    Talker = 6,
    Listener = 7,
    Address = 8,
};

void appendNumber(std::vector<std::byte> &data, std::uint16_t value, bool networkOrder);
void appendNumber(std::vector<std::byte> &data, std::uint32_t value, bool networkOrder);

// False when the data of the call is not exactly one number of this length.
[[nodiscard]] bool takeNumber(const DocmdCall &call, std::uint16_t &value);
[[nodiscard]] bool takeNumber(const DocmdCall &call, std::uint32_t &value);
/// False when the data of the call is no string of bytes for the bus.
[[nodiscard]] bool takeBytes(const DocmdCall &call, xdr::Bytes &bytes);

} // namespace wire::vxi11
