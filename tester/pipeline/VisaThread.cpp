#include "pipeline/VisaThread.h"

#include "pipeline/VisaSessionWorker.h"

void VisaThread::run()
{
    if (m_worker)
        m_worker->doWork();
}

void VisaThread::openRM()
{
    if (m_worker)
        m_worker->openRM();
}

void VisaThread::closeRM()
{
    if (m_worker)
        m_worker->closeRM();
}
