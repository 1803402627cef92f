// The program is closed in the middle of a test on a real transport. Each time in a process of its own: what counts is how it ends.

#include "gui/support/InstrumentTestsWindow.h"

#include "app/MainWindow.h"
#include "support/RawClient.h"

#include <QElapsedTimer>

#include <cstdlib>
#include <functional>

namespace
{

constexpr int Stuck = 55;

bool endsNormallyOrStuck(int status)
{
    return WIFEXITED(status) && (WEXITSTATUS(status) == 0 || WEXITSTATUS(status) == Stuck);
}

struct Closing {
    const Way &way;
    int test;
    int afterMs; ///< since the test has said its first line
};

void PrintTo(const Closing &closing, std::ostream *out)
{
    static constexpr const char *Tests[] = {"Performance", "Stress4882", "StressMmem"};
    *out << closing.way.name << Tests[closing.test] << "After" << closing.afterMs;
}

/// The instrument is the parent's in the child too: it outlasts the child however that ends.
class ClosingTheProgram : public InstrumentTestsWindow
{
protected:
    ClosingTheProgram() { ::testing::GTEST_FLAG(death_test_style) = "threadsafe"; }
    ~ClosingTheProgram() override { qunsetenv("SHARED_RESOURCE"); }

    QString instrument(const Way &way, const std::vector<std::string> &more = {})
    {
        if (!qEnvironmentVariableIsSet("SHARED_RESOURCE")) {
            m_simulator = simulator(way, more);
            qputenv("SHARED_RESOURCE", resourceOf(m_simulator, way.service).toUtf8());
            qputenv("SHARED_PORT", QByteArray::number(m_simulator->port("socket")));
        }
        return QString::fromUtf8(qgetenv("SHARED_RESOURCE"));
    }

    /// True when the instrument's first fault has struck.
    static bool faultHasStruck()
    {
        test::RawClient client(static_cast<std::uint16_t>(qEnvironmentVariableIntValue("SHARED_PORT")));
        client.send("DIAGNOSTIC:FAULT:COUNT? 1\n");
        return client.receiveLine() != "0\n";
    }

    /// Starts the test and closes the program when that has come true.
    [[noreturn]] void closeWhen(const std::function<bool()> &happened, const QString &resource, int test)
    {
        openPage(resource);
        choose(0, static_cast<Test>(test));
        startSurely(0);
        EXPECT_TRUE(eventually(happened, 60000)) << endOfLog();
        EXPECT_TRUE(isRunning(0)) << endOfLog();
        closeWindow();
        // The window has ended by itself. The test program's own statics are not what is looked at here.
        std::_Exit(HasFailure() ? 1 : 0);
    }

private:
    Simulator m_simulator;
};

class ClosingDuringATest : public ClosingTheProgram, public ::testing::WithParamInterface<Closing>
{
};

TEST_P(ClosingDuringATest, EndsInTimeAndWithoutAnAbort)
{
    const auto &[way, test, afterMs] = GetParam();
    // An instrument that takes its time: even the performance test is in the middle of its queries then.
    const QString resource = instrument(way, {"--fault", "any:delay=0.03"});
    const char *line = test == Performance ? "Test 10 times viReadSTB" : StressRuns;
    QElapsedTimer timer;
    timer.start();
    const auto inTheMiddle = [=, this] {
        if (!log().contains(line))
            return false;
        meanwhile(afterMs);
        return true;
    };
    EXPECT_EXIT(closeWhen(inTheMiddle, resource, test), endsNormallyOrStuck, "");
    EXPECT_LT(timer.elapsed(), 90000);
    RecordProperty("ms", static_cast<int>(timer.elapsed()));
}

std::vector<Closing> everyTestOnEveryWay()
{
    std::vector<Closing> closings;
    for (const Way *way : {&ways::Hislip, &ways::RawSocket, &ways::Vxi11, &ways::Gateway, &ways::Serial})
        for (const int test : {0, 1, 2})
            closings.push_back({*way, test, test == 0 ? 100 : 150 * test});
    return closings;
}

INSTANTIATE_TEST_SUITE_P(Of, ClosingDuringATest, ::testing::ValuesIn(everyTestOnEveryWay()),
                         [](const auto &each) { return testing::PrintToString(each.param); });

TEST_F(ClosingTheProgram, WhileATestWaitsForAnAnswerThatNeverComesEndsItWith55)
{
    // The sixth answer is the first one behind the set-up. The test waits 30000 ms for it, the program 5000 for the test.
    const QString resource = instrument(ways::Hislip, {"--socket", "0", "--fault", "hislip:drop-reply:nth=6"});
    QElapsedTimer timer;
    timer.start();
    EXPECT_EXIT(closeWhen(faultHasStruck, resource, StressMmem), ::testing::ExitedWithCode(Stuck), "");
    EXPECT_LT(timer.elapsed(), 90000);
}

} // namespace
