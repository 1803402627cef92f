// How long a HiSLIP client may keep the server waiting, by a clock that the test turns.
#include "protocol/simulator/HislipMessage.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/server/HislipServer.h"
#include "simulator/server/Listener.h"
#include "support/RawClient.h"

#include <gtest/gtest.h>

using namespace simulator;
using namespace std::chrono_literals;
using test::expectMessage;
using test::expectText;
using test::fromHex;
using test::message;
using test::RawClient;

namespace
{

class PatientHislip : public testing::Test
{
protected:
    /// Lets the server do what it has to do now.
    void work()
    {
        for (int round = 0; round < 20; ++round) {
            loop.after({}, [this] { loop.stop(); });
            loop.run();
        }
    }

    void turn(std::chrono::nanoseconds by)
    {
        now += by;
        work();
    }

    /// Works until the client has something to receive, be it the end.
    void workFor(RawClient &client)
    {
        const auto deadline = std::chrono::steady_clock::now() + 30s;
        while (client.silentFor(0ms) && std::chrono::steady_clock::now() < deadline)
            work();
        EXPECT_FALSE(client.silentFor(0ms));
    }

    void expectOpen(RawClient &client)
    {
        work();
        EXPECT_TRUE(client.silentFor(20ms)) << "neither a word nor the end";
    }

    /// Sends Initialize and returns the session id.
    std::string initialize(RawClient &sync)
    {
        sync.send(message("4853 00 00 01005A5A", "hislip0"));
        workFor(sync);
        return sync.receive(16).substr(6, 2);
    }

    void initializeAsync(RawClient &async, const std::string &id)
    {
        async.send(fromHex("4853 11 00 0000") + id + fromHex("0000000000000000"));
        workFor(async);
        expectMessage(async, "4853 12 00 00005A5A");
    }

    EventLoop::Clock::time_point now;
    EventLoop loop{[this] { return now; }};
    Instrument instrument{loop, {}};
    HislipServer server{loop, instrument, {}};
    Listener listener{
        loop, {"127.0.0.1", false}, 0, [this](FileDescriptor socket) { server.accept(std::move(socket)); }};
};

} // namespace

TEST_F(PatientHislip, GivesAConnectionTenSecondsToIntroduceItself)
{
    RawClient silent(listener.port());
    RawClient slow(listener.port());
    work();
    slow.send(fromHex("4853 00"));
    turn(9999ms);
    expectOpen(silent);
    expectOpen(slow);
    turn(1ms);
    workFor(silent);
    EXPECT_EQ(silent.receiveAll(), "");
    workFor(slow);
    EXPECT_EQ(slow.receiveAll(), "");
}

TEST_F(PatientHislip, GivesASessionThirtySecondsForItsSecondConnection)
{
    RawClient sync(listener.port());
    const std::string id = initialize(sync);
    turn(29999ms);
    expectOpen(sync);
    EXPECT_EQ(server.sessions(), 1u);
    turn(1ms);
    workFor(sync);
    EXPECT_EQ(expectText(sync, "4853 02 03 00000000"), "no asynchronous connection came");
    sync.close();
    work();
    EXPECT_EQ(server.sessions(), 0u);
}

TEST_F(PatientHislip, HasAllTheTimeForASessionThatStands)
{
    RawClient sync(listener.port());
    RawClient async(listener.port());
    initializeAsync(async, initialize(sync));
    turn(1000h);
    expectOpen(sync);
    expectOpen(async);
    sync.send(message("4853 07 00 FFFFFF00", "*OPC?\n"));
    workFor(sync);
    expectMessage(sync, "4853 07 00 FFFFFF00", "1\n");
}

TEST_F(PatientHislip, GivesADeviceClearSixtySecondsToEnd)
{
    RawClient sync(listener.port());
    RawClient async(listener.port());
    initializeAsync(async, initialize(sync));
    for (const bool completed : {true, false}) {
        async.send(message("4853 13 00 00000000"));
        workFor(async);
        expectMessage(async, "4853 17 00 00000000");
        turn(59999ms);
        expectOpen(sync);
        if (!completed)
            break;
        sync.send(message("4853 08 00 00000000"));
        workFor(sync);
        expectMessage(sync, "4853 09 00 00000000");
        turn(1h);
        expectOpen(sync);
    }
    turn(1ms);
    workFor(sync);
    EXPECT_EQ(expectText(sync, "4853 02 00 00000000"), "the device clear was not completed");
    workFor(async);
    EXPECT_EQ(expectText(async, "4853 02 00 00000000"), "the device clear was not completed");
}

TEST_F(PatientHislip, GivesWhoIsTurnedAwayTwoSecondsToGo)
{
    RawClient stubborn(listener.port());
    stubborn.send(message("4853 00 00 01005A5A", "hislip7"));
    workFor(stubborn);
    EXPECT_EQ(expectText(stubborn, "4853 02 03 00000000"), "there is no such sub-address");
    turn(2s);
    // The server has closed by now: what is sent is answered by a reset.
    bool refused = false;
    for (int i = 0; i < 1000 && !refused; ++i) {
        refused = !stubborn.trySend("x");
        work();
    }
    EXPECT_TRUE(refused);
}
