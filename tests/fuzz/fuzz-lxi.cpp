// An LXI identification document. It ends, its texts hold no more than it does, and its resources can be opened.
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/discovery/HostCollection.h"
#include "kyvisa/discovery/LxiDocument.h"
#include "kyvisa/include/visa.h"
#include "tests/fuzz/Promise.h"

#include <cstdint>

using namespace kyvisa;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const auto document = readLxiDocument({reinterpret_cast<const char *>(data), size});
    if (!document)
        return 0;
    const LxiTexts &texts = document->texts;
    for (const std::string *text : {&texts.manufacturer, &texts.model, &texts.serialNumber, &texts.version,
                                    &texts.description, &texts.hostName}) {
        promise(text->size() <= size);
        promise(text->empty() || (text->front() != ' ' && text->back() != ' '));
    }
    promise(document->resources.size() <= 64);
    FoundHosts hosts;
    for (const char *address : {"10.0.0.9", "192.168.0.7"})
        hosts[address].document = *document;
    for (const FoundResource &resource : resourcesOf(hosts)) {
        ResourceName name;
        promise(parseResourceName(resource.name, name) == VI_SUCCESS);
        promise(name.canonical() == resource.name);
        promise(!resource.texts.hostName.empty());
    }
    return 0;
}
