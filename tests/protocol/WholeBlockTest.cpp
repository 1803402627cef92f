// The mass-memory stress test of the tester with blocks of its full size, on the library that ships and the simulator.

#include "support/SimulatorProcess.h"

#include "instrtests/StressMmemTest.h"
#include "log/Log.h"
#include "log/SessionLog.h"
#include "visa/VisaSessionWithLog.h"

#include <QtGlobal>

#include <gmock/gmock.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

using testing::AnyOf;
using testing::Contains;
using testing::Each;
using testing::HasSubstr;
using testing::Not;

namespace
{

constexpr std::size_t FullSize = 31457280;

/// A way, and a start of the random numbers that draws a block of the full size at once and then reads it back.
struct Whole {
    const char *name;
    std::vector<std::string> options;
    const char *service;
    unsigned seed;
};

void PrintTo(const Whole &whole, std::ostream *out)
{
    *out << whole.name;
}

class WholeBlock : public ::testing::TestWithParam<Whole>
{
protected:
    using Texts = std::vector<std::string>;

    /// What is in the log, calls and the test's own lines.
    Texts lines() const
    {
        std::vector<FastBuffer> held(1024);
        held.resize(m_log->getMessageQueue()->copyFromQueue(held.data(), static_cast<int>(held.size())));
        Texts texts;
        for (const FastBuffer &line : held)
            texts.emplace_back(line.text);
        return texts;
    }

    /// The block as it came back: on a raw socket alone, else with its line feed.
    bool readBack() const
    {
        for (const std::string &line : lines())
            for (const std::size_t count : {FullSize, FullSize + 1})
                if (line.starts_with("viRead(") && line.ends_with("retCnt= " + std::to_string(count) + ")"))
                    return true;
        return false;
    }

    std::unique_ptr<Log> m_log = std::make_unique<Log>(nullptr);
    SessionLog m_sessionLog{m_log.get(), nullptr};
};

TEST_P(WholeBlock, ComesBackEqual)
{
    test::SimulatorProcess simulator(GetParam().options);
    if (const std::string port = simulator.resource("portmapper"); !port.empty())
        qputenv("KYVISA_PORTMAPPER_PORT", QByteArray::fromStdString(port));
    m_sessionLog.showLog(true);
    VisaSessionWithLog session(&m_sessionLog);
    session.openRM();
    std::string resource = simulator.resource(GetParam().service);
    session.open(resource.data(), 0, 10000);

    QT_WARNING_PUSH
    QT_WARNING_DISABLE_DEPRECATED
    qsrand(GetParam().seed); // of this thread
    QT_WARNING_POP
    std::atomic<bool> stop = false;
    std::atomic<bool> ended = false;
    std::thread watcher([&] {
        const auto patience = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        while (!ended && !readBack() && std::chrono::steady_clock::now() < patience)
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        stop = true;
    });
    const unsigned status = stressMmemTest(&m_sessionLog, &session, &stop);
    ended = true;
    watcher.join();
    session.closeRM();

    EXPECT_EQ(status, 0u);
    EXPECT_TRUE(readBack());
    EXPECT_THAT(lines(), Contains(HasSubstr(":MMEM:DATA 'Test.dat',#8" + std::to_string(FullSize))));
    EXPECT_THAT(lines(), Contains(HasSubstr(" Trigger. Average read ")));
    EXPECT_THAT(lines(), Each(Not(AnyOf(HasSubstr("match"), HasSubstr("not equal"), HasSubstr("SYST:ERR?")))));
}

INSTANTIATE_TEST_SUITE_P(
    Over, WholeBlock,
    ::testing::Values(Whole{"RawSocket", {"--socket", "0"}, "socket", 164161576},
                      Whole{"Hislip", {"--hislip", "0"}, "hislip", 112650620},
                      Whole{"Vxi11", {"--vxi11", "0", "--portmapper", "0"}, "vxi11", 112650620},
                      Whole{"Gateway", {"--gpib", "--vxi11", "0", "--portmapper", "0"}, "gpib", 112650620}),
    [](const auto &each) { return each.param.name; });

} // namespace
