#pragma once

#include "kyvisa/include/visatype.h"

#include <atomic>
#include <chrono>
#include <cstddef>
#include <string>
#include <string_view>

/**
 * The trace of all calls to standard error, one line a call:
 *
 *     viWrite(2, "*IDN?\n", 6, 6) = VI_SUCCESS, 0.041 ms
 *
 * Beside them come lines about what a call did that its arguments do not show, such as where a search was made.
 *
 * It is the only thing that the library ever prints. Each line is written in one piece.
 */
namespace kyvisa::trace
{

extern std::atomic<bool> g_on;

inline bool isOn()
{
    return g_on.load(std::memory_order_relaxed);
}
/// For the whole process: what the resource manager session says that was opened last.
void switchTo(bool on);

/// In double quotes, control bytes as escapes, cut behind 80 bytes; NULL for no text.
void appendText(std::string &to, const char *text);
void appendBytes(std::string &to, const void *data, std::size_t count);
void appendAddress(std::string &to, const void *address);

/// One line of its own about what a call is doing.
void tell(std::string line);

void write(const char *operation, std::string_view arguments, ViStatus status, std::chrono::nanoseconds duration);

} // namespace kyvisa::trace
