#pragma once

#include "kyvisa/include/visatype.h"

#include <cstddef>
#include <span>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}

/// What a session on a GPIB interface can do beside transfers. Each operation answers a status of the VISA interface.
class GpibController
{
public:
    /// @param mode a mode of viGpibControlATN, checked.
    virtual ViStatus controlAttention(ViUInt16 mode, const os::WaitLimit &limit) = 0;
    virtual ViStatus clearInterface(const os::WaitLimit &limit) = 0;
    /// @param count receives the bytes sent, also on errors.
    virtual ViStatus sendCommands(std::span<const std::byte> commands, const os::WaitLimit &limit,
                                  std::size_t &count) = 0;
    /// @param secondary VI_NO_SEC_ADDR for none.
    virtual ViStatus passControl(ViUInt16 primary, ViUInt16 secondary, const os::WaitLimit &limit) = 0;

protected:
    ~GpibController() = default;
};

} // namespace kyvisa
