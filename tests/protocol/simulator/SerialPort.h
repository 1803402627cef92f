#pragma once

#include <gtest/gtest.h>

#include <fcntl.h>
#include <poll.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <functional>
#include <string>
#include <string_view>

namespace test
{

/// Milliseconds.
constexpr int PortPatience = 30000;
constexpr int PortBrief = 200; // enough to see what comes, short enough to wait for what does not

/// A port that is open.
class SerialPort
{
public:
    explicit SerialPort(const std::string &name, int flags = O_RDWR)
        : m_port(::open(name.c_str(), flags | O_NOCTTY | O_NONBLOCK | O_CLOEXEC))
    {
        EXPECT_GE(m_port, 0) << name << ": " << std::strerror(errno);
    }
    ~SerialPort() { close(); }
    SerialPort(const SerialPort &) = delete;
    SerialPort &operator=(const SerialPort &) = delete;

    void close()
    {
        if (m_port >= 0)
            ::close(m_port);
        m_port = -1;
    }
    int get() const { return m_port; }

    void send(std::string_view bytes)
    {
        while (!bytes.empty()) {
            pollfd state{m_port, POLLOUT, 0};
            ASSERT_EQ(::poll(&state, 1, PortPatience), 1) << "the port takes no more";
            const ssize_t count = ::write(m_port, bytes.data(), bytes.size());
            if (count > 0)
                bytes.remove_prefix(static_cast<std::size_t>(count));
        }
    }
    /// Writes what goes at once. The number of bytes.
    std::size_t sendWhatGoes(std::string_view bytes)
    {
        std::size_t sent = 0;
        for (ssize_t count = 1; count > 0 && sent < bytes.size();) {
            pollfd state{m_port, POLLOUT, 0};
            if (::poll(&state, 1, PortBrief) != 1)
                break;
            count = ::write(m_port, bytes.data() + sent, bytes.size() - sent);
            sent += count > 0 ? static_cast<std::size_t>(count) : 0;
        }
        return sent;
    }
    /// Waits for this many bytes.
    std::string receive(std::size_t count, int patience = PortPatience)
    {
        return receiveUntil([=](const std::string &text) { return text.size() >= count; }, count, patience);
    }
    std::string receiveLine(int patience = PortPatience)
    {
        return receiveUntil([](const std::string &text) { return text.ends_with('\n'); }, 1, patience);
    }
    std::string ask(std::string_view query)
    {
        send(query);
        return receiveLine();
    }
    termios settings() const
    {
        termios result{};
        EXPECT_EQ(::tcgetattr(m_port, &result), 0);
        return result;
    }
    void useXonXoff() const
    {
        termios changed = settings();
        changed.c_iflag |= IXON | IXOFF;
        EXPECT_EQ(::tcsetattr(m_port, TCSANOW, &changed), 0);
    }

private:
    std::string receiveUntil(const std::function<bool(const std::string &)> &enough, std::size_t atOnce, int patience)
    {
        std::string text;
        while (!enough(text)) {
            pollfd state{m_port, POLLIN, 0};
            if (::poll(&state, 1, patience) != 1)
                return text;
            std::array<char, 4096> piece;
            const std::size_t most = atOnce == 1 ? 1 : std::min(piece.size(), atOnce - text.size());
            const ssize_t got = ::read(m_port, piece.data(), most);
            if (got <= 0)
                return text;
            text.append(piece.data(), static_cast<std::size_t>(got));
        }
        return text;
    }

    int m_port;
};

} // namespace test
