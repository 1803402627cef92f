// Registering with a portmapper that runs already: what it is told, and what it may answer.
#include "simulator/server/PortmapRegistration.h"

#include "support/ClosedPort.h"
#include "support/ScriptedPeer.h"

#include <gtest/gtest.h>

#include <memory>

using namespace test;
using simulator::PortmapRegistration;
using Outcome = PortmapRegistration::Outcome;

namespace
{

const wire::portmap::Mapping Core{0x0607AF, 1, 6, 4567};

std::string call(const char *procedure, const char *mapping)
{
    return hex("80000038 00000001 00000000 00000002 000186A0 00000002") + hex(procedure) +
           hex("00000000 00000000 00000000 00000000") + hex(mapping);
}

std::string reply(const char *result)
{
    return hex("8000001C 00000001 00000001 00000000 00000000 00000000 00000000") + hex(result);
}

void answer(ScriptedPeer &peer, const std::string &expected, const std::string &bytes)
{
    PeerConnection connection = peer.accept();
    connection.expect(expected);
    connection.send(bytes);
    connection.expectClosed();
}

const std::string Set = call("00000001", "000607AF 00000001 00000006 000011D7");
const std::string Unset = call("00000002", "000607AF 00000001 00000000 00000000");
const std::string GetPort = call("00000003", "000607AF 00000001 00000006 00000000");
const std::string Yes = reply("00000001");
const std::string No = reply("00000000");

} // namespace

TEST(PortmapRegistration, SetsAtTheStartAndUnsetsAtTheEnd)
{
    ScriptedPeer portmapper([](ScriptedPeer &self) {
        answer(self, Set, Yes);
        answer(self, Unset, Yes);
    });
    PortmapRegistration registration(portmapper.port());
    EXPECT_EQ(registration.add(Core), Outcome::Done);
}

TEST(PortmapRegistration, LeavesAlonePortsThatSomebodyServes)
{
    ScriptedPeer other([](ScriptedPeer &self) { self.accept().expectClosed(); });
    const std::uint16_t port = other.port();
    ScriptedPeer portmapper([=](ScriptedPeer &self) {
        answer(self, Set, No);
        const std::string number{static_cast<char>(port >> 8), static_cast<char>(port & 0xFF)};
        answer(self, GetPort, reply("0000") + number);
    });
    PortmapRegistration registration(portmapper.port());
    EXPECT_EQ(registration.add(Core), Outcome::Refused);
}

TEST(PortmapRegistration, TakesThePlaceOfOneThatWasLeftBehind)
{
    const ClosedPort closed;
    ScriptedPeer portmapper([&](ScriptedPeer &self) {
        answer(self, Set, No);
        const std::string number{static_cast<char>(closed.number() >> 8), static_cast<char>(closed.number() & 0xFF)};
        answer(self, GetPort, reply("0000") + number);
        answer(self, Unset, Yes);
        answer(self, Set, Yes);
        answer(self, Unset, Yes);
    });
    PortmapRegistration registration(portmapper.port());
    EXPECT_EQ(registration.add(Core), Outcome::Done);
}

TEST(PortmapRegistration, IsRefusedByOneThatRegistersNobody)
{
    ScriptedPeer portmapper([](ScriptedPeer &self) {
        answer(self, Set, No);
        answer(self, GetPort, No);
    });
    PortmapRegistration registration(portmapper.port());
    EXPECT_EQ(registration.add(Core), Outcome::Refused);
}

TEST(PortmapRegistration, FindsNobody)
{
    const ClosedPort closed;
    PortmapRegistration registration(closed.number());
    EXPECT_EQ(registration.add(Core), Outcome::Nobody);
}

TEST(PortmapRegistration, TakesNoNonsenseForAnAnswer)
{
    const std::string good = Yes;
    std::vector<std::string> answers{
        "HTTP/1.1 400 Bad Request\r\n\r\n",
        hex("FFFFFFFF") + std::string(4096, 'x'),                                             // a huge record
        hex("8000001C 00000002 00000001 00000000 00000000 00000000 00000000 00000001"),       // another call's
        hex("80000018 00000001 00000001 00000000 00000000 00000000 00000003"),                // unknown procedure
        hex("80000014 00000001 00000001 00000001 00000001 00000001"),                         // denied
        hex("80000018 00000001 00000001 00000000 00000000 00000000 00000000"),                // no result
        hex("80000038 00000001 00000000 00000002 000186A0 00000002") + std::string(36, '\0'), // a call
    };
    for (std::size_t length = 0; length < good.size(); ++length)
        answers.push_back(good.substr(0, length));
    for (const std::string &bytes : answers) {
        ScriptedPeer portmapper([&](ScriptedPeer &self) {
            PeerConnection connection = self.accept();
            connection.expect(Set);
            connection.trySend(bytes);
            connection.close();
        });
        PortmapRegistration registration(portmapper.port());
        EXPECT_EQ(registration.add(Core), Outcome::NoAnswer) << bytes.size();
    }
}

TEST(PortmapRegistration, DoesNotWaitForeverForOneThatIsSilent)
{
    ScriptedPeer portmapper([](ScriptedPeer &self) {
        PeerConnection connection = self.accept();
        connection.expect(Set);
        connection.send(hex("8000001C"));
        connection.expectClosed();
    });
    PortmapRegistration registration(portmapper.port());
    EXPECT_EQ(registration.add(Core), Outcome::NoAnswer);
}
