// The simulator's portmapper: literal bytes over TCP and UDP.
#include "protocol/simulator/Vxi11Client.h"

#include <gtest/gtest.h>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <vector>

using namespace test;

namespace
{

const char *const Header = "4B59AA01 00000000 00000002 000186A0 00000002 ";
const char *const NoCredentials = " 00000000 00000000 00000000 00000000 ";
const char *const Accepted = "4B59AA01 00000001 00000000 00000000 00000000 00000000 ";

class Portmapper : public Vxi11Fixture
{
protected:
    const std::string corePort = RpcCaller::digits(RpcCaller::word(port));

    /// The datagram that answers, in hexadecimal digits; empty when none comes within @p patience milliseconds.
    std::string ask(const std::string &digits, int patience = 30000) const
    {
        const int socket = ::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(portmapperPort);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        const std::string datagram = fromHex(digits);
        EXPECT_EQ(::sendto(socket, datagram.data(), datagram.size(), 0, reinterpret_cast<const sockaddr *>(&address),
                           sizeof address),
                  static_cast<ssize_t>(datagram.size()));
        pollfd watched{socket, POLLIN, 0};
        std::array<char, 4096> answer;
        ssize_t size = 0;
        if (::poll(&watched, 1, patience) == 1)
            size = ::recv(socket, answer.data(), answer.size(), 0);
        ::close(socket);
        return RpcCaller::digits({answer.data(), static_cast<std::size_t>(size)});
    }
    std::string ask(const char *procedure, const char *arguments) const
    {
        return ask(std::string(Header) + procedure + NoCredentials + arguments);
    }
};

} // namespace

TEST_F(Portmapper, TellsThePortOfTheCoreProgramByDatagram)
{
    EXPECT_NE(corePort, "00000000 ");
    EXPECT_EQ(ask("00000003", "000607AF 00000001 00000006 00000000"), Accepted + corePort);
    EXPECT_EQ(ask("00000003", "000607AF 00000001 00000006 FFFFFFFF"), Accepted + corePort)
        << "the port given is ignored";
    EXPECT_EQ(ask("00000003", "000607B0 00000001 00000006 00000000"), Accepted + corePort) << "abort program";
}

TEST_F(Portmapper, AnswersZeroForWhatIsNotThere)
{
    for (const char *mapping : {"000607B1 00000001 00000006 00000000", "000607AF 00000002 00000006 00000000",
                                "000607AF 00000001 00000011 00000000"})
        EXPECT_EQ(ask("00000003", mapping), std::string(Accepted) + "00000000 ") << mapping;
}

TEST_F(Portmapper, DoesNothingWhenAskedTo)
{
    EXPECT_EQ(ask("00000000", ""), Accepted);
}

TEST_F(Portmapper, ListsWhatIsThere)
{
    const std::string own = RpcCaller::digits(RpcCaller::word(portmapperPort));
    EXPECT_EQ(ask("00000004", ""), Accepted + std::string("00000001 000607AF 00000001 00000006 ") + corePort +
                                       "00000001 000607B0 00000001 00000006 " + corePort +
                                       "00000001 000186A0 00000002 00000006 " + own +
                                       "00000001 000186A0 00000002 00000011 " + own + "00000000 ");
}

TEST_F(Portmapper, LetsNobodyRegisterOrRemove)
{
    EXPECT_EQ(ask("00000001", "000607AF 00000001 00000011 00000007"), std::string(Accepted) + "00000000 ");
    EXPECT_EQ(ask("00000002", "000607AF 00000001 00000006 00000000"), std::string(Accepted) + "00000000 ");
    EXPECT_EQ(ask("00000003", "000607AF 00000001 00000006 00000000"), Accepted + corePort);
    EXPECT_EQ(ask("00000003", "000607AF 00000001 00000011 00000000"), std::string(Accepted) + "00000000 ");
}

TEST_F(Portmapper, PassesNoCallsOn)
{
    const std::string call = std::string(Header) + "00000005" + NoCredentials + "000607AF 00000001 00000000 00000000";
    EXPECT_EQ(ask(call, 300), "") << "silence is the answer to a datagram";
    RpcCaller tcp(portmapperPort, "000186A0");
    tcp.send("00000005", "000607AF 00000001 00000000 00000000", {}, "00000002");
    EXPECT_EQ(RpcCaller::digits(tcp.reply()), "11223344 00000001 00000000 00000000 00000000 00000003 ");
}

TEST_F(Portmapper, RefusesWhatItCannotServe)
{
    const std::string tail = std::string("00000003") + NoCredentials + "000607AF 00000001 00000006 00000000";
    EXPECT_EQ(ask("4B59AA01 00000000 00000002 000186A0 00000004 " + tail),
              "4B59AA01 00000001 00000000 00000000 00000000 00000002 00000002 00000002 ")
        << "version 4";
    EXPECT_EQ(ask("4B59AA01 00000000 00000002 000607AF 00000001 " + tail),
              "4B59AA01 00000001 00000000 00000000 00000000 00000001 ")
        << "another program";
    EXPECT_EQ(ask("4B59AA01 00000000 00000003 000186A0 00000002 " + tail),
              "4B59AA01 00000001 00000001 00000000 00000002 00000002 ")
        << "another RPC version";
    EXPECT_EQ(ask("00000006", ""), "4B59AA01 00000001 00000000 00000000 00000000 00000003 ");
    EXPECT_EQ(ask("00000003", "000607AF 00000001 00000006"), "4B59AA01 00000001 00000000 00000000 00000000 00000004 ");
    EXPECT_EQ(ask(std::string(Header) + "00000003 00000001 00000191 00000000 00000000"),
              "4B59AA01 00000001 00000001 00000001 00000001 ")
        << "credentials of 401 bytes";
}

TEST_F(Portmapper, AnswersNothingToNonsenseAndGoesOn)
{
    for (const char *nonsense :
         {"", "00", "4B59AA01 00000000", "4B59AA01 00000001 00000000 00000000 00000000 00000000"})
        EXPECT_EQ(ask(std::string(nonsense), 100), "") << nonsense;
    RawClient hostile(portmapperPort);
    hostile.send(fromHex("FFFFFFFF 00000000"));
    EXPECT_EQ(hostile.receiveAll(), "");
    EXPECT_EQ(ask("00000000", ""), Accepted);
}

TEST_F(Portmapper, AnswersSeveralCallsOfOneConnection)
{
    RpcCaller tcp(portmapperPort, "000186A0");
    for (int i = 0; i < 3; ++i) {
        tcp.send("00000003", "000607AF 00000001 00000006 00000000", {}, "00000002");
        EXPECT_EQ(tcp.results(), corePort);
    }
}

TEST_F(Portmapper, SilentConnectionsKeepNobodyOut)
{
    for (const char *beginning : {"", "80000038 00000001"}) {
        std::vector<RawClient> clients;
        for (int i = 0; i < 300; ++i) {
            clients.emplace_back(portmapperPort);
            clients.back().trySend(fromHex(beginning));
        }
        EXPECT_EQ(askForPort(), port) << beginning;
    }
}
