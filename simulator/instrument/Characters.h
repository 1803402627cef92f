#pragma once

/// Character classes of IEEE 488.2, independent of any locale.
namespace simulator
{

constexpr bool isWhiteSpace(char c)
{
    const auto byte = static_cast<unsigned char>(c);
    return byte <= 32 && byte != '\n';
}

constexpr bool isDigit(char c)
{
    return c >= '0' && c <= '9';
}

constexpr bool isLetter(char c)
{
    return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
}

constexpr bool isUpper(char c)
{
    return c >= 'A' && c <= 'Z';
}

constexpr char toUpper(char c)
{
    return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
}

constexpr char toLower(char c)
{
    return isUpper(c) ? static_cast<char>(c - 'A' + 'a') : c;
}

} // namespace simulator
