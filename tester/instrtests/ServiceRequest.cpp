#include "instrtests/ServiceRequest.h"

#include "pipeline/VisaError.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <utility>

void ServiceRequest::wait(unsigned timeoutMs)
{
    m_event = 0;
    try {
        m_session.waitOnEvent(VI_EVENT_SERVICE_REQ, timeoutMs, &m_event);
    } catch (const VisaError &) {
        // A completion code counts as failure, yet it brings an event.
        if (m_event != 0) {
            try {
                close();
            } catch (const VisaError &) { // it is in the log; the first failure is the one to tell
            }
        }
        throw;
    }
}

void ServiceRequest::close()
{
    m_session.closeObject(std::exchange(m_event, 0));
}
