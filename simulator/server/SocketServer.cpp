#include "simulator/server/SocketServer.h"

#include "simulator/instrument/Instrument.h"
#include "simulator/instrument/MessageExchange.h"
#include "simulator/server/Connection.h"

#include <algorithm>

namespace simulator
{
namespace
{

// More than this on its way to a client, and its next message waits.
constexpr std::size_t EnoughUnsent = 1024 * 1024;
constexpr std::chrono::hours PatienceForLastAnswer{1};

} // namespace

class SocketServer::Client final : Connection::Owner, MessageExchange::Client
{
public:
    Client(SocketServer &server, FileDescriptor socket, std::uint64_t number)
        : m_number(number), m_server(server), m_traffic(server.m_instrument.traffic, "socket", peerOf(socket)),
          m_exchange(server.m_instrument, *this, {false, true, {}}),
          m_connection(server.m_loop, std::move(socket), *this),
          m_lockOwner(server.m_instrument.locks.join([this] { received(); }, &m_traffic))
    {
        m_exchange.setTraffic(&m_traffic);
    }
    ~Client() { m_server.m_instrument.locks.leave(m_lockOwner); }

    bool isSilent() const { return m_silent; }
    /// Has said all, and is there for nothing but answers that it does not read.
    bool isLeaving() const { return m_connection.inputEnded(); }
    std::uint64_t number() const { return m_number; }

private:
    bool mayGoOn() const
    {
        return m_exchange.accepting() && m_connection.unsent() < EnoughUnsent &&
               (m_exchange.inMessage() || m_server.m_instrument.locks.allows(m_lockOwner));
    }

    void received() override
    {
        m_silent = m_silent && m_connection.input().empty();
        answer();
        while (!m_connection.input().empty() && mayGoOn()) {
            m_server.m_instrument.remote.addressed();
            std::span<const std::byte> bytes = m_connection.input();
            const std::size_t before = bytes.size();
            m_exchange.receive(bytes);
            m_connection.consume(before - bytes.size());
            answer();
        }
        // A client that has said all still gets its answers.
        if (m_connection.inputEnded() && m_exchange.accepting() && m_connection.input().empty())
            m_connection.closeAfterSending(PatienceForLastAnswer);
    }

    void answer()
    {
        if (!m_exchange.output().isComplete())
            return;
        std::vector<Outgoing> message = toOutgoing(m_exchange.output().take());
        MessageForm form{FaultProtocol::Socket, true};
        form.payloadSize = sizeOf(message) - 1; // without the line feed
        form.end = EndMark::LastByte;
        m_connection.sendPast(m_server.m_instrument.faults, form, std::move(message));
    }

    std::span<std::byte> directInput() override
    {
        return mayGoOn() ? m_exchange.directInput() : std::span<std::byte>{};
    }
    void directReceived(std::size_t count) override { m_exchange.directReceived(count); }
    void drained() override { received(); }
    void inputAccepted() override { received(); }

    void closed() override { m_server.forget(*this); }

    const std::uint64_t m_number;
    bool m_silent = true; ///< has never said anything
    SocketServer &m_server;
    TrafficLog::Client m_traffic;
    MessageExchange m_exchange;
    Connection m_connection;
    LockTable::Owner m_lockOwner;
};

SocketServer::SocketServer(EventLoop &loop, Instrument &instrument, std::size_t maxClients)
    : m_loop(loop), m_instrument(instrument), m_maxClients(maxClients)
{
}

SocketServer::~SocketServer() = default;

void SocketServer::accept(FileDescriptor socket)
{
    if (m_clients.size() >= m_maxClients) {
        auto dispensable =
            std::find_if(m_clients.begin(), m_clients.end(), [](const auto &each) { return each.second->isSilent(); });
        if (dispensable == m_clients.end())
            dispensable = std::find_if(m_clients.begin(), m_clients.end(),
                                       [](const auto &each) { return each.second->isLeaving(); });
        if (dispensable == m_clients.end())
            return; // closes it
        forget(*dispensable->second);
    }
    const std::uint64_t number = ++m_lastClient;
    m_clients.emplace(number, std::make_shared<Client>(*this, std::move(socket), number));
}

void SocketServer::forget(const Client &client)
{
    const auto found = m_clients.find(client.number());
    if (found == m_clients.end())
        return;
    m_loop.destroyLater(found->second);
    m_clients.erase(found);
}

} // namespace simulator
