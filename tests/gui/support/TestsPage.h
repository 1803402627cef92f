#pragma once

#include "gui/support/WindowTest.h"

#include <QTest>

#include <string>

/// The page "Tests" as a person uses it. @p Base is WindowTest or one of its kind; slots are 0 and 1.
template <typename Base>
class TestsPage : public Base
{
protected:
    enum Test { Performance, Stress4882, StressMmem };

    static std::string named(int slot, const char *what) { return "test" + std::to_string(slot) + what; }
    QWidget *part(int slot, const char *what) { return Base::widget(named(slot, what).c_str()); }

    void choose(int slot, Test test)
    {
        QTest::keyClick(part(slot, "Chooser"), Qt::Key_Home);
        for (int i = 0; i < test; ++i)
            QTest::keyClick(part(slot, "Chooser"), Qt::Key_Down);
    }

    void start(int slot) { Base::press(named(slot, "Start").c_str()); }
    void stop(int slot) { Base::press(named(slot, "Stop").c_str()); }

    bool isIdle(int slot)
    {
        return part(slot, "Start")->isEnabled() && !part(slot, "Stop")->isEnabled() &&
               part(slot, "")->cursor().shape() == Qt::ArrowCursor;
    }
    bool isRunning(int slot)
    {
        return !part(slot, "Start")->isEnabled() && part(slot, "Stop")->isEnabled() &&
               result(slot).startsWith("Running ");
    }
    QString result(int slot) { return Base::text(named(slot, "Result").c_str()); }
    bool ends(int slot, int ms = 30000)
    {
        return Base::eventually([=, this] { return isIdle(slot); }, ms);
    }

    /// What was written to the log files so far.
    QString log()
    {
        QString all;
        for (const QString &path : Base::logFiles())
            all += QString::fromUtf8(Base::contents(path));
        return all;
    }
};
