#include "kyvisa/os/SystemCalls.h"

#include <atomic>
#include <sys/eventfd.h>
#include <unistd.h>

namespace kyvisa::os
{
namespace
{

int pollWithoutSignalMask(pollfd *descriptors, nfds_t count, const timespec *timeout)
{
    return ::ppoll(descriptors, count, timeout, nullptr);
}

constexpr SystemCalls Real = {
    ::socket,   ::connect, pollWithoutSignalMask, ::recv, ::sendmsg, ::setsockopt, ::getsockopt, ::eventfd,
    ::shutdown, ::close,   ::getaddrinfo,
};

std::atomic<const SystemCalls *> g_calls{&Real};

} // namespace

const SystemCalls &systemCalls()
{
    return *g_calls.load(std::memory_order_acquire);
}

const SystemCalls &realSystemCalls()
{
    return Real;
}

ReplacedSystemCalls::ReplacedSystemCalls(const SystemCalls &calls)
{
    g_calls.store(&calls, std::memory_order_release);
}

ReplacedSystemCalls::~ReplacedSystemCalls()
{
    g_calls.store(&Real, std::memory_order_release);
}

} // namespace kyvisa::os
