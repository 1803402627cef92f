#pragma once

#include "kyvisa/include/visatype.h"

#include <string>
#include <string_view>

namespace kyvisa
{

/// What a resource string says, with the defaults filled in.
struct ResourceName {
    enum class Class { Instr, Socket, Intfc, Memacc, Backplane, Servant };

    ViUInt16 interfaceType = 0; ///< VI_INTF_...
    ViUInt16 board = 0;
    Class resourceClass = Class::Instr;

    // TCPIP
    std::string host; ///< name or address in numbers, without the brackets of an IPv6 address
    std::string deviceName;
    ViUInt16 port = 0;
    bool deviceNameGiven = false;
    bool secure = false; ///< credentials were given

    // GPIB
    ViUInt16 primaryAddress = 0;
    ViUInt16 secondaryAddress = 0xFFFF; ///< VI_NO_SEC_ADDR

    // where the LAN gateway of the board is, which no resource string says: the configuration does
    std::string gatewayHost;
    std::string gatewayInterface;

    // Everything else: the parts between board and class, as given. ASRL: the device file, or empty for a port by number.
    std::string address;

    /// The device name says HiSLIP.
    bool isHislip() const;

    /// The full form, with board number and class. Opening it opens the same resource.
    std::string canonical() const;
    const char *className() const;
};

/// Longest resource string, without its NUL.
constexpr std::size_t MaxResourceName = 255;

/// VI_SUCCESS or VI_ERROR_INV_RSRC_NAME.
ViStatus parseResourceName(std::string_view text, ResourceName &name);

} // namespace kyvisa
