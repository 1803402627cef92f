// The first byte says in what pieces the rest reaches the instrument, and whether its transport has END. What it answers and what its
// error queue holds must not depend on the pieces.
#include "tests/fuzz/Promise.h"
#include "tests/unit/simulator/HandTurnedTimers.h"
#include "tests/unit/simulator/TestClient.h"

#include <algorithm>
#include <string>

namespace
{

constexpr std::size_t Limit = 100'000;
constexpr int MaxWaits = 1000;

std::string answers(std::string_view bytes, std::size_t piece, bool hasEnd)
{
    HandTurnedTimers timers;
    simulator::InstrumentOptions options;
    options.maxMessage = Limit;
    options.massMemory = Limit;
    simulator::Instrument instrument(timers, options);
    TestClient client(instrument, hasEnd);
    while (!bytes.empty()) {
        client.send(bytes.substr(0, std::min(piece, bytes.size())));
        bytes.remove_prefix(std::min(piece, bytes.size()));
    }
    if (hasEnd)
        client.sendEnd();
    // One at a time: a continuous acquisition never ends.
    for (int i = 0; i < MaxWaits && timers.turnToNext(); ++i)
        continue;
    std::string result = client.takeAnswers();

    // Whatever came before: after a device clear it talks sense, and it has kept to its memory.
    client.clear();
    promise(client.ask("*OPT?\n") == "0\n");
    promise(instrument.blocks->used() <= instrument.blocks->capacity());
    promise(instrument.massMemory.used() <= Limit);
    return result + client.ask("SYST:ERR:ALL?;:MMEM:CAT?\n");
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    if (size == 0)
        return 0;
    const std::string_view bytes{reinterpret_cast<const char *>(data + 1), size - 1};
    const bool hasEnd = (data[0] & 1) != 0;
    promise(answers(bytes, data[0] / 2 + std::size_t{1}, hasEnd) == answers(bytes, SIZE_MAX, hasEnd));
    return 0;
}
