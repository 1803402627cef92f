// What each operation writes into the log. Scripts of users read these lines: each is written out here in full.
#include "unit/visa/SessionFixture.h"

#include <cstdio>

using testing::ElementsAre;

namespace
{

class SessionLogText : public SessionTest
{
protected:
    SessionLogText() { openSession(); }
};

ViStatus ignore(ViSession, ViEventType, ViEvent, ViAddr)
{
    return VI_SUCCESS;
}

} // namespace

TEST_F(SessionLogText, OfOpen)
{
    char name[] = "TCPIP::10.0.0.7::inst0::INSTR";
    m_session->open(name, 4, 3000);
    EXPECT_THAT(texts(),
                ElementsAre("viClose(vi= 2)",
                            "viOpen(sesn= 1, rsrc= TCPIP::10.0.0.7::inst0::INSTR, mode= 4, timeout= 3000, vi= 3)"));
}

TEST_F(SessionLogText, OfOpenWithoutAName)
{
    standin::script("viOpen", {.status = VI_ERROR_INV_RSRC_NAME, .numbers = {0}});
    EXPECT_EQ(thrownBy([&] { m_session->open(nullptr, 0, 0xFFFFFFFF); }), VI_ERROR_INV_RSRC_NAME);
    EXPECT_EQ(lastText(), "viOpen(sesn= 1, rsrc= (null), mode= 0, timeout= 4294967295, vi= 0)");
}

TEST_F(SessionLogText, OfCloseSession)
{
    m_session->closeSession();
    EXPECT_THAT(texts(), ElementsAre("viClose(vi= 2)"));
}

TEST_F(SessionLogText, OfWrite)
{
    m_session->write("*IDN?\n", 6);
    m_session->write(":VOLT 1.5\r\n");
    m_session->write("a\0b", 3);
    EXPECT_THAT(texts(), ElementsAre("viWrite(vi= 2,buf= \"*IDN?\\n\",cnt= 6,retCnt= 6)",
                                     "viWrite(vi= 2,buf= \":VOLT 1.5\\r\\n\",cnt= 11,retCnt= 11)",
                                     "viWrite(vi= 2,buf= \"a\\0b\",cnt= 3,retCnt= 3)"));
}

TEST_F(SessionLogText, OfRead)
{
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "1.5E3\n"});
    char buffer[101];
    EXPECT_EQ(m_session->read(buffer, 100), 6u);
    EXPECT_THAT(texts(), ElementsAre("viRead(vi= 2,buf= \"1.5E3\\n\",cnt= 100,retCnt= 6)"));
}

TEST_F(SessionLogText, OfAReadThatFailed)
{
    char buffer[16] = "left over";
    EXPECT_EQ(thrownBy([&] { m_session->read(buffer, 16); }), VI_ERROR_TMO);
    EXPECT_THAT(texts(), ElementsAre("viRead(vi= 2,buf= \"\",cnt= 16,retCnt= 0)"));
}

TEST_F(SessionLogText, OfQuery)
{
    char buffer[64];
    EXPECT_EQ(m_session->query("*IDN?\n", 6, buffer, 64), 23u);
    EXPECT_THAT(texts(), ElementsAre("viWrite(vi= 2,buf= \"*IDN?\\n\",cnt= 6,retCnt= 6)",
                                     "viRead(vi= 2,buf= \"Oltrava,Stand-in,1,1.0\\n\",cnt= 64,retCnt= 23)"));
}

TEST_F(SessionLogText, OfViPrintfShowsTheFormat)
{
    m_session->viPrintf("VOLT %d\n", 12);
    EXPECT_THAT(texts(), ElementsAre("viPrintf(vi= 2,writeFmt=\"VOLT %d\\n\")"));
    EXPECT_THAT(standin::calls("viVPrintf").at(0).texts, ElementsAre("VOLT %d\n", "VOLT 12\n"));
}

TEST_F(SessionLogText, OfViScanf)
{
    standin::script("viVScanf", {.status = VI_SUCCESS, .bytes = "42"});
    int value = 0;
    m_session->viScanf("%d\t", &value);
    EXPECT_EQ(value, 42);
    EXPECT_THAT(texts(), ElementsAre("viScanf(vi= 2,readFmt=\"%d\\t\")"));
}

TEST_F(SessionLogText, OfViQueryfMissesAQuote)
{
    standin::script("viVQueryf", {.status = VI_SUCCESS, .bytes = "7 8"});
    int first = 0;
    int second = 0;
    m_session->viQueryf("TWO?\n", "%d %d", &first, &second);
    EXPECT_EQ(first, 7);
    EXPECT_EQ(second, 8);
    EXPECT_THAT(texts(), ElementsAre("viQueryf(vi= 2,writeFmt=\"TWO?\\n,readFmt=\"%d %d\")"));
}

TEST_F(SessionLogText, OfSetAttribute)
{
    m_session->setAttribute(VI_ATTR_TMO_VALUE, 5000, true);
    m_session->setAttribute(VI_ATTR_USER_DATA, 0xFEDCBA9876543210UL, true);
    m_session->setAttribute(Attribute{.id = VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, .value = 6}, false);
    EXPECT_THAT(texts(), ElementsAre("viSetAttribute(vi= 2,type= VI_ATTR_TMO_VALUE,value= 0x1388)",
                                     "viSetAttribute(vi= 2,type= VI_ATTR_USER_DATA,value= 0xFEDCBA9876543210)",
                                     "viSetAttribute(vi= 1,type= VI_KY_ATTR_TCPIP_FIND_RSRC_MODE,value= 0x6)"));
}

TEST_F(SessionLogText, OfGetAttribute)
{
    Attribute timeout{.id = VI_ATTR_TMO_VALUE};
    m_session->getAttribute(timeout, true);
    Attribute name{.id = VI_ATTR_RSRC_NAME};
    m_session->getAttribute(name, true);
    std::free(reinterpret_cast<void *>(name.value));
    Attribute mode{.id = VI_KY_ATTR_TCPIP_FIND_RSRC_MODE};
    m_session->getAttribute(mode, false);
    EXPECT_THAT(texts(), ElementsAre("viGetAttribute(vi= 2,type= VI_ATTR_TMO_VALUE,value= 0x7D0)",
                                     "viGetAttribute(vi= 2,type= VI_ATTR_RSRC_NAME,value= TCPIP::localhost::hislip0)",
                                     "viGetAttribute(vi= 1,type= VI_KY_ATTR_TCPIP_FIND_RSRC_MODE,value= 0x6)"));
}

TEST_F(SessionLogText, OfAnAttributeWithoutAName)
{
    Attribute attribute{.id = 0x12345678};
    EXPECT_EQ(thrownBy([&] { m_session->getAttribute(attribute, true); }), VI_ERROR_NSUP_ATTR);
    EXPECT_THAT(texts(), ElementsAre("viGetAttribute(vi= 2,type= Unknown Attribute,value= 0x0)"));
}

TEST_F(SessionLogText, OfSetTimeout)
{
    m_session->setTimeout(60000);
    EXPECT_THAT(texts(), ElementsAre("viSetAttribute(vi= 2,type= VI_ATTR_TMO_VALUE,value= 0xEA60)"));
}

TEST_F(SessionLogText, OfGetStb)
{
    standin::script("viReadSTB", {.status = VI_SUCCESS, .numbers = {0x5A}});
    EXPECT_EQ(m_session->getSTB(), 0x5A);
    EXPECT_THAT(texts(), ElementsAre("viReadSTB(vi= 2,stb= 0x5A)"));
}

TEST_F(SessionLogText, OfTriggerAndClear)
{
    m_session->trigger(5);
    m_session->clear();
    EXPECT_THAT(texts(), ElementsAre("viAssertTrigger(vi= 2,proto= 5)", "viClear(vi= 2)"));
}

TEST_F(SessionLogText, OfLocks)
{
    m_session->lockExclusive(1500);
    char requested[] = "mine";
    char granted[256] = "left over";
    m_session->lockShared(2500, requested, granted);
    EXPECT_STREQ(granted, "mine");
    m_session->lockShared(0, nullptr, granted);
    m_session->unlock();
    EXPECT_THAT(texts(), ElementsAre("viLock(vi= 2,mode= VI_EXCLUSIVE_LOCK, timeout= 1500, rKey= \"\", aKey= \"\")",
                                     "viLock(vi= 2,mode= VI_SHARED_LOCK, timeout= 2500, rKey= mine, aKey= mine)",
                                     "viLock(vi= 2,mode= VI_SHARED_LOCK, timeout= 0, rKey= (null), aKey= standin-key)",
                                     "viUnlock(vi= 2)"));
}

TEST_F(SessionLogText, OfGpibControlRen)
{
    m_session->gpibControlREN(4);
    m_session->gpibControlREN(9);
    EXPECT_THAT(texts(), ElementsAre("viGpibControlREN(vi= 2,mode= VI_GPIB_REN_ASSERT_LLO)",
                                     "viGpibControlREN(vi= 2,mode= Unknown Mode)"));
}

TEST_F(SessionLogText, OfGpibControlAtnHasASmallG)
{
    m_session->gpibConrtolATN(3);
    EXPECT_THAT(texts(), ElementsAre("vigpibControlATN(vi= 2,mode= VI_GPIB_ATN_ASSERT_IMMEDIATE)"));
}

TEST_F(SessionLogText, OfTheOtherGpibOperations)
{
    char command[] = "\x3F\x5F";
    m_session->gpibSendIFC();
    EXPECT_EQ(m_session->gpibCommand(command, 2), 2u);
    m_session->gpibPassControl(0x1E, 0xFFFF);
    EXPECT_THAT(texts(), ElementsAre("viGpibSendIFC(vi= 2)", "viGpibCommand(vi= 2,buf=\"?_\",cnt=2,retCnt=2)",
                                     "viGpibPassControl(vi= 2,primAddr= 0x1E, secAddr= 0xFFFF)"));
}

TEST_F(SessionLogText, OfEvents)
{
    m_session->enableEvent(VI_EVENT_SERVICE_REQ, 1, 0);
    m_session->discardEvents(VI_EVENT_GPIB_CIC, 65535);
    m_session->disableEvent(VI_ALL_ENABLED_EVENTS, 2);
    EXPECT_THAT(texts(), ElementsAre("viEnableEvent(vi= 2,type= VI_EVENT_SERVICE_REQ, mech= 1, context= 0)",
                                     "viDiscardEvents(vi= 2,type= VI_EVENT_GPIB_CIC, mech= 65535)",
                                     "viDisableEvent(vi= 2,type= VI_ALL_ENABLED_EVENTS, mech= 2)"));
}

TEST_F(SessionLogText, OfWaitOnEvent)
{
    standin::script("viWaitOnEvent", {.status = VI_SUCCESS, .numbers = {VI_EVENT_SERVICE_REQ, 2001}});
    unsigned context = 0;
    EXPECT_EQ(m_session->waitOnEvent(VI_ALL_ENABLED_EVENTS, 2000, &context), 0x3FFF200Bu);
    EXPECT_EQ(context, 2001u);
    EXPECT_EQ(thrownBy([&] { m_session->waitOnEvent(VI_EVENT_TRIG, 10, &context); }), VI_ERROR_TMO);
    EXPECT_THAT(texts(), ElementsAre("viWaitOnEvent(vi= 2, inType= VI_ALL_ENABLED_EVENTS, timeout= 2000, "
                                     "outType=VI_EVENT_SERVICE_REQ, outContext= 2001)",
                                     "viWaitOnEvent(vi= 2, inType= VI_EVENT_TRIG, timeout= 10, "
                                     "outType=Unknown Event, outContext= 0)"));
}

TEST_F(SessionLogText, OfHandlers)
{
    char user = 0;
    m_session->installHandler(VI_EVENT_SERVICE_REQ, ignore, &user);
    m_session->uninstallHandler(VI_EVENT_SERVICE_REQ, ignore, nullptr);
    // Addresses differ from run to run: two numbers stand for them here.
    char installed[200];
    std::snprintf(installed, sizeof installed,
                  "viInstallHandler(vi= 2, type= VI_EVENT_SERVICE_REQ, hndlr= 0x%lX, uhndlr= 0x%lX)",
                  reinterpret_cast<unsigned long>(&ignore), reinterpret_cast<unsigned long>(&user));
    char uninstalled[200];
    std::snprintf(uninstalled, sizeof uninstalled,
                  "viUninstallHandler(vi= 2, type= VI_EVENT_SERVICE_REQ, hndlr= 0x%lX, uhndlr= 0x0)",
                  reinterpret_cast<unsigned long>(&ignore));
    EXPECT_THAT(texts(), ElementsAre(installed, uninstalled));
}

TEST_F(SessionLogText, OfFindRsrcAndFindNext)
{
    standin::addResource({.name = "TCPIP::a::INSTR"});
    standin::addResource({.name = "TCPIP::b::INSTR"});
    char expression[] = "?*INSTR";
    char found[256] = "left over";
    unsigned list = 77;
    EXPECT_EQ(m_session->findRsrc(expression, &list, found), 2u);
    EXPECT_STREQ(found, "TCPIP::a::INSTR");
    m_session->findNext(list, found);
    EXPECT_STREQ(found, "TCPIP::b::INSTR");
    EXPECT_EQ(thrownBy([&] { m_session->findNext(list, found); }), VI_ERROR_RSRC_NFOUND);
    EXPECT_THAT(texts(),
                ElementsAre("viFindRsrc(vi= 1, expr= ?*INSTR, findList= 1001, retcnt= 2, instrDesc= TCPIP::a::INSTR)",
                            "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_MANF,value= )",
                            "viFindNext(findList=1001, instrDesc= TCPIP::b::INSTR)",
                            "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_MANF,value= )",
                            "viFindNext(findList=1001, instrDesc= )"));
}

TEST_F(SessionLogText, OfASearchWithoutMatch)
{
    char expression[] = "GPIB?*";
    char found[256] = "left over";
    unsigned list = 77;
    EXPECT_EQ(thrownBy([&] { m_session->findRsrc(expression, &list, found); }), VI_ERROR_RSRC_NFOUND);
    EXPECT_THAT(texts(), ElementsAre("viFindRsrc(vi= 1, expr= GPIB?*, findList= 0, retcnt= 0, instrDesc= )"));
    EXPECT_EQ(lines().at(0).status, VI_ERROR_RSRC_NFOUND);
}

TEST_F(SessionLogText, OfIn32LeavesItsParenthesisOpen)
{
    standin::script("viIn32", {.status = VI_SUCCESS, .numbers = {0xABCD}});
    EXPECT_EQ(m_session->In32(1, 0x1200000034UL), 0xABCDu);
    const auto call = standin::calls("viIn32").at(0);
    EXPECT_EQ(call.numbers.at(1), 0x1200000034u); // the library gets the whole offset
    char expected[100];
    std::snprintf(expected, sizeof expected, "viIn32(space=1, offset= 0x00000034, val(%p)=0x0000ABCD",
                  reinterpret_cast<void *>(call.numbers.at(2)));
    EXPECT_THAT(texts(), ElementsAre(expected));
}

TEST_F(SessionLogText, OfCloseObject)
{
    EXPECT_EQ(thrownBy([&] { m_session->closeObject(2001); }), VI_ERROR_INV_OBJECT);
    EXPECT_THAT(texts(), ElementsAre("viClose(objectid= 2001)"));
}

TEST_F(SessionLogText, CutsTheBufferAt250AndTheLineAt449Characters)
{
    m_session->write(std::string(300, 'A').c_str());
    EXPECT_EQ(lastText(), "viWrite(vi= 2,buf= \"" + std::string(250, 'A') + "\",cnt= 300,retCnt= 300)");
    const std::string name(600, 'B');
    EXPECT_EQ(thrownBy([&] { m_session->open(const_cast<char *>(name.c_str()), 0, 0); }), 0);
    EXPECT_EQ(lastText(), "viOpen(sesn= 1, rsrc= " + std::string(427, 'B'));
    EXPECT_EQ(lastText().size(), 449u);
}
