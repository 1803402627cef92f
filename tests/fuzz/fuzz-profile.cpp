// Any text is either refused, with a reason and a place inside it, or it is an instrument that answers each of its queries and survives a reset.
#include "simulator/profile/HeaderPattern.h"
#include "simulator/profile/ProfileModel.h"
#include "simulator/profile/ProfileReader.h"
#include "tests/fuzz/Promise.h"
#include "tests/unit/simulator/HandTurnedTimers.h"
#include "tests/unit/simulator/TestClient.h"

#include <algorithm>
#include <string>

using namespace simulator;

namespace
{

constexpr std::size_t Limit = 20'000'000;

/// A way to write the header, with suffix 1 where one may be.
std::string written(const std::string &header)
{
    std::string path = HeaderPattern(header).paths.front();
    std::replace(path.begin(), path.end(), '#', '1');
    return path;
}

void use(const Profile &profile)
{
    HandTurnedTimers timers;
    InstrumentOptions options;
    options.maxMessage = Limit;
    options.massMemory = Limit;
    applyProfile(profile, options);
    Instrument instrument(timers, options);
    installProfile(profile, instrument);
    TestClient client(instrument);
    for (const ProfileSetting &setting : profile.settings)
        promise(!client.ask(":" + written(setting.header) + "?\n").empty());
    for (const ProfileCommand &command : profile.commands) {
        if (command.leastParameters > 0 || !command.answer)
            continue;
        client.ask(written(command.header) + "?\n");
        timers.turn(std::chrono::hours(2));
    }
    client.ask("*SAV 1;*RST;*RCL 1\n");
    promise(instrument.blocks->used() <= instrument.blocks->capacity());
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const std::string_view text{reinterpret_cast<const char *>(data), size};
    try {
        use(readProfile(text));
    } catch (const ProfileError &error) {
        promise(*error.what() != '\0');
        const auto lines = static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n')) + 1;
        promise(error.position.line >= 1 && error.position.line <= lines && error.position.column <= size + 1);
    }
    return 0;
}
