#pragma once

#include "RecordingListener.h"
#include "log/FastBuffer.h"
#include "log/StringMessageQueue.h"
#include "pipeline/VisaFunctionCallHandler.h"
#include "pipeline/VisaSessionWorker.h"
#include "pipeline/VisaThread.h"
#include "support/standin/Standin.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

/// A session's worker on its thread, above the stand-in library, without a window: the test takes the results itself.
class RunningWorker : public testing::Test
{
protected:
    void SetUp() override
    {
        standin::reset();
        m_handler = std::make_unique<VisaFunctionCallHandler>(nullptr);
        m_worker = std::make_unique<VisaSessionWorker>(m_handler.get());
        m_worker->getLog()->showLog(true);
        m_listener = std::make_unique<RecordingListener>(m_handler.get(), VisaFunctionCallTyp::All);
        m_thread.setWorker(m_worker.get());
        m_thread.start();
    }

    void TearDown() override { end(); }

    void end()
    {
        if (!m_handler)
            return;
        m_handler->close();
        m_thread.wait();
        m_worker.reset();
        m_listener.reset();
        m_handler.reset();
    }

    _visaFunctionCall awaitResult()
    {
        finsihedFunctionCall record;
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        while (!m_handler->getFinishedVisaFunctionCall(record)) {
            if (std::chrono::steady_clock::now() > deadline) {
                ADD_FAILURE() << "no result came";
                break;
            }
            std::this_thread::yield();
        }
        return record.call;
    }

    _visaFunctionCall run(VisaFunctionCallTyp type, const Parameter &first = {}, const Parameter &second = {},
                          const Parameter &third = {})
    {
        _visaFunctionCall request;
        request.type = type;
        request.parameter = {first, second, third};
        EXPECT_TRUE(m_handler->sendVisaFunctionCall(request, false));
        _visaFunctionCall result = awaitResult();
        EXPECT_EQ(result.type, type);
        return result;
    }

    void open()
    {
        EXPECT_EQ(run(VisaFunctionCallTyp::Open, text("TCPIP::localhost::hislip0"), {}, number(3000)).status, 0);
    }

    std::vector<std::string> logLines()
    {
        const auto lines = std::make_unique<FastBuffer[]>(1000);
        const unsigned count = m_worker->getStringMessageQueue()->copyFromQueue(lines.get(), 1000);
        std::vector<std::string> texts;
        for (unsigned i = 0; i < count; ++i)
            texts.emplace_back(lines[i].text);
        return texts;
    }

    static Parameter number(std::uint64_t value) { return {value, {}}; }
    static Parameter text(std::string value) { return {0, std::move(value)}; }

    std::unique_ptr<VisaFunctionCallHandler> m_handler;
    std::unique_ptr<VisaSessionWorker> m_worker;
    std::unique_ptr<RecordingListener> m_listener;
    VisaThread m_thread;
};
