#pragma once

#include "kyvisa/os/WaitLimit.h"

#include <poll.h>
#include <span>

namespace kyvisa::os
{

/**
 * Waits until one of @p watched is ready or the limit ends the wait. Its last entry is filled in here: it watches the
 * limit's wake-up.
 *
 * @param atLatest ends the wait earlier; the answer is then Done, with nothing ready.
 */
IoResult pollWithin(std::span<pollfd> watched, const WaitLimit &limit, Deadline atLatest = Deadline::never());

} // namespace kyvisa::os
