#include "simulator/server/HislipDelivery.h"

#include <gtest/gtest.h>

using simulator::HislipDelivery;

TEST(HislipDelivery, GivesAResponseTheIdOfItsRequestInSynchronizedMode)
{
    HislipDelivery delivery;
    delivery.restart(false);
    EXPECT_EQ(delivery.nextId(0xFFFFFF04), 0xFFFFFF04u);
    EXPECT_EQ(delivery.nextId(0xFFFFFF04), 0xFFFFFF04u);
}

TEST(HislipDelivery, CountsMessagesByTwoAndAroundInOverlappedMode)
{
    HislipDelivery delivery;
    delivery.restart(true);
    EXPECT_EQ(delivery.nextId(7), 0xFFFFFF00u);
    EXPECT_EQ(delivery.nextId(7), 0xFFFFFF02u);
    for (int i = 0; i < 126; ++i)
        delivery.nextId(7);
    EXPECT_EQ(delivery.nextId(7), 0u);
    delivery.restart(true);
    EXPECT_EQ(delivery.nextId(7), 0xFFFFFF00u);
}

TEST(HislipDelivery, TellsAnInterruptedResponseInSynchronizedModeAlone)
{
    for (const bool overlapped : {false, true}) {
        HislipDelivery delivery;
        delivery.restart(overlapped);
        EXPECT_TRUE(delivery.messageCame(false)) << "nothing was sent";
        delivery.responseSent();
        EXPECT_TRUE(delivery.messageCame(true)) << "sent and read";
        delivery.responseSent();
        EXPECT_EQ(delivery.messageCame(false), overlapped) << "sent and not read";
        delivery.restart(overlapped);
        EXPECT_EQ(delivery.messageCame(true), overlapped) << "read what was never sent";
        delivery.responseSent();
        delivery.statusQueryCame(true, 0);
        EXPECT_TRUE(delivery.messageCame(false)) << "the status query said it";
    }
}

TEST(HislipDelivery, KnowsWhatIsUnreadInOverlappedMode)
{
    HislipDelivery delivery;
    delivery.restart(true);
    EXPECT_TRUE(delivery.allRead());
    delivery.nextId(0);
    delivery.responseSent();
    delivery.nextId(0);
    delivery.responseSent();
    delivery.messageCame(true);
    EXPECT_FALSE(delivery.allRead()) << "one of two";
    delivery.statusQueryCame(false, 0xFFFFFF00);
    EXPECT_FALSE(delivery.allRead());
    delivery.statusQueryCame(false, 0xFFFFFF02);
    EXPECT_TRUE(delivery.allRead());
    delivery.nextId(0);
    delivery.responseSent();
    delivery.messageCame(true);
    EXPECT_TRUE(delivery.allRead()) << "the only one";
}
