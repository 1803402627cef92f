#include "simulator/server/SocketServer.h"

#include "simulator/instrument/Instrument.h"
#include "simulator/instrument/MessageExchange.h"
#include "simulator/server/Connection.h"

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
    Client(SocketServer &server, FileDescriptor socket)
        : m_server(server), m_exchange(server.m_instrument, *this, {false, true, {}}),
          m_connection(server.m_loop, std::move(socket), *this),
          m_lockOwner(server.m_instrument.locks.join([this] { received(); }))
    {
    }
    ~Client() { m_server.m_instrument.locks.leave(m_lockOwner); }

private:
    bool mayGoOn() const
    {
        return m_exchange.accepting() && m_connection.unsent() < EnoughUnsent &&
               (m_exchange.inMessage() || m_server.m_instrument.locks.allows(m_lockOwner));
    }

    void received() override
    {
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
        if (m_exchange.output().isComplete())
            m_connection.send(toOutgoing(m_exchange.output().take()));
    }

    std::span<std::byte> directInput() override
    {
        return mayGoOn() ? m_exchange.directInput() : std::span<std::byte>{};
    }
    void directReceived(std::size_t count) override { m_exchange.directReceived(count); }
    void drained() override { received(); }
    void inputAccepted() override { received(); }

    void closed() override
    {
        const auto self = m_server.m_clients.find(this);
        if (self == m_server.m_clients.end())
            return;
        m_server.m_loop.destroyLater(self->second);
        m_server.m_clients.erase(self);
    }

    SocketServer &m_server;
    MessageExchange m_exchange;
    Connection m_connection;
    LockTable::Owner m_lockOwner;
};

SocketServer::SocketServer(EventLoop &loop, Instrument &instrument) : m_loop(loop), m_instrument(instrument) {}

SocketServer::~SocketServer() = default;

void SocketServer::accept(FileDescriptor socket)
{
    if (m_clients.size() >= MaxClients)
        return; // closes it
    const auto client = std::make_shared<Client>(*this, std::move(socket));
    m_clients.emplace(client.get(), client);
}

} // namespace simulator
