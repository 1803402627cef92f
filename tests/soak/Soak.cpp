// Fifty clients on one simulator. Usage: soak SECONDS [RECORD_FILE]. Status 1 when anything was lost, crossed, grown or left busy.
#include "soak/SoakClients.h"
#include "support/ProcessFigures.h"
#include "support/SimulatorProcess.h"

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
#include <mutex>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

using namespace soak;
using test::figuresOf;
using test::ProcessFigures;
using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

namespace
{

constexpr int QueriesOfASession = 400;
constexpr std::size_t AllowedGrowth = 8 * 1024; // KiB; what allocators keep of a busy moment
constexpr double AllowedIdleSeconds = 0.05;     // of processor time in a second
constexpr std::chrono::seconds AllowedEnding{10};

struct Group {
    Kind kind;
    int clients;
};

/// Fifty. One client each for the serial port and the stations of the bus, which can have one conversation at a time.
constexpr std::array Groups{Group{Kind::Socket, 18},
                            Group{Kind::HislipSynchronized, 14},
                            Group{Kind::HislipOverlapped, 10},
                            Group{Kind::Vxi11, 5},
                            Group{Kind::Bus7, 1},
                            Group{Kind::Bus9, 1},
                            Group{Kind::Serial, 1}};

enum class Phase { Working, Silent, Leaving };

struct Shared {
    const Places places;
    std::atomic<Phase> phase = Phase::Working;
    std::atomic<int> silent = 0;
    std::atomic<std::uint64_t> queries = 0;
    std::array<std::atomic<std::uint64_t>, 7> queriesOfKind = {};
    std::atomic<std::uint64_t> lost = 0;
    std::atomic<std::uint64_t> crossed = 0;
    std::mutex mutex = {};
    std::string firstTrouble = {};

    void trouble(const std::string &what)
    {
        const std::lock_guard guard(mutex);
        if (firstTrouble.empty())
            firstTrouble = what;
    }
};

/// Stores a word of its own in a file of its own, and asks for it in the same message and in the next one: the answers must be that word.
void work(Shared &shared, Kind kind, int number)
{
    std::uint64_t counter = 0;
    const std::string file = "'soak" + std::to_string(number) + "'";
    std::unique_ptr<Client> client;
    while (shared.phase == Phase::Working) {
        try {
            client.reset();
            client = connect(kind, shared.places);
            for (int i = 0; i < QueriesOfASession && shared.phase == Phase::Working; ++i) {
                const std::string word = std::to_string(number) + "-" + std::to_string(++counter);
                const std::string size = std::to_string(word.size());
                const std::string block = "#" + std::to_string(size.size()) + size + word;
                const std::string store = "MMEM:DATA " + file + "," + block;
                for (const std::string &message :
                     {store + ";:MMEM:DATA? " + file + "\n", "MMEM:DATA? " + file + "\n"}) {
                    const std::string answer = client->query(message);
                    ++shared.queries;
                    ++shared.queriesOfKind.at(static_cast<std::size_t>(kind));
                    if (answer == block + "\n")
                        continue;
                    ++shared.crossed;
                    shared.trouble("client " + std::to_string(number) + " stored " + word + " and got " + answer);
                }
            }
        } catch (const std::exception &error) {
            ++shared.lost;
            shared.trouble("client " + std::to_string(number) + ": " + error.what());
            std::this_thread::sleep_for(100ms); // a simulator that ends needs the processor too
        }
    }
    ++shared.silent;
    while (shared.phase != Phase::Leaving)
        std::this_thread::sleep_for(10ms);
}

std::vector<std::thread> start(Shared &shared)
{
    std::vector<std::thread> threads;
    for (const Group &group : Groups)
        for (int i = 0; i < group.clients; ++i)
            threads.emplace_back(work, std::ref(shared), group.kind, static_cast<int>(threads.size()));
    return threads;
}

void join(std::vector<std::thread> &threads)
{
    for (std::thread &thread : threads)
        thread.join();
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

/// "socket 1200, hislip 900, ..."
std::string perKind(const Shared &shared)
{
    constexpr std::array Names{"socket", "hislip", "hislip overlapped", "vxi11", "gpib 7", "gpib 9,1", "serial"};
    std::string text;
    for (std::size_t i = 0; i < Names.size(); ++i)
        text += (i == 0 ? "" : ", ") + std::string(Names.at(i)) + " " + std::to_string(shared.queriesOfKind.at(i));
    return text;
}

/// A client that was never served is as bad as one that was served wrongly.
bool everyKindWasServed(const Shared &shared)
{
    return std::all_of(shared.queriesOfKind.begin(), shared.queriesOfKind.end(),
                       [](const std::atomic<std::uint64_t> &queries) { return queries > 0; });
}

/// How many there are when nothing comes and goes any more.
std::size_t settledDescriptors(pid_t process)
{
    constexpr int Unchanged = 20;
    std::size_t found = figuresOf(process).descriptors;
    for (int same = 0; same < Unchanged; ++same) {
        std::this_thread::sleep_for(10ms);
        if (const std::size_t again = figuresOf(process).descriptors; again != found) {
            found = again;
            same = 0;
        }
    }
    return found;
}

/// Waits until the simulator has seen everybody leave.
std::size_t descriptorsAfterwards(pid_t process, std::size_t expected)
{
    std::size_t found = figuresOf(process).descriptors;
    for (int i = 0; i < 1000 && found != expected; ++i) {
        std::this_thread::sleep_for(10ms);
        found = figuresOf(process).descriptors;
    }
    return found;
}

int run(int seconds, const char *recordFile)
{
    test::SimulatorProcess simulator(
        {"--socket", "0", "--hislip", "0", "--vxi11", "0", "--portmapper", "0", "--gpib", "--serial"});
    const std::string serial = simulator.resource("serial");
    const Places places{simulator.port("socket"), simulator.port("hislip"),
                        vxi11Port(static_cast<std::uint16_t>(std::stoi(simulator.resource("portmapper")))),
                        serial.substr(4, serial.size() - 11)};
    const std::size_t descriptors = settledDescriptors(simulator.id());
    const std::string begun = now();

    Shared shared{places};
    std::vector<std::thread> threads = start(shared);
    std::this_thread::sleep_for(std::chrono::seconds(seconds) / 3);
    const ProcessFigures warm = figuresOf(simulator.id());
    std::this_thread::sleep_for(std::chrono::seconds(seconds) * 2 / 3);
    const ProcessFigures end = figuresOf(simulator.id());

    shared.phase = Phase::Silent;
    while (shared.silent < static_cast<int>(threads.size()))
        std::this_thread::sleep_for(10ms);
    const double before = figuresOf(simulator.id()).processorSeconds;
    std::this_thread::sleep_for(1s);
    const double idle = figuresOf(simulator.id()).processorSeconds - before;
    shared.phase = Phase::Leaving;
    join(threads);
    const std::size_t left = descriptorsAfterwards(simulator.id(), descriptors);
    const std::string ended = now();

    // Once more, to be ended in the middle of it: what these clients lose then is no loss.
    Shared again{places};
    std::vector<std::thread> load = start(again);
    while (again.queries < threads.size())
        std::this_thread::sleep_for(10ms);
    const Clock::time_point signalled = Clock::now();
    const int status = simulator.stop(SIGTERM);
    const auto ending = std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - signalled);
    again.phase = Phase::Leaving;
    join(load);

    std::ostringstream record;
    record << "soak " << seconds << " | start " << begun << " | end " << ended << " | clients " << threads.size()
           << " | queries " << shared.queries << " (" << perKind(shared) << ") | lost " << shared.lost << " | crossed "
           << shared.crossed << " | memory KiB after warm-up " << warm.memory << ", at the end " << end.memory
           << ", peak " << end.peakMemory << " | descriptors before " << descriptors << ", with clients "
           << end.descriptors << ", after " << left << " | idle processor seconds in one second " << idle
           << " | SIGTERM under load: status " << status << " after " << ending.count() << " ms";
    std::cout << record.str() << std::endl;
    if (!shared.firstTrouble.empty())
        std::cout << "first trouble: " << shared.firstTrouble << std::endl;
    if (recordFile != nullptr)
        std::ofstream(recordFile, std::ios::app) << record.str() << '\n';

    const bool memoryIsFlat = KYVISA_SANITIZED || end.memory <= warm.memory + AllowedGrowth;
    const bool fine = everyKindWasServed(shared) && shared.lost == 0 && shared.crossed == 0 && memoryIsFlat &&
                      left == descriptors && idle <= AllowedIdleSeconds && status == 0 && ending <= AllowedEnding;
    return fine ? 0 : 1;
}

} // namespace

int main(int argc, char **argv)
{
    std::signal(SIGPIPE, SIG_IGN);
    const int seconds = argc >= 2 ? std::atoi(argv[1]) : 0;
    if (seconds < 3 || argc > 3) {
        std::fprintf(stderr, "usage: soak SECONDS [RECORD_FILE], at least 3 seconds\n");
        return 2;
    }
    try {
        return run(seconds, argc == 3 ? argv[2] : nullptr);
    } catch (const std::exception &error) {
        std::fprintf(stderr, "soak: %s\n", error.what());
        return 1;
    }
}
