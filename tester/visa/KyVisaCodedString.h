#pragma once

#include <cstdint>
#include <string>

/**
 * Renders the bytes of a transfer for a log line: printable ASCII as it is, tab, line feed, carriage return and zero as
 * \t \n \r \0, everything else as \x and two upper-case hexadecimal digits. Backslash and double quote are not escaped.
 *
 * The text ends with the first byte that takes it past 249 characters, so it is 253 characters long at most; nothing
 * marks the cut. A null pointer gives an empty text.
 */
std::string KyVisaCodedString(const char *bytes, std::uint64_t count);
