#pragma once

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <mutex>
#include <thread>
#include <vector>

namespace test
{

/**
 * Stands between a client and a server on loopback and passes their bytes on, as badly as it was told: in small pieces, late,
 * several at once, or not to the end.
 */
class Relay
{
public:
    struct Manners {
        std::size_t piece = 64 * 1024;       ///< most bytes that are passed on at once
        std::chrono::microseconds delay{0};  ///< before each piece; what comes meanwhile is merged with it
        std::size_t cutAfter = SIZE_MAX;     ///< bytes to the client after which all connections end
        std::size_t cutAfterSent = SIZE_MAX; ///< the same for bytes to the server
    };

    Relay(std::uint16_t serverPort, Manners manners);
    ~Relay();
    Relay(const Relay &) = delete;
    Relay &operator=(const Relay &) = delete;

    std::uint16_t port() const { return m_port; }

private:
    void serve();
    void connect(int client);
    void pass(int from, int to, bool toClient);

    const std::uint16_t m_serverPort;
    const Manners m_manners;
    int m_listener;
    std::uint16_t m_port = 0;
    std::atomic<std::size_t> m_passed{0}; ///< to the client
    std::atomic<std::size_t> m_sent{0};   ///< to the server
    std::mutex m_mutex;
    std::vector<int> m_descriptors;
    std::vector<std::thread> m_threads;
    std::thread m_acceptor;
};

} // namespace test
