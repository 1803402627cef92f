#pragma once

#include <algorithm>
#include <cstddef>
#include <string_view>

namespace kyvisa
{

/// Reads a text from left to right.
class TextReader
{
public:
    explicit TextReader(std::string_view text) : m_text(text) {}

    bool atEnd() const { return m_text.empty(); }
    char peek() const { return atEnd() ? '\0' : m_text.front(); }
    void skip(std::size_t count = 1) { m_text.remove_prefix(std::min(count, m_text.size())); }
    char next()
    {
        const char c = peek();
        skip();
        return c;
    }
    bool take(std::string_view expected)
    {
        if (!m_text.starts_with(expected))
            return false;
        skip(expected.size());
        return true;
    }
    void skipBlanks()
    {
        while (peek() == ' ' || peek() == '\t')
            skip();
    }
    template <typename Predicate>
    std::string_view takeWhile(Predicate wanted)
    {
        const auto end = std::find_if_not(m_text.begin(), m_text.end(), wanted);
        const std::string_view taken = m_text.substr(0, static_cast<std::size_t>(end - m_text.begin()));
        skip(taken.size());
        return taken;
    }
    std::string_view rest() const { return m_text; }

private:
    std::string_view m_text;
};

} // namespace kyvisa
