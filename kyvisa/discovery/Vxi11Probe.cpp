#include "kyvisa/discovery/Vxi11Probe.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/transport/PortLookup.h"
#include "kyvisa/transport/Vxi11Core.h"

namespace kyvisa
{

std::string probeVxi11(const std::string &host, std::uint16_t port, const os::WaitLimit &limit)
{
    ProgramAddress address{host, port};
    if (port == 0 && lookUpCorePort(host, limit, address) != VI_SUCCESS)
        return {};
    os::StreamSocket socket;
    if (Vxi11Core::connect(address, limit, socket) != VI_SUCCESS)
        return {};
    Vxi11Core core(std::move(socket), address.host);
    // Some instruments answer to the name of a gateway as well, so theirs is asked for first.
    for (const char *device : {"inst0", "gpib0"}) {
        wire::vxi11::CreateLinkResult link;
        const ViStatus status = core.createLink(device, limit, link);
        if (status == VI_SUCCESS)
            core.destroyLink(link.link);
        if (status == VI_SUCCESS)
            return device;
        if (!core.isOpen())
            break;
    }
    return {};
}

} // namespace kyvisa
