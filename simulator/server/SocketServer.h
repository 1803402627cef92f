#pragma once

#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"

#include <map>
#include <memory>

namespace simulator
{

class Instrument;

/**
 * The raw socket: program messages that end with a line feed, answers that end with one. There is no END, no status byte, no clear; an
 * answer that nobody has read is simply the first one read next.
 */
class SocketServer
{
public:
    static constexpr std::size_t MaxClients = 64;

    SocketServer(EventLoop &loop, Instrument &instrument);
    ~SocketServer();

    void accept(FileDescriptor socket);

private:
    class Client;

    EventLoop &m_loop;
    Instrument &m_instrument;
    std::map<Client *, std::shared_ptr<Client>> m_clients;
};

} // namespace simulator
