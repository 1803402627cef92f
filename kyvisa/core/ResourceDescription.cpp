#include "kyvisa/core/ResourceDescription.h"

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"

namespace kyvisa
{
namespace
{

std::string interfaceText(const ResourceName &name)
{
    const std::string board = std::to_string(name.board);
    switch (name.interfaceType) {
    case VI_INTF_TCPIP:
        return "TCPIP" + board + " (" + name.host + ")";
    case VI_INTF_GPIB:
        return "GPIB" + board +
               (name.gatewayHost.empty() ? "" : " (" + name.gatewayHost + " " + name.gatewayInterface + ")");
    case VI_INTF_ASRL:
        return "ASRL" + (name.address.empty() ? board : " (" + name.address + ")");
    default:
        return {};
    }
}

} // namespace

std::uint16_t kindOf(const ResourceName &name)
{
    switch (name.interfaceType) {
    case VI_INTF_TCPIP:
        if (name.resourceClass == ResourceName::Class::Socket)
            return kind::Socket;
        return name.isHislip() ? kind::Hislip : kind::Vxi11;
    case VI_INTF_GPIB:
        return name.resourceClass == ResourceName::Class::Intfc ? kind::GpibIntfc : kind::GpibInstr;
    case VI_INTF_ASRL:
        return kind::Serial;
    default:
        return 0;
    }
}

void describeResource(const ResourceName &name, AttributeStore &attributes)
{
    attributes.setText(VI_ATTR_RSRC_NAME, name.canonical());
    attributes.setText(VI_ATTR_RSRC_CLASS, name.className());
    attributes.setText(VI_ATTR_RSRC_MANF_NAME, "Oltrava");
    attributes.setNumber(VI_ATTR_INTF_TYPE, name.interfaceType);
    attributes.setNumber(VI_ATTR_INTF_NUM, name.board);
    attributes.setText(VI_ATTR_INTF_INST_NAME, interfaceText(name));
    attributes.setText(VI_ATTR_TCPIP_HOSTNAME, name.host);
    attributes.setText(VI_ATTR_TCPIP_DEVICE_NAME, name.deviceName);
    attributes.setNumber(VI_ATTR_TCPIP_PORT, name.port);
    attributes.setNumber(VI_ATTR_TCPIP_IS_HISLIP, name.isHislip() ? VI_TRUE : VI_FALSE);
    attributes.setNumber(VI_ATTR_GPIB_PRIMARY_ADDR, name.primaryAddress);
    attributes.setNumber(VI_ATTR_GPIB_SECONDARY_ADDR, name.secondaryAddress);
}

} // namespace kyvisa
