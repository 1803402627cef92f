#pragma once

#include <visatype.h>

#include <memory>

class SessionLog;

/**
 * Writes one line for each VISA event callback. One per process: the first session's log gets the lines of all
 * sessions, until that log goes away.
 *
 * Callbacks come on threads of the VISA library at any time. forget() waits for one that is writing; after it no
 * callback touches the log. A log that is destroyed is forgotten by itself, but its owner calls forget() first when
 * callbacks may still come.
 */
class CallBackLog
{
public:
    ~CallBackLog() = default;
    CallBackLog(const CallBackLog &) = delete;
    CallBackLog &operator=(const CallBackLog &) = delete;

    /// Creates the instance with @p log, or answers the existing one unchanged.
    static CallBackLog *createCallBackLog(SessionLog *log);
    /// Ends the instance if it writes to @p log: callbacks are silent until another log is given.
    static void forget(const SessionLog *log);

    /// The ViHndlr that the panels install. Runs on threads of the VISA library.
    static ViStatus viEventHandler(ViSession vi, ViEventType type, ViEvent context, void *userHandle);

private:
    explicit CallBackLog(SessionLog *log) : m_log(log) {}

    static std::unique_ptr<CallBackLog> s_pcallBackLog;

    SessionLog *m_log; ///< not owned
};
