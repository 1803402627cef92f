#pragma once

#include "simulator/traffic/TrafficLog.h"

#include <string>

namespace simulator
{

/// Local time of day with milliseconds: "13:05:59.042".
std::string timeOfDay(std::chrono::system_clock::time_point time);

/// "->" to the instrument, "<-" from it, "--" for what is no message.
std::string_view arrowOf(TrafficLog::Kind kind);

} // namespace simulator
