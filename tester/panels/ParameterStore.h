#pragma once

#include <cstdint>

/// Stores the low 16 bits of a request slot's number and leaves the others as they were: consumers read no more than the
/// width of their VISA argument.
constexpr void storeUInt16(std::uint64_t &slot, std::uint16_t value)
{
    slot = (slot & ~std::uint64_t{0xFFFF}) | value;
}

/// The same for an argument of 32 bits.
constexpr void storeUInt32(std::uint64_t &slot, std::uint32_t value)
{
    slot = (slot & ~std::uint64_t{0xFFFFFFFF}) | value;
}
