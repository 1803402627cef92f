#include "simulator/profile/JsonText.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <optional>

namespace simulator
{
namespace
{

constexpr std::size_t MaxDepth = 16;
constexpr std::size_t MaxKeys = 100; ///< of an object: no profile has as many, and each is compared with all before it

using Json = nlohmann::json;

/// Goes along the text in step with the parser's events, since these do not tell where they stand.
class Tracker
{
public:
    explicit Tracker(std::string_view text) : m_text(text) {}

    /// The token of the next event: behind the last one there is nothing but white space, commas and colons.
    TextPosition next()
    {
        while (m_at < m_text.size() &&
               std::string_view{" \t\r\n,:\xEF\xBB\xBF"}.find(m_text[m_at]) != std::string_view::npos)
            step();
        const TextPosition begun = m_position;
        const char first = m_at < m_text.size() ? m_text[m_at] : '\0';
        step();
        if (first == '"')
            skipString();
        else if (std::string_view{"{}[]"}.find(first) == std::string_view::npos)
            while (m_at < m_text.size() &&
                   std::string_view{" \t\r\n,:{}[]"}.find(m_text[m_at]) == std::string_view::npos)
                step();
        return begun;
    }

    /// Goes to a byte, for an error.
    TextPosition at(std::size_t byte)
    {
        while (m_at < std::min(byte, m_text.size()))
            step();
        return m_position;
    }

private:
    void step()
    {
        if (m_at >= m_text.size())
            return;
        if (m_text[m_at++] == '\n')
            m_position = {m_position.line + 1, 1};
        else
            ++m_position.column;
    }

    void skipString()
    {
        while (m_at < m_text.size()) {
            const char c = m_text[m_at];
            step();
            if (c == '\\')
                step();
            else if (c == '"')
                return;
        }
    }

    const std::string_view m_text;
    std::size_t m_at = 0;
    TextPosition m_position;
};

/// Builds the value from the parser's events.
class Builder final : public nlohmann::json_sax<Json>
{
public:
    explicit Builder(std::string_view text) : m_text(text), m_tracker(text) {}

    JsonValue take() { return std::move(m_root); }

    bool null() override { return add(JsonValue::Kind::Null), true; }
    bool boolean(bool value) override
    {
        add(JsonValue::Kind::Boolean).boolean = value;
        return true;
    }
    bool number_integer(number_integer_t value) override { return number(static_cast<double>(value)); }
    bool number_unsigned(number_unsigned_t value) override { return number(static_cast<double>(value)); }
    bool number_float(number_float_t value, const string_t &) override { return number(value); }
    bool string(string_t &value) override
    {
        add(JsonValue::Kind::String).string = value;
        return true;
    }
    bool binary(binary_t &) override { return false; }
    bool start_object(std::size_t) override { return open(JsonValue::Kind::Object); }
    bool start_array(std::size_t) override { return open(JsonValue::Kind::Array); }
    bool end_object() override { return close(); }
    bool end_array() override { return close(); }

    bool key(string_t &name) override
    {
        const TextPosition position = m_tracker.next();
        auto &members = m_open.back()->members;
        const auto same =
            std::find_if(members.begin(), members.end(), [&](const auto &member) { return member.key == name; });
        if (same != members.end())
            throw ProfileError(position, "the key \"" + name + "\" stands here already, in line " +
                                             std::to_string(same->position.line));
        if (members.size() == MaxKeys)
            throw ProfileError(position, "more than " + std::to_string(MaxKeys) + " keys in one object");
        members.push_back({name, position, {}});
        return true;
    }

    bool parse_error(std::size_t byte, const std::string &, const nlohmann::detail::exception &error) override
    {
        // "[...] parse error at line 3, column 5: syntax error while parsing value - ..."
        std::string reason = error.what();
        if (const std::size_t behind = reason.find("] "); behind != std::string::npos)
            reason.erase(0, behind + 2);
        if (const std::size_t column = reason.find(", column "); column != std::string::npos)
            if (const std::size_t behind = reason.find(": ", column); behind != std::string::npos)
                reason.erase(0, behind + 2);
        throw ProfileError(positionOf(byte), reason);
    }

private:
    TextPosition positionOf(std::size_t byte) const
    {
        // The parser counts the bytes read, the wrong one included.
        return Tracker(m_text).at(byte == 0 ? 0 : byte - 1);
    }

    bool number(double value)
    {
        add(JsonValue::Kind::Number).number = value;
        return true;
    }

    JsonValue &add(JsonValue::Kind kind)
    {
        const TextPosition position = m_tracker.next();
        JsonValue *to = &m_root;
        if (!m_open.empty()) {
            JsonValue &parent = *m_open.back();
            to = parent.kind == JsonValue::Kind::Array ? &parent.elements.emplace_back() : &parent.members.back().value;
        }
        to->kind = kind;
        to->position = position;
        return *to;
    }

    bool open(JsonValue::Kind kind)
    {
        // The parent's elements do not move while one of them is open.
        JsonValue &value = add(kind);
        if (m_open.size() >= MaxDepth)
            throw ProfileError(value.position, "nested deeper than " + std::to_string(MaxDepth));
        m_open.push_back(&value);
        return true;
    }

    bool close()
    {
        m_tracker.next();
        m_open.pop_back();
        return true;
    }

    const std::string_view m_text;
    Tracker m_tracker;
    JsonValue m_root;
    std::vector<JsonValue *> m_open;
};

} // namespace

std::string_view JsonValue::nameOf(Kind kind)
{
    switch (kind) {
    case Kind::Null:
        return "null";
    case Kind::Boolean:
        return "true or false";
    case Kind::Number:
        return "a number";
    case Kind::String:
        return "a string";
    case Kind::Array:
        return "a list";
    case Kind::Object:
        return "an object";
    }
    return {};
}

JsonValue parseJson(std::string_view text)
{
    Builder builder(text);
    Json::sax_parse(text.begin(), text.end(), &builder);
    return builder.take();
}

} // namespace simulator
