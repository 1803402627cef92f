#include "log/Log.h"

#include "log/LogFile.h"

std::atomic<std::uint64_t> Log::s_line{0};

Log::Log(LogFile *file) : m_logFile(file) {}

std::uint64_t Log::getNewLine()
{
    s_line.fetch_add(1);
    return s_line.load();
}

void Log::doWork()
{
    FastBuffer line;
    while (m_fileMessageQueue.pop(line)) {
        if (m_logFile)
            m_logFile->writeData(line);
    }
}

void Log::stop()
{
    m_fileMessageQueue.stop();
}

void *ThreadForFileLog(void *log)
{
    static_cast<Log *>(log)->doWork();
    return nullptr;
}
