#pragma once

#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"

#include <cstdint>
#include <map>
#include <memory>

namespace simulator
{

class Instrument;

/**
 * The raw socket: program messages that end with a line feed, answers that end with one. There is no END, no status byte, no clear; an
 * answer that nobody has read is simply the first one read next. When
 * there are too many clients, the oldest that has never said anything gives way to a new one.
 */
class SocketServer
{
public:
    SocketServer(EventLoop &loop, Instrument &instrument, std::size_t maxClients);
    ~SocketServer();

    void accept(FileDescriptor socket);

private:
    class Client;

    void forget(const Client &client);

    EventLoop &m_loop;
    Instrument &m_instrument;
    const std::size_t m_maxClients;
    std::map<std::uint64_t, std::shared_ptr<Client>> m_clients; ///< by their number, in the order in which they came
    std::uint64_t m_lastClient = 0;
};

} // namespace simulator
