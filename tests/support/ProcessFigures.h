#pragma once

#include <cstddef>
#include <sys/types.h>

namespace test
{

/// What /proc says of a process at one moment.
struct ProcessFigures {
    std::size_t memory = 0;     ///< resident, KiB
    std::size_t peakMemory = 0; ///< KiB
    std::size_t descriptors = 0;
    double processorSeconds = 0; ///< used so far
};

ProcessFigures figuresOf(pid_t process);

} // namespace test
