#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

struct Block;
struct MessageUnit;

/// One program data element, as IEEE 488.2 tells them apart.
struct Parameter {
    enum class Kind : std::uint8_t { Number, Character, String, Block, Expression };

    Kind kind;
    std::string text;       ///< character data, content of the string, expression with its parentheses
    double number = 0;      ///< of Number
    std::string suffix;     ///< of Number: letters behind it, upper case
    Block *block = nullptr; ///< of Block; lives in the unit
};

/// The header of a unit: `SOUR2:VOLT?` is {"SOUR2", "VOLT"}, query. Points into the unit's text.
struct CommandHeader {
    std::vector<std::string_view> mnemonics;
    bool absolute = false; ///< leading colon: starts at the root
    bool common = false;   ///< `*` command; mnemonics holds the name alone
    bool query = false;
    std::string_view text; ///< as sent
};

struct ParsedUnit {
    CommandHeader header;
    std::vector<Parameter> parameters;
};

/// Takes a unit apart. Throws a ScpiError of class -1xx for what breaks the syntax; whether the header and the data types mean anything is decided later.
ParsedUnit parseUnit(MessageUnit &unit);

} // namespace simulator
