#pragma once

#include "simulator/server/FileDescriptor.h"
#include "simulator/server/ListenAddress.h"

#include <cstdint>

namespace simulator
{

/// A non-blocking socket of @p type (SOCK_STREAM, SOCK_DGRAM) that is bound to the address. Port 0 takes a free one. Throws std::system_error.
FileDescriptor bindSocket(const ListenAddress &address, int type, std::uint16_t port);

/// Port that a socket is bound to.
std::uint16_t portOf(const FileDescriptor &socket);

} // namespace simulator
