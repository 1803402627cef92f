#pragma once

#include "kyvisa/format/TextBuffers.h"

#include <cstdarg>
#include <string>
#include <vector>

namespace test
{

struct Printed {
    ViStatus status;
    std::string text;

    bool operator==(const Printed &) const = default;
};

/// The printed text up to its NUL.
inline Printed print(const char *format, ...)
{
    std::vector<char> buffer(100'000, '?');
    va_list list;
    va_start(list, format);
    kyvisa::format::Arguments arguments(list);
    va_end(list);
    const ViStatus status = kyvisa::format::printToText(buffer.data(), format, arguments);
    return {status, status < 0 ? std::string() : std::string(buffer.data())};
}

inline ViStatus scan(const char *text, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    kyvisa::format::Arguments arguments(list);
    va_end(list);
    return kyvisa::format::scanText(text, format, arguments);
}

} // namespace test
