#include "kyvisa/format/NumberText.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <limits>

namespace kyvisa::format
{
namespace
{

/// The integral part of the largest long double has about 4900 digits; what is asked beyond is zeros.
constexpr std::size_t MostPrecision = 10'000;
constexpr std::size_t RoomForInteger = 5'000;

} // namespace

std::string integerDigits(std::uint64_t magnitude, int base, bool capitals, std::size_t leastDigits)
{
    std::array<char, 64> digits;
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), magnitude, base).ptr;
    std::string text(digits.data(), end);
    if (capitals)
        std::transform(text.begin(), text.end(), text.begin(),
                       [](char c) { return c >= 'a' ? char(c - 'a' + 'A') : c; });
    if (text.size() < leastDigits)
        text.insert(0, leastDigits - text.size(), '0');
    return text;
}

std::string floatDigits(long double value, char code, std::size_t precision)
{
    if (std::isnan(value))
        return "nan";
    if (std::isinf(value))
        return "inf";
    const std::size_t digits = std::min(precision, MostPrecision);
    const auto form = code == 'f'                  ? std::chars_format::fixed
                      : code == 'e' || code == 'E' ? std::chars_format::scientific
                                                   : std::chars_format::general;
    std::string text(digits + RoomForInteger, '\0');
    const auto end =
        std::to_chars(text.data(), text.data() + text.size(), std::fabs(value), form, static_cast<int>(digits)).ptr;
    text.resize(static_cast<std::size_t>(end - text.data()));
    if (code == 'E' || code == 'G')
        std::replace(text.begin(), text.end(), 'e', 'E');
    return text;
}

std::int64_t Number::rounded(std::int64_t low, std::int64_t high) const
{
    constexpr auto MostPositive = static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());
    if (exact && magnitude <= MostPositive) {
        const auto value = static_cast<std::int64_t>(magnitude);
        return std::clamp(negative ? -value : value, low, high);
    }
    const long double value = std::floor(real + 0.5L);
    if (!(value > static_cast<long double>(low))) // an undefined value too
        return low;
    return value >= static_cast<long double>(high) ? high : static_cast<std::int64_t>(value);
}

std::uint64_t Number::roundedUnsigned(std::uint64_t high) const
{
    if (exact && !negative)
        return std::min(magnitude, high);
    // As in C, a negative integer wraps around.
    if (exact)
        return (~magnitude + 1) & high;
    const long double value = std::floor(real + 0.5L);
    if (!(value > 0))
        return 0;
    return value >= static_cast<long double>(high) ? high : static_cast<std::uint64_t>(value);
}

bool parseDecimal(std::string_view text, Number &number)
{
    number = {};
    if (!text.empty() && (text.front() == '+' || text.front() == '-')) {
        number.negative = text.front() == '-';
        text.remove_prefix(1);
    }
    const char *const end = text.data() + text.size();
    const auto whole = std::from_chars(text.data(), end, number.magnitude);
    number.exact = whole.ec == std::errc() && whole.ptr == end;
    const auto [rest, error] = std::from_chars(text.data(), end, number.real);
    if (rest != end || text.empty())
        return false;
    if (error == std::errc::result_out_of_range) {
        // Too large, or too near to zero: the exponent's sign tells.
        const std::size_t exponent = text.find_first_of("eE");
        const bool tiny = exponent != std::string_view::npos && text.substr(exponent + 1).starts_with('-');
        number.real = tiny ? 0 : std::numeric_limits<long double>::infinity();
    } else if (error != std::errc()) {
        return false;
    }
    if (number.negative)
        number.real = -number.real;
    return true;
}

bool parseDigits(std::string_view digits, int base, Number &number)
{
    number = {};
    if (digits.empty())
        return false;
    const char *const end = digits.data() + digits.size();
    const auto [rest, error] = std::from_chars(digits.data(), end, number.magnitude, base);
    if (error == std::errc::result_out_of_range)
        number.magnitude = std::numeric_limits<std::uint64_t>::max();
    else if (error != std::errc() || rest != end)
        return false;
    number.exact = true;
    number.real = static_cast<long double>(number.magnitude);
    return true;
}

} // namespace kyvisa::format
