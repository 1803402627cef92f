#include "kyvisa/transport/PortLookup.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/os/Connector.h"
#include "kyvisa/transport/IoStatus.h"
#include "kyvisa/transport/RpcClient.h"
#include "wire/Portmap.h"
#include "wire/Vxi11.h"

#include <array>
#include <charconv>
#include <cstdlib>
#include <string_view>

namespace kyvisa
{

using namespace wire;
using os::IoResult;

std::uint16_t portmapperPort()
{
    const char *setting = std::getenv("KYVISA_PORTMAPPER_PORT");
    const std::string_view text = setting ? setting : "";
    std::uint16_t port = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), port);
    const bool usable = error == std::errc() && end == text.data() + text.size() && port != 0;
    return usable ? port : portmap::DefaultPort;
}

ViStatus lookUpCorePort(const std::string &host, const os::WaitLimit &limit, ProgramAddress &found)
{
    os::StreamSocket socket;
    IoResult result = os::connectStream(host, portmapperPort(), limit, socket, os::AddressOrder::Ipv4First);
    if (result != IoResult::Done)
        return connectStatus(result, limit);
    found.host = socket.peerAddress();
    RpcClient portmapper(std::move(socket), portmap::Program, portmap::Version);
    auto arguments = portmapper.begin(static_cast<std::uint32_t>(portmap::Procedure::GetPort));
    encode(arguments, portmap::Mapping{vxi11::CoreProgram, vxi11::Version, portmap::Tcp, 0});
    rpc::Reply reply;
    result = portmapper.send(limit);
    if (result == IoResult::Done)
        result = portmapper.receive(reply, limit);
    if (result == IoResult::Done && !reply.success())
        return VI_ERROR_RSRC_NFOUND;
    std::array<std::byte, 4> bytes{};
    if (result == IoResult::Done)
        result = portmapper.take(bytes, limit).result;
    if (result != IoResult::Done)
        return connectStatus(result, limit);
    xdr::Reader reader(bytes);
    return portmap::decodePort(reader, found.port) && found.port != 0 ? VI_SUCCESS : VI_ERROR_RSRC_NFOUND;
}

} // namespace kyvisa
