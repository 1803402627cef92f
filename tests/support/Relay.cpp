#include "support/Relay.h"

#include <arpa/inet.h>
#include <netinet/tcp.h>
#include <stdexcept>
#include <sys/socket.h>
#include <unistd.h>

namespace test
{
namespace
{

sockaddr_in loopback(std::uint16_t port)
{
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return address;
}

void sendAll(int to, const char *data, std::size_t size)
{
    while (size > 0) {
        const ssize_t sent = ::send(to, data, size, MSG_NOSIGNAL);
        if (sent <= 0)
            return;
        data += sent;
        size -= static_cast<std::size_t>(sent);
    }
}

} // namespace

Relay::Relay(std::uint16_t serverPort, Manners manners)
    : m_serverPort(serverPort), m_manners(manners), m_listener(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0))
{
    sockaddr_in address = loopback(0);
    socklen_t length = sizeof address;
    if (::bind(m_listener, reinterpret_cast<sockaddr *>(&address), sizeof address) != 0 ||
        ::listen(m_listener, 64) != 0 ||
        ::getsockname(m_listener, reinterpret_cast<sockaddr *>(&address), &length) != 0)
        throw std::runtime_error("the relay has no port");
    m_port = ntohs(address.sin_port);
    m_acceptor = std::thread([this] { serve(); });
}

Relay::~Relay()
{
    ::shutdown(m_listener, SHUT_RDWR);
    m_acceptor.join();
    for (const int descriptor : m_descriptors)
        ::shutdown(descriptor, SHUT_RDWR);
    for (std::thread &thread : m_threads)
        thread.join();
    for (const int descriptor : m_descriptors)
        ::close(descriptor);
    ::close(m_listener);
}

void Relay::serve()
{
    for (;;) {
        const int client = ::accept4(m_listener, nullptr, nullptr, SOCK_CLOEXEC);
        if (client < 0)
            return;
        connect(client);
    }
}

void Relay::connect(int client)
{
    const int server = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const sockaddr_in address = loopback(m_serverPort);
    const int on = 1;
    ::setsockopt(server, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    ::setsockopt(client, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    const std::lock_guard lock(m_mutex);
    m_descriptors.insert(m_descriptors.end(), {client, server});
    if (::connect(server, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0) {
        ::shutdown(client, SHUT_RDWR);
        return;
    }
    m_threads.emplace_back([=, this] { pass(client, server, false); });
    m_threads.emplace_back([=, this] { pass(server, client, true); });
}

void Relay::pass(int from, int to, bool toClient)
{
    std::vector<char> buffer(m_manners.piece);
    for (;;) {
        if (m_manners.delay.count() > 0) {
            char first;
            if (::recv(from, &first, 1, MSG_PEEK) <= 0)
                break;
            std::this_thread::sleep_for(m_manners.delay);
        }
        const ssize_t got = ::recv(from, buffer.data(), buffer.size(), 0);
        if (got <= 0)
            break;
        auto size = static_cast<std::size_t>(got);
        const std::size_t cut = toClient ? m_manners.cutAfter : m_manners.cutAfterSent;
        const std::size_t before = (toClient ? m_passed : m_sent).fetch_add(size);
        if (before + size > cut) {
            sendAll(to, buffer.data(), cut > before ? cut - before : 0);
            const std::lock_guard lock(m_mutex);
            for (const int descriptor : m_descriptors)
                ::shutdown(descriptor, SHUT_RDWR);
            return;
        }
        sendAll(to, buffer.data(), size);
    }
    ::shutdown(to, SHUT_WR);
}

} // namespace test
