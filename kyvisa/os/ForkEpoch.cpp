#include "kyvisa/os/ForkEpoch.h"

#include <atomic>
#include <pthread.h>

namespace kyvisa::os
{
namespace
{

std::atomic<std::uint32_t> g_epoch{0};

void stepEpoch()
{
    g_epoch.fetch_add(1, std::memory_order_relaxed);
}

} // namespace

std::uint32_t forkEpoch()
{
    return g_epoch.load(std::memory_order_relaxed);
}

void watchForks(void (*before)(), void (*inParent)(), void (*inChild)())
{
    ::pthread_atfork(nullptr, nullptr, stepEpoch);
    ::pthread_atfork(before, inParent, inChild);
}

} // namespace kyvisa::os
