// The pages on the library that ships and a simulated instrument.

#include "gui/support/InstrumentWindowTest.h"

#include <QProcess>

namespace
{

class InstrumentPages : public InstrumentWindowTest
{
protected:
    InstrumentPages() : InstrumentWindowTest({"--hislip", "0", "--socket", "0"}) {}

    /// Presses a button and waits for the status.
    void press(const char *name, const QString &status = "VI_SUCCESS")
    {
        InstrumentWindowTest::press(name);
        ASSERT_TRUE(statusIs(status)) << name << ": " << text("statusLabel").toStdString();
    }
    bool lineHolds(const QString &piece)
    {
        return eventually([&] { return logHolds(piece); });
    }
};

class RealAttributes : public InstrumentPages
{
protected:
    RealAttributes()
    {
        connectTo(resource("hislip"));
        showPage("Attributes");
    }

    void select(const QString &filter, const QString &name)
    {
        enter("attributesFilter", filter);
        chooseRow("attributesList", name);
    }
    QString get(const QString &filter, const QString &name)
    {
        select(filter, name);
        press("attributesGet");
        return text("attributesCurrent");
    }
    void set(const QString &filter, const QString &name, const QString &value, const QString &status = "VI_SUCCESS")
    {
        select(filter, name);
        enter("attributesNew", value);
        press("attributesSet", status);
    }
};

TEST_F(RealAttributes, EveryWidthComesAsItIs)
{
    EXPECT_EQ(get("termchar", "VI_ATTR_TERMCHAR"), "0xa (10)");        // 8 bits
    EXPECT_EQ(get("intf_type", "VI_ATTR_INTF_TYPE"), "0x6 (6)");       // 16
    EXPECT_EQ(get("_tmo", "VI_ATTR_TMO_VALUE"), "0x7d0 (2000)");       // 32
    EXPECT_EQ(get("user_data_64", "VI_ATTR_USER_DATA_64"), "0x0 (0)"); // 64
    EXPECT_EQ(get("is_hislip", "VI_ATTR_TCPIP_IS_HISLIP"), "0x1 (1)"); // a boolean
    EXPECT_EQ(get("manf_id", "VI_ATTR_RSRC_MANF_ID"), "0xfaf (4015)");
}

TEST_F(RealAttributes, TextsComeAsTexts)
{
    EXPECT_EQ(get("rsrc_class", "VI_ATTR_RSRC_CLASS"), "INSTR");
    EXPECT_EQ(get("rsrc_manf_name", "VI_ATTR_RSRC_MANF_NAME"), "Oltrava");
    EXPECT_EQ(get("tcpip_addr", "VI_ATTR_TCPIP_ADDR"), "127.0.0.1");
    EXPECT_EQ(get("rsrc_name", "VI_ATTR_RSRC_NAME"), resource("hislip").replace("TCPIP::", "TCPIP0::"));
    EXPECT_TRUE(lineHolds("type= VI_ATTR_RSRC_CLASS,value= INSTR)"));
}

TEST_F(RealAttributes, WhatIsSetIsReadBackAndTakesEffect)
{
    set("user_data_64", "VI_ATTR_USER_DATA_64", "0xFEDCBA9876543210");
    EXPECT_EQ(get("user_data_64", "VI_ATTR_USER_DATA_64"), "0xfedcba9876543210 (18364758544493064720)");
    set("_tmo", "VI_ATTR_TMO_VALUE", "150");
    EXPECT_EQ(get("_tmo", "VI_ATTR_TMO_VALUE"), "0x96 (150)");
    showPage("Basics");
    press("basicRead", "VI_ERROR_TMO"); // nothing was asked
    ASSERT_TRUE(lineHolds("viRead("));
    const QString duration = logCell(logRows() - 1, 1);
    ASSERT_TRUE(duration.endsWith(" ms")) << duration.toStdString();
    EXPECT_GE(duration.section(' ', 0, 0).toInt(), 150);
    EXPECT_LT(duration.section(' ', 0, 0).toInt(), 2000) << "not the time-out of before";
}

TEST_F(RealAttributes, WhatCannotBeSaysSo)
{
    select("asrl_baud", "VI_ATTR_ASRL_BAUD");
    press("attributesGet", "VI_ERROR_NSUP_ATTR");
    EXPECT_EQ(text("attributesCurrent"), "");
    set("rsrc_class", "VI_ATTR_RSRC_CLASS", "1", "VI_ERROR_ATTR_READONLY");
    set("tcpip_port", "VI_ATTR_TCPIP_PORT", "1", "VI_ERROR_ATTR_READONLY");
    set("send_end", "VI_ATTR_SEND_END_EN", "7", "VI_ERROR_NSUP_ATTR_STATE");
}

TEST_F(RealAttributes, TheResourceManagerAnswersWithoutASession)
{
    showPage("Basics");
    press("resourceDisconnect");
    showPage("Attributes");
    EXPECT_EQ(get("impl_version", "VI_ATTR_RSRC_IMPL_VERSION"), "0x500806 (5244934)");
    select("_tmo", "VI_ATTR_TMO_VALUE");
    press("attributesGet", "VI_ERROR_NSUP_ATTR");
}

class RealLocks : public InstrumentPages
{
protected:
    RealLocks()
    {
        connectTo(resource("hislip"));
        showPage("Locking");
    }
    ~RealLocks() override { release(); }

    /// Another program takes a lock on the same instrument.
    void holdElsewhere(const QStringList &lock)
    {
        m_other.start(QStringLiteral(LOCK_HOLDER_FILE), QStringList{resource("hislip")} + lock);
        ASSERT_TRUE(m_other.waitForReadyRead(10000));
        const QByteArray said = m_other.readAllStandardOutput();
        ASSERT_TRUE(said.startsWith("holds ")) << said.toStdString();
    }
    void release()
    {
        m_other.closeWriteChannel();
        m_other.waitForFinished(10000);
    }
    QString lockState()
    {
        showPage("Attributes");
        enter("attributesFilter", "lock_state");
        chooseRow("attributesList", "VI_ATTR_RSRC_LOCK_STATE");
        press("attributesGet");
        showPage("Locking");
        return text("attributesCurrent");
    }

    QProcess m_other;
};

TEST_F(RealLocks, AnExclusiveLockOfAnotherProgramIsWaitedForInVain)
{
    holdElsewhere({"exclusive"});
    enterNumber("lockTimeout", 300);
    press("lockExclusive", "VI_ERROR_TMO");
    press("lockShared", "VI_ERROR_TMO");
    EXPECT_EQ(text("lockAccessKey"), "");
    enterNumber("lockTimeout", 0);
    press("lockExclusive", "VI_ERROR_RSRC_LOCKED");
    EXPECT_EQ(lockState(), "0x1 (1)");
    release();
    press("lockExclusive");
    EXPECT_EQ(lockState(), "0x1 (1)");
    press("lockUnlock");
    EXPECT_EQ(lockState(), "0x0 (0)");
}

TEST_F(RealLocks, ALockIsGrantedWhenTheOtherProgramLetsGo)
{
    holdElsewhere({"exclusive"});
    enterNumber("lockTimeout", 10000);
    InstrumentWindowTest::press("lockExclusive");
    meanwhile(300);
    EXPECT_EQ(text("statusLabel"), "Status: ----") << "still waiting";
    release();
    EXPECT_TRUE(statusIs("VI_SUCCESS")) << text("statusLabel").toStdString();
}

TEST_F(RealLocks, ASharedLockIsSharedByItsKeyAlone)
{
    holdElsewhere({"shared", "bench 7"});
    enterNumber("lockTimeout", 300);
    enter("lockRequestedKey", "another");
    press("lockShared", "VI_ERROR_TMO");
    EXPECT_EQ(text("lockAccessKey"), "");
    enter("lockRequestedKey", "bench 7");
    press("lockShared");
    EXPECT_EQ(text("lockAccessKey"), "bench 7");
    EXPECT_TRUE(lineHolds("mode= VI_SHARED_LOCK, timeout= 300, rKey= bench 7, aKey= bench 7)"));
    EXPECT_EQ(lockState(), "0x2 (2)");
    showPage("Basics");
    query("*OPC?\\n", "1\n");
}

TEST_F(RealLocks, NestedLocksAreCountedAndGivenBackOneByOne)
{
    press("lockExclusive");
    press("lockExclusive", "VI_SUCCESS_NESTED_EXCLUSIVE");
    press("lockUnlock", "VI_SUCCESS_NESTED_EXCLUSIVE");
    press("lockUnlock");
    press("lockUnlock", "VI_ERROR_SESN_NLOCKED");
}

TEST_F(RealLocks, AKeyIsMadeUpWhenNoneIsAskedFor)
{
    press("lockShared");
    const QString key = text("lockAccessKey");
    EXPECT_FALSE(key.isEmpty());
    press("lockUnlock");
    EXPECT_EQ(text("lockAccessKey"), key);
}

TEST_F(RealLocks, LocalAndRemoteReachTheInstrument)
{
    press("lockGoToLocal");
    press("lockGoToRemote");
}

class RealEvents : public InstrumentPages
{
protected:
    RealEvents()
    {
        connectTo(resource("hislip"));
        write("*ESE 1;*SRE 32\\n"); // operation complete requests service
        showPage("Events");
        choose("eventType", "VI_EVENT_SERVICE_REQ");
    }

    void requestService()
    {
        showPage("Basics");
        write("*OPC\\n");
        showPage("Events");
    }
};

TEST_F(RealEvents, AServiceRequestWaitsInTheQueue)
{
    press("eventEnable");
    press("eventWait", "VI_ERROR_TMO");
    requestService();
    press("eventWait");
    EXPECT_TRUE(lineHolds("inType= VI_EVENT_SERVICE_REQ, timeout= 2000, outType=VI_EVENT_SERVICE_REQ, outContext= "));
    showPage("Basics");
    EXPECT_TRUE(statusByte("0x60"));
}

TEST_F(RealEvents, AServiceRequestIsACallbackLineOnceTheHandlerIsInstalled)
{
    tick("mechanismHandler");
    press("eventEnable", "VI_ERROR_HNDLR_NINSTALLED"); // the handler comes first
    press("eventInstall");
    press("eventEnable");
    requestService();
    EXPECT_TRUE(lineHolds("Callback from Event VI_EVENT_SERVICE_REQ: vi="));
    press("eventDisable");
    press("eventUninstall");
}

TEST_F(RealEvents, ADiscardedServiceRequestIsGone)
{
    press("eventEnable");
    requestService();
    showPage("Basics");
    EXPECT_TRUE(statusByte("0x60")); // it has been sent by now
    showPage("Events");
    press("eventDiscard");
    press("eventWait", "VI_ERROR_TMO");
    press("eventDiscard", "VI_SUCCESS_QUEUE_EMPTY");
    press("eventDisable");
    press("eventWait", "VI_ERROR_NENABLED");
}

TEST_F(RealEvents, WhatTheResourceDoesNotHaveSaysSo)
{
    choose("eventType", "VI_EVENT_USB_INTR");
    press("eventEnable", "VI_ERROR_INV_EVENT");
    press("eventInstall", "VI_ERROR_INV_EVENT");
}

} // namespace
