#include "gui/support/StandinWindowTest.h"

#include "app/MainWindow.h"

#include <visa.h>

#include <QElapsedTimer>
#include <QStatusBar>

namespace
{

class Title : public StandinWindowTest
{
protected:
    Title()
    {
        standin::setTextAttribute(VI_ATTR_RSRC_MANF_NAME, "Acme");
        standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0x00500100);
        standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 0x0FFF, 2);
    }

    QString title() { return window().windowTitle(); }
};

TEST_F(Title, NamesTheImplementationOnceItHasAnswered)
{
    openWindow();
    EXPECT_TRUE(eventually([this] { return title() != "KyVisaTester 5.8.6"; }));
    EXPECT_EQ(title(), "KyVisaTester 5.8.6 Visa from Acme (5.1.0)");
}

TEST_F(Title, StartsWithNameAndVersionOnly)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viGetAttribute", {.gate = gate});
    openWindow();
    ASSERT_TRUE(gate->waitForArrival());
    meanwhile();
    EXPECT_EQ(title(), "KyVisaTester 5.8.6");
    gate->open();
    EXPECT_TRUE(eventually([this] { return title() == "KyVisaTester 5.8.6 Visa from Acme (5.1.0)"; }));
}

TEST_F(Title, ShowsAVersionOfZeroAsThreeZeros)
{
    standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0);
    openWindow();
    EXPECT_TRUE(eventually([this] { return title() == "KyVisaTester 5.8.6 Visa from Acme (0.0.0)"; }))
        << title().toStdString();
}

TEST_F(Title, SplitsTheVersionAtBits20And8)
{
    standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0xABCDEF12);
    openWindow();
    // 0xABC, 0xDEF, 0x12
    EXPECT_TRUE(eventually([this] { return title() == "KyVisaTester 5.8.6 Visa from Acme (2748.3567.18)"; }))
        << title().toStdString();
}

TEST_F(Title, StaysWhenTheManufacturerNameFails)
{
    standin::script("viGetAttribute", {.status = VI_ERROR_NSUP_ATTR});
    openWindow();
    ASSERT_TRUE(called("viGetAttribute", 3));
    meanwhile();
    EXPECT_EQ(title(), "KyVisaTester 5.8.6");
}

TEST_F(Title, IsGivenUpByAnyFailingCallBeforeItIsComplete)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viGetAttribute", {});
    standin::script("viGetAttribute", {});
    standin::script("viGetAttribute", {.status = VI_ERROR_TMO, .gate = gate});
    openWindow();
    ASSERT_TRUE(gate->waitForArrival());
    gate->open();
    ASSERT_TRUE(statusIs("VI_ERROR_TMO"));
    meanwhile();
    EXPECT_EQ(title(), "KyVisaTester 5.8.6");
}

TEST_F(Title, NeverChangesOnceComplete)
{
    openWindow();
    ASSERT_TRUE(eventually([this] { return title() == "KyVisaTester 5.8.6 Visa from Acme (5.1.0)"; }));
    standin::script("viOpen", {.status = VI_ERROR_RSRC_NFOUND});
    enter("resourceName", "TCPIP::localhost::hislip0");
    press("resourceConnect");
    EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_ERROR_RSRC_NFOUND"; }));
    EXPECT_EQ(title(), "KyVisaTester 5.8.6 Visa from Acme (5.1.0)");
}

TEST_F(Title, AttributesAreAskedForInOrder)
{
    openWindow();
    ASSERT_TRUE(called("viGetAttribute", 3));
    const auto calls = standin::calls("viGetAttribute");
    EXPECT_EQ(calls.at(0).numbers.at(0), 0xBFFF0174u);
    EXPECT_EQ(calls.at(1).numbers.at(0), 0x3FFF0003u);
    EXPECT_EQ(calls.at(2).numbers.at(0), 0x3FFF0175u);
    for (const auto &call : calls)
        EXPECT_EQ(call.handle, 1u) << "asked of the resource manager while no session is open";
}

class StatusBar : public Title
{
protected:
    QString message() { return window().statusBar()->currentMessage(); }
};

TEST_F(StatusBar, SaysThatACallRunsAndThenThatItFinished)
{
    openWindow();
    ASSERT_TRUE(eventually([this] { return message() == "Function finished"; }));
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viOpen", {.gate = gate});
    enter("resourceName", "TCPIP::localhost::hislip0");
    press("resourceConnect");
    ASSERT_TRUE(gate->waitForArrival());
    EXPECT_EQ(message(), "Running function");
    meanwhile(4200); // a started call's message has no time-out
    EXPECT_EQ(message(), "Running function");
    gate->open();
    EXPECT_TRUE(eventually([this] { return message() == "Function finished"; }));
}

TEST_F(StatusBar, DropsFunctionFinishedAfterFourSeconds)
{
    openWindow();
    ASSERT_TRUE(eventually([this] { return message() == "Function finished"; }));
    QElapsedTimer timer;
    timer.start();
    EXPECT_TRUE(eventually([this] { return message().isEmpty(); }, 30000));
    EXPECT_GE(timer.elapsed(), 2000);
}

} // namespace
