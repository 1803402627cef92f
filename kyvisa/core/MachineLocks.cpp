#include "kyvisa/core/MachineLocks.h"

#include <cstdint>
#include <string_view>

namespace kyvisa
{
namespace
{

using os::LockFile;

constexpr int KeyBits = 22;
constexpr int ResourceBits = 40;
constexpr std::int64_t Joining = 0;
constexpr std::int64_t Exclusive = 1;
constexpr std::int64_t Keys = 2;
constexpr std::int64_t KeyCount = std::int64_t{1} << KeyBits;
constexpr std::int64_t PieceSize = KeyCount * 2;

/// FNV-1a. Other processes, with other builds of this library, must come to the same places.
std::uint64_t hash(std::string_view text)
{
    std::uint64_t value = 0xCBF29CE484222325u;
    for (const char c : text) {
        value ^= static_cast<unsigned char>(c);
        value *= 0x100000001B3u;
    }
    return value ^ value >> 32;
}

std::int64_t pieceOf(const std::string &resource)
{
    return static_cast<std::int64_t>(hash(resource) & ((std::uint64_t{1} << ResourceBits) - 1)) * PieceSize;
}

MachineLocks::Answer answerFor(LockFile::Outcome outcome)
{
    switch (outcome) {
    case LockFile::Outcome::Done:
        return MachineLocks::Answer::Granted;
    case LockFile::Outcome::Held:
        return MachineLocks::Answer::Held;
    case LockFile::Outcome::Unavailable:
        break;
    }
    return MachineLocks::Answer::Unavailable;
}

} // namespace

MachineLocks::MachineLocks(std::shared_ptr<os::LockFile> file, const std::string &resource)
    : m_file(std::move(file)), m_begin(pieceOf(resource))
{
}

LockFile::Range MachineLocks::place(std::int64_t offset, std::int64_t length) const
{
    return {m_begin + offset, length};
}

LockFile::Range MachineLocks::all() const
{
    return place(Exclusive, Keys - Exclusive + KeyCount);
}

LockFile::Range MachineLocks::placeOf(const std::string &key) const
{
    return place(Keys + static_cast<std::int64_t>(hash(key) & static_cast<std::uint64_t>(KeyCount - 1)));
}

MachineLocks::Answer MachineLocks::takeExclusive(bool sharing)
{
    if (!m_file->ready())
        return Answer::Unavailable;
    const auto outcome = m_file->tryLock(sharing ? place(Exclusive) : all(), LockFile::Kind::Exclusive);
    m_exclusive = outcome == LockFile::Outcome::Done;
    return answerFor(outcome);
}

MachineLocks::Answer MachineLocks::share(const std::string &key, bool joining)
{
    if (!m_file->ready())
        return Answer::Unavailable;
    const auto alone = m_file->lockBriefly(place(Joining));
    if (alone != LockFile::Outcome::Done)
        return answerFor(alone);
    Answer answer = Answer::Granted;
    const auto sharer = m_file->find(place(Keys, KeyCount));
    if (sharer && sharer->kind == LockFile::Kind::Exclusive)
        answer = Answer::Held;
    else if (sharer && !joining)
        answer = Answer::Held;
    else if (sharer && sharer->begin != placeOf(key).begin)
        answer = Answer::OtherKey;
    if (answer == Answer::Granted)
        answer = answerFor(m_file->tryLock(placeOf(key), LockFile::Kind::Shared));
    m_shared = answer == Answer::Granted;
    m_file->unlock(place(Joining));
    return answer;
}

void MachineLocks::keep(bool exclusive, bool shared)
{
    if (m_exclusive && !exclusive)
        m_file->unlock(m_shared ? place(Exclusive) : all());
    if (m_shared && !shared)
        m_file->unlock(place(Keys, KeyCount));
    m_exclusive = m_exclusive && exclusive;
    m_shared = m_shared && shared;
}

bool MachineLocks::shutsOut(bool sharing) const
{
    return sharing ? othersHoldExclusive() : m_file->ready() && m_file->find(all()).has_value();
}

bool MachineLocks::othersHoldExclusive() const
{
    return m_file->ready() && m_file->find(place(Exclusive)).has_value();
}

bool MachineLocks::othersShare() const
{
    const auto found = m_file->ready() ? m_file->find(place(Keys, KeyCount)) : std::nullopt;
    return found && found->kind == LockFile::Kind::Shared;
}

} // namespace kyvisa
