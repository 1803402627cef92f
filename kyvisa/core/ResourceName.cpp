#include "kyvisa/core/ResourceName.h"

#include "kyvisa/include/visa.h"
#include "wire/Hislip.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <optional>
#include <vector>

namespace kyvisa
{
namespace
{

using Class = ResourceName::Class;

struct InterfaceName {
    std::string_view prefix;
    ViUInt16 type;
};

/// IEEE 488.1 sends secondary address 0 as this byte.
constexpr int FirstSecondaryOnBus = 96;

// The longer of two names with a common beginning comes first.
constexpr std::array Interfaces = {
    InterfaceName{"GPIB-VXI", VI_INTF_GPIB_VXI}, InterfaceName{"GPIB", VI_INTF_GPIB},
    InterfaceName{"VXI", VI_INTF_VXI},           InterfaceName{"ASRL", VI_INTF_ASRL},
    InterfaceName{"PXI", VI_INTF_PXI},           InterfaceName{"TCPIP", VI_INTF_TCPIP},
    InterfaceName{"USB", VI_INTF_USB},
};

constexpr std::array<const char *, 6> ClassNames = {"INSTR", "SOCKET", "INTFC", "MEMACC", "BACKPLANE", "SERVANT"};

char lower(char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool equalIgnoringCase(std::string_view a, std::string_view b)
{
    return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](char x, char y) { return lower(x) == lower(y); });
}

bool startsIgnoringCase(std::string_view text, std::string_view prefix)
{
    return text.size() >= prefix.size() && equalIgnoringCase(text.substr(0, prefix.size()), prefix);
}

template <typename Number>
std::optional<Number> number(std::string_view text, int base = 10)
{
    Number value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value, base);
    if (text.empty() || error != std::errc() || end != text.data() + text.size())
        return std::nullopt;
    return value;
}

/// The parts between "::"; one that stands in square brackets may contain it.
std::optional<std::vector<std::string_view>> split(std::string_view text)
{
    std::vector<std::string_view> parts;
    for (;;) {
        std::size_t from = 0;
        if (const std::size_t bracket = text.find('['); bracket != text.npos && bracket < text.find("::")) {
            from = text.find(']', bracket);
            if (from == text.npos)
                return std::nullopt;
        }
        const std::size_t end = text.find("::", from);
        parts.push_back(text.substr(0, end));
        // A colon at an end of a part could not be told from those between the parts.
        if (parts.back().empty() || parts.back().front() == ':' || parts.back().back() == ':')
            return std::nullopt;
        if (end == text.npos)
            return parts;
        text.remove_prefix(end + 2);
    }
}

std::optional<Class> classOf(std::string_view text)
{
    for (std::size_t i = 0; i < ClassNames.size(); ++i)
        if (equalIgnoringCase(text, ClassNames[i]))
            return static_cast<Class>(i);
    return std::nullopt;
}

bool parseHost(std::string_view text, ResourceName &name)
{
    if (const std::size_t at = text.find('@'); at != text.npos) {
        name.secure = true;
        text.remove_prefix(at + 1);
    }
    if (!text.empty() && text.front() == '[') {
        if (text.back() != ']' || text.size() < 4)
            return false;
        text = text.substr(1, text.size() - 2);
        if (text.find(':') == text.npos)
            return false;
    } else if (text.find(':') != text.npos) {
        return false;
    }
    name.host = text;
    return !text.empty() && std::none_of(text.begin(), text.end(), [](unsigned char c) {
        return c <= ' ' || c == '[' || c == ']' || c == '/' || c == '@' || c == 0x7F;
    });
}

bool parseDeviceName(std::string_view text, ResourceName &name)
{
    name.deviceNameGiven = true;
    if (startsIgnoringCase(text, "hislip")) {
        if (const std::size_t comma = text.find(','); comma != text.npos) {
            const auto port = number<ViUInt16>(text.substr(comma + 1));
            if (!port || *port == 0)
                return false;
            name.port = *port;
            text = text.substr(0, comma);
        }
        if (text.size() > wire::hislip::MaxSubAddress)
            return false;
    }
    name.deviceName = text;
    return !text.empty() && text.back() != ':' &&
           std::none_of(text.begin(), text.end(), [](unsigned char c) { return c <= ' ' || c == 0x7F; });
}

bool parseTcpip(std::vector<std::string_view> parts, ResourceName &name)
{
    name.deviceName = "inst0";
    if (name.resourceClass == Class::Servant) {
        if (parts.size() > 1)
            return false;
        return parts.empty() || parseDeviceName(parts[0], name);
    }
    if (parts.empty() || parts.size() > 2 || !parseHost(parts[0], name))
        return false;
    if (name.resourceClass == Class::Socket) {
        name.deviceName.clear();
        const auto port = parts.size() == 2 ? number<ViUInt16>(parts[1]) : std::nullopt;
        name.port = port.value_or(0);
        return port && *port != 0;
    }
    if (name.resourceClass != Class::Instr || (parts.size() == 2 && !parseDeviceName(parts[1], name)))
        return false;
    if (name.isHislip() && name.port == 0)
        name.port = wire::hislip::DefaultPort;
    return true;
}

bool parseGpib(const std::vector<std::string_view> &parts, ResourceName &name)
{
    if (name.resourceClass == Class::Intfc || name.resourceClass == Class::Servant)
        return parts.empty();
    if (name.resourceClass != Class::Instr || parts.empty() || parts.size() > 2)
        return false;
    const auto primary = number<ViUInt16>(parts[0]);
    if (!primary || *primary > 30)
        return false;
    name.primaryAddress = *primary;
    if (parts.size() == 2) {
        const auto given = number<ViUInt16>(parts[1]);
        if (!given)
            return false;
        // Some write it as it goes over the bus.
        const int secondary = *given >= FirstSecondaryOnBus ? *given - FirstSecondaryOnBus : *given;
        if (secondary > 30)
            return false;
        name.secondaryAddress = static_cast<ViUInt16>(secondary);
        name.address = std::to_string(name.primaryAddress) + "::" + std::to_string(secondary);
    }
    return true;
}

/// Vendor and product are hexadecimal with 0x, or decimal; the serial number is free text.
bool parseUsb(const std::vector<std::string_view> &parts, ResourceName &name)
{
    if (name.resourceClass != Class::Instr || parts.size() < 3 || parts.size() > 4)
        return false;
    for (int i = 0; i < 2; ++i) {
        const bool hex = startsIgnoringCase(parts[i], "0x");
        if (!number<ViUInt16>(hex ? parts[i].substr(2) : parts[i], hex ? 16 : 10))
            return false;
    }
    return parts.size() == 3 || number<ViUInt16>(parts[3]);
}

/// The register-based interfaces, which this library knows by name only.
bool parseRegisterBased(const std::vector<std::string_view> &parts, ResourceName &name)
{
    const bool chassis = !parts.empty() && startsIgnoringCase(parts[0], "CHASSIS");
    switch (name.resourceClass) {
    case Class::Instr:
        return !parts.empty() && parts.size() <= 3 && (chassis || (parts[0].front() >= '0' && parts[0].front() <= '9'));
    case Class::Memacc:
    case Class::Servant:
        return parts.empty();
    case Class::Backplane:
        return parts.size() <= 1;
    default:
        return false;
    }
}

/// Nothing in it that would not be seen.
bool isPlain(std::string_view text)
{
    return std::none_of(text.begin(), text.end(), [](unsigned char c) { return c <= ' ' || c == 0x7F; });
}

bool parseAddress(std::vector<std::string_view> parts, ResourceName &name)
{
    switch (name.interfaceType) {
    case VI_INTF_TCPIP:
        return parseTcpip(std::move(parts), name);
    case VI_INTF_GPIB:
        return parseGpib(parts, name);
    case VI_INTF_ASRL:
        return parts.empty() && name.resourceClass == Class::Instr && isPlain(name.address);
    case VI_INTF_USB:
        return parseUsb(parts, name);
    default:
        return parseRegisterBased(parts, name);
    }
}

} // namespace

bool ResourceName::isHislip() const
{
    return interfaceType == VI_INTF_TCPIP && resourceClass == Class::Instr && startsIgnoringCase(deviceName, "hislip");
}

const char *ResourceName::className() const
{
    return ClassNames[static_cast<std::size_t>(resourceClass)];
}

std::string ResourceName::canonical() const
{
    std::string text;
    for (const InterfaceName &known : Interfaces)
        if (known.type == interfaceType)
            text = known.prefix;
    if (interfaceType == VI_INTF_ASRL && !address.empty())
        return text + address + "::" + className();
    text += std::to_string(board);
    if (interfaceType == VI_INTF_TCPIP && resourceClass != Class::Servant) {
        const bool brackets = host.find(':') != host.npos;
        text += "::" + (brackets ? "[" + host + "]" : host);
        if (resourceClass == Class::Socket)
            text += "::" + std::to_string(port);
    }
    if (!deviceName.empty())
        text += "::" + deviceName;
    if (isHislip() && port != wire::hislip::DefaultPort)
        text += "," + std::to_string(port);
    if (!address.empty())
        text += "::" + address;
    return text + "::" + className();
}

ViStatus parseResourceName(std::string_view text, ResourceName &name)
{
    name = {};
    const auto isControl = [](unsigned char c) { return c < ' ' || c == 0x7F; };
    if (text.size() > MaxResourceName || std::any_of(text.begin(), text.end(), isControl))
        return VI_ERROR_INV_RSRC_NAME;
    const auto *known = std::find_if(Interfaces.begin(), Interfaces.end(), [&](const InterfaceName &candidate) {
        return startsIgnoringCase(text, candidate.prefix);
    });
    auto parts = split(text);
    if (known == Interfaces.end() || !parts)
        return VI_ERROR_INV_RSRC_NAME;
    name.interfaceType = known->type;

    const std::string_view board = parts->front().substr(std::min(known->prefix.size(), parts->front().size()));
    const bool deviceFile = known->type == VI_INTF_ASRL && board.starts_with("/dev/");
    if (!board.empty() && !deviceFile) {
        const auto value = number<ViUInt16>(board);
        if (!value)
            return VI_ERROR_INV_RSRC_NAME;
        name.board = *value;
    }
    parts->erase(parts->begin());
    if (!parts->empty()) {
        if (const auto given = classOf(parts->back())) {
            name.resourceClass = *given;
            parts->pop_back();
        }
    }
    if (deviceFile)
        name.address = board;
    else if (name.interfaceType != VI_INTF_TCPIP) {
        for (const std::string_view part : *parts)
            name.address.append(name.address.empty() ? "" : "::").append(part);
    }
    if (!parseAddress(std::move(*parts), name) || name.canonical().size() > MaxResourceName)
        return VI_ERROR_INV_RSRC_NAME;
    return VI_SUCCESS;
}

} // namespace kyvisa
