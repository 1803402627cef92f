#include "protocol/simulator/SimulatorFixture.h"

using namespace test;
using namespace std::chrono_literals;

namespace
{

class HislipLocks : public SimulatorFixture
{
protected:
    /// Whoever still holds a lock goes, so that the last check is not shut out.
    void TearDown() override
    {
        a.sync.close();
        b.sync.close();
        SimulatorFixture::TearDown();
    }

    void request(HislipClient &client, std::string_view key, const char *response, const char *timeout = "00000000")
    {
        client.async.send(message(std::string("4853 04 01 ") + timeout, key));
        expectMessage(client.async, response);
    }
    void release(HislipClient &client, const char *response)
    {
        client.async.send(message("4853 04 00 FFFFFEFE"));
        expectMessage(client.async, response);
    }
    void expectInfo(HislipClient &client, const char *response)
    {
        client.async.send(message("4853 18 00 00000000"));
        expectMessage(client.async, response);
    }

    static constexpr const char *Failed = "4853 05 00 00000000";
    static constexpr const char *Granted = "4853 05 01 00000000";
    static constexpr const char *SharedReleased = "4853 05 02 00000000";
    static constexpr const char *Wrong = "4853 05 03 00000000";

    std::uint16_t port = simulator.port("hislip");
    HislipClient a{port};
    HislipClient b{port};
};

} // namespace

TEST_F(HislipLocks, AreExclusive)
{
    expectInfo(b, "4853 19 00 00000000");
    request(a, "", Granted);
    expectInfo(b, "4853 19 01 00000001");
    request(b, "", Failed);
    request(b, "key", Failed);
    request(a, "", Wrong);
    release(b, Wrong);
    release(a, Granted);
    release(a, Wrong);
    expectInfo(b, "4853 19 00 00000000");
}

TEST_F(HislipLocks, AreSharedByKey)
{
    request(a, "key", Granted);
    request(b, std::string_view("key\0", 4), Granted);
    HislipClient c(port);
    request(c, "other", Failed);
    request(c, "", Failed);
    expectInfo(c, "4853 19 00 00000002");
    request(a, "", Granted);
    expectInfo(c, "4853 19 01 00000002");
    release(a, Granted);
    release(a, SharedReleased);
    release(b, SharedReleased);
    request(c, "other", Granted);
}

TEST_F(HislipLocks, RefuseAKeyThatIsTooLong)
{
    request(a, std::string(256, 'k'), Granted);
    request(b, std::string(258, 'k'), Wrong);
}

TEST_F(HislipLocks, HoldTheDataOfOthersUntilReleased)
{
    request(a, "", Granted);
    b.sync.send(message("4853 07 00 FFFFFF00", "*ESE 4;*ESE?\n"));
    b.async.send(message("4853 15 00 FFFFFF00"));
    expectMessage(b.async, "4853 16 00 00000000");
    a.sync.send(message("4853 07 00 FFFFFF00", "*ESE?\n"));
    expectMessage(a.sync, "4853 07 00 FFFFFF00", "0\n");
    EXPECT_TRUE(b.sync.silentFor(50ms));
    release(a, Granted);
    expectMessage(b.sync, "4853 07 00 FFFFFF00", "4\n");
}

TEST_F(HislipLocks, HoldTheRawSocketToo)
{
    request(a, "", Granted);
    RawClient socket(simulator.port("socket"));
    socket.send("*ESE?\n");
    EXPECT_TRUE(socket.silentFor(50ms));
    release(a, Granted);
    EXPECT_EQ(socket.receiveLine(), "0\n");
}

TEST_F(HislipLocks, LetADeviceClearThroughOfWhoIsShutOut)
{
    request(a, "", Granted);
    b.sync.send(message("4853 07 00 FFFFFF00", "*ESE 4\n"));
    b.async.send(message("4853 13 00 00000000"));
    expectMessage(b.async, "4853 17 00 00000000");
    b.sync.send(message("4853 08 00 00000000"));
    expectMessage(b.sync, "4853 09 00 00000000");
    a.sync.send(message("4853 07 00 FFFFFF00", "*ESE?\n"));
    expectMessage(a.sync, "4853 07 00 FFFFFF00", "0\n");
    release(a, Granted);
}

TEST_F(HislipLocks, AreGrantedToWhoWaits)
{
    request(a, "", Granted);
    b.async.send(message("4853 04 01 00007530"));
    EXPECT_TRUE(b.async.silentFor(50ms));
    release(a, Granted);
    expectMessage(b.async, Granted);
}

TEST_F(HislipLocks, FailAfterTheTimeThatWasGiven)
{
    request(a, "", Granted);
    request(b, "", Failed, "00000032");
}

TEST_F(HislipLocks, AreFreedByAClosedConnection)
{
    request(a, "", Granted);
    b.async.send(message("4853 04 01 00007530"));
    a.sync.close();
    expectMessage(b.async, Granted);
}

TEST_F(HislipLocks, AnswerAWaitingRequestBeforeADeviceClear)
{
    request(a, "", Granted);
    b.async.send(message("4853 04 01 00007530"));
    b.async.send(message("4853 13 00 00000000"));
    expectMessage(b.async, Failed);
    expectMessage(b.async, "4853 17 00 00000000");
    b.sync.send(message("4853 08 00 00000000"));
    expectMessage(b.sync, "4853 09 00 00000000");
}

TEST_F(HislipLocks, AreReleasedAfterTheMessageThatTheReleaseNames)
{
    request(a, "", Granted);
    a.sync.send(message("4853 07 00 FFFFFF00", "SYST:DEL 0.2;*ESE 8\n"));
    a.async.send(message("4853 04 00 FFFFFF00"));
    b.sync.send(message("4853 07 00 FFFFFF00", "*ESE?\n"));
    expectMessage(a.async, Granted);
    expectMessage(b.sync, "4853 07 00 FFFFFF00", "8\n");
}

TEST_F(HislipLocks, AreReleasedByADeviceClearThatEndsTheMessage)
{
    request(a, "", Granted);
    a.sync.send(message("4853 07 00 FFFFFF00", "SYST:DEL 3600\n"));
    a.async.send(message("4853 04 00 FFFFFF00"));
    a.async.send(message("4853 13 00 00000000"));
    expectMessage(a.async, Granted);
    expectMessage(a.async, "4853 17 00 00000000");
    request(b, "", Granted);
}
