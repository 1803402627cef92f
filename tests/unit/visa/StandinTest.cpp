#include "support/standin/Standin.h"

#include <visa.h>

#include <gmock/gmock.h>

#include <cstring>
#include <thread>

using testing::ElementsAre;

namespace
{

class StandinTest : public testing::Test
{
protected:
    StandinTest() { standin::reset(); }

    ViSession openOne()
    {
        ViSession manager = 0;
        ViSession session = 0;
        viOpenDefaultRM(&manager);
        viOpen(manager, "TCPIP::here::INSTR", 0, 0, &session);
        return session;
    }
};

ViStatus count(ViSession, ViEventType, ViEvent, ViAddr userHandle)
{
    ++*static_cast<int *>(userHandle);
    return VI_SUCCESS;
}

} // namespace

TEST_F(StandinTest, OpensAndClosesLikeALibrary)
{
    ViSession manager = 0;
    ViSession first = 0;
    ViSession second = 0;
    EXPECT_EQ(viOpenDefaultRM(&manager), VI_SUCCESS);
    EXPECT_EQ(viOpen(manager, "A", 0, 0, &first), VI_SUCCESS);
    EXPECT_EQ(viOpen(manager, "B", 0, 0, &second), VI_SUCCESS);
    EXPECT_EQ(manager, 1u);
    EXPECT_EQ(first, 2u);
    EXPECT_EQ(second, 3u);
    EXPECT_EQ(standin::openObjects(), 3u);
    EXPECT_EQ(viClose(first), VI_SUCCESS);
    EXPECT_EQ(viClose(first), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viClose(0), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viClear(first), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viClear(second), VI_SUCCESS);
}

TEST_F(StandinTest, AnswersAReadAfterItsQueryAndTimesOutOtherwise)
{
    const ViSession vi = openOne();
    char buffer[64] = {};
    ViUInt32 length = 99;
    EXPECT_EQ(viRead(vi, reinterpret_cast<ViPBuf>(buffer), sizeof buffer, &length), VI_ERROR_TMO);
    standin::setReply("VOLT?", "1.25\n");
    EXPECT_EQ(viWrite(vi, reinterpret_cast<ViConstBuf>("VOLT?\n"), 6, nullptr), VI_SUCCESS);
    EXPECT_EQ(viRead(vi, reinterpret_cast<ViPBuf>(buffer), 2, &length), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(length, 2u);
    EXPECT_EQ(viRead(vi, reinterpret_cast<ViPBuf>(buffer), sizeof buffer, &length), VI_SUCCESS);
    EXPECT_EQ(std::string(buffer, length), "25\n");
}

TEST_F(StandinTest, TakesScriptedAnswersInOrderAndMayLieAboutTheCount)
{
    const ViSession vi = openOne();
    standin::script("viRead", {.status = VI_SUCCESS_TERM_CHAR, .bytes = "ab"});
    standin::script("viRead", {.status = VI_ERROR_TMO, .bytes = "c", .numbers = {1000}});
    char buffer[8] = {};
    ViUInt32 length = 0;
    EXPECT_EQ(viRead(vi, reinterpret_cast<ViPBuf>(buffer), 8, &length), VI_SUCCESS_TERM_CHAR);
    EXPECT_EQ(length, 2u);
    EXPECT_EQ(viRead(vi, reinterpret_cast<ViPBuf>(buffer), 8, &length), VI_ERROR_TMO);
    EXPECT_EQ(length, 1000u);
    EXPECT_EQ(standin::pending("viRead"), 0u);
}

TEST_F(StandinTest, RecordsCallsWithTheirArguments)
{
    const ViSession vi = openOne();
    viEnableEvent(vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 7);
    viWrite(vi, reinterpret_cast<ViConstBuf>("x\0y"), 3, nullptr);
    EXPECT_THAT(standin::operations(), ElementsAre("viOpenDefaultRM", "viOpen", "viEnableEvent", "viWrite"));
    const auto enable = standin::calls("viEnableEvent").at(0);
    EXPECT_EQ(enable.handle, vi);
    EXPECT_THAT(enable.numbers, ElementsAre(0x3FFF200B, 1, 7));
    EXPECT_THAT(standin::calls("viWrite").at(0).texts, ElementsAre(std::string("x\0y", 3)));
}

TEST_F(StandinTest, WritesAttributesInTheirOwnWidth)
{
    const ViSession vi = openOne();
    std::uint64_t value = 0xFFFFFFFFFFFFFFFF;
    standin::setAttribute(VI_ATTR_TERMCHAR, 0x0A, 1);
    EXPECT_EQ(viGetAttribute(vi, VI_ATTR_TERMCHAR, &value), VI_SUCCESS);
    EXPECT_EQ(value, 0xFFFFFFFFFFFFFF0Au);
    EXPECT_EQ(viSetAttribute(vi, VI_ATTR_TMO_VALUE, 5000), VI_SUCCESS);
    ViUInt32 timeout = 0;
    EXPECT_EQ(viGetAttribute(vi, VI_ATTR_TMO_VALUE, &timeout), VI_SUCCESS);
    EXPECT_EQ(timeout, 5000u);
    char name[64] = {};
    EXPECT_EQ(viGetAttribute(vi, VI_ATTR_RSRC_NAME, name), VI_SUCCESS);
    EXPECT_STREQ(name, "TCPIP::here::INSTR");
    EXPECT_EQ(viGetAttribute(vi, VI_ATTR_SLOT, &value), VI_ERROR_NSUP_ATTR);
}

TEST_F(StandinTest, FindsResourcesWithTheirTexts)
{
    openOne();
    ViFindList list = 0;
    ViUInt32 found = 0;
    char name[VI_FIND_BUFLEN] = {};
    EXPECT_EQ(viFindRsrc(1, "?*", &list, &found, name), VI_ERROR_RSRC_NFOUND);
    standin::addResource({.name = "A", .texts = {{VI_KY_ATTR_LXI_MODEL, "M1"}}});
    standin::addResource({.name = "B"});
    EXPECT_EQ(viFindRsrc(1, "?*", &list, &found, name), VI_SUCCESS);
    EXPECT_EQ(found, 2u);
    EXPECT_STREQ(name, "A");
    char text[64] = {};
    EXPECT_EQ(viGetAttribute(list, VI_KY_ATTR_LXI_MODEL, text), VI_SUCCESS);
    EXPECT_STREQ(text, "M1");
    EXPECT_EQ(viFindNext(list, name), VI_SUCCESS);
    EXPECT_STREQ(name, "B");
    EXPECT_EQ(viGetAttribute(list, VI_KY_ATTR_LXI_MODEL, text), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(viFindNext(list, name), VI_ERROR_RSRC_NFOUND);
    EXPECT_EQ(viClose(list), VI_SUCCESS);
}

TEST_F(StandinTest, HoldsACallUntilTheGateOpens)
{
    const ViSession vi = openOne();
    const auto gate = std::make_shared<standin::Gate>();
    standin::script("viClear", {.gate = gate});
    std::atomic<bool> returned = false;
    std::thread caller([&] {
        viClear(vi);
        returned = true;
    });
    EXPECT_TRUE(standin::waitForCalls("viClear", 1));
    EXPECT_TRUE(gate->waitForArrival());
    EXPECT_FALSE(returned);
    gate->open();
    caller.join();
    EXPECT_TRUE(returned);
}

TEST_F(StandinTest, CallsInstalledHandlersOnly)
{
    const ViSession vi = openOne();
    int hits = 0;
    viInstallHandler(vi, VI_EVENT_SERVICE_REQ, count, &hits);
    standin::fireEvent(vi, VI_EVENT_SERVICE_REQ);
    standin::fireEvent(vi, VI_EVENT_TRIG);
    standin::fireEvent(vi + 1, VI_EVENT_SERVICE_REQ);
    EXPECT_EQ(hits, 1);
    viUninstallHandler(vi, VI_EVENT_SERVICE_REQ, count, &hits);
    standin::fireEvent(vi, VI_EVENT_SERVICE_REQ);
    EXPECT_EQ(hits, 1);
    EXPECT_EQ(standin::openObjects(), 2u);
}
