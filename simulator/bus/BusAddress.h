#pragma once

#include <cstdint>
#include <optional>
#include <utility>

namespace simulator
{

/// Where an instrument is on the bus: two numbers from 0 to 30, of which the second may be absent.
struct BusAddress {
    static constexpr std::uint8_t Most = 30;

    std::uint8_t primary = 0;
    std::optional<std::uint8_t> secondary{};

    bool operator==(const BusAddress &) const = default;
    bool operator<(const BusAddress &other) const
    {
        return std::pair{primary, secondary} < std::pair{other.primary, other.secondary};
    }
};

} // namespace simulator
