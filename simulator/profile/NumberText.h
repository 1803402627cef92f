#pragma once

#include "simulator/profile/Profile.h"

#include <string>

namespace simulator
{

/// A number as an answer has it. What is no number, or too large for its style, is written as SCPI-99 says or in NR3.
std::string numberText(double value, const NumberStyle &style);

} // namespace simulator
