#include "wire/Dns.h"

#include <algorithm>
#include <limits>
#include <map>
#include <utility>

namespace wire::dns
{
namespace
{

constexpr std::uint16_t TopBit = 0x8000;
constexpr unsigned PointerMark = 0xC0;
constexpr std::size_t MaxPointer = 0x3FFF;
constexpr std::size_t MaxString = 255;

char lower(char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool same(std::string_view a, std::string_view b)
{
    return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](char x, char y) { return lower(x) == lower(y); });
}

class Encoder
{
public:
    explicit Encoder(bool compresses) : m_compresses(compresses) {}

    void u8(unsigned value) { m_bytes.push_back(static_cast<std::byte>(value)); }
    void u16(std::size_t value)
    {
        m_good = m_good && value <= std::numeric_limits<std::uint16_t>::max();
        u8(value >> 8 & 0xFF);
        u8(value & 0xFF);
    }
    void u32(std::uint32_t value)
    {
        u16(value >> 16);
        u16(value & 0xFFFF);
    }
    void text(std::string_view text)
    {
        const auto bytes = std::as_bytes(std::span(text));
        m_bytes.insert(m_bytes.end(), bytes.begin(), bytes.end());
    }

    void name(const Name &name)
    {
        m_good = m_good && name.valid();
        if (!m_good)
            return;
        const std::vector<std::string> &labels = name.labels();
        for (std::size_t i = 0; i < labels.size(); ++i) {
            std::string rest;
            for (std::size_t j = i; j < labels.size(); ++j) {
                rest += static_cast<char>(labels[j].size());
                rest.append(labels[j]);
            }
            std::transform(rest.begin(), rest.end(), rest.begin(), lower);
            const auto known = m_known.find(rest);
            if (m_compresses && known != m_known.end())
                return u16(std::size_t{PointerMark} << 8 | known->second);
            if (m_bytes.size() <= MaxPointer)
                m_known.emplace(std::move(rest), m_bytes.size());
            u8(static_cast<unsigned>(labels[i].size()));
            text(labels[i]);
        }
        u8(0);
    }

    void question(const Question &question)
    {
        name(question.name);
        u16(question.type);
        u16(question.klass | (question.unicast ? TopBit : 0u));
    }

    void record(const Record &record)
    {
        name(record.name);
        u16(record.type);
        u16(record.klass | (record.unique ? TopBit : 0u));
        u32(record.ttl);
        const std::size_t at = m_bytes.size();
        u16(0);
        data(record);
        const std::size_t length = m_bytes.size() - at - 2;
        m_good = m_good && length <= std::numeric_limits<std::uint16_t>::max();
        m_bytes[at] = static_cast<std::byte>(length >> 8 & 0xFF);
        m_bytes[at + 1] = static_cast<std::byte>(length & 0xFF);
    }

    void data(const Record &record)
    {
        std::visit([this](const auto &data) { write(data); }, record.data);
    }

    std::vector<std::byte> take() { return m_good ? std::move(m_bytes) : std::vector<std::byte>{}; }

private:
    void write(const Unknown &bytes) { m_bytes.insert(m_bytes.end(), bytes.begin(), bytes.end()); }
    void write(const Pointer &pointer) { name(pointer.target); }
    void write(const Service &service)
    {
        u16(service.priority);
        u16(service.weight);
        u16(service.port);
        name(service.target);
    }
    void write(const Text &strings)
    {
        for (const std::string &string : strings.strings) {
            m_good = m_good && string.size() <= MaxString;
            u8(static_cast<unsigned>(string.size() & 0xFF));
            text(string);
        }
        if (strings.strings.empty())
            u8(0); // a TXT record is never empty (RFC 6763, 6.1)
    }
    template <std::size_t Size>
    void write(const std::array<std::uint8_t, Size> &address)
    {
        for (const std::uint8_t byte : address)
            u8(byte);
    }

    const bool m_compresses;
    bool m_good = true;
    std::vector<std::byte> m_bytes;
    std::map<std::string, std::size_t> m_known; ///< where a name, lengths included and in lower case, was written
};

class Decoder
{
public:
    explicit Decoder(std::span<const std::byte> bytes) : m_bytes(bytes), m_end(bytes.size()) {}

    bool good() const { return m_good; }

    std::uint8_t u8()
    {
        m_good = m_good && m_at < m_end;
        return m_good ? std::to_integer<std::uint8_t>(m_bytes[m_at++]) : std::uint8_t{0};
    }
    std::uint16_t u16()
    {
        const unsigned high = u8();
        return static_cast<std::uint16_t>(high << 8 | u8());
    }
    std::uint32_t u32()
    {
        const std::uint32_t high = u16();
        return high << 16 | u16();
    }
    std::string text(std::size_t size)
    {
        m_good = m_good && size <= m_end - m_at;
        if (!m_good)
            return {};
        const char *begin = reinterpret_cast<const char *>(m_bytes.data()) + m_at;
        m_at += size;
        return {begin, size};
    }

    Name name()
    {
        std::vector<std::string> labels;
        std::size_t size = 1;
        std::size_t before = m_at; // a pointer leads further back than everything so far
        std::optional<std::size_t> behind;
        const std::size_t end = m_end;
        while (m_good) {
            const std::uint8_t length = u8();
            if (length == 0)
                break;
            if ((length & PointerMark) == PointerMark) {
                const std::size_t target = (length & ~PointerMark) << 8 | u8();
                if (!behind)
                    behind = m_at;
                m_good = m_good && target < before;
                m_at = before = target;
                m_end = m_bytes.size(); // what a record's data points to lies outside of it
                continue;
            }
            size += length + std::size_t{1};
            m_good = m_good && length <= MaxLabel && size <= MaxName;
            labels.push_back(text(length));
        }
        m_end = end;
        if (behind && m_good)
            m_at = *behind;
        return m_good ? Name(std::move(labels)) : Name();
    }

    Question question()
    {
        Question question;
        question.name = name();
        question.type = u16();
        const std::uint16_t klass = u16();
        question.klass = klass & ~TopBit & 0xFFFF;
        question.unicast = (klass & TopBit) != 0;
        return question;
    }

    Record record()
    {
        Record record;
        record.name = name();
        record.type = u16();
        const std::uint16_t klass = u16();
        record.klass = klass & ~TopBit & 0xFFFF;
        record.unique = (klass & TopBit) != 0;
        record.ttl = u32();
        const std::size_t length = u16();
        m_good = m_good && length <= m_end - m_at;
        if (!m_good)
            return record;
        const std::size_t end = std::exchange(m_end, m_at + length);
        data(record);
        m_good = m_good && m_at == m_end;
        m_end = end;
        return record;
    }

private:
    void data(Record &record)
    {
        switch (record.type) {
        case TypePtr:
            record.data = Pointer{name()};
            break;
        case TypeSrv: {
            Service service;
            service.priority = u16();
            service.weight = u16();
            service.port = u16();
            service.target = name();
            record.data = std::move(service);
            break;
        }
        case TypeTxt: {
            Text strings;
            while (m_good && m_at < m_end)
                if (std::string string = text(u8()); !string.empty())
                    strings.strings.push_back(std::move(string));
            record.data = std::move(strings);
            break;
        }
        case TypeA:
            record.data = address<Ipv4>();
            break;
        case TypeAaaa:
            record.data = address<Ipv6>();
            break;
        default:
            record.data = Unknown(m_bytes.begin() + static_cast<std::ptrdiff_t>(m_at),
                                  m_bytes.begin() + static_cast<std::ptrdiff_t>(m_end));
            m_at = m_end;
        }
    }

    template <typename Address>
    Address address()
    {
        Address address{};
        for (std::uint8_t &byte : address)
            byte = u8();
        return address;
    }

    std::span<const std::byte> m_bytes;
    std::size_t m_at = 0;
    std::size_t m_end; ///< of the message, or of the data of the record being read
    bool m_good = true;
};

} // namespace

Name operator+(std::string_view label, const Name &parent)
{
    std::vector<std::string> labels{std::string(label)};
    labels.insert(labels.end(), parent.m_labels.begin(), parent.m_labels.end());
    return Name(std::move(labels));
}

bool Name::valid() const
{
    std::size_t size = 1;
    for (const std::string &label : m_labels) {
        if (label.empty() || label.size() > MaxLabel)
            return false;
        size += label.size() + 1;
    }
    return size <= MaxName;
}

std::string Name::text() const
{
    std::string result;
    for (const std::string &label : m_labels) {
        if (!result.empty())
            result += '.';
        for (const char c : label) {
            if (c == '.' || c == '\\')
                result += '\\';
            result += c;
        }
    }
    return result;
}

bool operator==(const Name &a, const Name &b)
{
    return std::equal(a.m_labels.begin(), a.m_labels.end(), b.m_labels.begin(), b.m_labels.end(), same);
}

std::optional<std::string_view> Text::value(std::string_view key) const
{
    for (const std::string_view string : strings) {
        const std::size_t equals = std::min(string.find('='), string.size());
        if (equals > 0 && same(string.substr(0, equals), key))
            return string.substr(std::min(equals + 1, string.size()));
    }
    return std::nullopt;
}

std::vector<std::byte> encode(const Message &message)
{
    Encoder encoder(true);
    encoder.u16(message.id);
    encoder.u16(message.flags);
    encoder.u16(message.questions.size());
    encoder.u16(message.answers.size());
    encoder.u16(message.authorities.size());
    encoder.u16(message.additionals.size());
    for (const Question &question : message.questions)
        encoder.question(question);
    for (const auto *records : {&message.answers, &message.authorities, &message.additionals})
        for (const Record &record : *records)
            encoder.record(record);
    return encoder.take();
}

std::vector<std::byte> encodeData(const Record &record)
{
    Encoder encoder(false);
    encoder.data(record);
    return encoder.take();
}

bool decode(std::span<const std::byte> bytes, Message &message)
{
    message = {};
    Decoder decoder(bytes);
    message.id = decoder.u16();
    message.flags = decoder.u16();
    const std::uint16_t questions = decoder.u16();
    const std::array<std::uint16_t, 3> counts = {decoder.u16(), decoder.u16(), decoder.u16()};
    for (std::uint16_t i = 0; i < questions && decoder.good(); ++i)
        message.questions.push_back(decoder.question());
    const std::array sections = {&message.answers, &message.authorities, &message.additionals};
    for (std::size_t section = 0; section < sections.size(); ++section)
        for (std::uint16_t i = 0; i < counts[section] && decoder.good(); ++i)
            sections[section]->push_back(decoder.record());
    if (!decoder.good())
        message = {};
    return decoder.good();
}

} // namespace wire::dns
