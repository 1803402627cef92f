#include "kyvisa/discovery/MdnsQuery.h"

#include <arpa/inet.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <optional>

namespace kyvisa
{

using namespace wire::dns;

namespace
{

constexpr std::chrono::milliseconds Schedule[] = {std::chrono::milliseconds(0), std::chrono::milliseconds(250),
                                                  std::chrono::milliseconds(1000)};
constexpr std::size_t MostEntries = 4096;
constexpr std::uint32_t Group = 0xE00000FB; // 224.0.0.251

const std::pair<Name, Announcement::Service> Types[] = {
    {{"_hislip", "_tcp", "local"}, Announcement::Service::Hislip},
    {{"_vxi-11", "_tcp", "local"}, Announcement::Service::Vxi11},
    {{"_scpi-raw", "_tcp", "local"}, Announcement::Service::RawSocket},
    {{"_lxi", "_tcp", "local"}, Announcement::Service::Lxi},
};

/// Names are the same whatever the case of their letters, so this is what they are known by.
std::string keyOf(const Name &name)
{
    std::string key = name.text();
    std::transform(key.begin(), key.end(), key.begin(), [](unsigned char c) { return std::tolower(c); });
    return key;
}

std::string textOf(const Ipv4 &address)
{
    std::array<char, INET_ADDRSTRLEN> text{};
    ::inet_ntop(AF_INET, address.data(), text.data(), text.size());
    return text.data();
}

std::string valueOf(const Text &text, std::string_view key)
{
    return std::string(text.value(key).value_or(""));
}

/// Remembers the first value of a key, and of a bounded number of keys.
template <typename Value>
void keep(std::map<std::string, Value> &entries, std::string key, Value value)
{
    if (entries.size() < MostEntries)
        entries.emplace(std::move(key), std::move(value));
}

} // namespace

MdnsQuery::MdnsQuery(std::span<const os::NetworkInterface> interfaces, Found found) : m_found(std::move(found))
{
    for (const os::NetworkInterface &interface : interfaces)
        if (interface.canMulticast)
            open(interface);
}

std::span<const std::chrono::milliseconds> MdnsQuery::schedule() const
{
    return Schedule;
}

void MdnsQuery::askOn(Link &link)
{
    std::vector<Question> questions;
    for (const auto &[type, service] : Types)
        questions.push_back({type, TypePtr, Internet, true});
    send(link, std::move(questions));
}

void MdnsQuery::send(Link &link, std::vector<Question> questions)
{
    Message message;
    message.questions = std::move(questions);
    link.socket.send(encode(message), {htonl(Group)}, MulticastPort);
}

void MdnsQuery::take(std::span<const std::byte> answer, const std::string &from, Link &link)
{
    Message message;
    if (!decode(answer, message) || !message.isResponse() || (message.flags & ResponseCodeMask) != 0)
        return;
    for (const auto *section : {&message.answers, &message.authorities, &message.additionals})
        for (const Record &record : *section)
            if (record.ttl != 0)
                note(record, m_heard[&link]);
    report(from, m_heard[&link], link);
}

void MdnsQuery::note(const Record &record, Heard &heard)
{
    if (const auto *pointer = std::get_if<Pointer>(&record.data)) {
        const auto *type = std::find_if(std::begin(Types), std::end(Types),
                                        [&](const auto &entry) { return entry.first == record.name; });
        if (type != std::end(Types))
            keep(heard.instances, keyOf(pointer->target), Instance{type->second, pointer->target});
    } else if (const auto *service = std::get_if<Service>(&record.data)) {
        // Port 0 says that the service is not there (RFC 6763 section 8: its name alone is taken).
        if (service->port == 0)
            return;
        keep(heard.services, keyOf(record.name), *service);
    } else if (const auto *text = std::get_if<Text>(&record.data)) {
        keep(heard.texts, keyOf(record.name), *text);
    } else if (const auto *address = std::get_if<Ipv4>(&record.data)) {
        const std::string host = keyOf(record.name);
        keep(heard.addresses, host, {});
        if (const auto known = heard.addresses.find(host); known != heard.addresses.end() && known->second.size() < 16)
            known->second.insert(textOf(*address));
    }
}

/// @param from of a host with several addresses, the one that it answers from is the one to talk to.
void MdnsQuery::report(const std::string &from, Heard &heard, Link &link)
{
    std::vector<Question> missing;
    for (auto &[key, instance] : heard.instances) {
        if (instance.reported)
            continue;
        const auto service = heard.services.find(key);
        if (service == heard.services.end()) {
            if (!std::exchange(instance.askedFor, true)) {
                missing.push_back({instance.name, TypeSrv, Internet, true});
                missing.push_back({instance.name, TypeTxt, Internet, true});
            }
            continue;
        }
        const auto addresses = heard.addresses.find(keyOf(service->second.target));
        if (addresses == heard.addresses.end() || addresses->second.empty()) {
            if (!std::exchange(instance.addressAskedFor, true))
                missing.push_back({service->second.target, TypeA, Internet, true});
            continue;
        }
        instance.reported = true;
        Announcement announcement{instance.service, {}, service->second.port, {}};
        announcement.address = addresses->second.contains(from) ? from : *addresses->second.begin();
        if (const auto text = heard.texts.find(key); text != heard.texts.end())
            announcement.texts = {valueOf(text->second, "Manufacturer"),
                                  valueOf(text->second, "Model"),
                                  valueOf(text->second, "SerialNumber"),
                                  valueOf(text->second, "FirmwareVersion"),
                                  {},
                                  {}};
        announcement.texts.hostName = service->second.target.text();
        m_found(announcement);
    }
    if (!missing.empty())
        send(link, std::move(missing));
}

} // namespace kyvisa
