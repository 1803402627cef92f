#pragma once

#include <cstdint>

/**
 * A VISA attribute and its value.
 *
 * A text attribute (top bit of the identifier set) holds the address of a zero-filled buffer of 512 bytes that
 * VisaSessionWithLog::getAttribute allocates with calloc; the holder releases it with free, on every path.
 */
struct Attribute {
    std::uint32_t id = 0;
    std::uint64_t value = 0;

    bool isText() const { return (id & 0x80000000u) != 0; }
    const char *text() const { return reinterpret_cast<const char *>(value); }
};
