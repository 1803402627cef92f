#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace kyvisa::format
{

/// Digits of @p magnitude in @p base (2, 8, 10 or 16), with zeros in front up to @p leastDigits.
std::string integerDigits(std::uint64_t magnitude, int base, bool capitals, std::size_t leastDigits);

/// The magnitude of @p value as C's printf writes it for @p code (one of f e E g G), with a decimal point whatever the
/// process's locale is. Infinite and undefined values are "inf" and "nan".
std::string floatDigits(long double value, char code, std::size_t precision);

/**
 * A number as IEEE 488.2 lets a device write it (NRf: NR1, NR2, NR3), or in base 2, 8 or 16. Integers are exact in the
 * whole range of 64 bits, with and without sign.
 */
struct Number {
    bool negative = false;
    bool exact = false; ///< `magnitude` holds it; otherwise `real` alone does
    std::uint64_t magnitude = 0;
    long double real = 0; ///< with its sign

    /// The nearest integer, halves upwards, limited to [low, high].
    std::int64_t rounded(std::int64_t low, std::int64_t high) const;
    std::uint64_t roundedUnsigned(std::uint64_t high) const;
};

/// @param text sign, digits, point and exponent, complete. @return false when it is no number.
bool parseDecimal(std::string_view text, Number &number);
/// @param digits of @p base, without sign or prefix; limited to 64 bits.
bool parseDigits(std::string_view digits, int base, Number &number);

} // namespace kyvisa::format
