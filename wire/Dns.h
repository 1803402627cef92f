#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

/**
 * DNS messages (RFC 1035) as multicast DNS (RFC 6762) and service discovery (RFC 6763) use them.
 *
 *     header:    id | flags | number of questions, answers, authorities, additionals      6 u16
 *     question:  name | type u16 | class u16, top bit: answer me alone (QU)
 *     record:    name | type u16 | class u16, top bit: forget other ones | time to live u32 | length u16 | data
 *     name:      labels, each with its length in a byte (at most 63), then 0; or, anywhere, a pointer to an earlier one
 */
namespace wire::dns
{

constexpr std::uint16_t MulticastPort = 5353;
constexpr std::size_t MaxLabel = 63;
constexpr std::size_t MaxName = 255;     ///< bytes of a name, lengths included
constexpr std::size_t MaxMessage = 9000; ///< of multicast DNS, headers of IP and UDP included

constexpr std::uint16_t Internet = 1; ///< the class
constexpr std::uint16_t AnyClass = 255;

constexpr std::uint16_t ResponseFlag = 0x8000;
constexpr std::uint16_t OpcodeMask = 0x7800;
constexpr std::uint16_t AuthoritativeFlag = 0x0400;
constexpr std::uint16_t TruncatedFlag = 0x0200; ///< more known answers follow
constexpr std::uint16_t ResponseCodeMask = 0x000F;

enum Type : std::uint16_t {
    TypeA = 1,
    TypePtr = 12,
    TypeTxt = 16,
    TypeAaaa = 28,
    TypeSrv = 33,
    TypeAny = 255,
};

/// A name as its labels, which may hold any bytes. Names are the same whatever the case of their ASCII letters.
class Name
{
public:
    Name() = default;
    Name(std::initializer_list<std::string_view> labels) : m_labels(labels.begin(), labels.end()) {}
    explicit Name(std::vector<std::string> labels) : m_labels(std::move(labels)) {}

    const std::vector<std::string> &labels() const { return m_labels; }
    /// This name below another: "box" + "_http._tcp.local".
    friend Name operator+(std::string_view label, const Name &parent);
    /// Whether it can be written: no label empty or too long, and the whole not either.
    bool valid() const;
    /// Readable, "box._http._tcp.local"; a dot or backslash inside a label with a backslash before it.
    std::string text() const;

    friend bool operator==(const Name &a, const Name &b);

private:
    std::vector<std::string> m_labels;
};

struct Question {
    Name name;
    std::uint16_t type = TypePtr;
    std::uint16_t klass = Internet;
    bool unicast = false; ///< QU

    bool operator==(const Question &) const = default;
};

struct Pointer {
    Name target;
    bool operator==(const Pointer &) const = default;
};

struct Service {
    std::uint16_t priority = 0;
    std::uint16_t weight = 0;
    std::uint16_t port = 0;
    Name target;
    bool operator==(const Service &) const = default;
};

/// The strings of a TXT record, each "key=value", "key=" or "key".
struct Text {
    std::vector<std::string> strings;

    /// The value of a key, whatever its case; of several the first (RFC 6763, 6.4). None when the key is not there.
    std::optional<std::string_view> value(std::string_view key) const;
    bool operator==(const Text &) const = default;
};

using Ipv4 = std::array<std::uint8_t, 4>;
using Ipv6 = std::array<std::uint8_t, 16>;
using Unknown = std::vector<std::byte>; ///< of a type that is none of these

struct Record {
    Name name;
    std::uint16_t type = TypePtr; ///< fits the data
    std::uint16_t klass = Internet;
    bool unique = false;   ///< cache-flush: this name has no other records of the type
    std::uint32_t ttl = 0; ///< seconds; 0 says goodbye
    std::variant<Unknown, Pointer, Service, Text, Ipv4, Ipv6> data;

    bool operator==(const Record &) const = default;
};

struct Message {
    std::uint16_t id = 0;
    std::uint16_t flags = 0;
    std::vector<Question> questions;
    std::vector<Record> answers;
    std::vector<Record> authorities;
    std::vector<Record> additionals;

    bool isResponse() const { return (flags & ResponseFlag) != 0; }
    bool operator==(const Message &) const = default;
};

/// Names are compressed. Empty when something cannot be written: a name that is not valid, a string of more than 255 bytes, more than 65535 of anything.
std::vector<std::byte> encode(const Message &message);

/// A record's data without compression, as two hosts compare it (RFC 6762, 8.2).
std::vector<std::byte> encodeData(const Record &record);

/// False when the bytes are not one whole message; bytes behind it are none of it. Nothing is believed: lengths are held against what is there, pointers lead back
/// and never forward, and what is decoded is at most 256 times as long as what came.
bool decode(std::span<const std::byte> bytes, Message &message);

} // namespace wire::dns
