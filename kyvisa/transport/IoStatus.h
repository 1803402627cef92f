#pragma once

#include "kyvisa/include/visatype.h"
#include "kyvisa/os/WaitLimit.h"

#include <cstddef>

namespace kyvisa
{

namespace os
{
class StreamSocket;
}

/// The status of a transfer that ended with @p result.
ViStatus transferStatus(os::IoResult result, const os::WaitLimit &limit);

/// The status of a connection attempt that ended with @p result.
ViStatus connectStatus(os::IoResult result, const os::WaitLimit &limit);

/// viSetBuf() of the system's buffers of @p socket. The system may round the size, and cut it to what it allows.
ViStatus resizeBuffersOf(os::StreamSocket &socket, ViUInt16 mask, std::size_t size);

} // namespace kyvisa
