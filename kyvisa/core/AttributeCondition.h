#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <variant>

namespace kyvisa
{

class TextReader;

/**
 * The attribute condition of viFindRsrc (VPP-4.3): comparisons of global attributes with numbers or texts, joined by `&&`,
 * `||` and `!`. A resource that does not have an attribute fails every comparison with it.
 */
class AttributeCondition
{
public:
    using Value = std::variant<std::int64_t, std::string>;
    /// The value of the attribute with this name.
    using Lookup = std::function<std::optional<Value>(std::string_view name)>;

    /// Reads a condition to the end of the text. Nothing when it is not valid.
    static std::optional<AttributeCondition> parse(TextReader &reader);

    bool holds(const Lookup &lookup) const { return m_holds(lookup); }

private:
    using Test = std::function<bool(const Lookup &)>;

    explicit AttributeCondition(Test test) : m_holds(std::move(test)) {}
    friend class ConditionParser;

    Test m_holds;
};

} // namespace kyvisa
