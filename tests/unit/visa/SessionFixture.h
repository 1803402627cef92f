#pragma once

#include "log/Log.h"
#include "log/SessionLog.h"
#include "pipeline/VisaError.h"
#include "support/standin/Standin.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <gmock/gmock.h>

#include <memory>

/// A logged session on the stand-in, open on session 2 with resource manager 1, its lines in a ring of its own.
class SessionTest : public testing::Test
{
protected:
    SessionTest()
    {
        standin::reset();
        m_sessionLog.showLog(true);
        m_session = std::make_unique<VisaSessionWithLog>(&m_sessionLog);
    }

    /// Opens session 2; the line of the opening is forgotten.
    void openSession()
    {
        char name[] = "TCPIP::localhost::hislip0";
        m_session->open(name, 0, 2000);
        m_log->getMessageQueue()->clear();
    }

    std::vector<FastBuffer> lines()
    {
        std::vector<FastBuffer> held(64);
        held.resize(m_log->getMessageQueue()->copyFromQueue(held.data(), 64));
        return held;
    }

    std::vector<std::string> texts()
    {
        std::vector<std::string> all;
        for (const FastBuffer &line : lines())
            all.emplace_back(line.text);
        return all;
    }

    std::string lastText()
    {
        const auto all = texts();
        return all.empty() ? "" : all.back();
    }

    /// The status that @p operation throws, or 0 when it returns.
    template <typename Operation>
    static ViStatus thrownBy(Operation operation)
    {
        try {
            operation();
        } catch (const VisaError &error) {
            return error.getStatus();
        }
        return 0;
    }

    std::unique_ptr<Log> m_log = std::make_unique<Log>(nullptr); // large: not on the stack
    SessionLog m_sessionLog{m_log.get(), nullptr};
    std::unique_ptr<VisaSessionWithLog> m_session;
};
