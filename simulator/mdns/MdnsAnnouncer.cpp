#include "simulator/mdns/MdnsAnnouncer.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <net/if.h>
#include <netinet/in.h>

#include <cstring>
#include <map>
#include <random>
#include <system_error>
#include <utility>

namespace simulator
{
namespace
{

/// What this machine has of what a listen address names.
struct Found {
    MdnsInterface interface;
    MdnsAddresses addresses;
    bool optional = true; ///< not to be announced there is no news
};

using FoundByInterface = std::map<std::pair<unsigned, bool>, Found>;

struct Freed {
    void operator()(ifaddrs *list) const { ::freeifaddrs(list); }
};

std::string textOf(const sockaddr &address)
{
    std::array<char, INET6_ADDRSTRLEN> text{};
    const void *bytes = address.sa_family == AF_INET6
                            ? static_cast<const void *>(&reinterpret_cast<const sockaddr_in6 &>(address).sin6_addr)
                            : &reinterpret_cast<const sockaddr_in &>(address).sin_addr;
    ::inet_ntop(address.sa_family, bytes, text.data(), text.size());
    return text.data();
}

/// Another spelling of an IPv6 address names the same.
bool sameAddress(const std::string &a, const std::string &b)
{
    in6_addr left{};
    in6_addr right{};
    const int family = a.find(':') == a.npos ? AF_INET : AF_INET6;
    return ::inet_pton(family, a.c_str(), &left) == 1 && ::inet_pton(family, b.c_str(), &right) == 1 &&
           std::memcmp(&left, &right, sizeof left) == 0;
}

void add(MdnsAddresses &to, const sockaddr &address)
{
    if (address.sa_family == AF_INET) {
        wire::dns::Ipv4 bytes;
        std::memcpy(bytes.data(), &reinterpret_cast<const sockaddr_in &>(address).sin_addr, bytes.size());
        to.ipv4.push_back(bytes);
    } else {
        wire::dns::Ipv6 bytes;
        std::memcpy(bytes.data(), &reinterpret_cast<const sockaddr_in6 &>(address).sin6_addr, bytes.size());
        to.ipv6.push_back(bytes);
    }
}

/// Interfaces that are up and have one of the addresses, each once for each family.
FoundByInterface find(const std::vector<ListenAddress> &wanted)
{
    FoundByInterface found;
    ifaddrs *list = nullptr;
    if (::getifaddrs(&list) != 0)
        return found;
    const std::unique_ptr<ifaddrs, Freed> owner(list);
    for (const ifaddrs *entry = list; entry != nullptr; entry = entry->ifa_next) {
        if (entry->ifa_addr == nullptr || (entry->ifa_flags & IFF_UP) == 0)
            continue;
        const int family = entry->ifa_addr->sa_family;
        if (family != AF_INET && family != AF_INET6)
            continue;
        const std::string text = textOf(*entry->ifa_addr);
        for (const ListenAddress &address : wanted) {
            const bool any = address.text == (family == AF_INET ? "0.0.0.0" : "::");
            if (!any && !(address.isIpv6() == (family == AF_INET6) && sameAddress(address.text, text)))
                continue;
            const unsigned index = ::if_nametoindex(entry->ifa_name);
            Found &at = found[{index, family == AF_INET6}];
            at.interface = {index, entry->ifa_name, family == AF_INET6};
            // Where all interfaces are meant, one that knows no multicast is left out in silence.
            at.optional = at.optional && (address.optional || any);
            add(at.addresses, *entry->ifa_addr);
            break;
        }
    }
    return found;
}

} // namespace

MdnsAnnouncer::MdnsAnnouncer(EventLoop &loop, const std::vector<ListenAddress> &addresses, MdnsRecords records,
                             std::function<void(const std::string &)> told)
    : m_responder(loop, std::move(records), std::random_device{}(), std::move(told))
{
    const FoundByInterface found = find(addresses);
    for (const auto &[key, at] : found) {
        try {
            m_sockets.push_back(std::make_unique<MdnsSocket>(
                loop, at.interface, [this](MdnsSocket &socket, std::span<const std::byte> bytes, const MdnsPeer &from) {
                    m_responder.received(socket, bytes, from);
                }));
        } catch (const std::system_error &error) {
            if (!at.optional)
                m_notes.push_back("mdns: cannot announce on " + at.interface.name + ": " + error.code().message());
            continue;
        }
        // Both families of an interface lead to the same instrument, and both tell all its addresses.
        MdnsAddresses both = at.addresses;
        if (const auto other = found.find({key.first, !key.second}); other != found.end()) {
            both.ipv4.insert(both.ipv4.end(), other->second.addresses.ipv4.begin(), other->second.addresses.ipv4.end());
            both.ipv6.insert(both.ipv6.end(), other->second.addresses.ipv6.begin(), other->second.addresses.ipv6.end());
        }
        m_responder.add(*m_sockets.back(), std::move(both));
    }
    if (m_sockets.empty() && m_notes.empty())
        m_notes.emplace_back("mdns: no interface has an address that is listened on");
    m_responder.start();
}

} // namespace simulator
