#pragma once

#include "kyvisa/os/Deadline.h"
#include "kyvisa/os/Wakeup.h"

namespace kyvisa::os
{

/// What may end a wait before its condition holds: the call's deadline, and another thread.
struct WaitLimit {
    Deadline deadline;
    const Wakeup &wakeup;
};

/// How an operation of this folder ended.
enum class IoResult {
    Done,
    TimedOut,
    Woken,     ///< the Wakeup was raised
    Closed,    ///< the peer ended the connection, or it was never open
    NoAddress, ///< name or address unknown, refused or unreachable
    NoMemory,  ///< the system had no descriptor, memory or thread left
};

} // namespace kyvisa::os
