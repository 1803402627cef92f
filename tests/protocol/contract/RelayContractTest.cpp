// The same conversations over a network with bad manners: everything in pieces, merged, late, or cut at any byte.
#include "contract/Contract.h"
#include "support/RawClient.h"
#include "support/Relay.h"
#include "support/ScriptedPeer.h"
#include "support/Stopwatch.h"
#include "support/Vxi11Peer.h"

#include <optional>

using test::Relay;
using test::Stopwatch;
using test::VisaSession;

namespace contract
{
namespace
{

std::vector<Protocol> protocolsOverNetworks()
{
    std::vector<Protocol> some = protocols();
    std::erase_if(some, [](const Protocol &protocol) {
        const std::string service = protocol.service;
        return service == "serial";
    });
    return some;
}

class OverRelay : public Contract
{
protected:
    void SetUp() override { m_port = portOfTheService(); }

    /// VXI-11 finds its port by the portmapper.
    bool isPortmapped() const { return !m_simulator.resource("portmapper").empty(); }
    std::uint16_t portOfTheService() const
    {
        if (!isPortmapped())
            return m_simulator.port(GetParam().service);
        test::RawClient asking(static_cast<std::uint16_t>(std::stoi(m_simulator.resource("portmapper"))));
        asking.send(test::hex("80000038 00000001 00000000 00000002 000186A0 00000002 00000003 00000000 00000000 "
                              "00000000 00000000 000607AF 00000001 00000006 00000000"));
        return static_cast<std::uint16_t>(test::RpcServed::number(asking.receive(32).substr(28)));
    }
    std::string through(const Relay &relay) const
    {
        std::string name = resource();
        if (isPortmapped())
            return name;
        const std::string port = std::to_string(m_port);
        return name.replace(name.find(port), port.size(), std::to_string(relay.port()));
    }
    ViStatus openThrough(const Relay &relay, VisaSession &session, ViUInt32 timeout = 20000)
    {
        std::optional<test::ScriptedPeer> portmapper;
        if (isPortmapped()) {
            portmapper.emplace([port = relay.port()](test::ScriptedPeer &peer) {
                test::RpcServed asked(peer.accept());
                asked.takeCall();
                asked.reply(test::RpcServed::digits(test::RpcServed::word(port)));
                asked.connection.expectClosed();
            });
            test::usePortmapper(portmapper->port());
        }
        const ViStatus status = session.open(through(relay), timeout);
        if (status < VI_SUCCESS)
            return status;
        session.set(VI_ATTR_TMO_VALUE, 20000);
        if (!GetParam().hasEnd)
            session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
        return status;
    }
    /// What a program does with an instrument; false where a call failed.
    bool converse(VisaSession &session)
    {
        const std::string block(3000, 'b');
        if (session.write("*CLS;*ESE 5;*ESE?\n") < VI_SUCCESS || session.read() != whole() || session.text != "5\n")
            return false;
        if (session.write("MMEM:DATA \"r\",#43000" + block + "\n") < VI_SUCCESS ||
            session.write("MMEM:DATA? \"r\"\n") < VI_SUCCESS || session.read(4096) != whole())
            return false;
        return session.text == "#43000" + block + "\n" && viClear(session.vi) == VI_SUCCESS &&
               session.write("*OPC?\n") == VI_SUCCESS && session.read() == whole() && session.text == "1\n";
    }

    std::uint16_t m_port = 0;
};

INSTANTIATE_TEST_SUITE_P(All, OverRelay, testing::ValuesIn(protocolsOverNetworks()), nameOf);

TEST_P(OverRelay, BytesOneByOne)
{
    Relay relay(m_port, {.piece = 1});
    VisaSession session;
    ASSERT_EQ(openThrough(relay, session), VI_SUCCESS);
    EXPECT_TRUE(converse(session));
    viClose(session.vi);
}

TEST_P(OverRelay, OddPiecesLateAndMerged)
{
    Relay relay(m_port, {.piece = 37, .delay = std::chrono::microseconds(300)});
    VisaSession session;
    ASSERT_EQ(openThrough(relay, session), VI_SUCCESS);
    EXPECT_TRUE(converse(session));
    viClose(session.vi);
}

TEST_P(OverRelay, CutAtEveryByteOfTheBeginningAndAtSomeBehind)
{
    int whole = 0;
    for (std::size_t cut = 0; cut < 4000; cut += cut < 200 ? 1 : 97) {
        Relay relay(m_port, {.cutAfter = cut});
        VisaSession session;
        const Stopwatch watch;
        const ViStatus opened = openThrough(relay, session, 10000);
        if (opened == VI_SUCCESS) {
            whole += converse(session) ? 1 : 0;
            // Whatever happened before: from here on the session knows that its connection is gone, and says so at once.
            ViStatus status = VI_SUCCESS;
            for (int i = 0; i < 2000 && status != VI_ERROR_CONN_LOST; ++i) {
                status = session.write("*CLS;*OPC?\n");
                if (status >= VI_SUCCESS)
                    status = session.read();
            }
            EXPECT_EQ(status, VI_ERROR_CONN_LOST) << "cut after " << cut;
            EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
        } else {
            EXPECT_TRUE(opened == VI_ERROR_RSRC_NFOUND || opened == VI_ERROR_CONN_LOST)
                << opened << " cut after " << cut;
        }
        EXPECT_LT(watch.milliseconds(), 15000) << "cut after " << cut;
    }
    EXPECT_GT(whole, 0) << "some cuts lie behind the conversation";
}

} // namespace
} // namespace contract
