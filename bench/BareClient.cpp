#include "bench/BareClient.h"

#include "wire/Hislip.h"

#include <arpa/inet.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstring>
#include <memory>
#include <stdexcept>

namespace bench
{
namespace
{

using wire::hislip::Header;
using wire::hislip::HeaderSize;
using wire::hislip::MessageType;

sockaddr_in loopback(std::uint16_t port)
{
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return address;
}

void noDelay(int fd)
{
    const int on = 1;
    ::setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
}

int connectTo(std::uint16_t port)
{
    const int fd = ::socket(AF_INET, SOCK_STREAM, 0);
    const sockaddr_in address = loopback(port);
    if (fd < 0 || ::connect(fd, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0)
        throw std::runtime_error("cannot connect");
    noDelay(fd);
    return fd;
}

int listenSomewhere()
{
    const int listener = ::socket(AF_INET, SOCK_STREAM, 0);
    const sockaddr_in address = loopback(0);
    if (::bind(listener, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0 ||
        ::listen(listener, 1) != 0)
        throw std::runtime_error("cannot listen");
    return listener;
}

std::uint16_t portOf(int listener)
{
    sockaddr_in address{};
    socklen_t length = sizeof address;
    ::getsockname(listener, reinterpret_cast<sockaddr *>(&address), &length);
    return ntohs(address.sin_port);
}

void sendAll(int fd, const void *data, std::size_t size)
{
    const char *at = static_cast<const char *>(data);
    while (size > 0) {
        const ssize_t sent = ::send(fd, at, size, MSG_NOSIGNAL);
        if (sent <= 0)
            throw std::runtime_error("send failed");
        at += sent;
        size -= static_cast<std::size_t>(sent);
    }
}

void receiveAll(int fd, void *data, std::size_t size)
{
    char *at = static_cast<char *>(data);
    while (size > 0) {
        const ssize_t received = ::recv(fd, at, size, 0);
        if (received <= 0)
            throw std::runtime_error("recv failed");
        at += received;
        size -= static_cast<std::size_t>(received);
    }
}

Header receiveHeader(int fd)
{
    std::array<std::byte, HeaderSize> bytes;
    receiveAll(fd, bytes.data(), bytes.size());
    Header header;
    if (!wire::hislip::decode(bytes, header))
        throw std::runtime_error("not a HiSLIP header");
    return header;
}

} // namespace

BareEcho::BareEcho()
{
    const int listener = listenSomewhere();
    const std::uint16_t port = portOf(listener);
    m_process = ::fork();
    if (m_process == 0) {
        const int peer = ::accept(listener, nullptr, nullptr);
        noDelay(peer);
        char byte;
        while (::recv(peer, &byte, 1, 0) == 1)
            sendAll(peer, &byte, 1);
        ::_exit(0);
    }
    m_socket = connectTo(port);
    ::close(listener);
}

BareEcho::~BareEcho()
{
    ::close(m_socket);
    ::waitpid(m_process, nullptr, 0);
}

void BareEcho::ping()
{
    char byte = '.';
    sendAll(m_socket, &byte, 1);
    receiveAll(m_socket, &byte, 1);
}

BareSocket::BareSocket(std::uint16_t port) : m_socket(connectTo(port)) {}

BareSocket::~BareSocket()
{
    ::close(m_socket);
}

std::size_t BareSocket::query(std::string_view command, char *answer, std::size_t size)
{
    sendAll(m_socket, command.data(), command.size());
    std::size_t got = 0;
    do {
        const ssize_t received = ::recv(m_socket, answer + got, size - got, 0);
        if (received <= 0)
            throw std::runtime_error("recv failed");
        got += static_cast<std::size_t>(received);
    } while (answer[got - 1] != '\n');
    return got;
}

void BareSocket::write(const void *data, std::size_t size)
{
    sendAll(m_socket, data, size);
}

void BareSocket::readAll(void *data, std::size_t size)
{
    receiveAll(m_socket, data, size);
}

BareHislip::BareHislip(std::uint16_t port)
    : m_synchronous(connectTo(port)), m_asynchronous(-1), m_messageId(wire::hislip::FirstMessageId)
{
    const std::string_view subAddress = "hislip0";
    auto hello =
        wire::hislip::encode({MessageType::Initialize, 0,
                              wire::hislip::initializeParameter(wire::hislip::Version1, 0x5A5A), subAddress.size()});
    std::memcpy(m_out, hello.data(), HeaderSize);
    std::memcpy(m_out + HeaderSize, subAddress.data(), subAddress.size());
    sendAll(m_synchronous, m_out, HeaderSize + subAddress.size());
    const std::uint32_t session = receiveHeader(m_synchronous).parameter & 0xFFFF;

    m_asynchronous = connectTo([this] {
        sockaddr_in peer{};
        socklen_t length = sizeof peer;
        ::getpeername(m_synchronous, reinterpret_cast<sockaddr *>(&peer), &length);
        return ntohs(peer.sin_port);
    }());
    hello = wire::hislip::encode({MessageType::AsyncInitialize, 0, session, 0});
    sendAll(m_asynchronous, hello.data(), hello.size());
    receiveHeader(m_asynchronous);
}

BareHislip::~BareHislip()
{
    ::close(m_asynchronous);
    ::close(m_synchronous);
}

std::size_t BareHislip::query(std::string_view command, char *answer, std::size_t size)
{
    const auto header = wire::hislip::encode({MessageType::DataEnd, 0, m_messageId, command.size()});
    m_messageId += 2;
    std::memcpy(m_out, header.data(), HeaderSize);
    std::memcpy(m_out + HeaderSize, command.data(), command.size());
    sendAll(m_synchronous, m_out, HeaderSize + command.size());

    std::size_t got = 0;
    std::size_t wanted = HeaderSize;
    do {
        const ssize_t received = ::recv(m_synchronous, m_in + got, sizeof m_in - got, 0);
        if (received <= 0)
            throw std::runtime_error("recv failed");
        got += static_cast<std::size_t>(received);
        if (got >= HeaderSize && wanted == HeaderSize) {
            Header answerHeader;
            wire::hislip::decode(
                std::span<const std::byte, HeaderSize>(reinterpret_cast<const std::byte *>(m_in), HeaderSize),
                answerHeader);
            wanted += static_cast<std::size_t>(answerHeader.payloadLength);
        }
    } while (got < wanted);
    const std::size_t length = std::min(size, wanted - HeaderSize);
    std::memcpy(answer, m_in + HeaderSize, length);
    return length;
}

BareCopy::BareCopy(std::size_t size) : m_size(size)
{
    const int listener = listenSomewhere();
    const std::uint16_t port = portOf(listener);
    m_process = ::fork();
    if (m_process == 0) {
        const int peer = ::accept(listener, nullptr, nullptr);
        noDelay(peer);
        const auto memory = std::make_unique<char[]>(size);
        std::memset(memory.get(), 'x', size);
        char request;
        while (::recv(peer, &request, 1, 0) == 1) {
            if (request == 'w') {
                receiveAll(peer, memory.get(), size);
                sendAll(peer, "k", 1);
            } else {
                sendAll(peer, memory.get(), size);
            }
        }
        ::_exit(0);
    }
    m_socket = connectTo(port);
    ::close(listener);
}

BareCopy::~BareCopy()
{
    ::close(m_socket);
    ::waitpid(m_process, nullptr, 0);
}

void BareCopy::write(const char *data)
{
    sendAll(m_socket, "w", 1);
    sendAll(m_socket, data, m_size);
    char answer;
    receiveAll(m_socket, &answer, 1);
}

void BareCopy::read(char *data)
{
    sendAll(m_socket, "r", 1);
    receiveAll(m_socket, data, m_size);
}

} // namespace bench
