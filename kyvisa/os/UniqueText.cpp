#include "kyvisa/os/UniqueText.h"

#include <array>
#include <cstdio>
#include <random>

namespace kyvisa::os
{

std::string uniqueText()
{
    std::random_device source;
    std::string text = "kyvisa-";
    for (int i = 0; i < 4; ++i) {
        std::array<char, 9> digits{};
        std::snprintf(digits.data(), digits.size(), "%08x", source());
        text += digits.data();
    }
    return text;
}

} // namespace kyvisa::os
