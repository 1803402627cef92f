// Queries over raw socket, HiSLIP and VXI-11, blocks over the first two: libkyvisa against bare clients on the same simulator, all
// on one core, batches of both sides by turns.
//
//     bench-transport [--rounds N] [--block-rounds N]

#include "bench/BareClient.h"
#include "bench/BareVxi11.h"
#include "bench/BenchSimulator.h"
#include "bench/Measurement.h"
#include "bench/VisaClient.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <string>
#include <vector>

namespace
{

using namespace bench;

constexpr std::size_t BlockSize = 64u << 20;
constexpr std::size_t QueriesOfABatch = 200;
constexpr std::size_t WarmUp = 10; // behind another side's batch the caches are the other side's
const std::string Query = "*IDN?\n";

struct Side {
    const char *name;
    std::function<void()> call;
};

void expect(bool condition, const char *what)
{
    if (condition)
        return;
    std::fprintf(stderr, "%s\n", what);
    std::exit(1);
}

void measureQueries(Measurement &measurement, const BenchSimulator &simulator, std::size_t rounds)
{
    char answer[1024];
    BareEcho echo;
    BareSocket bareSocket(simulator.socketPort());
    BareHislip bareHislip(simulator.hislipPort());
    BareVxi11 bareVxi11(simulator.portmapperPort());
    VisaClient socket(resourceOf(simulator, Protocol::Socket), Protocol::Socket);
    VisaClient hislip(resourceOf(simulator, Protocol::Hislip), Protocol::Hislip);
    VisaClient vxi11(resourceOf(simulator, Protocol::Vxi11), Protocol::Vxi11);

    const std::size_t length = bareSocket.query(Query, answer, sizeof answer);
    const auto same = [&](std::size_t got) { expect(got == length, "the clients got different answers"); };
    const Side sides[] = {
        {"ping", [&] { echo.ping(); }},
        {"socket/bare", [&] { same(bareSocket.query(Query, answer, sizeof answer)); }},
        {"socket/kyvisa", [&] { same(socket.query(answer, sizeof answer)); }},
        {"hislip/bare", [&] { same(bareHislip.query(Query, answer, sizeof answer)); }},
        {"hislip/kyvisa", [&] { same(hislip.query(answer, sizeof answer)); }},
        {"vxi11/bare", [&] { same(bareVxi11.query(Query, answer, sizeof answer)); }},
        {"vxi11/kyvisa", [&] { same(vxi11.query(answer, sizeof answer)); }},
    };
    for (std::size_t round = 0; round < rounds; ++round)
        for (const Side &side : sides)
            measurement.add(side.name, timeEach(WarmUp, QueriesOfABatch, side.call));
}

std::string blockMessage()
{
    std::string message = "MMEM:DATA \"bench\",#8" + std::to_string(BlockSize);
    message.append(BlockSize, 'x');
    message += '\n';
    return message;
}

void measureBlocks(Measurement &measurement, const BenchSimulator &simulator, std::size_t rounds)
{
    BareCopy copy(BlockSize);
    VisaClient socket(resourceOf(simulator, Protocol::Socket), Protocol::Socket);
    VisaClient hislip(resourceOf(simulator, Protocol::Hislip), Protocol::Hislip);

    const std::string message = blockMessage();
    std::vector<char> answer(10 + BlockSize + 1); // "#8" and eight digits, the bytes, the line feed
    const auto write = [&](VisaClient &client) {
        client.write(message);
        // The answer shows that the instrument has taken the block.
        client.write("*OPC?\n");
        client.readAll(answer.data(), 2);
    };
    const auto read = [&](VisaClient &client) {
        client.write("MMEM:DATA? \"bench\"\n");
        client.readAll(answer.data(), static_cast<ViUInt32>(answer.size()));
    };
    const auto readSocket = [&] {
        socket.terminationCharacter(false);
        read(socket);
        socket.terminationCharacter(true);
    };
    const Side sides[] = {
        {"blockWrite/bare", [&] { copy.write(message.data()); }},
        {"blockWrite/socket", [&] { write(socket); }},
        {"blockWrite/hislip", [&] { write(hislip); }},
        {"blockRead/bare", [&] { copy.read(answer.data()); }},
        {"blockRead/socket", readSocket},
        {"blockRead/hislip", [&] { read(hislip); }},
    };
    for (std::size_t round = 0; round <= rounds; ++round)
        for (const Side &side : sides) {
            const std::vector<double> batch = timeEach(0, 1, side.call);
            if (round > 0) // the first one touches the memory
                measurement.add(side.name, batch);
        }
    expect(std::memcmp(answer.data(), "#867108864x", 11) == 0 && answer.back() == '\n',
           "not the block that was written");
}

} // namespace

int main(int argc, char **argv)
{
    // Both ends on one core: unpinned round trips are bimodal, by where the scheduler puts the two processes.
    runOn(0);
    const BenchSimulator simulator;
    ::setenv("KYVISA_PORTMAPPER_PORT", std::to_string(simulator.portmapperPort()).c_str(), 1);
    Measurement measurement;
    measureQueries(measurement, simulator, numberOption(argc, argv, "--rounds", 200));
    measureBlocks(measurement, simulator, numberOption(argc, argv, "--block-rounds", 15));
    measurement.print();
    return 0;
}
