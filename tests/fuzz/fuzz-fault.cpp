// Any text is either refused with a reason or a fault that is what it says: written again it is the same, and it strikes within its bounds.
#include "simulator/fault/Faults.h"
#include "tests/fuzz/Promise.h"

#include <string_view>

using namespace simulator;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const std::string_view text{reinterpret_cast<const char *>(data), size};
    try {
        const FaultSpec spec = parseFaultSpec(text);
        promise(spec.text == text);
        promise(spec.probability >= 0 && spec.probability <= 1 && spec.number >= 1);

        constexpr std::uint64_t Size = 48;
        Faults faults(1, [] {});
        promise(faults.add(spec) == 1u);
        MessageForm form{spec.protocol.value_or(FaultProtocol::Vxi11), true, 28, {0, 4, 0x7FFFFFFF}, {4, 4}, 1, 40, 8};
        form.end = EndMark::Byte;
        for (int i = 0; i < 3; ++i) {
            const auto damage = faults.strike(form, Size);
            promise(!damage || !damage->cutAt || *damage->cutAt < Size);
            promise(!damage || !damage->changedByte || *damage->changedByte < form.payloadSize);
            promise(!damage || !damage->headerKept || *damage->headerKept <= form.header);
            promise(faults.serviceRequests(form.protocol) <= 100);
        }
    } catch (const FaultSpecError &error) {
        promise(*error.what() != '\0');
    }
    return 0;
}
