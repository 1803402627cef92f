#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace soak
{

/// Bytes to and from a socket or a port. Every wait ends: whoever waits longer than the patience, or whose peer goes, gets a std::runtime_error.
class Stream
{
public:
    /// Connects to a port of 127.0.0.1.
    explicit Stream(std::uint16_t port);
    /// Opens a serial port.
    explicit Stream(const std::string &device);
    ~Stream();
    Stream(const Stream &) = delete;
    Stream &operator=(const Stream &) = delete;

    void send(std::string_view bytes);
    std::string receive(std::size_t count);

private:
    void wait(short events);

    int m_descriptor;
};

/// Most significant byte first.
std::string bigEndian(std::uint64_t value, unsigned bytes);
std::uint64_t fromBigEndian(std::string_view bytes);

} // namespace soak
