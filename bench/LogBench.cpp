// What logging costs the thread that emits: one logged call above the bare library call, and one line into both sinks against
// spdlog's asynchronous logger. Bursts stay below the queues' sizes; the writer runs on the other core and flushes each line.

#include "log/Log.h"
#include "log/LogFile.h"
#include "log/SessionLog.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <benchmark/benchmark.h>

#include <spdlog/async.h>
#include <spdlog/async_logger.h>
#include <spdlog/sinks/basic_file_sink.h>
#include <spdlog/sinks/ringbuffer_sink.h>
#include <spdlog/spdlog.h>

#include <QElapsedTimer>
#include <QFile>
#include <QTemporaryDir>

#include <pthread.h>
#include <sched.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <string>
#include <thread>

namespace
{

thread_local std::uint64_t allocations = 0;

} // namespace

void *operator new(std::size_t size)
{
    ++allocations;
    if (void *memory = std::malloc(size))
        return memory;
    throw std::bad_alloc();
}

void operator delete(void *memory) noexcept
{
    std::free(memory);
}

void operator delete(void *memory, std::size_t) noexcept
{
    std::free(memory);
}

namespace
{

constexpr int Burst = 8000; // below the 16383 lines that the file queue holds
constexpr const char *Text = "viWrite(vi= 2,buf= \"*IDN?\\n\",cnt= 6,retCnt= 6)";

void runOn(int core)
{
    cpu_set_t cores;
    CPU_ZERO(&cores);
    CPU_SET(core, &cores);
    sched_setaffinity(0, sizeof cores, &cores); // refused on a machine with one core: both sides share it then
}

/// Log, log file and writer thread as a session worker has them.
class Logging
{
public:
    Logging()
        : m_file(std::make_unique<LogFile>(nullptr)), m_log(std::make_unique<Log>(m_file.get())),
          m_front(m_log.get(), nullptr)
    {
        m_writer = std::thread([this] {
            runOn(1);
            ThreadForFileLog(m_log.get());
        });
    }

    ~Logging()
    {
        m_log->stop();
        m_writer.join();
    }

    void sinks(bool both)
    {
        m_front.showLog(both);
        m_front.writeLogFile(both);
    }

    /// Waits until the last line emitted stands in the file.
    void drain() const
    {
        const QByteArray last = QByteArray::number(static_cast<qulonglong>(Log::s_line.load()));
        QFile file(m_file->getCurrentFileName());
        if (!file.open(QIODevice::ReadOnly))
            std::abort();
        for (;;) {
            file.seek(std::max<qint64>(0, file.size() - 400));
            const QByteArray tail = file.readAll();
            if (tail.endsWith('\n') && tail.contains('\n' + last + '\t'))
                return;
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
    }

    SessionLog *front() { return &m_front; }

private:
    std::unique_ptr<LogFile> m_file;
    std::unique_ptr<Log> m_log;
    SessionLog m_front;
    std::thread m_writer;
};

Logging *logging = nullptr;

/// Times bursts of calls by hand: the pause between two of them, in which the writer catches up, does not count.
template <typename Call, typename Pause>
void bursts(benchmark::State &state, Call call, Pause pause)
{
    std::uint64_t allocated = 0;
    for (auto _ : state) {
        const std::uint64_t before = allocations;
        const auto start = std::chrono::steady_clock::now();
        for (int i = 0; i < Burst; ++i)
            call();
        const std::chrono::duration<double> elapsed = std::chrono::steady_clock::now() - start;
        allocated += allocations - before;
        state.SetIterationTime(elapsed.count() / Burst);
        pause();
    }
    state.counters["allocations"] = static_cast<double>(allocated) / (static_cast<double>(state.iterations()) * Burst);
}

void bareCall(benchmark::State &state)
{
    ViUInt32 written = 0;
    bursts(
        state,
        [&] {
            viWrite(2, reinterpret_cast<ViConstBuf>("*IDN?\n"), 6, &written);
            benchmark::DoNotOptimize(written);
        },
        [] {});
}

void twoClockReadings(benchmark::State &state)
{
    QElapsedTimer timer;
    bursts(
        state,
        [&] {
            timer.restart();
            benchmark::DoNotOptimize(timer.nsecsElapsed());
        },
        [] {});
}

void loggedCall(benchmark::State &state, bool bothSinks)
{
    VisaSessionWithLog session(logging->front());
    session.open(const_cast<char *>("TCPIP::localhost::hislip0"), 0, 2000);
    logging->sinks(bothSinks);
    bursts(
        state, [&] { benchmark::DoNotOptimize(session.write("*IDN?\n", 6)); },
        [&] {
            if (bothSinks)
                logging->drain();
        });
    logging->sinks(false);
}

void oneLine(benchmark::State &state)
{
    logging->sinks(true);
    FastBuffer line;
    std::strncpy(line.text, Text, sizeof line.text);
    line.status = VI_SUCCESS;
    line.duration = 15230;
    bursts(
        state, [&] { logging->front()->emitWriteMessage(&line); }, [] { logging->drain(); });
    logging->sinks(false);
}

std::shared_ptr<spdlog::async_logger> spdlogger;

void spdlogLine(benchmark::State &state)
{
    const std::string_view text = Text;
    bursts(
        state, [&] { spdlogger->info(spdlog::string_view_t(text.data(), text.size())); },
        [] {
            // The queue is empty when the flush that was put behind the burst has been carried out.
            spdlogger->flush();
            while (spdlog::thread_pool()->queue_size() > 0)
                std::this_thread::sleep_for(std::chrono::milliseconds(1));
        });
}

} // namespace

BENCHMARK(bareCall)->UseManualTime()->Iterations(20);
BENCHMARK(twoClockReadings)->UseManualTime()->Iterations(20);
BENCHMARK_CAPTURE(loggedCall, off, false)->UseManualTime()->Iterations(20);
BENCHMARK_CAPTURE(loggedCall, bothSinks, true)->UseManualTime()->Iterations(20);
BENCHMARK(oneLine)->UseManualTime()->Iterations(20);
BENCHMARK(spdlogLine)->UseManualTime()->Iterations(20);

int main(int argc, char **argv)
{
    QTemporaryDir home;
    qputenv("HOME", home.path().toLocal8Bit());
    runOn(0);

    spdlog::init_thread_pool(16384, 1, [] { runOn(1); });
    const spdlog::sinks_init_list sinks{
        std::make_shared<spdlog::sinks::basic_file_sink_mt>((home.path() + "/spdlog.txt").toStdString()),
        std::make_shared<spdlog::sinks::ringbuffer_sink_mt>(8192)};
    spdlogger = std::make_shared<spdlog::async_logger>("bench", sinks, spdlog::thread_pool(),
                                                       spdlog::async_overflow_policy::block);
    spdlogger->flush_on(spdlog::level::info); // each line is flushed, as in the log file

    Logging sessionLogging;
    logging = &sessionLogging;
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv))
        return 2;
    benchmark::RunSpecifiedBenchmarks();
    spdlogger.reset();
    spdlog::shutdown();
    return 0;
}
