#include "kyvisa/os/Deadline.h"

namespace kyvisa::os
{

Deadline Deadline::after(std::chrono::milliseconds span)
{
    return Deadline(Clock::now() + span);
}

Deadline Deadline::afterVisaTimeout(std::uint32_t milliseconds)
{
    return milliseconds == 0xFFFFFFFFu ? never() : after(std::chrono::milliseconds(milliseconds));
}

Deadline Deadline::now()
{
    return Deadline(Clock::now());
}

bool Deadline::expired() const
{
    return !isNever() && Clock::now() >= m_end;
}

std::uint32_t Deadline::visaTimeoutLeft() const
{
    return isNever() ? 0xFFFFFFFFu
                     : static_cast<std::uint32_t>(std::chrono::ceil<std::chrono::milliseconds>(remaining()).count());
}

std::chrono::nanoseconds Deadline::remaining() const
{
    const auto now = Clock::now();
    return now >= m_end ? std::chrono::nanoseconds::zero()
                        : std::chrono::duration_cast<std::chrono::nanoseconds>(m_end - now);
}

} // namespace kyvisa::os
