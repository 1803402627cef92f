#pragma once

#include "wire/Dns.h"

#include <cstdint>
#include <string>
#include <vector>

namespace simulator
{

struct Identification;

/// A service that is announced: "_hislip", on its port.
struct MdnsService {
    std::string type;
    std::uint16_t port;
};

/// The addresses by which the instrument is reached on one link.
struct MdnsAddresses {
    std::vector<wire::dns::Ipv4> ipv4;
    std::vector<wire::dns::Ipv6> ipv6;
};

/**
 * The records that announce the instrument (RFC 6763): all services have one instance name, "<Manufacturer> <Model> - <SerialNumber>", and the host a name made of
 * model and serial number. When somebody else has one of them already, both get a number: "... (2)" and "...-2".
 */
class MdnsRecords
{
public:
    MdnsRecords(const Identification &identity, std::vector<MdnsService> services);

    /// The next names.
    void rename();
    /// At most 63 bytes, in UTF-8.
    const std::string &instance() const { return m_instance; }
    const wire::dns::Name &host() const { return m_host; }

    /// Everything there is, as it is announced.
    std::vector<wire::dns::Record> all(const MdnsAddresses &addresses) const;
    /// The same with no time to live, without what other instruments say in the same words.
    std::vector<wire::dns::Record> goodbyes(const MdnsAddresses &addresses) const;
    /// Those of them whose names nobody else may have.
    std::vector<wire::dns::Record> unique(const MdnsAddresses &addresses) const;
    /// One question for each name that is to be ours alone.
    std::vector<wire::dns::Question> probes() const;

    std::vector<wire::dns::Record> answersTo(const wire::dns::Question &question, const MdnsAddresses &addresses) const;
    /// What whoever gets these answers will ask next.
    std::vector<wire::dns::Record> additionalTo(const std::vector<wire::dns::Record> &answers,
                                                const MdnsAddresses &addresses) const;

    /// Whether it says about a name of ours what we do not say ourselves. @p addresses: those of all links.
    bool contradicts(const wire::dns::Record &record, const MdnsAddresses &addresses) const;

private:
    void makeNames();

    const std::string m_fullName;
    const std::string m_hostLabel;
    const std::vector<std::string> m_text;
    const std::vector<MdnsService> m_services;
    unsigned m_number = 1;
    std::string m_instance;
    wire::dns::Name m_host;
};

} // namespace simulator
