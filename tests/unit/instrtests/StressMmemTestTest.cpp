#include "InstrumentTestFixture.h"

#include "instrtests/StressMmemTest.h"

#include <QElapsedTimer>

#include <algorithm>
#include <chrono>

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::MatchesRegex;
using testing::Not;

namespace
{

constexpr Draw Odd{2, 1};
constexpr Draw Even{2, 0};
constexpr Draw BlockOfOneByte{10, 0};
const char *const Aborted = "Test aborted. No data transferred.";

constexpr Draw action(unsigned number)
{
    return {10, number};
}

class StressMmem : public InstrumentTest
{
protected:
    StressMmem()
    {
        standin::setReply("*IDN?", "Maker,Model,1,2.0\n");
        standin::setReply("*OPC?", "1\n");
        standin::setReply(":mmem:msis?", "C:\n");
        standin::setReply(":mmem:cdir?", "\"C:\\\"\n");
        standin::setReply("system:error?", "0,\"No error\"\n");
        standin::setReply("*STB?", "0\n");
    }

    /// Runs what is drawn and then, as the last action, a device clear during which the test is stopped.
    /// @param clears so many of them in all, with the one of the set-up and the last one
    unsigned act(std::vector<Draw> draws, int clears = 2)
    {
        draws.push_back(action(0));
        draw(draws);
        friendly("viClear", clears - 1);
        stopDuring("viClear");
        return run(stressMmemTest);
    }

    /// A block of the one byte is written (with its line feed where that is drawn), then read back, without a look into the error
    /// queue or at the status byte.
    std::vector<Draw> blockOf(unsigned char byte) const
    {
        std::vector<Draw> draws = {action(6), Odd, BlockOfOneByte, {100, byte}};
        if (m_serviceRequests)
            draws.push_back(Odd); // with a line feed
        draws.push_back(action(8));
        if (m_serviceRequests)
            draws.insert(draws.end(), {Even, Even});
        return draws;
    }

    void withoutServiceRequests() { m_serviceRequests = false; }

    static void readsBack(const std::string &answer) { standin::setReply(":MMEM:DATA? 'Test.dat'", answer); }

    /// What was asked behind the set-up, but for the last clear and the close.
    static Texts actionAsked()
    {
        Texts texts = askedFrom("set 3FFF001A=30000");
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
        texts.erase(texts.begin(), std::find(texts.begin(), texts.end(), "0,\"No error\"\\n") + 1);
        return texts;
    }

private:
    bool m_serviceRequests = true;
};

TEST_F(StressMmem, SetsUpInThisOrder)
{
    m_stop = true;
    EXPECT_EQ(run(stressMmemTest), 0u);
    EXPECT_THAT(asked(),
                ElementsAre("get 3FFF0171", "get BFFF0001", "set 3FFF001C=4", "viClear", "write *CLS;*ESE 0;*SRE 0\n",
                            "write *IDN?\n", "read 4096", "write *OPC?\n", "read 4096", "viEnableEvent 3FFF200B 1",
                            "write :mmem:msis?\n", "read 4096", "write :mmem:cdir?\n", "read 4096",
                            "write system:error?\n", "read 4096", "set 3FFF001A=30000", "close 2"));
    EXPECT_THAT(lines(),
                ElementsAre("StressMmemTest of Device: Maker,Model,1,2.0\\n", "Press 'Stop Test' to finish test!",
                            "MSIS =C:\\n", "OTH:CDIR= \"C:\\\"\\n", "0,\"No error\"\\n", Aborted));
}

TEST_F(StressMmem, SetsUpASerialLine)
{
    beSerial();
    m_stop = true;
    EXPECT_EQ(run(stressMmemTest), 0u);
    const Texts calls = asked();
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 9),
                ElementsAre("get 3FFF0171", "set 3FFF0038=0", "set 3FFF0021=115200", "set 3FFF0022=8", "set 3FFF0023=0",
                            "set 3FFF0024=10", "set 3FFF0025=2", "get BFFF0001", "set 3FFF001C=4"));
    EXPECT_THAT(calls, Not(Contains(HasSubstr("viEnableEvent"))));
    EXPECT_EQ(lines().front(), "Force ASRL settings to 115200,8,N,1,RTS/CTS. Max data size = 15 kB!");
}

TEST_F(StressMmem, SetsUpARawSocket)
{
    beRawSocket();
    m_stop = true;
    EXPECT_EQ(run(stressMmemTest), 0u);
    const Texts calls = asked();
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 4),
                ElementsAre("get 3FFF0171", "get BFFF0001", "set 3FFF0038=1", "set 3FFF001C=4"));
    EXPECT_THAT(calls, Not(Contains(HasSubstr("viEnableEvent"))));
}

TEST_F(StressMmem, SetsUpGpib)
{
    beGpib();
    m_stop = true;
    EXPECT_EQ(run(stressMmemTest), 0u);
    const Texts calls = askedFrom("write *OPC?\n");
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 4),
                ElementsAre("write *OPC?\n", "read 4096", "set 3FFF0184=1", "viEnableEvent 3FFF200B 1"));
}

TEST_F(StressMmem, ALongAnswerToOpcIsAFailureAndTheTestGoesOn)
{
    standin::setReply("*OPC?", "+1\n");
    m_stop = true;
    EXPECT_EQ(run(stressMmemTest), 1u);
    EXPECT_EQ(lines().at(1), "Invalid response for *OPC?: +1\\n");
    EXPECT_EQ(lines().back(), Aborted);
}

TEST_F(StressMmem, LeavesDriveD)
{
    standin::setReply(":mmem:msis?", "\"D:\"\n");
    m_stop = true;
    EXPECT_EQ(run(stressMmemTest), 0u);
    EXPECT_THAT(asked(), Contains("write :mmem:msis 'C:'")); // without a line feed
    EXPECT_THAT(lines(), Contains("MSIS set to C:"));
}

class EachModel : public StressMmem, public testing::WithParamInterface<const char *>
{
};

TEST_P(EachModel, OfTheTwoIsAskedInItsOwnWay)
{
    standin::setReply("*IDN?", GetParam());
    standin::setReply(":mmem:dir?", "0,100,\"Test.dat,BIN,5\"\n");
    m_stop = true;
    EXPECT_EQ(run(stressMmemTest), 0u);
    EXPECT_THAT(asked(), Contains("write :mmem:dir?\n"));
    EXPECT_THAT(asked(), Not(Contains("write :mmem:cdir?\n")));
    EXPECT_THAT(lines(), Contains("ZAW:DIR = 0,100,\"Test.dat,BIN,5\"\\n"));
}

INSTANTIATE_TEST_SUITE_P(Of, EachModel, testing::Values("Maker,ZAW 5,1,2\n", "Maker,MZEB,1,2\n"));

TEST_F(StressMmem, OtherModelsAreToldByCaseAndComma)
{
    standin::setReply("*IDN?", "ZAW,zeb,1,2\n");
    m_stop = true;
    run(stressMmemTest);
    EXPECT_THAT(asked(), Contains("write :mmem:cdir?\n"));
}

TEST_F(StressMmem, AnswersAreCutInTheirLines)
{
    standin::setReply("*IDN?", std::string(100, 'i'));
    standin::setReply(":mmem:msis?", std::string(100, 'm'));
    standin::setReply("system:error?", std::string(100, 'e'));
    m_stop = true;
    run(stressMmemTest);
    EXPECT_THAT(lines(), Contains("StressMmemTest of Device: " + std::string(50, 'i')));
    EXPECT_THAT(lines(), Contains("MSIS =" + std::string(30, 'm')));
    EXPECT_THAT(lines(), Contains(std::string(30, 'e')));
}

/// A call of the set-up that fails.
struct FailingCall {
    const char *operation;
    int before; ///< calls of it that succeed
};

void PrintTo(const FailingCall &failing, std::ostream *out)
{
    *out << failing.operation << " after " << failing.before;
}

class EachCallOfTheMmemSetUp : public StressMmem, public testing::WithParamInterface<FailingCall>
{
};

TEST_P(EachCallOfTheMmemSetUp, ThatFailsEndsIt)
{
    friendly(GetParam().operation, GetParam().before);
    failure(GetParam().operation, VI_ERROR_TMO);
    EXPECT_EQ(run(stressMmemTest), 1u);
    const Texts all = lines();
    EXPECT_THAT(Texts(all.end() - 2, all.end()), ElementsAre("Error: VI_ERROR_TMO", Aborted));
    EXPECT_EQ(asked().back(), "close 2");
}

// The protocol too, unlike in the other tests.
INSTANTIATE_TEST_SUITE_P(Of, EachCallOfTheMmemSetUp,
                         testing::Values(FailingCall{"viGetAttribute", 0}, FailingCall{"viGetAttribute", 1},
                                         FailingCall{"viSetAttribute", 0}, FailingCall{"viClear", 0},
                                         FailingCall{"viWrite", 0}, FailingCall{"viRead", 0}, FailingCall{"viRead", 1},
                                         FailingCall{"viEnableEvent", 0}, FailingCall{"viRead", 4},
                                         FailingCall{"viSetAttribute", 1}),
                         [](const auto &each) {
                             return std::string(each.param.operation) + std::to_string(each.param.before);
                         });

TEST_F(StressMmem, GpibActionsAreGpibsAlone)
{
    EXPECT_EQ(act({action(1), action(4), action(5)}), 0u);
    EXPECT_THAT(actionAsked(), IsEmpty());
}

TEST_F(StressMmem, TriggersAndTogglesOnGpib)
{
    beGpib();
    EXPECT_EQ(act({action(1), action(4), action(5)}), 0u);
    EXPECT_THAT(actionAsked(),
                ElementsAre("viAssertTrigger 0", "get 3FFF0184", "set 3FFF0184=0", "get 3FFF001B", "set 3FFF001B=0"));
}

TEST_F(StressMmem, SendsOpcAndReadsTheStatusByteByQuery)
{
    EXPECT_EQ(act({action(2), action(3)}), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("write *OPC\n", "write *STB?\n", "read 4096"));
    EXPECT_THAT(actionLines(), ElementsAre(Aborted));
}

TEST_F(StressMmem, AnEmptyStatusAnswerIsTriedAgainAndNoFailure)
{
    friendly("viRead", 5);
    emptyAnswer();
    emptyAnswer();
    EXPECT_EQ(act({action(3)}), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("write *STB?\n", "read 4096", "read 4096"));
    EXPECT_THAT(actionLines(),
                ElementsAre("Warning! STB answer size is 0. Try again!", "STB answer size is still zero!", Aborted));
}

TEST_F(StressMmem, ReadsNothingBackBeforeABlockWasWritten)
{
    EXPECT_EQ(act({action(8), action(9)}), 0u);
    EXPECT_THAT(actionAsked(), IsEmpty());
    EXPECT_THAT(actionLines(), ElementsAre(Aborted));
}

TEST_F(StressMmem, WritesABlockAndReadsItBack)
{
    readsBack("#11A\n");
    EXPECT_EQ(act(blockOf('A')), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("write :MMEM:DATA 'Test.dat',#11A\n", "write :MMEM:DATA? 'Test.dat'\n",
                                           "read 2", "read 1", "read 31461376"));
    EXPECT_THAT(actionLines(), ElementsAre(MatchesRegex("Ready with 1 Clear and 0 Trigger\\. Average read [0-9.]+ "
                                                        "MBits/s\\. Average write [0-9.]+ MBits/s")));
}

TEST_F(StressMmem, LeavesTheLineFeedOutAtRandom)
{
    readsBack("#11A\n");
    EXPECT_EQ(act({action(7), Odd, BlockOfOneByte, {100, 'A'}, Even, action(9), Even, Even}), 0u);
    EXPECT_EQ(actionAsked().front(), "write :MMEM:DATA 'Test.dat',#11A");
}

TEST_F(StressMmem, AnAnswerWithoutALineFeedIsRightToo)
{
    readsBack("#11A");
    EXPECT_EQ(act(blockOf('A')), 0u);
    EXPECT_THAT(actionLines(), ElementsAre(HasSubstr("Average read")));
}

TEST_F(StressMmem, TakesNoByteOfTheDataForALineEnd)
{
    readsBack("#11\n\r\n");
    EXPECT_EQ(act(blockOf('\n')), 0u);
    EXPECT_THAT(actionLines(), ElementsAre(HasSubstr("Average read")));
}

TEST_F(StressMmem, OnARawSocketTheTerminationCharacterIsOffForTheData)
{
    beRawSocket();
    withoutServiceRequests();
    readsBack("#11\n\n");
    EXPECT_EQ(act(blockOf('\n')), 0u);
    EXPECT_THAT(actionAsked(),
                ElementsAre("write :MMEM:DATA 'Test.dat',#11\n\n", "write :MMEM:DATA? 'Test.dat'\n", "read 2", "read 1",
                            "set 3FFF0038=0", "read 1", "set 3FFF0038=1", "read 4096"));
    EXPECT_THAT(actionLines(), ElementsAre(HasSubstr("Average read")));
}

TEST_F(StressMmem, OnASerialLineTheEndModeIsOffForTheData)
{
    beSerial();
    withoutServiceRequests();
    readsBack("#11\n\n");
    EXPECT_EQ(act(blockOf('\n')), 0u);
    EXPECT_THAT(actionAsked(),
                ElementsAre("write :MMEM:DATA 'Test.dat',#11\n\n", "write :MMEM:DATA? 'Test.dat'\n", "read 2", "read 1",
                            "set 3FFF00B3=0", "read 1", "set 3FFF00B3=2", "read 4096"));
}

TEST_F(StressMmem, DoesNotReadBackABlockThatAClearMayHaveDiscarded)
{
    EXPECT_EQ(act({action(6), Odd, BlockOfOneByte, AnyDraw, AnyDraw, action(0), action(8)}, 3), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre(HasSubstr("write :MMEM:DATA 'Test.dat',#11"), "viClear"));
    EXPECT_THAT(actionLines(), ElementsAre(Aborted));
}

TEST_F(StressMmem, ReadsABlockBackAfterAClearWhenAnAnswerHasShownThatItWasTaken)
{
    readsBack("#11\xFF\n"); // never what was written
    draw({action(6), Odd, BlockOfOneByte, AnyDraw, AnyDraw, action(3), action(0), action(8), Even, Even});
    EXPECT_EQ(run(stressMmemTest), 1u);
    EXPECT_THAT(asked(), Contains("write :MMEM:DATA? 'Test.dat'\n"));
    EXPECT_EQ(standin::calls("viClear").size(), 2u);
}

TEST_F(StressMmem, OnARawSocketAClearDiscardsNoBlock)
{
    beRawSocket();
    readsBack("#11\xFF\n");
    draw({action(6), Odd, BlockOfOneByte, AnyDraw, action(0), action(8)});
    EXPECT_EQ(run(stressMmemTest), 1u);
    EXPECT_THAT(asked(), Contains("write :MMEM:DATA? 'Test.dat'\n"));
    EXPECT_EQ(standin::calls("viClear").size(), 2u);
}

TEST_F(StressMmem, OnASerialLineAClearWaitsUntilTheBlockHasLeft)
{
    beSerial();
    std::vector<Draw> draws = {action(6), Even, {15, 0}, {1023, 0}};
    draws.insert(draws.end(), 1024, AnyDraw); // the data
    draws.push_back(action(0));
    draw(draws);
    friendly("viWrite", 6);
    QElapsedTimer timer;
    standin::script("viWrite", {.then = [&timer] { timer.start(); }});
    qint64 waited = 0;
    friendly("viClear", 1);
    standin::script("viClear", {.then = [&] {
                        waited = timer.elapsed();
                        m_stop = true;
                    }});
    EXPECT_EQ(run(stressMmemTest), 0u);
    // 1024 bytes at 11520 a second.
    EXPECT_GE(waited, 89);
}

TEST_F(StressMmem, OnARawSocketTheDataIsReadUntilComplete)
{
    beRawSocket();
    draw({action(6), Odd, {10, 1}, {100, 'A'}, {100, '\n'}, action(8)}, 29583474);
    friendly("viRead", 5);
    for (const char *piece : {"#1", "2", "A", "\n"})
        answer(piece);
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "\n", .then = [this] { m_stop = true; }});
    EXPECT_EQ(run(stressMmemTest), 0u);
    EXPECT_THAT(actionLines(), ElementsAre(HasSubstr("Average read")));
    EXPECT_THAT(askedFrom("set 3FFF0038=0"),
                ElementsAre("set 3FFF0038=0", "read 2", "read 1", "set 3FFF0038=1", "read 4096", "close 2"));
}

TEST_F(StressMmem, OnARawSocketAnAnswerThatBreaksOffIsTooShort)
{
    beRawSocket();
    withoutServiceRequests();
    friendly("viRead", 5);
    answer("#1");
    answer("1");
    emptyAnswer();
    EXPECT_EQ(act(blockOf('A')), 1u);
    EXPECT_EQ(actionLines().front(), "Number of chars don't match: expected: 1 received:  0");
}

/// What an instrument answers instead of "#11A\n", and the line that tells it.
struct Wrong {
    const char *name;
    std::string answer;
    std::string line;
};

void PrintTo(const Wrong &wrong, std::ostream *out)
{
    *out << wrong.name;
}

class EachWrongAnswer : public StressMmem, public testing::WithParamInterface<Wrong>
{
};

TEST_P(EachWrongAnswer, EndsItAsFailed)
{
    readsBack(GetParam().answer);
    EXPECT_EQ(act(blockOf('A')), 1u);
    EXPECT_EQ(actionLines().front(), GetParam().line);
    EXPECT_EQ(actionLines().size(), 2u);
    EXPECT_EQ(standin::pending("viClear"), 1u) << "the clear that would have stopped it was never reached";
}

INSTANTIATE_TEST_SUITE_P(
    Of, EachWrongAnswer,
    testing::Values(Wrong{"OneByte", "#", "Size of the answer is to short!"},
                    Wrong{"NoBlock", "A1A\n", "Answer doesn't begin with #"},
                    Wrong{"AnotherLength", "#12AB\n", "Number of chars don't match: sent:  1 received:  2 "},
                    Wrong{"NoNumber", "#1xA\n", "Number of chars don't match: sent:  1 received:  -1 "},
                    Wrong{"HalfANumber", "#21xA\n", "Number of chars don't match: sent:  1 received:  -1 "},
                    Wrong{"Negative", "#2-1A\n", "Number of chars don't match: sent:  1 received:  -1 "},
                    Wrong{"LengthBreaksOff", "#31", "Number of chars don't match: sent:  1 received:  -1 "},
                    Wrong{"NoDigit", "#xA\n", "Number of chars don't match: sent:  1 received:  -1 "},
                    Wrong{"Indefinite", "#0A\n", "Number of chars don't match: sent:  1 received:  -1 "},
                    Wrong{"TooMuch", "#11AB\n", "Number of chars don't match: expected: 1 received:  2"},
                    Wrong{"TwoLineFeeds", "#11A\n\n", "Number of chars don't match: expected: 1 received:  2"},
                    Wrong{"AnotherByte", "#11a\n", "Binary data not equal at index: 0A != a"}),
    [](const auto &each) { return std::string(each.param.name); });

TEST_F(StressMmem, NoDataAtAllIsTooShort)
{
    friendly("viRead", 5);
    answer("#1");
    answer("1");
    emptyAnswer();
    EXPECT_EQ(act(blockOf('A')), 1u);
    EXPECT_EQ(actionLines().front(), "Number of chars don't match: expected: 1 received:  0");
}

TEST_F(StressMmem, OnARawSocketBytesBehindTheDataCount)
{
    beRawSocket();
    withoutServiceRequests();
    readsBack("#11AB\n");
    EXPECT_EQ(act(blockOf('A')), 1u);
    EXPECT_EQ(actionLines().front(), "Number of chars don't match: expected: 1 received:  2");
}

TEST_F(StressMmem, WaitsForTheAnswerAtRandom)
{
    readsBack("#11A\n");
    statusByte(4);
    statusByte(20);
    EXPECT_EQ(act({action(6), Odd, BlockOfOneByte, {100, 'A'}, Odd, action(8), Even, Odd}), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("write :MMEM:DATA 'Test.dat',#11A\n", "write :MMEM:DATA? 'Test.dat'\n",
                                           "viReadSTB", "viReadSTB", "read 2", "read 1", "read 31461376"));
}

TEST_F(StressMmem, StopsWaitingAfterTwentySecondsAndReadsAllTheSame)
{
    readsBack("#11A\n");
    EXPECT_EQ(act({action(6), Odd, BlockOfOneByte, {100, 'A'}, Odd, action(8), Even, Odd}), 0u);
    EXPECT_THAT(actionLines(), ElementsAre("20 seconds no answer! Continue..", HasSubstr("Average read")));
}

TEST_F(StressMmem, AStopEndsTheWaiting)
{
    readsBack("#11A\n");
    standin::script("viReadSTB", {});
    stopDuring("viReadSTB");
    draw({action(6), Odd, BlockOfOneByte, {100, 'A'}, Odd, action(8), Even, Odd});
    EXPECT_EQ(run(stressMmemTest), 0u);
    EXPECT_EQ(standin::calls("viReadSTB").size(), 2u);
    EXPECT_THAT(actionLines(), ElementsAre(HasSubstr("Average read"))) << "what was asked for is read";
}

TEST_F(StressMmem, DrainsTheErrorQueueAtRandom)
{
    readsBack("#11A\n");
    friendly("viRead", 5);
    answer("-410,\"Query INTERRUPTED\"\n");
    answer("-254,\"Media full\"\n");
    answer("0,\"No error\"\n");
    EXPECT_EQ(act({action(6), Odd, BlockOfOneByte, {100, 'A'}, Odd, action(8), Odd, Even}), 0u);
    EXPECT_THAT(actionAsked(), ElementsAre("write :MMEM:DATA 'Test.dat',#11A\n", "write syst:err?\n", "read 4096",
                                           "write syst:err?\n", "read 4096", "write syst:err?\n", "read 4096",
                                           "write :MMEM:DATA? 'Test.dat'\n", "read 2", "read 1", "read 31461376"));
    EXPECT_THAT(actionLines(),
                ElementsAre("Query: SYST:ERR? returns: -254,\"Media full\"\\n", HasSubstr("Average read")));
}

TEST_F(StressMmem, AnErrorWithoutANumberEndsTheDraining)
{
    readsBack("#11A\n");
    standin::setReply("syst:err?", "no number\n");
    EXPECT_EQ(act({action(6), Odd, BlockOfOneByte, {100, 'A'}, Odd, action(8), Odd, Even}), 0u);
    EXPECT_THAT(actionLines(), ElementsAre("Query: SYST:ERR? cannot parse no number\\n", HasSubstr("Average read")));
}

TEST_F(StressMmem, AnErrorQueueThatNeverEndsIsDrainedUntilTheStop)
{
    readsBack("#11A\n");
    standin::setReply("syst:err?", "-113,\"Undefined header\"\n");
    draw({action(6), Odd, BlockOfOneByte, {100, 'A'}, Odd, action(8), Odd, Even});
    friendly("viWrite", 50);
    stopDuring("viWrite");
    EXPECT_EQ(run(stressMmemTest), 0u);
    EXPECT_THAT(actionLines(), Contains("Query: SYST:ERR? returns: -113,\"Undefined header\"\\n").Times(44));
}

/// Lengths of large blocks on a serial line: what is drawn and what comes of it.
struct Length {
    Draw units;
    Draw less;
    std::size_t bytes;
};

void PrintTo(const Length &length, std::ostream *out)
{
    *out << length.bytes;
}

class EachLength : public StressMmem, public testing::WithParamInterface<Length>
{
};

TEST_P(EachLength, OfALargeBlockOnASerialLine)
{
    beSerial();
    draw({action(6), Even, GetParam().units, GetParam().less});
    friendly("viWrite", 6);
    stopDuring("viWrite");
    EXPECT_EQ(run(stressMmemTest), 0u);
    const std::string header = ":MMEM:DATA 'Test.dat',#" + std::to_string(std::to_string(GetParam().bytes).size()) +
                               std::to_string(GetParam().bytes);
    const std::string command = standin::calls("viWrite").back().texts.at(0);
    EXPECT_EQ(command.substr(0, header.size()), header);
    EXPECT_EQ(command.size(), header.size() + GetParam().bytes + 1);
    EXPECT_EQ(command.back(), '\n');
    EXPECT_TRUE(std::all_of(command.begin() + static_cast<std::ptrdiff_t>(header.size()), command.end() - 1,
                            [](char c) { return c >= 0 && c <= 99; }));
}

INSTANTIATE_TEST_SUITE_P(Of, EachLength,
                         testing::Values(Length{{15, 0}, {1023, 1022}, 2}, Length{{15, 0}, {1023, 0}, 1024},
                                         Length{{15, 14}, {1023, 0}, 15360}));

TEST_F(StressMmem, UsualBlocksHaveUpTo30720Units)
{
    draw({action(6), Even, {30720, 1500}, {7, 0}});
    friendly("viWrite", 6);
    stopDuring("viWrite");
    EXPECT_EQ(run(stressMmemTest), 0u);
    const std::size_t size = standin::calls("viWrite").back().numbers.at(0);
    EXPECT_GE(size, 1501u * 1024 - 1022);
    EXPECT_LE(size, 1501u * 1024 + 40);
}

TEST_F(StressMmem, AFailureEndsItWithAnErrorAndItsFigures)
{
    readsBack("#11A\n");
    draw([this] {
        auto draws = blockOf('A');
        draws.push_back(action(2));
        return draws;
    }());
    friendly("viWrite", 8);
    failure("viWrite", VI_ERROR_CONN_LOST);
    EXPECT_EQ(run(stressMmemTest), 1u);
    EXPECT_THAT(actionLines(), ElementsAre("Error: VI_ERROR_CONN_LOST", HasSubstr("Average read")));
    EXPECT_EQ(asked().back(), "close 2");
}

TEST_F(StressMmem, ACloseThatFailsAtTheEndIsAFailure)
{
    m_stop = true;
    failure("viClose", VI_ERROR_CLOSING_FAILED);
    EXPECT_EQ(run(stressMmemTest), 1u);
    EXPECT_THAT(actionLines(), ElementsAre("Error: VI_ERROR_CLOSING_FAILED", Aborted));
}

TEST_F(StressMmem, TheAveragesAreMillionsOfBitsOfDataASecond)
{
    readsBack("#11A\n");
    friendly("viWrite", 6);
    standin::script("viWrite", {.delay = std::chrono::milliseconds(100)});
    friendly("viRead", 7);
    standin::script("viRead", {.delay = std::chrono::milliseconds(200)});
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(act(blockOf('A')), 0u);
    const std::chrono::duration<double> whole = std::chrono::steady_clock::now() - begin;
    double read = 0;
    double write = 0;
    ASSERT_EQ(std::sscanf(actionLines().back().c_str(),
                          "Ready with 1 Clear and 0 Trigger. Average read %lf MBits/s. Average write %lf MBits/s",
                          &read, &write),
              2);
    // One byte: 8 bits in a tenth and a fifth of a second at least, and in no longer than all of it took. The lines have six digits.
    const double slowest = 8e-6 / whole.count() - 1e-6;
    EXPECT_GE(write, slowest);
    EXPECT_LE(write, 81e-6);
    EXPECT_GE(read, slowest);
    EXPECT_LE(read, 41e-6);
}

TEST_F(StressMmem, AWriteAloneIsNoTransfer)
{
    EXPECT_EQ(act({action(6), Odd, BlockOfOneByte, AnyDraw, Odd}), 0u);
    EXPECT_THAT(actionLines(), ElementsAre(Aborted));
}

} // namespace
