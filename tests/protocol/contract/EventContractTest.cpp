// Events, their contexts as objects, and handlers of exceptions, over every protocol.
#include "contract/Contract.h"
#include "support/Completion.h"

#include <array>
#include <functional>
#include <string>
#include <thread>
#include <vector>

using test::Completion;
using test::nextCompletion;

namespace contract
{
namespace
{

constexpr ViEventType Done = VI_EVENT_IO_COMPLETION;
constexpr ViEventType Failed = VI_EVENT_EXCEPTION;

class EventContract : public Contract
{
protected:
    void TearDown() override { viClose(m_session.vi); }

    ViStatus enable(ViEventType type, ViUInt16 mechanism)
    {
        return viEnableEvent(m_session.vi, type, mechanism, VI_NULL);
    }
    /// Makes one event of type Done, and answers when the transfer is over.
    void transferNothing() { EXPECT_EQ(viReadAsync(m_session.vi, nullptr, 0, nullptr), VI_SUCCESS); }
    ViEvent takeContext()
    {
        ViEvent context = VI_NULL;
        EXPECT_GE(viWaitOnEvent(m_session.vi, Done, 30000, nullptr, &context), VI_SUCCESS);
        return context;
    }
};

INSTANTIATE_TEST_SUITE_P(All, EventContract, testing::ValuesIn(protocols()), nameOf);

TEST_P(EventContract, AContextBelongsToWhoeverTookIt)
{
    ASSERT_EQ(enable(Done, VI_QUEUE), VI_SUCCESS);
    transferNothing();
    const ViEvent context = takeContext();
    EXPECT_EQ(viDiscardEvents(m_session.vi, VI_ALL_ENABLED_EVENTS, VI_ALL_MECH), VI_SUCCESS_QUEUE_EMPTY);
    EXPECT_EQ(viDisableEvent(m_session.vi, Done, VI_ALL_MECH), VI_SUCCESS);
    EXPECT_EQ(viClose(m_session.vi), VI_SUCCESS);
    Completion completion;
    test::readAttributes(context, completion);
    EXPECT_EQ(completion.type, Done);
    EXPECT_EQ(completion.status, VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(viClose(context), VI_SUCCESS);
    EXPECT_EQ(viClose(context), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_EVENT_TYPE, &completion.type), VI_ERROR_INV_OBJECT);
}

TEST_P(EventContract, AContextIsReadAndNothingElse)
{
    ASSERT_EQ(enable(Done, VI_QUEUE), VI_SUCCESS);
    transferNothing();
    const ViEvent context = takeContext();
    std::array<char, 256> place{};
    EXPECT_EQ(viSetAttribute(context, VI_ATTR_JOB_ID, 5), VI_ERROR_ATTR_READONLY);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_TMO_VALUE, place.data()), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(viRead(context, reinterpret_cast<ViPBuf>(place.data()), 1, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viClose(m_session.rm), VI_SUCCESS); // and with it whatever was opened through it
    EXPECT_EQ(viClose(context), VI_ERROR_INV_OBJECT);
}

TEST_P(EventContract, AFullQueueKeepsWhatItHasAndSaysSo)
{
    EXPECT_EQ(m_session.get<ViUInt32>(VI_ATTR_MAX_QUEUE_LENGTH), 50u);
    ASSERT_EQ(m_session.set(VI_ATTR_MAX_QUEUE_LENGTH, 3), VI_SUCCESS);
    ASSERT_EQ(enable(Done, VI_QUEUE), VI_SUCCESS);
    EXPECT_EQ(m_session.set(VI_ATTR_MAX_QUEUE_LENGTH, 9), VI_ERROR_ATTR_READONLY);
    std::vector<ViJobId> jobs(6);
    for (ViJobId &job : jobs)
        ASSERT_EQ(viReadAsync(m_session.vi, nullptr, 0, &job), VI_SUCCESS);
    query("*OPC?"); // behind five of them; the sixth may be about to be told
    EXPECT_EQ(nextCompletion(m_session.vi).waited, VI_WARN_QUEUE_OVERFLOW);
    Completion completion = nextCompletion(m_session.vi);
    EXPECT_EQ(completion.job, jobs[1]);
    EXPECT_GE(completion.waited, VI_SUCCESS);
    completion = nextCompletion(m_session.vi);
    EXPECT_EQ(completion.job, jobs[2]);
}

TEST_P(EventContract, WaitingNeedsNoPlaceForTheResults)
{
    ASSERT_EQ(enable(Done, VI_QUEUE), VI_SUCCESS);
    transferNothing();
    EXPECT_EQ(viWaitOnEvent(m_session.vi, VI_ALL_ENABLED_EVENTS, 30000, nullptr, nullptr), VI_SUCCESS);
    EXPECT_EQ(viWaitOnEvent(m_session.vi, VI_ALL_ENABLED_EVENTS, VI_TMO_IMMEDIATE, nullptr, nullptr), VI_ERROR_TMO);
}

/// A handler for VI_EVENT_EXCEPTION and what it was told.
struct Witness {
    struct Call {
        ViEventType type;
        ViStatus status;
        std::string operation;
        std::thread::id thread;
    };
    std::vector<Call> calls;
    std::function<void(ViSession)> work = [](ViSession) {};

    static ViStatus call(ViSession session, ViEventType type, ViEvent context, ViAddr user)
    {
        auto &self = *static_cast<Witness *>(user);
        Call call{.type = type, .status = VI_SUCCESS, .operation = std::string(256, '\0'), .thread = {}};
        EXPECT_EQ(viGetAttribute(context, VI_ATTR_STATUS, &call.status), VI_SUCCESS);
        EXPECT_EQ(viGetAttribute(context, VI_ATTR_OPER_NAME, call.operation.data()), VI_SUCCESS);
        ViJobId job = 0;
        EXPECT_EQ(viGetAttribute(context, VI_ATTR_JOB_ID, &job), VI_ERROR_NSUP_ATTR);
        call.operation = call.operation.c_str();
        call.thread = std::this_thread::get_id();
        self.calls.push_back(call);
        self.work(session);
        return VI_SUCCESS;
    }
};

class ExceptionContract : public EventContract
{
protected:
    void SetUp() override
    {
        Contract::SetUp();
        if (HasFatalFailure())
            return;
        ASSERT_EQ(viInstallHandler(m_session.vi, Failed, Witness::call, &m_witness), VI_SUCCESS);
        ASSERT_EQ(enable(Failed, VI_HNDLR), VI_SUCCESS);
    }
    ViStatus failingRead()
    {
        m_session.set(VI_ATTR_TMO_VALUE, 50);
        return m_session.read();
    }

    Witness m_witness;
};

INSTANTIATE_TEST_SUITE_P(All, ExceptionContract, testing::ValuesIn(protocols()), nameOf);

TEST_P(ExceptionContract, TellsWhatFailedOnTheThreadThatFailed)
{
    std::thread::id reader;
    std::thread([&] {
        reader = std::this_thread::get_id();
        EXPECT_EQ(failingRead(), VI_ERROR_TMO);
    }).join();
    EXPECT_EQ(m_session.set(VI_ATTR_TMO_VALUE, 20000), VI_SUCCESS);
    EXPECT_EQ(viSetAttribute(m_session.vi, VI_ATTR_RSRC_CLASS, 0), VI_ERROR_ATTR_READONLY);
    ASSERT_EQ(m_witness.calls.size(), 2u);
    EXPECT_EQ(m_witness.calls[0].type, Failed);
    EXPECT_EQ(m_witness.calls[0].status, VI_ERROR_TMO);
    EXPECT_EQ(m_witness.calls[0].operation, "viRead");
    EXPECT_EQ(m_witness.calls[0].thread, reader);
    EXPECT_EQ(m_witness.calls[1].operation, "viSetAttribute");
    EXPECT_EQ(m_witness.calls[1].thread, std::this_thread::get_id());
}

TEST_P(ExceptionContract, HandlerMayRepairAndFailAgain)
{
    m_witness.work = [this](ViSession session) {
        ViByte byte = 0;
        EXPECT_EQ(viRead(session, &byte, 1, nullptr), VI_ERROR_TMO); // raises nothing further
        m_session.set(VI_ATTR_TMO_VALUE, 20000);
        EXPECT_EQ(viClear(session), VI_SUCCESS);
    };
    EXPECT_EQ(failingRead(), VI_ERROR_TMO);
    EXPECT_EQ(m_witness.calls.size(), 1u);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_P(ExceptionContract, HandlerMayCloseTheSessionUnderItsCall)
{
    m_witness.work = [](ViSession session) { EXPECT_EQ(viClose(session), VI_SUCCESS); };
    EXPECT_EQ(failingRead(), VI_ERROR_TMO);
    EXPECT_EQ(m_session.read(), VI_ERROR_INV_OBJECT);
    EXPECT_EQ(m_witness.calls.size(), 1u);
}

TEST_P(ExceptionContract, HandlerMayTakeItselfOut)
{
    m_witness.work = [this](ViSession session) {
        EXPECT_EQ(viUninstallHandler(session, Failed, Witness::call, &m_witness), VI_SUCCESS);
    };
    EXPECT_EQ(failingRead(), VI_ERROR_TMO);
    EXPECT_EQ(failingRead(), VI_ERROR_TMO);
    EXPECT_EQ(m_witness.calls.size(), 1u);
    EXPECT_EQ(enable(Failed, VI_HNDLR), VI_ERROR_HNDLR_NINSTALLED);
}

TEST_P(ExceptionContract, AJobThatFailsTellsItInItsCompletion)
{
    ASSERT_EQ(enable(Done, VI_QUEUE), VI_SUCCESS);
    m_session.set(VI_ATTR_TMO_VALUE, 50);
    ViByte byte = 0;
    EXPECT_EQ(viReadAsync(m_session.vi, &byte, 1, nullptr), VI_SUCCESS);
    EXPECT_EQ(nextCompletion(m_session.vi).status, VI_ERROR_TMO);
    EXPECT_TRUE(m_witness.calls.empty());
}

} // namespace
} // namespace contract
