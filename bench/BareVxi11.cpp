#include "bench/BareVxi11.h"

#include <arpa/inet.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <stdexcept>

namespace bench
{
namespace
{

constexpr std::uint32_t LastFragment = 0x80000000u;
constexpr std::size_t ReplyHeader = 7; // words: mark, transaction id, reply, accepted, no verifier, success

int connectTo(std::uint16_t port)
{
    const int fd = ::socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (fd < 0 || ::connect(fd, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0)
        throw std::runtime_error("cannot connect");
    const int on = 1;
    ::setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    return fd;
}

void exchange(int fd, const void *call, std::size_t size, std::uint32_t *reply, std::size_t room)
{
    if (::send(fd, call, size, MSG_NOSIGNAL) != static_cast<ssize_t>(size))
        throw std::runtime_error("send failed");
    std::size_t got = 0;
    std::size_t wanted = sizeof *reply;
    do {
        const ssize_t received = ::recv(fd, reinterpret_cast<char *>(reply) + got, room - got, 0);
        if (received <= 0)
            throw std::runtime_error("recv failed");
        got += static_cast<std::size_t>(received);
        if (got >= sizeof *reply)
            wanted = sizeof *reply + (ntohl(reply[0]) & ~LastFragment);
    } while (got < wanted);
}

/// The words of a call's header behind the mark.
std::uint32_t *header(std::uint32_t *out, std::uint32_t xid, std::uint32_t program, std::uint32_t version,
                      std::uint32_t procedure)
{
    const std::uint32_t words[] = {xid, 0, 2, program, version, procedure, 0, 0, 0, 0};
    for (const std::uint32_t word : words)
        *out++ = htonl(word);
    return out;
}

} // namespace

BareVxi11::BareVxi11(std::uint16_t portmapper) : m_socket(-1)
{
    const int asking = connectTo(portmapper);
    std::uint32_t *end = header(m_out + 1, 1, 100000, 2, 3);
    for (const std::uint32_t word : {0x0607AFu, 1u, 6u, 0u})
        *end++ = htonl(word);
    m_out[0] = htonl(LastFragment | static_cast<std::uint32_t>((end - m_out - 1) * 4));
    exchange(asking, m_out, static_cast<std::size_t>(end - m_out) * 4, m_in, sizeof m_in);
    ::close(asking);
    m_socket = connectTo(static_cast<std::uint16_t>(ntohl(m_in[ReplyHeader])));

    std::uint32_t *at = arguments(10); // create_link
    for (const std::uint32_t word : {0u, 0u, 0u, 5u})
        *at++ = htonl(word);
    std::memcpy(at, "inst0\0\0\0", 8);
    call(at + 2);
    m_link = m_in[ReplyHeader + 1];
}

BareVxi11::~BareVxi11()
{
    ::close(m_socket);
}

std::uint32_t *BareVxi11::arguments(std::uint32_t procedure)
{
    return header(m_out + 1, ++m_xid, 0x0607AF, 1, procedure);
}

void BareVxi11::call(const std::uint32_t *end)
{
    m_out[0] = htonl(LastFragment | static_cast<std::uint32_t>((end - m_out - 1) * 4));
    exchange(m_socket, m_out, static_cast<std::size_t>(end - m_out) * 4, m_in, sizeof m_in);
    if (m_in[ReplyHeader] != 0)
        throw std::runtime_error("the instrument refused");
}

std::size_t BareVxi11::query(std::string_view command, char *answer, std::size_t size)
{
    std::uint32_t *at = arguments(11); // device_write, with END
    *at++ = m_link;
    for (const std::uint32_t word : {30000u, 0u, 8u, static_cast<std::uint32_t>(command.size())})
        *at++ = htonl(word);
    const std::size_t words = (command.size() + 3) / 4;
    at[words - 1] = 0;
    std::memcpy(at, command.data(), command.size());
    call(at + words);

    at = arguments(12); // device_read
    *at++ = m_link;
    for (const std::uint32_t word : {static_cast<std::uint32_t>(size), 30000u, 0u, 0u, 0u})
        *at++ = htonl(word);
    call(at);
    const std::size_t length = std::min<std::size_t>(ntohl(m_in[ReplyHeader + 2]), size);
    std::memcpy(answer, m_in + ReplyHeader + 3, length);
    return length;
}

} // namespace bench
