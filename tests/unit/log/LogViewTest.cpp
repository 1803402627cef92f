#include "log/LogTextDisplay.h"

#include "log/Log.h"
#include "pipeline/VisaDispatcher.h"
#include "pipeline/VisaFunctionCallHandler.h"

#include <QApplication>
#include <QClipboard>
#include <QHeaderView>
#include <QLabel>
#include <QPushButton>
#include <QScrollBar>
#include <QTableWidget>
#include <QtTest>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <memory>

namespace
{

constexpr std::int32_t ErrorTimeOut = -1073807339;
constexpr std::int32_t SuccessMaxCnt = 0x3FFF0006;

QString utf8(const char *text)
{
    return QString::fromUtf8(text);
}

/// The live view in a window of its own, used with mouse and keys.
class LogView : public testing::Test
{
protected:
    LogView()
    {
        m_view->resize(750, 480);
        m_view->show();
        m_view->activateWindow();
        EXPECT_TRUE(QTest::qWaitForWindowExposed(m_view.get()));
        fitRows(20);
        m_view->setQueue(m_ring.get());
    }

    ~LogView() override { QApplication::clipboard()->clear(); }

    QTableWidget *table() { return m_view->findChild<QTableWidget *>("logTable"); }
    QPushButton *button(const char *name) { return m_view->findChild<QPushButton *>(name); }
    QString label(const char *name) { return m_view->findChild<QLabel *>(name)->text(); }
    void click(const char *name) { QTest::mouseClick(button(name), Qt::LeftButton); }

    bool inLiveMode() { return !button("logLiveMode")->isEnabled() && button("logViewMode")->isEnabled(); }
    bool inViewMode() { return button("logLiveMode")->isEnabled() && !button("logViewMode")->isEnabled(); }

    int rowHeight() { return QFontMetrics(table()->font()).height() + 2; }

    /// Makes the window as tall as it takes for @p rows rows and a bit.
    void fitRows(int rows)
    {
        const int wanted = table()->horizontalHeader()->height() + rows * rowHeight() + 3;
        m_view->resize(m_view->width(), m_view->height() + wanted - table()->height());
        QCoreApplication::processEvents();
        ASSERT_EQ(table()->height(), wanted);
    }

    void add(std::uint64_t first, std::uint64_t last)
    {
        for (std::uint64_t number = first; number <= last; ++number)
            addVisaLine(number, 0, 0, "viClear(vi= 1)");
    }

    void addVisaLine(std::uint64_t number, std::int32_t status, std::uint64_t duration, const char *text)
    {
        FastBuffer line{};
        line.visaLine = true;
        line.line = number;
        line.status = status;
        line.duration = duration;
        std::snprintf(line.text, sizeof line.text, "%s", text);
        m_ring->addMessage(&line);
    }

    void addFreeText(std::uint64_t number, const char *text)
    {
        FastBuffer line{};
        line.line = number;
        line.status = ErrorTimeOut;
        line.duration = 5;
        std::snprintf(line.text, sizeof line.text, "%s", text);
        m_ring->addMessage(&line);
    }

    QString cell(int row, int column)
    {
        const QTableWidgetItem *item = table()->item(row, column);
        return item ? item->text() : QString("(no item)");
    }

    QStringList column(int number)
    {
        QStringList texts;
        for (int row = 0; row < table()->rowCount(); ++row)
            texts << cell(row, number);
        return texts;
    }

    static QStringList numbers(int first, int last)
    {
        QStringList texts;
        for (int number = first; number <= last; ++number)
            texts << QString::number(number);
        return texts;
    }

    void selectRow(int row, Qt::KeyboardModifiers modifiers = Qt::NoModifier)
    {
        const QPoint inCell = table()->visualItemRect(table()->item(row, 0)).center();
        QTest::mouseClick(table()->viewport(), Qt::LeftButton, modifiers, inCell);
    }

    static QString clipboard() { return QApplication::clipboard()->text(); }

    QObject m_dispatcherOwner;
    const std::unique_ptr<VisaFunctionCallHandler> m_handler =
        std::make_unique<VisaFunctionCallHandler>(VisaDispatcher::getVisaDispatcherInstance(&m_dispatcherOwner));
    const std::unique_ptr<StringMessageQueue> m_ring = std::make_unique<StringMessageQueue>();
    const std::unique_ptr<LogTextDisplay> m_view = std::make_unique<LogTextDisplay>(m_handler.get(), nullptr);
};

TEST_F(LogView, HasFourColumnsWithoutRowNumbers)
{
    ASSERT_EQ(table()->columnCount(), 4);
    const char *const labels[] = {"Line", "Duration", "Status", "Visa Operation"};
    for (int i = 0; i < 4; ++i)
        EXPECT_EQ(table()->horizontalHeaderItem(i)->text(), labels[i]);
    const QFontMetrics metrics(table()->font());
    EXPECT_EQ(table()->columnWidth(0), metrics.horizontalAdvance("Line") + 10);
    EXPECT_EQ(table()->columnWidth(1), metrics.horizontalAdvance("Duration (s)") + 10);
    EXPECT_EQ(table()->columnWidth(2), metrics.horizontalAdvance("Status") + 10);
    EXPECT_TRUE(table()->horizontalHeader()->stretchLastSection());
    EXPECT_TRUE(table()->verticalHeader()->isHidden());
    EXPECT_EQ(table()->horizontalScrollBarPolicy(), Qt::ScrollBarAlwaysOff);
    EXPECT_EQ(table()->editTriggers(), QAbstractItemView::NoEditTriggers);
    EXPECT_EQ(table()->selectionBehavior(), QAbstractItemView::SelectRows);
}

TEST_F(LogView, SaysWhatItsControlsAre)
{
    EXPECT_EQ(button("logClear")->text(), "Clear");
    EXPECT_EQ(button("logLiveMode")->text(), "Live Mode");
    EXPECT_EQ(button("logViewMode")->text(), "View Mode");
    EXPECT_EQ(label("logHint"), "Use Ctrl + C to copy the selected rows to the cache.");
    QStringList texts;
    for (const QLabel *each : m_view->findChildren<QLabel *>())
        texts << each->text();
    EXPECT_TRUE(texts.contains("Lines:"));
    EXPECT_TRUE(texts.contains("Displayed:"));
}

TEST_F(LogView, StartsInLiveModeAndShowsLinesByItself)
{
    EXPECT_TRUE(inLiveMode());
    EXPECT_EQ(table()->verticalScrollBarPolicy(), Qt::ScrollBarAlwaysOff);
    add(1, 5);
    EXPECT_TRUE(QTest::qWaitFor([&] { return table()->rowCount() == 5; }, 20000));
    add(6, 7);
    EXPECT_TRUE(QTest::qWaitFor([&] { return table()->rowCount() == 7; }, 20000));
}

TEST_F(LogView, LooksEvery300Milliseconds)
{
    const auto *timer = m_view->findChild<QTimer *>("logTimer");
    ASSERT_NE(timer, nullptr);
    EXPECT_TRUE(timer->isActive());
    EXPECT_EQ(timer->interval(), 300);
    LogTextDisplay idle(nullptr, nullptr);
    EXPECT_FALSE(idle.findChild<QTimer *>("logTimer")->isActive()) << "there is no ring to look at yet";
}

TEST_F(LogView, ShowsFewLinesFromTheTop)
{
    add(1, 5);
    m_view->timeout();
    EXPECT_EQ(m_view->visibleLines(), 20);
    EXPECT_EQ(column(0), numbers(1, 5));
    EXPECT_EQ(label("logDisplayed"), "5");
    for (int row = 0; row < 5; ++row)
        EXPECT_EQ(table()->rowHeight(row), rowHeight());
}

TEST_F(LogView, ShowsTheNewestOfManyLinesAndTheWholeSnapshotInViewMode)
{
    add(1, 2000);
    m_view->timeout();
    EXPECT_EQ(column(0), numbers(1981, 2000));
    EXPECT_EQ(label("logDisplayed"), "20");

    click("logViewMode");
    EXPECT_TRUE(inViewMode());
    EXPECT_EQ(column(0), numbers(977, 2000));
    EXPECT_EQ(label("logDisplayed"), "1024");
    EXPECT_EQ(table()->verticalScrollBarPolicy(), Qt::ScrollBarAsNeeded);
    QCoreApplication::processEvents();
    EXPECT_TRUE(table()->verticalScrollBar()->isVisible());
    EXPECT_EQ(table()->verticalScrollBar()->value(), table()->verticalScrollBar()->maximum());
    EXPECT_EQ(table()->rowHeight(1023), rowHeight());
}

TEST_F(LogView, WritesTheDurationInWholeUnits)
{
    struct {
        std::uint64_t nanoseconds;
        const char *text;
    } const rows[] = {{0, "0 ns"},           {999, "999 ns"},
                      {1000, "1 µs"},        {1999, "1 µs"},
                      {999999, "999 µs"},    {1000000, "1 ms"},
                      {999999999, "999 ms"}, {1000000000, "1 s"},
                      {61999999999, "61 s"}, {18446744073709551615u, "18446744073 s"}};
    for (const auto &row : rows)
        addVisaLine(1, 0, row.nanoseconds, "");
    m_view->timeout();
    ASSERT_EQ(table()->rowCount(), 10);
    for (int row = 0; row < 10; ++row)
        EXPECT_EQ(cell(row, 1), utf8(rows[row].text));
}

TEST_F(LogView, ColoursErrorsAndWarnings)
{
    addVisaLine(1, ErrorTimeOut, 0, "");
    addVisaLine(2, SuccessMaxCnt, 0, "");
    addVisaLine(3, 0, 0, "");
    m_view->timeout();
    EXPECT_EQ(column(2), QStringList({"VI_ERROR_TMO", "VI_SUCCESS_MAX_CNT", "VI_SUCCESS"}));
    EXPECT_EQ(table()->item(0, 2)->foreground().color(), QColor(Qt::red));
    EXPECT_EQ(table()->item(1, 2)->foreground().color(), QColor::fromHsl(30, 255, 128));
    EXPECT_EQ(table()->item(2, 2)->foreground(), QBrush());
}

TEST_F(LogView, TakesTheColourBackWhenARowGetsAnotherLine)
{
    addVisaLine(1, ErrorTimeOut, 0, "");
    m_view->timeout();
    m_ring->clear();
    addVisaLine(2, 0, 0, "");
    m_view->timeout();
    EXPECT_EQ(cell(0, 0), "2");
    EXPECT_EQ(table()->item(0, 2)->foreground(), QBrush());
}

TEST_F(LogView, AlignsItsCells)
{
    add(1, 1);
    m_view->timeout();
    EXPECT_TRUE(table()->item(0, 0)->textAlignment() & Qt::AlignRight);
    EXPECT_TRUE(table()->item(0, 1)->textAlignment() & Qt::AlignRight);
    EXPECT_EQ(table()->item(0, 2)->textAlignment(), int(Qt::AlignCenter));
}

TEST_F(LogView, ShowsFreeTextWithoutDurationAndStatus)
{
    addFreeText(7, "Test started");
    addVisaLine(8, 0, 1, "viClear(vi= 1)");
    m_view->timeout();
    EXPECT_EQ(cell(0, 0), "7");
    EXPECT_TRUE(table()->item(0, 0)->textAlignment() & Qt::AlignRight);
    EXPECT_EQ(table()->item(0, 1), nullptr);
    EXPECT_EQ(table()->item(0, 2), nullptr);
    EXPECT_EQ(cell(0, 3), "Test started");
    EXPECT_EQ(table()->rowHeight(0), rowHeight());
    EXPECT_EQ(cell(1, 1), "1 ns");
}

TEST_F(LogView, ChangesARowFromOneKindOfLineToTheOther)
{
    for (int round = 0; round < 3; ++round) {
        addVisaLine(1, 0, 1, "call");
        m_view->timeout();
        EXPECT_EQ(cell(0, 1) + cell(0, 2) + cell(0, 3), "1 nsVI_SUCCESScall");
        m_ring->clear();
        addFreeText(2, "text");
        m_view->timeout();
        EXPECT_EQ(cell(0, 1) + cell(0, 2) + cell(0, 3), "(no item)(no item)text");
        m_ring->clear();
    }
}

TEST_F(LogView, ReadsTextAsUtf8UpToItsEnd)
{
    addFreeText(1, "10 µV");
    FastBuffer full{};
    std::fill_n(full.text, sizeof full.text, 'x');
    m_ring->addMessage(&full);
    addFreeText(3, "<b>\xff");
    m_view->timeout();
    EXPECT_EQ(cell(0, 3), utf8("10 µV"));
    EXPECT_EQ(cell(1, 3), QString(450, 'x'));
    EXPECT_EQ(cell(2, 3), utf8("<b>\xef\xbf\xbd"));
    EXPECT_EQ(table()->item(2, 3)->toolTip(), utf8("<p>&lt;b&gt;\xef\xbf\xbd</p>"));
}

TEST_F(LogView, KeepsItsRowsInViewModeWhileTheNumberOfLinesGoesOn)
{
    add(1, 30);
    m_view->timeout();
    click("logViewMode");
    add(31, 40);
    Log::getNewLine();
    m_view->timeout();
    EXPECT_EQ(column(0), numbers(1, 30));
    EXPECT_EQ(label("logLines"), QString::number(Log::s_line.load()));
    const QString before = label("logLines");
    Log::getNewLine();
    m_view->timeout();
    EXPECT_EQ(label("logLines").toULongLong(), before.toULongLong() + 1);
}

TEST_F(LogView, ShowsInViewModeWhatTheLastLookFound)
{
    add(1, 3);
    m_view->timeout();
    add(4, 5); // not looked at yet
    click("logViewMode");
    EXPECT_EQ(column(0), numbers(1, 3));
}

TEST_F(LogView, ComesBackToLiveModeByItsButton)
{
    add(1, 30);
    m_view->timeout();
    click("logViewMode");
    click("logLiveMode");
    EXPECT_TRUE(inLiveMode());
    EXPECT_EQ(table()->rowCount(), 0);
    EXPECT_EQ(table()->verticalScrollBarPolicy(), Qt::ScrollBarAlwaysOff);
    EXPECT_TRUE(table()->verticalScrollBar()->isHidden());
    m_view->timeout(); // no new line, yet it draws again
    EXPECT_EQ(column(0), numbers(11, 30));
}

TEST_F(LogView, ComesBackToLiveModeWithAnyFinishedCall)
{
    for (const VisaFunctionCallTyp type : {VisaFunctionCallTyp::Read, VisaFunctionCallTyp::StopTest}) {
        add(1, 3);
        m_view->timeout();
        click("logViewMode");
        ASSERT_TRUE(inViewMode());
        _visaFunctionCall call;
        call.type = type;
        m_handler->VisaFunctionCallFinshed(call);
        EXPECT_TRUE(QTest::qWaitFor([&] { return inLiveMode(); }, 20000));
    }
}

TEST_F(LogView, LeavesTheRowsAloneWhenACallFinishesInLiveMode)
{
    add(1, 3);
    m_view->timeout();
    _visaFunctionCall call;
    m_view->visaFunctionCallFinished(call);
    EXPECT_EQ(column(0), numbers(1, 3));
}

TEST_F(LogView, ClearsInLiveMode)
{
    add(1, 30);
    m_view->timeout();
    click("logClear");
    EXPECT_EQ(table()->rowCount(), 0);
    EXPECT_EQ(label("logDisplayed"), "0");
    EXPECT_TRUE(inLiveMode());
    m_view->timeout();
    EXPECT_EQ(table()->rowCount(), 0);
    add(31, 32);
    m_view->timeout();
    EXPECT_EQ(column(0), numbers(31, 32));
}

TEST_F(LogView, ClearsInViewModeAndStaysThere)
{
    add(1, 30);
    m_view->timeout();
    click("logViewMode");
    click("logClear");
    EXPECT_TRUE(inViewMode());
    EXPECT_EQ(table()->rowCount(), 0);
    EXPECT_EQ(label("logDisplayed"), "0");
    FastBuffer line;
    EXPECT_EQ(m_ring->copyFromQueue(&line, 1), 0u);
}

TEST_F(LogView, BringsNothingBackThatWasCleared)
{
    add(1, 30);
    m_view->timeout();
    click("logClear");
    fitRows(25);
    EXPECT_EQ(table()->rowCount(), 0);
    click("logViewMode");
    EXPECT_EQ(table()->rowCount(), 0);
    EXPECT_EQ(label("logDisplayed"), "0");
}

TEST_F(LogView, FitsItsRowsToTheHeightInLiveMode)
{
    add(1, 100);
    m_view->timeout();
    fitRows(30);
    EXPECT_EQ(column(0), numbers(71, 100));
    EXPECT_EQ(label("logDisplayed"), "30");
    fitRows(7);
    EXPECT_EQ(column(0), numbers(94, 100));
    EXPECT_EQ(label("logDisplayed"), "7");
}

TEST_F(LogView, ComputesNoFewerThanNoRows)
{
    add(1, 100);
    m_view->timeout();
    table()->setMinimumHeight(0);
    table()->setFixedHeight(0);
    ASSERT_GT(table()->horizontalHeader()->height(), rowHeight()) << "less than minus one row";
    EXPECT_EQ(m_view->visibleLines(), 0);
    add(101, 101);
    m_view->timeout();
    EXPECT_EQ(table()->rowCount(), 0);
    EXPECT_EQ(label("logDisplayed"), "0");
}

TEST_F(LogView, KeepsItsRowsInViewModeWhenItIsResized)
{
    add(1, 100);
    m_view->timeout();
    click("logViewMode");
    fitRows(10);
    EXPECT_EQ(column(0), numbers(1, 100));
}

TEST_F(LogView, CopiesSelectedRowsWithTabs)
{
    addVisaLine(1, 0, 15230, "viClear(vi= 1)");
    addFreeText(2, "Test started");
    addVisaLine(3, ErrorTimeOut, 2000000000, "viRead(vi= 1)");
    addVisaLine(4, 0, 1, "viClose(vi= 1)");
    m_view->timeout();
    selectRow(1);
    selectRow(2, Qt::ShiftModifier);
    const QSignalSpy copied(QApplication::clipboard(), &QClipboard::dataChanged);
    ASSERT_EQ(QApplication::focusWidget(), table());
    QTest::keyClick(QApplication::focusWidget(), Qt::Key_C, Qt::ControlModifier);
    EXPECT_EQ(copied.count(), 1) << "the table must not copy a cell of its own first";
    EXPECT_EQ(clipboard(), "2\t\t\tTest started\t\n"
                           "3\t2 s\tVI_ERROR_TMO\tviRead(vi= 1)\t\n");

    selectRow(0);
    selectRow(3, Qt::ControlModifier);
    QTest::keyClick(QApplication::focusWidget(), Qt::Key_C, Qt::ControlModifier);
    EXPECT_EQ(clipboard(), utf8("1\t15 µs\tVI_SUCCESS\tviClear(vi= 1)\t\n"
                                "4\t1 ns\tVI_SUCCESS\tviClose(vi= 1)\t\n"));
}

TEST_F(LogView, CopiesThoughTheFocusIsNotInTheTable)
{
    add(1, 1);
    m_view->timeout();
    selectRow(0);
    QTest::keyClick(m_view.get(), Qt::Key_C, Qt::ControlModifier);
    EXPECT_EQ(clipboard(), "1\t0 ns\tVI_SUCCESS\tviClear(vi= 1)\t\n");
}

TEST_F(LogView, CopiesWithControlAndCAlone)
{
    add(1, 1);
    m_view->timeout();
    selectRow(0);
    QApplication::clipboard()->setText("untouched");
    for (QWidget *target : {QApplication::focusWidget(), static_cast<QWidget *>(m_view.get())}) {
        QTest::keyClick(target, Qt::Key_C, Qt::ControlModifier | Qt::ShiftModifier);
        QTest::keyClick(target, Qt::Key_C, Qt::ControlModifier | Qt::AltModifier);
        QTest::keyClick(target, Qt::Key_C);
        QTest::keyClick(target, Qt::Key_X, Qt::ControlModifier);
        EXPECT_EQ(clipboard(), "untouched");
    }
}

TEST_F(LogView, UsesItsCellsAgain)
{
    add(1, 100);
    m_view->timeout();
    const QTableWidgetItem *before = table()->item(19, 3);
    add(101, 200);
    m_view->timeout();
    EXPECT_EQ(table()->item(19, 3), before);
    EXPECT_EQ(column(0), numbers(181, 200));
}

TEST_F(LogView, DoesNothingWithoutARing)
{
    LogTextDisplay empty(nullptr, nullptr);
    empty.timeout();
    empty.buttonViewModeClicked();
    empty.buttonClearClicked();
    empty.buttonLiveModeClicked();
    EXPECT_EQ(empty.findChild<QTableWidget *>("logTable")->rowCount(), 0);
}

} // namespace
