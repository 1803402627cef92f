#include "kyvisa/core/FindExpression.h"

#include <algorithm>
#include <cctype>
#include <span>

namespace kyvisa
{
namespace
{

/// Reads a text from left to right.
class Reader
{
public:
    explicit Reader(std::string_view text) : m_text(text) {}

    bool atEnd() const { return m_text.empty(); }
    char peek() const { return atEnd() ? '\0' : m_text.front(); }
    void skip(std::size_t count = 1) { m_text.remove_prefix(std::min(count, m_text.size())); }
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

private:
    std::string_view m_text;
};

constexpr int MaxNesting = 64;

bool isWord(unsigned char c)
{
    return std::isalnum(c) || c == '_';
}

/// alternatives := sequence { "|" sequence }
class RegexCheck
{
public:
    explicit RegexCheck(std::string_view text) : m_reader(text) {}
    bool run() { return alternatives(0) && m_reader.atEnd(); }

private:
    bool alternatives(int depth)
    {
        do {
            if (!sequence(depth))
                return false;
        } while (m_reader.take("|"));
        return true;
    }

    bool sequence(int depth)
    {
        int elements = 0;
        while (!m_reader.atEnd() && m_reader.peek() != '|' && m_reader.peek() != ')') {
            if (!element(depth))
                return false;
            ++elements;
            if (m_reader.peek() == '*' || m_reader.peek() == '+')
                m_reader.skip();
        }
        return elements > 0;
    }

    bool element(int depth)
    {
        switch (m_reader.peek()) {
        case '*':
        case '+':
        case ']':
        case '}':
            return false;
        case '(':
            m_reader.skip();
            return depth < MaxNesting && alternatives(depth + 1) && m_reader.take(")");
        case '[':
            m_reader.skip();
            return characterList();
        case '\\':
            m_reader.skip();
            break;
        default:
            break;
        }
        if (m_reader.atEnd())
            return false;
        m_reader.skip();
        return true;
    }

    bool characterList()
    {
        m_reader.take("^");
        int members = 0;
        while (!m_reader.take("]")) {
            char from = 0;
            char to = 0;
            if (!member(from))
                return false;
            to = from;
            if (m_reader.take("-") &&
                (!member(to) || static_cast<unsigned char>(to) < static_cast<unsigned char>(from)))
                return false;
            ++members;
        }
        return members > 0;
    }

    bool member(char &character)
    {
        m_reader.take("\\");
        if (m_reader.atEnd())
            return false;
        character = m_reader.peek();
        m_reader.skip();
        return true;
    }

    Reader m_reader;
};

/// or := and { "||" and }   and := factor { "&&" factor }   factor := "(" or ")" | "!" factor | comparison
class ConditionCheck
{
public:
    explicit ConditionCheck(std::string_view text) : m_reader(text) {}

    bool run()
    {
        const bool valid = either(0);
        m_reader.skipBlanks();
        return valid && m_reader.atEnd();
    }

private:
    bool token(std::string_view expected)
    {
        m_reader.skipBlanks();
        return m_reader.take(expected);
    }

    bool either(int depth)
    {
        do {
            if (!both(depth))
                return false;
        } while (token("||"));
        return true;
    }

    bool both(int depth)
    {
        do {
            if (!factor(depth))
                return false;
        } while (token("&&"));
        return true;
    }

    bool factor(int depth)
    {
        if (depth > MaxNesting)
            return false;
        if (token("("))
            return either(depth + 1) && token(")");
        if (token("!"))
            return factor(depth + 1);
        return comparison();
    }

    bool comparison()
    {
        m_reader.skipBlanks();
        const std::string_view name = m_reader.takeWhile(isWord);
        if (!name.starts_with("VI_") || std::find(Local.begin(), Local.end(), name) != Local.end())
            return false;
        const bool equality = token("==") || token("!=");
        if (!equality && !token(">=") && !token("<=") && !token(">") && !token("<"))
            return false;
        m_reader.skipBlanks();
        if (m_reader.peek() != '"')
            return number();
        m_reader.skip();
        m_reader.takeWhile([](char c) { return c != '"'; });
        return equality && m_reader.take("\"");
    }

    bool number()
    {
        m_reader.take("-");
        if (m_reader.take("0x") || m_reader.take("0X"))
            return !m_reader.takeWhile([](unsigned char c) { return std::isxdigit(c) != 0; }).empty();
        return !m_reader.takeWhile([](unsigned char c) { return std::isdigit(c) != 0; }).empty();
    }

    /// Attributes that differ from session to session of one resource.
    static constexpr std::string_view LocalNames[] = {
        "VI_ATTR_TMO_VALUE",        "VI_ATTR_TERMCHAR",         "VI_ATTR_TERMCHAR_EN",      "VI_ATTR_SEND_END_EN",
        "VI_ATTR_SUPPRESS_END_EN",  "VI_ATTR_IO_PROT",          "VI_ATTR_MAX_QUEUE_LENGTH", "VI_ATTR_USER_DATA",
        "VI_ATTR_RM_SESSION",       "VI_ATTR_TRIG_ID",          "VI_ATTR_DMA_ALLOW_EN",     "VI_ATTR_FILE_APPEND_EN",
        "VI_ATTR_RD_BUF_OPER_MODE", "VI_ATTR_WR_BUF_OPER_MODE", "VI_ATTR_ASRL_END_IN",      "VI_ATTR_ASRL_END_OUT",
        "VI_ATTR_TCPIP_NODELAY",    "VI_ATTR_TCPIP_KEEPALIVE",
    };
    static constexpr std::span Local{LocalNames};

    Reader m_reader;
};

} // namespace

bool FindExpression::isValid(std::string_view text)
{
    const std::size_t brace = text.find('{');
    if (brace == text.npos)
        return RegexCheck(text).run();
    if (text.back() != '}')
        return false;
    return RegexCheck(text.substr(0, brace)).run() &&
           ConditionCheck(text.substr(brace + 1, text.size() - brace - 2)).run();
}

} // namespace kyvisa
