#include "Hislip.h"

namespace wire::hislip
{
namespace
{

template <typename Unsigned>
void store(std::byte *to, Unsigned value)
{
    for (std::size_t i = 0; i < sizeof value; ++i)
        to[i] = static_cast<std::byte>(value >> (8 * (sizeof value - 1 - i)));
}

template <typename Unsigned>
Unsigned load(const std::byte *from)
{
    Unsigned value = 0;
    for (std::size_t i = 0; i < sizeof value; ++i)
        value = static_cast<Unsigned>(value << 8) | std::to_integer<Unsigned>(from[i]);
    return value;
}

} // namespace

std::array<std::byte, HeaderSize> encode(const Header &header)
{
    std::array<std::byte, HeaderSize> bytes;
    bytes[0] = std::byte{'H'};
    bytes[1] = std::byte{'S'};
    bytes[2] = static_cast<std::byte>(header.type);
    bytes[3] = static_cast<std::byte>(header.control);
    store(&bytes[4], header.parameter);
    store(&bytes[8], header.payloadLength);
    return bytes;
}

bool decode(std::span<const std::byte, HeaderSize> bytes, Header &header)
{
    if (bytes[0] != std::byte{'H'} || bytes[1] != std::byte{'S'})
        return false;
    header.type = static_cast<MessageType>(bytes[2]);
    header.control = std::to_integer<std::uint8_t>(bytes[3]);
    header.parameter = load<std::uint32_t>(&bytes[4]);
    header.payloadLength = load<std::uint64_t>(&bytes[8]);
    return true;
}

std::array<std::byte, 8> encodeSize(std::uint64_t size)
{
    std::array<std::byte, 8> bytes;
    store(bytes.data(), size);
    return bytes;
}

std::uint64_t decodeSize(std::span<const std::byte, 8> bytes)
{
    return load<std::uint64_t>(bytes.data());
}

} // namespace wire::hislip
