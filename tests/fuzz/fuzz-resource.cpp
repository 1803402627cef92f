// A resource string. What is accepted has one full form, which says the same and does not change when it is read again.
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"
#include "tests/fuzz/Promise.h"

#include <cstdint>

using namespace kyvisa;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const std::string_view text(reinterpret_cast<const char *>(data), size);
    ResourceName name;
    const ViStatus status = parseResourceName(text, name);
    promise(status == VI_SUCCESS || status == VI_ERROR_INV_RSRC_NAME);
    if (status != VI_SUCCESS)
        return 0;
    const std::string full = name.canonical();
    promise(full.size() <= MaxResourceName);
    promise(full.find('\0') == full.npos);
    // Credentials are left out of the full form: nobody who shows it gives them away.
    ResourceName again;
    promise(parseResourceName(full, again) == VI_SUCCESS);
    promise(again.canonical() == full);
    promise(again.interfaceType == name.interfaceType && again.board == name.board &&
            again.resourceClass == name.resourceClass && again.host == name.host && again.port == name.port &&
            again.deviceName == name.deviceName && again.primaryAddress == name.primaryAddress &&
            again.secondaryAddress == name.secondaryAddress && again.address == name.address);
    return 0;
}
