#pragma once

#include <bitset>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

namespace kyvisa
{

class TextReader;

/**
 * The regular expression of viFindRsrc (VPP-4.3): `?` any character, `\` the next one literally, `[ ]` `[^ ]` lists and
 * ranges, `*` `+` repetition, `|` either whole side, `( )` grouping. It matches whole resource strings and ignores case.
 *
 * Matching follows all possibilities at once, so it takes time in proportion to the pattern times the text, whatever the
 * pattern says.
 */
class ResourcePattern
{
public:
    /// Reads a pattern up to the end of the text, or to the brace of a condition. Nothing when it is not valid.
    static std::optional<ResourcePattern> parse(TextReader &reader);

    bool matches(std::string_view text) const;
    /// Whether some text that begins like this could match.
    bool mayMatch(std::string_view beginning) const;

    /// One step of the machine that matches. Targets are relative, so that pieces of a program can be put together.
    struct Step {
        enum class Kind : std::uint8_t { Character, Either, Jump, Match };
        Kind kind;
        std::bitset<256> characters; ///< of Character
        int first = 0;               ///< of Either and Jump
        int second = 0;              ///< of Either
    };
    using Program = std::vector<Step>;

private:
    explicit ResourcePattern(Program program) : m_program(std::move(program)) {}

    std::vector<bool> reachedAfter(std::string_view text) const;
    void follow(std::size_t step, std::vector<bool> &reached, std::vector<std::size_t> &waiting) const;

    Program m_program;
};

} // namespace kyvisa
