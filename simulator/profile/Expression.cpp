#include "simulator/profile/Expression.h"

#include "simulator/instrument/Characters.h"

#include <algorithm>
#include <charconv>
#include <cmath>

namespace simulator
{

/// Reads from front to back, each level of precedence a function.
class ExpressionReader
{
public:
    using Operation = Expression::Operation;

    ExpressionReader(std::string_view text, const Expression::Resolve &resolve, std::vector<Expression::Step> &steps)
        : m_text(text), m_resolve(resolve), m_steps(steps)
    {
    }

    void read()
    {
        if (m_text.size() > Expression::MaxText)
            throw ExpressionError("the expression is longer than " + std::to_string(Expression::MaxText));
        sum(0);
        if (peek() != '\0')
            throw ExpressionError("unexpected " + found() + " in the expression");
    }

private:
    char peek()
    {
        while (m_at < m_text.size() && (m_text[m_at] == ' ' || m_text[m_at] == '\t'))
            ++m_at;
        return m_at < m_text.size() ? m_text[m_at] : '\0';
    }
    std::string found() { return peek() == '\0' ? "end" : "\"" + std::string{m_text.substr(m_at, 1)} + "\""; }
    bool take(char c)
    {
        if (peek() != c || m_at >= m_text.size())
            return false;
        ++m_at;
        return true;
    }
    void expect(char c)
    {
        if (!take(c))
            throw ExpressionError(std::string("expected \"") + c + "\", found " + found() + " in the expression");
    }
    void add(Operation operation) { m_steps.push_back({operation, 0, 0}); }

    void sum(std::size_t depth)
    {
        product(depth);
        while (true) {
            if (take('+')) {
                product(depth);
                add(Operation::Add);
            } else if (take('-')) {
                product(depth);
                add(Operation::Subtract);
            } else {
                return;
            }
        }
    }

    void product(std::size_t depth)
    {
        factor(depth);
        while (true) {
            if (take('*')) {
                factor(depth);
                add(Operation::Multiply);
            } else if (take('/')) {
                factor(depth);
                add(Operation::Divide);
            } else {
                return;
            }
        }
    }

    void factor(std::size_t depth)
    {
        if (depth >= Expression::MaxDepth)
            throw ExpressionError("the expression is nested deeper than " + std::to_string(Expression::MaxDepth));
        if (take('-')) {
            factor(depth + 1);
            add(Operation::Negate);
        } else if (take('(')) {
            sum(depth + 1);
            expect(')');
        } else if (isDigit(peek()) || peek() == '.') {
            number();
        } else if (isLetter(peek())) {
            name(depth);
        } else {
            throw ExpressionError("expected a value, found " + found() + " in the expression");
        }
    }

    void number()
    {
        double value = 0;
        const auto result = std::from_chars(m_text.data() + m_at, m_text.data() + m_text.size(), value);
        if (result.ec != std::errc{})
            throw ExpressionError("a number that is none in the expression");
        m_at = static_cast<std::size_t>(result.ptr - m_text.data());
        m_steps.push_back({Operation::Number, value, 0});
    }

    void name(std::size_t depth)
    {
        const std::size_t from = m_at;
        while (m_at < m_text.size() && (isLetter(m_text[m_at]) || isDigit(m_text[m_at]) || m_text[m_at] == '_'))
            ++m_at;
        const std::string_view word = m_text.substr(from, m_at - from);
        if (take('('))
            return call(word, depth);
        m_steps.push_back({Operation::Setting, 0, m_resolve(word)});
    }

    void call(std::string_view function, std::size_t depth)
    {
        if (function == "min" || function == "max") {
            sum(depth + 1);
            while (take(',')) {
                sum(depth + 1);
                add(function == "min" ? Operation::Min : Operation::Max);
            }
        } else if (function == "noise" || function == "abs") {
            sum(depth + 1);
            add(function == "abs" ? Operation::Abs : Operation::Noise);
        } else {
            throw ExpressionError("there is no function \"" + std::string{function} + "\"; they are min max abs noise");
        }
        expect(')');
    }

    const std::string_view m_text;
    const Expression::Resolve &m_resolve;
    std::vector<Expression::Step> &m_steps;
    std::size_t m_at = 0;
};

Expression::Expression(double number) : m_steps{{Operation::Number, number, 0}} {}

Expression::Expression(std::string_view text, const Resolve &resolve)
{
    ExpressionReader(text, resolve, m_steps).read();
}

double Expression::value(const Surroundings &surroundings) const
{
    std::vector<double> stack;
    const auto pop = [&] {
        const double top = stack.back();
        stack.pop_back();
        return top;
    };
    for (const Step &step : m_steps) {
        switch (step.operation) {
        case Operation::Number:
            stack.push_back(step.number);
            continue;
        case Operation::Setting:
            stack.push_back(surroundings.setting(step.setting));
            continue;
        case Operation::Negate:
            stack.back() = -stack.back();
            continue;
        case Operation::Abs:
            stack.back() = std::fabs(stack.back());
            continue;
        case Operation::Noise:
            stack.back() *= surroundings.normal();
            continue;
        default:
            break;
        }
        const double right = pop();
        double &left = stack.back();
        switch (step.operation) {
        case Operation::Add:
            left += right;
            break;
        case Operation::Subtract:
            left -= right;
            break;
        case Operation::Multiply:
            left *= right;
            break;
        case Operation::Divide:
            left /= right;
            break;
        case Operation::Min:
            left = std::min(left, right);
            break;
        case Operation::Max:
            left = std::max(left, right);
            break;
        default:
            break;
        }
    }
    return stack.empty() ? 0 : stack.back();
}

} // namespace simulator
