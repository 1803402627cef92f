// Instruments that misbehave while a test runs: each test tells what it should, ends or goes on as it should, and everything
// else stays usable.

#include "gui/support/InstrumentTestsWindow.h"

#include "app/MainWindow.h"
#include "support/RawClient.h"

#include <algorithm>

namespace
{

constexpr int Patience = 120000; // milliseconds; the longest time-out of a test is 30000

/// How a test comes out of it.
enum class Outcome {
    Finishes, ///< by itself and without a failure
    Fails,    ///< by itself, in red
    GoesOn,   ///< until it is stopped
};

/// When the fault is switched on.
enum class From { TheStart, TheMiddle };

struct Case {
    const char *name;
    int test;
    const Way &way;
    const char *fault;
    From from;
    Outcome outcome;
    std::vector<const char *> lines;      ///< all are told
    std::vector<const char *> oneOf = {}; ///< and one of these
};

void PrintTo(const Case &each, std::ostream *out)
{
    *out << each.name << ": " << each.fault;
}

/// The session is connected to the instrument with the fault, and slot 0 tests it; slot 1 tests a sound one.
class EachFault : public InstrumentTestsWindow, public ::testing::WithParamInterface<Case>
{
protected:
    EachFault()
        : m_sound(simulator(ways::Serial)),
          m_faulty(GetParam().way.service == std::string("socket") ? simulator(ways::RawSocket)
                                                                   : simulator(GetParam().way, {"--socket", "0"}))
    {
        openPage(resourceOf(m_faulty, GetParam().way.service));
        if (!portIsTheTestsAlone())
            connectSession();
        enter("test1Resource", resourceOf(m_sound, "serial"));
        choose(0, static_cast<Test>(GetParam().test));
        choose(1, StressMmem);
    }

    static bool portIsTheTestsAlone() { return GetParam().way.service == std::string("serial"); }

    void switchOn(const std::string &fault) { tell("DIAGNOSTIC:FAULT:ADD '" + fault + "'"); }
    void switchOff() { tell("DIAGNOSTIC:FAULT:DELETE ALL;*CLS;*SRE 0;*ESE 0"); }

    /// Starts the test and waits until it is past its set-up.
    void startWell(int slot, Test test)
    {
        const int running = log().count(SetUp);
        const int stressed = log().count(StressRuns);
        startSurely(slot);
        if (test == Stress4882) {
            ASSERT_TRUE(logged(StressRuns, stressed + 1)) << endOfLog();
        }
        if (test == StressMmem) {
            ASSERT_TRUE(logged(SetUp, running + 1)) << endOfLog();
        }
    }

    Simulator m_sound;
    Simulator m_faulty;

private:
    static constexpr const char *SetUp = "VI_ATTR_TMO_VALUE,value= 0x7530)"; // the last step of the mass-memory test's

    /// Says it to the instrument with the fault, which has done it when this returns.
    void tell(const std::string &command)
    {
        test::RawClient client(m_faulty->port("socket"));
        client.send(command + "\n");
        client.finishSending();
        client.receiveAll();
    }
};

TEST_P(EachFault, IsToldAndDisturbsNothingElse)
{
    const Case &expected = GetParam();
    const Test test = static_cast<Test>(expected.test);
    startWell(1, StressMmem);

    if (expected.from == From::TheStart) {
        switchOn(expected.fault);
        startSurely(0);
    } else {
        startWell(0, test);
        switchOn(expected.fault);
    }
    if (expected.outcome == Outcome::GoesOn) {
        for (const char *line : expected.lines)
            EXPECT_TRUE(logged(line, 1, Patience)) << line << ": " << endOfLog();
        EXPECT_TRUE(isRunning(0)) << endOfLog();
        stop(0);
    }
    EXPECT_TRUE(ends(0, Patience)) << endOfLog();
    const bool fails = expected.outcome == Outcome::Fails;
    EXPECT_TRUE(eventually([&] { return warnings() == (fails ? 1 : 0); }));
    EXPECT_EQ(result(0), fails ? "Error occurred" : "");
    for (const char *line : expected.lines)
        EXPECT_TRUE(logged(line)) << line << ": " << endOfLog();
    if (!expected.oneOf.empty()) {
        EXPECT_TRUE(eventually([&] {
            const QString all = log();
            return std::any_of(expected.oneOf.begin(), expected.oneOf.end(),
                               [&](const char *line) { return all.contains(line); });
        })) << endOfLog();
    }
    EXPECT_TRUE(isRunning(1)) << endOfLog();

    // When the instrument is sound again, the session that was open all the time works, and so does the slot.
    switchOff();
    if (!portIsTheTestsAlone()) {
        showPage("Basics");
        enterNumber("basicReadCount", 1); // a raw socket has no other end
        expectAnswer("*OPC?\\n", "1");
        press("basicClear"); // the line feed is still to come
    }
    startWell(0, test);
    if (test != Performance) {
        EXPECT_TRUE(isRunning(0)) << endOfLog();
        stop(0);
    }
    EXPECT_TRUE(ends(0, Patience)) << endOfLog();
    EXPECT_EQ(result(0), "") << endOfLog();
    EXPECT_TRUE(isRunning(1)) << endOfLog();
    stop(1);
    EXPECT_TRUE(ends(1)) << endOfLog();
    EXPECT_EQ(warnings(), fails ? 1 : 0) << endOfLog();
}

const std::vector<const char *> MissingRequest = {"\tError in waiting for SRQ", "\tError: No SRQ"};
const std::vector<const char *> WrongError = {"syst:err? returns unexpected error code: ",
                                              "Query: SYST:ERR? returns zero string"};
const std::vector<const char *> WrongBlock = {
    "Binary data not equal at index: ", "Number of chars don't match: ", "Answer doesn't begin with #"};
// Formatted input says of a lost connection that its input failed.
const std::vector<const char *> LostConnection = {"Error: VI_ERROR_CONN_LOST", "Error: VI_ERROR_IO"};
constexpr const char *Finished = "Test finished without Errors";
constexpr const char *Counts = " Clear, 0 Trigger and ";

// The performance test judges nothing: what it cannot measure it leaves out.
INSTANTIATE_TEST_SUITE_P(UnderThePerformanceTest, EachFault,
                         ::testing::Values(Case{"HislipDroppedRequest",
                                                0,
                                                ways::Hislip,
                                                "hislip:withhold-srq",
                                                From::TheStart,
                                                Outcome::Finishes,
                                                {"Error in waiting for SRQ", "Test read 3000000 Bytes", Finished}},
                                           Case{"Vxi11DroppedRequest",
                                                0,
                                                ways::Vxi11,
                                                "vxi11:withhold-srq",
                                                From::TheStart,
                                                Outcome::Finishes,
                                                {"Error in waiting for SRQ", "Test read 3000000 Bytes", Finished}},
                                           Case{"HislipRequestThatStays",
                                                0,
                                                ways::Hislip,
                                                "hislip:nonsense-status=64",
                                                From::TheStart,
                                                Outcome::Finishes,
                                                {"Too much SRQs", "Test read 3000000 Bytes", Finished}},
                                           Case{"HislipChangedByte",
                                                0,
                                                ways::Hislip,
                                                "hislip:change-byte=0",
                                                From::TheStart,
                                                Outcome::Finishes,
                                                {"Test MMEM:DATA[?] is skipped!", Finished}},
                                           Case{"HislipFullErrorQueue",
                                                0,
                                                ways::Hislip,
                                                "hislip:fill-errors",
                                                From::TheStart,
                                                Outcome::Finishes,
                                                {"Test MMEM:DATA[?] is skipped!", Finished}},
                                           Case{"SocketFullErrorQueue",
                                                0,
                                                ways::RawSocket,
                                                "socket:fill-errors",
                                                From::TheStart,
                                                Outcome::Finishes,
                                                {"Test MMEM:DATA[?] is skipped!", Finished}},
                                           Case{"HislipMissingEnd",
                                                0,
                                                ways::Hislip,
                                                "hislip:no-end:nth=3",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_TMO"}},
                                           Case{"SocketMissingEnd",
                                                0,
                                                ways::RawSocket,
                                                "socket:no-end:every=5",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_TMO"}},
                                           Case{"Vxi11MissingEnd",
                                                0,
                                                ways::Vxi11,
                                                "vxi11:no-end:nth=3",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_"}},
                                           Case{"GatewayMissingEnd",
                                                0,
                                                ways::Gateway,
                                                "gpib:no-end:nth=3",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_"}},
                                           Case{"SerialMissingEnd",
                                                0,
                                                ways::Serial,
                                                "serial:no-end:nth=3",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_TMO"}},
                                           Case{"HislipStaleAnswer",
                                                0,
                                                ways::Hislip,
                                                "hislip:stale-id:nth=4",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_TMO"}},
                                           Case{"Vxi11StaleAnswer",
                                                0,
                                                ways::Vxi11,
                                                "vxi11:stale-id:nth=4",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_"}},
                                           Case{"HislipConnectionCut",
                                                0,
                                                ways::Hislip,
                                                "hislip:cut:nth=5",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_CONN_LOST"}}),
                         [](const auto &each) { return each.param.name; });

// A finding ends the IEEE 488.2 stress test, and only a failed call does so in red.
INSTANTIATE_TEST_SUITE_P(
    UnderTheStress4882Test, EachFault,
    ::testing::Values(Case{"HislipDroppedRequest",
                           1,
                           ways::Hislip,
                           "hislip:withhold-srq",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {Counts},
                           MissingRequest},
                      Case{"Vxi11DroppedRequest",
                           1,
                           ways::Vxi11,
                           "vxi11:withhold-srq",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {Counts},
                           MissingRequest},
                      Case{"GatewayDroppedRequest",
                           1,
                           ways::Gateway,
                           "gpib:withhold-srq",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {Counts},
                           MissingRequest},
                      Case{"HislipNoMessageAvailable",
                           1,
                           ways::Hislip,
                           "hislip:nonsense-status=0",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {"Invalid status value : 0x0 ", Counts}},
                      Case{"HislipChangedByte",
                           1,
                           ways::Hislip,
                           "hislip:change-byte=0",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {Counts},
                           WrongError},
                      Case{"SocketChangedByte",
                           1,
                           ways::RawSocket,
                           "socket:change-byte=0",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {Counts},
                           WrongError},
                      Case{"SerialChangedByte",
                           1,
                           ways::Serial,
                           "serial:change-byte=0",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {Counts},
                           WrongError},
                      Case{"HislipFullErrorQueue",
                           1,
                           ways::Hislip,
                           "hislip:fill-errors",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {"syst:err? returns unexpected error code: -310 or wrong format", Counts}},
                      Case{"SocketFullErrorQueue",
                           1,
                           ways::RawSocket,
                           "socket:fill-errors",
                           From::TheMiddle,
                           Outcome::Finishes,
                           {"syst:err? returns unexpected error code: -310 or wrong format", Counts}},
                      Case{"HislipMissingEnd",
                           1,
                           ways::Hislip,
                           "hislip:no-end",
                           From::TheMiddle,
                           Outcome::Fails,
                           {"Error: VI_ERROR_TMO", Counts}},
                      Case{"SocketMissingEnd",
                           1,
                           ways::RawSocket,
                           "socket:no-end",
                           From::TheMiddle,
                           Outcome::Fails,
                           {"Error: VI_ERROR_TMO", Counts}},
                      Case{"HislipStaleAnswer",
                           1,
                           ways::Hislip,
                           "hislip:stale-id",
                           From::TheMiddle,
                           Outcome::Fails,
                           {"Error: VI_ERROR_TMO", Counts}},
                      Case{"Vxi11StaleAnswer",
                           1,
                           ways::Vxi11,
                           "vxi11:stale-id",
                           From::TheMiddle,
                           Outcome::Fails,
                           {"Error: VI_ERROR_", Counts}},
                      Case{"SocketConnectionCut",
                           1,
                           ways::RawSocket,
                           "socket:cut",
                           From::TheMiddle,
                           Outcome::Fails,
                           {Counts},
                           LostConnection},
                      Case{"Vxi11ConnectionCut",
                           1,
                           ways::Vxi11,
                           "vxi11:cut",
                           From::TheMiddle,
                           Outcome::Fails,
                           {Counts},
                           LostConnection}),
    [](const auto &each) { return each.param.name; });

// The mass-memory test fails for a block that came back wrong, goes on after an error of the instrument, and needs no requests.
INSTANTIATE_TEST_SUITE_P(UnderTheStressMmemTest, EachFault,
                         ::testing::Values(Case{"HislipDroppedRequest",
                                                2,
                                                ways::Hislip,
                                                "hislip:withhold-srq",
                                                From::TheMiddle,
                                                Outcome::GoesOn,
                                                {"\tviReadSTB("}},
                                           Case{"HislipNoMessageAvailable",
                                                2,
                                                ways::Hislip,
                                                "hislip:nonsense-status=0",
                                                From::TheMiddle,
                                                Outcome::GoesOn,
                                                {"20 seconds no answer! Continue.."}},
                                           Case{"HislipFullErrorQueue",
                                                2,
                                                ways::Hislip,
                                                "hislip:fill-errors",
                                                From::TheMiddle,
                                                Outcome::GoesOn,
                                                {"Query: SYST:ERR? returns: -310,", "Query: SYST:ERR? returns: -350,"}},
                                           Case{"HislipChangedByte",
                                                2,
                                                ways::Hislip,
                                                "hislip:change-byte=1009",
                                                From::TheMiddle,
                                                Outcome::Fails,
                                                {},
                                                WrongBlock},
                                           Case{"SocketChangedByte",
                                                2,
                                                ways::RawSocket,
                                                "socket:change-byte=1009",
                                                From::TheMiddle,
                                                Outcome::Fails,
                                                {},
                                                WrongBlock},
                                           Case{"Vxi11ChangedByte",
                                                2,
                                                ways::Vxi11,
                                                "vxi11:change-byte=1009",
                                                From::TheMiddle,
                                                Outcome::Fails,
                                                {},
                                                WrongBlock},
                                           Case{"GatewayChangedByte",
                                                2,
                                                ways::Gateway,
                                                "gpib:change-byte=1009",
                                                From::TheMiddle,
                                                Outcome::Fails,
                                                {},
                                                WrongBlock},
                                           Case{"SerialChangedByte",
                                                2,
                                                ways::Serial,
                                                "serial:change-byte=1009",
                                                From::TheMiddle,
                                                Outcome::Fails,
                                                {},
                                                WrongBlock},
                                           Case{"HislipMissingEnd",
                                                2,
                                                ways::Hislip,
                                                "hislip:no-end",
                                                From::TheMiddle,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_TMO"}},
                                           Case{"SocketMissingEnd",
                                                2,
                                                ways::RawSocket,
                                                "socket:no-end",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_TMO", "Test aborted. No data transferred."}},
                                           Case{"HislipStaleAnswer",
                                                2,
                                                ways::Hislip,
                                                "hislip:stale-id",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_TMO", "Test aborted. No data transferred."}},
                                           Case{"Vxi11StaleAnswer",
                                                2,
                                                ways::Vxi11,
                                                "vxi11:stale-id",
                                                From::TheStart,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_", "Test aborted. No data transferred."}},
                                           Case{"HislipConnectionCut",
                                                2,
                                                ways::Hislip,
                                                "hislip:cut",
                                                From::TheMiddle,
                                                Outcome::Fails,
                                                {"Error: VI_ERROR_CONN_LOST"}}),
                         [](const auto &each) { return each.param.name; });

} // namespace
