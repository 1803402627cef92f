#pragma once

#include "kyvisa/os/StreamSocket.h"

#include <cstdint>

namespace kyvisa::os
{

/// A TCP socket that waits for connections on one of this machine's IPv4 addresses, on a port that the system chose.
class ListeningSocket
{
public:
    ListeningSocket() = default;
    ~ListeningSocket() { close(); }
    ListeningSocket(const ListeningSocket &) = delete;
    ListeningSocket &operator=(const ListeningSocket &) = delete;

    /// @param address in host order, 127.0.0.1 is 0x7F000001. False when the system refused.
    bool open(std::uint32_t address);
    void close();

    std::uint16_t port() const { return m_port; }
    /// For waiting: readable when a connection has come.
    int descriptor() const { return m_descriptor; }
    /// Takes a connection that has come; one that is not open when none has.
    StreamSocket accept();

private:
    int m_descriptor = -1;
    std::uint16_t m_port = 0;
};

} // namespace kyvisa::os
