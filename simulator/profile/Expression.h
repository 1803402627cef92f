#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

/// What is wrong with an expression.
class ExpressionError : public std::runtime_error
{
public:
    using std::runtime_error::runtime_error;
};

/**
 * A small formula of a profile: numbers, names of settings, + - * /, parentheses, min(a, b, ...), max(a, b, ...), abs(a) and noise(sigma), which is a
 * normally distributed number around 0.
 *
 *     min(voltage, limit * load) * output + noise(0.001)
 *
 * It is checked when it is read and cannot fail later: what has no value, such as 0/0, is a NaN.
 */
class Expression
{
public:
    static constexpr std::size_t MaxText = 1000;
    static constexpr std::size_t MaxDepth = 32;

    /// The index by which value() asks for a name. Throws ExpressionError when there is no such setting.
    using Resolve = std::function<std::size_t(std::string_view name)>;

    struct Surroundings {
        std::function<double(std::size_t)> setting;
        std::function<double()> normal; ///< around 0, deviation 1
    };

    Expression() = default; ///< 0
    explicit Expression(double number);
    /// Throws ExpressionError.
    Expression(std::string_view text, const Resolve &resolve);

    double value(const Surroundings &surroundings) const;

private:
    friend class ExpressionReader;

    enum class Operation : std::uint8_t {
        Number,
        Setting,
        Negate,
        Add,
        Subtract,
        Multiply,
        Divide,
        Min,
        Max,
        Abs,
        Noise
    };

    struct Step {
        Operation operation;
        double number = 0;
        std::size_t setting = 0;
    };

    std::vector<Step> m_steps; ///< operands before their operation
};

} // namespace simulator
