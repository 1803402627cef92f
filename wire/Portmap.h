#pragma once

#include "wire/Xdr.h"

#include <cstdint>
#include <vector>

/**
 * Portmapper, version 2 (RFC 1833, section 3): which port serves a program. Over UDP or TCP, on port 111.
 *
 *     procedure   arguments   result
 *     Null        none        none
 *     Set         Mapping     boolean: registered
 *     Unset       Mapping     boolean: something was removed (protocol and port are ignored)
 *     GetPort     Mapping     u32: the port, 0 when not registered (the port given is ignored)
 *     Dump        none        list of Mapping
 *     CallIt      a call to be passed on
 */
namespace wire::portmap
{

constexpr std::uint16_t DefaultPort = 111;
constexpr std::uint32_t Program = 100000;
constexpr std::uint32_t Version = 2;

constexpr std::uint32_t Tcp = 6; ///< protocol numbers of a mapping
constexpr std::uint32_t Udp = 17;

enum class Procedure : std::uint32_t { Null = 0, Set = 1, Unset = 2, GetPort = 3, Dump = 4, CallIt = 5 };

struct Mapping {
    std::uint32_t program = 0;
    std::uint32_t version = 0;
    std::uint32_t protocol = Tcp;
    std::uint32_t port = 0;

    bool operator==(const Mapping &) const = default;
};

void encode(xdr::Writer &writer, const Mapping &mapping);
bool decode(xdr::Reader &reader, Mapping &mapping);

/// Result of GetPort. Zero, and every number that is no port, reads as "not registered".
void encodePort(xdr::Writer &writer, std::uint16_t port);
bool decodePort(xdr::Reader &reader, std::uint16_t &port);

/// Result of Set and Unset.
void encodeDone(xdr::Writer &writer, bool done);
bool decodeDone(xdr::Reader &reader, bool &done);

/// Result of Dump. Decoding fails beyond @p limit entries.
void encodeList(xdr::Writer &writer, std::span<const Mapping> mappings);
bool decodeList(xdr::Reader &reader, std::vector<Mapping> &mappings, std::size_t limit = 1024);

} // namespace wire::portmap
