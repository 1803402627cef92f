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

/// Two tests that can share an instrument: its status registers are one, so at most one of them may wait for service requests.
struct Pair {
    const Way &first;
    int firstTest;
    const Way &second;
    int secondTest;
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
    const auto &[first, firstTest, second, secondTest] = GetParam();
    const Simulator instrument = simulator(second, first.options);
    openPage(resourceOf(instrument, first.service));
    connectSession();
    enter("test1Resource", resourceOf(instrument, second.service));
    choose(0, static_cast<Test>(firstTest));
    choose(1, static_cast<Test>(secondTest));
    startSurely(0);
    startSurely(1);
    ASSERT_TRUE(logged(StressRuns, 2)) << endOfLog();
    useTheSession(20);
    EXPECT_TRUE(logged(":MMEM:DATA? 'Test.dat'", 2)) << endOfLog();
    EXPECT_TRUE(logged("err?;error?", 2)) << endOfLog();
    EXPECT_TRUE(isRunning(0)) << endOfLog();
    EXPECT_TRUE(isRunning(1)) << endOfLog();
    stopBoth();
    expectNoFinding();
}

INSTANTIATE_TEST_SUITE_P(Over, OneInstrument,
                         ::testing::Values(Pair{ways::Hislip, 2, ways::RawSocket, 1},
                                           Pair{ways::Hislip, 2, ways::Serial, 1},
                                           Pair{ways::RawSocket, 1, ways::Hislip, 2},
                                           Pair{ways::RawSocket, 1, ways::Vxi11, 2},
                                           Pair{ways::RawSocket, 1, ways::Gateway, 2}),
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
