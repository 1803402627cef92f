#include "simulator/server/Vxi11Server.h"

#include "simulator/server/Vxi11Session.h"

#include <algorithm>
#include <utility>

namespace simulator
{

using wire::vxi11::LinkId;

Vxi11Server::Vxi11Server(EventLoop &loop, Instrument &instrument)
    : m_loop(loop), m_instrument(instrument),
      m_device(instrument, {[this] { changed(); },
                            [this] {
                                return std::any_of(m_waiting.begin(), m_waiting.end(),
                                                   [](const Waiting &each) { return each.forAnswer; });
                            },
                            [this] { requestService(); }})
{
}

Vxi11Server::~Vxi11Server()
{
    m_loop.cancel(m_retry);
    for (const auto &[id, link] : m_links)
        m_instrument.locks.leave(link.lockOwner);
}

void Vxi11Server::accept(FileDescriptor socket)
{
    if (m_sessions.size() >= MaxClients)
        return; // closes it
    const auto session = std::make_shared<Vxi11Session>(*this, std::move(socket));
    m_sessions.emplace(session.get(), session);
}

void Vxi11Server::forget(Vxi11Session &session)
{
    const auto found = m_sessions.find(&session);
    if (found == m_sessions.end())
        return;
    endWait(session);
    destroyLinks(session);
    m_loop.destroyLater(found->second);
    m_sessions.erase(found);
}

Vxi11Link *Vxi11Server::createLink(Vxi11Session &session)
{
    if (m_links.size() >= MaxLinks)
        return nullptr;
    while (m_links.contains(m_nextLink))
        m_nextLink = m_nextLink == INT32_MAX ? 0 : m_nextLink + 1;
    const LinkId id = m_nextLink;
    m_nextLink = id == INT32_MAX ? 0 : id + 1;
    const LockTable::Owner owner = m_instrument.locks.join([this] { changed(); });
    return &m_links.emplace(id, Vxi11Link{id, &session, owner, false, {}}).first->second;
}

Vxi11Link *Vxi11Server::findLink(LinkId id)
{
    const auto found = m_links.find(id);
    return found == m_links.end() ? nullptr : &found->second;
}

void Vxi11Server::destroyLink(const Vxi11Link &link)
{
    m_instrument.locks.leave(link.lockOwner);
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

void Vxi11Server::wait(Vxi11Session &session, bool forAnswer)
{
    const auto found =
        std::find_if(m_waiting.begin(), m_waiting.end(), [&](const Waiting &each) { return each.session == &session; });
    if (found == m_waiting.end())
        m_waiting.push_back({&session, forAnswer});
    else
        found->forAnswer = forAnswer;
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
    for (const Waiting &each : waiting)
        if (m_sessions.contains(each.session))
            each.session->retry();
}

void Vxi11Server::requestService()
{
    for (const auto &[id, link] : m_links)
        if (link.serviceRequests)
            link.session->requestService(link.handle);
}

} // namespace simulator
