#include "simulator/mdns/MdnsRecords.h"

#include "simulator/instrument/Instrument.h"

#include <algorithm>

namespace simulator
{

using namespace wire::dns;

namespace
{

// RFC 6762, 10: two minutes for what depends on a host's name or address, 75 minutes for the rest.
constexpr std::uint32_t HostTtl = 120;
constexpr std::uint32_t OtherTtl = 4500;

const Name Enumeration = {"_services", "_dns-sd", "_udp", "local"};

Name typeName(const MdnsService &service)
{
    return {service.type, "_tcp", "local"};
}

/// The first @p size bytes, without half a UTF-8 character at the end.
std::string cut(std::string text, std::size_t size)
{
    if (text.size() <= size)
        return text;
    while (size > 0 && (static_cast<unsigned char>(text[size]) & 0xC0) == 0x80)
        --size;
    text.resize(size);
    return text;
}

/// Letters, digits and hyphens, as a host's name has them.
std::string hostLabel(const std::string &text)
{
    std::string label;
    for (const char c : text) {
        const bool upper = c >= 'A' && c <= 'Z';
        if (upper || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9'))
            label += upper ? static_cast<char>(c - 'A' + 'a') : c;
        else if (!label.empty() && label.back() != '-')
            label += '-';
    }
    while (label.ends_with('-'))
        label.pop_back();
    return label.empty() ? "instrument" : label;
}

std::vector<std::string> textOf(const Identification &identity)
{
    std::vector<std::string> strings = {"txtvers=1", "Manufacturer=" + identity.manufacturer, "Model=" + identity.model,
                                        "SerialNumber=" + identity.serial, "FirmwareVersion=" + identity.firmware};
    for (std::string &string : strings)
        string = cut(string, 255);
    return strings;
}

bool asks(const Question &question, const Record &record)
{
    return (question.type == TypeAny || question.type == record.type) &&
           (question.klass == Internet || question.klass == AnyClass) && question.name == record.name;
}

} // namespace

MdnsRecords::MdnsRecords(const Identification &identity, std::vector<MdnsService> services)
    : m_fullName(identity.manufacturer + " " + identity.model + " - " + identity.serial),
      m_hostLabel(hostLabel(identity.model + "-" + identity.serial)), m_text(textOf(identity)),
      m_services(std::move(services))
{
    makeNames();
}

void MdnsRecords::rename()
{
    ++m_number;
    makeNames();
}

void MdnsRecords::makeNames()
{
    const std::string suffix = m_number == 1 ? std::string() : " (" + std::to_string(m_number) + ")";
    const std::string hostSuffix = m_number == 1 ? std::string() : "-" + std::to_string(m_number);
    m_instance = cut(m_fullName, MaxLabel - suffix.size()) + suffix;
    m_host = {cut(m_hostLabel, MaxLabel - hostSuffix.size()) + hostSuffix, "local"};
}

std::vector<Record> MdnsRecords::all(const MdnsAddresses &addresses) const
{
    std::vector<Record> records;
    for (const MdnsService &service : m_services) {
        const Name type = typeName(service);
        records.push_back({Enumeration, TypePtr, Internet, false, OtherTtl, Pointer{type}});
        records.push_back({type, TypePtr, Internet, false, OtherTtl, Pointer{m_instance + type}});
    }
    const std::vector<Record> own = unique(addresses);
    records.insert(records.end(), own.begin(), own.end());
    return records;
}

std::vector<Record> MdnsRecords::goodbyes(const MdnsAddresses &addresses) const
{
    std::vector<Record> records = all(addresses);
    std::erase_if(records, [](const Record &record) { return record.name == Enumeration; });
    for (Record &record : records)
        record.ttl = 0;
    return records;
}

std::vector<Record> MdnsRecords::unique(const MdnsAddresses &addresses) const
{
    std::vector<Record> records;
    for (const MdnsService &service : m_services) {
        const Name instance = m_instance + typeName(service);
        records.push_back({instance, TypeSrv, Internet, true, HostTtl, Service{0, 0, service.port, m_host}});
        records.push_back({instance, TypeTxt, Internet, true, OtherTtl, Text{m_text}});
    }
    for (const Ipv4 &address : addresses.ipv4)
        records.push_back({m_host, TypeA, Internet, true, HostTtl, address});
    for (const Ipv6 &address : addresses.ipv6)
        records.push_back({m_host, TypeAaaa, Internet, true, HostTtl, address});
    return records;
}

std::vector<Question> MdnsRecords::probes() const
{
    std::vector<Question> questions;
    for (const MdnsService &service : m_services)
        questions.push_back({m_instance + typeName(service), TypeAny, Internet, false});
    questions.push_back({m_host, TypeAny, Internet, false});
    return questions;
}

std::vector<Record> MdnsRecords::answersTo(const Question &question, const MdnsAddresses &addresses) const
{
    std::vector<Record> answers = all(addresses);
    std::erase_if(answers, [&](const Record &record) { return !asks(question, record); });
    return answers;
}

std::vector<Record> MdnsRecords::additionalTo(const std::vector<Record> &answers, const MdnsAddresses &addresses) const
{
    std::vector<Record> additional;
    for (const Record &record : unique(addresses)) {
        const bool helps = std::any_of(answers.begin(), answers.end(), [&](const Record &answer) {
            if (const auto *pointer = std::get_if<Pointer>(&answer.data))
                return pointer->target == record.name ||
                       (record.name == m_host && !(answer.name == Enumeration)); // the SRV beside it leads there
            return answer.type == TypeSrv && record.name == m_host;
        });
        if (helps && std::find(answers.begin(), answers.end(), record) == answers.end())
            additional.push_back(record);
    }
    return additional;
}

bool MdnsRecords::contradicts(const Record &record, const MdnsAddresses &addresses) const
{
    if (record.ttl == 0 || record.klass != Internet)
        return false;
    bool ours = false;
    for (const Record &own : unique(addresses)) {
        if (!(own.name == record.name) || own.type != record.type)
            continue;
        if (own.data == record.data)
            return false;
        ours = true;
    }
    return ours;
}

} // namespace simulator
