#include "simulator/server/Vxi11Server.h"

#include "simulator/server/Vxi11Session.h"

#include <strings.h>

#include <algorithm>
#include <utility>

namespace simulator
{

using wire::vxi11::Error;
using wire::vxi11::LinkId;

Vxi11Server::Vxi11Server(EventLoop &loop, Instrument &instrument, std::size_t maxClients)
    : m_loop(loop), m_traffic(instrument.traffic), m_faults(instrument.faults),
      m_instrument(instrument, {[this] { changed(); }, [this] { return isAwaited(m_instrument); },
                                [this] { requestService(m_instrument); }}),
      m_maxClients(maxClients)
{
}

Vxi11Server::~Vxi11Server()
{
    m_loop.cancel(m_retry);
    for (const auto &[id, link] : m_links)
        link.target->locks().leave(link.lockOwner);
}

void Vxi11Server::openGateway(const Vxi11Gateway::Options &options)
{
    m_gateway = std::make_unique<Vxi11Gateway>(
        m_loop, options,
        Vxi11Gateway::Events{[this] { changed(); }, [this](const Vxi11Target &target) { return isAwaited(target); },
                             [this](const Vxi11Target &target) { requestService(target); }});
}

Error Vxi11Server::find(std::string_view device, Vxi11Target *&target)
{
    constexpr std::string_view Instrument = "inst0";
    // The log keeps the name for as long as there is the link.
    if (device.size() > MaxDeviceName)
        return Error::Syntax;
    if (device.empty() || (device.size() == Instrument.size() &&
                           ::strncasecmp(device.data(), Instrument.data(), Instrument.size()) == 0)) {
        target = &m_instrument;
        return Error::NoError;
    }
    return m_gateway ? m_gateway->find(device, target) : Error::NotAccessible;
}

void Vxi11Server::accept(FileDescriptor socket)
{
    if (m_sessions.size() >= m_maxClients) {
        const auto silent = std::find_if(m_sessions.begin(), m_sessions.end(),
                                         [](const auto &each) { return each.second->isSilent(); });
        if (silent == m_sessions.end())
            return; // closes it
        forget(*silent->second);
    }
    const std::uint64_t number = ++m_lastSession;
    m_sessions.emplace(number, std::make_shared<Vxi11Session>(*this, std::move(socket), number));
}

void Vxi11Server::forget(Vxi11Session &session)
{
    const auto found = m_sessions.find(session.number());
    if (found == m_sessions.end())
        return;
    // A call of its may have come in this very round, and its links and waits would be forgotten by nobody.
    session.stop();
    endWait(session);
    destroyLinks(session);
    m_loop.destroyLater(found->second);
    m_sessions.erase(found);
}

Vxi11Link *Vxi11Server::createLink(Vxi11Session &session, Vxi11Target &target, std::string_view device,
                                   const std::string &name)
{
    if (m_links.size() >= MaxLinks)
        return nullptr;
    while (m_links.contains(m_nextLink))
        m_nextLink = m_nextLink == INT32_MAX ? 0 : m_nextLink + 1;
    const LinkId id = m_nextLink;
    m_nextLink = id == INT32_MAX ? 0 : id + 1;
    const bool isGateway = device.starts_with('g') || device.starts_with('G');
    auto traffic = std::make_unique<TrafficLog::Client>(m_traffic, isGateway ? std::string(device) : "vxi11", name);
    const LockTable::Owner owner = target.locks().join([this] { changed(); }, traffic.get());
    return &m_links.emplace(id, Vxi11Link{id, &session, &target, owner, false, {}, std::move(traffic)}).first->second;
}

Vxi11Link *Vxi11Server::findLink(LinkId id)
{
    const auto found = m_links.find(id);
    return found == m_links.end() ? nullptr : &found->second;
}

void Vxi11Server::destroyLink(const Vxi11Link &link)
{
    link.target->locks().leave(link.lockOwner);
    if (Vxi11Device *device = link.target->device())
        device->endTraffic(*link.traffic);
    m_links.erase(link.id);
}

void Vxi11Server::destroyLinks(const Vxi11Session &session)
{
    for (auto link = m_links.begin(); link != m_links.end();) {
        const Vxi11Link &each = (link++)->second;
        if (each.session == &session)
            destroyLink(each);
    }
}

void Vxi11Server::wait(Vxi11Session &session, const Vxi11Target *answerOf)
{
    const auto found =
        std::find_if(m_waiting.begin(), m_waiting.end(), [&](const Waiting &each) { return each.session == &session; });
    if (found == m_waiting.end())
        m_waiting.push_back({&session, answerOf});
    else
        found->answerOf = answerOf;
}

void Vxi11Server::endWait(Vxi11Session &session)
{
    std::erase_if(m_waiting, [&](const Waiting &each) { return each.session == &session; });
}

/// Called from inside everything: calls that wait are tried when that has returned.
void Vxi11Server::changed()
{
    if (!m_waiting.empty() && m_retry == Timers::None)
        m_retry = m_loop.after({}, [this] { retryAll(); });
}

void Vxi11Server::retryAll()
{
    m_retry = Timers::None;
    const std::vector<Waiting> waiting = m_waiting;
    // A session that is forgotten meanwhile is destroyed later, not in here.
    for (const Waiting &each : waiting)
        if (m_sessions.contains(each.session->number()))
            each.session->retry();
}

bool Vxi11Server::isAwaited(const Vxi11Target &target) const
{
    return std::any_of(m_waiting.begin(), m_waiting.end(),
                       [&](const Waiting &each) { return each.answerOf == &target; });
}

void Vxi11Server::requestService(const Vxi11Target &target)
{
    for (const auto &[id, link] : m_links)
        if (link.serviceRequests && link.target == &target)
            link.session->requestService(link.handle, protocolOf(&target));
}

} // namespace simulator
