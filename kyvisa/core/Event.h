#pragma once

#include "kyvisa/include/visatype.h"

namespace kyvisa
{

/// One occurrence of an event, before somebody asks for its context.
struct Event {
    ViEventType type = 0;
    // VI_EVENT_IO_COMPLETION and VI_EVENT_EXCEPTION:
    ViStatus status = 0;
    const char *operation = ""; ///< a literal
    // VI_EVENT_IO_COMPLETION:
    ViJobId job = 0;
    void *buffer = nullptr;
    ViUInt64 count = 0;
};

} // namespace kyvisa
