// Service requests of VXI-11: the instrument connects back, and tells without waiting for an answer.
#include "protocol/simulator/Vxi11Client.h"
#include "support/ClosedPort.h"
#include "support/ScriptedPeer.h"

#include <gtest/gtest.h>

#include <future>

using namespace test;

namespace
{

class Vxi11Interrupt : public Vxi11Fixture
{
protected:
    Vxi11Client client{port};

    /// create_intr_chan to a port of 127.0.0.1 by TCP.
    std::string create(std::uint16_t listening)
    {
        return client.core.call("00000019", "7F000001" + RpcCaller::digits(RpcCaller::word(listening)) +
                                                "000607B1 00000001 00000000");
    }
    std::string enable(const char *on, const std::string &handle)
    {
        return client.core.call("00000014", client.link + on + Vxi11Client::size(handle), handle);
    }
};

const char *const Header = "00000000 00000002 000607B1 00000001 0000001E 00000000 00000000 00000000 00000000";

} // namespace

TEST_F(Vxi11Interrupt, TellsServiceRequestsWithTheHandleOfTheLink)
{
    std::promise<void> seen;
    ScriptedPeer controller([&](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        channel.expect(hex("80000034 00000001") + hex(Header) + hex("00000005") + "link7" + std::string(3, '\0'));
        channel.expect(hex("80000034 00000002") + hex(Header) + hex("00000005") + "link7" + std::string(3, '\0'));
        seen.set_value();
        channel.expectClosed();
    });
    ASSERT_EQ(create(controller.port()), "00000000 ");
    EXPECT_EQ(create(controller.port()), "0000001D ") << "one channel a connection";
    ASSERT_EQ(enable("00000001", "link7"), "00000000 ");
    client.write("*SRE 16\n");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n") << "no second request before a poll";
    EXPECT_EQ(client.statusByte(), "00000000 00000000 ") << "the reason is gone, and the request with it";
    seen.get_future().wait_for(std::chrono::seconds(30));
    EXPECT_EQ(client.core.call("0000001A"), "00000000 ");
    EXPECT_EQ(client.core.call("0000001A"), "00000006 ");
}

TEST_F(Vxi11Interrupt, IsSilentForLinksThatDidNotAsk)
{
    ScriptedPeer controller([](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        channel.expectClosed();
    });
    ASSERT_EQ(create(controller.port()), "00000000 ");
    ASSERT_EQ(enable("00000001", "x"), "00000000 ");
    ASSERT_EQ(enable("00000000", ""), "00000000 ");
    client.write("*SRE 16\n");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
    EXPECT_EQ(client.core.call("0000001A"), "00000000 ");
}

TEST_F(Vxi11Interrupt, WorksWithoutAChannelAndWithOneThatBroke)
{
    ASSERT_EQ(enable("00000001", "x"), "00000000 ");
    client.write("*SRE 16\n");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
    {
        // A reset before the simulator has answered would be a channel that never came about.
        std::promise<void> answered;
        ScriptedPeer controller([&](ScriptedPeer &self) {
            PeerConnection channel = self.accept();
            answered.get_future().wait_for(std::chrono::seconds(30));
            channel.reset();
        });
        ASSERT_EQ(create(controller.port()), "00000000 ");
        answered.set_value();
    }
    EXPECT_EQ(client.statusByte(), "00000000 00000000 ");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
}

TEST_F(Vxi11Interrupt, ThrowsAwayWhatAControllerAnswers)
{
    std::promise<void> seen;
    ScriptedPeer controller([&](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        channel.send(hex("80000018 00000001 00000001 00000000 00000000 00000000 00000000 FFFFFFFF"));
        channel.expect(hex("8000002C 00000001") + hex(Header) + hex("00000000"));
        seen.set_value();
        channel.expectClosed();
    });
    ASSERT_EQ(create(controller.port()), "00000000 ");
    ASSERT_EQ(enable("00000001", ""), "00000000 ");
    client.write("*SRE 16\n");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
    EXPECT_EQ(seen.get_future().wait_for(std::chrono::seconds(30)), std::future_status::ready);
    EXPECT_EQ(client.core.call("0000001A"), "00000000 ");
}

TEST_F(Vxi11Interrupt, ConnectsBackToTheCallerAlone)
{
    EXPECT_EQ(client.core.call("00000019", "C0A80109 00009C40 000607B1 00000001 00000000"), "00000015 ")
        << "a stranger";
    EXPECT_EQ(client.core.call("00000019", "7F000001 00009C40 000607B1 00000001 00000001"), "00000008 ") << "UDP";
    EXPECT_EQ(client.core.call("00000019", "7F000001 00000000 000607B1 00000001 00000000"), "00000005 ") << "port 0";
    EXPECT_EQ(client.core.call("00000019", "7F000001 00010000 000607B1 00000001 00000000"), "00000005 ");
    const ClosedPort closed;
    EXPECT_EQ(create(closed.number()), "00000006 ") << "nobody listens";
    EXPECT_EQ(client.core.call("0000001A"), "00000006 ");
    EXPECT_EQ(client.query("*OPC?\n"), "1\n");
}

namespace
{

class GatewayInterrupt : public Vxi11Fixture
{
protected:
    GatewayInterrupt() : Vxi11Fixture({"--gpib"}) {}

    static std::string enable(Vxi11Client &client, const std::string &handle)
    {
        return client.core.call("00000014", client.link + "00000001" + Vxi11Client::size(handle), handle);
    }
};

} // namespace

TEST_F(GatewayInterrupt, TellsTheLinksOfTheInstrumentThatRequestsServiceAndThoseOfTheBus)
{
    Vxi11Client second(port, "gpib0,7");
    Vxi11Client other(port, "gpib0,5");
    Vxi11Client bus(port, "gpib0");
    std::promise<void> seen;
    std::promise<void> seenByBus;
    ScriptedPeer controller([&](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        channel.expect(hex("80000030 00000001") + hex(Header) + hex("00000002") + "s7" + std::string(2, '\0'));
        seen.set_value();
        channel.expectClosed();
    });
    ScriptedPeer controllerOfOther([](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        channel.expectClosed(); // and nothing before
    });
    ScriptedPeer controllerOfBus([&](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        channel.expect(hex("80000030 00000001") + hex(Header) + hex("00000003") + "bus" + std::string(1, '\0'));
        seenByBus.set_value();
        channel.expectClosed();
    });
    const auto create = [](Vxi11Client &client, std::uint16_t listening) {
        return client.core.call("00000019", "7F000001" + RpcCaller::digits(RpcCaller::word(listening)) +
                                                "000607B1 00000001 00000000");
    };
    ASSERT_EQ(create(second, controller.port()), "00000000 ");
    ASSERT_EQ(create(other, controllerOfOther.port()), "00000000 ");
    ASSERT_EQ(create(bus, controllerOfBus.port()), "00000000 ");
    ASSERT_EQ(enable(second, "s7"), "00000000 ");
    ASSERT_EQ(enable(other, "s5"), "00000000 ");
    ASSERT_EQ(enable(bus, "bus"), "00000000 ");
    second.write("*SRE 16\n");
    second.write("*IDN?\n");
    EXPECT_EQ(seen.get_future().wait_for(std::chrono::seconds(30)), std::future_status::ready);
    EXPECT_EQ(seenByBus.get_future().wait_for(std::chrono::seconds(30)), std::future_status::ready);
    EXPECT_EQ(second.statusByte(), "00000000 00000050 ");
    for (Vxi11Client *client : {&second, &other, &bus})
        EXPECT_EQ(client->core.call("0000001A"), "00000000 ");
}

TEST_F(GatewayInterrupt, TellsLinksThatNameASecondaryAddressWhichTheInstrumentDoesNotHave)
{
    Vxi11Client second(port, "gpib0,7,0");
    std::promise<void> seen;
    ScriptedPeer controller([&](ScriptedPeer &self) {
        PeerConnection channel = self.accept();
        channel.expect(hex("80000030 00000001") + hex(Header) + hex("00000002") + "s7" + std::string(2, '\0'));
        seen.set_value();
        channel.expectClosed();
    });
    ASSERT_EQ(second.core.call("00000019", "7F000001" + RpcCaller::digits(RpcCaller::word(controller.port())) +
                                               "000607B1 00000001 00000000"),
              "00000000 ");
    ASSERT_EQ(enable(second, "s7"), "00000000 ");
    second.write("*SRE 16\n");
    second.write("*IDN?\n");
    EXPECT_EQ(seen.get_future().wait_for(std::chrono::seconds(30)), std::future_status::ready);
    EXPECT_EQ(second.core.call("0000001A"), "00000000 ");
}
