#pragma once

#include "simulator/server/EventLoop.h"
#include "simulator/server/FileDescriptor.h"
#include "wire/Portmap.h"
#include "wire/Rpc.h"

#include <map>
#include <memory>
#include <span>
#include <vector>

namespace simulator
{

/**
 * A portmapper for the simulator's own programs, over TCP and UDP: clients of VXI-11 ask it for the port, and find instruments by asking everybody.
 *
 * What it maps is decided at the start. Nobody else may register or remove anything (both answer "no"), and it passes no calls on.
 */
class Portmapper
{
public:
    static constexpr std::size_t MaxClients = 64;

    explicit Portmapper(EventLoop &loop);
    ~Portmapper();

    void add(const wire::portmap::Mapping &mapping) { m_mappings.push_back(mapping); }

    /// A client over TCP. When there are too many, the one that came first gives way: an answer takes no time.
    void accept(FileDescriptor socket);
    /// A bound UDP socket on which to answer. @param broadcasts a second one to listen on, or none: its answers leave by the first.
    void answerOn(FileDescriptor socket, FileDescriptor broadcasts);

private:
    class Client;
    struct Datagrams {
        FileDescriptor socket;
        EventLoop::WatchId watch;
    };

    void forget(std::uint64_t client);
    void listenOn(FileDescriptor socket, int answerBy);
    void datagrams(int socket, int answerBy);
    /// The datagram that answers this one; empty when nothing does.
    std::vector<std::byte> answer(std::span<const std::byte> datagram) const;
    /// Writes the results of a procedure. Another status than Success when there are none.
    wire::rpc::AcceptStatus execute(const wire::rpc::Call &call, wire::xdr::Reader arguments,
                                    wire::xdr::Writer &results) const;

    EventLoop &m_loop;
    std::vector<wire::portmap::Mapping> m_mappings;
    std::vector<Datagrams> m_sockets;
    std::map<std::uint64_t, std::shared_ptr<Client>> m_clients; ///< by their number, in the order in which they came
    std::uint64_t m_lastClient = 0;
};

} // namespace simulator
