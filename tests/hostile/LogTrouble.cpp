// The tester's log, its writer thread at work, when its disk, its folder or its permission goes away in the middle.
//   log-trouble full FOLDER         FOLDER is on a file system with less room than the lines need
//   log-trouble removed FOLDER      the folder goes
//   log-trouble forbidden FOLDER    nobody may enter or write the folder any more; as root it becomes nobody first
// Status 1 and a sentence when something is wrong. A hang is for the caller to see.
#include "hostile/WorkingLog.h"

#include <QDir>
#include <QFile>

#include <cstdio>
#include <cstring>
#include <grp.h>
#include <stdexcept>
#include <string>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>

using namespace hostile;

namespace
{

constexpr int Lines = 5000;

void requireWholeLines(const QString &path)
{
    QFile file(path);
    require(file.open(QIODevice::ReadOnly), "the log file cannot be read");
    int broken = 0;
    while (!file.atEnd()) {
        const QByteArray line = file.readLine();
        broken += line.count('\t') == 3 && line.endsWith(" nsec\n") ? 0 : 1;
    }
    require(broken == 0, std::to_string(broken) + " broken lines");
}

void full(const QString &folder)
{
    WorkingLog log;
    log.file().setCurrentStandardDir(folder);
    const QString path = log.file().getCurrentFileName();
    require(!path.isEmpty(), "no log file at the beginning");
    QFile filler(folder + "/filler");
    require(filler.open(QIODevice::WriteOnly | QIODevice::Unbuffered), "no filler");
    const QByteArray page(4096, 'f');
    while (filler.write(page) == page.size()) {
    }
    filler.close();
    log.emitMany(Lines);
    require(log.file().getCurrentFileName() == path, "another file while the disk is full");
    require(QFile::remove(folder + "/filler"), "the filler stays");
    log.awaitInFile("there is room again");
    requireWholeLines(path);
    require(QFile(path).size() > 0, "nothing was written");
}

void removed(const QString &folder)
{
    WorkingLog log;
    log.file().setCurrentStandardDir(folder + "/first");
    require(QDir().mkpath(folder + "/first"), "no folder");
    log.file().setCurrentStandardDir(folder + "/first");
    log.awaitInFile("before");
    std::thread busy([&] { log.emitMany(Lines); });
    const bool gone = QDir(folder + "/first").removeRecursively();
    busy.join();
    require(gone, "the folder does not go");
    require(log.file().getCurrentFileName().isEmpty(), "a file that is not there");
    require(!log.file().createNewFile(folder + "/first/new.txt"), "a file in a folder that is not there");
    log.emitMany(Lines);
    require(QDir().mkpath(folder + "/second"), "no second folder");
    log.file().setCurrentStandardDir(folder + "/second");
    log.awaitInFile("after");
    requireWholeLines(log.file().getCurrentFileName());
}

void forbidden(const QString &folder)
{
    constexpr unsigned Nobody = 65534;
    if (::geteuid() == 0) // root may do everything
        require(::setgroups(0, nullptr) == 0 && ::setgid(Nobody) == 0 && ::setuid(Nobody) == 0, "root stays root");
    WorkingLog log;
    log.file().setCurrentStandardDir(folder);
    log.awaitInFile("before");
    const QString path = log.file().getCurrentFileName();
    std::thread busy([&] { log.emitMany(Lines); });
    const bool closed = ::chmod(QFile::encodeName(folder).constData(), 0) == 0;
    busy.join();
    require(closed, "the folder stays open");
    require(!log.file().createNewFile(folder + "/new.txt"), "a file in a forbidden folder");
    log.emitMany(Lines);
    require(::chmod(QFile::encodeName(folder).constData(), 0700) == 0, "the folder stays closed");
    log.file().setCurrentStandardDir(folder);
    log.awaitInFile("after");
    requireWholeLines(log.file().getCurrentFileName());
    requireWholeLines(path);
}

} // namespace

int main(int argc, char **argv)
{
    if (argc != 3) {
        std::fprintf(stderr, "usage: log-trouble full|removed|forbidden FOLDER\n");
        return 2;
    }
    try {
        const QString folder = QFile::decodeName(argv[2]);
        if (std::strcmp(argv[1], "full") == 0)
            full(folder);
        else if (std::strcmp(argv[1], "removed") == 0)
            removed(folder);
        else if (std::strcmp(argv[1], "forbidden") == 0)
            forbidden(folder);
        else
            throw std::runtime_error("no such trouble");
    } catch (const std::exception &error) {
        std::fprintf(stderr, "log-trouble: %s\n", error.what());
        return 1;
    }
    return 0;
}
