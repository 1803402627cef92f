#include "kyvisa/discovery/LanQuery.h"

#include <arpa/inet.h>

#include <array>

namespace kyvisa
{
namespace
{

constexpr std::size_t LargestAnswer = 9000; // RFC 6762 section 17
constexpr int MostAtOnce = 256;

} // namespace

void LanQuery::open(const os::NetworkInterface &interface)
{
    os::DatagramSocket socket(interface);
    if (socket.isOpen())
        m_links.push_back({interface, std::move(socket)});
}

void LanQuery::ask()
{
    for (Link &link : m_links)
        askOn(link);
}

void LanQuery::collect(std::size_t socket)
{
    std::array<std::byte, LargestAnswer> buffer;
    for (int count = 0; count < MostAtOnce; ++count) {
        in_addr from{};
        const auto size = m_links[socket].socket.receive(buffer, from);
        if (!size)
            return;
        std::array<char, INET_ADDRSTRLEN> text{};
        ::inet_ntop(AF_INET, &from, text.data(), text.size());
        take(std::span(buffer).first(*size), text.data(), m_links[socket]);
    }
}

} // namespace kyvisa
