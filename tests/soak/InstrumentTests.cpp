// The stress tests on all protocols at once, by turns. Usage: instrument-tests SECONDS [RECORD_FILE]. Status 1 when one found
// anything, did not stop in time, or left something behind.
#include "support/ProcessFigures.h"
#include "support/SimulatorProcess.h"

#include "instrtests/PerformanceTest.h"
#include "instrtests/Stress4882Test.h"
#include "instrtests/StressMmemTest.h"
#include "log/Log.h"
#include "log/SessionLog.h"
#include "pipeline/VisaError.h"
#include "visa/VisaSessionWithLog.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <iostream>
#include <memory>
#include <mutex>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <unistd.h>

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

namespace
{

constexpr std::chrono::seconds LongestTurn{20};
constexpr std::chrono::seconds AllowedStop{20}; // a second, and what a busy machine adds
constexpr std::size_t MostLines = 1024;

struct Way {
    const char *name;
    std::string resource;
};

/// What all turns on one way came to.
struct Result {
    int turns = 0;
    int measured = 0;
    long long clears = 0;
    long long opens = 0;
    int transfers = 0; ///< turns of the mass-memory test that moved blocks both ways
    std::chrono::milliseconds longestStop{0};
    std::vector<std::string> findings;
};

bool isFinding(const std::string &line)
{
    static constexpr std::array Marks{"Error",    "Cannot open",  "Warning!",    "Invalid ",  "returns",
                                      "still",    "no answer",    "don't match", "not equal", "doesn't begin",
                                      "to short", "cannot parse", "Too much"};
    return line != "Test finished without Errors" && std::any_of(Marks.begin(), Marks.end(), [&](const char *mark) {
               return line.find(mark) != std::string::npos;
           });
}

/// One run of a test, as the page's threads do it: a session and a log of its own.
class Turn
{
public:
    Turn() { m_session.openRM(); }
    ~Turn() { m_session.closeRM(); }
    Turn(const Turn &) = delete;
    Turn &operator=(const Turn &) = delete;

    /// Stops the test when @p span is over. @p stopTook receives how long it took from there to its end.
    unsigned run(const Way &way, TestFunction test, std::chrono::milliseconds span, std::chrono::milliseconds &stopTook)
    {
        std::atomic<bool> stop = false;
        std::atomic<unsigned> status = 1;
        std::thread thread([&] {
            try {
                std::string resource = way.resource;
                m_session.open(resource.data(), 0, 2000);
                status = test(&m_sessionLog, &m_session, &stop);
            } catch (const VisaError &error) {
                m_failure = std::string("Cannot open ") + VisaError::StatusCode(error.getStatus());
            }
            m_ended = true;
        });
        const Clock::time_point until = Clock::now() + span;
        while (Clock::now() < until && !m_ended)
            std::this_thread::sleep_for(10ms);
        const Clock::time_point stopped = Clock::now();
        stop = true;
        thread.join();
        stopTook = std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - stopped);
        return status;
    }

    /// The test's own lines.
    std::vector<std::string> lines() const
    {
        std::vector<FastBuffer> held(MostLines);
        held.resize(m_log->getMessageQueue()->copyFromQueue(held.data(), MostLines));
        std::vector<std::string> texts;
        for (const FastBuffer &line : held)
            texts.emplace_back(line.text);
        if (!m_failure.empty())
            texts.push_back(m_failure);
        return texts;
    }

private:
    std::unique_ptr<Log> m_log = std::make_unique<Log>(nullptr);
    SessionLog m_sessionLog{m_log.get(), nullptr};
    VisaSessionWithLog m_session{&m_sessionLog};
    std::atomic<bool> m_ended = false;
    std::string m_failure;
};

void take(Result &result, const std::string &line)
{
    long long clears = 0;
    long long opens = 0;
    if (std::sscanf(line.c_str(), "Ready with %lld Clear, 0 Trigger and %lld open", &clears, &opens) == 2 ||
        std::sscanf(line.c_str(), "Ready with %lld Clear and ", &clears) == 1) {
        result.clears += clears;
        result.opens += opens;
    }
    if (line.find("Average read") != std::string::npos)
        ++result.transfers;
}

void takeTurns(const Way &way, Clock::time_point end, std::chrono::milliseconds span, Result &result)
{
    constexpr std::array<TestFunction, 3> Tests{test4882, stressMmemTest, performanceTest};
    for (std::size_t number = 0; Clock::now() < end; ++number) {
        const TestFunction test = Tests.at(number % Tests.size());
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now());
        std::chrono::milliseconds stopTook{0};
        Turn turn;
        const unsigned status = turn.run(way, test, std::min(span, left), stopTook);
        ++result.turns;
        if (test == performanceTest)
            ++result.measured; // runs to its end in any case
        else
            result.longestStop = std::max(result.longestStop, stopTook);
        for (const std::string &line : turn.lines()) {
            take(result, line);
            if (isFinding(line))
                result.findings.push_back(std::string(way.name) + ": " + line);
        }
        if (status != 0)
            result.findings.push_back(std::string(way.name) + ": status " + std::to_string(status));
    }
}

std::string now()
{
    const std::time_t time = std::time(nullptr);
    std::tm parts{};
    ::gmtime_r(&time, &parts);
    std::array<char, 32> text{};
    std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &parts);
    return text.data();
}

int run(int seconds, const char *recordFile)
{
    // Instruments of their own, so that no test meets the status registers and files of another.
    test::SimulatorProcess hislip({"--hislip", "0"});
    test::SimulatorProcess socket({"--socket", "0"});
    test::SimulatorProcess serial({"--serial"});
    test::SimulatorProcess vxi11({"--vxi11", "0", "--portmapper", "0", "--gpib"});
    ::setenv("KYVISA_PORTMAPPER_PORT", vxi11.resource("portmapper").c_str(), 1);
    const std::array ways{Way{"HiSLIP", hislip.resource("hislip")}, Way{"socket", socket.resource("socket")},
                          Way{"VXI-11", vxi11.resource("vxi11")}, Way{"gateway", "TCPIP::127.0.0.1::gpib0,7::INSTR"},
                          Way{"serial", serial.resource("serial")}};

    const std::string begun = now();
    const std::size_t descriptors = test::figuresOf(::getpid()).descriptors;
    const Clock::time_point start = Clock::now();
    const Clock::time_point end = start + std::chrono::seconds(seconds);
    const auto span = std::min<std::chrono::milliseconds>(LongestTurn, std::chrono::milliseconds(seconds * 1000 / 4));
    std::array<Result, ways.size()> results;
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i < ways.size(); ++i)
        threads.emplace_back([&, i] { takeTurns(ways.at(i), end, span, results.at(i)); });
    std::this_thread::sleep_for(std::chrono::seconds(seconds) / 2);
    const test::ProcessFigures half = test::figuresOf(::getpid());
    for (std::thread &thread : threads)
        thread.join();
    const test::ProcessFigures last = test::figuresOf(::getpid());

    std::ostringstream record;
    record << "instrument-tests " << seconds << " | start " << begun << " | end " << now();
    bool fine = last.descriptors == descriptors;
    std::vector<std::string> findings;
    for (std::size_t i = 0; i < ways.size(); ++i) {
        const Result &result = results.at(i);
        record << " | " << ways.at(i).name << ": turns " << result.turns << " (" << result.measured
               << " of them measured), clears " << result.clears << ", opens " << result.opens << ", transfers "
               << result.transfers << ", longest stop " << result.longestStop.count() << " ms";
        findings.insert(findings.end(), result.findings.begin(), result.findings.end());
        fine = fine && result.clears > 0 && result.longestStop < AllowedStop;
    }
    std::size_t simulators = 0;
    for (const test::SimulatorProcess *each : {&hislip, &socket, &serial, &vxi11})
        simulators += test::figuresOf(each->id()).peakMemory;
    record << " | memory KiB at half time " << half.memory << ", peak " << last.peakMemory
           << ", peak of the instruments together " << simulators << " | descriptors before " << descriptors
           << ", after " << last.descriptors << " | findings " << findings.size();
    std::cout << record.str() << std::endl;
    for (const std::string &finding : findings)
        std::cout << finding << std::endl;
    if (recordFile != nullptr)
        std::ofstream(recordFile, std::ios::app) << record.str() << '\n';
    return fine && findings.empty() ? 0 : 1;
}

} // namespace

int main(int argc, char **argv)
{
    std::signal(SIGPIPE, SIG_IGN);
    const int seconds = argc >= 2 ? std::atoi(argv[1]) : 0;
    if (seconds < 4 || argc > 3) {
        std::fprintf(stderr, "usage: instrument-tests SECONDS [RECORD_FILE], at least 4 seconds\n");
        return 2;
    }
    try {
        return run(seconds, argc == 3 ? argv[2] : nullptr);
    } catch (const std::exception &error) {
        std::fprintf(stderr, "instrument-tests: %s\n", error.what());
        return 1;
    }
}
