// What logging costs the thread that emits: one logged call above the bare library call, and one line into both sinks against
// spdlog's asynchronous logger. Bursts stay below the queues' sizes; the writer runs on the other core and flushes each line.
//
//     bench-log [--rounds N]

#include "bench/Measurement.h"
#include "log/Log.h"
#include "log/LogFile.h"
#include "log/SessionLog.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <spdlog/async.h>
#include <spdlog/async_logger.h>
#include <spdlog/sinks/basic_file_sink.h>
#include <spdlog/sinks/ringbuffer_sink.h>
#include <spdlog/spdlog.h>

#include <QElapsedTimer>
#include <QFile>
#include <QTemporaryDir>

#include <array>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <memory>
#include <new>
#include <string>
#include <thread>
#include <vector>

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

constexpr std::size_t SlicesOfABurst = 80;
constexpr int CallsOfASlice = 100; // a burst stays below the 16383 lines that the file queue holds
constexpr const char *Text = "viWrite(vi= 2,buf= \"*IDN?\\n\",cnt= 6,retCnt= 6)";

/// Log, log file and writer thread as a session worker has them.
class Logging
{
public:
    Logging()
        : m_file(std::make_unique<LogFile>(nullptr)), m_log(std::make_unique<Log>(m_file.get())),
          m_front(m_log.get(), nullptr)
    {
        m_writer = std::thread([this] {
            bench::runOn(1);
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

template <typename Value>
void keep(Value &&value)
{
    asm volatile("" : : "r,m"(value) : "memory"); // the optimiser must not drop what computed it
}

/// One burst of calls: nanoseconds a call, averaged over slices of it, and how many allocations all of them made.
struct Burst {
    std::vector<double> slices;
    std::uint64_t allocations;
};

template <typename Call>
Burst burst(Call call)
{
    const std::uint64_t before = allocations;
    std::array<double, SlicesOfABurst> slices;
    auto start = std::chrono::steady_clock::now();
    for (double &slice : slices) {
        for (int i = 0; i < CallsOfASlice; ++i)
            call();
        const auto end = std::chrono::steady_clock::now();
        slice = std::chrono::duration<double, std::nano>(end - start).count() / CallsOfASlice;
        start = end;
    }
    const std::uint64_t allocated = allocations - before;
    return {{slices.begin(), slices.end()}, allocated};
}

struct Side {
    const char *name;
    std::function<Burst()> burst;
    std::function<void()> drain; ///< the pause in which the writer catches up does not count
};

std::shared_ptr<spdlog::async_logger> makeSpdlogger(const QString &folder)
{
    spdlog::init_thread_pool(16384, 1, [] { bench::runOn(1); });
    const spdlog::sinks_init_list sinks{
        std::make_shared<spdlog::sinks::basic_file_sink_mt>((folder + "/spdlog.txt").toStdString()),
        std::make_shared<spdlog::sinks::ringbuffer_sink_mt>(8192)};
    auto logger = std::make_shared<spdlog::async_logger>("bench", sinks, spdlog::thread_pool(),
                                                         spdlog::async_overflow_policy::block);
    logger->flush_on(spdlog::level::info); // each line is flushed, as in the log file
    return logger;
}

/// The queue is empty when the flush that was put behind the burst has been carried out.
void drain(spdlog::async_logger &logger)
{
    logger.flush();
    while (spdlog::thread_pool()->queue_size() > 0)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

void measure(bench::Measurement &measurement, Logging &logging, spdlog::async_logger &spdlogger, std::size_t rounds)
{
    VisaSessionWithLog session(logging.front());
    session.open(const_cast<char *>("TCPIP::localhost::hislip0"), 0, 2000);
    QElapsedTimer timer;
    ViUInt32 written = 0;
    FastBuffer line{};
    std::strncpy(line.text, Text, sizeof line.text - 1);
    line.status = VI_SUCCESS;
    line.duration = 15230;
    const std::string_view text = Text;

    const auto nothing = [] {};
    const auto drained = [&] { logging.drain(); };
    const Side sides[] = {
        {"bareCall",
         [&] {
             return burst([&] {
                 viWrite(2, reinterpret_cast<ViConstBuf>("*IDN?\n"), 6, &written);
                 keep(written);
             });
         },
         nothing},
        {"twoClockReadings",
         [&] {
             return burst([&] {
                 timer.restart();
                 keep(timer.nsecsElapsed());
             });
         },
         nothing},
        {"loggedCall/off", [&] { return burst([&] { keep(session.write("*IDN?\n", 6)); }); }, nothing},
        {"loggedCall/bothSinks",
         [&] {
             logging.sinks(true);
             const Burst result = burst([&] { keep(session.write("*IDN?\n", 6)); });
             logging.sinks(false);
             return result;
         },
         drained},
        {"oneLine",
         [&] {
             logging.sinks(true);
             const Burst result = burst([&] { logging.front()->emitWriteMessage(&line); });
             logging.sinks(false);
             return result;
         },
         drained},
        {"spdlogLine", [&] { return burst([&] { spdlogger.info(spdlog::string_view_t(text.data(), text.size())); }); },
         [&] { drain(spdlogger); }},
    };
    std::uint64_t allocated = 0;
    for (std::size_t round = 0; round <= rounds; ++round)
        for (const Side &side : sides) {
            const Burst result = side.burst();
            side.drain();
            if (round == 0) // touches the memory
                continue;
            measurement.add(side.name, result.slices);
            if (std::string_view(side.name) == "oneLine")
                allocated += result.allocations;
        }
    measurement.setValue("allocationsOfALine",
                         static_cast<double>(allocated) / static_cast<double>(rounds * SlicesOfABurst * CallsOfASlice));
}

} // namespace

int main(int argc, char **argv)
{
    QTemporaryDir home;
    qputenv("HOME", home.path().toLocal8Bit());
    bench::runOn(0);
    bench::Measurement measurement;
    {
        Logging logging;
        auto spdlogger = makeSpdlogger(home.path());
        measure(measurement, logging, *spdlogger, bench::numberOption(argc, argv, "--rounds", 100));
    }
    spdlog::shutdown();
    measurement.print();
    return 0;
}
