// The page "Gpib" on a GPIB bus behind a LAN gateway: the library that ships, VXI-11, the simulated bus.

#include "gui/support/InstrumentWindowTest.h"

#include <QFile>

namespace
{

/// The simulator is a gateway; the library knows it as board 0. Its interface has the address 21, instruments have 5 and 7.
class RealBus : public InstrumentWindowTest
{
protected:
    RealBus() : InstrumentWindowTest({"--gpib", "--portmapper", "0"})
    {
        // Read when the resource manager is opened, which a new window does.
        closeWindow();
        QFile settings(home() + "/kyvisa.ini");
        EXPECT_TRUE(settings.open(QIODevice::WriteOnly));
        settings.write("[KYGPIB-GATEWAYS]\nBoard0 = \"TCPIP::127.0.0.1::gpib0\"\n");
        settings.close();
        qputenv("KYVISA_CONFIG", settings.fileName().toLocal8Bit());
        qputenv("KYVISA_PORTMAPPER_PORT", resource("portmapper").toLatin1());
        openWindow();
    }

    /// Presses a button and waits for the status.
    void press(const char *name, const QString &status = "VI_SUCCESS")
    {
        InstrumentWindowTest::press(name);
        ASSERT_TRUE(statusIs(status)) << name << ": " << text("statusLabel").toStdString();
    }

    /// Connects to the bus itself. The interface takes the attribute that the window sets at once.
    void connectBus()
    {
        connectTo("GPIB0::INTFC");
        showPage("Gpib");
    }

    /// What the attribute of that name is now, read on its page.
    QString state(const QString &filter)
    {
        showPage("Attributes");
        enter("attributesFilter", filter);
        const QStringList found = rows("attributesList");
        EXPECT_EQ(found.size(), 1) << filter.toStdString();
        chooseRow("attributesList", found.value(0));
        press("attributesGet");
        showPage("Gpib");
        return text("attributesCurrent");
    }

    void control(const char *box, const char *button, const QString &mode)
    {
        choose(box, mode);
        press(button);
    }
    void command(const QString &typed, const QString &status = "VI_SUCCESS")
    {
        enter("gpibCommand", typed);
        press("gpibSendCommand", status);
    }
};

TEST_F(RealBus, RemoteEnableFollowsItsModes)
{
    connectBus();
    control("gpibRen", "gpibSendRen", "VI_GPIB_REN_ASSERT");
    EXPECT_EQ(state("gpib_ren_state"), "0x1 (1)");
    control("gpibRen", "gpibSendRen", "VI_GPIB_REN_DEASSERT");
    EXPECT_EQ(state("gpib_ren_state"), "0x0 (0)");
}

TEST_F(RealBus, AttentionIsTakenAndItsStateNotToldByGateways)
{
    connectBus();
    control("gpibAtn", "gpibSendAtn", "VI_GPIB_ATN_ASSERT");
    EXPECT_EQ(state("gpib_atn_state"), "0xffff (65535)"); // unknown
    control("gpibAtn", "gpibSendAtn", "VI_GPIB_ATN_DEASSERT");
}

TEST_F(RealBus, InterfaceClearTakesTheBusBackAfterControlWasPassed)
{
    connectBus();
    press("gpibSendIfc");
    EXPECT_EQ(state("gpib_cic_state"), "0x1 (1)");
    enterNumber("gpibPrimary", 5);
    enterNumber("gpibSecondary", 65535);
    press("gpibPassControl");
    EXPECT_EQ(state("gpib_cic_state"), "0x0 (0)");
    command("\\x3F", "VI_ERROR_NCIC");
    press("gpibSendIfc");
    EXPECT_EQ(state("gpib_cic_state"), "0x1 (1)");
}

TEST_F(RealBus, CommandsAddressTalkerAndListenerByHand)
{
    connectBus();
    EXPECT_EQ(state("gpib_primary"), "0x15 (21)");
    command("\\x3FU%"); // unlisten; the interface (21) talks, instrument 5 listens
    EXPECT_EQ(state("gpib_addr_state"), "0x1 (1)");
    showPage("Basics");
    enter("basicCommand", "*ESE 5;*ESE?\\n");
    press("basicWrite");
    showPage("Gpib");
    command("?E5"); // unlisten; instrument 5 talks, the interface listens
    EXPECT_EQ(state("gpib_addr_state"), "0x2 (2)");
    showPage("Basics");
    press("basicRead");
    EXPECT_EQ(view(), "5\n");
}

TEST_F(RealBus, AnInstrumentOnTheBusGoesToLocalAndToRemote)
{
    connectTo("GPIB0::5::INSTR");
    showPage("Locking");
    press("lockGoToRemote");
    press("lockGoToLocal");
    showPage("Basics");
    query("*OPC?\\n", "1\n");
}

TEST_F(RealBus, AnAddressThatNoBusHasIsRefused)
{
    connectBus();
    enterNumber("gpibPrimary", 31);
    enterNumber("gpibSecondary", 65535);
    InstrumentWindowTest::press("gpibPassControl");
    EXPECT_TRUE(eventually([this] { return text("statusLabel").startsWith("Status: VI_ERROR_"); }))
        << text("statusLabel").toStdString();
    EXPECT_EQ(state("gpib_cic_state"), "0x1 (1)") << "control stays here";
}

} // namespace
