#include "simulator/fault/Faults.h"

#include <algorithm>
#include <utility>

namespace simulator
{
namespace
{

constexpr unsigned DefaultRepeats = 2;

/// A value in [0, 1), the same on every machine.
double fraction(std::mt19937_64 &random)
{
    constexpr double Step = 1.0 / 9007199254740992.0; // 2^-53
    return static_cast<double>(random() >> 11) * Step;
}

/// False for a message that has nothing which this kind could damage; it does not count then.
bool applies(FaultKind kind, const MessageForm &form)
{
    switch (kind) {
    case FaultKind::ShortHeader:
        return form.header > 0;
    case FaultKind::OversizedHeader:
        return form.length.size > 0;
    case FaultKind::ChangeByte:
        return form.payloadSize > 0;
    case FaultKind::StaleId:
        return form.id.size > 0;
    case FaultKind::NoEnd:
        return form.end != EndMark::None;
    case FaultKind::RefuseLock:
    case FaultKind::WithholdSrq:
    case FaultKind::RepeatSrq:
    case FaultKind::NonsenseStatus:
        return false;
    default:
        return true;
    }
}

} // namespace

const Faults::Entry *Faults::find(unsigned number) const
{
    const auto found =
        std::find_if(m_entries.begin(), m_entries.end(), [=](const Entry &each) { return each.number == number; });
    return found == m_entries.end() ? nullptr : &*found;
}

void Faults::begin(Entry &entry) const
{
    entry.seen = entry.struck = 0;
    // Each has a generator of its own, so that one more fault does not change when the others strike.
    std::seed_seq sequence{static_cast<std::uint32_t>(m_seed), static_cast<std::uint32_t>(m_seed >> 32), entry.number};
    entry.random.seed(sequence);
}

std::optional<unsigned> Faults::add(FaultSpec spec)
{
    if (m_entries.size() >= Capacity)
        return std::nullopt;
    m_entries.push_back({++m_lastNumber, std::move(spec), 0, 0, std::mt19937_64{}});
    begin(m_entries.back());
    return m_lastNumber;
}

bool Faults::remove(unsigned number)
{
    return std::erase_if(m_entries, [=](const Entry &each) { return each.number == number; }) != 0;
}

void Faults::restart(std::uint64_t seed)
{
    m_seed = seed;
    for (Entry &entry : m_entries)
        begin(entry);
}

bool Faults::strikes(Entry &entry)
{
    ++entry.seen;
    bool result = true;
    switch (entry.spec.when) {
    case FaultSpec::When::Always:
        break;
    case FaultSpec::When::Probability:
        result = fraction(entry.random) < entry.spec.probability;
        break;
    case FaultSpec::When::Nth:
        result = entry.seen == entry.spec.number;
        break;
    case FaultSpec::When::Every:
        result = entry.seen % entry.spec.number == 0;
        break;
    }
    entry.struck += result ? 1 : 0;
    return result;
}

std::optional<Damage> Faults::strike(const MessageForm &form, std::uint64_t size)
{
    std::optional<Damage> result;
    for (Entry &entry : m_entries) {
        const FaultSpec &spec = entry.spec;
        // Every message of the second channel counts: none of them carries an answer.
        const bool counts = form.answer || spec.allMessages || form.protocol == FaultProtocol::HislipAsync;
        if (!counts || !spec.concerns(form.protocol) || !applies(spec.kind, form) || !strikes(entry))
            continue;
        if (spec.kind == FaultKind::FillErrors) {
            m_fillErrors();
            continue;
        }
        if (!result)
            result.emplace();
        damage(*result, entry, form, size);
    }
    return result;
}

void Faults::damage(Damage &damage, Entry &entry, const MessageForm &form, std::uint64_t size)
{
    const auto valueOr = [&](std::uint64_t otherwise) {
        return entry.spec.value ? static_cast<std::uint64_t>(*entry.spec.value) : otherwise;
    };
    switch (entry.spec.kind) {
    case FaultKind::Delay:
        damage.delay +=
            std::chrono::duration_cast<std::chrono::nanoseconds>(std::chrono::duration<double>{*entry.spec.value});
        break;
    case FaultKind::DropReply:
        damage.drop = true;
        break;
    case FaultKind::Cut:
        damage.cutAt = std::min(valueOr(size / 2), size - std::min<std::uint64_t>(size, 1));
        break;
    case FaultKind::ShortHeader:
        damage.headerKept = static_cast<std::size_t>(std::min<std::uint64_t>(valueOr(form.header / 2), form.header));
        break;
    case FaultKind::OversizedHeader:
        damage.announced = valueOr(form.length.mask);
        break;
    case FaultKind::Garbage:
        damage.garbageBytes = valueOr(size);
        damage.garbageSeed = entry.random();
        break;
    case FaultKind::ChangeByte:
        damage.changedByte = valueOr(entry.random()) % form.payloadSize;
        break;
    case FaultKind::StaleId:
        damage.staleId = true;
        break;
    case FaultKind::NoEnd:
        damage.noEnd = true;
        break;
    default:
        break;
    }
}

Faults::Entry *Faults::occasion(FaultKind kind, FaultProtocol protocol)
{
    Entry *result = nullptr;
    for (Entry &entry : m_entries)
        if (entry.spec.kind == kind && entry.spec.concerns(protocol) && strikes(entry))
            result = &entry;
    return result;
}

bool Faults::refusesLock(FaultProtocol protocol)
{
    return occasion(FaultKind::RefuseLock, protocol) != nullptr;
}

unsigned Faults::serviceRequests(FaultProtocol protocol)
{
    if (occasion(FaultKind::WithholdSrq, protocol))
        return 0;
    const Entry *repeated = occasion(FaultKind::RepeatSrq, protocol);
    if (!repeated)
        return 1;
    return repeated->spec.value ? static_cast<unsigned>(*repeated->spec.value) : DefaultRepeats;
}

std::uint8_t Faults::told(FaultProtocol protocol, std::uint8_t truth)
{
    Entry *nonsense = occasion(FaultKind::NonsenseStatus, protocol);
    if (!nonsense)
        return truth;
    if (nonsense->spec.value)
        return static_cast<std::uint8_t>(*nonsense->spec.value);
    // Never by chance what is true.
    return static_cast<std::uint8_t>(truth ^ (1 + nonsense->random() % 255));
}

} // namespace simulator
