// How cost grows: log lines, open sessions, size of a block, found resources. One series a size, named "what/size", each sample
// the time for all of it.
//
//     bench-growth [--quick]

#include "bench/BenchSimulator.h"
#include "bench/Measurement.h"
#include "bench/VisaClient.h"
#include "log/Log.h"
#include "log/LogFile.h"
#include "log/SessionLog.h"

#include <visa.h>

#include <QFile>
#include <QTemporaryDir>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace
{

using bench::Measurement;
using bench::Protocol;
using bench::timeEach;
using bench::VisaClient;

constexpr int Repetitions = 3;
/// The header of a block has room for nine digits.
constexpr std::array<std::size_t, 7> BlockSizes{1, 32, 1 << 10, 1 << 15, 1 << 20, 1 << 25, 999'999'999};

void repeat(Measurement &measurement, const std::string &series, const std::function<void()> &call)
{
    measurement.add(series, timeEach(0, Repetitions, call));
}

std::string named(const char *what, std::size_t size)
{
    return std::string(what) + '/' + std::to_string(size);
}

/// Emits lines into both sinks and waits until the last one stands in the file.
void measureLines(Measurement &measurement, std::size_t most)
{
    const auto file = std::make_unique<LogFile>(nullptr);
    const auto log = std::make_unique<Log>(file.get());
    SessionLog front(log.get(), nullptr);
    front.showLog(true);
    front.writeLogFile(true);
    std::thread writer([&] {
        bench::runOn(1);
        ThreadForFileLog(log.get());
    });
    QFile written(file->getCurrentFileName());
    if (!written.open(QIODevice::ReadOnly))
        std::abort();
    FastBuffer line{};
    std::snprintf(line.text, sizeof line.text, "viWrite(vi= 2,buf= \"*IDN?\\n\",cnt= 6,retCnt= 6)");
    const auto emitted = [&](std::size_t count) {
        for (std::size_t i = 0; i < count; ++i)
            front.emitWriteMessage(&line);
        const QByteArray last = '\n' + QByteArray::number(static_cast<qulonglong>(Log::s_line.load())) + '\t';
        for (;;) {
            written.seek(std::max<qint64>(0, written.size() - 400));
            const QByteArray tail = '\n' + written.readAll();
            if (tail.endsWith('\n') && tail.contains(last))
                return;
            std::this_thread::yield();
        }
    };
    emitted(20000); // touches the memory
    for (std::size_t count = 1; count <= most; count *= 10)
        repeat(measurement, named("lines", count), [&] { emitted(count); });
    log->stop();
    writer.join();
}

void measureSessions(Measurement &measurement, const bench::BenchSimulator &simulator)
{
    // Half of them by each protocol: the simulator closes a session some time after its client did, and takes 100 of each.
    const auto open = [&](std::size_t number) {
        const Protocol protocol = number % 2 == 0 ? Protocol::Hislip : Protocol::Socket;
        return std::make_unique<VisaClient>(bench::resourceOf(simulator, protocol), protocol);
    };
    std::array<char, 256> answer;
    for (const std::size_t count : {1, 3, 10, 30, 100}) {
        std::vector<std::unique_ptr<VisaClient>> clients;
        repeat(measurement, named("opens", count), [&] {
            clients.clear();
            for (std::size_t i = 0; i < count; ++i)
                clients.push_back(open(i));
        });
        // Each sample is a query on the next session; on a busy machine no hundred in a row would be left alone.
        std::size_t next = 0;
        std::vector<double> samples =
            timeEach(count, 2000, [&] { clients[next++ % count]->query(answer.data(), answer.size()); });
        std::nth_element(samples.begin(), samples.begin() + 1000, samples.end());
        measurement.add(named("sessions", count), {samples[1000] * static_cast<double>(count)});
    }
}

void measureBlocks(Measurement &measurement, const bench::BenchSimulator &simulator, std::size_t most)
{
    VisaClient client(bench::resourceOf(simulator, Protocol::Hislip), Protocol::Hislip);
    for (const std::size_t size : BlockSizes) {
        if (size > most)
            return;
        const std::string digits = std::to_string(size);
        const std::string header = "#" + std::to_string(digits.size()) + digits;
        std::string message = "MMEM:DATA \"growth\"," + header;
        message.append(size, 'x');
        message += '\n';
        std::vector<char> answer(header.size() + size + 1);
        const auto write = [&] {
            client.write(message);
            client.write("*OPC?\n");
            client.readAll(answer.data(), 2);
        };
        const auto read = [&] {
            client.write("MMEM:DATA? \"growth\"\n");
            client.readAll(answer.data(), static_cast<ViUInt32>(answer.size()));
        };
        write(); // touches the memory
        read();
        repeat(measurement, named("blockWrite", size), write);
        repeat(measurement, named("blockRead", size), read);
    }
}

void measureResources(Measurement &measurement, const std::string &folder)
{
    const std::string file = folder + "/kyvisa.ini";
    ::setenv("KYVISA_CONFIG", file.c_str(), 1);
    constexpr std::array Sections{"SOCKET-RSRCS", "HISLIP-RSRCS", "KYVXI11-RSRCS"}; // a section holds 4,096 at most
    for (std::size_t count = 1; count <= 10000; count *= 10) {
        std::ofstream settings(file);
        for (std::size_t i = 0, section = 0; i < count; ++i) {
            if (i % ((count + Sections.size() - 1) / Sections.size()) == 0)
                settings << '[' << Sections.at(section++) << "]\n";
            settings << "Name" << i << " = \"TCPIP::10." << i / 65536 << '.' << i / 256 % 256 << '.' << i % 256
                     << "::5025::SOCKET\"\n";
        }
        settings.close();
        repeat(measurement, named("resources", count), [&] {
            ViSession manager = VI_NULL;
            ViFindList list = VI_NULL;
            ViUInt32 found = 0;
            std::array<ViChar, 256> name{};
            viOpenDefaultRM(&manager);
            viSetAttribute(manager, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 0); // the list alone, not the network
            ViStatus status = viFindRsrc(manager, "TCPIP?*SOCKET", &list, &found, name.data());
            for (ViUInt32 i = 1; i < found && status >= VI_SUCCESS; ++i)
                status = viFindNext(list, name.data());
            viClose(manager);
            if (status < VI_SUCCESS || found != count) {
                std::fprintf(stderr, "%u of %zu resources were found, status 0x%08X\n", found, count,
                             static_cast<unsigned>(status));
                std::exit(1);
            }
        });
    }
}

} // namespace

int main(int argc, char **argv)
{
    const bool quick = argc > 1 && std::string(argv[1]) == "--quick";
    QTemporaryDir home;
    qputenv("HOME", home.path().toLocal8Bit());
    bench::runOn(0);
    const bench::BenchSimulator simulator;
    Measurement measurement;
    measureLines(measurement, quick ? 100000 : 1000000);
    measureSessions(measurement, simulator);
    measureBlocks(measurement, simulator, quick ? BlockSizes[5] : BlockSizes.back());
    measureResources(measurement, home.path().toStdString());
    measurement.print();
    return 0;
}
