#include "simulator/server/HislipServer.h"

#include "simulator/instrument/Characters.h"

#include <algorithm>
#include <utility>

namespace simulator
{

using namespace wire::hislip;

namespace
{

// Sessions that are being told their end, and connections that have said nothing yet, come on top.
constexpr std::size_t ConnectionsPerSession = 2;

/// The LAN device names that this instrument answers to.
bool isOurs(std::string_view subAddress)
{
    if (subAddress.ends_with('\0'))
        subAddress.remove_suffix(1);
    constexpr std::string_view Ours = "HISLIP0";
    return subAddress.empty() || std::equal(subAddress.begin(), subAddress.end(), Ours.begin(), Ours.end(),
                                            [](char a, char b) { return toUpper(a) == b; });
}

} // namespace

/// A connection that has not said yet what it is.
class HislipServer::Newcomer final : public Connection::Owner
{
public:
    Newcomer(HislipServer &server, FileDescriptor socket, std::uint64_t order)
        : number(order), m_server(server),
          m_channel(std::make_unique<Connection>(server.m_loop, std::move(socket), *this)),
          m_timer(server.m_loop.after(server.m_options.patience.introduction, [this] { m_server.forget(*this); }))
    {
    }
    ~Newcomer() { m_server.m_loop.cancel(m_timer); }

    HislipChannel &channel() { return m_channel; }

    const std::uint64_t number; ///< in the order in which they came

    void refuse(FatalErrorCode code, std::string_view text)
    {
        m_refused = true;
        m_channel.sendFatalError(code, text);
        m_channel.connection().closeAfterSending(m_server.m_options.patience.lastWords);
    }

private:
    void received() override
    {
        if (m_refused)
            return;
        switch (m_channel.next()) {
        case HislipChannel::Next::Malformed:
            return refuse(FatalErrorCode::BadHeader, "poorly formed message header");
        case HislipChannel::Next::Message:
            if (m_channel.header().payloadLength > MaxSubAddress + 1)
                return refuse(FatalErrorCode::BadInitialization, "sub-address too long");
            if (m_channel.payloadComplete())
                return m_server.introduced(*this);
            break;
        case HislipChannel::Next::Nothing:
            break;
        }
        if (m_channel.connection().inputEnded())
            m_server.forget(*this);
    }
    void closed() override { m_server.forget(*this); }

    HislipServer &m_server;
    HislipChannel m_channel;
    Timers::Id m_timer;
    bool m_refused = false;
};

HislipServer::HislipServer(EventLoop &loop, Instrument &instrument, HislipOptions options)
    : m_loop(loop), m_instrument(instrument), m_options(options)
{
}

HislipServer::~HislipServer() = default;

void HislipServer::accept(FileDescriptor socket)
{
    // Whoever opens connections and says nothing must not keep others out until patience is at an end.
    if (m_newcomers.size() >= ConnectionsPerSession * m_options.maxSessions)
        forget(*m_newcomers.begin()->second);
    const std::uint64_t number = ++m_lastNewcomer;
    m_newcomers.emplace(number, std::make_shared<Newcomer>(*this, std::move(socket), number));
}

void HislipServer::forget(Newcomer &newcomer)
{
    const auto found = m_newcomers.find(newcomer.number);
    if (found == m_newcomers.end())
        return;
    m_loop.destroyLater(found->second);
    m_newcomers.erase(found);
}

void HislipServer::introduced(Newcomer &newcomer)
{
    switch (newcomer.channel().header().type) {
    case MessageType::Initialize:
        return initialize(newcomer);
    case MessageType::AsyncInitialize:
        return asyncInitialize(newcomer);
    case MessageType::FatalError:
        return forget(newcomer);
    default:
        newcomer.refuse(FatalErrorCode::BadInitialization, "the first message is Initialize or AsyncInitialize");
    }
}

void HislipServer::initialize(Newcomer &newcomer)
{
    HislipChannel &channel = newcomer.channel();
    if (!isOurs(channel.payload()))
        return newcomer.refuse(FatalErrorCode::BadInitialization, "there is no such sub-address");
    if (!makeRoom())
        return newcomer.refuse(FatalErrorCode::MaximumClients, "too many clients");
    channel.taken(static_cast<std::size_t>(channel.remaining()));
    const std::uint16_t id = freeId();
    const auto session = std::make_shared<HislipSession>(m_loop, m_instrument, m_options, id, channel.release(),
                                                         [this](HislipSession &ended) { forget(ended); });
    m_sessions.emplace(id, session);
    forget(newcomer);
    session->start();
}

void HislipServer::asyncInitialize(Newcomer &newcomer)
{
    HislipChannel &channel = newcomer.channel();
    const std::uint32_t id = channel.header().parameter;
    const auto found = id <= 0xFFFF ? m_sessions.find(static_cast<std::uint16_t>(id)) : m_sessions.end();
    if (found == m_sessions.end() || !found->second->wantsAsynchronous())
        return newcomer.refuse(FatalErrorCode::BadInitialization, "no session waits for this connection");
    channel.taken(static_cast<std::size_t>(channel.remaining()));
    found->second->setAsynchronous(channel.release());
    forget(newcomer);
}

/// Room for a session, at the cost of one that is only being told its end, or of the one that has been waiting longest for its second
/// connection. False when all have theirs.
bool HislipServer::makeRoom()
{
    std::size_t alive = 0;
    std::shared_ptr<HislipSession> ended;
    std::shared_ptr<HislipSession> waiting;
    const auto age = [this](const auto &session) { return static_cast<std::uint16_t>(m_lastId - session->id()); };
    const auto takeOlder = [&](std::shared_ptr<HislipSession> &oldest, const std::shared_ptr<HislipSession> &session) {
        if (!oldest || age(session) > age(oldest))
            oldest = session;
    };
    for (const auto &[id, session] : m_sessions) {
        alive += session->hasEnded() ? 0 : 1;
        if (session->hasEnded())
            takeOlder(ended, session);
        else if (session->wantsAsynchronous())
            takeOlder(waiting, session);
    }
    if (alive >= m_options.maxSessions) {
        if (!waiting)
            return false;
        waiting->fatal(FatalErrorCode::MaximumClients, "too many clients");
        forget(*waiting);
    } else if (ended && m_sessions.size() >= ConnectionsPerSession * m_options.maxSessions) {
        forget(*ended);
    }
    return true;
}

void HislipServer::forget(const HislipSession &session)
{
    const auto found = m_sessions.find(session.id());
    if (found == m_sessions.end() || found->second.get() != &session)
        return;
    m_loop.destroyLater(found->second);
    m_sessions.erase(found);
}

std::uint16_t HislipServer::freeId()
{
    do
        ++m_lastId;
    while (m_sessions.contains(m_lastId));
    return m_lastId;
}

} // namespace simulator
