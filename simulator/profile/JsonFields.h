#pragma once

#include "simulator/profile/JsonText.h"

#include <cstddef>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

/**
 * The members of one object, taken by name and checked on the way. Whoever has constructed it with the names that the object may have knows that there are no others.
 */
class JsonFields
{
public:
    /// @p what names the object in messages: "a setting". Throws ProfileError when @p value is no object or has a key beside @p allowed.
    JsonFields(const JsonValue &value, std::string what, std::initializer_list<std::string_view> allowed);

    /// Null when the key is not there.
    const JsonValue *find(std::string_view key) const;
    const JsonValue &require(std::string_view key) const;
    TextPosition position() const { return m_value.position; }

    double number(std::string_view key, double otherwise, double least, double most) const;
    std::size_t whole(std::string_view key, std::size_t otherwise, std::size_t least, std::size_t most) const;
    bool boolean(std::string_view key, bool otherwise) const;

private:
    const JsonValue &m_value;
    std::string m_what;
};

/// The value, of the right kind. @p what names it in messages.
const JsonValue &expect(const JsonValue &value, JsonValue::Kind kind, std::string_view what);
double numberOf(const JsonValue &value, std::string_view what, double least, double most);
/// Index of the string in a list of words.
std::size_t wordOf(const JsonValue &value, std::string_view what, std::initializer_list<std::string_view> words);
/// A text that can stand in an answer: no control characters.
std::string textOf(const JsonValue &value, std::string_view what, std::size_t most);

} // namespace simulator
