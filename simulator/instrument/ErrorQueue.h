#pragma once

#include "simulator/instrument/ScpiError.h"

#include <cstddef>
#include <deque>

namespace simulator
{

/// The SCPI error/event queue: first in, first out, and full means that the newest entry gives way to -350.
class ErrorQueue
{
public:
    static constexpr std::size_t Capacity = 30; ///< unless another one is asked for
    static constexpr int Overflow = -350;

    explicit ErrorQueue(std::size_t capacity = Capacity) : m_capacity(capacity) {}

    /// False when the error is lost.
    bool push(ScpiError error);
    /// Removes the oldest entry; 0,"No error" when there is none.
    ScpiError pop();
    bool empty() const { return m_errors.empty(); }
    std::size_t size() const { return m_errors.size(); }
    void clear() { m_errors.clear(); }

private:
    const std::size_t m_capacity;
    std::deque<ScpiError> m_errors;
};

/// The number of an error as instruments write it: some with a sign in any case, `+0`.
std::string errorNumber(int number, bool withSign = false);

/// `-113,"Undefined header;FOO"`: as SYSTem:ERRor? answers, the text at most 255 characters.
std::string errorResponse(const ScpiError &error, bool withSign = false);

} // namespace simulator
