#include "simulator/server/HislipControl.h"

#include "simulator/instrument/Instrument.h"
#include "simulator/server/HislipChannel.h"

namespace simulator
{

using namespace wire::hislip;

HislipControl::HislipControl(Instrument &instrument, HislipChannel &async, std::function<void()> changed,
                             TrafficLog::Client &traffic)
    : m_instrument(instrument), m_async(async), m_owner(instrument.locks.join(std::move(changed), &traffic)),
      m_completed(NothingSentId)
{
}

HislipControl::~HislipControl()
{
    leave();
}

void HislipControl::leave()
{
    if (m_owner != 0)
        m_instrument.locks.leave(std::exchange(m_owner, 0));
}

bool HislipControl::allowed() const
{
    return m_instrument.locks.allows(m_owner);
}

void HislipControl::lock(const Header &header, std::string_view key)
{
    enum Response : std::uint8_t { Failed = 0, Granted = 1, Wrong = 3 };
    m_instrument.remote.addressed();
    if (header.control > 1)
        return m_async.refuse(ErrorCode::UnknownControlCode, "neither a request nor a release");
    if (m_unlockAfter || key.size() > MaxLockString + 1)
        return m_async.send(MessageType::AsyncLockResponse, Wrong);
    if (header.control == 0) {
        if (isComplete(header.parameter))
            return unlock();
        m_unlockAfter = header.parameter;
        return;
    }
    if (m_instrument.faults.refusesLock(FaultProtocol::Hislip))
        return m_async.send(MessageType::AsyncLockResponse, Failed);
    if (key.ends_with('\0'))
        key.remove_suffix(1);
    m_instrument.locks.request(m_owner, std::string{key}, std::chrono::milliseconds{header.parameter},
                               [this](LockTable::Answer answer) {
                                   const std::uint8_t control = answer == LockTable::Answer::Granted  ? Granted
                                                                : answer == LockTable::Answer::Failed ? Failed
                                                                                                      : Wrong;
                                   m_async.send(MessageType::AsyncLockResponse, control);
                               });
}

void HislipControl::lockInfo()
{
    m_async.send(MessageType::AsyncLockInfoResponse, m_instrument.locks.exclusivelyLocked() ? 1 : 0,
                 static_cast<std::uint32_t>(m_instrument.locks.holders()));
}

void HislipControl::remoteLocal(const Header &header)
{
    if (header.control > 6)
        return m_async.refuse(ErrorCode::UnknownControlCode, "unknown remote/local request");
    if (m_changeAfter)
        return m_async.refuse(ErrorCode::Unidentified, "a remote/local request is still waiting");
    if (isComplete(header.parameter))
        return change(header.control);
    m_changeAfter = {header.parameter, header.control};
}

bool HislipControl::isComplete(std::uint32_t messageId) const
{
    // Ids wrap around.
    return static_cast<std::int32_t>(m_completed - messageId) >= 0;
}

void HislipControl::completed(std::uint32_t messageId)
{
    m_completed = messageId;
    if (m_unlockAfter && isComplete(*m_unlockAfter)) {
        m_unlockAfter.reset();
        unlock();
    }
    if (m_changeAfter && isComplete(m_changeAfter->first))
        change(std::exchange(m_changeAfter, std::nullopt)->second);
}

void HislipControl::cleared()
{
    m_instrument.remote.addressed();
    m_instrument.locks.endWait(m_owner);
    if (std::exchange(m_unlockAfter, std::nullopt))
        unlock();
    if (m_changeAfter)
        change(std::exchange(m_changeAfter, std::nullopt)->second);
}

void HislipControl::restart()
{
    m_completed = NothingSentId;
}

void HislipControl::unlock()
{
    enum Response : std::uint8_t { ExclusiveReleased = 1, SharedReleased = 2, NotHeld = 3 };
    std::uint8_t control = NotHeld;
    switch (m_instrument.locks.release(m_owner)) {
    case LockTable::Released::Exclusive:
        control = ExclusiveReleased;
        break;
    case LockTable::Released::Shared:
        control = SharedReleased;
        break;
    case LockTable::Released::Nothing:
        break;
    }
    m_async.send(MessageType::AsyncLockResponse, control);
}

void HislipControl::change(std::uint8_t request)
{
    enum Request : std::uint8_t {
        DisableRemote,
        EnableRemote,
        DisableAndGoToLocal,
        EnableAndGoToRemote,
        EnableAndLockOut,
        EnableGoToRemoteAndLockOut,
        GoToLocal,
    };
    RemoteState &remote = m_instrument.remote;
    if (request != GoToLocal)
        remote.setRemoteEnable(request != DisableRemote && request != DisableAndGoToLocal);
    if (request == EnableAndLockOut || request == EnableGoToRemoteAndLockOut)
        remote.setLockout();
    if (request == EnableAndGoToRemote || request == EnableGoToRemoteAndLockOut)
        remote.addressed();
    if (request == GoToLocal)
        remote.goToLocal();
    m_async.send(MessageType::AsyncRemoteLocalResponse);
}

} // namespace simulator
