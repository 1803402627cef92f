#include "gui/support/StandinWindowTest.h"

#include "app/MainWindow.h"

#include <visa.h>

#include <QLabel>

namespace
{

class ResourceFrameInWindow : public StandinWindowTest
{
protected:
    ResourceFrameInWindow()
    {
        openWindow();
        enter("resourceName", "TCPIP::localhost::hislip0");
    }

    bool connected()
    {
        return eventually([this] { return isVisible("resourceDisconnect"); });
    }
    bool disconnected()
    {
        return eventually([this] { return isVisible("resourceConnect"); });
    }
    QColor labelColour() { return widget("statusLabel")->palette().color(QPalette::WindowText); }
};

TEST_F(ResourceFrameInWindow, ConnectOpensTheResourceWithModeAndTimeOut)
{
    tick("openExclusiveLock");
    tick("openLoadConfig");
    enterNumber("openTimeout", 1234);
    press("resourceConnect");
    ASSERT_TRUE(connected());
    const auto call = standin::calls("viOpen").at(0);
    EXPECT_EQ(call.handle, 1u);
    EXPECT_EQ(call.texts.at(0), "TCPIP::localhost::hislip0");
    EXPECT_EQ(call.numbers.at(0), 5u);
    EXPECT_EQ(call.numbers.at(1), 1234u);
    EXPECT_FALSE(isVisible("resourceConnect"));
    EXPECT_FALSE(isEnabled("resourceName"));
}

TEST_F(ResourceFrameInWindow, OpenTimeOutStartsAt2000)
{
    EXPECT_EQ(shown("openTimeout", "value").toInt(), 2000);
    EXPECT_EQ(shown("openTimeout", "minimum").toInt(), 0);
    EXPECT_EQ(shown("openTimeout", "maximum").toInt(), 10000000);
    EXPECT_EQ(shown("openTimeout", "singleStep").toInt(), 1000);
}

TEST_F(ResourceFrameInWindow, ShowLogIsTickedAndWriteLogIsNot)
{
    EXPECT_TRUE(shown("showLog", "checked").toBool());
    EXPECT_FALSE(shown("writeLog", "checked").toBool());
}

TEST_F(ResourceFrameInWindow, ReturnStoresTheNameButDoesNotSend)
{
    enter("resourceName", "TCPIP::10.0.0.7::inst0");
    key(Qt::Key_Return);
    meanwhile();
    EXPECT_TRUE(standin::calls("viOpen").empty());
    EXPECT_TRUE(isVisible("resourceConnect"));
    enter("resourceName", "something else, not stored");
    closeWindow();
    openWindow();
    EXPECT_EQ(text("resourceName"), "TCPIP::10.0.0.7::inst0");
}

TEST_F(ResourceFrameInWindow, AFailedOpenChangesNothing)
{
    standin::script("viOpen", {.status = VI_ERROR_RSRC_NFOUND});
    press("resourceConnect");
    ASSERT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_ERROR_RSRC_NFOUND"; }));
    EXPECT_EQ(labelColour(), QColor(Qt::red));
    EXPECT_TRUE(isVisible("resourceConnect"));
    EXPECT_FALSE(isVisible("resourceDisconnect"));
    EXPECT_TRUE(isEnabled("resourceName"));
}

TEST_F(ResourceFrameInWindow, AnOpenWithInformationConnectsAndTheLabelIsOrange)
{
    standin::script("viOpen", {.status = VI_WARN_CONFIG_NLOADED});
    // The panel's own follow-up call soon replaces the status: hold it back.
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viSetAttribute", {.gate = gate});
    press("resourceConnect");
    ASSERT_TRUE(connected());
    ASSERT_TRUE(gate->waitForArrival());
    EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_WARN_CONFIG_NLOADED"; }));
    EXPECT_EQ(labelColour().rgb(), QColor::fromHsl(30, 255, 128).rgb());
    gate->open();
    EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_SUCCESS"; }));
    EXPECT_EQ(labelColour(), QColor(Qt::blue));
}

TEST_F(ResourceFrameInWindow, DisconnectClosesAndTheFrameReturns)
{
    press("resourceConnect");
    ASSERT_TRUE(connected());
    press("resourceDisconnect");
    ASSERT_TRUE(disconnected());
    EXPECT_TRUE(isEnabled("resourceName"));
    EXPECT_EQ(standin::calls("viClose").size(), 1u);
}

TEST_F(ResourceFrameInWindow, DisconnectReturnsEvenWhenTheCloseFails)
{
    press("resourceConnect");
    ASSERT_TRUE(connected());
    standin::script("viClose", {.status = VI_ERROR_INV_OBJECT});
    press("resourceDisconnect");
    ASSERT_TRUE(disconnected());
    EXPECT_EQ(text("statusLabel"), "Status: VI_ERROR_INV_OBJECT");
}

TEST_F(ResourceFrameInWindow, ALostConnectionClosesTheSession)
{
    press("resourceConnect");
    ASSERT_TRUE(connected());
    standin::script("viReadSTB", {.status = VI_ERROR_CONN_LOST});
    press("basicReadStb");
    ASSERT_TRUE(disconnected());
    EXPECT_EQ(standin::calls("viClose").size(), 1u);
}

TEST_F(ResourceFrameInWindow, StatusLabelStartsBlueWithDashes)
{
    closeWindow();
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viGetAttribute", {.gate = gate});
    openWindow();
    ASSERT_TRUE(gate->waitForArrival());
    EXPECT_EQ(text("statusLabel"), "Status: ----");
    EXPECT_EQ(labelColour(), QColor(Qt::blue));
    gate->open();
}

TEST_F(ResourceFrameInWindow, AStartedCallResetsTheStatusLabel)
{
    standin::script("viOpen", {.status = VI_ERROR_TMO});
    press("resourceConnect");
    ASSERT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_ERROR_TMO"; }));
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viOpen", {.gate = gate});
    press("resourceConnect");
    ASSERT_TRUE(gate->waitForArrival());
    EXPECT_EQ(text("statusLabel"), "Status: ----");
    EXPECT_EQ(labelColour(), QColor(Qt::blue));
    gate->open();
}

} // namespace
