#include "simulator/instrument/RemoteState.h"

namespace simulator
{

void RemoteState::setRemoteEnable(bool enable)
{
    m_remoteEnable = enable;
    if (!enable)
        m_lockout = m_remote = false;
}

std::string_view RemoteState::name() const
{
    if (!m_remote)
        return "LOC";
    return m_lockout ? "RWL" : "REM";
}

} // namespace simulator
