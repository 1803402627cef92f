#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <sys/socket.h>
#include <thread>

namespace test
{

/// One connection that a client made to a ScriptedPeer. What goes wrong fails the running test.
class PeerConnection
{
public:
    explicit PeerConnection(int descriptor) : m_descriptor(descriptor) {}
    ~PeerConnection();
    PeerConnection(PeerConnection &&other) noexcept;
    PeerConnection &operator=(PeerConnection &&) = delete;

    /// Waits for exactly these bytes.
    void expect(std::string_view bytes);
    /// Takes this many bytes, whatever they are.
    std::string take(std::size_t count);
    /// As take(), but the client may close before: fewer bytes then, and no failure.
    std::string takeUntilClosed(std::size_t count);
    void send(std::string_view bytes);
    /// Sends until the client has gone or does not read any more; never fails.
    bool trySend(std::string_view bytes);
    /// Waits until the client has closed.
    void expectClosed();
    /// True when nothing arrives for this long.
    bool silentFor(std::chrono::milliseconds span);
    void close();
    /// Closes with a reset.
    void reset();

private:
    int m_descriptor;
};

/**
 * A server that follows a script on a thread of its own: the script accepts connections, says literal bytes and checks the
 * literal bytes that the client sent. Every wait inside is bounded, so a test that goes wrong ends.
 */
class ScriptedPeer
{
public:
    using Script = std::function<void(ScriptedPeer &)>;

    explicit ScriptedPeer(Script script, bool ipv6 = false);
    /// On this IPv4 address and port.
    ScriptedPeer(Script script, const char *address, std::uint16_t port);
    /// Waits until the script has run to its end.
    ~ScriptedPeer();
    ScriptedPeer(const ScriptedPeer &) = delete;
    ScriptedPeer &operator=(const ScriptedPeer &) = delete;

    std::uint16_t port() const { return m_port; }
    PeerConnection accept();
    void finish();

private:
    void listen(sockaddr *address, socklen_t length);

    int m_listener;
    std::uint16_t m_port = 0;
    std::thread m_thread;
};

/// Bytes written as pairs of hexadecimal digits, blanks ignored.
std::string hex(std::string_view digits);

} // namespace test
