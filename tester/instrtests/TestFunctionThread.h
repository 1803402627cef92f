#pragma once

#include "instrtests/TestFunction.h"
#include "visa/VisaSessionWithLog.h"

#include <QString>
#include <QThread>

#include <atomic>

class VisaSessionWorker;

/**
 * Runs one instrument test at a time, on a session of its own. Each session worker owns two, the slots 0 and 1.
 *
 *     worker                          this thread
 *     startTest(resource, function)   opens the resource, runs the test
 *     stop()                          the test notices at its next checkpoint
 *                                     worker.testFinished(result, id), then returns
 *
 * The test closes the session; this thread does not. A test that does not end within the destructor's 5000 ms must not keep
 * the program alive: the process ends at once, with status 55.
 */
class TestFunctionThread : public QThread
{
    Q_OBJECT

public:
    static constexpr int StuckStatus = 55; ///< exit status of the process

    TestFunctionThread(SessionLog *log, VisaSessionWorker *worker); ///< neither is owned
    ~TestFunctionThread() override;

    void setid(unsigned id) { m_id = id; }
    /// Waits until the run before has returned (it is told to stop), then starts. A test that cannot be started has failed.
    void startTest(const char *resourceName, TestFunction function);
    void stop() { m_stop.store(true, std::memory_order_relaxed); }

    /// The resource manager of the thread's session, while no test runs.
    void openRM() { m_session.openRM(); }
    void closeRM() { m_session.closeRM(); }

protected:
    void run() override;

private:
    unsigned runTest();

    SessionLog *m_log;
    VisaSessionWorker *m_worker;
    TestFunction m_function = nullptr;
    VisaSessionWithLog m_session;
    QString m_resourceName;
    unsigned m_id = 0; ///< the slot's number
    std::atomic<bool> m_stop{false};
};
