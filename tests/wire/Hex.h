#pragma once

#include <gtest/gtest.h>

#include <cctype>
#include <cstddef>
#include <string_view>
#include <vector>

/// Bytes as they stand in a table: pairs of hexadecimal digits and, in quotes, ASCII characters; blanks and | separate.
inline std::vector<std::byte> hex(std::string_view text)
{
    std::vector<std::byte> bytes;
    int digits = 0;
    unsigned value = 0;
    bool quoted = false;
    for (const char c : text) {
        if (c == '\'') {
            quoted = !quoted;
        } else if (quoted) {
            bytes.push_back(static_cast<std::byte>(c));
        } else if (std::isxdigit(static_cast<unsigned char>(c))) {
            const int digit = std::isdigit(static_cast<unsigned char>(c)) ? c - '0' : std::tolower(c) - 'a' + 10;
            value = value * 16 + static_cast<unsigned>(digit);
            if (++digits == 2) {
                bytes.push_back(static_cast<std::byte>(value));
                digits = 0;
                value = 0;
            }
        } else if (c != ' ' && c != '|') {
            ADD_FAILURE() << "not hexadecimal: " << c;
        }
    }
    EXPECT_EQ(digits, 0) << "half a byte in: " << text;
    EXPECT_FALSE(quoted) << "open quote in: " << text;
    return bytes;
}
