#include "visa/KyVisaCodedString.h"

#include <cstddef>

namespace
{

constexpr std::size_t LongestUncut = 249;

void appendByte(std::string &text, unsigned char byte)
{
    static constexpr char Digits[] = "0123456789ABCDEF";
    switch (byte) {
    case '\t':
        text += "\\t";
        return;
    case '\n':
        text += "\\n";
        return;
    case '\r':
        text += "\\r";
        return;
    case '\0':
        text += "\\0";
        return;
    default:
        break;
    }
    if (byte >= 0x20 && byte <= 0x7E) {
        text += static_cast<char>(byte);
        return;
    }
    text += "\\x";
    text += Digits[byte >> 4];
    text += Digits[byte & 0x0F];
}

} // namespace

std::string KyVisaCodedString(const char *bytes, std::uint64_t count)
{
    std::string text;
    text.reserve(256);
    if (bytes == nullptr)
        return text;
    // The limit is looked at after each whole escape: an escape is never torn.
    for (std::uint64_t i = 0; i < count && text.size() <= LongestUncut; ++i)
        appendByte(text, static_cast<unsigned char>(bytes[i]));
    return text;
}
