#include "instrtests/TestFunctionThread.h"

#include "instrtests/InterfaceSetup.h"
#include "instrtests/TestLine.h"
#include "pipeline/VisaError.h"
#include "pipeline/VisaSessionWorker.h"

#include <visa.h>

#include <cstdlib>

namespace
{
constexpr unsigned OpenTimeout = 2000; // ms
constexpr unsigned long EndMs = 5000;
} // namespace

TestFunctionThread::TestFunctionThread(SessionLog *log, VisaSessionWorker *worker)
    : m_log(log), m_worker(worker), m_session(log)
{
}

TestFunctionThread::~TestFunctionThread()
{
    if (!wait(EndMs))
        std::_Exit(StuckStatus); // no destructors below a test that still runs
}

void TestFunctionThread::startTest(const char *resourceName, TestFunction function)
{
    stop(); // of the run before, which is returning
    wait();
    m_stop.store(false, std::memory_order_relaxed);
    m_resourceName = QString::fromUtf8(resourceName);
    m_function = function;
    if (function)
        start();
    // Whoever asked for the test waits for its end.
    if (!function || (!isRunning() && !isFinished()))
        m_worker->testFinished(1, m_id);
}

void TestFunctionThread::run()
{
    unsigned result = 1;
    try {
        result = runTest();
    } catch (const VisaError &error) {
        // Of a failure inside the test, too: see docs/decisions/test-failure-says-cannot-open.md.
        logTestLine(m_log, "Cannot open VISA-Resource(%s)", VisaError::StatusCode(error.getStatus()));
    }
    m_worker->testFinished(result, m_id);
}

unsigned TestFunctionThread::runTest()
{
    QByteArray name = m_resourceName.toUtf8();
    logTestLine(m_log, "Open VISA-Resource: %s", name.constData());
    m_session.open(name.data(), VI_NO_LOCK, OpenTimeout);
    logTestLine(m_log, "Manf Name: %s", interfacesetup::text(m_session, VI_ATTR_RSRC_MANF_NAME).c_str());
    logTestLine(m_log, "Impl Version: 0x%llX",
                static_cast<unsigned long long>(interfacesetup::number(m_session, VI_ATTR_RSRC_IMPL_VERSION)));
    return m_function(m_log, &m_session, &m_stop);
}
