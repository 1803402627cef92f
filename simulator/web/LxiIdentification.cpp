#include "simulator/web/LxiIdentification.h"

#include "simulator/web/InstrumentState.h"
#include "simulator/web/Markup.h"

#include <algorithm>
#include <map>

namespace simulator
{
namespace
{

std::string element(const char *name, const std::string &content)
{
    return std::string("<") + name + ">" + markup(content) + "</" + name + ">\n";
}

/// The address of a resource string: TCPIP::127.0.0.1::..., without the brackets of IPv6.
std::string hostIn(const std::string &resource)
{
    const std::size_t begin = resource.find("::");
    if (!resource.starts_with("TCPIP") || begin == resource.npos)
        return {};
    const bool bracketed = resource.compare(begin + 2, 1, "[") == 0;
    const std::size_t end = resource.find(bracketed ? "]" : "::", begin + 2);
    const std::size_t first = begin + (bracketed ? 3 : 2);
    return end == resource.npos ? std::string() : resource.substr(first, end - first);
}

std::string interfaceOf(const std::string &address, const std::vector<std::string> &resources)
{
    const bool ipv6 = address.find(':') != address.npos;
    std::string text = "<Interface xsi:type=\"NetworkInformation\" InterfaceType=\"LXI\" IPType=\"";
    text += ipv6 ? "IPv6\">\n" : "IPv4\">\n";
    for (const std::string &resource : resources)
        text += element("InstrumentAddressString", resource);
    text += element("Hostname", address);
    text += element("IPAddress", address);
    text += element("DHCPEnabled", "false");
    text += element("AutoIPEnabled", "false");
    return text + "</Interface>\n";
}

std::string functionOf(const char *name, const char *version, const std::string &inside)
{
    return std::string("<Function FunctionName=\"") + name + "\" Version=\"" + version + "\">" + inside +
           "</Function>\n";
}

} // namespace

std::string lxiIdentification(const Identification &identity, const std::vector<ServedAt> &services,
                              const std::string &host)
{
    const std::string home = "http://" + host + "/";
    std::map<std::string, std::vector<std::string>> resourcesByAddress;
    std::string functions;
    for (const ServedAt &service : services) {
        const std::string address = hostIn(service.resource);
        if (address.empty())
            continue;
        resourcesByAddress[address].push_back(service.resource);
        if (service.service == "hislip" && functions.find("LXI HiSLIP") == functions.npos) {
            const std::size_t comma = service.resource.rfind(',');
            const std::string port = service.resource.substr(comma + 1, service.resource.rfind("::") - comma - 1);
            functions += functionOf("LXI HiSLIP", "1.0", element("Port", port) + element("Subaddress", "hislip0"));
        }
        if (service.service == "vxi11" && functions.find("LXI VXI-11") == functions.npos)
            functions += functionOf("LXI VXI-11", "1.0", {});
        if (address.find(':') != address.npos && functions.find("LXI IPv6") == functions.npos)
            functions += functionOf("LXI IPv6", "1.0", {});
    }

    std::string text = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
                       "<LXIDevice xmlns=\"http://www.lxistandard.org/InstrumentIdentification/1.0\" "
                       "xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\" "
                       "xsi:schemaLocation=\"http://www.lxistandard.org/InstrumentIdentification/1.0 ";
    text += markup(home) + "lxi/identification\">\n";
    text += element("Manufacturer", identity.manufacturer);
    text += element("Model", identity.model);
    text += element("SerialNumber", identity.serial);
    text += element("FirmwareRevision", identity.firmware);
    text += element("ManufacturerDescription", "A simulated instrument for VISA programs");
    text += element("HomepageURL", home);
    text += element("UserDescription", identity.model + " on " + host);
    text += element("IdentificationURL", home + "lxi/identification");
    for (const auto &[address, resources] : resourcesByAddress)
        text += interfaceOf(address, resources);
    text += element("Domain", "1");
    text += element("LXIVersion", "1.5");
    if (!functions.empty())
        text += "<LXIExtendedFunctions>\n" + functions + "</LXIExtendedFunctions>\n";
    return text + "</LXIDevice>\n";
}

} // namespace simulator
