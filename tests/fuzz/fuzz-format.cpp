// A format text and an answer, separated by a NUL. Parsing ends, and scanning stays inside what it was given.
#include "kyvisa/format/Directive.h"
#include "kyvisa/format/TextBuffers.h"
#include "kyvisa/include/visa.h"
#include "tests/fuzz/Promise.h"

#include <algorithm>
#include <array>
#include <cstdarg>
#include <cstdint>
#include <cstring>
#include <string>

using namespace kyvisa;

namespace
{

ViStatus scan(const std::string &text, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    format::Arguments arguments(list);
    va_end(list);
    return format::scanText(text.c_str(), format, arguments);
}

/// True when the format stores nothing: its arguments, which are not there, are never asked for.
bool asksForNoArgument(const format::Directives &directives)
{
    return std::all_of(directives.begin(), directives.end(), [](const format::Directive &directive) {
        return directive.kind != format::Directive::Kind::Conversion ||
               (directive.discard && directive.width.from != format::Amount::From::Argument &&
                directive.arraySize.from != format::Amount::From::Argument);
    });
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const std::string input(reinterpret_cast<const char *>(data), size);
    const std::size_t separator = input.find('\0');
    const std::string format = input.substr(0, separator);
    const std::string text = separator == std::string::npos ? "" : input.substr(separator + 1);

    format::Directives directives;
    format::parseOutputFormat(format.c_str(), directives);
    if (format::parseInputFormat(format.c_str(), directives) == VI_SUCCESS && asksForNoArgument(directives))
        promise(scan(text, format.c_str()) == VI_SUCCESS);

    // Each conversion into a variable of its own, with a guard behind it.
    struct {
        std::array<char, 8> characters;
        std::array<char, 4> guard{'k', 'e', 'p', 't'};
    } into;
    int count = 4;
    long elements = 2;
    double real = 0;
    long long integer = 0;
    std::array<int, 4> integers{};
    promise(scan(text, "%lld,%lf,%,#d", &integer, &real, &count, integers.data()) == VI_SUCCESS);
    promise(count >= 0 && count <= 4);
    for (const char *conversion : {"%8s", "%8t", "%8T", "%7[^,]", "%8c"})
        promise(scan(text, conversion, into.characters.data()) == VI_SUCCESS);
    promise(scan(text, "%#lb", &elements, into.characters.data()) == VI_SUCCESS);
    elements = 1;
    promise(scan(text, "%#Zy", &elements, into.characters.data()) == VI_SUCCESS);
    promise(std::memcmp(into.guard.data(), "kept", 4) == 0);
    return 0;
}
