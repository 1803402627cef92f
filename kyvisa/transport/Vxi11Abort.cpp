#include "kyvisa/transport/Vxi11Abort.h"

#include "kyvisa/os/Connector.h"
#include "kyvisa/transport/RpcClient.h"

#include <array>

namespace kyvisa
{

using namespace wire;
using os::IoResult;

bool abortLink(const std::string &host, std::uint16_t port, vxi11::LinkId link, const os::WaitLimit &limit)
{
    os::StreamSocket socket;
    if (os::connectStream(host, port, limit, socket) != IoResult::Done)
        return false;
    RpcClient channel(std::move(socket), vxi11::AbortProgram, vxi11::Version);
    auto arguments = channel.begin(vxi11::DeviceAbort);
    encode(arguments, vxi11::Link{link});
    rpc::Reply reply;
    std::array<std::byte, 4> bytes{};
    if (channel.send(limit) != IoResult::Done || channel.receive(reply, limit) != IoResult::Done || !reply.success() ||
        channel.take(bytes, limit).result != IoResult::Done)
        return false;
    vxi11::ErrorResult result;
    xdr::Reader reader(bytes);
    return decode(reader, result) && result.error == vxi11::Error::NoError;
}

} // namespace kyvisa
