#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace simulator
{

/// Thrown by parser and commands to refuse a program message unit. The exchange reports it and goes on with the next unit.
struct ScpiError {
    int number;       ///< as in SCPI-99: -100 to -199 command, -200 execution, -300 device, -400 query
    std::string info; ///< device-dependent part of the text, may be empty
};

/// The text that SCPI-99 gives a number; that of its class for one that it does not name.
std::string_view errorText(int number);

/// The bit of the standard event status register that an error of this number sets.
std::uint8_t eventOfError(int number);

} // namespace simulator
