#pragma once

#include "simulator/fault/FaultSpec.h"
#include "simulator/server/ListenAddress.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

namespace simulator
{

struct Profile;

/// What the command line asks for.
struct Options {
    std::vector<ListenAddress> listen;
    std::optional<std::uint16_t> hislip;
    std::optional<std::uint16_t> socket;
    std::optional<std::uint16_t> vxi11;
    std::optional<std::uint16_t> portmapper;
    std::optional<std::uint16_t> http;
    /// The portmapper was not asked for, VXI-11 without one was: not to have it is no error.
    bool portmapperIsOptional = false;
    bool serial = false;
    bool gateway = false;
    bool refuseBusCommands = false;
    std::size_t maxMessage = 0;
    std::size_t maxClients = 0;             ///< of each service
    unsigned handshakeTimeout = 0;          ///< seconds; 0: the protocol's own
    std::shared_ptr<const Profile> profile; ///< may be null
    std::vector<FaultSpec> faults;
    std::uint64_t seed = 0;
    std::optional<std::uint64_t> memory; ///< bytes of mass memory
    bool reportUnread = true;
    bool hislipOverlap = false;
    bool signedErrors = false;
    bool mdns = false;
    bool log = false;
    bool quiet = false;
};

/// Fills @p options. A value is the status to leave with: 0 after --help and --version, 2 after a message about a bad option.
std::optional<int> parseOptions(int argc, const char *const *argv, Options &options);

} // namespace simulator
