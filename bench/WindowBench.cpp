// How much of one core the window's thread takes while the log is busy, everything but that thread on the other core:
//
//     log       20,000 lines a second go straight into the log that the live view shows
//     test      a logged session asks *IDN? as fast as the simulator answers, as an instrument test does
//     pipeline  the whole program's window: requests go through the pipeline as fast as it takes them, results come back
//
//     bench-window [--seconds N]

#include "app/MainWindow.h"
#include "app/SessionInstanceTab.h"
#include "bench/BenchSimulator.h"
#include "bench/Measurement.h"
#include "bench/VisaClient.h"
#include "log/Log.h"
#include "log/LogFile.h"
#include "log/LogTextDisplay.h"
#include "log/SessionLog.h"
#include "pipeline/VisaFunctionCallHandler.h"
#include "pipeline/VisaFunctionCallListener.h"
#include "visa/VisaSessionWithLog.h"

#include <QApplication>
#include <QCheckBox>
#include <QTemporaryDir>
#include <QTimer>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <functional>
#include <memory>
#include <string>
#include <thread>

namespace
{

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

constexpr int LinesOfAStep = 20;
constexpr auto Step = 1ms; // so 20,000 a second
const QSize WindowSize(1200, 800);

double threadSeconds()
{
    std::timespec time{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

/// Lets the event loop run, and sets what share of the time its thread worked and how many lines came.
void watch(bench::Measurement &measurement, const std::string &name, std::chrono::milliseconds span)
{
    const auto run = [](std::chrono::milliseconds time) {
        QTimer::singleShot(time, Qt::PreciseTimer, qApp, &QCoreApplication::quit);
        QApplication::exec();
    };
    run(500ms); // the first lines build the table
    const std::uint64_t lines = Log::s_line.load();
    const double worked = threadSeconds();
    const auto begin = Clock::now();
    run(span);
    const double seconds = std::chrono::duration<double>(Clock::now() - begin).count();
    measurement.setValue(name + "/share", (threadSeconds() - worked) / seconds);
    measurement.setValue(name + "/linesASecond", static_cast<double>(Log::s_line.load() - lines) / seconds);
}

/// The live view with a log of its own behind it, as in a session tab, and a thread that fills the log. The rings make it large: it
/// lives on the heap.
class BusyLog
{
public:
    using Fill = std::function<void(SessionLog &, const std::atomic<bool> &stop)>;

    explicit BusyLog(const Fill &fill) : m_log(&m_file), m_front(&m_log, nullptr)
    {
        m_front.showLog(true);
        m_front.writeLogFile(true);
        m_writer = std::thread([this] {
            bench::runOn(1);
            ThreadForFileLog(&m_log);
        });
        m_filler = std::thread([this, fill] {
            bench::runOn(1);
            fill(m_front, m_stop);
        });
        m_view.resize(WindowSize);
        m_view.setQueue(m_log.getMessageQueue());
        m_view.show();
    }

    ~BusyLog()
    {
        m_stop = true;
        m_filler.join();
        m_log.stop();
        m_writer.join();
    }

private:
    LogFile m_file{nullptr};
    Log m_log;
    SessionLog m_front;
    LogTextDisplay m_view{nullptr, nullptr};
    std::atomic<bool> m_stop{false};
    std::thread m_writer;
    std::thread m_filler;
};

void linesBySchedule(SessionLog &log, const std::atomic<bool> &stop)
{
    auto next = Clock::now();
    for (std::uint64_t call = 0; !stop; ++call) {
        for (int i = 0; i < LinesOfAStep; ++i) {
            FastBuffer line{};
            std::snprintf(line.text, sizeof line.text, "viWrite(vi= 2,buf= \"SOUR:VOLT %llu\\n\",cnt= 16,retCnt= 16)",
                          static_cast<unsigned long long>(call));
            line.status = i == 0 ? -1073807339 : 0; // a time-out now and then
            line.duration = 15000 + call % 1000;
            log.emitWriteMessage(&line);
        }
        next += Step;
        std::this_thread::sleep_until(next);
    }
}

void queriesAtFullSpeed(SessionLog &log, const std::atomic<bool> &stop, std::string resource)
{
    VisaSessionWithLog session(&log);
    session.open(resource.data(), 0, 5000);
    char answer[256];
    while (!stop)
        session.query("*IDN?\n", 6, answer, sizeof answer);
}

/// Keeps the pipeline filled: each result is the reason for the next request.
class Requests : public VisaFunctionCallListener
{
public:
    static constexpr int Outstanding = 64;

    Requests(VisaFunctionCallHandler *handler, const std::string &resource)
        : VisaFunctionCallListener(handler, VisaFunctionCallTyp::Query)
    {
        _visaFunctionCall open;
        open.type = VisaFunctionCallTyp::Open;
        open.parameter[0].stringValue = resource;
        open.parameter[2].uintValue = 5000;
        sendVisaFunctionCall(open);
        for (int i = 0; i < Outstanding; ++i)
            ask();
    }

    void visaFunctionCallFinished(_visaFunctionCall &call) override
    {
        if (call.status < 0) {
            std::fprintf(stderr, "a query failed: 0x%08X\n", static_cast<unsigned>(call.status));
            std::exit(1);
        }
        ++m_answers;
        ask();
    }

    std::uint64_t answers() const { return m_answers; }

private:
    void ask()
    {
        _visaFunctionCall query;
        query.type = VisaFunctionCallTyp::Query;
        query.parameter[0].stringValue = "*IDN?\n";
        query.parameter[1].uintValue = 256;
        sendVisaFunctionCall(query);
    }

    std::uint64_t m_answers = 0;
};

} // namespace

int main(int argc, char **argv)
{
    QTemporaryDir home;
    for (const char *variable : {"HOME", "XDG_CONFIG_HOME", "XDG_DATA_HOME", "XDG_CACHE_HOME"})
        qputenv(variable, home.path().toLocal8Bit());
    const std::chrono::milliseconds span = std::chrono::seconds(bench::numberOption(argc, argv, "--seconds", 10));
    bench::runOn(1);
    const bench::BenchSimulator simulator;
    const std::string resource = bench::resourceOf(simulator, bench::Protocol::Hislip);
    const QApplication application(argc, argv);
    QApplication::setApplicationName(QStringLiteral("bench-window"));
    bench::Measurement measurement;
    {
        const auto log = std::make_unique<BusyLog>(linesBySchedule);
        bench::runOn(0);
        watch(measurement, "log", span);
    }
    {
        const auto log = std::make_unique<BusyLog>(
            [&](SessionLog &front, const std::atomic<bool> &stop) { queriesAtFullSpeed(front, stop, resource); });
        watch(measurement, "test", span);
    }
    {
        bench::runOn(1); // the threads that the window starts stay there
        MainWindow window(nullptr);
        bench::runOn(0);
        window.resize(WindowSize);
        window.show();
        auto *session = window.findChild<SessionInstanceTab *>();
        const Requests requests(session->getVisaFunctionCallHandler(), resource);
        watch(measurement, "pipeline", span);
        measurement.setValue("pipeline/answers", static_cast<double>(requests.answers()));
    }
    measurement.print();
    return 0;
}
