#include "kyvisa/format/Scanner.h"

#include "kyvisa/include/visa.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstring>
#include <limits>

namespace kyvisa::format
{
namespace
{

constexpr std::size_t NoLimit = std::numeric_limits<std::size_t>::max();
constexpr std::size_t LongestNumber = 400; // what is longer is no number that a device sends

bool isBlank(int c)
{
    return c == ' ' || (c >= '\t' && c <= '\r');
}

bool isDecimal(int c)
{
    return c >= '0' && c <= '9';
}

bool isDigitOf(int base, int c)
{
    if (base <= 10)
        return c >= '0' && c < '0' + base;
    return isDecimal(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

int baseOf(char code)
{
    switch (code) {
    case 'x':
    case 'X':
    case 'p':
        return 16;
    case 'o':
        return 8;
    default:
        return 10;
    }
}

} // namespace

void Scanner::Size::store(std::size_t count) const
{
    if (!countTo)
        return;
    if (isLong)
        *static_cast<long *>(countTo) = static_cast<long>(count);
    else
        *static_cast<int *>(countTo) = static_cast<int>(count);
}

ViStatus Scanner::scan(const Directives &directives)
{
    for (const Directive &directive : directives) {
        switch (carryOut(directive)) {
        case Step::Matched:
            break;
        case Step::Wrong:
            return VI_ERROR_INV_FMT;
        case Step::Ended:
            return m_source.status();
        }
        if (m_source.status() < VI_SUCCESS)
            return m_source.status();
    }
    return VI_SUCCESS;
}

Scanner::Step Scanner::carryOut(const Directive &directive)
{
    switch (directive.kind) {
    case Directive::Kind::Text:
        return matchText(directive.text);
    case Directive::Kind::Blank:
        skipBlanks();
        return Step::Matched;
    case Directive::Kind::LineEnd: // of output
        return Step::Matched;
    case Directive::Kind::Conversion:
        break;
    }
    if (directive.isInteger() || directive.isFloat() || directive.code == 'p')
        return scanNumbers(directive);
    switch (directive.code) {
    case 'c':
        return scanCharacters(directive);
    case 'b':
    case 'y':
        return scanBlock(directive);
    case 'n':
        storeCount(directive);
        return Step::Matched;
    default:
        return scanText(directive);
    }
}

Scanner::Step Scanner::matchText(std::string_view text)
{
    for (const char c : text) {
        if (m_source.peek() != static_cast<unsigned char>(c))
            return Step::Ended;
        next();
    }
    return Step::Matched;
}

bool Scanner::takeSize(const Amount &amount, bool isLong, Size &size)
{
    size.given = amount.given();
    size.value = amount.value;
    size.isLong = isLong;
    if (amount.from != Amount::From::Argument)
        return true;
    size.countTo = m_arguments.next<void *>();
    if (!size.countTo)
        return false;
    const long value = isLong ? *static_cast<long *>(size.countTo) : *static_cast<int *>(size.countTo);
    size.value = static_cast<std::size_t>(std::max(value, 0L));
    return value >= 0;
}

Scanner::Step Scanner::scanNumbers(const Directive &directive)
{
    Size width;
    Size array;
    if (!takeSize(directive.width, false, width) || !takeSize(directive.arraySize, false, array))
        return Step::Wrong;
    void *const to = directive.discard ? nullptr : m_arguments.next<void *>();
    if (!to && !directive.discard)
        return Step::Wrong;
    const std::size_t wanted = array.given ? array.value : 1;
    const std::size_t limit = width.given && width.value > 0 ? width.value : NoLimit;
    std::size_t count = 0;
    while (count < wanted) {
        skipBlanks();
        Number number;
        if (!readNumber(directive, limit, number))
            break;
        if (to)
            store(directive, number, to, count);
        ++count;
        if (count < wanted && m_source.peek() != ',')
            break;
        if (count < wanted)
            next();
    }
    if (array.given)
        array.store(count);
    return count > 0 || wanted == 0 ? Step::Matched : Step::Ended;
}

/// A number in any form that IEEE 488.2 lets a device choose, or in the base of the conversion as in C.
bool Scanner::readNumber(const Directive &directive, std::size_t limit, Number &number)
{
    if (m_source.peek() == '#')
        return readPrefixed(limit, number);
    const int base = baseOf(directive.code);
    if (directive.isFloat() || (base == 10 && directive.code != 'i'))
        return readDecimal(limit, number);
    bool negative = false;
    if (m_source.peek() == '-' || m_source.peek() == '+') {
        negative = next() == '-';
        --limit;
    }
    int radix = base;
    const int second = m_source.peek() == '0' && limit > 2 && base != 8 ? m_source.peek(1) : InputSource::Nothing;
    if ((second == 'x' || second == 'X') && isDigitOf(16, m_source.peek(2))) {
        next();
        next();
        limit -= 2;
        radix = 16;
    } else if (directive.code == 'i' && isDigitOf(8, second)) {
        radix = 8;
    }
    if (radix == 10 ? !readDecimal(limit, number) : !readDigits(radix, limit, number))
        return false;
    number.negative = negative;
    number.real = negative ? -number.real : number.real;
    return true;
}

bool Scanner::readPrefixed(std::size_t limit, Number &number)
{
    const int letter = m_source.peek(1);
    const int base = letter == 'H' || letter == 'h'   ? 16
                     : letter == 'Q' || letter == 'q' ? 8
                     : letter == 'B' || letter == 'b' ? 2
                                                      : 0;
    if (base == 0 || limit < 3 || !isDigitOf(base, m_source.peek(2)))
        return false;
    next();
    next();
    return readDigits(base, limit - 2, number);
}

bool Scanner::readDigits(int base, std::size_t limit, Number &number)
{
    std::string digits;
    while (digits.size() < std::min(limit, LongestNumber) && isDigitOf(base, m_source.peek()))
        digits += static_cast<char>(next());
    return parseDigits(digits, base, number);
}

bool Scanner::readDecimal(std::size_t limit, Number &number)
{
    limit = std::min(limit, LongestNumber);
    std::string text;
    const auto takeDigits = [&] {
        bool any = false;
        for (; text.size() < limit && isDecimal(m_source.peek()); any = true)
            text += static_cast<char>(next());
        return any;
    };
    const int sign = m_source.peek();
    if ((sign == '-' || sign == '+') && limit > 1)
        text += static_cast<char>(next());
    bool any = takeDigits();
    if (text.size() < limit && m_source.peek() == '.' && (any || isDecimal(m_source.peek(1)))) {
        text += static_cast<char>(next());
        any = takeDigits() || any;
    }
    if (!any)
        return false;
    const int letter = text.size() + 1 < limit ? m_source.peek() : InputSource::Nothing;
    if (letter == 'e' || letter == 'E') {
        const int after = m_source.peek(1);
        const bool isSigned = after == '+' || after == '-';
        if (isDecimal(isSigned ? m_source.peek(2) : after) && text.size() + (isSigned ? 2 : 1) < limit) {
            text += static_cast<char>(next());
            if (isSigned)
                text += static_cast<char>(next());
            takeDigits();
        }
    }
    return parseDecimal(text, number);
}

void Scanner::store(const Directive &directive, const Number &number, void *array, std::size_t index)
{
    const auto put = [&]<typename Type>(Type value) {
        std::memcpy(static_cast<char *>(array) + index * sizeof value, &value, sizeof value);
    };
    if (directive.code == 'p')
        return put(reinterpret_cast<void *>(static_cast<std::uintptr_t>(number.magnitude)));
    if (directive.isFloat()) {
        switch (directive.length) {
        case Length::LongDouble:
            return put(number.real);
        case Length::Long:
            return put(static_cast<double>(number.real));
        default:
            return put(static_cast<float>(number.real));
        }
    }
    const auto putInteger = [&]<typename Signed>(Signed) {
        using Limits = std::numeric_limits<Signed>;
        using Unsigned = std::make_unsigned_t<Signed>;
        if (directive.code == 'd' || directive.code == 'i')
            put(static_cast<Signed>(number.rounded(Limits::min(), Limits::max())));
        else
            put(static_cast<Unsigned>(number.roundedUnsigned(std::numeric_limits<Unsigned>::max())));
    };
    switch (directive.length) {
    case Length::Short:
        return putInteger(short{});
    case Length::Long:
        return putInteger(long{});
    case Length::LongLong:
        return putInteger(static_cast<long long>(0));
    default:
        return putInteger(int{});
    }
}

Scanner::Step Scanner::scanCharacters(const Directive &directive)
{
    Size width;
    if (!takeSize(directive.width, false, width))
        return Step::Wrong;
    auto *const to = directive.discard ? nullptr : m_arguments.next<char *>();
    if (!to && !directive.discard)
        return Step::Wrong;
    const std::size_t wanted = width.given ? width.value : 1;
    for (std::size_t count = 0; count < wanted; ++count) {
        if (m_source.peek() == InputSource::Nothing)
            return count > 0 ? Step::Matched : Step::Ended;
        const int c = next();
        if (to)
            to[count] = static_cast<char>(c);
    }
    return Step::Matched;
}

/// %s, %[, %t and %T: they differ in what ends them.
Scanner::Step Scanner::scanText(const Directive &directive)
{
    Size width;
    if (!takeSize(directive.width, false, width))
        return Step::Wrong;
    auto *const to = directive.discard ? nullptr : m_arguments.next<char *>();
    if (!to && !directive.discard)
        return Step::Wrong;
    // The width of %s, %t and %T is the buffer's size and includes the NUL. That of %[ is C's: the most characters to take.
    // A size that comes from a variable is a buffer's in either case.
    const bool asInC = directive.code == '[' && directive.width.from == Amount::From::Format;
    const std::size_t most = asInC ? width.value : NoLimit;
    const std::size_t room = !width.given || asInC ? NoLimit : width.value > 0 ? width.value - 1 : 0;
    if (directive.code == 's')
        skipBlanks();
    std::size_t stored = 0;
    std::size_t taken = 0;
    for (; taken < most; ++taken) {
        const int c = m_source.peek();
        if (c == InputSource::Nothing || (directive.code == 's' && isBlank(c)) ||
            (directive.code == '[' && !directive.set.test(static_cast<unsigned char>(c))))
            break;
        next();
        if (to && stored < room)
            to[stored++] = static_cast<char>(c);
        if (directive.code == 'T' && c == '\n') {
            ++taken;
            break;
        }
    }
    const bool matched = taken > 0 || directive.code == 't';
    if (to && matched && (!width.given || width.value > 0))
        to[stored] = '\0';
    if (to && matched)
        width.store(stored);
    return matched ? Step::Matched : Step::Ended;
}

Scanner::Step Scanner::scanBlock(const Directive &directive)
{
    Size size;
    if (!takeSize(directive.width, true, size))
        return Step::Wrong;
    if (directive.code == 'y')
        return takeElements(directive, size, NoLimit, false);
    skipBlanks();
    if (m_source.peek() != '#' || !isDecimal(m_source.peek(1)))
        return Step::Ended;
    next();
    const int lengthDigits = next() - '0';
    if (lengthDigits == 0)
        return takeElements(directive, size, NoLimit, true);
    std::size_t length = 0;
    for (int digit = 0; digit < lengthDigits; ++digit) {
        if (!isDecimal(m_source.peek()))
            return Step::Ended;
        length = length * 10 + static_cast<std::size_t>(next() - '0');
    }
    return takeElements(directive, size, length, true);
}

/**
 * @param length of the data in bytes; NoLimit when it lasts to the end of the message.
 * @param isBlock what was not asked for does not belong to what follows it, and the line feed at the end of an indefinite
 * block is no data.
 */
Scanner::Step Scanner::takeElements(const Directive &directive, const Size &size, std::size_t length, bool isBlock)
{
    auto *const to = directive.discard ? nullptr : m_arguments.next<std::byte *>();
    if (!to && !directive.discard)
        return Step::Wrong;
    const std::size_t elementSize = directive.elementSize();
    const std::size_t wanted = std::min(size.given ? size.value : NoLimit, NoLimit / elementSize) * elementSize;
    const std::size_t bytes = std::min(wanted, length / elementSize * elementSize);
    std::size_t got = to ? m_source.take({to, bytes}) : dropUpTo(bytes);
    m_taken += got;
    if (isBlock && length == NoLimit) {
        if (to && got > 0 && to[got - 1] == std::byte{'\n'} && m_source.peek() == InputSource::Nothing)
            --got;
        dropUpTo(NoLimit);
    } else if (isBlock && got == bytes) {
        dropUpTo(length - got);
    }
    const std::size_t stored = got / elementSize;
    const bool littleEndianHost = std::endian::native == std::endian::little;
    if (to && elementSize > 1 && littleEndianHost != directive.littleEndian)
        for (std::size_t at = 0; at < stored * elementSize; at += elementSize)
            std::reverse(to + at, to + at + elementSize);
    size.store(stored);
    return got > 0 || bytes == 0 ? Step::Matched : Step::Ended;
}

std::size_t Scanner::dropUpTo(std::size_t count)
{
    std::array<std::byte, 4096> dropped;
    std::size_t done = 0;
    while (done < count) {
        const std::size_t part = m_source.take(std::span(dropped).first(std::min(dropped.size(), count - done)));
        if (part == 0)
            break;
        done += part;
    }
    return done;
}

void Scanner::storeCount(const Directive &directive)
{
    if (directive.discard)
        return;
    void *const to = m_arguments.next<void *>();
    if (!to)
        return;
    const auto put = [&]<typename Type>(Type) {
        const auto count = static_cast<Type>(m_taken);
        std::memcpy(to, &count, sizeof count);
    };
    switch (directive.length) {
    case Length::Short:
        return put(short{});
    case Length::Long:
        return put(long{});
    case Length::LongLong:
        return put(static_cast<long long>(0));
    default:
        return put(int{});
    }
}

void Scanner::skipBlanks()
{
    while (isBlank(m_source.peek()))
        next();
}

/// Takes the byte that peek() has shown.
int Scanner::next()
{
    const int c = m_source.peek();
    m_source.skip();
    ++m_taken;
    return c;
}

} // namespace kyvisa::format
