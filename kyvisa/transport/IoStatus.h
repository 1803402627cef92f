#pragma once

#include "kyvisa/include/visatype.h"
#include "kyvisa/os/WaitLimit.h"

namespace kyvisa
{

/// The status of a transfer that ended with @p result.
ViStatus transferStatus(os::IoResult result, const os::WaitLimit &limit);

/// The status of a connection attempt that ended with @p result.
ViStatus connectStatus(os::IoResult result, const os::WaitLimit &limit);

} // namespace kyvisa
