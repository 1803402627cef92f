#pragma once

#include "log/FastBuffer.h"

#include <QObject>

#include <atomic>

class Log;
class MessageQueue;
class StringMessageQueue;

/**
 * What VISA calls, tests and callbacks write to. Numbers each line and passes it to the live view's ring and the log
 * file's queue, as the two switches say. Any thread may emit; emitting allocates nothing and touches no file.
 */
class SessionLog : public QObject
{
    Q_OBJECT

public:
    SessionLog(Log *log, QObject *parent);
    ~SessionLog() override;

    /// True when somebody will see a line: callers build no text otherwise.
    bool isLogging() const;

    /// Emits a VISA line. It takes a number even when both switches are off. Waits while the file queue is full.
    void emitWriteMessage(FastBuffer *line);
    /// Emits free text, which the live view always gets.
    void forceEmitWriteMessage(FastBuffer *line);

public slots:
    void showLog(bool value);
    void writeLogFile(bool value);

private:
    StringMessageQueue *m_messageQueue;
    MessageQueue *m_fileMessageQueue;
    std::atomic<bool> m_showLog{false};
    std::atomic<bool> m_writeLogFile{false};
    Log *m_log; ///< not owned
};
