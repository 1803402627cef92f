#pragma once

#include <string_view>

namespace kyvisa
{

/**
 * The search expression of viFindRsrc: a regular expression over resource strings (VPP-4.3: `?` `\` `[ ]` `[^ ]` `*` `+`
 * `|` `( )`), optionally followed by an attribute condition in braces.
 *
 * Only global attributes may stand in the condition.
 */
class FindExpression
{
public:
    static bool isValid(std::string_view text);
};

} // namespace kyvisa
