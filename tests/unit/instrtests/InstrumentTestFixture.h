#pragma once

#include "instrtests/TestFunction.h"
#include "log/Log.h"
#include "log/SessionLog.h"
#include "support/standin/Standin.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <QtGlobal>

#include <gmock/gmock.h>

#include <atomic>
#include <cinttypes>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

/// A number that a test is to draw: the number drawn, divided by @p modulus, leaves @p remainder.
struct Draw {
    unsigned modulus;
    unsigned remainder;
};

constexpr Draw AnyDraw{1, 0};

/// An instrument test as a plain function, on session 2 of the stand-in, its own lines in a ring of its own.
class InstrumentTest : public testing::Test
{
protected:
    using Texts = std::vector<std::string>;

    InstrumentTest()
    {
        standin::reset();
        standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4015, 2);
        m_session = std::make_unique<VisaSessionWithLog>(&m_sessionLog);
        char name[] = "TCPIP::localhost::hislip0";
        m_session->open(name, 0, 2000);
        standin::forgetCalls();
    }

    unsigned run(TestFunction function) { return function(&m_sessionLog, m_session.get(), &m_stop); }

    /// The test's own lines.
    Texts lines() const
    {
        std::vector<FastBuffer> held(200);
        held.resize(m_log->getMessageQueue()->copyFromQueue(held.data(), 200));
        Texts texts;
        for (const FastBuffer &line : held) {
            EXPECT_FALSE(line.visaLine);
            texts.emplace_back(line.text);
        }
        return texts;
    }

    /// What the library was asked to do, one text a call.
    static Texts asked()
    {
        Texts texts;
        for (const standin::Call &call : standin::calls())
            texts.push_back(shown(call));
        return texts;
    }

    /// The same from the first call of that text on.
    static Texts askedFrom(const std::string &first)
    {
        Texts texts = asked();
        texts.erase(texts.begin(), std::find(texts.begin(), texts.end(), first));
        return texts;
    }

    static std::string shown(const standin::Call &call)
    {
        const auto number = [&](std::size_t n) { return std::to_string(call.numbers.at(n)); };
        const auto attribute = [&] {
            char text[16];
            std::snprintf(text, sizeof text, "%" PRIX64, call.numbers.at(0));
            return std::string(text);
        };
        const std::string &name = call.operation;
        if (name == "viWrite")
            return "write " + call.texts.at(0);
        if (name == "viVPrintf")
            return "printf " + call.texts.at(1);
        if (name == "viVScanf")
            return "scanf " + call.texts.at(0);
        if (name == "viRead")
            return "read " + number(0);
        if (name == "viSetAttribute")
            return "set " + attribute() + "=" + number(1);
        if (name == "viGetAttribute")
            return "get " + attribute();
        if (name == "viClose")
            return "close " + std::to_string(call.handle);
        if (name == "viOpen")
            return "open " + call.texts.at(0) + " " + number(0) + " " + number(1);
        if (name == "viWaitOnEvent" || name == "viEnableEvent" || name == "viDiscardEvents")
            return name + " " + attribute() + " " + number(1);
        if (name == "viGpibControlREN" || name == "viAssertTrigger")
            return name + " " + number(0);
        return name;
    }

    static void serviceRequest(ViEvent context = 2001, ViStatus status = VI_SUCCESS)
    {
        standin::script("viWaitOnEvent", {.status = status, .numbers = {VI_EVENT_SERVICE_REQ, context}});
    }
    static void statusByte(unsigned value) { standin::script("viReadSTB", {.status = VI_SUCCESS, .numbers = {value}}); }
    static void friendly(const std::string &operation, int times)
    {
        for (int i = 0; i < times; ++i)
            standin::script(operation, {});
    }
    static void answer(const std::string &bytes) { standin::script("viRead", {.status = VI_SUCCESS, .bytes = bytes}); }
    static void emptyAnswer() { standin::script("viRead", {.status = VI_SUCCESS, .numbers = {0}}); }
    static void failure(const std::string &operation, ViStatus status)
    {
        standin::script(operation, {.status = status});
    }
    void stopDuring(const std::string &operation)
    {
        standin::script(operation, {.then = [this] { m_stop = true; }});
    }

    static void beSerial() { standin::setAttribute(VI_ATTR_INTF_TYPE, VI_INTF_ASRL, 2); }
    static void beRawSocket() { standin::setTextAttribute(VI_ATTR_RSRC_CLASS, "SOCKET"); }
    static void beGpib()
    {
        standin::setAttribute(VI_ATTR_INTF_TYPE, VI_INTF_GPIB, 2);
        standin::setAttribute(VI_ATTR_GPIB_UNADDR_EN, 0, 2);
        standin::setAttribute(VI_ATTR_GPIB_READDR_EN, 1, 2);
    }

    /// Seeds qrand so that the test draws these. Looks for a seed from @p first on: rare draws take long to be found.
    static void draw(const std::vector<Draw> &draws, unsigned first = 1)
    {
        QT_WARNING_PUSH
        QT_WARNING_DISABLE_DEPRECATED
        for (unsigned seed = first; seed < 100000000; ++seed) {
            qsrand(seed);
            const bool found = std::all_of(draws.begin(), draws.end(), [](const Draw &each) {
                return static_cast<unsigned>(qrand()) % each.modulus == each.remainder;
            });
            if (found) {
                qsrand(seed);
                return;
            }
        }
        QT_WARNING_POP
        FAIL() << "no seed draws that";
    }

    std::unique_ptr<Log> m_log = std::make_unique<Log>(nullptr); // large: not on the stack
    SessionLog m_sessionLog{m_log.get(), nullptr};
    std::unique_ptr<VisaSessionWithLog> m_session;
    std::atomic<bool> m_stop{false};
};
