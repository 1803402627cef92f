// The instrument tests on the whole stack: the window, libkyvisa.so, the simulated instrument.

#include "gui/support/InstrumentTestsWindow.h"

#include "app/MainWindow.h"

#include <QElapsedTimer>

namespace
{

class OnInstrument : public InstrumentTestsWindow
{
protected:
    void startWith(const Way &way, const std::vector<std::string> &more = {})
    {
        m_simulator = simulator(way, more);
        m_resource = resourceOf(m_simulator, way.service);
        openPage(m_resource);
    }

    const QString &resource() const { return m_resource; }

    /// Lets a stress test work for a while, then stops it.
    /// @p untilSeen: what has to be in the log by then.
    void workAndStop(Test test, const char *untilSeen)
    {
        choose(0, test);
        startSurely(0);
        ASSERT_TRUE(logged(StressRuns)) << endOfLog();
        meanwhile(3000);
        EXPECT_TRUE(logged(untilSeen)) << endOfLog();
        EXPECT_TRUE(isRunning(0)) << endOfLog();
        QElapsedTimer timer;
        timer.start();
        stop(0);
        EXPECT_TRUE(ends(0)) << endOfLog();
        EXPECT_LT(timer.elapsed(), 15000); // a second, and what a busy machine adds
        RecordProperty("stop_ms", static_cast<int>(timer.elapsed()));
        EXPECT_EQ(warnings(), 0) << endOfLog();
    }

private:
    Simulator m_simulator;
    QString m_resource;
};

class EachWay : public OnInstrument, public ::testing::WithParamInterface<Way>
{
protected:
    EachWay() { startWith(GetParam()); }
};

TEST_P(EachWay, ThePerformanceTestFinishesWithoutErrors)
{
    startSurely(0);
    EXPECT_TRUE(ends(0, 60000));
    EXPECT_EQ(warnings(), 0);
    EXPECT_TRUE(eventually([this] { return log().contains("Test finished without Errors"); }))
        << log().right(2000).toStdString();
    EXPECT_TRUE(log().contains("Test read ")) << log().right(2000).toStdString();
}

TEST_P(EachWay, TheStress4882TestFindsNothingAndStops)
{
    workAndStop(Stress4882, "err?;error?");
    EXPECT_TRUE(eventually([this] { return log().contains(" Clear, 0 Trigger and "); }));
    for (const char *finding : {"Error", "Warning!", "Invalid status value", "returns", "still"})
        EXPECT_FALSE(log().contains(finding)) << finding << ": " << log().right(2000).toStdString();
}

TEST_P(EachWay, TheStressMmemTestFindsNothingAndStops)
{
    workAndStop(StressMmem, ":MMEM:DATA? 'Test.dat'");
    EXPECT_TRUE(eventually([this] { return log().contains(" Trigger. Average read "); }))
        << log().right(2000).toStdString();
    for (const char *finding :
         {"Error:", "Warning!", "Invalid", "SYST:ERR?", "seconds no answer", "match", "not equal"})
        EXPECT_FALSE(log().contains(finding)) << finding << ": " << log().right(2000).toStdString();
}

INSTANTIATE_TEST_SUITE_P(Over, EachWay,
                         ::testing::Values(ways::Hislip, ways::RawSocket, ways::Vxi11, ways::Gateway, ways::Serial),
                         [](const auto &each) { return each.param.name; });

TEST_F(OnInstrument, OnOverlappedHislipTheStress4882TestEndsWithAFinding)
{
    startWith(ways::Hislip, {"--hislip-overlap"});
    choose(0, Stress4882);
    startSurely(0);
    EXPECT_TRUE(ends(0, 60000)) << log().right(2000).toStdString();
    EXPECT_TRUE(eventually([this] { return log().contains(" Clear, 0 Trigger and "); }))
        << log().right(2000).toStdString();
    EXPECT_EQ(warnings(), 0) << "a finding is no VISA error";
}

} // namespace
