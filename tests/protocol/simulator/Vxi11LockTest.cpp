// Locks of VXI-11: of links against each other, and against the other protocols of the same instrument.
#include "protocol/simulator/Vxi11Client.h"

#include <gtest/gtest.h>

using namespace test;

namespace
{

class Vxi11Lock : public Vxi11Fixture
{
protected:
    Vxi11Client holder{port};
    Vxi11Client other{port};

    void TearDown() override
    {
        // Whoever still holds a lock would shut the last client out.
        holder.core.client().close();
        other.core.client().close();
        Vxi11Fixture::TearDown();
    }

    static std::string lock(Vxi11Client &client, const char *flagsAndTimeout = "00000000 00000000")
    {
        return client.core.call("00000012", client.link + flagsAndTimeout);
    }
    static std::string unlock(Vxi11Client &client) { return client.core.call("00000013", client.link); }
};

} // namespace

TEST_F(Vxi11Lock, IsOneLinksAlone)
{
    EXPECT_EQ(unlock(holder), "0000000C ") << "none held";
    EXPECT_EQ(lock(holder), "00000000 ");
    EXPECT_EQ(lock(holder), "0000000B ") << "also for the holder itself";
    EXPECT_EQ(lock(other), "0000000B ");
    EXPECT_EQ(unlock(other), "0000000C ");
    EXPECT_EQ(unlock(holder), "00000000 ");
    EXPECT_EQ(unlock(holder), "0000000C ");
    EXPECT_EQ(lock(other), "00000000 ");
}

TEST_F(Vxi11Lock, ShutsTheOtherLinksOut)
{
    ASSERT_EQ(lock(holder), "00000000 ");
    EXPECT_EQ(other.write("*OPC?\n"), "0000000B 00000000 ");
    EXPECT_EQ(other.read(), "0000000B 00000000 00000000 ");
    EXPECT_EQ(other.statusByte(), "0000000B 00000000 ");
    for (const char *procedure : {"0000000E", "0000000F", "00000010", "00000011"})
        EXPECT_EQ(other.generic(procedure), "0000000B ") << procedure;
    EXPECT_EQ(holder.query("SYST:ERR:ALL?\n"), "0,\"No error\"\n") << "what was refused did nothing";
    EXPECT_EQ(unlock(holder), "00000000 ");
    EXPECT_EQ(other.query("*OPC?\n"), "1\n");
}

TEST_F(Vxi11Lock, IsWaitedForWhenTheCallSaysSo)
{
    ASSERT_EQ(lock(holder), "00000000 ");
    other.core.send("0000000B", other.link + "00007530 00007530 00000009 00000006", "*OPC?\n");
    EXPECT_TRUE(other.core.client().silentFor(std::chrono::milliseconds(50)));
    EXPECT_EQ(unlock(holder), "00000000 ");
    EXPECT_EQ(other.core.results(), "00000000 00000006 ");
    EXPECT_EQ(other.answer(), "1\n");
}

TEST_F(Vxi11Lock, WaitForItEnds)
{
    ASSERT_EQ(lock(holder), "00000000 ");
    EXPECT_EQ(other.core.call("0000000B", other.link + "00007530 00000032 00000009 00000006", "*OPC?\n"),
              "0000000B 00000000 ");
    EXPECT_EQ(lock(other, "00000001 00000032"), "0000000B ");
    EXPECT_EQ(other.core.call("0000000D", other.link + "00000001 00000032 00007530"), "0000000B 00000000 ");
    EXPECT_EQ(lock(other, "00000000 00007530"), "0000000B ") << "a time alone is no wish to wait";
}

TEST_F(Vxi11Lock, IsHandedToWhoWaitsForIt)
{
    ASSERT_EQ(lock(holder), "00000000 ");
    other.core.send("00000012", other.link + "00000001 00007530");
    EXPECT_TRUE(other.core.client().silentFor(std::chrono::milliseconds(50)));
    EXPECT_EQ(unlock(holder), "00000000 ");
    EXPECT_EQ(other.core.results(), "00000000 ");
    EXPECT_EQ(holder.statusByte(), "0000000B 00000000 ");
}

TEST_F(Vxi11Lock, CanComeWithTheLink)
{
    RpcCaller third(port, "000607AF");
    const std::string created = third.call("0000000A", "00000001 00000001 00000000 00000005", "inst0");
    EXPECT_EQ(created.substr(0, 9), "00000000 ");
    EXPECT_EQ(holder.statusByte(), "0000000B 00000000 ");
    RpcCaller fourth(port, "000607AF");
    EXPECT_EQ(fourth.call("0000000A", "00000001 00000001 00000032 00000005", "inst0"),
              "0000000B 00000000 00000000 00000000 ")
        << "no lock, no link";
    EXPECT_EQ(fourth.call("0000000A", "00000001 00000000 00000000 00000005", "inst0").substr(0, 9), "00000000 ")
        << "a link alone needs none";
    EXPECT_EQ(third.call("00000017", created.substr(9, 8)), "00000000 ");
    EXPECT_EQ(holder.statusByte(), "00000000 00000000 ") << "gone with its link";
}

TEST_F(Vxi11Lock, WaitingCanBeAborted)
{
    ASSERT_EQ(lock(holder), "00000000 ");
    other.core.send("00000012", other.link + "00000001 00007530");
    EXPECT_TRUE(other.core.client().silentFor(std::chrono::milliseconds(50)));
    EXPECT_EQ(other.abort(), "00000000 ");
    EXPECT_EQ(other.core.results(), "00000017 ");
    other.core.send("0000000D", other.link + "00000001 00007530 00007530");
    EXPECT_TRUE(other.core.client().silentFor(std::chrono::milliseconds(50)));
    EXPECT_EQ(other.abort(), "00000000 ");
    EXPECT_EQ(other.core.results(), "00000017 00000000 ");
    EXPECT_EQ(unlock(holder), "00000000 ");
    EXPECT_EQ(lock(holder), "00000000 ") << "nobody waits any more";
}

TEST_F(Vxi11Lock, HoldsForTheRawSocketToo)
{
    RawClient socket(simulator.port("socket"));
    ASSERT_EQ(lock(holder), "00000000 ");
    socket.send("*OPC?\n");
    EXPECT_TRUE(socket.silentFor(std::chrono::milliseconds(50)));
    EXPECT_EQ(unlock(holder), "00000000 ");
    EXPECT_EQ(socket.receiveLine(), "1\n");
}

TEST_F(Vxi11Lock, IsTheSameAsHislips)
{
    HislipClient hislip(simulator.port("hislip"));
    hislip.async.send(message("4853 04 01 00000000")); // exclusive lock, no waiting
    expectMessage(hislip.async, "4853 05 01 00000000");
    EXPECT_EQ(lock(holder), "0000000B ");
    EXPECT_EQ(holder.write("*OPC?\n"), "0000000B 00000000 ");
    hislip.async.send(message("4853 04 00 FFFFFEFE"));
    expectMessage(hislip.async, "4853 05 01 00000000");
    EXPECT_EQ(lock(holder), "00000000 ");
    hislip.async.send(message("4853 04 01 00000000"));
    expectMessage(hislip.async, "4853 05 00 00000000");
}
