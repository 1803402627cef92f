// Answers to the questions of discovery, each behind its length in two bytes. Whatever they say, each host that is told of
// has an address, and each resource that is made of it can be opened.
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/discovery/HostCollection.h"
#include "kyvisa/discovery/MdnsQuery.h"
#include "kyvisa/include/visa.h"
#include "tests/fuzz/Promise.h"

#include <arpa/inet.h>

#include <algorithm>
#include <cstdint>

using namespace kyvisa;

namespace
{

/// The query without its sockets: what it sends goes nowhere, and the answers are handed to it.
class Listener : public MdnsQuery
{
public:
    explicit Listener(Found found) : MdnsQuery({}, std::move(found))
    {
        // A socket that has been moved from sends nothing.
        const os::DatagramSocket gone(std::move(m_link.socket));
    }
    void hear(std::span<const std::byte> answer) { take(answer, "10.0.0.9", m_link); }

private:
    Link m_link{{}, os::DatagramSocket({})};
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    FoundHosts hosts;
    Listener listener([&](const Announcement &announcement) {
        in_addr address{};
        promise(::inet_pton(AF_INET, announcement.address.c_str(), &address) == 1);
        FoundHost &host = hosts[announcement.address];
        if (announcement.service == Announcement::Service::Hislip)
            host.hislipPort = announcement.port;
        if (announcement.service == Announcement::Service::RawSocket)
            host.socketPort = announcement.port;
        fillIn(host.announced, announcement.texts);
    });
    std::span<const std::byte> rest = std::as_bytes(std::span(data, size));
    while (rest.size() > 2) {
        const std::size_t length = std::to_integer<std::size_t>(rest[0]) << 8 | std::to_integer<std::size_t>(rest[1]);
        rest = rest.subspan(2);
        listener.hear(rest.first(std::min(length, rest.size())));
        rest = rest.subspan(std::min(length, rest.size()));
    }
    for (const FoundResource &resource : resourcesOf(hosts)) {
        ResourceName name;
        promise(parseResourceName(resource.name, name) == VI_SUCCESS);
        promise(name.canonical() == resource.name);
    }
    return 0;
}
