#pragma once

#include <QThread>

class VisaSessionWorker;

/// The thread on which a session's worker executes requests. It ends when the worker's handler is closed.
class VisaThread : public QThread
{
    Q_OBJECT

public:
    using QThread::QThread;

    /// To be called before start(). The worker is not owned and outlives the thread.
    void setWorker(VisaSessionWorker *worker) { m_worker = worker; }
    void openRM();
    void closeRM();

protected:
    void run() override;

private:
    VisaSessionWorker *m_worker = nullptr;
};
