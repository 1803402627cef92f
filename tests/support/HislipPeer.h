#pragma once

#include "support/ScriptedPeer.h"

namespace test
{

/// The two connections of a HiSLIP session that a scripted instrument has accepted.
struct HislipConnections {
    PeerConnection sync;
    PeerConnection async;
};

/// Accepts a session on "hislip0": literal bytes both ways. The session id is 0x1234.
/// @param largest the message size that the instrument takes, 16 hexadecimal digits
inline HislipConnections acceptHislip(ScriptedPeer &peer, const char *largest = "0000000000100000",
                                      const char *initializeResponse = "48530100 01001234 0000000000000000")
{
    PeerConnection sync = peer.accept();
    sync.expect(hex("48530000 01005A5A 0000000000000007") + "hislip0");
    sync.send(hex(initializeResponse));
    PeerConnection async = peer.accept();
    async.expect(hex("48531100 00001234 0000000000000000"));
    async.send(hex("48531200 00005858 0000000000000000"));
    async.expect(hex("48530F00 00000000 0000000000000008 0000000000100000"));
    async.send(hex("48531000 00000000 0000000000000008") + hex(largest));
    return {std::move(sync), std::move(async)};
}

} // namespace test
