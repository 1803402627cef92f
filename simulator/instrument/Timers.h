#pragma once

#include <chrono>
#include <cstdint>
#include <functional>

namespace simulator
{

/// Where the instrument gets its time from: the event loop in the program, a clock turned by hand in unit tests.
class Timers
{
public:
    using Id = std::uint64_t;
    static constexpr Id None = 0;

    /// Calls @p action once, at the earliest after @p delay, never from inside this call.
    virtual Id after(std::chrono::nanoseconds delay, std::function<void()> action) = 0;
    /// The action is not called any more. Does nothing when it has been, or for None.
    virtual void cancel(Id id) = 0;

protected:
    ~Timers() = default;
};

} // namespace simulator
