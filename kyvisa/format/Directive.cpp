#include "kyvisa/format/Directive.h"

#include "kyvisa/include/visa.h"

#include <cstring>
#include <limits>

namespace kyvisa::format
{
namespace
{

constexpr std::size_t MostAmount = std::numeric_limits<int>::max();

enum class Direction { Output, Input };

bool isDigit(char c)
{
    return c >= '0' && c <= '9';
}

bool isOctal(char c)
{
    return c >= '0' && c <= '7';
}

bool oneOf(char c, const char *characters)
{
    return c != '\0' && std::strchr(characters, c) != nullptr;
}

bool isBlank(char c)
{
    return oneOf(c, " \t\n\r\v\f");
}

/// Reads one format text. Each step answers false, with the status set, when the text is not to be understood.
class FormatParser
{
public:
    FormatParser(const char *format, Direction direction, Directives &directives)
        : m_next(format), m_direction(direction), m_directives(directives)
    {
    }

    ViStatus parse()
    {
        while (*m_next != '\0' && m_status == VI_SUCCESS) {
            if (*m_next == '%' && m_next[1] == '%') {
                addText('%');
                m_next += 2;
            } else if (*m_next == '%') {
                ++m_next;
                parseConversion();
            } else {
                addCharacter(takeCharacter());
            }
        }
        return m_status;
    }

private:
    char takeCharacter()
    {
        const char c = *m_next++;
        if (c != '\\')
            return c;
        if (isOctal(*m_next)) {
            unsigned value = 0;
            for (int digit = 0; digit < 3 && isOctal(*m_next); ++digit)
                value = value * 8 + static_cast<unsigned>(*m_next++ - '0');
            return static_cast<char>(value);
        }
        constexpr char Letters[] = "nrt\\\"";
        constexpr char Meanings[] = "\n\r\t\\\"";
        if (!oneOf(*m_next, Letters))
            return c;
        return Meanings[std::strchr(Letters, *m_next++) - Letters];
    }

    void addCharacter(char c)
    {
        if (m_direction == Direction::Output && c == '\n')
            m_directives.emplace_back().kind = Directive::Kind::LineEnd;
        else if (m_direction == Direction::Input && isBlank(c))
            m_directives.emplace_back().kind = Directive::Kind::Blank;
        else
            addText(c);
    }

    void addText(char c)
    {
        if (m_directives.empty() || m_directives.back().kind != Directive::Kind::Text)
            m_directives.emplace_back();
        m_directives.back().text += c;
    }

    bool refuse(ViStatus status = VI_ERROR_INV_FMT)
    {
        m_status = status;
        return false;
    }

    void parseConversion()
    {
        Directive directive;
        directive.kind = Directive::Kind::Conversion;
        while (parseModifier(directive)) {
        }
        if (m_status != VI_SUCCESS)
            return;
        if (*m_next == '\0') {
            refuse();
            return;
        }
        directive.code = *m_next++;
        if (directive.code == '[' && !parseSet(directive))
            return;
        if (isAllowed(directive))
            m_directives.push_back(std::move(directive));
        else if (m_status == VI_SUCCESS)
            refuse();
    }

    /// Takes one modifier. False when the conversion's letter has come, or the text is wrong.
    bool parseModifier(Directive &directive)
    {
        const char c = *m_next;
        switch (c) {
        case '-':
            return takeFlag(directive.left);
        case '+':
            return takeFlag(directive.plus);
        case ' ':
            return takeFlag(directive.space);
        case '*':
            if (m_direction == Direction::Input)
                return takeFlag(directive.discard);
            return parseAmount(directive.width);
        case '#':
            return m_direction == Direction::Input ? parseAmount(directive.width) : refuse();
        case '0':
            if (m_direction == Direction::Output && !directive.width.given())
                return takeFlag(directive.zero);
            return parseAmount(directive.width);
        case '.':
            ++m_next;
            if (m_direction == Direction::Input)
                return refuse();
            if (!isDigit(*m_next) && *m_next != '*') { // as in C: a lone point is a precision of 0
                directive.precision = {Amount::From::Format, 0};
                return true;
            }
            return parseAmount(directive.precision);
        case ',':
            ++m_next;
            return parseAmount(directive.arraySize);
        case '@':
            ++m_next;
            if (directive.notation != 0 || !oneOf(*m_next, m_direction == Direction::Output ? "123HQB" : "12HQB"))
                return refuse();
            directive.notation = *m_next++;
            return true;
        case '!':
            if (m_next[1] != 'o' || !oneOf(m_next[2], "bl"))
                return refuse();
            directive.littleEndian = m_next[2] == 'l';
            m_byteOrderGiven = true;
            m_next += 3;
            return true;
        default:
            return isDigit(c) ? parseAmount(directive.width) : parseLength(directive);
        }
    }

    bool takeFlag(bool &flag)
    {
        flag = true;
        ++m_next;
        return true;
    }

    bool parseAmount(Amount &amount)
    {
        if (amount.given())
            return refuse();
        if (*m_next == (m_direction == Direction::Output ? '*' : '#')) {
            ++m_next;
            amount.from = Amount::From::Argument;
            return true;
        }
        if (!isDigit(*m_next))
            return refuse();
        amount.from = Amount::From::Format;
        for (; isDigit(*m_next); ++m_next) {
            amount.value = amount.value * 10 + static_cast<std::size_t>(*m_next - '0');
            if (amount.value > MostAmount)
                return refuse();
        }
        return true;
    }

    bool parseLength(Directive &directive)
    {
        const char c = *m_next;
        if (!oneOf(c, "hlLzZ"))
            return false;
        ++m_next;
        if (c == 'l' && directive.length == Length::Long) {
            directive.length = Length::LongLong;
            return true;
        }
        if (directive.length != Length::None)
            return refuse();
        directive.length = c == 'h'   ? Length::Short
                           : c == 'l' ? Length::Long
                           : c == 'L' ? Length::LongDouble
                           : c == 'z' ? Length::Float
                                      : Length::Double;
        return true;
    }

    bool parseSet(Directive &directive)
    {
        const bool excluded = *m_next == '^';
        if (excluded)
            ++m_next;
        // As in C, a bracket that comes first is a member.
        for (bool first = true; first || *m_next != ']'; first = false) {
            if (*m_next == '\0')
                return refuse();
            const auto low = static_cast<unsigned char>(takeCharacter());
            unsigned char high = low;
            if (*m_next == '-' && m_next[1] != ']' && m_next[1] != '\0') {
                ++m_next;
                high = static_cast<unsigned char>(takeCharacter());
            }
            for (unsigned member = low; member <= high; ++member)
                directive.set.set(member);
        }
        ++m_next;
        if (excluded)
            directive.set.flip();
        return true;
    }

    bool isAllowed(const Directive &directive)
    {
        if (m_byteOrderGiven && directive.code != 'y')
            return false;
        m_byteOrderGiven = false;
        if ((directive.notation != 0 || directive.arraySize.given()) && !directive.isInteger() && !directive.isFloat())
            return false;
        if (!lengthFits(directive))
            return false;
        return m_direction == Direction::Output ? isOutput(directive) : isInput(directive);
    }

    static bool lengthFits(const Directive &directive)
    {
        switch (directive.length) {
        case Length::None:
            return true;
        case Length::Short:
        case Length::LongLong:
            return directive.isInteger() || directive.isBlock() || directive.code == 'n';
        case Length::Long:
            return directive.isInteger() || directive.isFloat() || directive.isBlock() || directive.code == 'n';
        case Length::LongDouble:
            return directive.isFloat();
        case Length::Float:
        case Length::Double:
            return directive.isBlock();
        }
        return false;
    }

    bool isOutput(const Directive &directive)
    {
        if (directive.isBlock())
            return directive.width.given() && !directive.precision.given() && !directive.left && !directive.plus &&
                   !directive.space;
        // %t and %T read; they have no counterpart here.
        if (oneOf(directive.code, "tT"))
            return refuse(VI_ERROR_NSUP_FMT);
        return directive.isInteger() || directive.isFloat() || oneOf(directive.code, "cspn");
    }

    bool isInput(const Directive &directive)
    {
        if (directive.left || directive.plus || directive.space)
            return false;
        if (directive.code == 'B')
            return refuse(VI_ERROR_NSUP_FMT);
        if (directive.isBlock())
            return directive.width.given() || directive.discard;
        return directive.isInteger() || directive.isFloat() || oneOf(directive.code, "cs[tTpn");
    }

    const char *m_next;
    const Direction m_direction;
    Directives &m_directives;
    ViStatus m_status = VI_SUCCESS;
    bool m_byteOrderGiven = false;
};

ViStatus parseFormat(const char *format, Direction direction, Directives &directives)
{
    directives.clear();
    return format ? FormatParser(format, direction, directives).parse() : VI_ERROR_INV_FMT;
}

} // namespace

bool Directive::isInteger() const
{
    return oneOf(code, "diouxX");
}

bool Directive::isFloat() const
{
    return oneOf(code, "feEgG");
}

std::size_t Directive::elementSize() const
{
    switch (length) {
    case Length::Short:
        return 2;
    case Length::Long: // 32 bits in blocks, whatever a C long is
    case Length::Float:
        return 4;
    case Length::LongLong:
    case Length::Double:
        return 8;
    default:
        return 1;
    }
}

ViStatus parseOutputFormat(const char *format, Directives &directives)
{
    return parseFormat(format, Direction::Output, directives);
}

ViStatus parseInputFormat(const char *format, Directives &directives)
{
    return parseFormat(format, Direction::Input, directives);
}

} // namespace kyvisa::format
