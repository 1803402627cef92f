#pragma once

#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"
#include "simulator/server/ListenAddress.h"

#include <cstdint>
#include <functional>

namespace simulator
{

/// Accepts TCP connections on one address and hands them on, non-blocking.
class Listener
{
public:
    using Accepted = std::function<void(FileDescriptor)>;

    /// Port 0 takes a free one. Throws std::system_error when the address or the port cannot be had.
    Listener(EventLoop &loop, const ListenAddress &address, std::uint16_t port, Accepted accepted);
    ~Listener();
    Listener(const Listener &) = delete;
    Listener &operator=(const Listener &) = delete;

    std::uint16_t port() const { return m_port; }

private:
    void watch();
    void accept();

    EventLoop &m_loop;
    FileDescriptor m_socket;
    std::uint16_t m_port = 0;
    Accepted m_accepted;
    EventLoop::WatchId m_watch = 0;
    Timers::Id m_pause = Timers::None;
};

} // namespace simulator
