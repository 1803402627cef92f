#include "kyvisa/os/LockFile.h"

#include "kyvisa/os/SystemCalls.h"

#include <cerrno>
#include <chrono>
#include <fcntl.h>
#include <sys/stat.h>
#include <thread>

namespace kyvisa::os
{
namespace
{

constexpr int Flags = O_RDWR | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK;
constexpr mode_t ForEverybody = 0666;

constexpr int Attempts = 100;
constexpr std::chrono::microseconds BetweenAttempts{200};

struct flock rangeOf(LockFile::Range range, short type)
{
    struct flock lock {
    };
    lock.l_type = type;
    lock.l_whence = SEEK_SET;
    lock.l_start = range.begin;
    lock.l_len = range.length;
    return lock;
}

} // namespace

LockFile::LockFile(std::string path) : m_path(std::move(path)) {}

LockFile::~LockFile()
{
    abandon();
}

std::string LockFile::standardPath()
{
    return "/dev/shm/kyvisa-locks";
}

int LockFile::openFile() const
{
    // Not in one step: in a folder for everybody the system refuses to "create" what another user has made already.
    const auto open = [this](int flags, mode_t mode) {
        return untilNotInterrupted([&] { return systemCalls().open(m_path.c_str(), flags, mode); });
    };
    int descriptor = open(Flags, 0);
    if (descriptor < 0 && errno == ENOENT) {
        descriptor = open(Flags | O_CREAT | O_EXCL, ForEverybody);
        if (descriptor >= 0)
            ::fchmod(descriptor, ForEverybody); // whatever the process masks out
        else if (errno == EEXIST)
            descriptor = open(Flags, 0);
    }
    struct stat status {
    };
    if (descriptor >= 0 && (::fstat(descriptor, &status) != 0 || !S_ISREG(status.st_mode))) {
        systemCalls().close(descriptor);
        return -1;
    }
    return descriptor;
}

bool LockFile::ready()
{
    if (m_descriptor.load() >= 0)
        return true;
    const int fresh = openFile();
    int none = -1;
    if (fresh >= 0 && !m_descriptor.compare_exchange_strong(none, fresh))
        systemCalls().close(fresh); // another thread was faster
    return m_descriptor.load() >= 0;
}

LockFile::Outcome LockFile::tryLock(Range range, Kind kind) const
{
    struct flock lock = rangeOf(range, kind == Kind::Exclusive ? F_WRLCK : F_RDLCK);
    if (untilNotInterrupted([&] { return systemCalls().lockFile(m_descriptor, F_OFD_SETLK, &lock); }) == 0)
        return Outcome::Done;
    return errno == EAGAIN || errno == EACCES ? Outcome::Held : Outcome::Unavailable;
}

LockFile::Outcome LockFile::lockBriefly(Range range) const
{
    Outcome outcome = tryLock(range, Kind::Exclusive);
    for (int i = 0; i < Attempts && outcome == Outcome::Held; ++i) {
        std::this_thread::sleep_for(BetweenAttempts);
        outcome = tryLock(range, Kind::Exclusive);
    }
    return outcome;
}

void LockFile::unlock(Range range) const
{
    struct flock lock = rangeOf(range, F_UNLCK);
    untilNotInterrupted([&] { return systemCalls().lockFile(m_descriptor, F_OFD_SETLK, &lock); });
}

std::optional<LockFile::Found> LockFile::find(Range range) const
{
    struct flock lock = rangeOf(range, F_WRLCK);
    if (untilNotInterrupted([&] { return systemCalls().lockFile(m_descriptor, F_OFD_GETLK, &lock); }) != 0 ||
        lock.l_type == F_UNLCK)
        return std::nullopt;
    return Found{lock.l_type == F_WRLCK ? Kind::Exclusive : Kind::Shared, lock.l_start};
}

void LockFile::abandon()
{
    const int descriptor = m_descriptor.exchange(-1);
    if (descriptor >= 0)
        systemCalls().close(descriptor);
}

} // namespace kyvisa::os
