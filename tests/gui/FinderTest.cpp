// The finder over the window: modal, in front of a session that goes on behind it.

#include "gui/support/FinderDialog.h"
#include "gui/support/StandinWindowTest.h"

#include "app/MainWindow.h"
#include "support/ModalAnswer.h"

#include <visa.h>

#include <QGuiApplication>
#include <QLineEdit>
#include <QMessageBox>
#include <QTest>
#include <QTreeWidget>

namespace
{

class FinderInWindow : public FinderDialog<StandinWindowTest>
{
protected:
    FinderInWindow()
    {
        standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4015, 2);
        standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0x00500100);
        for (const char *name : {"TCPIP::a::hislip0::INSTR", "ASRL1::INSTR", "TCPIP::a::inst0::INSTR"})
            standin::addResource({name});
        openWindow();
    }

    bool foundAll() { return isEnabled("finderFind") && tree()->topLevelItemCount() == 2; }
};

TEST_F(FinderInWindow, ASelectedResourceGoesIntoTheResourceField)
{
    inFinder({search(), [this] { return foundAll(); }, now([this] {
                  clickResource(1, 1);
                  EXPECT_EQ(text("finderSelected"), "TCPIP::a::inst0::INSTR");
                  press("finderSelect");
              })});
    EXPECT_EQ(text("resourceName"), "TCPIP::a::inst0::INSTR");
    press("resourceConnect");
    ASSERT_TRUE(called("viOpen", 1));
    EXPECT_EQ(standin::calls("viOpen").at(0).texts.at(0), "TCPIP::a::inst0::INSTR");
}

TEST_F(FinderInWindow, ASearchReadsTheLxiTextsOfEachResource)
{
    inFinder({search(), [this] { return foundAll(); }, cancel()});
    EXPECT_EQ(standin::calls("viFindRsrc").at(0).texts.at(0), "?*");
    EXPECT_EQ(standin::calls("viFindNext").size(), 2u);
    // Its lines come into the view in their order: the last one brings all.
    EXPECT_TRUE(eventually([this] { return logRow("viClose(objectid= 1001)") >= 0; }));
    EXPECT_GE(logRow("viFindRsrc(vi= 1, expr= ?*, findList= 1001, retcnt= 3, instrDesc= TCPIP::a::hislip0::INSTR)"), 0);
    EXPECT_GE(logRow("viFindNext(findList=1001, instrDesc= ASRL1::INSTR)"), 0);
}

TEST_F(FinderInWindow, ClosedInTheMiddleOfASearchGivesTheWindowBack)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viFindNext", {.gate = gate});
    inFinder({search(), [] { return standin::calls("viFindNext").size() == 1; }, now([this] {
                  EXPECT_TRUE(waiting());
                  press("finderCancel");
              })});
    EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr);
    enter("resourceName", "typed while the search goes on");
    EXPECT_EQ(text("resourceName"), "typed while the search goes on");
    gate->open();
    EXPECT_TRUE(statusIs("VI_SUCCESS"));
    connectSession(); // and the session is none the worse for it
    inFinder({search(), [this] { return foundAll(); }, cancel()});
}

TEST_F(FinderInWindow, ASearchWaitsForTheCallThatRunsAndShowsItsResultsThen)
{
    connectSession();
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "late", .gate = gate});
    press("basicRead");
    ASSERT_TRUE(gate->waitForArrival());
    inFinder({search(), now([this, gate] {
                  EXPECT_TRUE(waiting());
                  EXPECT_FALSE(isEnabled("finderFind"));
                  enter("finderExpression", "TCPIP?*"); // the dialog lives
                  EXPECT_EQ(text("finderExpression"), "TCPIP?*");
                  gate->open();
              }),
              [this] { return foundAll(); }, cancel()});
    EXPECT_EQ(shown("basicReadView", "plainText").toString(), "late");
    EXPECT_EQ(standin::calls("viFindRsrc").at(0).texts.at(0), "?*") << "as it was when the button was pressed";
}

TEST_F(FinderInWindow, ASessionThatIsLostBehindItIsClosedAndTheSearchWorks)
{
    connectSession();
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viRead", {.status = VI_ERROR_CONN_LOST, .gate = gate});
    press("basicRead");
    ASSERT_TRUE(gate->waitForArrival());
    inFinder({now([gate] { gate->open(); }), [this] { return isVisible("resourceConnect"); }, search(),
              [this] { return foundAll(); }, now([this] {
                  clickResource(0, 0);
                  press("finderSelect");
              })});
    EXPECT_EQ(text("resourceName"), "ASRL1::INSTR");
    EXPECT_TRUE(isEnabled("resourceName"));
}

TEST_F(FinderInWindow, AConnectionThatIsLostInTheSearchEndsItAndClosesTheSession)
{
    connectSession();
    standin::script("viFindRsrc", {.status = VI_ERROR_CONN_LOST});
    inFinder({search(), [this] { return isVisible("resourceConnect"); }, [this] { return isEnabled("finderFind"); },
              now([this] {
                  EXPECT_EQ(tree()->topLevelItemCount(), 0);
                  EXPECT_FALSE(waiting());
                  press("finderCancel");
              })});
}

TEST_F(FinderInWindow, AConnectThatFinishesBehindItIsShown)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viOpen", {.gate = gate});
    enter("resourceName", "TCPIP::localhost::hislip0");
    press("resourceConnect");
    ASSERT_TRUE(gate->waitForArrival());
    inFinder({now([gate] { gate->open(); }), [this] { return isVisible("resourceDisconnect"); }, search(),
              [this] { return foundAll(); }, now([this] {
                  clickResource(1, 0);
                  press("finderSelect");
              })});
    EXPECT_EQ(text("resourceName"), "TCPIP::a::hislip0::INSTR");
    EXPECT_FALSE(isEnabled("resourceName")) << "the session is open";
}

TEST_F(FinderInWindow, NothingFoundLeavesAnEmptyTreeAndTheStatus)
{
    standin::script("viFindRsrc", {.status = VI_ERROR_RSRC_NFOUND});
    inFinder(
        {search(), [this] { return isEnabled("finderFind") && text("statusLabel") != "Status: ----"; }, now([this] {
             EXPECT_EQ(text("statusLabel"), "Status: VI_ERROR_RSRC_NFOUND");
             EXPECT_EQ(tree()->topLevelItemCount(), 0);
             press("finderCancel");
         })});
}

TEST_F(FinderInWindow, ResultsArriveBehindAMessageBox)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viFindNext", {.gate = gate});
    bool opened = false;
    const ModalAnswer box("noResourceSelected", [&](QDialog *dialog) {
        auto *message = qobject_cast<QMessageBox *>(dialog);
        if (!opened) {
            opened = true;
            EXPECT_EQ(message->windowTitle(), "No resource selected");
            EXPECT_EQ(message->text(), "Please select one resource!");
            gate->open(); // the search goes on behind the box
        }
        if (foundAll())
            QTest::keyClick(message, Qt::Key_Return);
    });
    std::size_t step = 0;
    const ModalAnswer finder("resourceDialog", [&](QDialog *) {
        if (step == 0) {
            step = 1;
            press("finderFind");
        } else if (step == 1 && standin::calls("viFindNext").size() == 1) {
            step = 2;
            press("finderSelect"); // nothing is selected
            EXPECT_TRUE(opened);
            clickResource(1, 0);
            press("finderSelect");
        }
    });
    press("actionFindResourceButton");
    EXPECT_EQ(text("resourceName"), "TCPIP::a::hislip0::INSTR");
}

/// A message box that somebody opens in the middle of a delivery: the value of an attribute changes in one.
class BoxInsideADelivery : public StandinWindowTest
{
protected:
    BoxInsideADelivery()
    {
        openWindow();
        connectSession();
        showPage("Attributes");
        enter("attributesFilter", "tmo");
        chooseRow("attributesList", "VI_ATTR_TMO_VALUE");
        QObject::connect(qobject_cast<QLineEdit *>(widget("attributesCurrent")), &QLineEdit::textChanged, [this] {
            if (m_opened)
                return;
            m_opened = true;
            QMessageBox box;
            box.setObjectName("insideADelivery");
            box.exec();
            m_closed = true;
        });
    }

    bool m_opened = false;
    bool m_closed = false;
};

TEST_F(BoxInsideADelivery, HoldsBackNoResultThatComesLater)
{
    auto first = std::make_shared<standin::Gate>();
    auto second = std::make_shared<standin::Gate>();
    standin::script("viGetAttribute", {.gate = first});
    standin::script("viSetAttribute", {.gate = second});
    press("attributesGet");
    ASSERT_TRUE(first->waitForArrival());
    showPage("Basics");
    tick("basicSendEnd"); // waits behind the first call
    bool followed = false;
    const ModalAnswer answer("insideADelivery", [&](QDialog *box) {
        second->open();
        followed = text("attributesCurrent") == "0x0 (0)" && text("statusLabel") == "Status: VI_SUCCESS";
        if (followed)
            QTest::keyClick(box, Qt::Key_Escape);
    });
    first->open();
    ASSERT_TRUE(eventually([this] { return m_closed; }));
    EXPECT_TRUE(followed) << "the second call was delivered while the box was open";
    EXPECT_TRUE(statusIs("VI_SUCCESS"));
    press("basicReadStb");
    EXPECT_TRUE(called("viReadSTB", 1)) << "the buttons are free";
}

TEST_F(BoxInsideADelivery, MayStandOpenWhenTheWindowCloses)
{
    press("attributesGet");
    const ModalAnswer answer("insideADelivery", [&](QDialog *box) {
        window().close(); // acts as the system: the window manager
        QTest::keyClick(box, Qt::Key_Escape);
    });
    EXPECT_TRUE(eventually([this] { return m_closed; }));
    EXPECT_FALSE(window().isVisible());
}

} // namespace
