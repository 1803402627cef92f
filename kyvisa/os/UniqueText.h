#pragma once

#include <string>

namespace kyvisa::os
{

/// A text that no other call makes, in this process or another, on this host or another: 32 hexadecimal digits of
/// randomness, less than 256 characters.
std::string uniqueText();

} // namespace kyvisa::os
