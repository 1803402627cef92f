#pragma once

#include "support/ScriptedPeer.h"
#include "support/VisaSession.h"

#include <cstdlib>
#include <string>
#include <string_view>

namespace test
{

/**
 * The other end of ONC RPC in a script: takes whole calls, shows them as hexadecimal words without their transaction id, and
 * answers with literal words.
 */
class RpcServed
{
public:
    explicit RpcServed(PeerConnection accepted) : connection(std::move(accepted)) {}

    /// The next call without mark, transaction id and the first word: "00000002 000607AF 00000001 0000000A ..." is
    /// shown from the program on, credentials left out: "000607AF 00000001 0000000A | arguments".
    std::string takeCall()
    {
        const std::string mark = connection.take(4);
        if (mark.size() < 4)
            return "nothing";
        const std::string body = connection.take(number(mark) & 0x7FFFFFFF);
        xid = body.substr(0, 4);
        if (body.size() < 40 || (mark[0] & '\x80') == 0 || digits(body.substr(4, 8)) != "00000000 00000002 " ||
            digits(body.substr(24, 16)) != "00000000 00000000 00000000 00000000 ")
            return "no call of version 2 without credentials in one fragment: " + digits(body);
        std::string shown = digits(body.substr(12, 12)) + "|";
        if (body.size() > 40)
            shown += " " + digits(body.substr(40));
        while (shown.back() == ' ')
            shown.pop_back();
        return shown;
    }
    /// A whole reply record: accepted, success, then these results.
    std::string record(std::string_view results, std::string_view data = {}) const
    {
        std::string body = xid + hex("00000001 00000000 00000000 00000000 00000000") + hex(results);
        body.append(data);
        body.append((4 - data.size() % 4) % 4, '\0');
        return word(0x80000000u | static_cast<std::uint32_t>(body.size())) + body;
    }
    void reply(std::string_view results, std::string_view data = {}) { connection.send(record(results, data)); }
    /// Takes a call that must be this one, and answers it.
    void serve(std::string_view call, std::string_view results, std::string_view data = {})
    {
        EXPECT_EQ(takeCall(), call);
        reply(results, data);
    }

    static std::string word(std::uint32_t value)
    {
        std::string bytes;
        for (int shift = 24; shift >= 0; shift -= 8)
            bytes += static_cast<char>(value >> shift);
        return bytes;
    }
    static std::uint32_t number(std::string_view bytes)
    {
        std::uint32_t value = 0;
        for (const char byte : bytes.substr(0, 4))
            value = value << 8 | static_cast<unsigned char>(byte);
        return value;
    }
    static std::string digits(std::string_view bytes)
    {
        constexpr char Digits[] = "0123456789ABCDEF";
        std::string text;
        for (std::size_t i = 0; i < bytes.size(); ++i) {
            text += Digits[static_cast<unsigned char>(bytes[i]) >> 4];
            text += Digits[static_cast<unsigned char>(bytes[i]) & 15];
            if (i % 4 == 3)
                text += ' ';
        }
        return text;
    }

    PeerConnection connection;
    std::string xid;
};

/// Portmapper, core and abort program on the one port of a scripted peer.
class Vxi11Peer
{
public:
    explicit Vxi11Peer(ScriptedPeer &peer) : m_peer(peer) {}

    RpcServed accept() { return RpcServed(m_peer.accept()); }
    /// Answers one question for the core program with this port.
    void answerPort()
    {
        RpcServed portmapper = accept();
        portmapper.serve("000186A0 00000002 00000003 | 000607AF 00000001 00000006 00000000", port());
        portmapper.connection.expectClosed();
    }
    /// Portmapper, core connection, create_link for "inst0".
    /// @param result error, link, abort port, largest write
    RpcServed acceptLink(std::string_view result)
    {
        answerPort();
        RpcServed core = accept();
        core.serve("000607AF 00000001 0000000A | 00000000 00000000 00000000 00000005 696E7374 30000000", result);
        return core;
    }
    /// destroy_link of link 7, and the end of the connection.
    static void endLink(RpcServed &core, std::string_view link = "00000007")
    {
        core.serve("000607AF 00000001 00000017 | " + std::string(link), "00000000");
        core.connection.expectClosed();
    }
    /// This peer's port as a word.
    std::string port() const
    {
        std::string text = RpcServed::digits(RpcServed::word(m_peer.port()));
        text.pop_back();
        return text;
    }

private:
    ScriptedPeer &m_peer;
};

/// Sends the library to this portmapper from now on. Each case of a test program runs in a process of its own.
inline void usePortmapper(std::uint16_t port)
{
    ::setenv("KYVISA_PORTMAPPER_PORT", std::to_string(port).c_str(), 1);
}

} // namespace test
