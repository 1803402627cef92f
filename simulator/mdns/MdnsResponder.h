#pragma once

#include "simulator/instrument/Timers.h"
#include "simulator/mdns/MdnsRecords.h"

#include <sys/socket.h>

#include <cstddef>
#include <cstdint>
#include <functional>
#include <list>
#include <random>
#include <set>
#include <span>
#include <string>
#include <vector>

namespace simulator
{

/// Who sent a datagram.
struct MdnsPeer {
    sockaddr_storage address{};
    socklen_t length = 0;
    std::uint16_t port =
        0; ///< another than 5353: one that knows no multicast DNS and is answered directly (RFC 6762, 6.7)
};

/// A network on which the instrument is announced.
class MdnsLink
{
public:
    virtual void multicast(std::span<const std::byte> message) = 0;
    virtual void unicast(std::span<const std::byte> message, const MdnsPeer &to) = 0;

protected:
    ~MdnsLink() = default;
};

/**
 * Announces the instrument by multicast DNS (RFC 6762): asks three times whether anybody has its names, takes others when somebody does, announces itself twice, then
 * answers questions, and says goodbye at the end. It knows no sockets; links send for it and hand in what they receive.
 *
 * Only one name is tried at a time, at most MaxNames in all: on a link where somebody claims every name the instrument stays unannounced, and its
 * services go on without.
 */
class MdnsResponder
{
public:
    static constexpr unsigned MaxNames = 50;

    /// @p told hears what the user should know: another name, or none.
    MdnsResponder(Timers &timers, MdnsRecords records, std::uint64_t seed,
                  std::function<void(const std::string &)> told);
    /// Says goodbye.
    ~MdnsResponder();
    MdnsResponder(const MdnsResponder &) = delete;
    MdnsResponder &operator=(const MdnsResponder &) = delete;

    const std::string &instance() const { return m_records.instance(); }
    /// Before start(). The link must outlive the responder.
    void add(MdnsLink &link, MdnsAddresses addresses);
    void start();
    void received(MdnsLink &link, std::span<const std::byte> bytes, const MdnsPeer &from);

private:
    enum class State : std::uint8_t { Idle, Probing, Announced };

    struct Site {
        MdnsLink *link;
        MdnsAddresses addresses;
        std::vector<wire::dns::Record> pending; ///< answers that wait for others to join them
        Timers::Id timer = Timers::None;
        std::set<std::vector<std::byte>> recent; ///< records that were multicast within the last second
    };

    void probeAfter(std::chrono::milliseconds delay);
    void probe(unsigned count);
    void announce(unsigned count);
    void response(const wire::dns::Message &message);
    void tiebreak(const wire::dns::Message &message);
    void query(Site &site, const wire::dns::Message &message, const MdnsPeer &from);
    void answerDirectly(Site &site, const wire::dns::Message &query, std::vector<wire::dns::Record> answers,
                        const MdnsPeer &to) const;
    void sendPending(Site &site);
    void multicast(Site &site, std::vector<wire::dns::Record> answers);
    void conflict();
    std::chrono::milliseconds random(int least, int most);
    void setTimer(std::chrono::milliseconds delay, std::function<void()> action);

    Timers &m_timers;
    MdnsRecords m_records;
    std::mt19937_64 m_generator;
    const std::function<void(const std::string &)> m_told;
    std::list<Site> m_sites;
    MdnsAddresses m_allAddresses;
    State m_state = State::Idle;
    Timers::Id m_timer = Timers::None;
    unsigned m_names = 1;
    unsigned m_conflicts = 0;
    std::set<Timers::Id> m_forgetting; ///< timers that end "recent"
};

} // namespace simulator
