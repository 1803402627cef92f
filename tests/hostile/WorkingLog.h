#pragma once

#include "log/Log.h"
#include "log/LogFile.h"
#include "log/SessionLog.h"

#include <QFile>

#include <chrono>
#include <cstdio>
#include <memory>
#include <pthread.h>
#include <stdexcept>
#include <string>
#include <thread>

namespace hostile
{

inline void require(bool condition, const std::string &what)
{
    if (!condition)
        throw std::runtime_error(what);
}

/// What a session worker has for its log, with the writer thread running.
class WorkingLog
{
public:
    WorkingLog()
    {
        m_sessionLog.showLog(true);
        m_sessionLog.writeLogFile(true);
        require(pthread_create(&m_writer, nullptr, ThreadForFileLog, m_log.get()) == 0, "no thread");
    }
    ~WorkingLog()
    {
        m_log->stop();
        pthread_join(m_writer, nullptr);
    }
    WorkingLog(const WorkingLog &) = delete;
    WorkingLog &operator=(const WorkingLog &) = delete;

    LogFile &file() { return m_file; }

    void emitLine(const std::string &text)
    {
        FastBuffer line{};
        std::snprintf(line.text, FastBuffer::TextSize, "%s", text.c_str());
        m_sessionLog.emitWriteMessage(&line);
    }
    /// As two threads of the tester do.
    void emitMany(int lines)
    {
        const auto some = [=, this] {
            for (int i = 0; i < lines / 2; ++i)
                emitLine("a line like many others " + std::to_string(i));
        };
        std::thread other(some);
        some();
        other.join();
    }
    /// Emits @p marker until it stands in the current file. How often that was.
    int awaitInFile(const std::string &marker)
    {
        constexpr std::chrono::seconds Patience{120};
        const auto end = std::chrono::steady_clock::now() + Patience;
        for (int times = 1; std::chrono::steady_clock::now() < end; ++times) {
            emitLine(marker);
            std::this_thread::sleep_for(std::chrono::milliseconds(10));
            QFile file(m_file.getCurrentFileName());
            if (file.open(QIODevice::ReadOnly) && file.readAll().contains(marker.c_str()))
                return times;
        }
        throw std::runtime_error("the log does not come back: " + marker);
    }

private:
    LogFile m_file{nullptr};
    std::unique_ptr<Log> m_log = std::make_unique<Log>(&m_file); // large: not on the stack
    SessionLog m_sessionLog{m_log.get(), nullptr};
    pthread_t m_writer{};
};

} // namespace hostile
