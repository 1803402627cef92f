#include "soak/Stream.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace soak
{
namespace
{

constexpr int Patience = 30000; // milliseconds

[[noreturn]] void fail(const std::string &what)
{
    throw std::runtime_error(what + ": " + std::strerror(errno));
}

} // namespace

Stream::Stream(std::uint16_t port) : m_descriptor(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0))
{
    sockaddr_in name{};
    name.sin_family = AF_INET;
    name.sin_port = htons(port);
    name.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (::connect(m_descriptor, reinterpret_cast<const sockaddr *>(&name), sizeof name) != 0) {
        ::close(m_descriptor);
        fail("connect");
    }
    const int on = 1;
    ::setsockopt(m_descriptor, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
}

Stream::Stream(const std::string &device) : m_descriptor(::open(device.c_str(), O_RDWR | O_NOCTTY | O_CLOEXEC))
{
    if (m_descriptor < 0)
        fail(device);
    termios settings{};
    ::tcgetattr(m_descriptor, &settings);
    ::cfmakeraw(&settings);
    ::tcsetattr(m_descriptor, TCSANOW, &settings);
}

Stream::~Stream()
{
    ::close(m_descriptor);
}

void Stream::wait(short events)
{
    pollfd watched{m_descriptor, events, 0};
    const int ready = ::poll(&watched, 1, Patience);
    if (ready < 0)
        fail("poll");
    if (ready == 0)
        throw std::runtime_error("no answer in time");
}

void Stream::send(std::string_view bytes)
{
    while (!bytes.empty()) {
        wait(POLLOUT);
        const ssize_t count = ::write(m_descriptor, bytes.data(), bytes.size());
        if (count <= 0)
            fail("send");
        bytes.remove_prefix(static_cast<std::size_t>(count));
    }
}

std::string Stream::receive(std::size_t count)
{
    std::string result(count, '\0');
    std::size_t have = 0;
    while (have < count) {
        wait(POLLIN);
        const ssize_t got = ::read(m_descriptor, result.data() + have, count - have);
        if (got == 0)
            throw std::runtime_error("the connection ended");
        if (got < 0)
            fail("receive");
        have += static_cast<std::size_t>(got);
    }
    return result;
}

std::string bigEndian(std::uint64_t value, unsigned bytes)
{
    std::string result;
    for (unsigned i = bytes; i > 0; --i)
        result += static_cast<char>(value >> 8 * (i - 1) & 0xFF);
    return result;
}

std::uint64_t fromBigEndian(std::string_view bytes)
{
    std::uint64_t value = 0;
    for (const char byte : bytes)
        value = value << 8 | static_cast<unsigned char>(byte);
    return value;
}

} // namespace soak
