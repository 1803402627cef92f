// The instrument tests on the whole stack: the window, libkyvisa.so, the simulated instrument.

#include "gui/support/TestsPage.h"

#include "app/MainWindow.h"
#include "support/ModalAnswer.h"
#include "support/SimulatorProcess.h"

#include <QElapsedTimer>

#include <memory>

namespace
{

/// A way to reach the simulated instrument.
struct Way {
    const char *name;
    std::vector<std::string> options; ///< of the simulator
    const char *service;
};

void PrintTo(const Way &way, std::ostream *out)
{
    *out << way.name;
}

class OnInstrument : public TestsPage<WindowTest>
{
protected:
    void startWith(const std::vector<std::string> &options, const char *service)
    {
        m_simulator = std::make_unique<test::SimulatorProcess>(options);
        qputenv("KYVISA_PORTMAPPER_PORT", QByteArray::fromStdString(m_simulator->resource("portmapper")));
        openWindow();
        showPage("Tests");
        tick("testWriteLog");
        m_resource = QString::fromStdString(m_simulator->resource(service));
        ASSERT_FALSE(m_resource.isEmpty());
        enter("resourceName", m_resource);
        EXPECT_EQ(text("test0Resource"), m_resource);
    }

    const QString &resource() const { return m_resource; }

    /// Lets a stress test work for a while, then stops it.
    /// @p untilSeen: what has to be in the log by then.
    void workAndStop(Test test, const char *untilSeen)
    {
        choose(0, test);
        start(0);
        ASSERT_TRUE(eventually([this] { return log().contains("Press 'Stop Test' to finish test!"); }))
            << log().toStdString();
        meanwhile(3000);
        EXPECT_TRUE(eventually([=, this] { return log().contains(untilSeen); }, 60000));
        EXPECT_TRUE(isRunning(0)) << log().right(2000).toStdString();
        QElapsedTimer timer;
        timer.start();
        stop(0);
        EXPECT_TRUE(ends(0)) << log().right(2000).toStdString();
        EXPECT_LT(timer.elapsed(), 5000); // a second, and what a busy machine adds
        RecordProperty("stop_ms", static_cast<int>(timer.elapsed()));
        EXPECT_EQ(warnings(), 0) << log().right(2000).toStdString();
    }

    int warnings() const { return m_warning.count(); }

private:
    ModalAnswer m_warning{"testAborted", [](QDialog *box) { QTest::keyClick(box, Qt::Key_Return); }};
    std::unique_ptr<test::SimulatorProcess> m_simulator;
    QString m_resource;
};

class EachWay : public OnInstrument, public ::testing::WithParamInterface<Way>
{
protected:
    EachWay() { startWith(GetParam().options, GetParam().service); }
};

TEST_P(EachWay, ThePerformanceTestFinishesWithoutErrors)
{
    start(0);
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
                         ::testing::Values(Way{"Hislip", {"--hislip", "0"}, "hislip"},
                                           Way{"RawSocket", {"--socket", "0"}, "socket"},
                                           Way{"Vxi11", {"--vxi11", "0", "--portmapper", "0"}, "vxi11"},
                                           Way{"Gateway", {"--gpib", "--vxi11", "0", "--portmapper", "0"}, "gpib"},
                                           Way{"Serial", {"--serial"}, "serial"}),
                         [](const auto &each) { return each.param.name; });

TEST_F(OnInstrument, OnOverlappedHislipTheStress4882TestEndsWithAFinding)
{
    startWith({"--hislip", "0", "--hislip-overlap"}, "hislip");
    choose(0, Stress4882);
    start(0);
    EXPECT_TRUE(ends(0, 60000)) << log().right(2000).toStdString();
    EXPECT_TRUE(eventually([this] { return log().contains(" Clear, 0 Trigger and "); }))
        << log().right(2000).toStdString();
    EXPECT_EQ(warnings(), 0) << "a finding is no VISA error";
}

TEST_F(OnInstrument, BothSlotsWorkAtOnce)
{
    startWith({"--hislip", "0", "--socket", "0"}, "hislip");
    enter("test1Resource", resource());
    choose(0, Stress4882);
    choose(1, StressMmem);
    start(0);
    start(1);
    meanwhile(2000);
    EXPECT_TRUE(isRunning(0)) << log().right(2000).toStdString();
    EXPECT_TRUE(isRunning(1)) << log().right(2000).toStdString();
    stop(1);
    EXPECT_TRUE(ends(1));
    EXPECT_TRUE(isRunning(0));
    stop(0);
    EXPECT_TRUE(ends(0));
}

} // namespace
