#include "simulator/fault/FaultSpec.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <vector>

namespace simulator
{
namespace
{

enum Places : unsigned {
    OnHislip = 1,
    OnHislipAsync = 2,
    OnSocket = 4,
    OnVxi11 = 8,
    OnGpib = 16,
    OnSerial = 32,
    OnHislipBoth = OnHislip | OnHislipAsync,
    OnRpc = OnVxi11 | OnGpib,
    OnStreams = OnSocket | OnSerial,
    Everywhere = OnHislipBoth | OnStreams | OnRpc,
};

struct ProtocolName {
    std::string_view name;
    FaultProtocol protocol;
};

constexpr std::array Protocols{
    ProtocolName{"hislip", FaultProtocol::Hislip}, ProtocolName{"hislip-async", FaultProtocol::HislipAsync},
    ProtocolName{"socket", FaultProtocol::Socket}, ProtocolName{"vxi11", FaultProtocol::Vxi11},
    ProtocolName{"gpib", FaultProtocol::Gpib},     ProtocolName{"serial", FaultProtocol::Serial},
};

enum class Value : std::uint8_t { None, Optional, Required };

struct Kind {
    std::string_view name;
    FaultKind kind;
    unsigned places;
    std::string_view why; ///< that it makes no sense elsewhere
    Value value = Value::None;
    double least = 0;
    double most = 0;
    bool whole = true;
    bool messages = true; ///< it strikes messages, so that on=all means something
};

constexpr double MostBytes = 9007199254740992.0; // 2^53: whole numbers are exact up to here
constexpr std::string_view NoHeader = "its messages have no header";
constexpr std::string_view NoAnswers = "no answers go over it";
constexpr std::string_view NoLocks = "clients cannot lock over it";
constexpr std::string_view NoService = "it has no service requests";
constexpr std::string_view NoStatus = "it has no status byte of its own";

constexpr std::array Kinds{
    Kind{"delay", FaultKind::Delay, Everywhere, {}, Value::Required, 0, 3600, false},
    Kind{"drop-reply", FaultKind::DropReply, Everywhere, {}},
    Kind{"cut", FaultKind::Cut, Everywhere & ~unsigned{OnSerial}, "it has no connection", Value::Optional, 0,
         MostBytes},
    Kind{"short-header", FaultKind::ShortHeader, OnHislipBoth | OnRpc, NoHeader, Value::Optional, 0, 64},
    Kind{"oversized-header", FaultKind::OversizedHeader, OnHislipBoth | OnRpc, NoHeader, Value::Optional, 0, MostBytes},
    Kind{"garbage", FaultKind::Garbage, Everywhere, {}, Value::Optional, 1, 1048576},
    Kind{"change-byte", FaultKind::ChangeByte, Everywhere & ~unsigned{OnHislipAsync}, NoAnswers, Value::Optional, 0,
         MostBytes},
    Kind{"stale-id", FaultKind::StaleId, OnHislip | OnRpc, "its messages carry no id"},
    Kind{"no-end", FaultKind::NoEnd, Everywhere & ~unsigned{OnHislipAsync}, NoAnswers},
    Kind{"refuse-lock", FaultKind::RefuseLock, OnHislipBoth | OnRpc, NoLocks, Value::None, 0, 0, true, false},
    Kind{"withhold-srq", FaultKind::WithholdSrq, OnHislipBoth | OnRpc, NoService, Value::None, 0, 0, true, false},
    Kind{"repeat-srq", FaultKind::RepeatSrq, OnHislipBoth | OnRpc, NoService, Value::Optional, 2, 100, true, false},
    Kind{"nonsense-status", FaultKind::NonsenseStatus, OnHislipBoth | OnRpc, NoStatus, Value::Optional, 0, 255, true,
         false},
    Kind{"fill-errors", FaultKind::FillErrors, Everywhere, {}},
};

constexpr unsigned placeOf(FaultProtocol protocol)
{
    return 1u << static_cast<unsigned>(protocol);
}

const Kind &kindOf(FaultKind kind)
{
    return *std::find_if(Kinds.begin(), Kinds.end(), [=](const Kind &each) { return each.kind == kind; });
}

std::string quoted(std::string_view text)
{
    return "\"" + std::string{text} + "\"";
}

template <typename Names>
std::string listOf(const Names &names)
{
    std::string list;
    for (const auto &each : names)
        list.append(list.empty() ? "" : " ").append(each.name);
    return list;
}

double numberOf(std::string_view name, std::string_view text, double least, double most, bool whole)
{
    double value = 0;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), value);
    if (result.ec != std::errc{} || result.ptr != text.data() + text.size() || !std::isfinite(value))
        throw FaultSpecError(std::string{name} + " needs a number, not " + quoted(text));
    if (whole && value != std::floor(value))
        throw FaultSpecError(std::string{name} + " needs a whole number, not " + quoted(text));
    if (value < least || value > most) {
        const auto written = [](double bound) {
            std::string digits = std::to_string(bound);
            digits.erase(digits.find_last_not_of('0') + 1);
            return digits.ends_with('.') ? digits.substr(0, digits.size() - 1) : digits;
        };
        throw FaultSpecError(std::string{name} + " is between " + written(least) + " and " + written(most) + ", not " +
                             std::string{text});
    }
    return value;
}

std::vector<std::string_view> split(std::string_view text)
{
    std::vector<std::string_view> parts;
    while (true) {
        const std::size_t colon = text.find(':');
        parts.push_back(text.substr(0, colon));
        if (colon == std::string_view::npos)
            return parts;
        text.remove_prefix(colon + 1);
    }
}

/// Reads what stands behind protocol and kind.
void readCondition(std::string_view part, const Kind &kind, FaultSpec &spec)
{
    const std::size_t mark = part.find('=');
    const std::string_view name = part.substr(0, mark);
    const std::string_view value = mark == std::string_view::npos ? std::string_view{} : part.substr(mark + 1);
    if (name == "on") {
        if (value != "all" && value != "answers")
            throw FaultSpecError("on is \"all\" or \"answers\", not " + quoted(value));
        if (!kind.messages)
            throw FaultSpecError("on=" + std::string{value} + " means nothing with " + std::string{kind.name});
        spec.allMessages = value == "all";
        return;
    }
    if (name != "p" && name != "nth" && name != "every")
        throw FaultSpecError("there is no condition " + quoted(name) + "; they are p, nth, every and on");
    if (spec.when != FaultSpec::When::Always)
        throw FaultSpecError("only one of p, nth and every can hold");
    if (name == "p") {
        spec.when = FaultSpec::When::Probability;
        spec.probability = numberOf(name, value, 0, 1, false);
    } else {
        spec.when = name == "nth" ? FaultSpec::When::Nth : FaultSpec::When::Every;
        spec.number = static_cast<std::uint64_t>(numberOf(name, value, 1, MostBytes, true));
    }
}

} // namespace

bool FaultSpec::concerns(FaultProtocol where) const
{
    if (!protocol)
        return (kindOf(kind).places & placeOf(where)) != 0;
    if (*protocol == where)
        return true;
    // What the second channel alone carries may be written for either.
    const bool messages = kindOf(kind).messages;
    return !messages && where == FaultProtocol::Hislip && *protocol == FaultProtocol::HislipAsync;
}

FaultSpec parseFaultSpec(std::string_view text)
{
    if (text.size() > FaultSpec::MaxText)
        throw FaultSpecError("a fault is at most " + std::to_string(FaultSpec::MaxText) + " characters long");
    const std::vector<std::string_view> parts = split(text);
    if (parts.size() < 2)
        throw FaultSpecError("a fault is PROTOCOL:KIND, for example \"hislip:drop-reply:p=0.01\", not " + quoted(text));

    FaultSpec spec;
    spec.text = text;
    if (parts[0] != "any") {
        const auto found = std::find_if(Protocols.begin(), Protocols.end(),
                                        [&](const ProtocolName &each) { return each.name == parts[0]; });
        if (found == Protocols.end())
            throw FaultSpecError("there is no protocol " + quoted(parts[0]) + "; they are any " + listOf(Protocols));
        spec.protocol = found->protocol;
    }

    const std::size_t mark = parts[1].find('=');
    const std::string_view name = parts[1].substr(0, mark);
    const auto kind = std::find_if(Kinds.begin(), Kinds.end(), [&](const Kind &each) { return each.name == name; });
    if (kind == Kinds.end())
        throw FaultSpecError("there is no kind of fault " + quoted(name) + "; they are " + listOf(Kinds));
    spec.kind = kind->kind;
    if (spec.protocol && (kind->places & placeOf(*spec.protocol)) == 0)
        throw FaultSpecError(std::string{name} + " makes no sense on " + std::string{parts[0]} + ": " +
                             std::string{kind->why});
    const bool hasValue = mark != std::string_view::npos;
    if (hasValue && kind->value == Value::None)
        throw FaultSpecError(std::string{name} + " takes no value");
    if (!hasValue && kind->value == Value::Required)
        throw FaultSpecError(std::string{name} + " needs a value, for example " + std::string{name} + "=0.5");
    if (hasValue)
        spec.value = numberOf(name, parts[1].substr(mark + 1), kind->least, kind->most, kind->whole);

    for (std::size_t i = 2; i < parts.size(); ++i)
        readCondition(parts[i], *kind, spec);
    return spec;
}

} // namespace simulator
