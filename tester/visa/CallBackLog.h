#pragma once

#include <visatype.h>

#include <memory>

class SessionLog;

/**
 * Writes one line for each VISA event callback. One per process: the first session's log gets the lines of all
 * sessions, until that log goes away.
 */
class CallBackLog
{
public:
    /// Creates the instance with @p log, or answers the existing one unchanged.
    static CallBackLog *createCallBackLog(SessionLog *log);
    /// To be called by a log that ends: callbacks find no log any more and are silent.
    static void forget(const SessionLog *log);

    /// The ViHndlr that the panels install. Runs on threads of the VISA library.
    static ViStatus viEventHandler(ViSession vi, ViEventType type, ViEvent context, void *userHandle);
};
