#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <span>
#include <string_view>
#include <vector>

/**
 * XDR (RFC 4506), as far as ONC RPC and VXI-11 need it. Every item fills a multiple of four bytes, big-endian; variable-length
 * data is its length, the bytes, and zero to three zero bytes.
 */
namespace wire::xdr
{

using Bytes = std::span<const std::byte>;

/// Zero bytes that follow variable-length data of @p length bytes.
constexpr std::size_t padding(std::size_t length)
{
    return (4 - length % 4) % 4;
}

/**
 * Appends to the caller's buffer. Clear and reuse one buffer and a small message costs no allocation.
 *
 * Large data need not pass through it: write opaqueHead(), then send the data from where it is, then the padding.
 */
class Writer
{
public:
    explicit Writer(std::vector<std::byte> &buffer) : m_buffer(buffer) {}

    void u32(std::uint32_t value);
    /// The same as u32() for each, in one go.
    void u32s(std::initializer_list<std::uint32_t> values);
    void i32(std::int32_t value) { u32(static_cast<std::uint32_t>(value)); }
    void boolean(bool value) { u32(value ? 1 : 0); }
    void opaque(Bytes data);
    void string(std::string_view text) { opaque(std::as_bytes(std::span(text))); }
    void opaqueHead(std::size_t length) { u32(static_cast<std::uint32_t>(length)); }

    std::size_t position() const { return m_buffer.size(); }
    /// Overwrites four bytes that were written before.
    void patch(std::size_t position, std::uint32_t value);

private:
    std::vector<std::byte> &m_buffer;
};

/**
 * Reads items one after the other. The first one that the input does not hold entirely makes ok() false for good; from then on every
 * item is zero or empty, so that a decoder reads all its items and asks once. Data and strings are views of the input: nothing is
 * allocated, whatever a length field claims.
 *
 * Lenient where receivers are: any non-zero boolean is true, and the values of padding bytes do not matter.
 */
class Reader
{
public:
    explicit Reader(Bytes input) : m_rest(input) {}

    std::uint32_t u32();
    std::int32_t i32() { return static_cast<std::int32_t>(u32()); }
    bool boolean() { return u32() != 0; }
    /// Variable-length data of at most @p limit bytes.
    Bytes opaque(std::uint32_t limit = UINT32_MAX);
    std::string_view string(std::uint32_t limit = UINT32_MAX);

    bool ok() const { return m_ok; }
    /// What has not been read yet; nothing after a failure.
    Bytes rest() const { return m_rest; }

private:
    bool take(std::size_t count, Bytes &taken);

    Bytes m_rest;
    bool m_ok = true;
};

} // namespace wire::xdr
