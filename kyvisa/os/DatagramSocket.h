#pragma once

#include "kyvisa/os/NetworkInterfaces.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

namespace kyvisa::os
{

/// A UDP socket on one network interface, at a port of the system's choice. Never waits.
class DatagramSocket
{
public:
    /// Check isOpen(). Broadcasts and multicasts leave by this interface.
    explicit DatagramSocket(const NetworkInterface &interface);
    ~DatagramSocket();
    DatagramSocket(DatagramSocket &&other) noexcept;
    DatagramSocket &operator=(DatagramSocket &&) = delete;

    bool isOpen() const { return m_descriptor >= 0; }
    int descriptor() const { return m_descriptor; }

    /// @return false when the system did not take it.
    bool send(std::span<const std::byte> data, in_addr to, std::uint16_t port);
    /// One datagram, cut to the buffer's size; nothing when none is there.
    std::optional<std::size_t> receive(std::span<std::byte> buffer, in_addr &from);

private:
    int m_descriptor;
};

} // namespace kyvisa::os
