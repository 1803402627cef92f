#pragma once

#include "simulator/instrument/Bytes.h"
#include "simulator/instrument/Parser.h"

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

/// What a numeric parameter may be. MINimum, MAXimum and DEFault stand for the three values.
struct Numeric {
    std::string_view unit; ///< upper case, for example "V"; multipliers are understood; empty: none is allowed
    double least;
    double most;
    double initial;
};

/**
 * The parameters of a command, taken in order. Each call takes the next one as the type asked for and throws the ScpiError that SCPI-99
 * gives to what does not fit: -109 missing, -104 and -1x8 type, -131 and -138 suffix, -222 range, -224 value.
 *
 * A command takes all of its parameters before it changes anything.
 */
class Arguments
{
public:
    explicit Arguments(std::vector<Parameter> parameters);

    bool more() const { return m_next < m_parameters.size(); }
    double number(const Numeric &range);
    /// As number(), for whole numbers; others are rounded.
    std::int64_t whole(const Numeric &range);
    /// What stands behind a query: MINimum, MAXimum or DEFault, and nothing else.
    double limit(const Numeric &range);
    std::int64_t integer(std::int64_t least, std::int64_t most);
    bool boolean();
    /// Index of the mnemonic in @p choices, written like "IMMediate".
    std::size_t choice(std::initializer_list<std::string_view> choices);
    std::size_t choice(std::span<const std::string> choices);
    /// Takes the next parameter if it is this word, written like "IMMediate".
    bool isWord(std::string_view pattern);
    std::string string();
    Bytes block();

private:
    Parameter &take();
    template <typename Choices>
    std::size_t chosen(const Choices &choices);
    static double limit(const Parameter &parameter, const Numeric &range);

    std::vector<Parameter> m_parameters;
    std::size_t m_next = 0;
};

} // namespace simulator
