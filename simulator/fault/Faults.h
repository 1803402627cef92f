#pragma once

#include "simulator/fault/MessageForm.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <random>
#include <vector>

namespace simulator
{

/// What is to be done to one outgoing message.
struct Damage {
    std::chrono::nanoseconds delay{0};
    bool drop = false;
    std::optional<std::uint64_t> cutAt;        ///< so many bytes are sent, then the connection ends
    std::optional<std::size_t> headerKept;     ///< so much of the header is sent
    std::optional<std::uint64_t> announced;    ///< what the length says
    std::optional<std::uint64_t> garbageBytes; ///< noise of that length instead of the message
    std::uint64_t garbageSeed = 0;
    std::optional<std::uint64_t> changedByte; ///< of the payload
    bool staleId = false;
    bool noEnd = false;
};

/**
 * The faults that are switched on. A server asks for each message it sends, each lock it is asked for, each service request and each status byte;
 * every fault that concerns it counts it, and strikes as its condition says. Several may strike one message.
 *
 * The order of the answers follows from the seed, the faults and the order of the questions alone, so that a run can be repeated.
 */
class Faults
{
public:
    static constexpr std::size_t Capacity = 64;

    struct Entry {
        unsigned number; ///< never given twice
        FaultSpec spec;
        std::uint64_t seen = 0;
        std::uint64_t struck = 0;
        std::mt19937_64 random;
    };

    /// @p fillErrors fills the instrument's error queue; it must not come back.
    Faults(std::uint64_t seed, std::function<void()> fillErrors) : m_seed(seed), m_fillErrors(std::move(fillErrors)) {}

    bool any() const { return !m_entries.empty(); }
    const std::vector<Entry> &entries() const { return m_entries; }
    const Entry *find(unsigned number) const;
    /// Its number; none when there are Capacity of them.
    std::optional<unsigned> add(FaultSpec spec);
    bool remove(unsigned number);
    void clear() { m_entries.clear(); }
    std::uint64_t seed() const { return m_seed; }
    /// All faults begin afresh: counters at 0, random numbers from this seed.
    void restart(std::uint64_t seed);

    /// None when the message may go as it is.
    std::optional<Damage> strike(const MessageForm &form, std::uint64_t size);
    bool refusesLock(FaultProtocol protocol);
    /// How often a service request is made: once, unless a fault says otherwise.
    unsigned serviceRequests(FaultProtocol protocol);
    /// The status byte that is told instead of @p truth.
    std::uint8_t told(FaultProtocol protocol, std::uint8_t truth);

private:
    /// The entry of this kind that strikes; all that are concerned count.
    Entry *occasion(FaultKind kind, FaultProtocol protocol);
    void begin(Entry &entry) const;
    static bool strikes(Entry &entry);
    static void damage(Damage &damage, Entry &entry, const MessageForm &form, std::uint64_t size);

    std::uint64_t m_seed;
    std::function<void()> m_fillErrors;
    std::vector<Entry> m_entries;
    unsigned m_lastNumber = 0;
};

} // namespace simulator
