// A configuration file. Lines that make no sense are counted, and what is left leads to resources that can be named again.
#include "kyvisa/core/Configuration.h"
#include "kyvisa/core/KnownResources.h"
#include "kyvisa/include/visa.h"
#include "tests/fuzz/Promise.h"

#include <algorithm>
#include <cstdint>

using namespace kyvisa;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const std::string_view text(reinterpret_cast<const char *>(data), size);
    std::vector<int> damaged;
    const Configuration configuration = parseConfiguration(text, damaged);
    const auto lines = 1 + std::count(text.begin(), text.end(), '\n');
    promise(std::is_sorted(damaged.begin(), damaged.end(), std::less_equal<>()));
    promise(damaged.empty() || (damaged.front() >= 1 && damaged.back() <= lines));
    for (const Configuration::Alias &alias : configuration.aliases)
        promise(configuration.resourceOf(alias.name) != nullptr);
    for (const FoundResource &known : knownResources(configuration, 2)) {
        ResourceName name;
        promise(parseResourceName(known.name, name) == VI_SUCCESS);
        promise(name.canonical() == known.name);
        promise(aliasOf(known.name, configuration).size() <= 255);
    }
    return 0;
}
