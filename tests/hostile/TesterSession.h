#pragma once

#include "log/Log.h"
#include "log/SessionLog.h"
#include "pipeline/VisaError.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <memory>
#include <string>

namespace hostile
{

/// A logged session as the tester's worker has one, with a log of its own.
class TesterSession
{
public:
    TesterSession() { m_sessionLog.showLog(true); }

    VisaSessionWithLog *operator->() { return &m_session; }

    /// What @p operation answers: the status that it throws, or VI_SUCCESS.
    template <typename Operation>
    static ViStatus statusOf(const Operation &operation)
    {
        try {
            operation();
        } catch (const VisaError &error) {
            return error.getStatus();
        }
        return VI_SUCCESS;
    }

    void open(std::string resource, unsigned timeout) { m_session.open(resource.data(), VI_NULL, timeout); }

    /// The newest line of the log; its status is -1 when there is none.
    FastBuffer lastLine()
    {
        FastBuffer line{};
        line.status = -1;
        m_log->getMessageQueue()->copyFromQueue(&line, 1);
        return line;
    }

private:
    std::unique_ptr<Log> m_log = std::make_unique<Log>(nullptr); // large: not on the stack
    SessionLog m_sessionLog{m_log.get(), nullptr};
    VisaSessionWithLog m_session{&m_sessionLog};
};

/// A status as the tables have it: "OK" for what is no error, else its name without "VI_ERROR_".
inline std::string shortName(ViStatus status)
{
    if (status >= VI_SUCCESS)
        return "OK";
    const std::string name = VisaError::StatusCode(status);
    return name.starts_with("VI_ERROR_") ? name.substr(9) : name + " " + std::to_string(status);
}

} // namespace hostile
