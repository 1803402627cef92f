#include "simulator/server/HislipServer.h"

#include "simulator/instrument/Characters.h"

#include <algorithm>
#include <utility>

namespace simulator
{

using namespace wire::hislip;

namespace
{

constexpr std::size_t MaxNewcomers = 128;
constexpr std::chrono::seconds PatienceForIntroduction{10};
constexpr std::chrono::seconds PatienceForLastWords{2};

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
    Newcomer(HislipServer &server, FileDescriptor socket)
        : m_server(server), m_channel(std::make_unique<Connection>(server.m_loop, std::move(socket), *this)),
          m_timer(server.m_loop.after(PatienceForIntroduction, [this] { m_server.forget(*this); }))
    {
    }
    ~Newcomer() { m_server.m_loop.cancel(m_timer); }

    HislipChannel &channel() { return m_channel; }

    void refuse(FatalErrorCode code, std::string_view text)
    {
        m_refused = true;
        m_channel.sendFatalError(code, text);
        m_channel.connection().closeAfterSending(PatienceForLastWords);
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
    if (m_newcomers.size() >= MaxNewcomers)
        return; // closes it
    const auto newcomer = std::make_shared<Newcomer>(*this, std::move(socket));
    m_newcomers.emplace(newcomer.get(), newcomer);
}

void HislipServer::forget(Newcomer &newcomer)
{
    const auto found = m_newcomers.find(&newcomer);
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
    if (m_sessions.size() >= m_options.maxSessions)
        return newcomer.refuse(FatalErrorCode::MaximumClients, "too many clients");
    channel.taken(static_cast<std::size_t>(channel.remaining()));
    const std::uint16_t id = freeId();
    const auto session = std::make_shared<HislipSession>(m_loop, m_instrument, m_options, id, channel.release(),
                                                         [this](HislipSession &ended) {
                                                             const auto found = m_sessions.find(ended.id());
                                                             if (found == m_sessions.end())
                                                                 return;
                                                             m_loop.destroyLater(found->second);
                                                             m_sessions.erase(found);
                                                         });
    m_sessions.emplace(id, session);
    forget(newcomer);
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

std::uint16_t HislipServer::freeId()
{
    do
        ++m_lastId;
    while (m_sessions.contains(m_lastId));
    return m_lastId;
}

} // namespace simulator
