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
    static constexpr std::size_t Capacity = 30;

    void push(ScpiError error);
    /// Removes the oldest entry; 0,"No error" when there is none.
    ScpiError pop();
    bool empty() const { return m_errors.empty(); }
    std::size_t size() const { return m_errors.size(); }
    void clear() { m_errors.clear(); }

private:
    std::deque<ScpiError> m_errors;
};

/// `-113,"Undefined header;FOO"`: as SYSTem:ERRor? answers, the text at most 255 characters.
std::string errorResponse(const ScpiError &error);

} // namespace simulator
