#include "simulator/instrument/Arguments.h"

#include "simulator/instrument/Characters.h"
#include "simulator/instrument/InputBuffer.h"
#include "simulator/instrument/Parser.h"
#include "simulator/instrument/ScpiError.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>

namespace simulator
{
namespace
{

using Kind = Parameter::Kind;

/// The error that says "data of this kind are not allowed here".
[[noreturn]] void refuse(const Parameter &parameter)
{
    switch (parameter.kind) {
    case Kind::Number:
        throw ScpiError{-128, {}};
    case Kind::Character:
        throw ScpiError{-148, parameter.text};
    case Kind::String:
        throw ScpiError{-158, {}};
    case Kind::Block:
        throw ScpiError{-168, {}};
    case Kind::Expression:
        throw ScpiError{-178, {}};
    }
    throw ScpiError{-104, {}};
}

bool isForm(std::string_view word, std::string_view pattern)
{
    const auto shortLength =
        static_cast<std::size_t>(std::find_if_not(pattern.begin(), pattern.end(), isUpper) - pattern.begin());
    return (word.size() == pattern.size() || word.size() == shortLength) &&
           std::equal(word.begin(), word.end(), pattern.begin(), [](char a, char b) { return a == toUpper(b); });
}

struct Multiplier {
    std::string_view name;
    double factor;
};

/// The suffix multipliers of IEEE 488.2. M is milli, but mega in front of HZ and OHM.
constexpr std::array Multipliers{
    Multiplier{"EX", 1e18}, Multiplier{"PE", 1e15}, Multiplier{"T", 1e12},  Multiplier{"G", 1e9},
    Multiplier{"MA", 1e6},  Multiplier{"K", 1e3},   Multiplier{"", 1},      Multiplier{"M", 1e-3},
    Multiplier{"U", 1e-6},  Multiplier{"N", 1e-9},  Multiplier{"P", 1e-12}, Multiplier{"F", 1e-15},
    Multiplier{"A", 1e-18},
};

double factorOf(std::string_view suffix, std::string_view unit)
{
    if (suffix.empty())
        return 1;
    if (unit.empty())
        throw ScpiError{-138, std::string{suffix}};
    if (!suffix.ends_with(unit))
        throw ScpiError{-131, std::string{suffix}};
    suffix.remove_suffix(unit.size());
    if (suffix == "M" && (unit == "HZ" || unit == "OHM"))
        return 1e6;
    for (const Multiplier &multiplier : Multipliers)
        if (suffix == multiplier.name)
            return multiplier.factor;
    throw ScpiError{-131, std::string{suffix}};
}

} // namespace

Arguments::Arguments(std::vector<Parameter> parameters) : m_parameters(std::move(parameters)) {}

Parameter &Arguments::take()
{
    if (!more())
        throw ScpiError{-109, {}};
    return m_parameters[m_next++];
}

double Arguments::limit(const Parameter &parameter, const Numeric &range)
{
    if (parameter.kind != Kind::Character)
        refuse(parameter);
    if (isForm(parameter.text, "MINimum"))
        return range.least;
    if (isForm(parameter.text, "MAXimum"))
        return range.most;
    if (isForm(parameter.text, "DEFault"))
        return range.initial;
    if (isForm(parameter.text, "INFinity") || isForm(parameter.text, "NINFinity"))
        throw ScpiError{-222, parameter.text};
    refuse(parameter);
}

double Arguments::limit(const Numeric &range)
{
    return limit(take(), range);
}

std::int64_t Arguments::whole(const Numeric &range)
{
    Numeric rounded = range;
    rounded.least -= 0.49;
    rounded.most += 0.49;
    return std::llround(std::clamp(number(rounded), range.least, range.most));
}

double Arguments::number(const Numeric &range)
{
    const Parameter &parameter = take();
    if (parameter.kind != Kind::Number)
        return limit(parameter, range);
    const double value = parameter.number * factorOf(parameter.suffix, range.unit);
    if (!(value >= range.least && value <= range.most))
        throw ScpiError{-222, {}};
    return value;
}

std::int64_t Arguments::integer(std::int64_t least, std::int64_t most)
{
    const Numeric range{"", static_cast<double>(least) - 0.5, static_cast<double>(most) + 0.5, 0};
    const Parameter &parameter = take();
    if (parameter.kind != Kind::Number)
        refuse(parameter);
    if (!parameter.suffix.empty())
        throw ScpiError{-138, parameter.suffix};
    if (!(parameter.number > range.least && parameter.number < range.most))
        throw ScpiError{-222, {}};
    return std::llround(parameter.number);
}

bool Arguments::boolean()
{
    const Parameter &parameter = take();
    if (parameter.kind == Kind::Character) {
        if (parameter.text == "ON")
            return true;
        if (parameter.text == "OFF")
            return false;
        throw ScpiError{-224, parameter.text};
    }
    if (parameter.kind != Kind::Number)
        refuse(parameter);
    if (!parameter.suffix.empty())
        throw ScpiError{-138, parameter.suffix};
    return std::round(parameter.number) != 0;
}

template <typename Choices>
std::size_t Arguments::chosen(const Choices &choices)
{
    const Parameter &parameter = take();
    if (parameter.kind != Kind::Character)
        refuse(parameter);
    const auto found = std::find_if(choices.begin(), choices.end(),
                                    [&](std::string_view pattern) { return isForm(parameter.text, pattern); });
    if (found == choices.end())
        throw ScpiError{-224, parameter.text};
    return static_cast<std::size_t>(found - choices.begin());
}

std::size_t Arguments::choice(std::initializer_list<std::string_view> choices)
{
    return chosen(choices);
}

std::size_t Arguments::choice(std::span<const std::string> choices)
{
    return chosen(choices);
}

bool Arguments::isWord(std::string_view pattern)
{
    if (!more() || m_parameters[m_next].kind != Kind::Character || !isForm(m_parameters[m_next].text, pattern))
        return false;
    ++m_next;
    return true;
}

std::string Arguments::string()
{
    Parameter &parameter = take();
    if (parameter.kind != Kind::String)
        refuse(parameter);
    return std::move(parameter.text);
}

Bytes Arguments::block()
{
    const Parameter &parameter = take();
    if (parameter.kind != Kind::Block)
        refuse(parameter);
    return std::move(parameter.block->bytes);
}

} // namespace simulator
