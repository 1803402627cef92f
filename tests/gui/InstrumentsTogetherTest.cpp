// Both slots at once on real transports, with a person at the other pages meanwhile.

#include "gui/support/InstrumentTestsWindow.h"

#include "app/MainWindow.h"

#include <random>

namespace
{

class Together : public InstrumentTestsWindow
{
protected:
    /// A person asks for one thing after another. Each answer is that question's.
    void useTheSession(int questions)
    {
        showPage("Basics");
        enterNumber("basicReadCount", 10); // a raw socket has no other end
        for (int i = 10; i < 10 + questions; ++i) {
            const QString word = QStringLiteral("word %1").arg(i);
            expectAnswer("DISP:TEXT '" + word + "';TEXT?\\n", '"' + word + '"');
            if (HasFailure())
                FAIL() << "question " << i << ": " << endOfLog();
        }
    }

    void expectNoFinding()
    {
        const QString all = log();
        for (const char *finding : {"\tError", "Warning!", "Invalid ", "SYST:ERR?", "syst:err? returns", "still",
                                    "no answer", "don't match", "not equal", "doesn't begin", "to short"})
            EXPECT_FALSE(all.contains(finding)) << finding << ": " << endOfLog();
        EXPECT_EQ(warnings(), 0);
    }

    void stopBoth()
    {
        stop(0);
        stop(1);
        EXPECT_TRUE(ends(0, 60000)) << endOfLog();
        EXPECT_TRUE(ends(1, 60000)) << endOfLog();
    }
};

TEST_F(Together, TwoInstrumentsAreTestedWhileTheSessionIsUsed)
{
    const Simulator first = simulator(ways::Hislip, {"--profile", "multimeter"});
    const Simulator second = simulator(ways::Hislip);
    openPage(resourceOf(first, "hislip"));
    connectSession();
    enter("test1Resource", resourceOf(second, "hislip"));
    choose(0, Stress4882);
    choose(1, StressMmem);
    startSurely(0);
    startSurely(1);
    ASSERT_TRUE(logged(StressRuns, 2)) << endOfLog();
    useTheSession(20);
    EXPECT_TRUE(logged(":MMEM:DATA? 'Test.dat'", 2)) << endOfLog();
    EXPECT_TRUE(isRunning(0)) << endOfLog();
    EXPECT_TRUE(isRunning(1)) << endOfLog();
    stopBoth();
    EXPECT_TRUE(log().contains("Stress Test 4882 of Device: Oltrava,MM-6510,"));
    EXPECT_TRUE(log().contains("StressMmemTest of Device: Oltrava,KyVisaSimulator,")) << log().left(3000).toStdString();
    expectNoFinding();
}

/// Two ways to one instrument. Its status registers and its file are one, so only some tests can share it: the IEEE 488.2 stress
/// test on one way, and on the other, which has no service requests, the performance test.
struct Pair {
    const Way &first;
    const Way &second;
    int stressed; ///< slot of the stress test
};

void PrintTo(const Pair &pair, std::ostream *out)
{
    *out << pair.first.name << "And" << pair.second.name;
}

class OneInstrument : public Together, public ::testing::WithParamInterface<Pair>
{
};

TEST_P(OneInstrument, IsTestedOverTwoWaysWhileTheSessionIsUsed)
{
    const auto &[first, second, stressed] = GetParam();
    const int measured = 1 - stressed;
    const Simulator instrument = simulator(second, first.options);
    openPage(resourceOf(instrument, first.service));
    connectSession();
    enter("test1Resource", resourceOf(instrument, second.service));
    choose(stressed, Stress4882);
    choose(measured, Performance);
    startSurely(stressed);
    ASSERT_TRUE(logged(StressRuns)) << endOfLog();
    for (int i = 1; i <= 3; ++i) {
        startSurely(measured);
        useTheSession(5);
        ASSERT_TRUE(ends(measured, 60000)) << endOfLog();
        ASSERT_TRUE(logged("Test finished without Errors", i)) << endOfLog();
    }
    EXPECT_TRUE(isRunning(stressed)) << endOfLog();
    stop(stressed);
    EXPECT_TRUE(ends(stressed, 60000)) << endOfLog();
    expectNoFinding();
}

INSTANTIATE_TEST_SUITE_P(Over, OneInstrument,
                         ::testing::Values(Pair{ways::Hislip, ways::RawSocket, 0}, Pair{ways::Hislip, ways::Serial, 0},
                                           Pair{ways::RawSocket, ways::Hislip, 1},
                                           Pair{ways::RawSocket, ways::Vxi11, 1},
                                           Pair{ways::RawSocket, ways::Gateway, 1}),
                         [](const auto &each) { return testing::PrintToString(each.param); });

TEST_F(Together, AStormOfStartsAndStopsLeavesEveryButtonAlive)
{
    const Simulator first = simulator(ways::Hislip);
    const Simulator second = simulator(ways::RawSocket);
    openPage(resourceOf(first, "hislip"));
    connectSession();
    enter("test1Resource", resourceOf(second, "socket"));
    choose(0, Stress4882);
    choose(1, StressMmem);
    std::minstd_rand random(1);
    for (int i = 0; i < 120; ++i) {
        const int slot = static_cast<int>(random() % 2);
        switch (random() % 5) {
        case 0:
        case 1:
            start(slot); // disabled while one runs
            break;
        case 2:
        case 3:
            stop(slot); // disabled while none runs
            break;
        default:
            showPage("Basics");
            press("basicReadStb"); // a call is out while the next button is pressed
            showPage("Tests");
            break;
        }
        meanwhile(static_cast<int>(random() % 40));
    }
    for (const int slot : {0, 1}) {
        if (!isIdle(slot))
            stop(slot);
        EXPECT_TRUE(ends(slot, 60000)) << endOfLog();
    }
    expectAnswer("*OPC?\\n", "1");
    const int before = log().count(StressRuns);
    startSurely(0);
    startSurely(1);
    EXPECT_TRUE(logged(StressRuns, before + 2)) << endOfLog();
    EXPECT_TRUE(isRunning(0)) << endOfLog();
    EXPECT_TRUE(isRunning(1)) << endOfLog();
    stopBoth();
    EXPECT_EQ(warnings(), 0) << endOfLog();
}

} // namespace
