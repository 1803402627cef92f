#pragma once

#include "kyvisa/core/AttributeCondition.h"
#include "kyvisa/core/ResourcePattern.h"

#include <cstddef>
#include <optional>
#include <string_view>

namespace kyvisa
{

/// Bytes of an expression. Working it out takes time and stack in proportion, and nobody types as much.
constexpr std::size_t LongestExpression = 4096;

/**
 * The search expression of viFindRsrc: a regular expression over resource strings, optionally followed by an attribute
 * condition in braces, such as `ASRL?*INSTR{VI_ATTR_ASRL_BAUD == 9600}`.
 */
class FindExpression
{
public:
    /// Nothing when @p text is not valid, or too long.
    static std::optional<FindExpression> parse(std::string_view text);

    /// @param resource a canonical resource string.
    bool matches(std::string_view resource) const;
    /// Whether some resource whose name begins like this could match.
    bool mayMatch(std::string_view beginning) const { return m_pattern.mayMatch(beginning); }

private:
    FindExpression(ResourcePattern pattern, std::optional<AttributeCondition> condition)
        : m_pattern(std::move(pattern)), m_condition(std::move(condition))
    {
    }

    ResourcePattern m_pattern;
    std::optional<AttributeCondition> m_condition;
};

} // namespace kyvisa
