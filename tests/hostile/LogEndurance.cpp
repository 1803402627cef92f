// The tester's log at full speed: two threads emit as fast as they can, the writer writes and flushes every line, the file changes again and
// again. No line may be lost, doubled or broken, and memory must stay as it is.
// Usage: log-endurance FOLDER SECONDS [RECORD_FILE]
#include "hostile/WorkingLog.h"
#include "support/ProcessFigures.h"

#include <QDateTime>

#include <array>
#include <atomic>
#include <fstream>
#include <iostream>
#include <sstream>
#include <unistd.h>

using namespace hostile;

namespace
{

constexpr std::size_t AllowedGrowth = 8 * 1024; // KiB
constexpr std::chrono::milliseconds BetweenFiles{500};

#ifdef __SANITIZE_ADDRESS__
constexpr bool FreedMemoryIsKept = true;
#else
constexpr bool FreedMemoryIsKept = false;
#endif

/// What stood in the files so far: the lines of each thread in their order, each once.
struct Found {
    std::array<long, 2> next{};
    long markers = 0;
    long lines = 0;

    /// Reads a file and removes it.
    void take(const QString &path)
    {
        QFile file(path);
        require(file.open(QIODevice::ReadOnly), "a log file cannot be read");
        while (!file.atEnd()) {
            const QByteArray line = file.readLine();
            const QList<QByteArray> fields = line.split('\t');
            require(fields.size() == 4 && line.endsWith(" nsec\n"), "a broken line: " + line.toStdString());
            ++lines;
            if (fields[2] == "marker") {
                ++markers;
                continue;
            }
            const QList<QByteArray> words = fields[2].split(' ');
            const int thread = words[0].toInt();
            require(words.size() == 2 && (thread == 0 || thread == 1), "another line: " + line.toStdString());
            require(words[1].toLong() == next.at(static_cast<std::size_t>(thread))++,
                    "a line is lost or doubled: " + line.toStdString());
        }
        file.close();
        require(file.remove(), "a log file stays");
    }
};

std::string now()
{
    return QDateTime::currentDateTimeUtc().toString(Qt::ISODate).toStdString();
}

void run(const QString &folder, int seconds, const char *recordFile)
{
    const std::string begun = now();
    WorkingLog log;
    Found found;
    std::atomic<bool> stop{false};
    std::array<long, 2> emitted{};
    const auto emitLines = [&](std::size_t thread) {
        for (; !stop; ++emitted.at(thread))
            log.emitLine(std::to_string(thread) + " " + std::to_string(emitted.at(thread)));
    };
    int files = 0;
    const auto nextFile = [&] {
        const QString before = log.file().getCurrentFileName();
        require(log.file().createNewFile(folder + "/" + QString::number(files++)), "no new log file");
        if (!before.isEmpty() && QFile::exists(before))
            found.take(before);
    };
    nextFile();
    std::thread first(emitLines, 0);
    std::thread second(emitLines, 1);
    const auto start = std::chrono::steady_clock::now();
    test::ProcessFigures warm;
    std::string trouble;
    try {
        while (std::chrono::steady_clock::now() - start < std::chrono::seconds(seconds)) {
            std::this_thread::sleep_for(BetweenFiles);
            nextFile();
            if (warm.memory == 0 && std::chrono::steady_clock::now() - start >= std::chrono::seconds(seconds) / 3)
                warm = test::figuresOf(::getpid());
        }
    } catch (const std::exception &error) {
        trouble = error.what();
    }
    stop = true;
    first.join();
    second.join();
    require(trouble.empty(), trouble);
    const int markers = log.awaitInFile("marker");
    const test::ProcessFigures end = test::figuresOf(::getpid());
    // The last markers may still be on their way.
    nextFile();
    const long later = markers - found.markers;
    require(later >= 0, "a marker is doubled");
    require(found.next == emitted, "lines are lost: " + std::to_string(emitted[0] + emitted[1]) + " were emitted, " +
                                       std::to_string(found.next[0] + found.next[1]) + " found");
    require(FreedMemoryIsKept || end.memory <= warm.memory + AllowedGrowth, "memory grew");

    std::ostringstream record;
    record << "log-endurance " << seconds << " | start " << begun << " | end " << now() << " | lines " << found.lines
           << " in " << files << " files | memory KiB after warm-up " << warm.memory << ", at the end " << end.memory
           << ", peak " << end.peakMemory << " | descriptors after warm-up " << warm.descriptors << ", at the end "
           << end.descriptors;
    std::cout << record.str() << std::endl;
    if (recordFile)
        std::ofstream(recordFile, std::ios::app) << record.str() << '\n';
}

} // namespace

int main(int argc, char **argv)
{
    const int seconds = argc >= 3 ? std::atoi(argv[2]) : 0;
    if (seconds < 1 || argc > 4) {
        std::fprintf(stderr, "usage: log-endurance FOLDER SECONDS [RECORD_FILE]\n");
        return 2;
    }
    try {
        run(QFile::decodeName(argv[1]), seconds, argc == 4 ? argv[3] : nullptr);
    } catch (const std::exception &error) {
        std::fprintf(stderr, "log-endurance: %s\n", error.what());
        return 1;
    }
    return 0;
}
