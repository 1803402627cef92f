#pragma once

#include "gui/support/WindowTest.h"

#include "support/SimulatorProcess.h"

#include <memory>
#include <string>
#include <utility>
#include <vector>

/// A window on the library that ships, with a simulated instrument of its own.
class InstrumentWindowTest : public WindowTest
{
protected:
    /// @param options of the simulator
    explicit InstrumentWindowTest(std::vector<std::string> options) : m_options(std::move(options))
    {
        startSimulator();
        openWindow();
    }

    void startSimulator() { m_simulator = std::make_unique<test::SimulatorProcess>(m_options); }

    QString resource(const char *service) const { return QString::fromStdString(m_simulator->resource(service)); }
    pid_t simulator() const { return m_simulator->id(); }

    void connectTo(const QString &name)
    {
        enter("resourceName", name);
        press("resourceConnect");
        ASSERT_TRUE(eventually([this] { return isVisible("resourceDisconnect"); }))
            << text("statusLabel").toStdString();
        // The panel's own follow-up has been answered too.
        ASSERT_TRUE(eventually([this] { return logHolds("type= VI_ATTR_SEND_END_EN,value= 0x1)"); }));
    }

    bool logHolds(const QString &piece)
    {
        for (int row = 0; row < logRows(); ++row)
            if (logCell(row, 3).contains(piece))
                return true;
        return false;
    }

    bool statusIs(const QString &name)
    {
        return eventually([&] { return text("statusLabel") == "Status: " + name; });
    }

    /// On the page "Basics".
    QString view() { return shown("basicReadView", "plainText").toString(); }

    void query(const QString &command, const QString &answer)
    {
        enter("basicCommand", command);
        press("basicQuery");
        EXPECT_TRUE(eventually([&] { return view() == answer; }))
            << command.toStdString() << " gave " << view().toStdString();
    }

    void write(const QString &command)
    {
        enter("basicCommand", command);
        press("basicWrite");
        EXPECT_TRUE(statusIs("VI_SUCCESS")) << text("statusLabel").toStdString();
    }

    bool statusByte(const QString &value)
    {
        press("basicReadStb");
        return eventually([&] { return text("basicStatusByte") == value; }, 2000);
    }

private:
    std::vector<std::string> m_options;
    std::unique_ptr<test::SimulatorProcess> m_simulator;
};
