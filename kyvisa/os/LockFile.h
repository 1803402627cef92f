#pragma once

#include <atomic>
#include <cstdint>
#include <optional>
#include <string>

namespace kyvisa::os
{

/**
 * An empty file in shared memory through which the processes of this machine see each other's locks.
 *
 * Locks are open-file-description locks on ranges of offsets; nothing is ever written. The kernel frees them when the process
 * ends in whatever way, so nothing can be left behind. It holds them for the open file, not for the process: two copies of
 * the library in one process see each other as well. Nothing here waits; who wants a lock that another process holds asks
 * again.
 *
 * Any thread may call. The file is opened when it is first needed and stays open.
 */
class LockFile
{
public:
    /// Half-open: [begin, begin + length).
    struct Range {
        std::int64_t begin;
        std::int64_t length;
    };
    enum class Kind { Shared, Exclusive };
    enum class Outcome { Done, Held, Unavailable };
    struct Found {
        Kind kind;
        std::int64_t begin;
    };

    explicit LockFile(std::string path);
    ~LockFile();
    LockFile(const LockFile &) = delete;
    LockFile &operator=(const LockFile &) = delete;

    /// For all users of the machine: /dev/shm/kyvisa-locks.
    static std::string standardPath();

    /// Makes sure that the file is open. False where that is impossible.
    bool ready();

    Outcome tryLock(Range range, Kind kind) const;
    /// As tryLock(), for locks that are held for some microseconds only.
    Outcome lockBriefly(Range range) const;
    void unlock(Range range) const;
    /// A lock of somebody else that an exclusive one on @p range would collide with.
    std::optional<Found> find(Range range) const;

    /// In a forked child: the file is the parent's.
    void abandon();

private:
    int openFile() const;

    const std::string m_path;
    std::atomic<int> m_descriptor{-1};
};

} // namespace kyvisa::os
