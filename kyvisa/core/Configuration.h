#pragma once

#include "kyvisa/include/visatype.h"

#include <array>
#include <cstddef>
#include <map>
#include <string>
#include <string_view>
#include <vector>

namespace kyvisa
{

/**
 * What the library's configuration file says: an INI file that the user and other programs write.
 *
 *     [KYVISA]            Debug = 1
 *     [KYVXI11-RSRCS]     Name0 = "TCPIP::192.168.0.7::inst0::INSTR"     (SOCKET-RSRCS, HISLIP-RSRCS, KYGPIB-RSRCS alike)
 *     [ALIASES]           Alias0 = "'meter','TCPIP::192.168.0.7::INSTR'"
 *     [KYGPIB-GATEWAYS]   Board0 = "TCPIP::192.168.0.9::gpib0"
 *
 * Sections and keys are recognised without case, values with or without double quotes. Entries count by their keys' numbers;
 * the keys that tell how many there are have no say. Sections that are not listed here are somebody else's.
 */
struct Configuration {
    enum class List { Vxi11, Socket, Hislip, Gpib };

    struct Alias {
        std::string name;
        std::string resource;
    };

    bool debug = false;
    std::array<std::vector<std::string>, 4> resources; ///< by List
    std::vector<Alias> aliases;
    std::map<ViUInt16, std::string> gateways; ///< by GPIB board

    const std::vector<std::string> &resourcesOf(List list) const { return resources[static_cast<std::size_t>(list)]; }
    /// The resource that @p name stands for, without case; nullptr when it is no alias.
    const std::string *resourceOf(std::string_view alias) const;
};

/// Bytes of a configuration file that are looked at. Nobody lists that many instruments by hand.
constexpr std::size_t LongestConfiguration = 1024 * 1024;

/// @param damaged receives the numbers, from 1, of the lines that were skipped because they make no sense.
Configuration parseConfiguration(std::string_view text, std::vector<int> &damaged);

/**
 * Reads the first of these files that exists: $KYVISA_CONFIG, $XDG_CONFIG_HOME/Oltrava/kyvisa.ini (without that variable
 * ~/.config/...), /etc/kyvisa.ini. Without any, everything has its default.
 *
 * With Debug on, each damaged line is told to stderr.
 */
Configuration readConfiguration();

} // namespace kyvisa
