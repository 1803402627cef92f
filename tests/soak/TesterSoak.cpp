// The whole tester on a simulated instrument, used by mouse and keys for as long as one likes: all protocols and pages in turn, the log
// shown and written. Memory, descriptors and threads must stay as they are.
// KYVISA_SOAK_SECONDS says how long (10 without it), KYVISA_SOAK_RECORD names the file that gets a line.
#include "gui/support/InstrumentWindowTest.h"
#include "gui/support/TestsPage.h"
#include "support/ProcessFigures.h"

#include "support/ModalAnswer.h"

#include <QDateTime>
#include <QElapsedTimer>
#include <QFileInfo>

#include <filesystem>
#include <fstream>
#include <iostream>
#include <sstream>
#include <unistd.h>

namespace
{

constexpr std::size_t AllowedGrowth = 8 * 1024; // KiB; what allocators keep of a busy moment
constexpr int QueriesOfASession = 50;
constexpr int Patience = 60000; // milliseconds

#ifdef __SANITIZE_ADDRESS__
constexpr bool FreedMemoryIsKept = true;
#else
constexpr bool FreedMemoryIsKept = false;
#endif

struct Way {
    const char *service;
    bool serviceRequests = true;
};
constexpr Way Ways[] = {{"hislip"}, {"vxi11"}, {"gpib"}, {"socket", false}, {"serial", false}};

class EveryService : public InstrumentWindowTest
{
protected:
    EveryService()
        : InstrumentWindowTest(
              {"--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0", "--gpib", "--serial"})
    {
    }
};

class TesterSoak : public TestsPage<EveryService>
{
protected:
    TesterSoak()
    {
        qputenv("KYVISA_PORTMAPPER_PORT", resource("portmapper").toLatin1());
        tick("writeLog");
        showPage("Tests");
        tick("testWriteLog");
        showPage("Basics");
    }

    /// The number of the newest line in the live view, which is drawn anew from time to time.
    qulonglong newestLine()
    {
        if (logRows() > 0)
            m_newest = std::max(m_newest, logCell(logRows() - 1, 0).toULongLong());
        return m_newest;
    }

    /// Presses a button and waits until what it started stands in the log.
    void act(const char *button)
    {
        const qulonglong before = newestLine();
        press(button);
        ASSERT_TRUE(eventually([=, this] { return newestLine() > before; }, Patience)) << button;
        ASSERT_TRUE(statusIs("VI_SUCCESS")) << button << ": " << text("statusLabel").toStdString();
    }

    void ask(const QString &command, const QString &answer)
    {
        press("basicClearText");
        enter("basicCommand", command);
        press("basicQuery");
        ASSERT_TRUE(eventually([&] { return view() == answer; }, Patience))
            << command.toStdString() << " gave " << view().toStdString() << ", " << text("statusLabel").toStdString();
        ++m_queries;
    }

    void setAttribute(const QString &filter, const QString &name, const QString &value)
    {
        showPage("Attributes");
        enter("attributesFilter", filter);
        chooseRow("attributesList", name);
        enter("attributesNew", value);
        act("attributesSet");
        act("attributesGet");
        showPage("Basics");
    }

    void useBasics()
    {
        for (int i = 0; i < QueriesOfASession; ++i) {
            ASSERT_NO_FATAL_FAILURE(ask(QStringLiteral("*ESE %1;*ESE?\\n").arg(i), QStringLiteral("%1\n").arg(i)));
        }
        act("basicClear");
    }

    void useLocks()
    {
        showPage("Locking");
        act("lockExclusive");
        act("lockUnlock");
    }

    void useEvents()
    {
        showPage("Events");
        WindowTest::choose("eventType", "VI_EVENT_SERVICE_REQ");
        act("eventEnable");
        act("eventDisable");
    }

    void disconnectFrom()
    {
        press("resourceDisconnect");
        ASSERT_TRUE(eventually([this] { return isVisible("resourceConnect"); }, Patience));
    }

    /// The next instrument test, for @p ms; it has a session of its own.
    void useTests(int ms)
    {
        showPage("Tests");
        choose(0, m_rounds % 2 == 0 ? Stress4882 : StressMmem);
        start(0);
        ASSERT_TRUE(eventually([this] { return isRunning(0); }, Patience));
        meanwhile(ms);
        stop(0);
        ASSERT_TRUE(ends(0, Patience)) << result(0).toStdString();
        showPage("Basics");
    }

    void session(const Way &way)
    {
        press("logClear");
        ASSERT_NO_FATAL_FAILURE(connectTo(resource(way.service)));
        if (!way.serviceRequests) { // sockets and serial lines have no end of an answer but its last character
            ASSERT_NO_FATAL_FAILURE(setAttribute("termchar_en", "VI_ATTR_TERMCHAR_EN", "1"));
        }
        ASSERT_NO_FATAL_FAILURE(useBasics());
        ASSERT_NO_FATAL_FAILURE(setAttribute("user_data_64", "VI_ATTR_USER_DATA_64", "12"));
        ASSERT_NO_FATAL_FAILURE(useLocks());
        if (way.serviceRequests) {
            ASSERT_NO_FATAL_FAILURE(useEvents());
        }
        ASSERT_NO_FATAL_FAILURE(disconnectFrom());
    }

    static test::ProcessFigures figures() { return test::figuresOf(::getpid()); }
    static std::size_t threads()
    {
        const std::filesystem::directory_iterator all("/proc/self/task");
        return static_cast<std::size_t>(std::distance(begin(all), end(all)));
    }
    static std::string now() { return QDateTime::currentDateTimeUtc().toString(Qt::ISODate).toStdString(); }

    qulonglong m_newest = 0;
    int m_queries = 0;
    int m_rounds = 0; ///< over all ways
};

TEST_F(TesterSoak, StaysAsItWas)
{
    const int seconds =
        qEnvironmentVariableIsSet("KYVISA_SOAK_SECONDS") ? qEnvironmentVariableIntValue("KYVISA_SOAK_SECONDS") : 10;
    const bool isShort = seconds < 60;
    const ModalAnswer warning("testAborted", [](QDialog *box) { QTest::keyClick(box, Qt::Key_Return); });
    const std::string begun = now();
    QElapsedTimer timer;
    timer.start();
    test::ProcessFigures warm;
    std::size_t warmThreads = 0;
    bool isWarm = false;
    do {
        for (const Way &way : Ways) {
            ASSERT_NO_FATAL_FAILURE(session(way)) << way.service;
            ASSERT_NO_FATAL_FAILURE(useTests(isShort ? 100 : 1000)) << way.service;
        }
        ++m_rounds;
        if (!isWarm && (isShort || timer.elapsed() > seconds * 1000 / 3)) {
            isWarm = true;
            warm = figures();
            warmThreads = threads();
        }
    } while (!timer.hasExpired(seconds * qint64{1000}));
    const test::ProcessFigures end = figures();

    qint64 written = 0;
    for (const QString &path : logFiles())
        written += QFileInfo(path).size();
    std::ostringstream record;
    record << "tester-soak " << seconds << " | start " << begun << " | end " << now() << " | rounds over 5 protocols "
           << m_rounds << " | queries by hand " << m_queries << " | log lines " << newestLine() << " | log file MiB "
           << written / 1024 / 1024 << " | memory KiB after warm-up " << warm.memory << ", at the end " << end.memory
           << ", peak " << end.peakMemory << " | descriptors after warm-up " << warm.descriptors << ", at the end "
           << end.descriptors << " | threads after warm-up " << warmThreads << ", at the end " << threads();
    std::cout << record.str() << std::endl;
    if (qEnvironmentVariableIsSet("KYVISA_SOAK_RECORD"))
        std::ofstream(qgetenv("KYVISA_SOAK_RECORD").toStdString(), std::ios::app) << record.str() << '\n';

    EXPECT_EQ(warning.count(), 0) << "an instrument test was aborted";
    EXPECT_GT(written, 0);
    EXPECT_EQ(end.descriptors, warm.descriptors);
    EXPECT_EQ(threads(), warmThreads);
    if (!FreedMemoryIsKept) {
        EXPECT_LE(end.memory, warm.memory + AllowedGrowth);
    }
}

} // namespace
