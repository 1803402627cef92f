#pragma once

#include "kyvisa/discovery/FoundResource.h"
#include "kyvisa/discovery/LanQuery.h"
#include "wire/Dns.h"

#include <cstdint>
#include <functional>
#include <map>
#include <set>
#include <string>
#include <utility>

namespace kyvisa
{

/// A service of an instrument, as it announces it.
struct Announcement {
    enum class Service { Hislip, Vxi11, RawSocket, Lxi };

    Service service = Service::Hislip;
    std::string address; ///< in numbers
    std::uint16_t port = 0;
    LxiTexts texts;
};

/**
 * One-shot multicast DNS questions (RFC 6762 section 5.1) for the services of RFC 6763 that instruments announce. The
 * questions leave from a port of their own, so every responder answers to this socket alone, and no daemon is in the way.
 *
 * Responders may leave out what they think is known. What is missing of an instance is asked for once more, by name.
 */
class MdnsQuery : public LanQuery
{
public:
    /// Called once for each service of each instance, when its port and its address are known.
    using Found = std::function<void(const Announcement &)>;

    MdnsQuery(std::span<const os::NetworkInterface> interfaces, Found found);

    std::span<const std::chrono::milliseconds> schedule() const override;

protected:
    void askOn(Link &link) override;
    void take(std::span<const std::byte> answer, const std::string &from, Link &link) override;

private:
    /// Instances of one service type, known by their whole names.
    struct Instance {
        Announcement::Service service;
        wire::dns::Name name;
        bool reported = false;
        bool askedFor = false;
        bool addressAskedFor = false;
    };

    /// What was heard on one interface. Names mean something on their own network only.
    struct Heard {
        std::map<std::string, Instance> instances; ///< by name
        std::map<std::string, wire::dns::Service> services;
        std::map<std::string, wire::dns::Text> texts;
        std::map<std::string, std::set<std::string>> addresses; ///< by host name
    };

    static void note(const wire::dns::Record &record, Heard &heard);
    void report(const std::string &from, Heard &heard, Link &link);
    void send(Link &link, std::vector<wire::dns::Question> questions);

    const Found m_found;
    std::map<const Link *, Heard> m_heard;
};

} // namespace kyvisa
