#include "gui/support/StandinWindowTest.h"

#include <visa.h>

namespace
{

/// Connected, on the page "Events".
class EventsPage : public StandinWindowTest
{
protected:
    EventsPage()
    {
        openWindow();
        connectSession();
        showPage("Events");
    }

    void press(const char *name, const QString &status = "VI_SUCCESS")
    {
        StandinWindowTest::press(name);
        ASSERT_TRUE(statusIs(status)) << text("statusLabel").toStdString();
    }

    bool lineAppears(const QString &line)
    {
        return eventually([&] { return logRow(line) >= 0; });
    }
    int lines(const QString &beginning)
    {
        int count = 0;
        for (int row = 0; row < logRows(); ++row)
            count += logCell(row, 3).startsWith(beginning) ? 1 : 0;
        return count;
    }
};

TEST_F(EventsPage, StartsWithTheQueueForIoCompletion)
{
    press("eventEnable");
    EXPECT_EQ(standin::calls("viEnableEvent").at(0).numbers, (std::vector<std::uint64_t>{0x3FFF2009, 1, 0}));
    EXPECT_TRUE(lineAppears("viEnableEvent(vi= 2,type= VI_EVENT_IO_COMPLETION, mech= 1, context= 0)"));
}

TEST_F(EventsPage, EachOperationGetsTypeAndMechanism)
{
    choose("eventType", "VI_EVENT_SERVICE_REQ");
    tick("mechanismHandler");
    press("eventEnable");
    EXPECT_TRUE(lineAppears("viEnableEvent(vi= 2,type= VI_EVENT_SERVICE_REQ, mech= 2, context= 0)"));
    press("eventDiscard");
    EXPECT_TRUE(lineAppears("viDiscardEvents(vi= 2,type= VI_EVENT_SERVICE_REQ, mech= 2)"));
    press("eventDisable");
    EXPECT_TRUE(lineAppears("viDisableEvent(vi= 2,type= VI_EVENT_SERVICE_REQ, mech= 2)"));
    tick("mechanismQueue");
    press("eventDisable");
    EXPECT_TRUE(lineAppears("viDisableEvent(vi= 2,type= VI_EVENT_SERVICE_REQ, mech= 1)"));
}

TEST_F(EventsPage, OffersEachEventType)
{
    struct Row {
        const char *name;
        std::uint64_t value;
    };
    for (const Row &row : {Row{"VI_EVENT_IO_COMPLETION", 0x3FFF2009}, Row{"VI_EVENT_TRIG", 0xBFFF200A},
                           Row{"VI_EVENT_SERVICE_REQ", 0x3FFF200B}, Row{"VI_EVENT_CLEAR", 0x3FFF200D},
                           Row{"VI_EVENT_EXCEPTION", 0xBFFF200E}, Row{"VI_EVENT_GPIB_CIC", 0x3FFF2012},
                           Row{"VI_EVENT_GPIB_TALK", 0x3FFF2013}, Row{"VI_EVENT_GPIB_LISTEN", 0x3FFF2014},
                           Row{"VI_EVENT_VXI_VME_SYSFAIL", 0x3FFF201D}, Row{"VI_EVENT_VXI_VME_SYSRESET", 0x3FFF201E},
                           Row{"VI_EVENT_VXI_SIGP", 0x3FFF2020}, Row{"VI_EVENT_VXI_VME_INTR", 0xBFFF2021},
                           Row{"VI_EVENT_PXI_INTR", 0x3FFF2022}, Row{"VI_EVENT_TCPIP_CONNECT", 0x3FFF2036},
                           Row{"VI_EVENT_USB_INTR", 0x3FFF2037}}) {
        choose("eventType", row.name);
        press("eventDiscard");
        EXPECT_EQ(standin::calls("viDiscardEvents").back().numbers.at(0), row.value) << row.name;
    }
}

TEST_F(EventsPage, AWaitTakesTwoSecondsAtMostAndSaysWhenNothingCame)
{
    choose("eventType", "VI_EVENT_SERVICE_REQ");
    press("eventWait", "VI_ERROR_TMO");
    EXPECT_EQ(standin::calls("viWaitOnEvent").at(0).numbers, (std::vector<std::uint64_t>{0x3FFF200B, 2000}));
    EXPECT_TRUE(lineAppears("viWaitOnEvent(vi= 2, inType= VI_EVENT_SERVICE_REQ, timeout= 2000, outType=Unknown Event, "
                            "outContext= 0)"));
}

TEST_F(EventsPage, AnEventThatWasWaitedForIsReportedInTheLogAndItsContextClosed)
{
    choose("eventType", "VI_EVENT_SERVICE_REQ");
    standin::script("viWaitOnEvent", {.status = VI_SUCCESS, .numbers = {0x3FFF200B, 2500}});
    press("eventWait");
    EXPECT_TRUE(lineAppears("viWaitOnEvent(vi= 2, inType= VI_EVENT_SERVICE_REQ, timeout= 2000, "
                            "outType=VI_EVENT_SERVICE_REQ, outContext= 2500)"));
    ASSERT_EQ(standin::calls("viClose").size(), 1u);
    EXPECT_EQ(standin::calls("viClose").at(0).handle, 2500u);
    EXPECT_EQ(lines("viClose"), 0);
}

TEST_F(EventsPage, MoreEventsInTheQueueAreNoFailure)
{
    standin::script("viWaitOnEvent", {.status = VI_SUCCESS_QUEUE_NEMPTY, .numbers = {0x3FFF2009, 2501}});
    press("eventWait", "VI_SUCCESS_QUEUE_NEMPTY");
    EXPECT_EQ(standin::calls("viClose").at(0).handle, 2501u);
}

TEST_F(EventsPage, EventsAreLinesOnceTheHandlerIsInstalled)
{
    choose("eventType", "VI_EVENT_SERVICE_REQ");
    tick("mechanismHandler");
    press("eventEnable");
    standin::fireEvent(2, 0x3FFF200B); // nobody hears it
    press("eventInstall");
    EXPECT_TRUE(
        eventually([this] { return lines("viInstallHandler(vi= 2, type= VI_EVENT_SERVICE_REQ, hndlr= 0x") == 1; }));
    EXPECT_NE(standin::calls("viInstallHandler").at(0).numbers.at(1), 0u);
    EXPECT_EQ(standin::calls("viInstallHandler").at(0).numbers.at(2), 0u);
    standin::fireEvent(2, 0x3FFF200B);
    EXPECT_TRUE(lineAppears("Callback from Event VI_EVENT_SERVICE_REQ: vi=2,context=2002,userHandle=(nil)"));
    EXPECT_EQ(lines("Callback from Event"), 1);
}

TEST_F(EventsPage, AHandlerIsForOneEventType)
{
    choose("eventType", "VI_EVENT_SERVICE_REQ");
    press("eventInstall");
    standin::fireEvent(2, 0x3FFF200D);
    standin::fireEvent(2, 0x3FFF200B);
    EXPECT_TRUE(lineAppears("Callback from Event VI_EVENT_SERVICE_REQ: vi=2,context=2002,userHandle=(nil)"));
    EXPECT_EQ(lines("Callback from Event"), 1);
}

TEST_F(EventsPage, AnUninstalledHandlerIsSilent)
{
    choose("eventType", "VI_EVENT_SERVICE_REQ");
    press("eventInstall");
    press("eventUninstall");
    EXPECT_TRUE(
        eventually([this] { return lines("viUninstallHandler(vi= 2, type= VI_EVENT_SERVICE_REQ, hndlr= 0x") == 1; }));
    standin::fireEvent(2, 0x3FFF200B);
    press("eventDiscard");
    ASSERT_TRUE(lineAppears("viDiscardEvents(vi= 2,type= VI_EVENT_SERVICE_REQ, mech= 1)"));
    EXPECT_EQ(lines("Callback from Event"), 0);
}

TEST_F(EventsPage, ACallbackIsShownWithoutShowLogToo)
{
    choose("eventType", "VI_EVENT_SERVICE_REQ");
    press("eventInstall");
    tick("showLog");
    meanwhile(50); // the switch is queued
    standin::fireEvent(2, 0x3FFF200B);
    EXPECT_TRUE(lineAppears("Callback from Event VI_EVENT_SERVICE_REQ: vi=2,context=2001,userHandle=(nil)"));
}

TEST_F(EventsPage, AnEventWithoutANameIsLoggedAsUnknown)
{
    choose("eventType", "VI_EVENT_PXI_INTR");
    press("eventInstall");
    standin::fireEvent(2, 0x3FFF2022);
    EXPECT_TRUE(lineAppears("Callback from Event Unknown Event: vi=2,context=2001,userHandle=(nil)"));
}

TEST_F(EventsPage, AnEventThatIsEnabledAlreadyIsNoFailure)
{
    standin::script("viEnableEvent", {.status = VI_SUCCESS_EVENT_EN});
    press("eventEnable", "VI_SUCCESS_EVENT_EN");
}

TEST_F(EventsPage, ClosingTheSessionLeavesTheChoice)
{
    choose("eventType", "VI_EVENT_USB_INTR");
    tick("mechanismHandler");
    press("resourceDisconnect");
    EXPECT_EQ(shown("eventType", "currentText").toString(), "VI_EVENT_USB_INTR");
    EXPECT_TRUE(shown("mechanismHandler", "checked").toBool());
}

TEST_F(EventsPage, TheWindowLivesWhileAnEventIsWaitedFor)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viWaitOnEvent", {.status = VI_ERROR_TMO, .gate = gate});
    StandinWindowTest::press("eventWait");
    ASSERT_TRUE(gate->waitForArrival());
    choose("eventType", "VI_EVENT_TRIG");
    showPage("Basics");
    EXPECT_TRUE(isVisible("basicTab"));
    gate->open();
    EXPECT_TRUE(statusIs("VI_ERROR_TMO"));
}

} // namespace
