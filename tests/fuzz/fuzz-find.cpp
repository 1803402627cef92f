// A search expression and a resource string, separated by a NUL. Whatever it says, it is answered, and a beginning of what
// matches may match.
#include "kyvisa/core/FindExpression.h"
#include "tests/fuzz/Promise.h"

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <string>

using namespace kyvisa;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const std::string input(reinterpret_cast<const char *>(data), size);
    const std::size_t separator = input.find('\0');
    const auto expression = FindExpression::parse(input.substr(0, separator));
    if (!expression)
        return 0;
    std::string resource = separator == std::string::npos ? "" : input.substr(separator + 1);
    resource.resize(std::min<std::size_t>(resource.size(), 255));
    for (const char *known : {"TCPIP0::192.168.0.7::hislip0,4881::INSTR", "TCPIP0::[::1]::5025::SOCKET",
                              "GPIB0::7::12::INSTR", "GPIB0::INTFC", "ASRL1::INSTR", resource.c_str()}) {
        const std::string text = known;
        const bool matches = expression->matches(text);
        // The beginnings that a search asks about, and one that the input chooses.
        if (matches)
            for (const std::size_t length : {std::size_t{0}, std::size_t{5}, size % (text.size() + 1), text.size()})
                promise(expression->mayMatch(text.substr(0, length)));
        // Letters count without their case. The condition compares texts as they are, so a match is only sure to stay without one.
        std::string upper = text;
        std::transform(upper.begin(), upper.end(), upper.begin(), [](unsigned char c) { return std::toupper(c); });
        promise(expression->mayMatch(text) == expression->mayMatch(upper));
    }
    return 0;
}
