#include "kyvisa/os/SystemCalls.h"

#include <atomic>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <unistd.h>

namespace kyvisa::os
{
namespace
{

int pollWithoutSignalMask(pollfd *descriptors, nfds_t count, const timespec *timeout)
{
    return ::ppoll(descriptors, count, timeout, nullptr);
}

int openPath(const char *path, int flags, mode_t mode)
{
    return ::open(path, flags, mode);
}

int lockFile(int descriptor, int command, struct flock *lock)
{
    return ::fcntl(descriptor, command, lock);
}

ssize_t receiveFrom(int descriptor, void *buffer, size_t size, int flags, sockaddr *from, socklen_t *length)
{
    return ::recvfrom(descriptor, buffer, size, flags, from, length);
}

int controlDevice(int descriptor, unsigned long request, void *argument)
{
    return ::ioctl(descriptor, request, argument);
}

constexpr SystemCalls Real = {
    .socket = ::socket,
    .connect = ::connect,
    .poll = pollWithoutSignalMask,
    .recv = ::recv,
    .sendmsg = ::sendmsg,
    .setsockopt = ::setsockopt,
    .getsockopt = ::getsockopt,
    .eventfd = ::eventfd,
    .shutdown = ::shutdown,
    .close = ::close,
    .bind = ::bind,
    .listen = ::listen,
    .accept4 = ::accept4,
    .open = openPath,
    .ioctl = controlDevice,
    .read = ::read,
    .write = ::write,
    .flock = ::flock,
    .lockFile = lockFile,
    .recvfrom = receiveFrom,
    .getifaddrs = ::getifaddrs,
    .getaddrinfo = ::getaddrinfo,
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
