#pragma once

#include "log/MessageQueue.h"
#include "log/StringMessageQueue.h"

#include <atomic>
#include <cstdint>

class LogFile;

/**
 * The log of one session worker: the ring of the live view, the queue of the log file, and the process-wide line
 * counter.
 *
 * doWork() runs on a thread of its own (ThreadForFileLog) and writes what the queue delivers until stop() is called.
 */
class Log
{
public:
    explicit Log(LogFile *file);

    StringMessageQueue *getMessageQueue() { return &m_messageQueue; }
    MessageQueue *getFileMessageQueue() { return &m_fileMessageQueue; }

    /// Takes the next line number. Two threads that emit at the same instant may get the same one.
    static std::uint64_t getNewLine();

    void doWork();
    void stop();

    static std::atomic<std::uint64_t> s_line; ///< number of the last line handed out, by any session

private:
    StringMessageQueue m_messageQueue;
    MessageQueue m_fileMessageQueue;
    LogFile *m_logFile; ///< not owned
};

/// Entry of the POSIX thread that writes the log file; @p log is a Log. Returns null when the log is stopped.
void *ThreadForFileLog(void *log);
