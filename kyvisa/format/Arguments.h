#pragma once

#include <cstdarg>

namespace kyvisa::format
{

/// The variables behind a format text, taken one after the other. Their types are the caller's promise, as in C.
class Arguments
{
public:
    explicit Arguments(va_list list) { va_copy(m_list, list); }
    ~Arguments() { va_end(m_list); }
    Arguments(const Arguments &) = delete;
    Arguments &operator=(const Arguments &) = delete;

    /// @tparam Type as it is passed through an ellipsis: int rather than short, double rather than float.
    template <typename Type>
    Type next()
    {
        return va_arg(m_list, Type);
    }

private:
    va_list m_list;
};

} // namespace kyvisa::format
