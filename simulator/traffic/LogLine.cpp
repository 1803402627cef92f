#include "simulator/traffic/LogLine.h"

#include <array>
#include <cstdio>
#include <ctime>

namespace simulator
{

std::string timeOfDay(std::chrono::system_clock::time_point time)
{
    using namespace std::chrono;
    const auto whole = floor<seconds>(time);
    const std::time_t clock = system_clock::to_time_t(whole);
    std::tm parts{};
    ::localtime_r(&clock, &parts);
    std::array<char, 48> text{};
    std::snprintf(text.data(), text.size(), "%02d:%02d:%02d.%03d", parts.tm_hour, parts.tm_min, parts.tm_sec,
                  static_cast<int>(duration_cast<milliseconds>(time - whole).count()));
    return text.data();
}

std::string_view arrowOf(TrafficLog::Kind kind)
{
    switch (kind) {
    case TrafficLog::Kind::ToInstrument:
        return "->";
    case TrafficLog::Kind::FromInstrument:
        return "<-";
    case TrafficLog::Kind::Event:
        break;
    }
    return "--";
}

} // namespace simulator
