#include "Xdr.h"

namespace wire::xdr
{
namespace
{

void store(std::byte *to, std::uint32_t value)
{
    to[0] = static_cast<std::byte>(value >> 24);
    to[1] = static_cast<std::byte>(value >> 16);
    to[2] = static_cast<std::byte>(value >> 8);
    to[3] = static_cast<std::byte>(value);
}

} // namespace

void Writer::u32(std::uint32_t value)
{
    std::byte bytes[4];
    store(bytes, value);
    m_buffer.insert(m_buffer.end(), bytes, bytes + 4);
}

void Writer::u32s(std::initializer_list<std::uint32_t> values)
{
    std::size_t position = m_buffer.size();
    m_buffer.resize(position + 4 * values.size());
    for (const std::uint32_t value : values) {
        store(&m_buffer[position], value);
        position += 4;
    }
}

void Writer::opaque(Bytes data)
{
    opaqueHead(data.size());
    m_buffer.insert(m_buffer.end(), data.begin(), data.end());
    m_buffer.insert(m_buffer.end(), padding(data.size()), std::byte{0});
}

void Writer::patch(std::size_t position, std::uint32_t value)
{
    store(&m_buffer[position], value);
}

bool Reader::take(std::size_t count, Bytes &taken)
{
    if (m_rest.size() < count) {
        m_ok = false;
        m_rest = {};
        return false;
    }
    taken = m_rest.first(count);
    m_rest = m_rest.subspan(count);
    return true;
}

std::uint32_t Reader::u32()
{
    Bytes bytes;
    if (!take(4, bytes))
        return 0;
    return std::to_integer<std::uint32_t>(bytes[0]) << 24 | std::to_integer<std::uint32_t>(bytes[1]) << 16 |
           std::to_integer<std::uint32_t>(bytes[2]) << 8 | std::to_integer<std::uint32_t>(bytes[3]);
}

Bytes Reader::opaque(std::uint32_t limit)
{
    const std::size_t length = u32();
    Bytes data;
    Bytes ignored;
    if (length > limit) {
        m_ok = false;
        m_rest = {};
        return {};
    }
    if (!take(length, data) || !take(padding(length), ignored))
        return {};
    return data;
}

std::string_view Reader::string(std::uint32_t limit)
{
    const Bytes data = opaque(limit);
    return {reinterpret_cast<const char *>(data.data()), data.size()};
}

} // namespace wire::xdr
