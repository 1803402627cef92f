#include "InstrumentTestFixture.h"

#include "instrtests/Stress4882Test.h"
#include "pipeline/VisaError.h"

#include <cstdlib>

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace
{

constexpr Draw Odd{2, 1};
constexpr Draw Even{2, 0};

constexpr Draw action(unsigned number)
{
    return {12, number};
}

class Stress4882 : public InstrumentTest
{
protected:
    Stress4882()
    {
        standin::setReply("*CLS;*IDN?", "Maker,Model 5,1,2.0\n");
        standin::setReply("*STB?", "0\n");
        standin::setReply("*ESR?", "1\n");
    }

    /// Runs the action and then, as the last one, a device clear during which the test is stopped.
    unsigned act(unsigned number, std::vector<Draw> draws = {})
    {
        draws.insert(draws.begin(), action(number));
        draws.push_back(action(0));
        draw(draws);
        friendly("viClear", number == 0 ? 2 : 1);
        stopDuring("viClear");
        return run(test4882);
    }

    /// What was asked between the set-up and the last clear.
    static Texts actionAsked()
    {
        Texts texts = askedFrom("printf *CLS;*ESE 1;*SRE 32\n");
        texts.erase(texts.begin());
        EXPECT_EQ(texts.back(), "close 2");
        texts.pop_back();
        if (!texts.empty() && texts.back() == "viClear")
            texts.pop_back();
        return texts;
    }

    /// The lines behind those of the set-up.
    Texts actionLines() const
    {
        Texts texts = lines();
        texts.erase(texts.begin(), std::find(texts.begin(), texts.end(), "Press 'Stop Test' to finish test!") + 1);
        return texts;
    }
};

TEST_F(Stress4882, SetsUpInThisOrder)
{
    m_stop = true;
    EXPECT_EQ(run(test4882), 0u);
    EXPECT_THAT(asked(),
                ElementsAre("get 3FFF0171", "get BFFF0001", "set 3FFF001C=4", "viClear", "get BFFF0002",
                            "write *CLS;*IDN?\n", "read 4096", "set 3FFF001A=8000", "get 3FFF0171", "get 3FFF0175",
                            "viEnableEvent 3FFF200B 1", "printf *CLS;*ESE 1;*SRE 32\n", "close 2"));
    EXPECT_THAT(lines(), ElementsAre("Stress Test 4882 of Device: Maker,Model 5,1,2.0\\n",
                                     "Press 'Stop Test' to finish test!", "Ready with 0 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, SetsUpASerialLine)
{
    beSerial();
    m_stop = true;
    EXPECT_EQ(run(test4882), 0u);
    const Texts calls = asked();
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 9),
                ElementsAre("get 3FFF0171", "set 3FFF0038=0", "set 3FFF0021=115200", "set 3FFF0022=8", "set 3FFF0023=0",
                            "set 3FFF0024=10", "set 3FFF0025=2", "get BFFF0001", "set 3FFF001C=4"));
    EXPECT_THAT(calls, Not(Contains(HasSubstr("viEnableEvent"))));
    EXPECT_EQ(lines().front(), "Force ASRL settings to 115200,8,N,1,RTS/CTS");
}

TEST_F(Stress4882, SetsUpARawSocket)
{
    beRawSocket();
    m_stop = true;
    EXPECT_EQ(run(test4882), 0u);
    const Texts calls = asked();
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 4),
                ElementsAre("get 3FFF0171", "get BFFF0001", "set 3FFF0038=1", "set 3FFF001C=4"));
    EXPECT_THAT(calls, Not(Contains(HasSubstr("viEnableEvent"))));
    EXPECT_EQ(calls[calls.size() - 2], "printf *CLS;*ESE 1;*SRE 32\n");
}

TEST_F(Stress4882, TunesGpibAddressing)
{
    beGpib();
    m_stop = true;
    EXPECT_EQ(run(test4882), 0u);
    const Texts calls = askedFrom("get 3FFF0175");
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 4),
                ElementsAre("get 3FFF0175", "set 3FFF0184=1", "set 3FFF001B=0", "viEnableEvent 3FFF200B 1"));
}

TEST_F(Stress4882, LeavesGpibAddressingToAManufacturerThatCannot)
{
    beGpib();
    standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4095, 2);
    m_stop = true;
    EXPECT_EQ(run(test4882), 0u);
    EXPECT_THAT(asked(), Not(Contains("set 3FFF0184=1")));
}

TEST_F(Stress4882, ARefusedProtocolIsNoMatter)
{
    failure("viSetAttribute", VI_ERROR_NSUP_ATTR_STATE);
    m_stop = true;
    EXPECT_EQ(run(test4882), 0u);
}

/// A call of the set-up that fails.
struct Failing {
    const char *operation;
    int before; ///< calls of it that succeed
};

void PrintTo(const Failing &failing, std::ostream *out)
{
    *out << failing.operation << " after " << failing.before;
}

class EachCallOfTheSetUp : public Stress4882, public testing::WithParamInterface<Failing>
{
};

TEST_P(EachCallOfTheSetUp, ThatFailsEndsIt)
{
    friendly(GetParam().operation, GetParam().before);
    failure(GetParam().operation, VI_ERROR_TMO);
    EXPECT_EQ(run(test4882), 1u);
    const Texts all = lines();
    EXPECT_THAT(Texts(all.end() - 2, all.end()),
                ElementsAre("Error: VI_ERROR_TMO", "Ready with 0 Clear, 0 Trigger and 0 open"));
    EXPECT_EQ(asked().back(), "close 2");
}

INSTANTIATE_TEST_SUITE_P(Of, EachCallOfTheSetUp,
                         testing::Values(Failing{"viGetAttribute", 0}, Failing{"viGetAttribute", 1},
                                         Failing{"viClear", 0}, Failing{"viGetAttribute", 2}, Failing{"viWrite", 0},
                                         Failing{"viRead", 0}, Failing{"viSetAttribute", 1},
                                         Failing{"viGetAttribute", 3}, Failing{"viGetAttribute", 4},
                                         Failing{"viEnableEvent", 0}, Failing{"viVPrintf", 0}),
                         [](const auto &each) {
                             return std::string(each.param.operation) + std::to_string(each.param.before);
                         });

TEST_F(Stress4882, Action0ClearsAndCounts)
{
    EXPECT_EQ(act(0), 0u);
    EXPECT_THAT(actionLines(), ElementsAre("Ready with 2 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action1DoesNothing)
{
    EXPECT_EQ(act(1), 0u);
    EXPECT_THAT(actionAsked(), IsEmpty());
    EXPECT_THAT(actionLines(), ElementsAre("Ready with 1 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action2SendsARequestInTwoPieces)
{
    serviceRequest();
    EXPECT_EQ(act(2, {Odd, {8000, 7995}}), 0u); // 5 more, modulo 8000: a width of 0
    EXPECT_THAT(actionAsked(),
                ElementsAre("set 3FFF0016=0", "printf *OPC \n", "set 3FFF0016=1", "viWaitOnEvent 3FFF200B 5000",
                            "viReadSTB", "close 2001", "write *ESR?", "read 4096"));
    EXPECT_THAT(actionLines(), ElementsAre("Ready with 1 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action2SendsARequestWithBlanksInOnePiece)
{
    serviceRequest();
    EXPECT_EQ(act(2, {Even, {8000, 495}}), 0u);
    const Texts calls = actionAsked();
    EXPECT_EQ(calls.front(), "printf *OPC" + std::string(500, ' ') + "\n");
    EXPECT_EQ(calls[1], "set 3FFF0016=1");
}

TEST_F(Stress4882, ABlankRunIsShortForOneManufacturer)
{
    standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4086, 2);
    serviceRequest();
    EXPECT_EQ(act(2, {Even, {300, 294}}), 0u); // the longest
    EXPECT_EQ(actionAsked().front(), "printf *OPC" + std::string(299, ' ') + "\n");
}

TEST_F(Stress4882, Action2ReadsTheStatusByteFourTimesAtMost)
{
    serviceRequest();
    for (int i = 0; i < 10; ++i)
        statusByte(96);
    EXPECT_EQ(act(2, {Even, AnyDraw}), 0u);
    EXPECT_EQ(standin::calls("viReadSTB").size(), 4u);
}

TEST_F(Stress4882, Action2FindsAMissingRequest)
{
    failure("viWaitOnEvent", VI_ERROR_TMO);
    EXPECT_EQ(act(2, {Even, AnyDraw}), 0u) << "a finding is no failure of VISA";
    EXPECT_EQ(actionAsked().back(), "viWaitOnEvent 3FFF200B 5000");
    EXPECT_THAT(actionLines(), ElementsAre("Error in waiting for SRQ", "Ready with 0 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action2ClosesTheEventOfACompletionCode)
{
    serviceRequest(2001, VI_SUCCESS_QUEUE_NEMPTY);
    EXPECT_EQ(act(2, {Even, AnyDraw}), 0u);
    EXPECT_EQ(actionAsked().back(), "close 2001");
    EXPECT_THAT(actionLines(), Contains("Error in waiting for SRQ"));
}

TEST_F(Stress4882, Action2ReadsNothingOnceMoreAndFindsThat)
{
    serviceRequest();
    friendly("viRead", 1);
    emptyAnswer();
    EXPECT_EQ(act(2, {Even, AnyDraw}), 0u);
    const Texts calls = actionAsked();
    EXPECT_THAT(Texts(calls.end() - 3, calls.end()), ElementsAre("write *ESR?", "read 4096", "read 0"));
    EXPECT_THAT(actionLines(), ElementsAre("Warning! ESR answer size is 0. Try again", "ESR answer size is still 0",
                                           "Ready with 0 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action3IdentifiesWithAServiceRequest)
{
    serviceRequest();
    statusByte(0);
    statusByte(16);
    EXPECT_EQ(act(3, {{3, 2}}), 0u);
    EXPECT_THAT(actionAsked(),
                ElementsAre("printf *SRE 48;*IDN?\n", "viWaitOnEvent 3FFF200B 5000", "close 2001", "scanf %*T",
                            "printf *SRE 32\n", "write *STB?\n", "viReadSTB", "viReadSTB", "read 4096"));
}

TEST_F(Stress4882, Action3AsksForTheStatusByteWithoutEnd)
{
    serviceRequest();
    statusByte(0);
    statusByte(16);
    EXPECT_EQ(act(3, {{3, 0}}), 0u);
    const Texts calls = actionAsked();
    EXPECT_THAT(Texts(calls.begin() + 5, calls.end()), ElementsAre("set 3FFF0016=0", "write *STB?\n", "set 3FFF0016=1",
                                                                   "viReadSTB", "viReadSTB", "read 4096"));
}

TEST_F(Stress4882, Action3AsksForTheStatusByteWithoutLineFeed)
{
    serviceRequest();
    statusByte(16);
    EXPECT_EQ(act(3, {{3, 1}}), 0u);
    const Texts calls = actionAsked();
    EXPECT_THAT(Texts(calls.begin() + 5, calls.end()), ElementsAre("write *STB?", "viReadSTB", "read 4096"));
}

TEST_F(Stress4882, Action3FindsAMissingRequest)
{
    failure("viWaitOnEvent", VI_ERROR_TMO);
    EXPECT_EQ(act(3), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("printf *SRE 48;*IDN?\n", "viWaitOnEvent 3FFF200B 5000"));
    EXPECT_THAT(actionLines(),
                ElementsAre("Error: No SRQ", "Error: VI_ERROR_TMO", "Ready with 0 Clear, 0 Trigger and 0 open"));
}

/// How often the message-available bit is missing.
struct Retries {
    int count;
    bool reported;
    unsigned reads; ///< of the status byte, behind the first one
};

void PrintTo(const Retries &retries, std::ostream *out)
{
    *out << retries.count;
}

class EachCountOfRetries : public Stress4882, public testing::WithParamInterface<Retries>
{
};

TEST_P(EachCountOfRetries, IsReportedFromTheFifthOn)
{
    serviceRequest();
    statusByte(0);
    for (int i = 0; i < GetParam().count; ++i)
        statusByte(4);
    statusByte(16);
    EXPECT_EQ(act(3, {{3, 2}}), 0u);
    EXPECT_EQ(standin::calls("viReadSTB").size(), 1 + GetParam().reads);
    EXPECT_EQ(actionAsked().back(), "read 4096") << "the answer is read in any case";
    if (GetParam().reported)
        EXPECT_THAT(actionLines(),
                    ElementsAre(GetParam().count > 5 ? "Invalid status value : 0x4 " : "Invalid status value : 0x10 ",
                                "Ready with 0 Clear, 0 Trigger and 0 open"));
    else
        EXPECT_THAT(actionLines(), ElementsAre("Ready with 1 Clear, 0 Trigger and 0 open"));
}

INSTANTIATE_TEST_SUITE_P(Of, EachCountOfRetries,
                         testing::Values(Retries{0, false, 1}, Retries{1, false, 2}, Retries{4, false, 5},
                                         Retries{5, true, 6}, Retries{6, true, 6}),
                         [](const auto &each) { return std::to_string(each.param.count); });

TEST_F(Stress4882, Action3TriesAnEmptyStatusAnswerAgain)
{
    serviceRequest();
    statusByte(0);
    statusByte(16);
    friendly("viRead", 1);
    emptyAnswer();
    EXPECT_EQ(act(3, {{3, 2}}), 0u);
    EXPECT_THAT(actionLines(),
                ElementsAre("Warning! STB answer size is 0. Try again!", "Ready with 1 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action3FindsAnEmptyStatusAnswer)
{
    serviceRequest();
    statusByte(0);
    statusByte(16);
    friendly("viRead", 1);
    emptyAnswer();
    emptyAnswer();
    EXPECT_EQ(act(3, {{3, 2}}), 0u);
    EXPECT_THAT(actionLines(),
                ElementsAre("Warning! STB answer size is 0. Try again!", "STB answer size is still zero!",
                            "Ready with 0 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action3ReadsTheEventRegisterWhenItIsSummarized)
{
    serviceRequest();
    statusByte(0);
    statusByte(16);
    standin::setReply("*STB?", std::string("32\0 16", 6));
    EXPECT_EQ(act(3, {{3, 2}}), 0u);
    const Texts calls = actionAsked();
    EXPECT_THAT(Texts(calls.end() - 3, calls.end()), ElementsAre("read 4096", "write *ESR?", "read 4096"));
}

TEST_F(Stress4882, Action3FindsAnEmptyEventRegister)
{
    serviceRequest();
    statusByte(0);
    statusByte(16);
    standin::setReply("*STB?", "112\n");
    friendly("viRead", 2);
    emptyAnswer();
    emptyAnswer();
    EXPECT_EQ(act(3, {{3, 2}}), 0u);
    EXPECT_EQ(actionAsked().back(), "read 4096") << "the second one too, unlike in action 2";
    EXPECT_THAT(actionLines(), ElementsAre("Warning! ESR answer size is 0. Try again", "ESR answer size is still zero!",
                                           "Ready with 0 Clear, 0 Trigger and 0 open"));
}

/// An action where there are no service requests.
struct Unasked {
    bool serial;
    unsigned number;
};

void PrintTo(const Unasked &unasked, std::ostream *out)
{
    *out << (unasked.serial ? "serial" : "socket") << unasked.number;
}

class WithoutServiceRequests : public Stress4882, public testing::WithParamInterface<Unasked>
{
protected:
    WithoutServiceRequests()
    {
        if (GetParam().serial)
            beSerial();
        else
            beRawSocket();
    }
};

TEST_P(WithoutServiceRequests, TheActionsThatNeedThemDoNothing)
{
    EXPECT_EQ(act(GetParam().number), 0u);
    EXPECT_THAT(actionAsked(), IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(Each, WithoutServiceRequests,
                         testing::Values(Unasked{true, 2}, Unasked{true, 4}, Unasked{true, 6}, Unasked{false, 2},
                                         Unasked{false, 4}, Unasked{false, 6}),
                         testing::PrintToStringParamName());

class StatusQueryWithoutServiceRequests : public Stress4882, public testing::WithParamInterface<unsigned>
{
};

TEST_P(StatusQueryWithoutServiceRequests, AlwaysEndsWithALineFeedAndPollsNothing)
{
    beRawSocket();
    EXPECT_EQ(act(3, {{3, GetParam()}}), 0u);
    if (GetParam() == 0)
        EXPECT_THAT(actionAsked(), ElementsAre("printf *SRE 48;*IDN?\n", "scanf %*T", "printf *SRE 32\n",
                                               "set 3FFF0016=0", "write *STB?\n", "set 3FFF0016=1", "read 4096"));
    else
        EXPECT_THAT(actionAsked(), ElementsAre("printf *SRE 48;*IDN?\n", "scanf %*T", "printf *SRE 32\n",
                                               "write *STB?\n", "read 4096"));
}

INSTANTIATE_TEST_SUITE_P(Each, StatusQueryWithoutServiceRequests, testing::Range(0u, 3u));

TEST_F(Stress4882, Action4GoesToRemoteOrToLocal)
{
    std::srand(1);
    const bool odd = std::rand() % 2 == 1;
    std::srand(1);
    EXPECT_EQ(act(4), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre(odd ? "viGpibControlREN 3" : "viGpibControlREN 6"));
}

TEST_F(Stress4882, Action4GoesTheOtherWayForTheOtherKindOfNumber)
{
    unsigned seed = 1;
    const auto first = [](unsigned s) {
        std::srand(s);
        return std::rand() % 2;
    };
    while (first(seed) == first(1))
        ++seed;
    std::srand(seed);
    EXPECT_EQ(act(4), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre(first(seed) == 1 ? "viGpibControlREN 3" : "viGpibControlREN 6"));
}

TEST_F(Stress4882, Action5OpensAgain)
{
    EXPECT_EQ(act(5), 0u);
    EXPECT_EQ(standin::calls("viOpen").size(), 1u);
    Texts calls = askedFrom("printf *CLS;*ESE 1;*SRE 32\n");
    EXPECT_THAT(calls, ElementsAre("printf *CLS;*ESE 1;*SRE 32\n", "close 2", "open TCPIP::localhost::hislip0 0 8000",
                                   "get 3FFF0171", "get BFFF0001", "set 3FFF001C=4", "viEnableEvent 3FFF200B 1",
                                   "write *CLS;*ESE 1;*SRE 32;*WAI\n", "viClear", "close 3"));
    EXPECT_THAT(actionLines(), ElementsAre("Ready with 1 Clear, 0 Trigger and 1 open"));
}

TEST_F(Stress4882, Action5SetsASerialLineUpWithAnotherFlowControlAndInSilence)
{
    beSerial();
    EXPECT_EQ(act(5), 0u);
    EXPECT_THAT(askedFrom("open TCPIP::localhost::hislip0 0 8000"),
                ElementsAre("open TCPIP::localhost::hislip0 0 8000", "get 3FFF0171", "set 3FFF0038=0",
                            "set 3FFF0021=115200", "set 3FFF0022=8", "set 3FFF0023=0", "set 3FFF0024=10",
                            "set 3FFF0025=6", "get BFFF0001", "set 3FFF001C=4", "write *CLS;*ESE 1;*SRE 32;*WAI\n",
                            "viClear", "close 3"));
    EXPECT_THAT(actionLines(), ElementsAre("Ready with 1 Clear, 0 Trigger and 1 open"));
}

TEST_F(Stress4882, AResourceThatDoesNotOpenAgainEndsIt)
{
    failure("viOpen", VI_ERROR_RSRC_BUSY);
    EXPECT_EQ(act(5), 1u);
    EXPECT_THAT(actionLines(), ElementsAre("Error: VI_ERROR_RSRC_BUSY", "Ready with 0 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action6LeavesAnAnswerUnread)
{
    EXPECT_EQ(act(6), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("write *IDN?"));
}

TEST_F(Stress4882, Actions7And8ToggleGpibAddressing)
{
    beGpib();
    draw({action(7), action(8), action(8), action(0)});
    friendly("viClear", 1);
    stopDuring("viClear");
    EXPECT_EQ(run(test4882), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("get 3FFF0184", "set 3FFF0184=0", "get 3FFF001B", "set 3FFF001B=1",
                                           "get 3FFF001B", "set 3FFF001B=0"));
}

TEST_F(Stress4882, Actions7And8AreGpibsAlone)
{
    draw({action(7), action(8), action(0)});
    friendly("viClear", 1);
    stopDuring("viClear");
    EXPECT_EQ(run(test4882), 0u);
    EXPECT_THAT(actionAsked(), IsEmpty());
}

TEST_F(Stress4882, Action9AsksForFourErrorsAtOnce)
{
    standin::setReply(":system:error?;error?;err?;error?", "-410,\"Query INTERRUPTED\";0,\"No error\"\n");
    EXPECT_EQ(act(9), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("write :system:error?;error?;err?;error?\n", "read 4096"));
    EXPECT_THAT(actionLines(), ElementsAre("Ready with 1 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action9FindsAnAnswerWithoutANumber)
{
    standin::setReply(":system:error?;error?;err?;error?", "Maker,Model\n");
    EXPECT_EQ(act(9), 0u);
    EXPECT_THAT(actionLines(),
                ElementsAre("Query: SYST:ERR? returns zero string", "Ready with 0 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, Action9TakesAnEmptyAnswerForReadable)
{
    friendly("viRead", 1);
    emptyAnswer();
    EXPECT_EQ(act(9), 0u);
    EXPECT_THAT(actionLines(), ElementsAre("Ready with 1 Clear, 0 Trigger and 0 open"));
}

class EachSplitQuery : public Stress4882, public testing::WithParamInterface<unsigned>
{
};

TEST_P(EachSplitQuery, ComesInTwoPieces)
{
    standin::script("viVScanf", {.bytes = "0,\"No error\""});
    EXPECT_EQ(act(GetParam(), {Odd, {8000, 2}}), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("set 3FFF0016=0", "printf :syst:err?", "set 3FFF0016=1",
                                           "printf ;       err?;\t :syst:err?\n", "scanf %d,%c%*T"));
}

TEST_P(EachSplitQuery, IsPolledInTheMiddle)
{
    standin::script("viVScanf", {.bytes = "0,\"No error\""});
    EXPECT_EQ(act(GetParam(), {Even, {8000, 7995}}), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("set 3FFF0016=0", "printf :syst:err?", "set 3FFF0016=1", "viReadSTB",
                                           "printf ; err?;\t :syst:err?\n", "scanf %d,%c%*T"));
}

INSTANTIATE_TEST_SUITE_P(OfBoth, EachSplitQuery, testing::Values(10u, 11u));

TEST_F(Stress4882, ARawSocketIsNotPolledInTheMiddleAndDrawsNothingForIt)
{
    beRawSocket();
    standin::script("viVScanf", {.bytes = "0,\"No error\""});
    EXPECT_EQ(act(10, {{8000, 2}}), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("set 3FFF0016=0", "printf :syst:err?", "set 3FFF0016=1",
                                           "printf ;       err?;\t :syst:err?\n", "scanf %d,%c%*T"));
}

/// What the split error query answers, and the error in the line when that is a finding.
struct Error {
    const char *answer;
    const char *line = nullptr;
};

void PrintTo(const Error &error, std::ostream *out)
{
    *out << error.answer;
}

class EachError : public Stress4882, public testing::WithParamInterface<Error>
{
};

TEST_P(EachError, IsAcceptedOrFound)
{
    standin::script("viVScanf", {.bytes = GetParam().answer});
    EXPECT_EQ(act(10, {Odd, AnyDraw}), 0u);
    if (GetParam().line)
        EXPECT_THAT(actionLines(), ElementsAre(GetParam().line, "Ready with 0 Clear, 0 Trigger and 0 open"));
    else
        EXPECT_THAT(actionLines(), ElementsAre("Ready with 1 Clear, 0 Trigger and 0 open"));
}

INSTANTIATE_TEST_SUITE_P(
    Of, EachError,
    testing::Values(Error{"0,\"No error\""}, Error{"-410,\"Query INTERRUPTED\""}, Error{"-350,\"Queue overflow\""},
                    Error{"-113,\"Undefined header\"", "syst:err? returns unexpected error code: -113 or wrong format"},
                    Error{"+5,\"Own\"", "syst:err? returns unexpected error code: 5 or wrong format"},
                    Error{"0,No error", "syst:err? returns unexpected error code: 0 or wrong format"},
                    Error{"Maker,Model", "syst:err? returns unexpected error code: 0 or wrong format"},
                    Error{"", "syst:err? returns unexpected error code: 0 or wrong format"}));

TEST_F(Stress4882, AFailureInAnActionEndsItWithTheCounts)
{
    draw({action(0), action(9)});
    friendly("viWrite", 1);
    failure("viWrite", VI_ERROR_CONN_LOST);
    EXPECT_EQ(run(test4882), 1u);
    EXPECT_THAT(actionLines(), ElementsAre("Error: VI_ERROR_CONN_LOST", "Ready with 1 Clear, 0 Trigger and 0 open"));
    EXPECT_EQ(asked().back(), "close 2");
}

TEST_F(Stress4882, ACloseThatFailsAfterAFailureIsNotTold)
{
    failure("viClear", VI_ERROR_CONN_LOST);
    failure("viClose", VI_ERROR_CLOSING_FAILED);
    EXPECT_EQ(run(test4882), 1u);
    EXPECT_THAT(lines(), ElementsAre("Error: VI_ERROR_CONN_LOST", "Ready with 0 Clear, 0 Trigger and 0 open"));
}

TEST_F(Stress4882, ACloseThatFailsAtTheEndGoesToTheThread)
{
    m_stop = true;
    failure("viClose", VI_ERROR_CLOSING_FAILED);
    EXPECT_THROW(run(test4882), VisaError);
    EXPECT_EQ(lines().back(), "Press 'Stop Test' to finish test!");
}

} // namespace
