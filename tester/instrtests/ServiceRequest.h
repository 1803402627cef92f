#pragma once

class VisaSessionWithLog;

/// Waits for the service request of an instrument, as an event in the queue.
class ServiceRequest
{
public:
    explicit ServiceRequest(VisaSessionWithLog &session) : m_session(session) {}

    /// Throws VisaError when none came, and for a completion code too. Nothing stays open then.
    void wait(unsigned timeoutMs);
    /// Closes the event that wait() has brought.
    void close();

private:
    VisaSessionWithLog &m_session;
    unsigned m_event = 0;
};
