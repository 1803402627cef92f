#pragma once

#include "wire/Portmap.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace simulator
{

/**
 * The simulator's programs in the portmapper that runs on this machine already, an rpcbind for example: while this lives, and as long as that one agrees.
 *
 * Waits for each answer, for a second at most: it belongs to the start and the end of the program.
 */
class PortmapRegistration
{
public:
    enum class Outcome : std::uint8_t {
        Done,
        Nobody,   ///< no portmapper runs there
        Refused,  ///< it registers nobody, or has another port for the program
        NoAnswer, ///< at least none that makes sense
    };

    explicit PortmapRegistration(std::uint16_t portmapperPort) : m_portmapper(portmapperPort) {}
    ~PortmapRegistration();
    PortmapRegistration(const PortmapRegistration &) = delete;
    PortmapRegistration &operator=(const PortmapRegistration &) = delete;

    /// Takes the place of an entry whose port nobody serves any more.
    Outcome add(const wire::portmap::Mapping &mapping);

private:
    Outcome set(const wire::portmap::Mapping &mapping);
    /// True when there is an entry for the program, and its port refuses connections.
    bool isLeftOver(const wire::portmap::Mapping &mapping) const;

    const std::uint16_t m_portmapper;
    std::vector<wire::portmap::Mapping> m_mappings;
};

} // namespace simulator
