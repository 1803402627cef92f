#include "InstrumentTestFixture.h"

#include "instrtests/visatestfunctions.h"

#include "instrtests/PerformanceTest.h"

#include <regex>

using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::Not;

namespace
{

class PerformanceTest : public InstrumentTest
{
protected:
    PerformanceTest()
    {
        standin::setReply("*CLS;*IDN?", "Maker,Model 5,1,2.0\n");
        standin::setReply("*IDN?", "Maker,Model 5,1,2.0\n");
        standin::setReply("*OPC?", "1\n");
        standin::setReply("*ESE 1;*SRE 32;*OPC?", "1\n");
        standin::setReply("*ESE 0;*SRE 0;*OPC?", "1\n");
        standin::setReply("*ESR?", "1\n");
        standin::setReply(":MMEM:DATA? 'Test.dat'", "#13ABC\n");
    }

    void serviceRequests(int count)
    {
        for (int i = 0; i < count; ++i)
            serviceRequest(2001 + static_cast<ViEvent>(i));
    }
    static void massMemory() { standin::script("viVScanf", {.bytes = "0,\"No error\""}); }

    /// The lines with their figures replaced.
    Texts shapes() const
    {
        Texts texts = lines();
        for (std::string &text : texts) {
            text = std::regex_replace(text, std::regex("^Ready with [0-9]+ "), "Ready with N ");
            text =
                std::regex_replace(text, std::regex("^Duration [0-9]+ µs\\. [0-9]+\\.[0-9]{6} "), "Duration N µs. X ");
        }
        return texts;
    }
};

const std::vector<std::string> UsualLines = {
    "Performance Test of Device: Maker,Model 5,1,2.0\\n",
    "Test 10 times viReadSTB",
    "Ready with N us per call",
    "Test 10 times *IDN?",
    "Ready with N us per call",
    "Test 10 times *OPC?",
    "Ready with N µs per call",
    "Test SRQs",
    "Ready with N µs",
    "Ready with N µs",
    "Ready with N µs",
    "Ready with N µs",
    "Ready with N µs",
    "Test write 3000000 Bytes",
    "Duration N µs. X Mb/s",
    "Duration N µs. X Mb/s",
    "Duration N µs. X Mb/s",
    "Duration N µs. X Mb/s",
    "Duration N µs. X Mb/s",
    "Test read 3000000 Bytes",
    "Duration N µs. X Mb/s",
    "Duration N µs. X Mb/s",
    "Duration N µs. X Mb/s",
    "Duration N µs. X Mb/s",
    "Duration N µs. X Mb/s",
    "Test finished without Errors",
};

TEST(TestCatalogue, HoldsThreeTestsInThisOrder)
{
    const _visatest *tests = nullptr;
    unsigned count = 0;
    getListOfTests(&tests, &count);
    ASSERT_EQ(count, 3u);
    EXPECT_STREQ(tests[0].name, "Performance Test");
    EXPECT_STREQ(tests[1].name, "Stress 4882 Test "); // with the blank
    EXPECT_STREQ(tests[2].name, "Stress Mmem Test");
    EXPECT_EQ(tests[0].function, performanceTest);
}

TEST_F(PerformanceTest, MeasuresEverythingAndFinishes)
{
    serviceRequests(5);
    massMemory();
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_THAT(shapes(), ElementsAreArray(UsualLines));
}

TEST_F(PerformanceTest, AsksInThisOrder)
{
    serviceRequests(5);
    massMemory();
    run(performanceTest);
    Texts expected = {"get 3FFF0171", "get BFFF0001", "set 3FFF001C=4", "viClear", "write *CLS;*IDN?\n", "read 4096"};
    for (int i = 0; i < 10; ++i)
        expected.emplace_back("viReadSTB");
    for (int i = 0; i < 10; ++i)
        expected.insert(expected.end(), {"write *IDN?\n", "read 4096"});
    for (int i = 0; i < 10; ++i)
        expected.insert(expected.end(), {"write *OPC?\n", "read 4096"});
    expected.insert(expected.end(), {"write *ESE 1;*SRE 32;*OPC?\n", "read 4096", "viEnableEvent 3FFF200B 1",
                                     "viDiscardEvents 3FFF200B 1"});
    for (int i = 0; i < 5; ++i)
        expected.insert(expected.end(),
                        {"write *OPC\n", "viWaitOnEvent 3FFF200B 2000", "close " + std::to_string(2001 + i),
                         "viReadSTB", "viReadSTB", "write *ESR?\n", "read 4096"});
    expected.insert(expected.end(), {"write *ESE 0;*SRE 0;*OPC?\n", "read 4096", "write MMEM:CDIR 'C:\\'\n",
                                     "write *CLS\n", "write :MMEM:DATA 'Test.dat',#13ABC\n", "write *OPC?\n",
                                     "read 4096", "printf system:error?\n", "scanf %d,%c%*T", "set 3FFF001A=10000"});
    const std::string block = "write :MMEM:DATA 'Test.dat',#73000000" + std::string(3000000 - 10, ' ') + "TestString\n";
    expected.insert(expected.end(), 5, block);
    for (int i = 0; i < 5; ++i)
        expected.insert(expected.end(), {"write :MMEM:DATA? 'Test.dat'\n", "read 3000200"});
    expected.insert(expected.end(), {"close 2", "close 0"});

    const Texts calls = asked();
    ASSERT_EQ(calls.size(), expected.size());
    for (std::size_t i = 0; i < calls.size(); ++i)
        ASSERT_TRUE(calls[i] == expected[i])
            << i << ": " << calls[i].substr(0, 100) << " and not " << expected[i].substr(0, 100);
}

TEST_F(PerformanceTest, SetsASerialLineUpAndTakesTheSmallBlock)
{
    beSerial();
    massMemory();
    EXPECT_EQ(run(performanceTest), 0u);
    const Texts calls = asked();
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 9),
                ElementsAre("get 3FFF0171", "set 3FFF0038=0", "set 3FFF0021=115200", "set 3FFF0022=8", "set 3FFF0023=0",
                            "set 3FFF0024=10", "set 3FFF0025=2", "get BFFF0001", "set 3FFF001C=4"));
    EXPECT_EQ(lines().front(), "Force ASRL settings to 115200,8,N,1,RTS/CTS");
    EXPECT_THAT(lines(), Contains("Test SRQs is skipped!"));
    EXPECT_THAT(lines(), Contains("Test write 10000 Bytes"));
    EXPECT_THAT(lines(), Contains("Test read 10000 Bytes"));
    EXPECT_THAT(calls, Contains("write :MMEM:DATA 'Test.dat',#510000" + std::string(10000 - 10, ' ') + "TestString\n"));
    EXPECT_THAT(calls, Contains("read 10200"));
    EXPECT_TRUE(standin::calls("viWaitOnEvent").empty());
}

TEST_F(PerformanceTest, ARawSocketHasNoServiceRequestsButTheLargeBlock)
{
    beRawSocket();
    massMemory();
    EXPECT_EQ(run(performanceTest), 0u);
    const Texts calls = asked();
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 4),
                ElementsAre("get 3FFF0171", "get BFFF0001", "set 3FFF0038=1", "set 3FFF001C=4"));
    EXPECT_THAT(lines(), Contains("Test SRQs is skipped!"));
    EXPECT_THAT(lines(), Contains("Test write 3000000 Bytes"));
}

TEST_F(PerformanceTest, ARawSocketWithoutTerminationCharacterKeepsTheServiceRequests)
{
    beRawSocket();
    serviceRequests(5);
    massMemory();
    failure("viSetAttribute", VI_ERROR_NSUP_ATTR); // TERMCHAR_EN
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_THAT(shapes(), ElementsAreArray(UsualLines));
}

TEST_F(PerformanceTest, AnInterfaceThatDoesNotSayWhatItIsCountsAsAnyOther)
{
    serviceRequests(5);
    massMemory();
    failure("viGetAttribute", VI_ERROR_NSUP_ATTR); // INTF_TYPE
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_THAT(shapes(), ElementsAreArray(UsualLines));
    const Texts calls = asked();
    EXPECT_THAT(Texts(calls.begin(), calls.begin() + 3), ElementsAre("get 3FFF0171", "set 3FFF001C=4", "viClear"))
        << "the class is not asked for any more";
}

class EachSerialSetting : public PerformanceTest, public testing::WithParamInterface<int>
{
};

TEST_P(EachSerialSetting, ThatFailsMakesItAnInterfaceLikeAnyOther)
{
    beSerial();
    serviceRequests(5);
    massMemory();
    friendly("viSetAttribute", GetParam());
    failure("viSetAttribute", VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_THAT(shapes(), ElementsAreArray(UsualLines)) << "no line about serial settings either";
}

INSTANTIATE_TEST_SUITE_P(OfSix, EachSerialSetting, testing::Range(0, 6));

TEST_F(PerformanceTest, AClassThatCannotBeReadIsNoMatter)
{
    serviceRequests(5);
    massMemory();
    friendly("viGetAttribute", 1);
    failure("viGetAttribute", VI_ERROR_NSUP_ATTR); // RSRC_CLASS
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_THAT(shapes(), ElementsAreArray(UsualLines));
}

TEST_F(PerformanceTest, ARefusedProtocolIsNoMatter)
{
    serviceRequests(5);
    massMemory();
    failure("viSetAttribute", VI_ERROR_NSUP_ATTR_STATE); // IO_PROT
    EXPECT_EQ(run(performanceTest), 0u);
}

TEST_F(PerformanceTest, AnEmptyEventQueueIsNoMatter)
{
    serviceRequests(5);
    massMemory();
    failure("viDiscardEvents", VI_SUCCESS_QUEUE_EMPTY);
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_THAT(shapes(), ElementsAreArray(UsualLines));
}

TEST_F(PerformanceTest, EventsThatWereEnabledAlreadyEndIt)
{
    // Every status other than 0 counts as failure there.
    failure("viEnableEvent", VI_SUCCESS_EVENT_EN);
    EXPECT_EQ(run(performanceTest), 1u);
    EXPECT_EQ(lines().back(), "Error: VI_SUCCESS_EVENT_EN");
}

TEST_F(PerformanceTest, AMissingServiceRequestEndsTheirStepAlone)
{
    serviceRequests(2);
    massMemory();
    EXPECT_EQ(run(performanceTest), 0u);
    const Texts shown = shapes();
    const auto srqs = std::find(shown.begin(), shown.end(), "Test SRQs");
    EXPECT_THAT(Texts(srqs, srqs + 5), ElementsAre("Test SRQs", "Ready with N µs", "Ready with N µs",
                                                   "Error in waiting for SRQ", "Test write 3000000 Bytes"));
    EXPECT_EQ(lines().back(), "Test finished without Errors");
    EXPECT_EQ(standin::calls("viWaitOnEvent").size(), 3u);
    EXPECT_THAT(asked(), Contains("write *ESE 0;*SRE 0;*OPC?\n"));
}

TEST_F(PerformanceTest, TheEventOfACompletionCodeIsClosed)
{
    serviceRequest(2001, VI_SUCCESS_QUEUE_NEMPTY);
    massMemory();
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_THAT(lines(), Contains("Error in waiting for SRQ"));
    EXPECT_THAT(asked(), Contains("close 2001"));
}

/// How often in a row the status byte asks for service, and what comes of it.
struct Requests {
    int inARow;
    bool tooMany;
    unsigned polls; ///< after the first read, which does not count
};

void PrintTo(const Requests &requests, std::ostream *out)
{
    *out << requests.inARow << " in a row";
}

class EachCountOfRequests : public PerformanceTest, public testing::WithParamInterface<Requests>
{
};

TEST_P(EachCountOfRequests, IsTooManyAboveThree)
{
    serviceRequests(5);
    massMemory();
    friendly("viReadSTB", 10 + 1);
    for (int i = 0; i < GetParam().inARow; ++i)
        statusByte(64 + 32);
    if (!GetParam().tooMany)
        friendly("viReadSTB", 1 + 4 * 2);
    else if (GetParam().polls < 6)
        friendly("viReadSTB", 1);
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_EQ(testing::Value(lines(), Contains("Too much SRQs")), GetParam().tooMany);
    EXPECT_EQ(standin::calls("viWaitOnEvent").size(), GetParam().tooMany ? 1u : 5u);
    if (GetParam().tooMany) {
        EXPECT_EQ(standin::calls("viReadSTB").size(), 10u + 1 + GetParam().polls);
        EXPECT_THAT(asked(), Not(Contains("write *ESR?\n")));
    }
    EXPECT_THAT(asked(), Contains("write *ESE 0;*SRE 0;*OPC?\n"));
    EXPECT_EQ(lines().back(), "Test finished without Errors");
}

INSTANTIATE_TEST_SUITE_P(Of, EachCountOfRequests,
                         testing::Values(Requests{1, false, 2}, Requests{3, false, 4}, Requests{4, true, 5},
                                         Requests{5, true, 6}, Requests{6, true, 6}, Requests{50, true, 6}),
                         [](const auto &each) { return std::to_string(each.param.inARow); });

class EachAnswerToTheProbe : public PerformanceTest, public testing::WithParamInterface<const char *>
{
};

TEST_P(EachAnswerToTheProbe, ButZeroAndAQuoteSkipsTheMassMemory)
{
    serviceRequests(5);
    standin::script("viVScanf", {.bytes = GetParam()});
    EXPECT_EQ(run(performanceTest), 0u);
    const Texts all = lines();
    EXPECT_THAT(Texts(all.end() - 2, all.end()),
                ElementsAre("Test MMEM:DATA[?] is skipped!", "Test finished without Errors"));
    EXPECT_THAT(asked(), Not(Contains(":MMEM:DATA? 'Test.dat'\n")));
}

INSTANTIATE_TEST_SUITE_P(Of, EachAnswerToTheProbe,
                         testing::Values("-113,\"Undefined header\"", "0,No error", "nothing", "0", ""));

TEST_F(PerformanceTest, FiguresAreMebibytesASecondOfTheWholeCommandAndOfWhatWasRead)
{
    beSerial();
    massMemory();
    standin::setReply(":MMEM:DATA? 'Test.dat'", std::string(5000, 'x') + "\n");
    friendly("viWrite", 1 + 10 + 10 + 4);
    standin::script("viWrite", {.delay = std::chrono::milliseconds(50)});
    friendly("viWrite", 4);
    friendly("viRead", 1 + 10 + 10 + 1);
    standin::script("viRead", {.delay = std::chrono::milliseconds(50)});
    EXPECT_EQ(run(performanceTest), 0u);
    Texts durations;
    for (const std::string &line : lines())
        if (line.starts_with("Duration"))
            durations.push_back(line);
    ASSERT_EQ(durations.size(), 10u);
    const auto bytes = [](const std::string &line) {
        unsigned long long microseconds = 0;
        double figure = 0;
        EXPECT_EQ(std::sscanf(line.c_str(), "Duration %llu µs. %lf Mb/s", &microseconds, &figure), 2);
        EXPECT_GE(microseconds, 50000u);
        return figure * 1048576 * static_cast<double>(microseconds) / 1e6;
    };
    EXPECT_NEAR(bytes(durations[0]), 24 + 7 + 10000, 10); // ":MMEM:DATA 'Test.dat',#5" ...
    EXPECT_NEAR(bytes(durations[5]), 5001, 10);
}

TEST_F(PerformanceTest, TheStopFlagDoesNotShortenIt)
{
    serviceRequests(5);
    massMemory();
    m_stop = true;
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_THAT(shapes(), ElementsAreArray(UsualLines));
}

/// A call that fails and the line that tells it.
struct Failing {
    const char *operation;
    int before; ///< calls of it that succeed
};

void PrintTo(const Failing &failing, std::ostream *out)
{
    *out << failing.operation << " after " << failing.before;
}

class EachFailingCall : public PerformanceTest, public testing::WithParamInterface<Failing>
{
};

TEST_P(EachFailingCall, EndsItWithAnErrorAndAClose)
{
    serviceRequests(5);
    friendly(GetParam().operation, GetParam().before);
    failure(GetParam().operation, VI_ERROR_CONN_LOST);
    massMemory();
    EXPECT_EQ(run(performanceTest), 1u);
    EXPECT_EQ(lines().back(), "Error: VI_ERROR_CONN_LOST");
    EXPECT_THAT(lines(), Not(Contains("Test finished without Errors")));
    EXPECT_EQ(asked().back(), "close 2");
    EXPECT_EQ(standin::openObjects(), 1u) << "the resource manager alone";
}

INSTANTIATE_TEST_SUITE_P(Of, EachFailingCall,
                         testing::Values(Failing{"viClear", 0}, Failing{"viWrite", 0}, Failing{"viRead", 0},
                                         Failing{"viReadSTB", 3}, Failing{"viWrite", 5}, Failing{"viRead", 15},
                                         Failing{"viEnableEvent", 0}, Failing{"viVPrintf", 0}, Failing{"viVScanf", 0},
                                         Failing{"viSetAttribute", 1}, Failing{"viWrite", 39}, Failing{"viRead", 33}),
                         [](const auto &each) {
                             return std::string(each.param.operation) + std::to_string(each.param.before);
                         });

TEST_F(PerformanceTest, ACloseThatFailsAtTheEndIsAnErrorAfterAll)
{
    serviceRequests(5);
    massMemory();
    friendly("viClose", 5); // of events
    failure("viClose", VI_ERROR_CLOSING_FAILED);
    EXPECT_EQ(run(performanceTest), 1u);
    const Texts all = lines();
    EXPECT_THAT(Texts(all.end() - 2, all.end()),
                ElementsAre("Test finished without Errors", "Error: VI_ERROR_CLOSING_FAILED"));
}

TEST_F(PerformanceTest, AnAnswerIsShownAsPrintableTextAndCut)
{
    standin::setReply("*CLS;*IDN?", std::string("A\0B\x01", 4) + std::string(400, 'x'));
    m_stop = true;
    EXPECT_EQ(run(performanceTest), 0u);
    EXPECT_EQ(lines().front(), "Performance Test of Device: A\\0B\\x01" + std::string(242, 'x'));
}

} // namespace
