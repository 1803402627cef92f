#pragma once

#include <cstddef>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace simulator
{

/// A place in a text, both counted from 1. Columns count bytes.
struct TextPosition {
    std::size_t line = 1;
    std::size_t column = 1;
};

/// What is wrong with a profile, and where.
class ProfileError : public std::runtime_error
{
public:
    ProfileError(TextPosition where, const std::string &reason) : std::runtime_error(reason), position(where) {}

    TextPosition position;
};

/// A JSON value that knows where it stands.
struct JsonValue {
    enum class Kind { Null, Boolean, Number, String, Array, Object };
    struct Member;

    Kind kind = Kind::Null;
    TextPosition position;
    bool boolean = false;
    double number = 0;
    std::string string;
    std::vector<JsonValue> elements;
    std::vector<Member> members; ///< in the order of the text

    /// "a string", "an object", ...
    static std::string_view nameOf(Kind kind);
};

struct JsonValue::Member {
    std::string key;
    TextPosition position; ///< of the key
    JsonValue value;
};

/// Reads a JSON text. Throws ProfileError for what is none, for a key that stands twice in one object, and for what is nested deeper than 16.
JsonValue parseJson(std::string_view text);

} // namespace simulator
