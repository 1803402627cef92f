#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

namespace soak
{

/// Where a simulator is reached.
struct Places {
    std::uint16_t socket;
    std::uint16_t hislip;
    std::uint16_t vxi11;
    std::string serial;
};

/// A client of one protocol, connected. What goes wrong is a std::runtime_error.
class Client
{
public:
    virtual ~Client() = default;

    /// Sends a program message and waits for its answer, both with their line feed. The answer has at most 1 KiB.
    virtual std::string query(std::string_view message) = 0;
};

enum class Kind { Socket, HislipSynchronized, HislipOverlapped, Vxi11, Bus7, Bus9, Serial };

std::unique_ptr<Client> connect(Kind kind, const Places &places);

/// Asks a portmapper for the port of VXI-11.
std::uint16_t vxi11Port(std::uint16_t portmapper);

} // namespace soak
