#include "log/SessionLog.h"

#include "log/Log.h"

SessionLog::SessionLog(Log *log, QObject *parent)
    : QObject(parent), m_messageQueue(log->getMessageQueue()), m_fileMessageQueue(log->getFileMessageQueue()),
      m_log(log)
{
}

SessionLog::~SessionLog() = default;

bool SessionLog::isLogging() const
{
    return m_showLog.load(std::memory_order_relaxed) || m_writeLogFile.load(std::memory_order_relaxed);
}

void SessionLog::emitWriteMessage(FastBuffer *line)
{
    line->visaLine = true;
    line->line = Log::getNewLine();
    if (m_showLog.load(std::memory_order_relaxed))
        m_messageQueue->addMessage(line);
    if (m_writeLogFile.load(std::memory_order_relaxed))
        m_fileMessageQueue->push(*line);
}

void SessionLog::forceEmitWriteMessage(FastBuffer *line)
{
    line->visaLine = false;
    line->line = Log::getNewLine();
    m_messageQueue->addMessage(line);
    if (m_writeLogFile.load(std::memory_order_relaxed))
        m_fileMessageQueue->push(*line);
}

void SessionLog::showLog(bool value)
{
    m_showLog.store(value, std::memory_order_relaxed);
}

void SessionLog::writeLogFile(bool value)
{
    m_writeLogFile.store(value, std::memory_order_relaxed);
}
