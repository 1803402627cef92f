#include "simulator/profile/JsonFields.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>

namespace simulator
{
namespace
{

std::string written(double number)
{
    std::array<char, 32> buffer;
    return {buffer.data(), std::to_chars(buffer.data(), buffer.data() + buffer.size(), number).ptr};
}

std::string listOf(std::initializer_list<std::string_view> words)
{
    std::string list;
    for (const std::string_view word : words)
        list.append(list.empty() ? "" : " ").append(word);
    return list;
}

} // namespace

const JsonValue &expect(const JsonValue &value, JsonValue::Kind kind, std::string_view what)
{
    if (value.kind != kind)
        throw ProfileError(value.position, std::string{what} + " is " + std::string{JsonValue::nameOf(kind)} +
                                               ", not " + std::string{JsonValue::nameOf(value.kind)});
    return value;
}

double numberOf(const JsonValue &value, std::string_view what, double least, double most)
{
    const double number = expect(value, JsonValue::Kind::Number, what).number;
    if (!(number >= least && number <= most))
        throw ProfileError(value.position, std::string{what} + " is between " + written(least) + " and " +
                                               written(most) + ", not " + written(number));
    return number;
}

std::size_t wordOf(const JsonValue &value, std::string_view what, std::initializer_list<std::string_view> words)
{
    const std::string &text = expect(value, JsonValue::Kind::String, what).string;
    const auto found = std::find(words.begin(), words.end(), text);
    if (found == words.end())
        throw ProfileError(value.position, std::string{what} + " \"" + text + "\" is none of " + listOf(words));
    return static_cast<std::size_t>(found - words.begin());
}

std::string textOf(const JsonValue &value, std::string_view what, std::size_t most)
{
    const std::string &text = expect(value, JsonValue::Kind::String, what).string;
    if (text.size() > most)
        throw ProfileError(value.position, std::string{what} + " is at most " + std::to_string(most) + " bytes long");
    if (std::any_of(text.begin(), text.end(), [](char c) { return static_cast<unsigned char>(c) < 32 || c == 127; }))
        throw ProfileError(value.position, std::string{what} + " has a control character");
    return text;
}

JsonFields::JsonFields(const JsonValue &value, std::string what, std::initializer_list<std::string_view> allowed)
    : m_value(expect(value, JsonValue::Kind::Object, what)), m_what(std::move(what))
{
    for (const JsonValue::Member &member : m_value.members)
        if (std::find(allowed.begin(), allowed.end(), member.key) == allowed.end())
            throw ProfileError(member.position,
                               m_what + " has no key \"" + member.key + "\"; the keys are " + listOf(allowed));
}

const JsonValue *JsonFields::find(std::string_view key) const
{
    const auto found = std::find_if(m_value.members.begin(), m_value.members.end(),
                                    [&](const JsonValue::Member &member) { return member.key == key; });
    return found == m_value.members.end() ? nullptr : &found->value;
}

const JsonValue &JsonFields::require(std::string_view key) const
{
    const JsonValue *value = find(key);
    if (!value)
        throw ProfileError(m_value.position, m_what + " needs the key \"" + std::string{key} + "\"");
    return *value;
}

double JsonFields::number(std::string_view key, double otherwise, double least, double most) const
{
    const JsonValue *value = find(key);
    return value ? numberOf(*value, "\"" + std::string{key} + "\"", least, most) : otherwise;
}

std::size_t JsonFields::whole(std::string_view key, std::size_t otherwise, std::size_t least, std::size_t most) const
{
    const JsonValue *value = find(key);
    if (!value)
        return otherwise;
    const std::string what = "\"" + std::string{key} + "\"";
    const double number = numberOf(*value, what, static_cast<double>(least), static_cast<double>(most));
    if (number != std::floor(number))
        throw ProfileError(value->position, what + " is a whole number");
    return static_cast<std::size_t>(number);
}

bool JsonFields::boolean(std::string_view key, bool otherwise) const
{
    const JsonValue *value = find(key);
    return value ? expect(*value, JsonValue::Kind::Boolean, "\"" + std::string{key} + "\"").boolean : otherwise;
}

} // namespace simulator
