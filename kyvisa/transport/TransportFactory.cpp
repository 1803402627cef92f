#include "kyvisa/transport/TransportFactory.h"

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/Configuration.h"
#include "kyvisa/core/KnownResources.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/Connector.h"
#include "kyvisa/transport/GpibTransport.h"
#include "kyvisa/transport/HislipConnector.h"
#include "kyvisa/transport/IoStatus.h"
#include "kyvisa/transport/PortLookup.h"
#include "kyvisa/transport/SerialTransport.h"
#include "kyvisa/transport/SocketTransport.h"
#include "kyvisa/transport/Vxi11Transport.h"
#include "wire/Hislip.h"

namespace kyvisa
{

namespace
{

bool isGpib(const ResourceName &name)
{
    return name.interfaceType == VI_INTF_GPIB;
}

void findGateway(const Configuration &configuration, ResourceName &name)
{
    const auto known = configuration.gateways.find(name.board);
    ResourceName gateway;
    if (known == configuration.gateways.end() || parseNameOrAlias(known->second, configuration, gateway) < VI_SUCCESS ||
        gateway.interfaceType != VI_INTF_TCPIP || gateway.resourceClass != ResourceName::Class::Instr ||
        gateway.isHislip() || gateway.secure)
        return;
    if (gateway.deviceName.find(',') != std::string::npos)
        return; // an instrument behind a gateway
    name.gatewayHost = gateway.host;
    name.gatewayInterface = gateway.deviceNameGiven ? gateway.deviceName : "gpib0";
}

} // namespace

std::vector<ResourceName> transportChoices(const ResourceName &name, const Configuration &configuration)
{
    const bool lanInstrument = name.interfaceType == VI_INTF_TCPIP && name.resourceClass == ResourceName::Class::Instr;
    std::vector<ResourceName> choices{name};
    if (isGpib(name))
        findGateway(configuration, choices.front());
    if (lanInstrument && !name.deviceNameGiven) {
        ResourceName &hislip = choices.emplace_back(name);
        hislip.deviceName = "hislip0";
        hislip.port = wire::hislip::DefaultPort;
    }
    return choices;
}

std::string lockName(const ResourceName &name)
{
    constexpr std::uint16_t StandardPortmapper = 111;
    std::string text = name.canonical();
    if (!name.gatewayHost.empty())
        text += " by " + name.gatewayHost + " " + name.gatewayInterface;
    // Behind a tunnel every instrument may be "localhost".
    const bool lanInstrument = name.interfaceType == VI_INTF_TCPIP && name.resourceClass == ResourceName::Class::Instr;
    const bool portmapped = (lanInstrument && !name.isHislip()) || !name.gatewayHost.empty();
    if (portmapped && portmapperPort() != StandardPortmapper)
        text += " by portmapper " + std::to_string(portmapperPort());
    return text;
}

std::uint16_t sessionKind(const ResourceName &name, ViStatus &status)
{
    status = VI_SUCCESS;
    if (name.secure) {
        status = VI_ERROR_INV_PROT;
    } else if (isGpib(name) && !name.gatewayHost.empty() && name.resourceClass == ResourceName::Class::Instr) {
        return kind::GpibInstr;
    } else if (isGpib(name) && !name.gatewayHost.empty() && name.resourceClass == ResourceName::Class::Intfc) {
        return kind::GpibIntfc;
    } else if (name.interfaceType == VI_INTF_ASRL) {
        return kind::Serial;
    } else if (name.interfaceType != VI_INTF_TCPIP) {
        status = VI_ERROR_INTF_NUM_NCONFIG;
    } else if (name.resourceClass == ResourceName::Class::Socket) {
        return kind::Socket;
    } else if (name.resourceClass != ResourceName::Class::Instr) {
        status = VI_ERROR_RSRC_NFOUND;
    } else if (name.isHislip()) {
        return kind::Hislip;
    } else {
        return kind::Vxi11;
    }
    return 0;
}

ViStatus openTransport(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                       std::unique_ptr<Transport> &transport)
{
    if (isGpib(name))
        return GpibTransport::connect(name, limit, transport);
    if (name.interfaceType == VI_INTF_ASRL)
        return SerialTransport::connect(name, transport);
    if (name.isHislip())
        return connectHislip(name, limit, attributes, transport);
    if (name.resourceClass == ResourceName::Class::Instr)
        return Vxi11Transport::connect(name, limit, attributes, transport);
    os::StreamSocket socket;
    const os::IoResult connected = os::connectStream(name.host, name.port, limit, socket);
    if (connected != os::IoResult::Done)
        return connectStatus(connected, limit);
    attributes.setText(VI_ATTR_TCPIP_ADDR, socket.peerAddress());
    transport = std::make_unique<SocketTransport>(std::move(socket));
    return VI_SUCCESS;
}

} // namespace kyvisa
