#include "gui/support/StandinWindowTest.h"

#include <visa.h>

#include <QApplication>
#include <QClipboard>
#include <QLabel>
#include <QScrollBar>
#include <QTableWidget>
#include <QTest>

namespace
{

class LiveLog : public StandinWindowTest
{
protected:
    LiveLog()
    {
        openWindow();
        EXPECT_TRUE(called("viGetAttribute", 3));
        connectSession();
        EXPECT_TRUE(eventually([this] {
            return logRow("viOpen(sesn= 1, rsrc= TCPIP::localhost::hislip0, mode= 0, timeout= 2000, vi= 2)") >= 0;
        }));
    }

    QTableWidget *table() { return qobject_cast<QTableWidget *>(widget("logTable")); }
    bool lineAppears(const QString &text)
    {
        return eventually([&] { return logRow(text) >= 0; });
    }
    QColor statusColour(const QString &text) { return table()->item(logRow(text), 2)->foreground().color(); }
    /// Reads the status byte @p times and waits until the last one is in the log.
    void manyCalls(int times)
    {
        const std::size_t before = standin::calls("viReadSTB").size();
        const int line = text("logLines").toInt();
        for (int i = 0; i < times; ++i) {
            press("basicReadStb");
            ASSERT_TRUE(called("viReadSTB", before + static_cast<std::size_t>(i) + 1));
            ASSERT_TRUE(statusIs("VI_SUCCESS"));
        }
        ASSERT_TRUE(eventually(
            [&] { return text("logLines").toInt() >= line + times && logCell(logRows() - 1, 0) == text("logLines"); }));
    }
};

TEST_F(LiveLog, ShowsEachCallWithNumberDurationStatusAndText)
{
    standin::script("viReadSTB", {.status = VI_SUCCESS, .numbers = {0x10}, .delay = std::chrono::milliseconds(20)});
    press("basicReadStb");
    ASSERT_TRUE(lineAppears("viReadSTB(vi= 2,stb= 0x10)"));
    const int row = logRow("viReadSTB(vi= 2,stb= 0x10)");
    EXPECT_TRUE(logCell(row, 0).toInt() > 0);
    EXPECT_TRUE(logCell(row, 1).endsWith(" ms")) << logCell(row, 1).toStdString();
    EXPECT_GE(logCell(row, 1).section(' ', 0, 0).toInt(), 20);
    EXPECT_EQ(logCell(row, 2), "VI_SUCCESS");
    EXPECT_EQ(row, logRows() - 1) << "the newest line is at the bottom";
}

TEST_F(LiveLog, NumbersLinesWithoutGaps)
{
    manyCalls(3);
    for (int row = 1; row < logRows(); ++row)
        EXPECT_EQ(logCell(row, 0).toInt(), logCell(row - 1, 0).toInt() + 1);
}

TEST_F(LiveLog, ErrorsAreRedAndWarningsOrange)
{
    standin::script("viReadSTB", {.status = VI_ERROR_TMO, .numbers = {0}});
    press("basicReadStb");
    ASSERT_TRUE(lineAppears("viReadSTB(vi= 2,stb= 0x0)"));
    EXPECT_EQ(logCell(logRow("viReadSTB(vi= 2,stb= 0x0)"), 2), "VI_ERROR_TMO");
    EXPECT_EQ(statusColour("viReadSTB(vi= 2,stb= 0x0)"), QColor(Qt::red));
    standin::script("viRead", {.status = VI_SUCCESS_MAX_CNT, .bytes = "12"});
    press("basicRead");
    ASSERT_TRUE(lineAppears("viRead(vi= 2,buf= \"12\",cnt= 1024,retCnt= 2)"));
    EXPECT_EQ(statusColour("viRead(vi= 2,buf= \"12\",cnt= 1024,retCnt= 2)").toHsl(), QColor::fromHsl(30, 255, 128));
}

TEST_F(LiveLog, WithoutShowLogNoLineAppearsButNumbersAreUsed)
{
    const int numbered = text("logLines").toInt();
    tick("showLog");
    meanwhile(50);
    press("basicClear");
    ASSERT_TRUE(called("viClear", 1));
    meanwhile(700);
    EXPECT_EQ(logRow("viClear(vi= 2)"), -1);
    EXPECT_EQ(text("logLines").toInt(), numbered) << "a line that nobody would see is not even built";
    tick("showLog");
    meanwhile(50);
    press("basicClear");
    EXPECT_TRUE(lineAppears("viClear(vi= 2)"));
}

TEST_F(LiveLog, LiveModeShowsWhatFitsNewestAtTheBottom)
{
    manyCalls(60);
    EXPECT_LT(logRows(), 60);
    EXPECT_GT(logRows(), 3);
    EXPECT_FALSE(table()->verticalScrollBar()->isVisible());
    EXPECT_EQ(text("logDisplayed").toInt(), logRows());
    EXPECT_FALSE(isEnabled("logLiveMode"));
    EXPECT_TRUE(isEnabled("logViewMode"));
}

TEST_F(LiveLog, ViewModeShowsTheWholeSnapshotAndStaysFrozen)
{
    manyCalls(60);
    press("logViewMode");
    const int rows = logRows();
    EXPECT_GE(rows, 60);
    EXPECT_EQ(text("logDisplayed").toInt(), rows);
    EXPECT_TRUE(isEnabled("logLiveMode"));
    EXPECT_FALSE(isEnabled("logViewMode"));
    EXPECT_TRUE(table()->verticalScrollBar()->isVisible());
    EXPECT_EQ(table()->verticalScrollBar()->value(), table()->verticalScrollBar()->maximum());
    meanwhile(700);
    EXPECT_EQ(logRows(), rows);
}

TEST_F(LiveLog, AFinishedCallReturnsToLiveMode)
{
    manyCalls(40);
    press("logViewMode");
    ASSERT_TRUE(isEnabled("logLiveMode"));
    press("basicReadStb");
    EXPECT_TRUE(eventually([this] { return !isEnabled("logLiveMode"); }));
    EXPECT_TRUE(eventually([this] { return logRows() > 0 && logRows() < 40; }));
}

TEST_F(LiveLog, LiveModeButtonReturnsToLiveMode)
{
    press("logViewMode");
    press("logLiveMode");
    EXPECT_FALSE(isEnabled("logLiveMode"));
    EXPECT_TRUE(isEnabled("logViewMode"));
    EXPECT_TRUE(eventually([this] { return logRows() > 0; }));
}

TEST_F(LiveLog, ClearEmptiesTheViewAndKeepsCounting)
{
    press("logClear");
    EXPECT_EQ(logRows(), 0);
    EXPECT_EQ(text("logDisplayed"), "0");
    const int before = text("logLines").toInt();
    press("basicClear");
    ASSERT_TRUE(lineAppears("viClear(vi= 2)"));
    EXPECT_EQ(logRows(), 1);
    EXPECT_EQ(text("logLines").toInt(), before + 1);
}

TEST_F(LiveLog, ControlCCopiesTheSelectedRows)
{
    press("logClear");
    press("basicClear");
    ASSERT_TRUE(lineAppears("viClear(vi= 2)"));
    press("logViewMode");
    ASSERT_EQ(logRows(), 1);
    QTest::mouseClick(table()->viewport(), Qt::LeftButton, Qt::NoModifier,
                      table()->visualItemRect(table()->item(0, 3)).center());
    key(Qt::Key_C, Qt::ControlModifier);
    EXPECT_EQ(QApplication::clipboard()->text(),
              logCell(0, 0) + "\t" + logCell(0, 1) + "\tVI_SUCCESS\tviClear(vi= 2)\t\n");
}

TEST_F(LiveLog, ControlShiftCDoesNotCopy)
{
    QApplication::clipboard()->clear();
    press("logViewMode");
    QTest::mouseClick(table()->viewport(), Qt::LeftButton, Qt::NoModifier,
                      table()->visualItemRect(table()->item(0, 3)).center());
    key(Qt::Key_C, Qt::ControlModifier | Qt::ShiftModifier);
    EXPECT_EQ(QApplication::clipboard()->text(), "");
}

TEST_F(LiveLog, TheHintNamesTheShortcut)
{
    EXPECT_EQ(text("logHint"), "Use Ctrl + C to copy the selected rows to the cache.");
}

TEST_F(LiveLog, ALongTextIsCutAndDoesNotDisturbTheTable)
{
    enter("basicCommand", QString(400, 'x'));
    press("basicWrite");
    ASSERT_TRUE(called("viWrite", 1));
    const QString cut = "viWrite(vi= 2,buf= \"" + QString(250, 'x') + "\",cnt= 400,retCnt= 400)";
    EXPECT_TRUE(lineAppears(cut));
}

} // namespace
