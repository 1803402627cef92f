#include "kyvisa/core/AttributeCondition.h"

#include "kyvisa/core/TextReader.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>

namespace kyvisa
{
namespace
{

constexpr int MaxNesting = 64;

/// Attributes that differ from session to session of one resource.
constexpr std::string_view LocalNames[] = {
    "VI_ATTR_TMO_VALUE",        "VI_ATTR_TERMCHAR",         "VI_ATTR_TERMCHAR_EN",      "VI_ATTR_SEND_END_EN",
    "VI_ATTR_SUPPRESS_END_EN",  "VI_ATTR_IO_PROT",          "VI_ATTR_MAX_QUEUE_LENGTH", "VI_ATTR_USER_DATA",
    "VI_ATTR_RM_SESSION",       "VI_ATTR_TRIG_ID",          "VI_ATTR_DMA_ALLOW_EN",     "VI_ATTR_FILE_APPEND_EN",
    "VI_ATTR_RD_BUF_OPER_MODE", "VI_ATTR_WR_BUF_OPER_MODE", "VI_ATTR_ASRL_END_IN",      "VI_ATTR_ASRL_END_OUT",
    "VI_ATTR_TCPIP_NODELAY",    "VI_ATTR_TCPIP_KEEPALIVE",
};

bool isWord(unsigned char c)
{
    return std::isalnum(c) || c == '_';
}

enum class Relation { Equal, NotEqual, AtLeast, AtMost, More, Less };

/// The longer operators come first: ">" is how ">=" begins.
constexpr std::pair<std::string_view, Relation> Relations[] = {
    {"==", Relation::Equal},  {"!=", Relation::NotEqual}, {">=", Relation::AtLeast},
    {"<=", Relation::AtMost}, {">", Relation::More},      {"<", Relation::Less},
};

bool compare(const AttributeCondition::Value &value, Relation relation, const AttributeCondition::Value &with)
{
    switch (relation) {
    case Relation::Equal:
        return value == with;
    case Relation::NotEqual:
        return value != with;
    case Relation::AtLeast:
        return value >= with;
    case Relation::AtMost:
        return value <= with;
    case Relation::More:
        return value > with;
    case Relation::Less:
        return value < with;
    }
    return false;
}

} // namespace

/// or := and { "||" and }   and := factor { "&&" factor }   factor := "(" or ")" | "!" factor | comparison
class ConditionParser
{
public:
    using Test = AttributeCondition::Test;

    explicit ConditionParser(TextReader &reader) : m_reader(reader) {}

    bool either(int depth, Test &test)
    {
        if (!both(depth, test))
            return false;
        while (token("||")) {
            Test other;
            if (!both(depth, other))
                return false;
            test = [left = std::move(test), right = std::move(other)](const auto &lookup) {
                return left(lookup) || right(lookup);
            };
        }
        return true;
    }

private:
    bool token(std::string_view expected)
    {
        m_reader.skipBlanks();
        return m_reader.take(expected);
    }

    bool both(int depth, Test &test)
    {
        if (!factor(depth, test))
            return false;
        while (token("&&")) {
            Test other;
            if (!factor(depth, other))
                return false;
            test = [left = std::move(test), right = std::move(other)](const auto &lookup) {
                return left(lookup) && right(lookup);
            };
        }
        return true;
    }

    bool factor(int depth, Test &test)
    {
        if (depth > MaxNesting)
            return false;
        if (token("("))
            return either(depth + 1, test) && token(")");
        if (token("!")) {
            Test inner;
            if (!factor(depth + 1, inner))
                return false;
            test = [inner = std::move(inner)](const auto &lookup) { return !inner(lookup); };
            return true;
        }
        return comparison(test);
    }

    bool comparison(Test &test)
    {
        m_reader.skipBlanks();
        const std::string_view name = m_reader.takeWhile(isWord);
        if (!name.starts_with("VI_") ||
            std::find(std::begin(LocalNames), std::end(LocalNames), name) != std::end(LocalNames))
            return false;
        m_reader.skipBlanks();
        const auto *relation = std::find_if(std::begin(Relations), std::end(Relations),
                                            [&](const auto &entry) { return m_reader.take(entry.first); });
        AttributeCondition::Value with;
        if (relation == std::end(Relations) || !value(relation->second, with))
            return false;
        test = [name = std::string(name), relation = relation->second, with](const auto &lookup) {
            const std::optional<AttributeCondition::Value> value = lookup(name);
            return value && value->index() == with.index() && compare(*value, relation, with);
        };
        return true;
    }

    bool value(Relation relation, AttributeCondition::Value &value)
    {
        m_reader.skipBlanks();
        if (!m_reader.take("\""))
            return number(value);
        value = std::string(m_reader.takeWhile([](char c) { return c != '"'; }));
        return m_reader.take("\"") && (relation == Relation::Equal || relation == Relation::NotEqual);
    }

    bool number(AttributeCondition::Value &value)
    {
        const bool negative = m_reader.take("-");
        const int base = m_reader.take("0x") || m_reader.take("0X") ? 16 : 10;
        const std::string_view digits = m_reader.takeWhile(
            [base](unsigned char c) { return base == 16 ? std::isxdigit(c) != 0 : std::isdigit(c) != 0; });
        std::uint64_t magnitude = 0;
        if (std::from_chars(digits.data(), digits.data() + digits.size(), magnitude, base).ec != std::errc())
            return false;
        value = static_cast<std::int64_t>(negative ? ~magnitude + 1 : magnitude);
        return true;
    }

    TextReader &m_reader;
};

std::optional<AttributeCondition> AttributeCondition::parse(TextReader &reader)
{
    Test test;
    if (!ConditionParser(reader).either(0, test))
        return std::nullopt;
    reader.skipBlanks();
    return reader.atEnd() ? std::optional(AttributeCondition(std::move(test))) : std::nullopt;
}

} // namespace kyvisa
