#include "RunningWorker.h"

#include "pipeline/ReceivedText.h"
#include "visa/CallBackLog.h"

#include <gmock/gmock.h>

#include <malloc.h>

#include <cstring>

using testing::ElementsAre;
using testing::IsEmpty;

namespace
{
constexpr ViSession Session = 2; // the stand-in's first one

using WorkerDispatch = RunningWorker;

std::string shown(const _visaFunctionCall &call)
{
    std::string text;
    for (const Parameter &parameter : call.parameter)
        text += std::to_string(parameter.uintValue) + "/" + parameter.stringValue + " ";
    return text;
}

TEST_F(WorkerDispatch, OpensWithModeAndTimeOutAndCloses)
{
    const auto opened = run(VisaFunctionCallTyp::Open, text("TCPIP::localhost::INSTR"), number(4), number(1500));
    EXPECT_EQ(opened.status, 0);
    EXPECT_EQ(shown(opened), "0/ 0/ 0/ ");
    const auto calls = standin::calls("viOpen");
    ASSERT_EQ(calls.size(), 1u);
    EXPECT_THAT(calls[0].numbers, ElementsAre(4, 1500));
    EXPECT_THAT(calls[0].texts, ElementsAre("TCPIP::localhost::INSTR"));

    const auto closed = run(VisaFunctionCallTyp::Close);
    EXPECT_EQ(closed.status, 0);
    EXPECT_EQ(shown(closed), "0/ 0/ 0/ ");
    ASSERT_EQ(standin::calls("viClose").size(), 1u);
    EXPECT_EQ(standin::calls("viClose")[0].handle, Session);
}

// One row a kind that answers nothing but a status.
struct PlainRow {
    VisaFunctionCallTyp type;
    Parameter first;
    Parameter second;
    const char *operation;
    std::vector<std::uint64_t> numbers;
};

void PrintTo(const PlainRow &row, std::ostream *stream)
{
    *stream << row.operation << " for kind " << static_cast<unsigned>(row.type);
}

class PlainDispatch : public RunningWorker, public testing::WithParamInterface<PlainRow>
{
};

TEST_P(PlainDispatch, PassesItsArgumentsAndAnswersTheStatus)
{
    open();
    const PlainRow &row = GetParam();
    const auto result = run(row.type, row.first, row.second);
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(shown(result), "0/ 0/ 0/ ");
    const auto calls = standin::calls(row.operation);
    ASSERT_EQ(calls.size(), 1u);
    EXPECT_EQ(calls[0].handle, Session);
    EXPECT_EQ(calls[0].numbers, row.numbers);

    standin::script(row.operation, {.status = static_cast<ViStatus>(0xBFFF0067)});
    const auto failed = run(row.type, row.first, row.second);
    EXPECT_EQ(failed.status, static_cast<ViStatus>(0xBFFF0067));
    EXPECT_EQ(shown(failed), "0/ 0/ 0/ ");
}

INSTANTIATE_TEST_SUITE_P(
    Kinds, PlainDispatch,
    testing::Values(
        PlainRow{VisaFunctionCallTyp::Unlock, {}, {}, "viUnlock", {}},
        PlainRow{VisaFunctionCallTyp::ExclusiveLock, {1234, ""}, {}, "viLock", {1, 1234, 0, 0}},
        PlainRow{VisaFunctionCallTyp::EnableEvent, {0x3FFF200B, ""}, {3, ""}, "viEnableEvent", {0x3FFF200B, 3, 0}},
        PlainRow{
            VisaFunctionCallTyp::DisableEvent, {0x3FFF200B, ""}, {0x1FFFF, ""}, "viDisableEvent", {0x3FFF200B, 0xFFFF}},
        PlainRow{VisaFunctionCallTyp::DiscardEvents, {0x3FFF200B, ""}, {1, ""}, "viDiscardEvents", {0x3FFF200B, 1}},
        PlainRow{VisaFunctionCallTyp::AssertTrigger, {77, ""}, {}, "viAssertTrigger", {0}},
        PlainRow{VisaFunctionCallTyp::Clear, {}, {}, "viClear", {}},
        PlainRow{VisaFunctionCallTyp::GpibControlREN, {0x10002, ""}, {}, "viGpibControlREN", {2}},
        PlainRow{VisaFunctionCallTyp::GpibControlATN, {0x10001, ""}, {}, "viGpibControlATN", {1}},
        PlainRow{VisaFunctionCallTyp::GpibSendIFC, {}, {}, "viGpibSendIFC", {}},
        PlainRow{VisaFunctionCallTyp::GpibCommand, {0, std::string("?\0U", 3)}, {}, "viGpibCommand", {3}},
        PlainRow{VisaFunctionCallTyp::GpibPassControl, {0x10005, ""}, {0x1FFFF, ""}, "viGpibPassControl", {5, 0xFFFF}},
        PlainRow{VisaFunctionCallTyp::Write, {0, std::string("a\0b\n", 4)}, {}, "viWrite", {4}}));

TEST_F(WorkerDispatch, WritesAllBytesZeroBytesIncluded)
{
    open();
    run(VisaFunctionCallTyp::Write, text(std::string("a\0b", 3)));
    run(VisaFunctionCallTyp::GpibCommand, text(std::string("\0?U", 3)));
    EXPECT_THAT(standin::calls("viWrite")[0].texts, ElementsAre(std::string("a\0b", 3)));
    EXPECT_THAT(standin::calls("viGpibCommand")[0].texts, ElementsAre(std::string("\0?U", 3)));
}

TEST_F(WorkerDispatch, ReadsWhatCame)
{
    open();
    standin::script("viRead", {.status = VI_SUCCESS_TERM_CHAR, .bytes = "1.5\n"});
    const auto result = run(VisaFunctionCallTyp::Read, number(4096));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(shown(result), "0/1.5\n 0/ 0/ ");
    EXPECT_THAT(standin::calls("viRead")[0].numbers, ElementsAre(4096));
}

TEST_F(WorkerDispatch, AReadFillsItsBufferToTheLastByte)
{
    open();
    standin::script("viRead", {.status = VI_SUCCESS_MAX_CNT, .bytes = "12345"});
    EXPECT_EQ(run(VisaFunctionCallTyp::Read, number(5)).parameter[0].stringValue, "12345");
}

TEST_F(WorkerDispatch, AReadEndsAtTheFirstZeroByte)
{
    open();
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = std::string("abc\0def", 7)});
    EXPECT_EQ(run(VisaFunctionCallTyp::Read, number(100)).parameter[0].stringValue, "abc");
}

TEST_F(WorkerDispatch, ACountBeyondTheBufferIsNotBelieved)
{
    open();
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "12345", .numbers = {4000000000}});
    EXPECT_EQ(run(VisaFunctionCallTyp::Read, number(5)).parameter[0].stringValue, "12345");
}

TEST_F(WorkerDispatch, AFailedReadHasNoText)
{
    open();
    standin::script("viRead", {.status = VI_ERROR_TMO, .bytes = "half"});
    const auto result = run(VisaFunctionCallTyp::Read, number(100));
    EXPECT_EQ(result.status, static_cast<ViStatus>(0xBFFF0015));
    EXPECT_EQ(shown(result), "0/ 0/ 0/ ");
}

TEST_F(WorkerDispatch, AReadOfNothingIsPassedOn)
{
    open();
    standin::script("viRead", {.status = VI_SUCCESS_MAX_CNT});
    const auto result = run(VisaFunctionCallTyp::Read, number(0));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.parameter[0].stringValue, "");
    EXPECT_THAT(standin::calls("viRead")[0].numbers, ElementsAre(0));
}

TEST_F(WorkerDispatch, AnImpossibleReadSizeIsAnExceptionOfItsOwn)
{
    open();
    for (const std::uint64_t size : {0xFFFFFFFFFFFFFFFFull, 0x8000000000000000ull, 0x100000000ull}) {
        const auto result = run(VisaFunctionCallTyp::Read, number(size));
        EXPECT_EQ(result.status, 0);
        EXPECT_EQ(shown(result), "0/ 0/ 0/ ");
        EXPECT_EQ(logLines().back(), "Execption occur");
    }
    EXPECT_THAT(standin::calls("viRead"), IsEmpty());
    EXPECT_EQ(run(VisaFunctionCallTyp::Query, text("*IDN?\n"), number(0xFFFFFFFFFFFFFFFFull)).status, 0);
    EXPECT_THAT(standin::calls("viWrite"), IsEmpty());

    // And the loop goes on.
    EXPECT_EQ(run(VisaFunctionCallTyp::Clear).status, 0);
}

TEST_F(WorkerDispatch, TheExceptionsLineIsShownEvenWithShowLogOff)
{
    m_worker->getLog()->showLog(false);
    run(VisaFunctionCallTyp::Read, number(0xFFFFFFFFFFFFFFFFull));
    EXPECT_THAT(logLines(), ElementsAre("Execption occur"));
    FastBuffer line;
    ASSERT_EQ(m_worker->getStringMessageQueue()->copyFromQueue(&line, 1), 1u);
    EXPECT_FALSE(line.visaLine);
    EXPECT_EQ(line.status, 0);
    EXPECT_EQ(line.duration, 0u);
}

TEST_F(WorkerDispatch, QueriesWithTheSizeOfTheSecondSlot)
{
    open();
    const auto result = run(VisaFunctionCallTyp::Query, {500, "*IDN?\n"}, number(1024));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(shown(result), "0/Oltrava,Stand-in,1,1.0\n 0/ 0/ ");
    EXPECT_THAT(standin::calls("viWrite")[0].texts, ElementsAre("*IDN?\n"));
    EXPECT_THAT(standin::calls("viRead")[0].numbers, ElementsAre(1024));
}

TEST_F(WorkerDispatch, AQueryWhoseWriteFailedReadsNothing)
{
    open();
    standin::script("viWrite", {.status = VI_ERROR_TMO});
    const auto result = run(VisaFunctionCallTyp::Query, text("*IDN?\n"), number(1024));
    EXPECT_EQ(result.status, VI_ERROR_TMO);
    EXPECT_EQ(result.parameter[0].stringValue, "");
    EXPECT_THAT(standin::calls("viRead"), IsEmpty());
}

// A session that throws the two statuses of a read that ended well: the text counts all the same.
TEST(ReceivedText, TakesTheWholeBufferWhenTheReadEndedOnTermCharOrCount)
{
    for (const ViStatus status : {0x3FFF0005, 0x3FFF0006}) {
        std::string text = "old";
        const auto read = [status](char *buffer, ViUInt32) -> ViUInt32 {
            std::memcpy(buffer, "12345", 5);
            throw VisaError(status);
        };
        try {
            receiveText(5, text, read);
            ADD_FAILURE() << "the status was lost";
        } catch (const VisaError &error) {
            EXPECT_EQ(error.getStatus(), status);
        }
        EXPECT_EQ(text, "12345");
    }
}

TEST(ReceivedText, TakesNothingWithAnyOtherStatus)
{
    for (const ViStatus status : {0x3FFF0002, -1}) {
        std::string text = "old";
        const auto read = [status](char *buffer, ViUInt32) -> ViUInt32 {
            std::memcpy(buffer, "12345", 5);
            throw VisaError(status);
        };
        EXPECT_THROW(receiveText(5, text, read), VisaError);
        EXPECT_EQ(text, "");
    }
}

TEST(ReceivedText, EndsAtTheCountReceived)
{
    std::string text;
    receiveText(100, text, [](char *buffer, ViUInt32 size) -> ViUInt32 {
        std::memset(buffer, 'x', size);
        return 3;
    });
    EXPECT_EQ(text, "xxx");
    receiveText(100, text, [](char *buffer, ViUInt32 size) -> ViUInt32 {
        std::memset(buffer, 'y', size);
        return 101;
    });
    EXPECT_EQ(text, std::string(100, 'y'));
}

TEST(ReceivedText, TouchesNoMemoryThatTheReadLeavesAlone)
{
    // A buffer of 4 GiB that nobody fills costs address space only.
    std::string text;
    receiveText(0xFFFFFFFFu, text, [](char *buffer, ViUInt32 size) -> ViUInt32 {
        EXPECT_EQ(size, 0xFFFFFFFFu);
        std::memcpy(buffer, "x", 1);
        return 1;
    });
    EXPECT_EQ(text, "x");
}

TEST_F(WorkerDispatch, ReadsTheStatusByteInItsSixteenBits)
{
    open();
    standin::script("viReadSTB", {.numbers = {0xFF50}});
    const auto result = run(VisaFunctionCallTyp::ReadSTB);
    EXPECT_EQ(shown(result), "65360/ 0/ 0/ ");
}

TEST_F(WorkerDispatch, SetsAttributesOfSessionAndManagerAndEchoesTheRequest)
{
    open();
    const auto onSession = run(VisaFunctionCallTyp::SetAttribute, {0x3FFF001A, "id"}, {5000, "value"}, number(9));
    EXPECT_EQ(onSession.status, 0);
    EXPECT_EQ(shown(onSession), "1073676314/id 5000/value 0/ ");
    const auto byDefault = run(VisaFunctionCallTyp::SetAttributeDef, {0x3FFF001A, "id"}, {6000, "value"});
    EXPECT_EQ(shown(byDefault), "1073676314/id 6000/value 0/ ");
    const auto calls = standin::calls("viSetAttribute");
    ASSERT_EQ(calls.size(), 2u);
    EXPECT_EQ(calls[0].handle, Session);
    EXPECT_THAT(calls[0].numbers, ElementsAre(0x3FFF001A, 5000));
    EXPECT_EQ(calls[1].handle, 1u);
    EXPECT_THAT(calls[1].numbers, ElementsAre(0x3FFF001A, 6000));
}

TEST_F(WorkerDispatch, AFailedSetAttributeStillEchoesTheRequest)
{
    open();
    standin::script("viSetAttribute", {.status = static_cast<ViStatus>(0xBFFF001E)});
    const auto result = run(VisaFunctionCallTyp::SetAttribute, {0x3FFF001A, "id"}, {5000, "value"});
    EXPECT_EQ(result.status, static_cast<ViStatus>(0xBFFF001E));
    EXPECT_EQ(shown(result), "1073676314/id 5000/value 0/ ");
}

TEST_F(WorkerDispatch, GetsNumbersOfSessionAndManager)
{
    open();
    const auto onSession = run(VisaFunctionCallTyp::GetAttribute, number(0x3FFF001A));
    EXPECT_EQ(shown(onSession), "1073676314/ 2000/ 0/ ");
    run(VisaFunctionCallTyp::GetAttributeDef, number(0x3FFF001A));
    const auto calls = standin::calls("viGetAttribute");
    ASSERT_EQ(calls.size(), 2u);
    EXPECT_EQ(calls[0].handle, Session);
    EXPECT_EQ(calls[1].handle, 1u);
}

TEST_F(WorkerDispatch, GetsTextsWithoutANumber)
{
    open();
    const auto result = run(VisaFunctionCallTyp::GetAttribute, number(0xBFFF0001)); // class of the resource
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(shown(result), "3221159937/ 0/INSTR 0/ ");
}

TEST_F(WorkerDispatch, AFailedGetAttributeSaysWhichAttribute)
{
    open();
    standin::script("viGetAttribute", {.status = static_cast<ViStatus>(0xBFFF001D)});
    const auto number = run(VisaFunctionCallTyp::GetAttribute, RunningWorker::number(0x3FFF001A));
    EXPECT_EQ(number.status, static_cast<ViStatus>(0xBFFF001D));
    EXPECT_EQ(shown(number), "1073676314/ 0/ 0/ ");
    standin::script("viGetAttribute", {.status = static_cast<ViStatus>(0xBFFF001D), .bytes = "stale"});
    const auto text = run(VisaFunctionCallTyp::GetAttribute, RunningWorker::number(0xBFFF0001));
    EXPECT_EQ(text.status, static_cast<ViStatus>(0xBFFF001D));
    EXPECT_EQ(shown(text), "3221159937/ 0/ 0/ ");
}

TEST_F(WorkerDispatch, FreesTheTextBuffersOfAttributesOnEveryPath)
{
    open();
    const auto inUse = [] { return mallinfo2().uordblks; };
    const auto round = [this](int count) {
        for (int i = 0; i < count; ++i) {
            run(VisaFunctionCallTyp::GetAttribute, RunningWorker::number(0xBFFF0001));
            standin::script("viGetAttribute", {.status = static_cast<ViStatus>(0xBFFF001D)});
            run(VisaFunctionCallTyp::GetAttribute, RunningWorker::number(0xBFFF0001));
            standin::reset(); // its record of calls grows, too
            m_worker->openRM();
        }
    };
    round(50);
    const auto before = inUse();
    round(500);
    EXPECT_LT(inUse(), before + 500 * 512 / 4); // one leaked buffer a round would be 500 * 512
}

TEST_F(WorkerDispatch, LocksSharedAndAnswersTheGrantedKey)
{
    open();
    standin::script("viLock", {.status = VI_SUCCESS, .bytes = "granted"});
    const auto result = run(VisaFunctionCallTyp::SharedLock, number(1500), text("wanted"));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(shown(result), "0/granted 0/ 0/ ");
    const auto call = standin::calls("viLock")[0];
    EXPECT_EQ(call.numbers[0], 2u);
    EXPECT_EQ(call.numbers[1], 1500u);
    EXPECT_THAT(call.texts, ElementsAre("wanted"));
    EXPECT_NE(call.numbers[2], 0u);
}

TEST_F(WorkerDispatch, AnEmptyRequestedKeyIsPassedAsTyped)
{
    open();
    run(VisaFunctionCallTyp::SharedLock, number(0), text(""));
    EXPECT_NE(standin::calls("viLock")[0].numbers[2], 0u);
    EXPECT_THAT(standin::calls("viLock")[0].texts, ElementsAre(""));
}

TEST_F(WorkerDispatch, ANestedSharedLockHandsOverItsKey)
{
    open();
    standin::script("viLock", {.status = static_cast<ViStatus>(0x3FFF009A), .bytes = "granted"});
    const auto nested = run(VisaFunctionCallTyp::SharedLock, number(0), text("wanted"));
    EXPECT_EQ(nested.status, 0x3FFF009A);
    EXPECT_EQ(nested.parameter[0].stringValue, "granted");

    standin::script("viLock", {.status = static_cast<ViStatus>(0xBFFF000F), .bytes = "granted"});
    const auto refused = run(VisaFunctionCallTyp::SharedLock, number(0), text("wanted"));
    EXPECT_EQ(refused.status, static_cast<ViStatus>(0xBFFF000F));
    EXPECT_EQ(refused.parameter[0].stringValue, "");
}

TEST_F(WorkerDispatch, WaitsForAnEvent2000MsWhateverIsAskedAndClosesItsContext)
{
    open();
    standin::script("viWaitOnEvent", {.status = VI_SUCCESS, .numbers = {0x3FFF200B, 7001}});
    const auto result = run(VisaFunctionCallTyp::WaitOnEvent, number(0x3FFF200B), number(60000));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(shown(result), "0/ 0/ 0/ ");
    EXPECT_THAT(standin::calls("viWaitOnEvent")[0].numbers, ElementsAre(0x3FFF200B, 2000));
    ASSERT_EQ(standin::calls("viClose").size(), 1u);
    EXPECT_EQ(standin::calls("viClose")[0].handle, 7001u);

    // A positive code is thrown, and leaves no context open either.
    standin::script("viWaitOnEvent", {.status = static_cast<ViStatus>(0x3FFF0080), .numbers = {0x3FFF200B, 7002}});
    EXPECT_EQ(run(VisaFunctionCallTyp::WaitOnEvent, number(0x3FFF200B)).status, 0x3FFF0080);
    EXPECT_EQ(standin::calls("viClose").at(1).handle, 7002u);
}

TEST_F(WorkerDispatch, InstallsTheCallbackLogAsHandler)
{
    open();
    run(VisaFunctionCallTyp::InstallHandler, number(0x3FFF200B), number(5));
    const auto handler = reinterpret_cast<std::uintptr_t>(&CallBackLog::viEventHandler);
    EXPECT_THAT(standin::calls("viInstallHandler")[0].numbers, ElementsAre(0x3FFF200B, handler, 0));
    standin::fireEvent(Session, 0x3FFF200B);
    EXPECT_THAT(logLines().back(), testing::StartsWith("Callback from Event "));
    run(VisaFunctionCallTyp::UninstallHandler, number(0x3FFF200B));
    EXPECT_THAT(standin::calls("viUninstallHandler")[0].numbers, ElementsAre(0x3FFF200B, handler, 0));
}

TEST_F(WorkerDispatch, KindsThatAreNoOperationFinishAtOnceAndCleared)
{
    const std::size_t before = standin::operations().size();
    for (const unsigned kind : {0u, 3u, 8u, 9u, 20u, 21u, 23u, 25u, 34u, 35u, 36u, 37u}) {
        _visaFunctionCall request;
        request.type = static_cast<VisaFunctionCallTyp>(kind);
        request.status = -5;
        request.parameter = {Parameter{1, "a"}, Parameter{2, "b"}, Parameter{3, "c"}};
        ASSERT_TRUE(m_handler->sendVisaFunctionCall(request, false));
        const auto result = awaitResult();
        EXPECT_EQ(static_cast<unsigned>(result.type), kind);
        EXPECT_EQ(result.status, 0);
        EXPECT_EQ(shown(result), "0/ 0/ 0/ ") << kind;
        if (kind == 0) { // the listener of All is one of the kind as well
            EXPECT_EQ(awaitResult().type, VisaFunctionCallTyp::All);
        }
    }
    EXPECT_EQ(standin::operations().size(), before);
}

TEST_F(WorkerDispatch, AnUnknownKindComesBackToo)
{
    for (const unsigned kind : {42u, 99u, 100u, 0xFFFFFFFFu}) {
        const auto result = run(static_cast<VisaFunctionCallTyp>(kind), {1, "a"});
        EXPECT_EQ(result.status, 0);
        EXPECT_EQ(shown(result), "0/ 0/ 0/ ");
    }
}
} // namespace
