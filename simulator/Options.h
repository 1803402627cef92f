#pragma once

#include "simulator/server/ListenAddress.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace simulator
{

/// What the command line asks for.
struct Options {
    std::vector<ListenAddress> listen;
    std::optional<std::uint16_t> hislip;
    std::optional<std::uint16_t> socket;
    std::optional<std::uint16_t> vxi11;
    std::optional<std::uint16_t> portmapper;
    /// The portmapper was not asked for, VXI-11 without one was: not to have it is no error.
    bool portmapperIsOptional = false;
    std::size_t maxMessage = 0;
    bool reportUnread = true;
    bool quiet = false;
};

/// Fills @p options. A value is the status to leave with: 0 after --help and --version, 2 after a message about a bad option.
std::optional<int> parseOptions(int argc, const char *const *argv, Options &options);

} // namespace simulator
