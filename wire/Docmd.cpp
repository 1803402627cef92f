#include "wire/Docmd.h"

#include <limits>

namespace wire::vxi11
{
namespace
{

template <typename Number>
void append(std::vector<std::byte> &data, Number value, bool networkOrder)
{
    constexpr int Bits = std::numeric_limits<Number>::digits;
    for (int shift = 0; shift < Bits; shift += 8)
        data.push_back(static_cast<std::byte>(value >> (networkOrder ? Bits - 8 - shift : shift)));
}

template <typename Number>
bool take(const DocmdCall &call, Number &value)
{
    if (call.data.size() != sizeof(Number) || call.dataSize != static_cast<std::int32_t>(sizeof(Number)))
        return false;
    std::uint32_t number = 0;
    for (std::size_t i = 0; i < sizeof(Number); ++i) {
        const std::size_t at = call.networkOrder ? i : sizeof(Number) - 1 - i;
        number = number << 8 | std::to_integer<std::uint32_t>(call.data[at]);
    }
    value = static_cast<Number>(number);
    return true;
}

} // namespace

void appendNumber(std::vector<std::byte> &data, std::uint16_t value, bool networkOrder)
{
    append(data, value, networkOrder);
}

void appendNumber(std::vector<std::byte> &data, std::uint32_t value, bool networkOrder)
{
    append(data, value, networkOrder);
}

bool takeNumber(const DocmdCall &call, std::uint16_t &value)
{
    return take(call, value);
}

bool takeNumber(const DocmdCall &call, std::uint32_t &value)
{
    return take(call, value);
}

bool takeBytes(const DocmdCall &call, xdr::Bytes &bytes)
{
    if (call.data.size() > MaxBusCommands || call.dataSize != 1)
        return false;
    bytes = call.data;
    return true;
}

} // namespace wire::vxi11
