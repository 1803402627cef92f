// Many sessions, one after the other and at once. KYVISA_CYCLES sets how many are opened and closed (2,000 without it);
// scripts/endurance does it 200,000 times and keeps a record of what it cost.
#include "contract/Contract.h"
#include "support/ProcessFigures.h"
#include "support/Stopwatch.h"

#include <array>
#include <atomic>
#include <cstdio>
#include <ctime>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <thread>
#include <unistd.h>

using test::figuresOf;
using test::ProcessFigures;
using test::Stopwatch;
using test::VisaSession;

namespace contract
{
namespace
{

class Endurance : public Contract
{
protected:
    void SetUp() override {}

    const std::size_t m_idleDescriptors = figuresOf(m_simulator.id()).descriptors;
};

INSTANTIATE_TEST_SUITE_P(All, Endurance, testing::ValuesIn(protocols()), nameOf);

/// The sanitizers keep what was freed, and one of them has a leak check of its own.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool FreedMemoryIsKept = true;
#else
constexpr bool FreedMemoryIsKept = false;
#endif

std::size_t threadCount()
{
    const std::filesystem::directory_iterator all("/proc/self/task");
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

std::string timeNow()
{
    const std::time_t now = std::time(nullptr);
    std::tm parts{};
    ::gmtime_r(&now, &parts);
    std::array<char, 32> text{};
    std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &parts);
    return text.data();
}

int cyclesWanted()
{
    const char *text = std::getenv("KYVISA_CYCLES");
    return text ? std::atoi(text) : 2000;
}

/// A serial port with nobody at its other end. The simulator tidies its own up behind each client, a moment after that has gone,
/// and then meets the next one here.
class QuietPort
{
public:
    QuietPort()
    {
        if (::grantpt(m_line) != 0 || ::unlockpt(m_line) != 0 || ::ptsname_r(m_line, m_name.data(), m_name.size()) != 0)
            throw std::runtime_error("no pseudo terminal");
    }
    ~QuietPort() { ::close(m_line); }
    QuietPort(const QuietPort &) = delete;
    QuietPort &operator=(const QuietPort &) = delete;

    std::string resource() const { return std::string("ASRL") + m_name.data() + "::INSTR"; }

private:
    const int m_line = ::posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
    std::array<char, 64> m_name{};
};

/// The instrument notices the last end a little later than this process: waits until it has as few descriptors as before.
std::size_t settledDescriptors(pid_t process, std::size_t wanted)
{
    const Stopwatch watch;
    std::size_t descriptors = figuresOf(process).descriptors;
    while (descriptors != wanted && watch.milliseconds() < 60000) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
        descriptors = figuresOf(process).descriptors;
    }
    return descriptors;
}

/// One line for the record, to the file that KYVISA_RECORD names and to the output.
void record(const std::string &line)
{
    std::printf("%s\n", line.c_str());
    if (const char *file = std::getenv("KYVISA_RECORD"); file && !testing::Test::HasFailure())
        std::ofstream(file, std::ios::app) << line << '\n';
}

TEST_P(Endurance, OpeningAndClosingLeavesNothing)
{
    const int cycles = cyclesWanted();
    ViSession manager = VI_NULL;
    ASSERT_EQ(viOpenDefaultRM(&manager), VI_SUCCESS);
    ::setenv("KYVISA_PORTMAPPER_PORT", m_simulator.resource("portmapper").c_str(), 1);
    const QuietPort port;
    const std::string name = GetParam().locks == Locks::OnePortOneSession ? port.resource() : resource();
    ProcessFigures before;
    ProcessFigures instrument;
    std::size_t threads = 0;
    const std::string start = timeNow();
    for (int i = 0; i < cycles; ++i) {
        ViSession session = VI_NULL;
        ASSERT_EQ(viOpen(manager, name.c_str(), VI_NULL, 20000, &session), VI_SUCCESS) << "cycle " << i;
        if (GetParam().locks != Locks::OnePortOneSession && i % 10 == 0) {
            ASSERT_EQ(viLock(session, VI_EXCLUSIVE_LOCK, 10000, nullptr, nullptr), VI_SUCCESS) << "cycle " << i;
        }
        if (GetParam().hasEnd && !GetParam().stringsForStatus && i % 10 == 5) {
            ASSERT_EQ(viEnableEvent(session, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL), VI_SUCCESS) << "cycle " << i;
        }
        ASSERT_EQ(viClose(session), VI_SUCCESS);
        if (i == cycles / 10) { // everything that comes once has come
            before = figuresOf(::getpid());
            instrument = figuresOf(m_simulator.id());
            instrument.descriptors = settledDescriptors(m_simulator.id(), m_idleDescriptors);
            threads = threadCount();
        }
    }
    const ProcessFigures after = figuresOf(::getpid());
    EXPECT_EQ(after.descriptors, before.descriptors);
    EXPECT_EQ(threadCount(), threads);
    const std::size_t left = settledDescriptors(m_simulator.id(), instrument.descriptors);
    EXPECT_EQ(left, instrument.descriptors) << "of the instrument";
    const ProcessFigures instrumentAfter = figuresOf(m_simulator.id());
    if (!FreedMemoryIsKept) {
        EXPECT_LT(after.memory, before.memory + 8 * 1024);
        EXPECT_LT(instrumentAfter.memory, instrument.memory + 8 * 1024) << "of the instrument";
    }
    std::ostringstream line;
    line << "endurance " << cycles << ' ' << GetParam().name << " | start " << start << " | end " << timeNow()
         << " | memory KiB after a tenth " << before.memory << ", at the end " << after.memory << ", peak "
         << after.peakMemory << " | descriptors after a tenth " << before.descriptors << ", at the end "
         << after.descriptors << " | threads " << threads << " | instrument: memory KiB after a tenth "
         << instrument.memory << ", at the end " << instrumentAfter.memory << ", descriptors after a tenth "
         << instrument.descriptors << ", at the end " << left;
    record(line.str());
    viClose(manager);
}

TEST(Threads, AHundredSessionsOnAHundredThreads)
{
    const test::SimulatorProcess simulator({"--hislip", "0", "--socket", "0"});
    std::vector<std::thread> threads;
    threads.reserve(100);
    std::atomic<int> answered{0};
    for (int i = 0; i < 100; ++i)
        threads.emplace_back([&, i] {
            const bool hislip = i % 2 == 0;
            VisaSession session;
            ASSERT_EQ(session.open(simulator.resource(hislip ? "hislip" : "socket"), 30000), VI_SUCCESS);
            session.set(VI_ATTR_TMO_VALUE, 30000);
            session.set(VI_ATTR_TERMCHAR_EN, hislip ? VI_FALSE : VI_TRUE);
            for (int question = 0; question < 20; ++question) {
                const std::string own = std::to_string(100000 + i * 1000 + question);
                ASSERT_EQ(session.write("MMEM:DATA \"f" + std::to_string(i) + "\",#16" + own + "\n"), VI_SUCCESS);
                ASSERT_EQ(session.write("MMEM:DATA? \"f" + std::to_string(i) + "\"\n"), VI_SUCCESS);
                ASSERT_GE(session.read(), VI_SUCCESS);
                ASSERT_NE(session.text.find(own), std::string::npos) << session.text;
                ++answered;
            }
        });
    for (std::thread &thread : threads)
        thread.join();
    EXPECT_EQ(answered, 2000);
}

// All VXI-11 links to an instrument share its output queue: the lock keeps it to one of them at a time.
TEST(Threads, ALockKeepsTheAnswersOfTwentyVxi11SessionsApart)
{
    const test::SimulatorProcess simulator({"--vxi11", "0", "--portmapper", "0"});
    ::setenv("KYVISA_PORTMAPPER_PORT", simulator.resource("portmapper").c_str(), 1);
    std::vector<std::thread> threads;
    std::atomic<int> answered{0};
    for (int i = 0; i < 20; ++i)
        threads.emplace_back([&, i] {
            VisaSession session;
            ASSERT_EQ(session.open(simulator.resource("vxi11"), 30000), VI_SUCCESS);
            session.set(VI_ATTR_TMO_VALUE, 30000);
            for (int question = 0; question < 10; ++question) {
                ASSERT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 60000, VI_NULL, VI_NULL), VI_SUCCESS);
                const std::string own = std::to_string(i * 10 + question);
                ASSERT_EQ(session.write("*ESE " + own + ";*ESE?\n"), VI_SUCCESS);
                ASSERT_EQ(session.read(), VI_SUCCESS);
                ASSERT_EQ(session.text, own + "\n");
                ASSERT_EQ(viUnlock(session.vi), VI_SUCCESS);
                ++answered;
            }
        });
    for (std::thread &thread : threads)
        thread.join();
    EXPECT_EQ(answered, 200);
}

} // namespace
} // namespace contract
