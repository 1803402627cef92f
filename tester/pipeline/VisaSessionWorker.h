#pragma once

#include "instrtests/TestFunctionThread.h"
#include "log/Log.h"
#include "log/LogFile.h"
#include "log/SessionLog.h"
#include "log/StringMessageQueue.h"
#include "pipeline/VisaFunctionCall.h"
#include "visa/VisaSessionWithLog.h"

#include <visatype.h>

#include <pthread.h>

#include <atomic>

class CallBackLog;
class VisaFunctionCallHandler;

/**
 * Executes the requests of one session, one after the other, and owns what that needs: the logging chain, the logged
 * VISA session, and the two threads on which instrument tests run beside it. The queues inside make it large; it lives on
 * the heap.
 *
 *     handler.close();      // the blocked take answers false, doWork() stops the log and returns
 *     thread.wait();        // the VisaThread that runs doWork()
 *     delete worker;        // stops the tests, joins the thread that writes the log file, waits for the tests
 *
 * A failing call, whatever it throws, ends as the status of its result: nothing but the closed handler ends the loop.
 */
class VisaSessionWorker
{
public:
    explicit VisaSessionWorker(VisaFunctionCallHandler *handler); ///< @p handler is not owned
    ~VisaSessionWorker();
    VisaSessionWorker(const VisaSessionWorker &) = delete;
    VisaSessionWorker &operator=(const VisaSessionWorker &) = delete;

    /// Takes and executes requests until the handler is closed. Runs on the session's VisaThread.
    void doWork();

    /// A test has ended: its listeners are told by a StopTest record (slot 0 the id, slot 1 the result). Test threads call it.
    void testFinished(unsigned int result, unsigned int id);

    /// Open and close the VISA resource managers of the session and of the tests, while no request is being executed and no
    /// test runs.
    void openRM();
    void closeRM();

    SessionLog *getLog() { return &m_sessionLog; }
    SessionLog *getTestLog() { return &m_testLog; }
    LogFile *getLogFile() { return &m_logFile; }
    /// The ring that the live view reads.
    StringMessageQueue *getStringMessageQueue() { return m_log.getMessageQueue(); }

private:
    void execute(_visaFunctionCall &request, _visaFunctionCall &result);
    TestFunctionThread &testThread(const Parameter &slot) { return m_testThreads[slot.uintValue != 0 ? 1 : 0]; }
    void dispatch(_visaFunctionCall &request, _visaFunctionCall &result);

    void findRsrc(_visaFunctionCall &request, _visaFunctionCall &result);
    void findNext(_visaFunctionCall &result);
    void forgetFoundTexts();
    void fillFound(const char *name, _visaFunctionCall &result);
    void closeFindList();
    void setAttribute(const _visaFunctionCall &request, _visaFunctionCall &result, bool onSession);
    void getAttribute(const _visaFunctionCall &request, _visaFunctionCall &result, bool onSession);
    void lockShared(_visaFunctionCall &request, _visaFunctionCall &result);

    StringMessageQueue m_stringMessageQueue; ///< the worker's own; the live view reads the one of m_log
    LogFile m_logFile;
    Log m_log;
    SessionLog m_sessionLog; ///< of the panels' calls
    SessionLog m_testLog;    ///< of the instrument tests
    VisaSessionWithLog m_session;
    std::atomic<bool> m_closing{false};  ///< from now on the end of a test is nobody's business
    TestFunctionThread m_testThreads[2]; ///< the slots 0 and 1
    VisaFunctionCallHandler *m_handler;  ///< not owned
    CallBackLog *m_callBackLog;          ///< one per process, not owned
    ViFindList m_findList = 0;           ///< of the last search; 0 when none is open
    ViUInt32 m_findCount = 0;            ///< resources of the list that were not handed out yet
    pthread_t m_fileLogThread{};
    bool m_fileLogRuns = false;
};
