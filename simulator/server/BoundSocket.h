#pragma once

#include "simulator/server/FileDescriptor.h"
#include "simulator/server/ListenAddress.h"

#include <cstdint>
#include <string>

namespace simulator
{

/// A non-blocking socket of @p type (SOCK_STREAM, SOCK_DGRAM) that is bound to the address. Port 0 takes a free one. Throws std::system_error.
FileDescriptor bindSocket(const ListenAddress &address, int type, std::uint16_t port);

/// A datagram socket that hears broadcasts to the network of @p address, which one that is bound to the address itself does not. Several programs may share it. Empty
/// where there is nothing to hear: on loopback, for IPv6, and for 0.0.0.0, which hears them anyway.
FileDescriptor bindBroadcast(const ListenAddress &address, std::uint16_t port);

/// The other end of a TCP connection, as "127.0.0.1:40312" or "[::1]:40312"; "?" when it has gone.
std::string peerOf(const FileDescriptor &socket);

/// Port that a socket is bound to.
std::uint16_t portOf(const FileDescriptor &socket);

} // namespace simulator
