// Starting and stopping tests at bad moments, on the scripted library.

#include "gui/support/StandinWindowTest.h"
#include "gui/support/TestsPage.h"

#include "app/MainWindow.h"
#include "support/ModalAnswer.h"

#include <visa.h>

#include <QElapsedTimer>
#include <QTest>
#include <QTreeWidget>

#include <thread>
#include <utility>

namespace
{

class InstrumentSlots : public TestsPage<StandinWindowTest>
{
protected:
    InstrumentSlots()
    {
        standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4015, 2);
        standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0x00500806);
        for (const char *command : {"*IDN?", "*CLS;*IDN?"})
            standin::setReply(command, "Maker,Model,1,2.0\n");
        standin::setReply("*OPC?", "1\n");
        standin::setReply(":mmem:msis?", "C:\n");
        standin::setReply(":mmem:cdir?", "C:\n");
        standin::setReply("system:error?", "0,\"No error\"\n");
        standin::setReply("*STB?", "0\n");
    }

    void open()
    {
        openWindow();
        connectSession();
        showPage("Tests");
    }

    /// A test that stands at the gate, in its first device clear, which has that status afterwards.
    std::shared_ptr<standin::Gate> startAtAGate(int slot, Test test, ViStatus status)
    {
        auto gate = std::make_shared<standin::Gate>();
        standin::script("viClear", {.status = status, .gate = gate});
        choose(slot, test);
        start(slot);
        EXPECT_TRUE(gate->waitForArrival());
        return gate;
    }
    /// Presses stop and waits until the worker has taken it.
    void stopAndWait(int slot)
    {
        stop(slot);
        EXPECT_EQ(part(slot, "")->cursor().shape(), Qt::WaitCursor);
        EXPECT_TRUE(statusIs("VI_SUCCESS")) << "of the request behind the stop";
    }
    /// A call of the session that does not return.
    std::shared_ptr<standin::Gate> readAtAGate()
    {
        auto gate = std::make_shared<standin::Gate>();
        standin::script("viRead", {.gate = gate});
        showPage("Basics");
        press("basicRead");
        EXPECT_TRUE(gate->waitForArrival());
        showPage("Tests");
        return gate;
    }

    ModalAnswer m_warning{"testAborted", [](QDialog *box) { QTest::keyClick(box, Qt::Key_Return); }};
};

TEST_F(InstrumentSlots, AStartIsRefusedWhileACallIsOutAndItsStopBringsTheSlotBack)
{
    open();
    const auto gate = readAtAGate();
    start(0);
    EXPECT_TRUE(isRunning(0)) << "the button says that it has sent";
    EXPECT_TRUE(text("test0Status").startsWith("Not started: "));
    stop(0);
    EXPECT_TRUE(isIdle(0));
    gate->open();
    ASSERT_TRUE(statusIs("VI_ERROR_TMO"));
    EXPECT_EQ(standin::calls("viOpen").size(), 1u) << "the session's own";
    // Now it starts.
    const auto test = startAtAGate(0, StressMmem, VI_SUCCESS);
    EXPECT_TRUE(isRunning(0));
    EXPECT_EQ(text("test0Status"), "");
    stopAndWait(0);
    test->open();
    EXPECT_TRUE(ends(0));
    EXPECT_EQ(m_warning.count(), 0);
}

TEST_F(InstrumentSlots, AStopWhileACallIsOutStopsAllTheSame)
{
    open();
    const auto test = startAtAGate(0, StressMmem, VI_SUCCESS);
    const auto gate = readAtAGate();
    stop(0);
    EXPECT_EQ(part(0, "")->cursor().shape(), Qt::WaitCursor);
    gate->open();
    ASSERT_TRUE(statusIs("VI_ERROR_TMO"));
    press("resourceDisconnect"); // the worker has taken the stop when it takes this
    ASSERT_TRUE(eventually([this] { return isVisible("resourceConnect"); }));
    test->open();
    EXPECT_TRUE(ends(0));
    EXPECT_EQ(m_warning.count(), 0);
}

TEST_F(InstrumentSlots, AStopThatHasToWaitLeavesTheOtherButtonsAlive)
{
    open();
    const auto gate = startAtAGate(0, Performance, VI_ERROR_ABORT);
    stopAndWait(0);
    // The other slot runs and ends meanwhile.
    enter("test1Resource", "TCPIP::other::hislip0");
    const auto other = startAtAGate(1, StressMmem, VI_SUCCESS);
    EXPECT_TRUE(isRunning(1));
    stopAndWait(1);
    other->open();
    EXPECT_TRUE(ends(1));
    // And so do the other pages.
    showPage("Basics");
    press("basicTrigger");
    EXPECT_TRUE(called("viAssertTrigger", 1));
    showPage("Tests");
    EXPECT_EQ(part(0, "")->cursor().shape(), Qt::WaitCursor);
    gate->open();
    EXPECT_TRUE(ends(0));
    EXPECT_TRUE(eventually([this] { return m_warning.count() == 1; })) << "its clear was aborted";
}

TEST_F(InstrumentSlots, AStopThatRacesTheTestsOwnEndLeavesEveryButtonAlive)
{
    open();
    for (int i = 0; i < 20; ++i) {
        standin::script("viClear", {.status = VI_ERROR_ABORT, .delay = std::chrono::microseconds(i * 300)});
        start(0);
        if (!isIdle(0))
            stop(0);
        ASSERT_TRUE(ends(0)) << i;
        ASSERT_TRUE(eventually([&] { return m_warning.count() == i + 1; })) << i;
    }
    showPage("Basics");
    press("basicTrigger");
    EXPECT_TRUE(called("viAssertTrigger", 1));
}

TEST_F(InstrumentSlots, ButtonsPressedTwiceSendOnce)
{
    open();
    const auto gate = startAtAGate(0, Performance, VI_ERROR_ABORT);
    start(0); // disabled
    stop(0);
    stop(0);
    gate->open();
    EXPECT_TRUE(ends(0));
    EXPECT_TRUE(eventually([this] { return m_warning.count() == 1; }));
    EXPECT_EQ(standin::calls("viOpen").size(), 2u);
    EXPECT_EQ(m_warning.count(), 1);
}

TEST_F(InstrumentSlots, AResourceThatDoesNotOpenIsToldInRed)
{
    open();
    standin::script("viOpen", {.status = VI_ERROR_RSRC_NFOUND});
    start(0);
    EXPECT_TRUE(eventually([this] { return m_warning.count() == 1; }));
    EXPECT_TRUE(eventually([this] { return result(0) == "Error occurred"; }));
    EXPECT_TRUE(isIdle(0));
    EXPECT_TRUE(eventually([this] { return logRow("Cannot open VISA-Resource(VI_ERROR_RSRC_NFOUND)") >= 0; }));
    EXPECT_EQ(result(1), "");
}

TEST_F(InstrumentSlots, TheFinderFillsTheLowerSlot)
{
    standin::addResource({"TCPIP::a::hislip0::INSTR"});
    open();
    EXPECT_FALSE(isVisible("test0Find"));
    enter("test1Resource", "typed");
    {
        const ModalAnswer finder("resourceDialog", [this](QDialog *) { press("finderCancel"); });
        press("test1Find");
        EXPECT_EQ(finder.count(), 1);
    }
    EXPECT_EQ(text("test1Resource"), "typed");
    const ModalAnswer finder("resourceDialog", [this, searched = false](QDialog *) mutable {
        auto *found = qobject_cast<QTreeWidget *>(widget("finderResults"));
        if (!std::exchange(searched, true))
            return press("finderFind");
        if (found->topLevelItemCount() == 0)
            return;
        const QTreeWidgetItem *resource = found->topLevelItem(0)->child(0);
        QTest::mouseClick(found->viewport(), Qt::LeftButton, {}, found->visualItemRect(resource).center());
        press("finderSelect");
    });
    press("test1Find");
    EXPECT_EQ(text("test1Resource"), "TCPIP::a::hislip0::INSTR");
}

TEST_F(InstrumentSlots, ClosingTheWindowInTheMiddleOfAStressTestEndsNormally)
{
    for (const Test test : {Stress4882, StressMmem}) {
        standin::reset();
        standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4015, 2);
        standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0x00500806);
        for (const char *command : {"*IDN?", "*CLS;*IDN?", "*OPC?", ":mmem:msis?", ":mmem:cdir?", "system:error?"})
            standin::setReply(command, "1\n");
        open();
        choose(0, test);
        start(0);
        ASSERT_TRUE(eventually([this] { return logRow("Press 'Stop Test' to finish test!") >= 0; }));
        QElapsedTimer timer;
        timer.start();
        closeWindow();
        EXPECT_LT(timer.elapsed(), 10000);
        EXPECT_EQ(standin::openObjects(), 0u);
    }
}

TEST_F(InstrumentSlots, ClosingTheWindowWhileATestEndsWaitsForIt)
{
    open();
    auto gate = startAtAGate(0, Performance, VI_ERROR_ABORT);
    std::thread later([gate] {
        std::this_thread::sleep_for(std::chrono::milliseconds(300));
        gate->open();
    });
    closeWindow();
    later.join();
    EXPECT_EQ(standin::openObjects(), 0u);
}

using InstrumentSlotsDeath = InstrumentSlots;

TEST_F(InstrumentSlotsDeath, ClosingTheWindowWhileATestHangsEndsTheProcessWith55)
{
    ::testing::GTEST_FLAG(death_test_style) = "threadsafe";
    QElapsedTimer timer;
    timer.start();
    EXPECT_EXIT(
        {
            open();
            startAtAGate(1, Performance, VI_ERROR_ABORT);
            closeWindow();
            std::_Exit(1); // not reached
        },
        ::testing::ExitedWithCode(55), "");
    EXPECT_GE(timer.elapsed(), 5000);
    EXPECT_LT(timer.elapsed(), 40000);
}

} // namespace
