#include "visa/CallBackLog.h"

#include "log/FastBuffer.h"
#include "log/SessionLog.h"
#include "visa/KyVisaNames.h"

#include <condition_variable>
#include <cstdio>
#include <mutex>

namespace
{

// Not held while a line is written: that can take as long as the log file's queue is full.
std::mutex s_mutex;
std::condition_variable s_written;
unsigned s_writing = 0; // callbacks that are writing a line now

/// Counts a callback as writing, from begin() to the end of the object.
class Writing
{
public:
    explicit Writing(std::unique_lock<std::mutex> &lock) : m_lock(lock)
    {
        ++s_writing;
        m_lock.unlock();
    }
    ~Writing()
    {
        m_lock.lock();
        --s_writing;
        s_written.notify_all();
    }
    Writing(const Writing &) = delete;
    Writing &operator=(const Writing &) = delete;

private:
    std::unique_lock<std::mutex> &m_lock;
};

} // namespace

std::unique_ptr<CallBackLog> CallBackLog::s_pcallBackLog;

CallBackLog *CallBackLog::createCallBackLog(SessionLog *log)
{
    const std::lock_guard lock(s_mutex);
    if (!s_pcallBackLog) {
        s_pcallBackLog.reset(new CallBackLog(log));
        if (log != nullptr)
            QObject::connect(log, &QObject::destroyed, [log] { forget(log); });
    }
    return s_pcallBackLog.get();
}

void CallBackLog::forget(const SessionLog *log)
{
    std::unique_lock lock(s_mutex);
    if (!s_pcallBackLog || s_pcallBackLog->m_log != log)
        return;
    s_pcallBackLog.reset();
    s_written.wait(lock, [] { return s_writing == 0; });
}

ViStatus CallBackLog::viEventHandler(ViSession vi, ViEventType type, ViEvent context, void *userHandle)
{
    std::unique_lock lock(s_mutex);
    SessionLog *log = s_pcallBackLog ? s_pcallBackLog->m_log : nullptr;
    if (log == nullptr)
        return 0;
    const Writing writing(lock);
    FastBuffer line;
    std::snprintf(line.text, sizeof line.text, "Callback from Event %s: vi=%u,context=%u,userHandle=%p",
                  KyVisaEventToString(type), vi, context, userHandle);
    line.status = 0;
    line.duration = 0;
    log->forceEmitWriteMessage(&line);
    return 0;
}
