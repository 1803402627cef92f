#include "simulator/server/GatewayName.h"

#include "simulator/bus/InterfaceMessages.h"

#include <strings.h>

#include <charconv>

namespace simulator
{

using wire::vxi11::Error;

namespace
{

/// Takes a number, and the comma behind it where something follows. None: there is no such number.
std::optional<unsigned> takeNumber(std::string_view &text)
{
    unsigned number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc{})
        return std::nullopt;
    text.remove_prefix(static_cast<std::size_t>(end - text.data()));
    if (text.empty())
        return number;
    if (text.front() != ',' || text.size() == 1)
        return std::nullopt;
    text.remove_prefix(1);
    return number;
}

} // namespace

Error parseGatewayName(std::string_view name, std::optional<BusAddress> &address)
{
    constexpr std::string_view Kind = "gpib";
    if (name.size() < Kind.size() || ::strncasecmp(name.data(), Kind.data(), Kind.size()) != 0)
        return Error::NotAccessible;
    name.remove_prefix(Kind.size());
    std::optional<unsigned> numbers[3];
    for (std::optional<unsigned> &number : numbers) {
        if (&number != numbers && name.empty())
            break;
        number = takeNumber(name);
        if (!number)
            return Error::Syntax;
    }
    if (!name.empty())
        return Error::Syntax;
    if (numbers[0] != 0u)
        return Error::NotAccessible;
    if (!numbers[1])
        return Error::NoError;
    const unsigned primary = *numbers[1];
    if (primary > BusAddress::Most)
        return Error::InvalidAddress;
    address = BusAddress{static_cast<std::uint8_t>(primary), std::nullopt};
    if (!numbers[2])
        return Error::NoError;
    const unsigned secondary = *numbers[2] >= bus::SecondaryGroup ? *numbers[2] - bus::SecondaryGroup : *numbers[2];
    if (secondary > BusAddress::Most)
        return Error::InvalidAddress;
    address->secondary = static_cast<std::uint8_t>(secondary);
    return Error::NoError;
}

} // namespace simulator
