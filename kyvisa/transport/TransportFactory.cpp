#include "kyvisa/transport/TransportFactory.h"

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/Connector.h"
#include "kyvisa/transport/HislipTransport.h"
#include "kyvisa/transport/IoStatus.h"
#include "kyvisa/transport/SocketTransport.h"
#include "wire/Hislip.h"

namespace kyvisa
{

ResourceName withTransportChosen(ResourceName name)
{
    const bool lanInstrument = name.interfaceType == VI_INTF_TCPIP && name.resourceClass == ResourceName::Class::Instr;
    if (lanInstrument && !name.deviceNameGiven) {
        name.deviceName = "hislip0";
        name.port = wire::hislip::DefaultPort;
    }
    return name;
}

std::uint16_t sessionKind(const ResourceName &name, ViStatus &status)
{
    status = VI_SUCCESS;
    if (name.secure) {
        status = VI_ERROR_INV_PROT;
    } else if (name.interfaceType != VI_INTF_TCPIP) {
        status = VI_ERROR_INTF_NUM_NCONFIG;
    } else if (name.resourceClass == ResourceName::Class::Socket) {
        return kind::Socket;
    } else if (name.resourceClass != ResourceName::Class::Instr) {
        status = VI_ERROR_RSRC_NFOUND;
    } else if (name.isHislip()) {
        return kind::Hislip;
    } else {
        status = VI_ERROR_LIBRARY_NFOUND;
    }
    return 0;
}

ViStatus openTransport(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                       std::unique_ptr<Transport> &transport)
{
    if (name.isHislip())
        return HislipTransport::connect(name, limit, attributes, transport);
    os::StreamSocket socket;
    const os::IoResult connected = os::connectStream(name.host, name.port, limit, socket);
    if (connected != os::IoResult::Done)
        return connectStatus(connected, limit);
    attributes.setText(VI_ATTR_TCPIP_ADDR, socket.peerAddress());
    transport = std::make_unique<SocketTransport>(std::move(socket));
    return VI_SUCCESS;
}

} // namespace kyvisa
