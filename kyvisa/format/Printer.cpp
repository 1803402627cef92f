#include "kyvisa/format/Printer.h"

#include "kyvisa/format/NumberText.h"
#include "kyvisa/include/visa.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstring>
#include <limits>

namespace kyvisa::format
{
namespace
{

constexpr std::size_t DefaultPrecision = 6;
constexpr std::size_t MostBlock = 999'999'999; // nine digits of length, IEEE 488.2 section 8.7.9

/// One value on its way to text, from an integer or a floating point argument.
struct Value {
    bool isReal = false;
    bool negative = false;
    std::uint64_t magnitude = 0;
    std::uint64_t pattern = 0; ///< of the argument's own width
    long double real = 0;
};

Value ofInteger(std::int64_t value, unsigned bits, bool isSigned)
{
    Value result;
    result.pattern = bits == 64 ? static_cast<std::uint64_t>(value)
                                : static_cast<std::uint64_t>(value) & ((std::uint64_t{1} << bits) - 1);
    result.negative = isSigned && value < 0;
    result.magnitude = result.negative ? ~static_cast<std::uint64_t>(value) + 1 : result.pattern;
    result.real =
        result.negative ? -static_cast<long double>(result.magnitude) : static_cast<long double>(result.magnitude);
    return result;
}

Value ofReal(long double value)
{
    Value result;
    result.isReal = true;
    result.negative = std::signbit(value);
    result.real = value;
    // Towards zero, within what an integer can hold.
    constexpr long double Limit = 9223372036854775807.0L;
    const auto whole = std::isnan(value) ? 0 : static_cast<std::int64_t>(std::clamp(value, -Limit, Limit));
    result.pattern = static_cast<std::uint64_t>(whole);
    result.magnitude = whole < 0 ? ~static_cast<std::uint64_t>(whole) + 1 : static_cast<std::uint64_t>(whole);
    return result;
}

int baseOf(char notationOrCode)
{
    switch (notationOrCode) {
    case 'H':
    case 'x':
    case 'X':
        return 16;
    case 'Q':
    case 'o':
        return 8;
    case 'B':
        return 2;
    default:
        return 10;
    }
}

/// The letter of C's printf that writes what directive and notation ask for; 0 for an integer.
char realForm(const Directive &directive)
{
    switch (directive.notation) {
    case '1':
        return 0;
    case '2':
        return 'f';
    case '3':
        return directive.code == 'e' ? 'e' : 'E';
    default:
        return directive.isFloat() ? directive.code : '\0';
    }
}

unsigned bitsOf(Length length)
{
    switch (length) {
    case Length::Short:
        return 16;
    case Length::Long:
        return sizeof(long) * 8;
    case Length::LongLong:
        return 64;
    default:
        return sizeof(int) * 8;
    }
}

} // namespace

ViStatus Printer::print(const Directives &directives)
{
    for (const Directive &directive : directives) {
        ViStatus status = VI_SUCCESS;
        switch (directive.kind) {
        case Directive::Kind::Text:
            status = append(directive.text);
            break;
        case Directive::Kind::LineEnd:
            status = m_sink.endLine();
            ++m_written;
            break;
        case Directive::Kind::Blank: // of input
            break;
        case Directive::Kind::Conversion:
            status = convert(directive);
            break;
        }
        if (status < VI_SUCCESS)
            return status;
    }
    return VI_SUCCESS;
}

ViStatus Printer::convert(const Directive &directive)
{
    if (directive.isBlock())
        return printBlock(directive);
    Sizes sizes;
    if (!takeSizes(directive, sizes))
        return VI_ERROR_INV_FMT;
    if (directive.isInteger() || directive.isFloat())
        return directive.arraySize.given() ? printArray(directive, sizes) : printNumber(directive, sizes);
    switch (directive.code) {
    case 'c': {
        const auto character = static_cast<char>(m_arguments.next<int>());
        return appendPadded({&character, 1}, sizes);
    }
    case 's':
        return printString(sizes);
    case 'p': {
        const auto address = reinterpret_cast<std::uintptr_t>(m_arguments.next<void *>());
        return appendPadded("0x" + integerDigits(address, 16, false, 1), sizes);
    }
    default:
        storeCount(directive);
        return VI_SUCCESS;
    }
}

bool Printer::takeSizes(const Directive &directive, Sizes &sizes)
{
    sizes.left = directive.left;
    sizes.width = directive.width.value;
    if (directive.width.from == Amount::From::Argument) {
        // As in C, a negative width asks for the left.
        const int width = m_arguments.next<int>();
        sizes.left = sizes.left || width < 0;
        sizes.width = static_cast<std::size_t>(std::abs(static_cast<long long>(width)));
    }
    sizes.precisionGiven = directive.precision.given();
    sizes.precision = directive.precision.value;
    if (directive.precision.from == Amount::From::Argument) {
        const int precision = m_arguments.next<int>();
        sizes.precisionGiven = precision >= 0;
        sizes.precision = static_cast<std::size_t>(std::max(precision, 0));
    }
    if (!directive.arraySize.given())
        return true;
    sizes.count = directive.arraySize.value;
    if (directive.arraySize.from == Amount::From::Argument) {
        const int count = m_arguments.next<int>();
        sizes.count = static_cast<std::size_t>(std::max(count, 0));
        return count >= 0;
    }
    return true;
}

namespace
{

/// Sign, prefix, zeros and digits of one number, without the blanks around it.
std::string numberText(const Directive &directive, const Value &value, const Printer::Sizes &sizes)
{
    const std::size_t width = sizes.width;
    const std::size_t precision = sizes.precision;
    const bool precisionGiven = sizes.precisionGiven;
    const bool prefixed = baseOf(directive.notation) != 10;
    const char real = prefixed ? '\0' : realForm(directive);
    std::string prefix;
    std::string digits;
    if (prefixed) {
        prefix = {'#', directive.notation};
        digits = integerDigits(value.pattern, baseOf(directive.notation), true, precisionGiven ? precision : 1);
    } else if (real != 0) {
        digits = floatDigits(value.real, real, precisionGiven ? precision : DefaultPrecision);
    } else {
        const int base = directive.notation == 0 ? baseOf(directive.code) : 10;
        const bool asPattern = base != 10 || directive.code == 'u';
        digits = integerDigits(asPattern ? value.pattern : value.magnitude, base, directive.code == 'X',
                               precisionGiven && !value.isReal ? precision : 1);
        // As in C: no digits for a zero that asks for none.
        if (precisionGiven && precision == 0 && digits == "0" && !value.isReal)
            digits.clear();
        if (asPattern)
            return sizes.left || !directive.zero || precisionGiven || digits.size() >= width
                       ? digits
                       : std::string(width - digits.size(), '0') + digits;
    }
    if (!prefixed && value.negative)
        prefix = "-";
    else if (!prefixed && directive.plus)
        prefix = "+";
    else if (!prefixed && directive.space)
        prefix = " ";
    const bool zeros = directive.zero && !sizes.left && (real != 0 || !precisionGiven) && std::isfinite(value.real);
    const std::size_t length = prefix.size() + digits.size();
    if (zeros && length < width)
        prefix.append(width - length, '0');
    return prefix + digits;
}

} // namespace

ViStatus Printer::printNumber(const Directive &directive, const Sizes &sizes)
{
    Value value;
    if (directive.isFloat()) {
        value = ofReal(directive.length == Length::LongDouble ? m_arguments.next<long double>()
                                                              : static_cast<long double>(m_arguments.next<double>()));
    } else {
        const bool isSigned = directive.code == 'd' || directive.code == 'i';
        std::int64_t number = 0;
        switch (directive.length) {
        case Length::Long:
            number = m_arguments.next<long>();
            break;
        case Length::LongLong:
            number = m_arguments.next<long long>();
            break;
        case Length::Short:
            number = static_cast<short>(m_arguments.next<int>());
            break;
        default:
            number = m_arguments.next<int>();
        }
        value = ofInteger(number, bitsOf(directive.length), isSigned);
    }
    return appendPadded(numberText(directive, value, sizes), sizes);
}

namespace
{

/// Element @p index of the array at @p array, whose type the directive tells.
Value elementOf(const Directive &directive, const void *array, std::size_t index)
{
    const auto at = [&]<typename Type>(Type) {
        Type element;
        std::memcpy(&element, static_cast<const char *>(array) + index * sizeof element, sizeof element);
        return element;
    };
    if (directive.isFloat()) {
        switch (directive.length) {
        case Length::LongDouble:
            return ofReal(at(0.0L));
        case Length::Long:
            return ofReal(at(0.0));
        default:
            return ofReal(at(0.0F));
        }
    }
    const bool isSigned = directive.code == 'd' || directive.code == 'i';
    const unsigned bits = bitsOf(directive.length);
    switch (bits) {
    case 16:
        return ofInteger(at(short{}), bits, isSigned);
    case 64:
        return ofInteger(at(static_cast<long long>(0)), bits, isSigned);
    default:
        return ofInteger(at(0), bits, isSigned);
    }
}

} // namespace

ViStatus Printer::printArray(const Directive &directive, const Sizes &sizes)
{
    const void *const array = m_arguments.next<const void *>();
    if (!array && sizes.count > 0)
        return VI_ERROR_INV_FMT;
    for (std::size_t index = 0; index < sizes.count; ++index) {
        if (index > 0)
            if (const ViStatus status = append(","); status < VI_SUCCESS)
                return status;
        const std::string text = numberText(directive, elementOf(directive, array, index), sizes);
        if (const ViStatus status = appendPadded(text, sizes); status < VI_SUCCESS)
            return status;
    }
    return VI_SUCCESS;
}

ViStatus Printer::printString(const Sizes &sizes)
{
    const char *const text = m_arguments.next<const char *>();
    if (!text)
        return VI_ERROR_INV_FMT;
    return appendPadded({text, sizes.precisionGiven ? ::strnlen(text, sizes.precision) : std::strlen(text)}, sizes);
}

bool Printer::takeCount(const Amount &amount, std::size_t &count)
{
    count = amount.value;
    if (amount.from != Amount::From::Argument)
        return true;
    const long given = m_arguments.next<long>();
    count = static_cast<std::size_t>(std::max(given, 0L));
    return given >= 0;
}

ViStatus Printer::printBlock(const Directive &directive)
{
    std::size_t count = 0;
    if (!takeCount(directive.width, count))
        return VI_ERROR_INV_FMT;
    const auto *const data = m_arguments.next<const std::byte *>();
    const std::size_t elementSize = directive.elementSize();
    if ((!data && count > 0) || count > std::numeric_limits<std::size_t>::max() / elementSize)
        return VI_ERROR_INV_FMT;
    const std::size_t size = count * elementSize;
    ViStatus status = VI_SUCCESS;
    if (directive.code == 'b') {
        if (size > MostBlock)
            return VI_ERROR_INV_FMT;
        const std::string length = integerDigits(size, 10, false, 1);
        status = append("#" + std::to_string(length.size()) + length);
    } else if (directive.code == 'B') {
        status = append("#0");
    }
    if (status >= VI_SUCCESS)
        status = printElements(directive, {data, size});
    if (status >= VI_SUCCESS && directive.code == 'B') {
        status = m_sink.endLine();
        ++m_written;
    }
    return status;
}

ViStatus Printer::printElements(const Directive &directive, std::span<const std::byte> data)
{
    const std::size_t elementSize = directive.elementSize();
    const bool inOrder = (std::endian::native == std::endian::little) == directive.littleEndian;
    m_written += data.size();
    if (elementSize == 1 || inOrder)
        return data.empty() ? VI_SUCCESS : m_sink.append(data);
    std::array<std::byte, 4096> turned; // a multiple of every element's size
    while (!data.empty()) {
        const auto part = data.first(std::min(data.size(), turned.size()));
        for (std::size_t at = 0; at < part.size(); at += elementSize)
            std::reverse_copy(part.begin() + static_cast<std::ptrdiff_t>(at),
                              part.begin() + static_cast<std::ptrdiff_t>(at + elementSize),
                              turned.begin() + static_cast<std::ptrdiff_t>(at));
        if (const ViStatus status = m_sink.append(std::span(turned).first(part.size())); status < VI_SUCCESS)
            return status;
        data = data.subspan(part.size());
    }
    return VI_SUCCESS;
}

void Printer::storeCount(const Directive &directive)
{
    void *const to = m_arguments.next<void *>();
    if (!to)
        return;
    const auto store = [&]<typename Type>(Type) {
        const auto count = static_cast<Type>(m_written);
        std::memcpy(to, &count, sizeof count);
    };
    switch (directive.length) {
    case Length::Short:
        return store(short{});
    case Length::Long:
        return store(long{});
    case Length::LongLong:
        return store(static_cast<long long>(0));
    default:
        return store(int{});
    }
}

ViStatus Printer::appendPadded(std::string_view text, const Sizes &sizes)
{
    const std::size_t missing = sizes.width > text.size() ? sizes.width - text.size() : 0;
    if (missing == 0)
        return append(text);
    const std::string blanks(missing, ' ');
    const std::string_view first = sizes.left ? text : std::string_view(blanks);
    const std::string_view second = sizes.left ? std::string_view(blanks) : text;
    const ViStatus status = append(first);
    return status < VI_SUCCESS ? status : append(second);
}

ViStatus Printer::append(std::string_view text)
{
    m_written += text.size();
    return text.empty() ? VI_SUCCESS : m_sink.append(std::as_bytes(std::span(text)));
}

} // namespace kyvisa::format
