#pragma once

#include <cstdint>

namespace kyvisa::os
{

/// Steps with each fork, in the child: what was made under another number belongs to the parent.
std::uint32_t forkEpoch();

/// What to do around fork(): lock before, unlock after, in parent and child. Called once.
void watchForks(void (*before)(), void (*inParent)(), void (*inChild)());

} // namespace kyvisa::os
