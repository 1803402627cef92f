#pragma once

#include <string_view>

namespace simulator
{

/// Who operates the instrument: its front panel (local) or a program (remote), and whether the panel may take it back.
class RemoteState
{
public:
    void setRemoteEnable(bool enable);
    void setLockout() { m_lockout = true; }
    void goToLocal() { m_remote = false; }
    /// A program talks to the instrument.
    void addressed() { m_remote = m_remote || m_remoteEnable; }

    /// LOC, REM, or with local lockout RWL.
    std::string_view name() const;

private:
    bool m_remoteEnable = true;
    bool m_lockout = false;
    bool m_remote = false;
};

} // namespace simulator
