#pragma once

#include "gui/support/TestsPage.h"

#include "support/ModalAnswer.h"
#include "support/SimulatorProcess.h"

#include <memory>
#include <ostream>
#include <string>
#include <vector>

/// A way to reach the simulated instrument.
struct Way {
    const char *name;
    std::vector<std::string> options; ///< of the simulator
    const char *service;
};

inline void PrintTo(const Way &way, std::ostream *out)
{
    *out << way.name;
}

namespace ways
{
inline const Way Hislip{"Hislip", {"--hislip", "0"}, "hislip"};
inline const Way RawSocket{"RawSocket", {"--socket", "0"}, "socket"};
inline const Way Vxi11{"Vxi11", {"--vxi11", "0", "--portmapper", "0"}, "vxi11"};
inline const Way Gateway{"Gateway", {"--gpib", "--vxi11", "0", "--portmapper", "0"}, "gpib"};
inline const Way Serial{"Serial", {"--serial"}, "serial"};
} // namespace ways

/**
 * The page "Tests" on the library that ships and simulated instruments: started, watched by their log, stopped. The warning
 * of a test that failed is closed and counted.
 */
class InstrumentTestsWindow : public TestsPage<WindowTest>
{
protected:
    using Simulator = std::unique_ptr<test::SimulatorProcess>;

    /// A simulated instrument on that way and, where wanted, on others too. One of them at most may have a portmapper.
    static Simulator simulator(const Way &way, const std::vector<std::string> &more = {})
    {
        std::vector<std::string> options = way.options;
        for (const std::string &option : more)
            options.push_back(option);
        auto started = std::make_unique<test::SimulatorProcess>(options);
        if (const std::string port = started->resource("portmapper"); !port.empty())
            qputenv("KYVISA_PORTMAPPER_PORT", QByteArray::fromStdString(port));
        return started;
    }
    static QString resourceOf(const Simulator &simulator, const char *service)
    {
        const QString resource = QString::fromStdString(simulator->resource(service));
        EXPECT_FALSE(resource.isEmpty()) << service;
        return resource;
    }

    /// Opens the window on the page "Tests", its lines written to the log file.
    void openPage(const QString &sessionResource)
    {
        openWindow();
        showPage("Tests");
        tick("testWriteLog");
        enter("resourceName", sessionResource);
        EXPECT_EQ(text("test0Resource"), sessionResource);
    }

    void connectSession()
    {
        press("resourceConnect");
        ASSERT_TRUE(eventually([this] { return isVisible("resourceDisconnect"); }, 30000))
            << text("statusLabel").toStdString();
    }

    /// Starts the test, again where the start was refused because another request was out.
    void startSurely(int slot)
    {
        EXPECT_TRUE(eventually(
            [=, this] {
                if (isIdle(slot))
                    start(slot);
                if (text(named(slot, "Status").c_str()).isEmpty())
                    return true;
                stop(slot);
                return false;
            },
            30000))
            << text(named(slot, "Status").c_str()).toStdString();
    }

    /// The session asks, and what the page "Basics" shows then begins with the answer. A button that is pressed while another
    /// request is out does nothing: then once more.
    void expectAnswer(const QString &question, const QString &answer)
    {
        showPage("Basics");
        enter("basicCommand", question);
        bool answered = false;
        for (int i = 0; i < 6 && !answered; ++i) {
            press("basicQuery");
            answered = eventually([&] { return view().startsWith(answer); }, 5000);
        }
        EXPECT_TRUE(answered) << question.toStdString() << " gave " << view().toStdString();
        showPage("Tests");
    }

    bool logged(const QString &text, int times = 1, int ms = 60000)
    {
        return eventually([&] { return log().count(text) >= times; }, ms);
    }
    /// For a message: the tests' own lines and the calls that failed, then the last lines of all.
    std::string endOfLog()
    {
        const QStringList all = log().split('\n');
        QStringList told;
        for (const QString &line : all)
            if (!line.contains(QLatin1String("\tvi")) || !line.contains(QLatin1String("VI_SUCCESS")))
                told << line;
        return '\n' +
               (told.mid(told.size() - 60) + QStringList("...") + all.mid(all.size() - 20)).join('\n').toStdString();
    }

    int warnings() const { return m_warning.count(); }

    static constexpr const char *StressRuns = "Press 'Stop Test' to finish test!";

private:
    QString view() { return shown("basicReadView", "plainText").toString(); }

    ModalAnswer m_warning{"testAborted", [](QDialog *box) { QTest::keyClick(box, Qt::Key_Return); }};
};
