#pragma once

#include <visatype.h>

/// Thrown by the logged session when an operation answers a status that it treats as failure. Thrown by value, caught
/// by reference; carries no text of its own.
class VisaError
{
public:
    explicit VisaError(const int &status) : m_status(status) {}

    ViStatus getStatus() const { return m_status; }

    /// Name of a status, "Unknown Status" when there is none.
    static const char *StatusCode(int status);

private:
    ViStatus m_status;
};
