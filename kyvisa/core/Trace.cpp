#include "kyvisa/core/Trace.h"

#include "kyvisa/core/StatusText.h"

#include <array>
#include <cstdio>
#include <cstring>

namespace kyvisa::trace
{
namespace
{

constexpr std::size_t MostShown = 80;

void appendEscaped(std::string &to, std::string_view bytes)
{
    to += '"';
    for (const char c : bytes.substr(0, MostShown)) {
        const auto byte = static_cast<unsigned char>(c);
        if (c == '\n')
            to += "\\n";
        else if (c == '\r')
            to += "\\r";
        else if (c == '"' || c == '\\')
            (to += '\\') += c;
        else if (byte >= 0x20 && byte < 0x7F)
            to += c;
        else {
            std::array<char, 8> escape{};
            std::snprintf(escape.data(), escape.size(), "\\x%02x", byte);
            to += escape.data();
        }
    }
    to += bytes.size() > MostShown ? "\"..." : "\"";
}

} // namespace

std::atomic<bool> g_on{false};

void switchTo(bool on)
{
    g_on.store(on, std::memory_order_relaxed);
}

void appendText(std::string &to, const char *text)
{
    if (text)
        appendEscaped(to, {text, ::strnlen(text, MostShown + 1)});
    else
        to += "NULL";
}

void appendBytes(std::string &to, const void *data, std::size_t count)
{
    if (data)
        appendEscaped(to, {static_cast<const char *>(data), count});
    else
        to += "NULL";
}

void appendAddress(std::string &to, const void *address)
{
    if (!address) {
        to += "NULL";
        return;
    }
    std::array<char, 24> text{};
    std::snprintf(text.data(), text.size(), "%p", address);
    to += text.data();
}

void tell(std::string line)
{
    line += '\n';
    std::fwrite(line.data(), 1, line.size(), stderr);
}

void write(const char *operation, std::string_view arguments, ViStatus status, std::chrono::nanoseconds duration)
{
    std::string line = std::string(operation) + "(" + std::string(arguments) + ") = ";
    std::array<char, 32> text{};
    if (const char *name = statusName(status)) {
        line += name;
    } else {
        std::snprintf(text.data(), text.size(), "0x%08X", static_cast<unsigned>(status));
        line += text.data();
    }
    const long long microseconds = std::chrono::duration_cast<std::chrono::microseconds>(duration).count();
    std::snprintf(text.data(), text.size(), ", %lld.%03lld ms\n", microseconds / 1000, microseconds % 1000);
    line += text.data();
    std::fwrite(line.data(), 1, line.size(), stderr);
}

} // namespace kyvisa::trace
