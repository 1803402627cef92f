// The page with the test in the worker's place: what it sends and how it takes what comes back.

#include "instrtests/TestTab.h"

#include "instrtests/TestFunctionWidget.h"
#include "instrtests/visatestfunctions.h"
#include "log/Log.h"
#include "log/SessionLog.h"
#include "support/ModalAnswer.h"
#include "unit/panels/PanelTest.h"

#include <visa.h>

#include <QBoxLayout>
#include <QCheckBox>
#include <QComboBox>
#include <QFontMetrics>
#include <QLabel>
#include <QLineEdit>
#include <QMessageBox>
#include <QPushButton>
#include <QTimer>

namespace
{

class TestPage : public PanelTest
{
protected:
    TestPage()
    {
        m_page->show();
        EXPECT_TRUE(QTest::qWaitForWindowExposed(m_page.get()));
    }

    template <class Widget>
    Widget *part(int slot, const char *what)
    {
        return find<Widget>(*m_page, ("test" + std::to_string(slot) + what).c_str());
    }
    QPushButton *start(int slot) { return part<QPushButton>(slot, "Start"); }
    QPushButton *stop(int slot) { return part<QPushButton>(slot, "Stop"); }
    QLabel *result(int slot) { return part<QLabel>(slot, "Result"); }
    QLabel *status(int slot) { return part<QLabel>(slot, "Status"); }
    Qt::CursorShape cursor(int slot) { return part<QWidget>(slot, "")->cursor().shape(); }
    QColor color(int slot) { return result(slot)->palette().color(QPalette::WindowText); }

    void expectIdle(int slot)
    {
        EXPECT_TRUE(start(slot)->isEnabled());
        EXPECT_FALSE(stop(slot)->isEnabled());
        EXPECT_EQ(result(slot)->text(), "");
        EXPECT_EQ(status(slot)->text(), "");
        EXPECT_EQ(cursor(slot), Qt::ArrowCursor);
    }
    void expectRunning(int slot, const QString &name)
    {
        EXPECT_FALSE(start(slot)->isEnabled());
        EXPECT_TRUE(stop(slot)->isEnabled());
        EXPECT_EQ(result(slot)->text(), "Running " + name);
        EXPECT_EQ(color(slot), QColor(Qt::black));
    }

    /// The worker finishes the start that was sent.
    void finishStart() { finish(PanelTest::result(Kind::Test)); }
    void endTest(unsigned slot, unsigned outcome, ViStatus callStatus = 0)
    {
        _visaFunctionCall call = PanelTest::result(Kind::StopTest, callStatus);
        call.parameter[0].uintValue = slot;
        call.parameter[1].uintValue = outcome;
        finish(call);
    }
    /// A locking request is outstanding from now on.
    void occupy()
    {
        _visaFunctionCall read;
        read.type = Kind::Read;
        ASSERT_TRUE(m_handler->sendVisaFunctionCall(read, true));
        requests();
    }
    bool isLocked()
    {
        _visaFunctionCall read;
        read.type = Kind::Read;
        const bool taken = m_handler->sendVisaFunctionCall(read, true);
        if (taken) {
            requests();
            finish(PanelTest::result(Kind::Read));
        }
        return !taken;
    }

    std::unique_ptr<TestTab> m_page = std::make_unique<TestTab>(m_handler.get(), nullptr);
};

TEST_F(TestPage, ShowsBoxesAndSlotsFromTopToBottom)
{
    auto *column = qobject_cast<QVBoxLayout *>(find<QCheckBox>(*m_page, "testShowLog")->parentWidget()->layout());
    ASSERT_TRUE(column);
    QStringList names;
    for (int i = 0; i < column->count(); ++i)
        names << (column->itemAt(i)->widget() ? column->itemAt(i)->widget()->objectName() : QString("spacer"));
    EXPECT_EQ(names, QStringList({"testShowLog", "testWriteLog", "test0", "test1", "spacer"}));
    EXPECT_EQ(find<QCheckBox>(*m_page, "testShowLog")->text(), "Show Log");
    EXPECT_EQ(find<QCheckBox>(*m_page, "testWriteLog")->text(), "Write Log");
    EXPECT_FALSE(find<QCheckBox>(*m_page, "testShowLog")->isChecked());
    EXPECT_FALSE(find<QCheckBox>(*m_page, "testWriteLog")->isChecked());
    EXPECT_TRUE(part<QPushButton>(0, "Find")->isHidden());
    EXPECT_FALSE(part<QPushButton>(1, "Find")->isHidden());
}

TEST_F(TestPage, LaysASlotOut)
{
    auto *column = qobject_cast<QVBoxLayout *>(part<QWidget>(1, "")->layout());
    ASSERT_TRUE(column);
    ASSERT_EQ(column->count(), 4);
    EXPECT_EQ(column->itemAt(0)->widget(), status(1));
    auto *resource = qobject_cast<QHBoxLayout *>(column->itemAt(1)->layout());
    EXPECT_EQ(resource->itemAt(0)->widget(), part<QLineEdit>(1, "Resource"));
    EXPECT_EQ(resource->itemAt(1)->widget(), part<QPushButton>(1, "Find"));
    auto *test = qobject_cast<QHBoxLayout *>(column->itemAt(2)->layout());
    EXPECT_EQ(test->itemAt(0)->widget(), part<QComboBox>(1, "Chooser"));
    EXPECT_EQ(test->stretch(0), 10);
    EXPECT_EQ(test->itemAt(1)->widget(), start(1));
    EXPECT_EQ(test->itemAt(2)->widget(), stop(1));
    EXPECT_EQ(column->itemAt(3)->widget(), result(1));
    EXPECT_EQ(result(1)->minimumHeight(), QFontMetrics(QFont()).height() + 10);
    EXPECT_EQ(part<QPushButton>(1, "Find")->text(), "Find Resource");
    EXPECT_EQ(start(1)->text(), "Start Test");
    EXPECT_EQ(stop(1)->text(), "Stop Test");
    expectIdle(0);
    expectIdle(1);
}

TEST_F(TestPage, OffersTheCatalogue)
{
    const _visatest *tests = nullptr;
    unsigned count = 0;
    getListOfTests(&tests, &count);
    auto *chooser = part<QComboBox>(0, "Chooser");
    ASSERT_EQ(chooser->count(), 3);
    EXPECT_EQ(chooser->itemText(0), "Performance Test");
    EXPECT_EQ(chooser->itemText(1), "Stress 4882 Test ");
    EXPECT_EQ(chooser->itemText(2), "Stress Mmem Test");
    for (int i = 0; i < 3; ++i)
        EXPECT_EQ(chooser->itemData(i).toULongLong(), reinterpret_cast<quintptr>(tests[i].function));
}

TEST_F(TestPage, FollowsTheSessionsResourceInTheUpperSlot)
{
    m_page->resourceNameChanged("TCPIP::a::INSTR");
    m_page->resourceNameChanged("TCPIP::a::INSTR");
    EXPECT_EQ(part<QLineEdit>(0, "Resource")->text(), "TCPIP::a::INSTR");
    EXPECT_EQ(part<QLineEdit>(1, "Resource")->text(), "");
}

TEST_F(TestPage, NothingElseCanBeTypedIntoTheUpperSlot)
{
    m_page->resourceNameChanged("TCPIP::a::INSTR");
    QTest::keyClicks(part<QLineEdit>(0, "Resource"), "x");
    QTest::keyClicks(part<QLineEdit>(1, "Resource"), "x");
    EXPECT_EQ(part<QLineEdit>(0, "Resource")->text(), "TCPIP::a::INSTR");
    EXPECT_EQ(part<QLineEdit>(1, "Resource")->text(), "x");
}

TEST_F(TestPage, ShowTestTwoDoesNothing)
{
    m_page->showTestTwo(false);
    EXPECT_FALSE(part<QWidget>(1, "")->isHidden());
}

TEST_F(TestPage, SwitchesTheLogOfTheTests)
{
    const auto log = std::make_unique<Log>(nullptr);
    SessionLog testLog(log.get(), nullptr);
    testLog.showLog(true);
    m_page->setTestLog(&testLog);
    EXPECT_FALSE(testLog.isLogging()) << "the boxes' state counts from the start";
    QTest::mouseClick(find<QCheckBox>(*m_page, "testShowLog"), Qt::LeftButton, {}, QPoint(8, 8));
    EXPECT_TRUE(testLog.isLogging());
    QTest::mouseClick(find<QCheckBox>(*m_page, "testShowLog"), Qt::LeftButton, {}, QPoint(8, 8));
    EXPECT_FALSE(testLog.isLogging());
    QTest::mouseClick(find<QCheckBox>(*m_page, "testWriteLog"), Qt::LeftButton, {}, QPoint(8, 8));
    EXPECT_TRUE(testLog.isLogging());
}

TEST_F(TestPage, StartSendsResourceTestAndSlot)
{
    const _visatest *tests = nullptr;
    unsigned count = 0;
    getListOfTests(&tests, &count);
    part<QLineEdit>(1, "Resource")->setText(QString::fromUtf8("TCPIP::gr\xC3\xBC\xC3\x9F\x65"));
    QTest::keyClick(part<QComboBox>(1, "Chooser"), Qt::Key_Down);
    press(start(1));
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::Test);
    EXPECT_EQ(sent[0].status, 0);
    EXPECT_EQ(sent[0].parameter[0].stringValue, "TCPIP::gr\xC3\xBC\xC3\x9F\x65");
    EXPECT_EQ(sent[0].parameter[1].uintValue, reinterpret_cast<std::uintptr_t>(tests[1].function));
    EXPECT_EQ(sent[0].parameter[2].uintValue, 1u);
    expectRunning(1, "Stress 4882 Test ");
    expectIdle(0);
}

TEST_F(TestPage, StopSendsTheSlotAndWaitsForTheTestsEnd)
{
    press(start(1));
    finishStart();
    requests();
    press(stop(1));
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 2u);
    EXPECT_EQ(sent[0].type, Kind::StopTest);
    EXPECT_EQ(sent[0].parameter[0].uintValue, 1u);
    EXPECT_EQ(sent[1].type, Kind::ParseRsrc) << "frees the other buttons";
    EXPECT_EQ(cursor(1), Qt::WaitCursor);
    EXPECT_NE(cursor(0), Qt::WaitCursor);
    expectRunning(1, "Performance Test");
    finish(PanelTest::result(Kind::ParseRsrc));
    EXPECT_EQ(cursor(1), Qt::WaitCursor);
    endTest(1, 0);
    expectIdle(1);
}

TEST_F(TestPage, AStopDoesNotKeepTheOtherButtonsWaiting)
{
    press(start(0));
    finishStart();
    press(stop(0));
    EXPECT_FALSE(isLocked());
    press(start(1));
    const auto sent = requests();
    EXPECT_EQ(sent.back().type, Kind::Test);
    expectRunning(1, "Performance Test");
}

TEST_F(TestPage, AnEndOfTheOtherSlotIsIgnored)
{
    press(start(0));
    finishStart();
    press(start(1));
    finishStart();
    endTest(1, 0);
    expectRunning(0, "Performance Test");
    expectIdle(1);
}

TEST_F(TestPage, ATestThatEndsByItselfNeedsNoStop)
{
    press(start(0));
    finishStart();
    endTest(0, 0);
    expectIdle(0);
}

TEST_F(TestPage, AFailureTurnsRedAndWarns)
{
    press(start(0));
    finishStart();
    QString title;
    QString text;
    int buttons = 0;
    bool idleBelow = false;
    ModalAnswer warning("testAborted", [&](QDialog *dialog) {
        auto *box = qobject_cast<QMessageBox *>(dialog);
        title = box->windowTitle();
        text = box->text();
        buttons = box->standardButtons();
        idleBelow = start(0)->isEnabled() && result(0)->text() == "Error occurred" && color(0) == QColor(Qt::red);
        EXPECT_EQ(box->icon(), QMessageBox::Warning);
        EXPECT_TRUE(box->isModal());
        QTest::keyClick(box, Qt::Key_Return);
    });
    endTest(0, 1);
    EXPECT_EQ(warning.count(), 1);
    EXPECT_EQ(title, "An error occurred");
    EXPECT_EQ(text, "Test aborted due to a VISA error!");
    EXPECT_EQ(buttons, QMessageBox::Ok);
    EXPECT_TRUE(idleBelow);
    EXPECT_EQ(result(0)->text(), "Error occurred");
    EXPECT_FALSE(stop(0)->isEnabled());
    // The next start is black again.
    press(start(0));
    expectRunning(0, "Performance Test");
}

TEST_F(TestPage, AFailedRecordCountsLikeAFailedTest)
{
    press(start(0));
    ModalAnswer warning("testAborted", [](QDialog *box) { QTest::keyClick(box, Qt::Key_Return); });
    endTest(0, 0, VI_ERROR_ALLOC);
    EXPECT_EQ(warning.count(), 1);
}

TEST_F(TestPage, ASecondFailureWhileTheFirstOneIsShownIsShownToo)
{
    press(start(0));
    finishStart();
    press(start(1));
    finishStart();
    ModalAnswer warning("testAborted", [](QDialog *box) { QTest::keyClick(box, Qt::Key_Return); });
    QTimer::singleShot(0, m_page.get(), [this] { endTest(1, 1); }); // in the event loop of the first box
    endTest(0, 1);
    EXPECT_EQ(warning.count(), 2);
    EXPECT_EQ(result(0)->text(), "Error occurred");
    EXPECT_EQ(result(1)->text(), "Error occurred");
}

TEST_F(TestPage, ThePageMayGoWhileTheWarningIsShown)
{
    press(start(0));
    finishStart();
    ModalAnswer warning("testAborted", [&](QDialog *) { m_page.reset(); });
    endTest(0, 1);
    EXPECT_EQ(warning.count(), 1);
}

TEST_F(TestPage, AStartThatWasRefusedSaysSoAndItsStopBringsTheSlotBack)
{
    occupy();
    press(start(0));
    EXPECT_TRUE(requests().empty());
    expectRunning(0, "Performance Test");
    EXPECT_EQ(status(0)->text(), "Not started: another call is running. Press \"Stop Test\", then start again.");
    press(stop(0));
    expectIdle(0);
    EXPECT_FALSE(isLocked());
    press(start(0));
    EXPECT_EQ(requests().back().type, Kind::Test);
    EXPECT_EQ(status(0)->text(), "");
}

TEST_F(TestPage, AStartThatWasRefusedIsNotTakenForTheOtherSlots)
{
    press(start(1)); // outstanding
    press(start(0)); // refused
    EXPECT_EQ(requests().size(), 1u);
    finishStart(); // of slot 1
    press(stop(0));
    expectIdle(0);
    expectRunning(1, "Performance Test");
    press(stop(1));
    EXPECT_EQ(cursor(1), Qt::WaitCursor) << "that test does run";
}

TEST_F(TestPage, AStopThatIsRefusedGoesOutAllTheSame)
{
    press(start(0));
    finishStart();
    requests();
    occupy();
    press(stop(0));
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::StopTest);
    EXPECT_EQ(sent[0].parameter[0].uintValue, 0u);
    EXPECT_EQ(cursor(0), Qt::WaitCursor);
    endTest(0, 0);
    expectIdle(0);
}

TEST_F(TestPage, StopPressedTwiceIsNoMatter)
{
    press(start(0));
    finishStart();
    press(stop(0));
    press(stop(0));
    endTest(0, 0);
    expectIdle(0);
    press(start(0));
    expectRunning(0, "Performance Test");
}

TEST_F(TestPage, AStopThatMeetsTheTestsOwnEndLeavesNothingBehind)
{
    press(start(0));
    finishStart();
    press(stop(0));
    endTest(0, 0); // the test's own, on its way when the button was pressed
    expectIdle(0);
    EXPECT_FALSE(isLocked());
    // The worker takes the stop only now, and answers nothing to it.
    requests();
    press(start(0));
    EXPECT_EQ(requests().back().type, Kind::Test);
}

TEST_F(TestPage, WithoutAHandlerNothingIsStuck)
{
    m_handler.reset();
    press(start(0));
    press(stop(0));
    expectIdle(0);
}

TEST_F(TestPage, TheKeyboardVisitsWhatItCanUse)
{
    EXPECT_EQ(tabOrder(*m_page, find<QCheckBox>(*m_page, "testShowLog")),
              QStringList({"testShowLog", "testWriteLog", "test0Resource", "test0Find", "test0Chooser", "test1Resource",
                           "test1Find", "test1Chooser"}));
    for (const char *name : {"test0Resource", "test0Chooser", "test1Resource", "test1Chooser"})
        EXPECT_NE(find<QWidget>(*m_page, name)->accessibleName(), "") << name;
}

} // namespace
