#include "simulator/profile/NumberText.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>

namespace simulator
{
namespace
{

// Whole numbers are exact up to here, and the text fits the buffer.
constexpr double LargestPlain = 9e15;

} // namespace

std::string numberText(double value, const NumberStyle &style)
{
    if (std::isnan(value))
        return "9.91E37";
    if (std::isinf(value))
        return value > 0 ? "9.9E37" : "-9.9E37";
    value += 0.0; // no negative zero
    NumberStyle::Form form = style.form;
    if (std::fabs(value) > LargestPlain)
        form = NumberStyle::Form::Nr3;
    if (form == NumberStyle::Form::Nr1)
        return std::to_string(std::llround(value));
    std::array<char, 64> buffer;
    const bool plain = form == NumberStyle::Form::Nr2;
    const int digits = static_cast<int>(plain ? style.digits : std::max(style.digits, 1u) - 1);
    char *end = std::to_chars(buffer.data(), buffer.data() + buffer.size(), value,
                              plain ? std::chars_format::fixed : std::chars_format::scientific, digits)
                    .ptr;
    std::replace(buffer.data(), end, 'e', 'E');
    return {buffer.data(), end};
}

} // namespace simulator
