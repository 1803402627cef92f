#pragma once

#include <chrono>

namespace test
{

/// Time since it was made, for bounds that leave a noisy machine plenty of room.
class Stopwatch
{
public:
    long milliseconds() const
    {
        return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - m_start)
            .count();
    }

private:
    std::chrono::steady_clock::time_point m_start = std::chrono::steady_clock::now();
};

} // namespace test
