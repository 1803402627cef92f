#pragma once

#include <cstdlib>

/// Ends the process when a decoder does not hold what it promises: the fuzzer takes an abort for a finding.
inline void promise(bool held)
{
    if (!held)
        std::abort();
}
