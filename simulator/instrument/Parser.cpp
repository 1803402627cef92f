#include "simulator/instrument/Parser.h"

#include "simulator/instrument/Characters.h"
#include "simulator/instrument/InputBuffer.h"
#include "simulator/instrument/ScpiError.h"

#include <algorithm>
#include <charconv>
#include <limits>

namespace simulator
{
namespace
{

constexpr std::size_t MaxMnemonic = 12;
constexpr std::size_t MaxDigits = 255;
constexpr int MaxExponent = 32000;
constexpr std::size_t MaxParameters = 1024;

/// Reads one unit from front to back.
class Reader
{
public:
    explicit Reader(MessageUnit &unit) : m_unit(unit), m_text(unit.text) {}

    ParsedUnit read();

private:
    char peek() const { return m_at < m_text.size() ? m_text[m_at] : '\0'; }
    bool atEnd() const { return m_at >= m_text.size(); }
    void skipWhiteSpace();
    template <typename Predicate>
    std::string_view take(Predicate predicate);

    void readHeader(CommandHeader &header);
    std::string_view readMnemonic();
    Parameter readParameter();
    Parameter readNumber();
    Parameter readNonDecimal();
    Parameter readString();
    Parameter readExpression();
    Parameter readHash();
    Parameter readCharacterData();
    void readSuffix(Parameter &number);

    MessageUnit &m_unit;
    const std::string_view m_text;
    std::size_t m_at = 0;
};

void Reader::skipWhiteSpace()
{
    while (!atEnd() && isWhiteSpace(m_text[m_at]))
        ++m_at;
}

template <typename Predicate>
std::string_view Reader::take(Predicate predicate)
{
    const std::size_t from = m_at;
    while (!atEnd() && predicate(m_text[m_at]))
        ++m_at;
    return m_text.substr(from, m_at - from);
}

bool isMnemonicCharacter(char c)
{
    return isLetter(c) || isDigit(c) || c == '_';
}

std::string upper(std::string_view text)
{
    std::string result{text};
    std::transform(result.begin(), result.end(), result.begin(), toUpper);
    return result;
}

ParsedUnit Reader::read()
{
    ParsedUnit parsed;
    readHeader(parsed.header);
    if (!atEnd() && !isWhiteSpace(peek()))
        throw ScpiError{isMnemonicCharacter(peek()) ? -102 : -101, std::string{m_text.substr(0, m_at + 1)}};
    skipWhiteSpace();
    while (!atEnd()) {
        if (parsed.parameters.size() == MaxParameters)
            throw ScpiError{-108, "too many parameters"};
        parsed.parameters.push_back(readParameter());
        skipWhiteSpace();
        if (atEnd())
            break;
        if (peek() != ',')
            throw ScpiError{-103, std::string{parsed.header.text}};
        ++m_at;
        skipWhiteSpace();
        if (atEnd())
            throw ScpiError{-109, std::string{parsed.header.text}};
    }
    return parsed;
}

void Reader::readHeader(CommandHeader &header)
{
    if (peek() == '*') {
        ++m_at;
        header.common = true;
        header.mnemonics.push_back(readMnemonic());
    } else {
        if (peek() == ':') {
            ++m_at;
            header.absolute = true;
        }
        header.mnemonics.push_back(readMnemonic());
        while (peek() == ':') {
            ++m_at;
            header.mnemonics.push_back(readMnemonic());
        }
    }
    if (peek() == '?') {
        ++m_at;
        header.query = true;
    }
    header.text = m_text.substr(0, m_at);
}

std::string_view Reader::readMnemonic()
{
    const std::string_view mnemonic = take(isMnemonicCharacter);
    if (mnemonic.empty()) {
        const bool printable = peek() > ' ' && peek() <= '~';
        throw ScpiError{printable || atEnd() || isWhiteSpace(peek()) ? -102 : -101,
                        std::string{m_text.substr(0, m_at + 1)}};
    }
    if (!isLetter(mnemonic.front()))
        throw ScpiError{-102, std::string{m_text.substr(0, m_at)}};
    if (mnemonic.size() > MaxMnemonic)
        throw ScpiError{-112, std::string{mnemonic}};
    return mnemonic;
}

Parameter Reader::readParameter()
{
    const char c = peek();
    if (isDigit(c) || c == '+' || c == '-' || c == '.')
        return readNumber();
    if (c == '"' || c == '\'')
        return readString();
    if (c == '#')
        return readHash();
    if (c == '(')
        return readExpression();
    if (isLetter(c))
        return readCharacterData();
    throw ScpiError{c == ',' ? -109 : -101, std::string{c}};
}

Parameter Reader::readNumber()
{
    std::string digits;
    if (peek() == '+' || peek() == '-')
        if (m_text[m_at++] == '-')
            digits += '-';
    const std::string_view whole = take(isDigit);
    std::string_view fraction;
    if (peek() == '.') {
        ++m_at;
        fraction = take(isDigit);
    }
    if (whole.empty() && fraction.empty())
        throw ScpiError{-121, {}};
    if (whole.size() + fraction.size() > MaxDigits)
        throw ScpiError{-124, {}};
    digits.append(whole.empty() ? "0" : whole).append(".").append(fraction.empty() ? "0" : fraction);

    // "1E3", and with white space "1 E 3"; but an E that no number follows begins a suffix.
    const std::size_t mark = m_at;
    skipWhiteSpace();
    int exponent = 0;
    bool hasExponent = false;
    if (toUpper(peek()) == 'E') {
        ++m_at;
        skipWhiteSpace();
        const bool negative = peek() == '-';
        if (negative || peek() == '+')
            ++m_at;
        const std::string_view value = take(isDigit);
        if (!value.empty()) {
            hasExponent = true;
            for (const char c : value)
                exponent = std::min(exponent * 10 + (c - '0'), MaxExponent + 1);
            if (exponent > MaxExponent)
                throw ScpiError{-123, {}};
            if (negative)
                exponent = -exponent;
        }
    }
    if (!hasExponent)
        m_at = mark;
    digits += "e" + std::to_string(exponent);

    Parameter number{Parameter::Kind::Number, {}, 0, {}, nullptr};
    const auto result = std::from_chars(digits.data(), digits.data() + digits.size(), number.number);
    if (result.ec == std::errc::result_out_of_range) {
        const bool tiny = exponent < 0;
        number.number = tiny ? 0.0 : std::numeric_limits<double>::infinity();
        if (digits.front() == '-')
            number.number = -number.number;
    }
    readSuffix(number);
    return number;
}

void Reader::readSuffix(Parameter &number)
{
    const std::size_t behindNumber = m_at;
    skipWhiteSpace();
    const bool apart = m_at > behindNumber;
    const std::string_view suffix = take([](char c) { return isLetter(c) || c == '/' || c == '.'; });
    if (suffix.size() > MaxMnemonic)
        throw ScpiError{-131, std::string{suffix}};
    number.suffix = upper(suffix);
    if (suffix.empty() && apart)
        return; // what stands here is no part of the number
    if (!atEnd() && !isWhiteSpace(peek()) && peek() != ',')
        throw ScpiError{suffix.empty() ? -121 : -131, std::string{peek()}};
}

Parameter Reader::readHash()
{
    for (Block &block : m_unit.blocks) {
        if (block.at != m_at)
            continue;
        if (block.refused)
            throw ScpiError{-321, {}};
        if (!block.complete)
            throw ScpiError{-161, {}};
        ++m_at;
        return {Parameter::Kind::Block, {}, 0, {}, &block};
    }
    return readNonDecimal();
}

Parameter Reader::readNonDecimal()
{
    ++m_at;
    int base = 0;
    switch (toUpper(peek())) {
    case 'H':
        base = 16;
        break;
    case 'Q':
        base = 8;
        break;
    case 'B':
        base = 2;
        break;
    default:
        throw ScpiError{-161, {}};
    }
    ++m_at;
    const std::string_view digits = take(isMnemonicCharacter);
    std::uint64_t value = 0;
    const auto result = std::from_chars(digits.data(), digits.data() + digits.size(), value, base);
    if (result.ec == std::errc::result_out_of_range)
        throw ScpiError{-124, {}};
    if (digits.empty() || result.ptr != digits.data() + digits.size())
        throw ScpiError{-121, std::string{digits}};
    return {Parameter::Kind::Number, {}, static_cast<double>(value), {}, nullptr};
}

Parameter Reader::readString()
{
    const char quote = m_text[m_at++];
    Parameter parameter{Parameter::Kind::String, {}, 0, {}, nullptr};
    while (true) {
        if (atEnd())
            throw ScpiError{-151, {}};
        const char c = m_text[m_at++];
        if (c == quote) {
            if (peek() != quote || atEnd())
                return parameter;
            ++m_at;
        }
        parameter.text += c;
    }
}

Parameter Reader::readExpression()
{
    const std::size_t from = m_at;
    int depth = 0;
    do {
        if (atEnd())
            throw ScpiError{-171, {}};
        const char c = m_text[m_at++];
        depth += c == '(' ? 1 : c == ')' ? -1 : 0;
    } while (depth > 0);
    return {Parameter::Kind::Expression, std::string{m_text.substr(from, m_at - from)}, 0, {}, nullptr};
}

Parameter Reader::readCharacterData()
{
    const std::string_view word = take(isMnemonicCharacter);
    if (word.size() > MaxMnemonic)
        throw ScpiError{-141, std::string{word}};
    if (!atEnd() && !isWhiteSpace(peek()) && peek() != ',')
        throw ScpiError{-141, std::string{word} + peek()};
    return {Parameter::Kind::Character, upper(word), 0, {}, nullptr};
}

} // namespace

ParsedUnit parseUnit(MessageUnit &unit)
{
    return Reader(unit).read();
}

} // namespace simulator
