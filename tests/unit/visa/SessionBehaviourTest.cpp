#include "unit/visa/SessionFixture.h"

#include <chrono>
#include <cstring>

using testing::ElementsAre;
using testing::IsEmpty;

namespace
{

class Session : public SessionTest
{
protected:
    Session() { openSession(); }

    /// Handles passed to viClose so far, in order.
    static std::vector<std::uint32_t> closed()
    {
        std::vector<std::uint32_t> handles;
        for (const auto &call : standin::calls("viClose"))
            handles.push_back(call.handle);
        return handles;
    }
};

class SessionThrows : public Session, public testing::WithParamInterface<int>
{
};

struct Operation {
    const char *visaName;
    bool throwsOnPositive;
    void (*call)(VisaSessionWithLog &session);
};

ViStatus ignore(ViSession, ViEventType, ViEvent, ViAddr)
{
    return VI_SUCCESS;
}

char s_text[512];
unsigned s_number;
Attribute s_attribute{.id = VI_ATTR_TMO_VALUE};

// Every logged operation on an open session, and whether a positive status counts as its failure.
const Operation Operations[] = {
    {"viOpen", true, [](VisaSessionWithLog &s) { s.open(s_text, 0, 0); }},
    {"viClose", true, [](VisaSessionWithLog &s) { s.closeSession(); }},
    {"viClose", true, [](VisaSessionWithLog &s) { s.closeObject(2); }},
    {"viWrite", false, [](VisaSessionWithLog &s) { s.write("x", 1); }},
    {"viWrite", false, [](VisaSessionWithLog &s) { s.write("x"); }},
    {"viRead", false, [](VisaSessionWithLog &s) { s.read(s_text, 1); }},
    {"viVPrintf", false, [](VisaSessionWithLog &s) { s.viPrintf("x"); }},
    {"viVScanf", false, [](VisaSessionWithLog &s) { s.viScanf("x"); }},
    {"viVQueryf", false, [](VisaSessionWithLog &s) { s.viQueryf("x", "y"); }},
    {"viSetAttribute", true, [](VisaSessionWithLog &s) { s.setAttribute(VI_ATTR_TMO_VALUE, 1, true); }},
    {"viSetAttribute", true, [](VisaSessionWithLog &s) { s.setAttribute(s_attribute, true); }},
    {"viSetAttribute", true, [](VisaSessionWithLog &s) { s.setTimeout(1); }},
    {"viGetAttribute", true, [](VisaSessionWithLog &s) { s.getAttribute(s_attribute, true); }},
    {"viReadSTB", true, [](VisaSessionWithLog &s) { s.getSTB(); }},
    {"viAssertTrigger", true, [](VisaSessionWithLog &s) { s.trigger(0); }},
    {"viClear", true, [](VisaSessionWithLog &s) { s.clear(); }},
    {"viLock", true, [](VisaSessionWithLog &s) { s.lockExclusive(1); }},
    {"viLock", true, [](VisaSessionWithLog &s) { s.lockShared(1, nullptr, s_text); }},
    {"viUnlock", true, [](VisaSessionWithLog &s) { s.unlock(); }},
    {"viGpibControlREN", true, [](VisaSessionWithLog &s) { s.gpibControlREN(0); }},
    {"viGpibControlATN", true, [](VisaSessionWithLog &s) { s.gpibConrtolATN(0); }},
    {"viGpibSendIFC", true, [](VisaSessionWithLog &s) { s.gpibSendIFC(); }},
    {"viGpibCommand", true, [](VisaSessionWithLog &s) { s.gpibCommand(s_text, 1); }},
    {"viGpibPassControl", true, [](VisaSessionWithLog &s) { s.gpibPassControl(1, 2); }},
    {"viEnableEvent", true, [](VisaSessionWithLog &s) { s.enableEvent(1, 2, 3); }},
    {"viDisableEvent", true, [](VisaSessionWithLog &s) { s.disableEvent(1, 2); }},
    {"viDiscardEvents", true, [](VisaSessionWithLog &s) { s.discardEvents(1, 2); }},
    {"viWaitOnEvent", true, [](VisaSessionWithLog &s) { s.waitOnEvent(1, 2, &s_number); }},
    {"viInstallHandler", true, [](VisaSessionWithLog &s) { s.installHandler(1, ignore, nullptr); }},
    {"viUninstallHandler", true, [](VisaSessionWithLog &s) { s.uninstallHandler(1, ignore, nullptr); }},
    {"viFindRsrc", true, [](VisaSessionWithLog &s) { s.findRsrc(s_text, &s_number, s_text); }},
    {"viFindNext", true, [](VisaSessionWithLog &s) { s.findNext(1001, s_text); }},
    {"viIn32", true, [](VisaSessionWithLog &s) { s.In32(0, 0); }},
};

} // namespace

TEST_P(SessionThrows, OnNegativeStatusesAlwaysAndOnPositiveOnesOutsideTransfers)
{
    const Operation &operation = Operations[GetParam()];
    // An operation may close the old session first; the script is for its own call.
    if (std::strcmp(operation.visaName, "viOpen") == 0)
        m_session->closeSession();
    for (const ViStatus status :
         {VI_ERROR_CONN_LOST, ViStatus(VI_SUCCESS_NESTED_EXCLUSIVE), ViStatus(VI_WARN_NSUP_BUF)}) {
        standin::script(operation.visaName, {.status = status, .numbers = {0}});
        const bool expected = status < 0 || operation.throwsOnPositive;
        const auto before = lines().size();
        EXPECT_EQ(thrownBy([&] { operation.call(*m_session); }), expected ? status : 0) << operation.visaName;
        EXPECT_EQ(standin::pending(operation.visaName), 0u) << operation.visaName;
        // Logged before it is thrown, with the status that the library gave.
        ASSERT_EQ(lines().size(), before + 1) << operation.visaName;
        EXPECT_EQ(lines().back().status, status) << operation.visaName;
        EXPECT_TRUE(lines().back().visaLine);
        if (std::strcmp(operation.visaName, "viClose") == 0)
            openSession();
    }
}

INSTANTIATE_TEST_SUITE_P(Operation, SessionThrows, testing::Range(0, static_cast<int>(std::size(Operations))),
                         [](const auto &test) {
                             return std::string(Operations[test.param].visaName) + std::to_string(test.param);
                         });

TEST_F(Session, PassesCompletionCodesOfTransfers)
{
    char buffer[4];
    standin::script("viRead", {.status = VI_SUCCESS_MAX_CNT, .bytes = "abcd"});
    EXPECT_EQ(m_session->read(buffer, 4), 4u);
    standin::script("viRead", {.status = VI_SUCCESS_TERM_CHAR, .bytes = "ab"});
    EXPECT_EQ(m_session->read(buffer, 4), 2u);
    EXPECT_EQ(std::string(buffer, 2), "ab");
}

TEST_F(Session, ThrowsForANestedLockAfterLoggingIt)
{
    standin::script("viLock", {.status = VI_SUCCESS_NESTED_EXCLUSIVE});
    EXPECT_EQ(thrownBy([&] { m_session->lockExclusive(10); }), VI_SUCCESS_NESTED_EXCLUSIVE);
    EXPECT_EQ(lines().at(0).status, VI_SUCCESS_NESTED_EXCLUSIVE);
}

TEST_F(Session, TakesTheDurationOfTheLibraryCallAlone)
{
    standin::script("viClear", {.delay = std::chrono::milliseconds(40)});
    m_session->clear();
    const auto before = std::chrono::steady_clock::now();
    m_session->clear(); // the timer starts afresh: nothing of the slow call before
    const auto around = std::chrono::steady_clock::now() - before;
    EXPECT_GE(lines().at(0).duration, 40'000'000u);
    EXPECT_LE(lines().at(1).duration,
              static_cast<std::uint64_t>(std::chrono::duration_cast<std::chrono::nanoseconds>(around).count()));
}

TEST_F(Session, TakesTheDurationOfAFailedCallToo)
{
    standin::script("viWrite", {.status = VI_ERROR_TMO, .delay = std::chrono::milliseconds(20)});
    EXPECT_EQ(thrownBy([&] { m_session->write("x"); }), VI_ERROR_TMO);
    EXPECT_GE(lines().at(0).duration, 20'000'000u);
}

TEST_F(Session, CallsTheLibraryAndNumbersNoLineWhileNobodyListens)
{
    m_sessionLog.showLog(false);
    const auto numbered = Log::getNewLine();
    EXPECT_EQ(m_session->write("x"), 1u);
    EXPECT_EQ(Log::getNewLine(), numbered + 1);
    EXPECT_EQ(standin::calls("viWrite").size(), 1u);
    EXPECT_THAT(lines(), IsEmpty());
}

TEST_F(Session, WorksWithoutALog)
{
    VisaSessionWithLog silent(nullptr);
    char name[] = "A";
    silent.open(name, 0, 0);
    EXPECT_EQ(silent.write("x"), 1u);
    EXPECT_EQ(thrownBy([&] { silent.closeObject(999); }), VI_ERROR_INV_OBJECT);
}

TEST_F(Session, ClosesTheOldSessionBeforeItOpensAnother)
{
    char name[] = "B";
    m_session->open(name, 0, 0);
    EXPECT_THAT(standin::operations(), ElementsAre("viOpenDefaultRM", "viOpen", "viClose", "viOpen"));
    EXPECT_THAT(closed(), ElementsAre(2));
}

TEST_F(Session, DoesNotOpenWhenTheOldSessionDoesNotClose)
{
    char name[] = "B";
    standin::script("viClose", {.status = VI_ERROR_CLOSING_FAILED});
    EXPECT_EQ(thrownBy([&] { m_session->open(name, 0, 0); }), VI_ERROR_CLOSING_FAILED);
    EXPECT_EQ(standin::calls("viOpen").size(), 1u);
}

TEST_F(Session, IsOpenEvenAfterAFailedOpen)
{
    m_session->closeSession();
    char name[] = "nowhere";
    standin::script("viOpen", {.status = VI_ERROR_RSRC_NFOUND, .numbers = {0}});
    EXPECT_EQ(thrownBy([&] { m_session->open(name, 0, 0); }), VI_ERROR_RSRC_NFOUND);
    EXPECT_EQ(thrownBy([&] { m_session->closeSession(); }), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(lastText(), "viClose(vi= 0)");
    EXPECT_EQ(thrownBy([&] { m_session->closeSession(); }), 0); // now it is closed
    EXPECT_EQ(standin::calls("viClose").size(), 2u);
}

TEST_F(Session, KeepsTheSessionOfADeviceThatDoesNotAnswerYet)
{
    m_session->closeSession();
    char name[] = "A";
    standin::script("viOpen", {.status = VI_SUCCESS_DEV_NPRESENT});
    EXPECT_EQ(thrownBy([&] { m_session->open(name, 0, 0); }), VI_SUCCESS_DEV_NPRESENT);
    m_session->clear();
    EXPECT_EQ(lastText(), "viClear(vi= 3)");
}

TEST_F(Session, ForgetsTheHandleWhateverTheCloseAnswers)
{
    standin::script("viClose", {.status = VI_ERROR_CONN_LOST});
    EXPECT_EQ(thrownBy([&] { m_session->closeSession(); }), VI_ERROR_CONN_LOST);
    EXPECT_EQ(thrownBy([&] { m_session->clear(); }), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(lastText(), "viClear(vi= 0)");
}

TEST_F(Session, ClosesOnceWhileLogging)
{
    m_session->closeSession();
    m_session->closeSession();
    EXPECT_THAT(closed(), ElementsAre(2));
}

TEST_F(Session, StaysOpenAfterACloseThatWasNotLogged)
{
    m_sessionLog.showLog(false);
    m_session->closeSession();
    EXPECT_EQ(thrownBy([&] { m_session->closeSession(); }), VI_ERROR_INV_OBJECT);
    EXPECT_THAT(closed(), ElementsAre(2, 0));
}

TEST_F(Session, IsClosedTwiceWhenDestroyed)
{
    m_session.reset();
    EXPECT_THAT(closed(), ElementsAre(2, 2, 1)); // the second one logged, then the resource manager
    EXPECT_THAT(texts(), ElementsAre("viClose(vi= 2)"));
    EXPECT_EQ(lines().at(0).status, VI_ERROR_INV_OBJECT);
    EXPECT_EQ(standin::openObjects(), 0u);
}

TEST_F(Session, ClosesOnlyTheManagerWhenDestroyedAfterAClose)
{
    m_session->closeSession();
    m_session.reset();
    EXPECT_THAT(closed(), ElementsAre(2, 1));
}

TEST_F(Session, ReopensTheResourceManager)
{
    standin::script("viClose", {.status = VI_ERROR_CONN_LOST}); // swallowed
    m_session->closeRM();
    m_session->closeRM(); // a handle that is closed is not closed again
    EXPECT_THAT(closed(), ElementsAre(2, 1));
    EXPECT_EQ(m_session->openRM(), VI_SUCCESS);
    char name[] = "A";
    m_session->open(name, 0, 0);
    EXPECT_EQ(lastText(), "viOpen(sesn= 1, rsrc= A, mode= 0, timeout= 0, vi= 3)");
}

TEST_F(Session, AnswersTheStatusOfAManagerThatDoesNotOpen)
{
    m_session->closeRM();
    standin::script("viOpenDefaultRM", {.status = VI_ERROR_SYSTEM_ERROR, .numbers = {0}});
    EXPECT_EQ(m_session->openRM(), VI_ERROR_SYSTEM_ERROR);
    m_session.reset(); // closes nothing more
    EXPECT_THAT(closed(), ElementsAre(2, 1));
}

TEST_F(Session, AsksTheManagerForAttributesWhileNoSessionIsOpen)
{
    m_session->setAttribute(VI_ATTR_TMO_VALUE, 1, true);
    m_session->setAttribute(VI_ATTR_TMO_VALUE, 1, false);
    m_sessionLog.showLog(false);
    m_session->closeSession(); // the open flag stays set; the handle counts
    m_session->setAttribute(VI_ATTR_TMO_VALUE, 1, true);
    Attribute attribute{.id = VI_ATTR_TMO_VALUE};
    m_session->getAttribute(attribute, true);
    std::vector<std::uint32_t> handles;
    for (const auto &call : standin::calls("viSetAttribute"))
        handles.push_back(call.handle);
    EXPECT_THAT(handles, ElementsAre(2, 1, 1));
    EXPECT_EQ(standin::calls("viGetAttribute").at(0).handle, 1u);
}

TEST_F(Session, SetsTheTimeOutOfASessionAndNeverTheManagers)
{
    m_session->closeSession();
    EXPECT_EQ(thrownBy([&] { m_session->setTimeout(1000); }), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(lastText(), "viSetAttribute(vi= 0,type= VI_ATTR_TMO_VALUE,value= 0x3E8)");
}

TEST_F(Session, ReadsNarrowAttributesWithoutLeftovers)
{
    Attribute attribute{.id = VI_ATTR_TERMCHAR, .value = 0xFFFFFFFFFFFFFFFF};
    m_session->getAttribute(attribute, true);
    EXPECT_EQ(attribute.value, 0x0Au);
}

TEST_F(Session, AllocatesTheTextOfAnAttributeOnEveryPath)
{
    Attribute attribute{.id = VI_ATTR_RSRC_MANF_NAME};
    m_session->getAttribute(attribute, true);
    EXPECT_STREQ(attribute.text(), "Oltrava");
    std::free(reinterpret_cast<void *>(attribute.value));

    Attribute unknown{.id = VI_ATTR_MODEL_NAME};
    EXPECT_EQ(thrownBy([&] { m_session->getAttribute(unknown, true); }), VI_ERROR_NSUP_ATTR);
    ASSERT_NE(unknown.value, 0u);
    EXPECT_STREQ(unknown.text(), "");
    EXPECT_EQ(unknown.text()[511], '\0');
    std::free(reinterpret_cast<void *>(unknown.value));
}

TEST_F(Session, EndsAnAttributeTextThatFillsItsBuffer)
{
    Attribute attribute{.id = VI_ATTR_RSRC_MANF_NAME};
    standin::script("viGetAttribute", {.status = VI_SUCCESS, .bytes = std::string(511, 'M')});
    m_session->getAttribute(attribute, true);
    EXPECT_EQ(std::string(attribute.text()), std::string(511, 'M'));
    std::free(reinterpret_cast<void *>(attribute.value));
}

TEST_F(Session, NeverBelievesACountBeyondTheBuffer)
{
    char buffer[4];
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "abcd", .numbers = {0xFFFFFFFF}});
    EXPECT_EQ(m_session->read(buffer, 4), 4u);
    EXPECT_EQ(lastText(), "viRead(vi= 2,buf= \"abcd\",cnt= 4,retCnt= 4)");
    standin::script("viWrite", {.status = VI_SUCCESS, .numbers = {100}});
    EXPECT_EQ(m_session->write("ab", 2), 2u);
    standin::script("viGpibCommand", {.status = VI_SUCCESS, .numbers = {100}});
    EXPECT_EQ(m_session->gpibCommand(buffer, 3), 3u);
}

TEST_F(Session, EmptiesOutputsBeforeTheCall)
{
    char text[256] = "left over";
    unsigned number = 77;
    char expression[] = "?*";
    thrownBy([&] { m_session->findRsrc(expression, &number, text); });
    EXPECT_THAT(standin::calls("viFindRsrc").at(0).outputsBefore, ElementsAre(0, 0, 0));
    std::strcpy(text, "left over");
    thrownBy([&] { m_session->findNext(1, text); });
    EXPECT_THAT(standin::calls("viFindNext").at(0).outputsBefore, ElementsAre(0));
    std::strcpy(text, "left over");
    m_session->lockShared(1, nullptr, text);
    EXPECT_THAT(standin::calls("viLock").at(0).outputsBefore, ElementsAre(0));
    m_session->write("x");
    m_session->getSTB();
    m_session->In32(0, 0);
    thrownBy([&] { m_session->read(text, 1); });
    thrownBy([&] { m_session->waitOnEvent(1, 1, nullptr); });
    for (const char *operation : {"viOpenDefaultRM", "viOpen", "viWrite", "viReadSTB", "viIn32", "viRead"})
        EXPECT_THAT(standin::calls(operation).at(0).outputsBefore, ElementsAre(0)) << operation;
    EXPECT_THAT(standin::calls("viWaitOnEvent").at(0).outputsBefore, ElementsAre(0, 0));
}

TEST_F(Session, KeepsARequestedKeyThatSharesItsBufferWithTheGrantedOne)
{
    char key[256] = "mine";
    m_session->lockShared(1, key, key);
    EXPECT_THAT(standin::calls("viLock").at(0).texts, ElementsAre("mine"));
}

TEST_F(Session, HandsOverTheGrantedKeyOfANestedLock)
{
    char key[256] = "";
    standin::script("viLock", {.status = VI_SUCCESS_NESTED_SHARED, .bytes = "granted"});
    EXPECT_EQ(thrownBy([&] { m_session->lockShared(1, nullptr, key); }), VI_SUCCESS_NESTED_SHARED);
    EXPECT_STREQ(key, "granted");
}

TEST_F(Session, PassesNoKeysToAnExclusiveLock)
{
    m_session->lockExclusive(1500);
    EXPECT_THAT(standin::calls("viLock").at(0).numbers, ElementsAre(VI_EXCLUSIVE_LOCK, 1500, 0, 0));
}

TEST_F(Session, ClosesAnEventContextThatNobodyAskedFor)
{
    standin::script("viWaitOnEvent", {.status = VI_SUCCESS, .numbers = {VI_EVENT_TRIG, 2001}});
    EXPECT_EQ(m_session->waitOnEvent(VI_EVENT_TRIG, 1, nullptr), 0xBFFF200Au);
    EXPECT_THAT(closed(), ElementsAre(2001));
    EXPECT_EQ(lines().size(), 1u); // the closing has no line
}

TEST_F(Session, ClosesAnEventContextThatCameWithAPositiveStatusToo)
{
    standin::script("viWaitOnEvent", {.status = VI_SUCCESS_QUEUE_NEMPTY, .numbers = {VI_EVENT_TRIG, 2002}});
    EXPECT_EQ(thrownBy([&] { m_session->waitOnEvent(VI_EVENT_TRIG, 1, nullptr); }), VI_SUCCESS_QUEUE_NEMPTY);
    EXPECT_THAT(closed(), ElementsAre(2002));
    EXPECT_EQ(standin::openObjects(), 2u);
}

TEST_F(Session, LeavesTheContextPlaceAloneWhenNoEventCame)
{
    unsigned context = 5;
    EXPECT_EQ(thrownBy([&] { m_session->waitOnEvent(VI_EVENT_TRIG, 1, &context); }), VI_ERROR_TMO);
    EXPECT_EQ(context, 5u);
    EXPECT_THAT(closed(), IsEmpty());
}

TEST_F(Session, HandsOverTheContextThatCameWithAPositiveStatus)
{
    unsigned context = 0;
    standin::script("viWaitOnEvent", {.status = VI_SUCCESS_QUEUE_NEMPTY, .numbers = {VI_EVENT_TRIG, 2003}});
    EXPECT_EQ(thrownBy([&] { m_session->waitOnEvent(VI_EVENT_TRIG, 1, &context); }), VI_SUCCESS_QUEUE_NEMPTY);
    EXPECT_EQ(context, 2003u);
    EXPECT_THAT(closed(), IsEmpty());
}

TEST_F(Session, TakesNullTexts)
{
    EXPECT_EQ(m_session->write(nullptr), 0u);
    EXPECT_EQ(m_session->write(nullptr, 0), 0u);
    EXPECT_THAT(texts(),
                ElementsAre("viWrite(vi= 2,buf= \"\",cnt= 0,retCnt= 0)", "viWrite(vi= 2,buf= \"\",cnt= 0,retCnt= 0)"));
}
