#include "simulator/mdns/MdnsResponder.h"

#include <algorithm>
#include <memory>
#include <utility>

namespace simulator
{

using namespace wire::dns;
using std::chrono::milliseconds;

namespace
{

constexpr unsigned Probes = 3;
constexpr unsigned Announcements = 2;
constexpr milliseconds BetweenProbes{250};
constexpr milliseconds BetweenAnnouncements{1000};
constexpr milliseconds AfterLostTiebreak{1000};
constexpr milliseconds BetweenSameAnswers{1000};
// RFC 6762, 8.1: whoever meets this many conflicts goes slowly from there.
constexpr unsigned ManyConflicts = 15;
constexpr milliseconds AfterManyConflicts{5000};
constexpr std::uint32_t MaxDirectTtl = 10; ///< for those who would keep it without listening on

std::vector<std::byte> identityOf(const Record &record)
{
    std::vector<std::byte> bytes = encodeData(record);
    bytes.push_back(static_cast<std::byte>(record.type));
    for (const char c : record.name.text())
        bytes.push_back(static_cast<std::byte>(c));
    return bytes;
}

void add(std::vector<Record> &records, const std::vector<Record> &more)
{
    for (const Record &record : more)
        if (std::find(records.begin(), records.end(), record) == records.end())
            records.push_back(record);
}

/// What is asked has it already, fresh enough (RFC 6762, 7.1).
bool isKnown(const Record &record, const std::vector<Record> &known)
{
    return std::any_of(known.begin(), known.end(), [&](const Record &other) {
        return other.name == record.name && other.type == record.type && other.data == record.data &&
               other.ttl >= record.ttl / 2;
    });
}

/// The records of one name in the order in which two hosts compare them (RFC 6762, 8.2.1).
std::vector<std::pair<std::uint16_t, std::vector<std::byte>>> comparable(const std::vector<Record> &records,
                                                                         const Name &name)
{
    std::vector<std::pair<std::uint16_t, std::vector<std::byte>>> result;
    for (const Record &record : records)
        if (record.name == name && record.klass == Internet)
            result.emplace_back(record.type, encodeData(record));
    std::sort(result.begin(), result.end());
    return result;
}

} // namespace

MdnsResponder::MdnsResponder(Timers &timers, MdnsRecords records, std::uint64_t seed,
                             std::function<void(const std::string &)> told)
    : m_timers(timers), m_records(std::move(records)), m_generator(seed), m_told(std::move(told))
{
}

MdnsResponder::~MdnsResponder()
{
    m_timers.cancel(m_timer);
    for (const Timers::Id timer : m_forgetting)
        m_timers.cancel(timer);
    for (Site &site : m_sites) {
        m_timers.cancel(site.timer);
        if (m_state != State::Announced)
            continue;
        Message goodbye;
        goodbye.flags = ResponseFlag | AuthoritativeFlag;
        goodbye.answers = m_records.goodbyes(site.addresses);
        site.link->multicast(encode(goodbye));
    }
}

void MdnsResponder::add(MdnsLink &link, MdnsAddresses addresses)
{
    m_allAddresses.ipv4.insert(m_allAddresses.ipv4.end(), addresses.ipv4.begin(), addresses.ipv4.end());
    m_allAddresses.ipv6.insert(m_allAddresses.ipv6.end(), addresses.ipv6.begin(), addresses.ipv6.end());
    m_sites.push_back({&link, std::move(addresses), {}, Timers::None, {}});
}

void MdnsResponder::start()
{
    if (!m_sites.empty())
        probeAfter(random(0, 250));
}

// ---- names

void MdnsResponder::probeAfter(milliseconds delay)
{
    m_state = State::Probing;
    setTimer(delay, [this] { probe(1); });
}

void MdnsResponder::probe(unsigned count)
{
    for (Site &site : m_sites) {
        Message message;
        message.questions = m_records.probes();
        message.authorities = m_records.unique(site.addresses);
        for (Record &record : message.authorities)
            record.unique = false;
        site.link->multicast(encode(message));
    }
    setTimer(BetweenProbes, [this, count] {
        if (count < Probes)
            probe(count + 1);
        else
            announce(1);
    });
}

void MdnsResponder::announce(unsigned count)
{
    m_state = State::Announced;
    for (Site &site : m_sites)
        multicast(site, m_records.all(site.addresses));
    if (count < Announcements)
        setTimer(BetweenAnnouncements, [this, count] { announce(count + 1); });
}

/// Somebody else has a name that we want to have, or have.
void MdnsResponder::conflict()
{
    ++m_conflicts;
    if (m_state == State::Probing) {
        if (m_names == MaxNames) {
            m_timers.cancel(std::exchange(m_timer, Timers::None));
            m_state = State::Idle;
            m_told("mdns: every name is taken, the instrument is not announced");
            return;
        }
        ++m_names;
        m_records.rename();
        m_told("mdns: the name is taken, trying " + m_records.instance());
    }
    probeAfter(m_conflicts < ManyConflicts ? random(0, 250) : AfterManyConflicts);
}

// ---- what others say

void MdnsResponder::received(MdnsLink &link, std::span<const std::byte> bytes, const MdnsPeer &from)
{
    const auto site = std::find_if(m_sites.begin(), m_sites.end(), [&](const Site &s) { return s.link == &link; });
    Message message;
    if (m_state == State::Idle || site == m_sites.end() || !decode(bytes, message))
        return;
    if ((message.flags & (OpcodeMask | ResponseCodeMask)) != 0)
        return;
    if (message.isResponse()) {
        if (from.port == MulticastPort)
            response(message);
    } else if (m_state == State::Announced) {
        query(*site, message, from);
    } else {
        tiebreak(message);
    }
}

void MdnsResponder::response(const Message &message)
{
    for (const auto *records : {&message.answers, &message.additionals})
        for (const Record &record : *records)
            if (m_records.contradicts(record, m_allAddresses))
                return conflict();
}

/// Two that ask for the same name at the same time: the one with the later data goes on.
void MdnsResponder::tiebreak(const Message &message)
{
    const std::vector<Record> own = m_records.unique(m_allAddresses);
    for (const Question &question : m_records.probes()) {
        const auto theirs = comparable(message.authorities, question.name);
        if (theirs.empty() || !(comparable(own, question.name) < theirs))
            continue;
        // The other end of our own link hears us too, with the addresses of that link alone.
        const bool isOurs = std::any_of(m_sites.begin(), m_sites.end(), [&](const Site &site) {
            return comparable(m_records.unique(site.addresses), question.name) == theirs;
        });
        if (!isOurs)
            return probeAfter(AfterLostTiebreak);
    }
}

// ---- answers

void MdnsResponder::query(Site &site, const Message &message, const MdnsPeer &from)
{
    const bool isLegacy = from.port != MulticastPort;
    std::vector<Record> direct;
    std::vector<Record> forAll;
    for (const Question &question : message.questions) {
        std::vector<Record> answers = m_records.answersTo(question, site.addresses);
        std::erase_if(answers, [&](const Record &record) { return isKnown(record, message.answers); });
        simulator::add(isLegacy || question.unicast ? direct : forAll, answers);
    }
    if (!direct.empty())
        answerDirectly(site, message, std::move(direct), from);
    if (forAll.empty())
        return;
    if (!message.authorities.empty()) {
        // A probe: whoever wants our name is told at once.
        for (const Record &record : forAll)
            site.recent.erase(identityOf(record));
        return multicast(site, std::move(forAll));
    }
    // Others may have answers of this name too, and are not to answer all at once.
    const bool isShared = std::any_of(forAll.begin(), forAll.end(), [](const Record &r) { return !r.unique; });
    simulator::add(site.pending, forAll);
    if (site.timer == Timers::None)
        site.timer = m_timers.after(isShared ? random(20, 120) : milliseconds{0}, [this, &site] {
            site.timer = Timers::None;
            sendPending(site);
        });
}

void MdnsResponder::answerDirectly(Site &site, const Message &query, std::vector<Record> answers,
                                   const MdnsPeer &to) const
{
    Message response;
    response.flags = ResponseFlag | AuthoritativeFlag;
    response.additionals = m_records.additionalTo(answers, site.addresses);
    response.answers = std::move(answers);
    if (to.port != MulticastPort) {
        response.id = query.id;
        response.questions = query.questions;
        for (auto *records : {&response.answers, &response.additionals})
            for (Record &record : *records) {
                record.unique = false;
                record.ttl = std::min(record.ttl, MaxDirectTtl);
            }
    }
    const std::vector<std::byte> bytes = encode(response);
    if (bytes.size() <= MaxMessage)
        site.link->unicast(bytes, to);
}

void MdnsResponder::sendPending(Site &site)
{
    std::vector<Record> answers = std::exchange(site.pending, {});
    if (m_state != State::Announced)
        return;
    std::erase_if(answers, [&](const Record &record) { return site.recent.contains(identityOf(record)); });
    if (!answers.empty())
        multicast(site, std::move(answers));
}

void MdnsResponder::multicast(Site &site, std::vector<Record> answers)
{
    Message response;
    response.flags = ResponseFlag | AuthoritativeFlag;
    response.additionals = m_records.additionalTo(answers, site.addresses);
    response.answers = std::move(answers);
    site.link->multicast(encode(response));
    std::vector<std::vector<std::byte>> sent;
    for (const Record &record : response.answers)
        if (auto [entry, isNew] = site.recent.insert(identityOf(record)); isNew)
            sent.push_back(*entry);
    if (sent.empty())
        return;
    const auto timer = std::make_shared<Timers::Id>(Timers::None);
    *timer = m_timers.after(BetweenSameAnswers, [this, &site, timer, sent = std::move(sent)] {
        m_forgetting.erase(*timer);
        for (const auto &record : sent)
            site.recent.erase(record);
    });
    m_forgetting.insert(*timer);
}

milliseconds MdnsResponder::random(int least, int most)
{
    return milliseconds{std::uniform_int_distribution<int>(least, most)(m_generator)};
}

void MdnsResponder::setTimer(milliseconds delay, std::function<void()> action)
{
    m_timers.cancel(m_timer);
    m_timer = m_timers.after(delay, [this, action = std::move(action)] {
        m_timer = Timers::None;
        action();
    });
}

} // namespace simulator
