#pragma once

#include "kyvisa/include/visatype.h"

#include <bitset>
#include <cstddef>
#include <string>
#include <vector>

namespace kyvisa::format
{

/// A width, precision or count in a conversion: absent, written in the format, or taken from an argument (`*`, `#`).
struct Amount {
    enum class From { Nowhere, Format, Argument };

    From from = From::Nowhere;
    std::size_t value = 0;

    bool given() const { return from != From::Nowhere; }
};

enum class Length : std::uint8_t { None, Short, Long, LongLong, LongDouble, Float, Double };

/**
 * One step of a format text. Escapes that are written as two characters (`\n`, `\\`, `\ooo`) are resolved here, beside the
 * control characters that a C compiler made of them.
 */
struct Directive {
    enum class Kind {
        Text,    ///< goes out as it is; must match on input
        LineEnd, ///< output: line feed with END
        Blank,   ///< input: skip white space
        Conversion
    };

    Kind kind = Kind::Text;
    std::string text; ///< of Text

    char code = 0; ///< the conversion's letter; '[' for a set of characters
    bool left = false;
    bool plus = false;
    bool space = false;
    bool zero = false;
    bool discard = false; ///< input: `%*d`
    char notation = 0;    ///< behind `@`: 1 2 3 H Q B
    Amount width;         ///< for b, B and y: the number of elements
    Amount precision;
    Amount arraySize;
    Length length = Length::None;
    bool littleEndian = false;
    std::bitset<256> set; ///< of '['

    bool isInteger() const;
    bool isFloat() const;
    bool isBlock() const { return code == 'b' || code == 'B' || code == 'y'; }
    std::size_t elementSize() const; ///< of a block's element in bytes
};

using Directives = std::vector<Directive>;

/// @return VI_SUCCESS, VI_ERROR_INV_FMT (no such conversion, or a modifier that it does not have) or VI_ERROR_NSUP_FMT.
ViStatus parseOutputFormat(const char *format, Directives &directives);
ViStatus parseInputFormat(const char *format, Directives &directives);

} // namespace kyvisa::format
