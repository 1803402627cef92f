#include "kyvisa/core/HandleTable.h"

#include <gtest/gtest.h>
#include <set>
#include <thread>

using namespace kyvisa;

namespace
{

class Thing : public Object
{
public:
    ViStatus getAttribute(ViAttr, void *) override { return 0; }
    ViStatus setAttribute(ViAttr, ViAttrState) override { return 0; }
    ViStatus close() override { return 0; }
};

ObjectPointer thing()
{
    return std::make_shared<Thing>();
}

TEST(HandleTable, FindsWhatWasInserted)
{
    HandleTable table;
    const ObjectPointer one = thing();
    const ViObject handle = table.insert(one, 0);
    EXPECT_NE(handle, 0u);
    EXPECT_EQ(table.find(handle), one);
    EXPECT_EQ(table.find(0), nullptr);
    EXPECT_EQ(table.find(handle + 1), nullptr);
    EXPECT_EQ(table.find(handle + 0x10000), nullptr);
}

TEST(HandleTable, RemovedHandleStaysUnknown)
{
    HandleTable table;
    const ViObject handle = table.insert(thing(), 0);
    EXPECT_NE(table.remove(handle), nullptr);
    EXPECT_EQ(table.remove(handle), nullptr);
    EXPECT_EQ(table.find(handle), nullptr);
}

TEST(HandleTable, DoesNotReuseAHandleForAHundredThousandOpens)
{
    HandleTable table;
    const ViObject first = table.insert(thing(), 0);
    table.remove(first);
    for (int i = 0; i < 100'000; ++i) {
        const ViObject handle = table.insert(thing(), 0);
        ASSERT_NE(handle, first);
        ASSERT_NE(handle, 0u);
        ASSERT_EQ(table.find(first), nullptr);
        table.remove(handle);
    }
}

TEST(HandleTable, TakesChildrenOutWithTheirParentAlone)
{
    HandleTable table;
    const ViObject parent = table.insert(thing(), 0);
    const ViObject other = table.insert(thing(), 0);
    const ViObject child = table.insert(thing(), parent);
    const ViObject foreign = table.insert(thing(), other);
    EXPECT_EQ(table.removeChildren(parent).size(), 1u);
    EXPECT_EQ(table.find(child), nullptr);
    EXPECT_NE(table.find(foreign), nullptr);
    EXPECT_NE(table.find(parent), nullptr);
}

TEST(HandleTable, RefusesAChildOfNobody)
{
    HandleTable table;
    const ViObject parent = table.insert(thing(), 0);
    table.remove(parent);
    EXPECT_EQ(table.insert(thing(), parent), 0u);
}

TEST(HandleTable, SaysSoWhenItIsFull)
{
    HandleTable table;
    std::set<ViObject> handles;
    for (int i = 0; i < 0x10000; ++i)
        handles.insert(table.insert(thing(), 0));
    EXPECT_EQ(handles.size(), 0x10000u);
    EXPECT_EQ(handles.count(0), 0u);
    EXPECT_EQ(table.insert(thing(), 0), 0u);
    table.remove(*handles.begin());
    EXPECT_NE(table.insert(thing(), 0), 0u);
}

TEST(HandleTable, OneOfManyClosersWins)
{
    HandleTable table;
    for (int round = 0; round < 200; ++round) {
        const ViObject handle = table.insert(thing(), 0);
        std::atomic<int> winners{0};
        std::array<std::thread, 4> threads;
        for (std::thread &thread : threads)
            thread = std::thread([&] { winners += table.remove(handle) ? 1 : 0; });
        for (std::thread &thread : threads)
            thread.join();
        ASSERT_EQ(winners, 1);
    }
}

} // namespace
