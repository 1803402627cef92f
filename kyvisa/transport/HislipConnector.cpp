#include "kyvisa/transport/HislipConnector.h"

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/Connector.h"
#include "kyvisa/transport/HislipTransport.h"
#include "kyvisa/transport/IoStatus.h"

#include <algorithm>

namespace kyvisa
{

using namespace wire::hislip;
using os::IoResult;

namespace
{

constexpr std::size_t InputCapacity = 16 * 1024;
constexpr std::uint16_t VendorId = 'Z' << 8 | 'Z'; // registered to nobody
constexpr std::uint8_t OverlapFlag = 1;
constexpr std::uint8_t EncryptionFlags = 2 | 4; // mandatory, required at the beginning

/// Why an instrument refused a session.
ViStatus refusal(FatalErrorCode code)
{
    switch (code) {
    case FatalErrorCode::MaximumClients:
        return VI_ERROR_RSRC_BUSY;
    case FatalErrorCode::SecureConnectionFailed:
        return VI_ERROR_INV_PROT;
    default:
        return VI_ERROR_RSRC_NFOUND;
    }
}

/// While opening, a connection that breaks off is a resource that is not there.
ViStatus whileOpening(ViStatus status)
{
    return status == VI_ERROR_CONN_LOST || status == VI_ERROR_IO ? VI_ERROR_RSRC_NFOUND : status;
}

ViStatus whileOpening(ViStatus status, HislipAsyncChannel &channel)
{
    const auto said = channel.fatalError();
    return status == VI_ERROR_CONN_LOST && said ? refusal(*said) : whileOpening(status);
}

ViStatus initialize(HislipChannel &channel, const std::string &subAddress, Header &response, const os::WaitLimit &limit)
{
    const Header request{MessageType::Initialize, 0, initializeParameter(Version1, VendorId), subAddress.size()};
    std::size_t sent = 0;
    IoResult result = channel.send(request, std::as_bytes(std::span(subAddress)), limit, sent);
    if (result == IoResult::Done)
        result = channel.next(response, limit);
    if (result != IoResult::Done)
        return whileOpening(transferStatus(result, limit));
    if (response.type == MessageType::FatalError)
        return refusal(static_cast<FatalErrorCode>(response.control));
    if (response.type != MessageType::InitializeResponse)
        return VI_ERROR_RSRC_NFOUND;
    if ((response.control & EncryptionFlags) != 0)
        return VI_ERROR_INV_PROT;
    return VI_SUCCESS;
}

} // namespace

ViStatus connectHislip(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                       std::unique_ptr<Transport> &transport)
{
    os::StreamSocket socket;
    IoResult connected = os::connectStream(name.host, name.port, limit, socket);
    if (connected != IoResult::Done)
        return connectStatus(connected, limit);
    const std::string address = socket.peerAddress();
    attributes.setText(VI_ATTR_TCPIP_ADDR, address);
    HislipChannel sync(std::move(socket), InputCapacity);
    Header response;
    ViStatus status = initialize(sync, name.deviceName, response, limit);
    if (status < VI_SUCCESS)
        return status;

    os::StreamSocket asyncSocket;
    // A name may have several addresses: the other connection belongs to the instrument that answered the first.
    connected = os::connectStream(address.empty() ? name.host : address, name.port, limit, asyncSocket);
    if (connected != IoResult::Done)
        return connectStatus(connected, limit);
    auto async = std::make_unique<HislipAsyncChannel>(std::move(asyncSocket));
    const std::uint32_t session = response.parameter & 0xFFFF;
    HislipAsyncChannel::Reply reply;
    status = async->transact({MessageType::AsyncInitialize, 0, session, 0}, {}, MessageType::AsyncInitializeResponse,
                             reply, limit);
    if (status < VI_SUCCESS)
        return whileOpening(status, *async);

    const bool overlapped = (response.control & OverlapFlag) != 0;
    HislipAsyncChannel &asyncChannel = *async;
    auto hislip = std::make_unique<HislipTransport>(std::move(sync), std::move(async), overlapped);
    status = hislip->agreeOnSizes(attributes.number(VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB) * 1024, limit);
    if (status < VI_SUCCESS)
        return whileOpening(status, asyncChannel);
    const std::uint32_t version = std::min<std::uint32_t>(response.parameter >> 16, Version1);
    attributes.setNumber(VI_ATTR_TCPIP_HISLIP_VERSION, (version >> 8) << 20 | (version & 0xFF) << 8);
    hislip->showModeIn(attributes);
    transport = std::move(hislip);
    return VI_SUCCESS;
}

} // namespace kyvisa
