#include "simulator/instrument/ErrorQueue.h"

#include <utility>

namespace simulator
{

bool ErrorQueue::push(ScpiError error)
{
    if (m_errors.size() == m_capacity) {
        m_errors.back() = {Overflow, {}};
        return false;
    }
    m_errors.push_back(std::move(error));
    return true;
}

ScpiError ErrorQueue::pop()
{
    if (m_errors.empty())
        return {0, {}};
    ScpiError oldest = std::move(m_errors.front());
    m_errors.pop_front();
    return oldest;
}

std::string errorNumber(int number, bool withSign)
{
    return (withSign && number >= 0 ? "+" : "") + std::to_string(number);
}

std::string errorResponse(const ScpiError &error, bool withSign)
{
    constexpr std::size_t MaxText = 255;
    std::string text{errorText(error.number)};
    if (!error.info.empty())
        text += ";";
    for (const char c : error.info) {
        if (c < ' ' || c > '~')
            text += '?';
        else if (c == '"')
            text += "\"\"";
        else
            text += c;
        if (text.size() >= MaxText - 1)
            break; // one short of the limit, so that a doubled quote fits
    }
    return errorNumber(error.number, withSign) + ",\"" + text + "\"";
}

} // namespace simulator
