#pragma once

#include <chrono>

namespace kyvisa::os
{

/// How long something takes, on the monotonic clock.
class Stopwatch
{
public:
    void start() { m_begin = std::chrono::steady_clock::now(); }
    /// Since start().
    std::chrono::nanoseconds elapsed() const { return std::chrono::steady_clock::now() - m_begin; }

private:
    std::chrono::steady_clock::time_point m_begin{};
};

} // namespace kyvisa::os
