// Queries over raw socket, HiSLIP and VXI-11, blocks over the first two: libkyvisa against bare clients on the same simulator, all on one core.

#include "bench/BareClient.h"
#include "bench/BareVxi11.h"
#include "bench/BenchSimulator.h"

#include <visa.h>

#include <benchmark/benchmark.h>

#include <sched.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

namespace
{

constexpr std::size_t BlockSize = 64u << 20;
const std::string Query = "*IDN?\n";

bench::BenchSimulator *simulator = nullptr;

void must(ViStatus status, const char *what)
{
    if (status < VI_SUCCESS) {
        std::fprintf(stderr, "%s: 0x%08X\n", what, static_cast<unsigned>(status));
        std::exit(1);
    }
}

enum class Protocol { Socket, Hislip, Vxi11 };

std::string resourceOf(Protocol protocol)
{
    switch (protocol) {
    case Protocol::Socket:
        return "TCPIP::127.0.0.1::" + std::to_string(simulator->socketPort()) + "::SOCKET";
    case Protocol::Hislip:
        return "TCPIP::127.0.0.1::hislip0," + std::to_string(simulator->hislipPort()) + "::INSTR";
    case Protocol::Vxi11:
        break;
    }
    return "TCPIP::127.0.0.1::inst0::INSTR";
}

/// A session of libkyvisa on the benchmark's simulator.
class Session
{
public:
    explicit Session(Protocol protocol)
    {
        const std::string resource = resourceOf(protocol);
        must(viOpenDefaultRM(&m_manager), "viOpenDefaultRM");
        must(viOpen(m_manager, resource.c_str(), VI_NO_LOCK, 2000, &m_session), "viOpen");
        must(viSetAttribute(m_session, VI_ATTR_TMO_VALUE, 30000), "time-out");
        if (protocol == Protocol::Socket)
            must(viSetAttribute(m_session, VI_ATTR_TERMCHAR_EN, VI_TRUE), "termination character");
    }

    ~Session() { viClose(m_manager); }

    ViUInt32 query(char *answer, ViUInt32 size)
    {
        ViUInt32 count = 0;
        must(
            viWrite(m_session, reinterpret_cast<ViConstBuf>(Query.data()), static_cast<ViUInt32>(Query.size()), &count),
            "viWrite");
        must(viRead(m_session, reinterpret_cast<ViPBuf>(answer), size, &count), "viRead");
        return count;
    }

    void write(const std::string &message)
    {
        ViUInt32 count = 0;
        must(viWrite(m_session, reinterpret_cast<ViConstBuf>(message.data()), static_cast<ViUInt32>(message.size()),
                     &count),
             "viWrite");
    }

    /// Reads exactly @p size bytes.
    void readAll(char *data, ViUInt32 size)
    {
        ViUInt32 got = 0;
        while (got < size) {
            ViUInt32 count = 0;
            must(viRead(m_session, reinterpret_cast<ViPBuf>(data + got), size - got, &count), "viRead");
            got += count;
        }
    }

    void terminationCharacter(bool enabled)
    {
        must(viSetAttribute(m_session, VI_ATTR_TERMCHAR_EN, enabled ? VI_TRUE : VI_FALSE), "termination character");
    }

private:
    ViSession m_manager = VI_NULL;
    ViSession m_session = VI_NULL;
};

void bareSocketQuery(benchmark::State &state)
{
    bench::BareSocket socket(simulator->socketPort());
    char answer[1024];
    for (auto _ : state)
        benchmark::DoNotOptimize(socket.query(Query, answer, sizeof answer));
    state.SetItemsProcessed(state.iterations());
}

void bareHislipQuery(benchmark::State &state)
{
    bench::BareHislip hislip(simulator->hislipPort());
    char answer[1024];
    for (auto _ : state)
        benchmark::DoNotOptimize(hislip.query(Query, answer, sizeof answer));
    state.SetItemsProcessed(state.iterations());
}

void bareVxi11Query(benchmark::State &state)
{
    bench::BareVxi11 vxi11(simulator->portmapperPort());
    char answer[1024];
    for (auto _ : state)
        benchmark::DoNotOptimize(vxi11.query(Query, answer, sizeof answer));
    state.SetItemsProcessed(state.iterations());
}

void kyvisaQuery(benchmark::State &state, Protocol protocol)
{
    Session session(protocol);
    char answer[1024];
    for (auto _ : state)
        benchmark::DoNotOptimize(session.query(answer, sizeof answer));
    state.SetItemsProcessed(state.iterations());
}

void bareBlockWrite(benchmark::State &state)
{
    bench::BareCopy copy(BlockSize);
    const std::vector<char> data(BlockSize, 'x');
    for (auto _ : state)
        copy.write(data.data());
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * BlockSize));
}

void bareBlockRead(benchmark::State &state)
{
    bench::BareCopy copy(BlockSize);
    std::vector<char> data(BlockSize);
    for (auto _ : state)
        copy.read(data.data());
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * BlockSize));
}

std::string blockMessage()
{
    std::string message = "MMEM:DATA \"bench\",#8" + std::to_string(BlockSize);
    message.append(BlockSize, 'x');
    message += '\n';
    return message;
}

void kyvisaBlockWrite(benchmark::State &state, Protocol protocol)
{
    Session session(protocol);
    const std::string message = blockMessage();
    char answer[8];
    for (auto _ : state) {
        session.write(message);
        // The answer shows that the instrument has taken the block.
        session.write("*OPC?\n");
        session.readAll(answer, 2);
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * BlockSize));
}

void kyvisaBlockRead(benchmark::State &state, Protocol protocol)
{
    Session session(protocol);
    session.write(blockMessage());
    const std::size_t answerSize = 10 + BlockSize + 1; // "#8" and eight digits, the bytes, the line feed
    std::vector<char> answer(answerSize);
    if (protocol == Protocol::Socket)
        session.terminationCharacter(false);
    for (auto _ : state) {
        session.write("MMEM:DATA? \"bench\"\n");
        session.readAll(answer.data(), static_cast<ViUInt32>(answerSize));
    }
    if (std::memcmp(answer.data(), "#867108864x", 11) != 0 || answer.back() != '\n')
        state.SkipWithError("not the block that was written");
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * BlockSize));
}

} // namespace

BENCHMARK(bareSocketQuery)->UseRealTime();
BENCHMARK_CAPTURE(kyvisaQuery, socket, Protocol::Socket)->UseRealTime();
BENCHMARK(bareHislipQuery)->UseRealTime();
BENCHMARK_CAPTURE(kyvisaQuery, hislip, Protocol::Hislip)->UseRealTime();
BENCHMARK(bareVxi11Query)->UseRealTime();
BENCHMARK_CAPTURE(kyvisaQuery, vxi11, Protocol::Vxi11)->UseRealTime();
BENCHMARK(bareBlockWrite)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(kyvisaBlockWrite, socket, Protocol::Socket)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(kyvisaBlockWrite, hislip, Protocol::Hislip)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(bareBlockRead)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(kyvisaBlockRead, socket, Protocol::Socket)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(kyvisaBlockRead, hislip, Protocol::Hislip)->UseRealTime()->Unit(benchmark::kMillisecond);

int main(int argc, char **argv)
{
    // Both ends on one core: unpinned round trips are bimodal, by where the scheduler puts the two processes.
    cpu_set_t cores;
    CPU_ZERO(&cores);
    CPU_SET(0, &cores);
    sched_setaffinity(0, sizeof cores, &cores);

    bench::BenchSimulator onTheSameCore;
    simulator = &onTheSameCore;
    ::setenv("KYVISA_PORTMAPPER_PORT", std::to_string(onTheSameCore.portmapperPort()).c_str(), 1);
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv))
        return 2;
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
