#include "kyvisa/discovery/Vxi11Query.h"

#include "kyvisa/transport/PortLookup.h"
#include "wire/Portmap.h"
#include "wire/Rpc.h"
#include "wire/Vxi11.h"

#include <random>

namespace kyvisa
{

using namespace wire;

namespace
{

constexpr std::chrono::milliseconds Schedule[] = {std::chrono::milliseconds(0), std::chrono::milliseconds(100),
                                                  std::chrono::milliseconds(500)};

} // namespace

Vxi11Query::Vxi11Query(std::span<const os::NetworkInterface> interfaces, Found found)
    : m_found(std::move(found)), m_xid(std::random_device()())
{
    for (const os::NetworkInterface &interface : interfaces)
        if (interface.canBroadcast)
            open(interface);
}

std::span<const std::chrono::milliseconds> Vxi11Query::schedule() const
{
    return Schedule;
}

void Vxi11Query::askOn(Link &link)
{
    std::vector<std::byte> packet;
    xdr::Writer writer(packet);
    rpc::Call call{m_xid, portmap::Program, portmap::Version, static_cast<std::uint32_t>(portmap::Procedure::GetPort)};
    encode(writer, call);
    encode(writer, portmap::Mapping{vxi11::CoreProgram, vxi11::Version, portmap::Tcp, 0});
    link.socket.send(packet, link.interface.broadcast, portmapperPort());
}

void Vxi11Query::take(std::span<const std::byte> answer, const std::string &from, Link &)
{
    xdr::Reader reader(answer);
    rpc::Reply reply;
    std::uint16_t port = 0;
    if (decode(reader, reply) && reply.xid == m_xid && reply.success() && portmap::decodePort(reader, port) &&
        port != 0)
        m_found(from, port);
}

} // namespace kyvisa
