// Many sessions, one after the other and at once. KYVISA_CYCLES sets how many are opened and closed (2,000 without it); the
// target endurance-record does it 200,000 times and prints what it cost.
#include "contract/Contract.h"
#include "support/Stopwatch.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <thread>

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
};

INSTANTIATE_TEST_SUITE_P(All, Endurance, testing::ValuesIn(protocols()), nameOf);

/// The address sanitizer keeps what was freed, and has a leak check of its own.
#ifdef __SANITIZE_ADDRESS__
constexpr bool FreedMemoryIsKept = true;
#else
constexpr bool FreedMemoryIsKept = false;
#endif

std::size_t entries(const char *folder)
{
    const std::filesystem::directory_iterator all(folder);
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

/// Kilobytes in use.
long memory()
{
    std::ifstream status("/proc/self/status");
    for (std::string line; std::getline(status, line);)
        if (line.starts_with("VmRSS:"))
            return std::atol(line.c_str() + 6);
    return 0;
}

int cyclesWanted(const Protocol &protocol)
{
    const char *text = std::getenv("KYVISA_CYCLES");
    const int cycles = text ? std::atoi(text) : 2000;
    return protocol.locks == Locks::OnePortOneSession ? cycles / 10 : cycles;
}

TEST_P(Endurance, OpeningAndClosingLeavesNothing)
{
    const int cycles = cyclesWanted(GetParam());
    ViSession manager = VI_NULL;
    ASSERT_EQ(viOpenDefaultRM(&manager), VI_SUCCESS);
    ::setenv("KYVISA_PORTMAPPER_PORT", m_simulator.resource("portmapper").c_str(), 1);
    const std::string name = resource();
    std::size_t descriptors = 0;
    std::size_t threads = 0;
    long kilobytes = 0;
    const Stopwatch watch;
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
            descriptors = entries("/proc/self/fd");
            threads = entries("/proc/self/task");
            kilobytes = memory();
        }
    }
    EXPECT_EQ(entries("/proc/self/fd"), descriptors);
    EXPECT_EQ(entries("/proc/self/task"), threads);
    if (!FreedMemoryIsKept) {
        EXPECT_LT(memory(), kilobytes + 8 * 1024);
    }
    std::printf("%s: %d sessions in %ld ms, %zu descriptors, %zu threads, %ld kB more memory\n", GetParam().name,
                cycles, watch.milliseconds(), descriptors, threads, memory() - kilobytes);
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
