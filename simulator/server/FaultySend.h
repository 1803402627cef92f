#pragma once

#include "simulator/fault/Faults.h"
#include "simulator/server/Outgoing.h"

#include <chrono>
#include <vector>

namespace simulator
{

/// How a message leaves that has been past the faults.
struct Delivery {
    bool dropped = false;
    bool cut = false; ///< the connection ends behind it
    std::chrono::nanoseconds delay{0};
};

/// Asks the faults about a message that is about to be sent and does to its bytes what they say. Stored blocks stay as they are: what is changed in them is
/// changed in a copy of the byte.
Delivery passFaults(Faults &faults, const MessageForm &form, std::vector<Outgoing> &message);

} // namespace simulator
