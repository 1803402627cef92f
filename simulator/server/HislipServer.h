#pragma once

#include "simulator/server/HislipSession.h"

#include <map>
#include <memory>

namespace simulator
{

/**
 * Takes HiSLIP connections, finds out by their first message which of the two channels they are, and hands them to a session. What does not introduce itself in time or
 * properly is told so and goes; when there are too many, the oldest of them goes first.
 */
class HislipServer
{
public:
    HislipServer(EventLoop &loop, Instrument &instrument, HislipOptions options);
    ~HislipServer();

    void accept(FileDescriptor socket);
    std::size_t sessions() const { return m_sessions.size(); }

private:
    class Newcomer;

    void introduced(Newcomer &newcomer);
    void initialize(Newcomer &newcomer);
    void asyncInitialize(Newcomer &newcomer);
    void forget(Newcomer &newcomer);
    void forget(const HislipSession &session);
    bool makeRoom();
    std::uint16_t freeId();

    EventLoop &m_loop;
    Instrument &m_instrument;
    const HislipOptions m_options;
    std::map<std::uint64_t, std::shared_ptr<Newcomer>> m_newcomers; ///< by their number
    std::uint64_t m_lastNewcomer = 0;
    std::map<std::uint16_t, std::shared_ptr<HislipSession>> m_sessions;
    std::uint16_t m_lastId = 0;
};

} // namespace simulator
