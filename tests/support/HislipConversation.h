#pragma once

#include "support/HislipPeer.h"
#include "support/VisaSession.h"

#include <gtest/gtest.h>
#include <string>

namespace test
{

/// The resource string that reaches "hislip0" of @p peer.
inline std::string hislipResource(const ScriptedPeer &peer)
{
    return "TCPIP::127.0.0.1::hislip0," + std::to_string(peer.port()) + "::INSTR";
}

/// Runs @p script as the instrument, with its HislipConnections, and @p user on an open session with a time-out of 20 s. Both
/// connections are closed in the end, with nothing more said on them.
template <typename Script, typename User>
void converse(Script script, User user)
{
    ScriptedPeer peer([&](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        script(client);
        client.sync.expectClosed();
        client.async.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(hislipResource(peer), 20000), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    user(session);
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

} // namespace test
