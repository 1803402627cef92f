#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>

namespace test
{

/// A TCP client that says literal bytes to a server under test. Every wait ends; what does not come fails the running test.
class RawClient
{
public:
    explicit RawClient(std::uint16_t port, bool ipv6 = false);
    ~RawClient();
    RawClient(RawClient &&other) noexcept;
    RawClient &operator=(RawClient &&) = delete;

    void send(std::string_view bytes);
    /// As send(), but that the server may close meanwhile is no failure. False when it did.
    bool trySend(std::string_view bytes);
    /// Waits for exactly this many bytes.
    std::string receive(std::size_t count);
    /// Waits for a line, with its line feed.
    std::string receiveLine();
    /// Everything up to the server's closing.
    std::string receiveAll();
    /// True when nothing arrives for this long.
    bool silentFor(std::chrono::milliseconds span);
    /// Says that no more will be sent.
    void finishSending();
    void close();

private:
    int m_descriptor;
};

/// Bytes written as pairs of hexadecimal digits, blanks ignored.
std::string fromHex(std::string_view digits);

} // namespace test
