// What the tester's performance test says of its blocks, and the same transfers by a bare program on the same library, by turns. One series a
// side: "write/hislip/test", "write/hislip/bare", ..., each sample one transfer.
//
//     bench-figures [--rounds N]

#include "bench/BenchSimulator.h"
#include "bench/Measurement.h"
#include "bench/VisaClient.h"
#include "instrtests/PerformanceTest.h"
#include "log/Log.h"
#include "log/SessionLog.h"
#include "visa/VisaSessionWithLog.h"

#include <array>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace
{

using bench::Measurement;
using bench::Protocol;
using bench::timeEach;
using bench::VisaClient;

constexpr std::size_t Transfers = 5;
constexpr std::size_t BlockSize = 3000000;
constexpr std::size_t MostLines = 100;

void runTest(Measurement &measurement, const std::string &resource, const std::string &name)
{
    const auto log = std::make_unique<Log>(nullptr);
    SessionLog front(log.get(), nullptr);
    VisaSessionWithLog session(&front);
    session.openRM();
    std::string opened = resource;
    session.open(opened.data(), 0, 2000);
    const std::atomic<bool> stop = false;
    const unsigned status = performanceTest(&front, &session, &stop);
    session.closeRM();

    std::vector<FastBuffer> lines(MostLines);
    lines.resize(log->getMessageQueue()->copyFromQueue(lines.data(), MostLines));
    std::vector<double> durations;
    for (const FastBuffer &line : lines)
        if (unsigned long long microseconds = 0; std::sscanf(line.text, "Duration %llu", &microseconds) == 1)
            durations.push_back(static_cast<double>(microseconds) * 1000);
    if (status != 0 || durations.size() != 2 * Transfers) {
        std::fprintf(stderr, "the performance test over %s: status %u, %zu transfers\n", name.c_str(), status,
                     durations.size());
        std::exit(1);
    }
    measurement.add("write/" + name + "/test", {durations.begin(), durations.begin() + Transfers});
    measurement.add("read/" + name + "/test", {durations.begin() + Transfers, durations.end()});
}

void runBare(Measurement &measurement, const std::string &resource, Protocol protocol, const std::string &name)
{
    VisaClient client(resource, protocol);
    const std::string command =
        ":MMEM:DATA 'Test.dat',#7" + std::to_string(BlockSize) + std::string(BlockSize, ' ') + "\n";
    std::vector<char> answer(2 + 7 + BlockSize + 1);
    measurement.add("write/" + name + "/bare", timeEach(0, Transfers, [&] { client.write(command); }));
    measurement.add("read/" + name + "/bare", timeEach(0, Transfers, [&] {
                        client.write(":MMEM:DATA? 'Test.dat'\n");
                        client.readAll(answer.data(), static_cast<ViUInt32>(answer.size()));
                    }));
}

} // namespace

int main(int argc, char **argv)
{
    bench::runOn(0);
    const bench::BenchSimulator simulator;
    ::setenv("KYVISA_PORTMAPPER_PORT", std::to_string(simulator.portmapperPort()).c_str(), 1);
    const std::array<std::pair<Protocol, const char *>, 3> ways{
        {{Protocol::Socket, "socket"}, {Protocol::Hislip, "hislip"}, {Protocol::Vxi11, "vxi11"}}};
    const std::size_t rounds = bench::numberOption(argc, argv, "--rounds", 15);
    Measurement measurement;
    for (std::size_t round = 0; round < rounds; ++round) {
        for (const auto &[protocol, name] : ways) {
            const std::string resource = bench::resourceOf(simulator, protocol);
            runTest(measurement, resource, name);
            runBare(measurement, resource, protocol, name);
        }
    }
    measurement.print();
    return 0;
}
