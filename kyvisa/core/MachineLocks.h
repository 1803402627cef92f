#pragma once

#include "kyvisa/os/LockFile.h"

#include <memory>
#include <string>

namespace kyvisa
{

/**
 * What this process holds of one resource's locks, as the other processes of the machine see it.
 *
 * A resource has a piece of the lock file's offsets to itself, found by its name:
 *
 *     0           held for moments, by whoever joins or begins to share
 *     1           the exclusive lock
 *     2 + f(key)  shared by the holders of a key
 *
 * An exclusive lock of one that does not share covers all of it but the first place, so it collides with everybody. Which
 * place is shared tells the key without telling it: a newcomer compares places.
 *
 * The caller serialises, and asks only for what its process does not hold yet.
 */
class MachineLocks
{
public:
    enum class Answer { Granted, Held, OtherKey, Unavailable };

    MachineLocks(std::shared_ptr<os::LockFile> file, const std::string &resource);

    /// @param sharing this process shares already: the other sharers do not matter.
    Answer takeExclusive(bool sharing);
    /// @param joining the key is one that the user knows; otherwise nobody may share yet.
    Answer share(const std::string &key, bool joining);
    /// Gives back what is not in use any more.
    void keep(bool exclusive, bool shared);

    /// Another process shuts this one out. @param sharing this process shares.
    bool shutsOut(bool sharing) const;
    bool othersHoldExclusive() const;
    bool othersShare() const;

private:
    os::LockFile::Range all() const;
    os::LockFile::Range place(std::int64_t offset, std::int64_t length = 1) const;
    os::LockFile::Range placeOf(const std::string &key) const;

    const std::shared_ptr<os::LockFile> m_file;
    const std::int64_t m_begin;
    bool m_exclusive = false;
    bool m_shared = false;
};

} // namespace kyvisa
