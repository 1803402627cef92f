#pragma once

#include <cerrno>
#include <fcntl.h>
#include <ifaddrs.h>
#include <netdb.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/types.h>

namespace kyvisa::os
{

/**
 * The system calls that the library makes, one function each. Tests replace single entries to make a call fail, answer
 * short or look slow; the library itself never changes them.
 */
struct SystemCalls {
    int (*socket)(int domain, int type, int protocol);
    int (*connect)(int descriptor, const sockaddr *address, socklen_t length);
    int (*poll)(pollfd *descriptors, nfds_t count, const timespec *timeout);
    ssize_t (*recv)(int descriptor, void *buffer, size_t size, int flags);
    ssize_t (*sendmsg)(int descriptor, const msghdr *message, int flags);
    int (*setsockopt)(int descriptor, int level, int option, const void *value, socklen_t length);
    int (*getsockopt)(int descriptor, int level, int option, void *value, socklen_t *length);
    int (*eventfd)(unsigned initial, int flags);
    int (*shutdown)(int descriptor, int how);
    int (*close)(int descriptor);
    int (*bind)(int descriptor, const sockaddr *address, socklen_t length);
    int (*listen)(int descriptor, int backlog);
    int (*accept4)(int descriptor, sockaddr *address, socklen_t *length, int flags);
    int (*open)(const char *path, int flags, mode_t mode);
    int (*ioctl)(int descriptor, unsigned long request, void *argument);
    ssize_t (*read)(int descriptor, void *buffer, size_t size);
    ssize_t (*write)(int descriptor, const void *data, size_t size);
    int (*flock)(int descriptor, int operation);
    int (*lockFile)(int descriptor, int command, struct flock *lock); ///< fcntl() with a lock
    ssize_t (*recvfrom)(int descriptor, void *buffer, size_t size, int flags, sockaddr *from, socklen_t *length);
    int (*getifaddrs)(ifaddrs **result);
    int (*getaddrinfo)(const char *node, const char *service, const addrinfo *hints, addrinfo **result);
};

/// Makes a call that does not wait again for as long as signals interrupt it.
template <typename Call>
auto untilNotInterrupted(const Call &call)
{
    auto result = call();
    while (result < 0 && errno == EINTR)
        result = call();
    return result;
}

/// What the library calls through.
const SystemCalls &systemCalls();

/// The real calls, to build a replacement from.
const SystemCalls &realSystemCalls();

/// Replaces the calls for its life time. @p calls must outlive it. For tests.
class ReplacedSystemCalls
{
public:
    explicit ReplacedSystemCalls(const SystemCalls &calls);
    ~ReplacedSystemCalls();
    ReplacedSystemCalls(const ReplacedSystemCalls &) = delete;
    ReplacedSystemCalls &operator=(const ReplacedSystemCalls &) = delete;
};

} // namespace kyvisa::os
