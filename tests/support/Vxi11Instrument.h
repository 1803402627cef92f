#pragma once

#include "support/Vxi11Peer.h"

#include <functional>
#include <string>
#include <utility>

namespace test
{

/// A session to "inst0" of a scripted instrument. The script has the core connection, and the peer for whatever else comes.
class Vxi11Instrument
{
public:
    using Script = std::function<void(RpcServed &core, Vxi11Peer &peer)>;

    /// @param link what create_link answers: error, link, abort port, largest write
    explicit Vxi11Instrument(Script script, std::string link = "00000000 00000007 00000000 00100000",
                             ViUInt32 timeout = 20000)
        : m_peer([script = std::move(script), link = std::move(link)](ScriptedPeer &scripted) {
              Vxi11Peer peer(scripted);
              std::string words = link;
              if (const std::size_t port = words.find("<port>"); port != words.npos)
                  words.replace(port, 6, peer.port());
              RpcServed core = peer.acceptLink(words);
              script(core, peer);
          })
    {
        usePortmapper(m_peer.port());
        EXPECT_EQ(session.open("TCPIP::127.0.0.1::inst0::INSTR"), VI_SUCCESS);
        session.set(VI_ATTR_TMO_VALUE, timeout);
    }
    ~Vxi11Instrument() { finish(); }
    Vxi11Instrument(const Vxi11Instrument &) = delete;
    Vxi11Instrument &operator=(const Vxi11Instrument &) = delete;

    /// Closes the session and waits for the end of the script.
    void finish()
    {
        if (session.vi != VI_NULL) {
            EXPECT_EQ(viClose(std::exchange(session.vi, VI_NULL)), VI_SUCCESS);
        }
        m_peer.finish();
    }
    std::uint16_t port() const { return m_peer.port(); }

private:
    ScriptedPeer m_peer;

public:
    VisaSession session;
};

/// A call as RpcServed shows it, without its word @p index, counted behind the bar: a time that nobody knows exactly.
inline std::string withoutTime(std::string call, std::size_t index, std::uint32_t *time = nullptr)
{
    const std::size_t at = call.find('|') + 2 + index * 9;
    if (at + 8 > call.size())
        return "too short: " + call;
    if (time)
        *time = static_cast<std::uint32_t>(std::stoul(call.substr(at, 8), nullptr, 16));
    return call.replace(at, 8, "........");
}

/// The data of a device_write, and its flags.
struct TakenWrite {
    std::string flags;
    std::size_t size = 0;
};

/// Takes a device_write and accepts all of it.
inline TakenWrite takeWrite(RpcServed &core)
{
    const std::string call = core.takeCall();
    EXPECT_EQ(call.substr(0, 28), "000607AF 00000001 0000000B |") << call.substr(0, 80);
    if (call.size() < 28 + 5 * 9)
        return {};
    const std::string size = call.substr(28 + 5 * 9 - 8, 8);
    core.reply("00000000 " + size);
    return {call.substr(28 + 4 * 9 - 8, 8), std::stoul(size, nullptr, 16)};
}

} // namespace test
