#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

namespace simulator
{

/// Where a fault can strike. HislipAsync is the second channel of a HiSLIP client, Gpib what goes through the LAN/GPIB gateway.
enum class FaultProtocol : std::uint8_t { Hislip, HislipAsync, Socket, Vxi11, Gpib, Serial };

enum class FaultKind : std::uint8_t {
    Delay,
    DropReply,
    Cut,
    ShortHeader,
    OversizedHeader,
    Garbage,
    ChangeByte,
    StaleId,
    NoEnd,
    RefuseLock,
    WithholdSrq,
    RepeatSrq,
    NonsenseStatus,
    FillErrors,
};

/// Says in one sentence what is wrong with a fault that somebody wrote.
class FaultSpecError : public std::invalid_argument
{
public:
    using std::invalid_argument::invalid_argument;
};

/**
 * One fault, as the user writes it: where, what, when, separated by colons.
 *
 *     hislip:drop-reply:p=0.01       each answer over HiSLIP is lost with a probability of 1 %
 *     any:delay=0.5:nth=10           the tenth answer, over whatever protocol, comes half a second late
 *     vxi11:cut:every=100            every hundredth answer over VXI-11 breaks off, and with it the connection
 *     hislip-async:garbage:on=all    all messages of the second channel are noise
 *
 * Without p, nth or every it strikes each time.
 */
struct FaultSpec {
    enum class When : std::uint8_t { Always, Probability, Nth, Every };

    static constexpr std::size_t MaxText = 200;

    std::optional<FaultProtocol> protocol; ///< none: wherever the kind makes sense
    FaultKind kind = FaultKind::Delay;
    std::optional<double> value; ///< what stands behind the kind: seconds, bytes, times, a status byte
    When when = When::Always;
    double probability = 1;
    std::uint64_t number = 1; ///< of Nth and Every
    bool allMessages = false; ///< also those that carry no answer, such as acknowledgements
    std::string text;         ///< as written

    /// True when a message, lock request or whatever the kind is about counts for this fault.
    bool concerns(FaultProtocol where) const;
};

/// Throws FaultSpecError.
FaultSpec parseFaultSpec(std::string_view text);

} // namespace simulator
