#include "PanelTest.h"

#include "panels/ObserverLineEdit.h"
#include "panels/ResourceFrame.h"
#include "panels/ResourceName.h"
#include "panels/SpinBoxParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QCheckBox>
#include <QLabel>
#include <QSignalSpy>

namespace
{
class ResourceFrameTest : public PanelTest
{
protected:
    ResourceFrameTest() { m_frame.setResourceName(&m_name); }

    bool connected() const { return m_connect->isHidden() && !m_disconnect->isHidden() && !m_line->isEnabled(); }
    bool disconnected() const { return !m_connect->isHidden() && m_disconnect->isHidden() && m_line->isEnabled(); }

    ResourceName m_name{2};
    ResourceFrame m_frame{m_handler.get(), nullptr};
    ObserverLineEdit *m_line = find<ObserverLineEdit>(m_frame, "resourceName");
    VisaFunctionCallButton *m_connect = find<VisaFunctionCallButton>(m_frame, "resourceConnect");
    VisaFunctionCallButton *m_disconnect = find<VisaFunctionCallButton>(m_frame, "resourceDisconnect");
};

TEST_F(ResourceFrameTest, StartsDisconnectedWithItsDefaults)
{
    EXPECT_TRUE(disconnected());
    EXPECT_EQ(m_line->minimumWidth(), 200);
    EXPECT_EQ(m_line->minimumHeight(), 20);
    EXPECT_EQ(m_connect->text(), "Connect");
    EXPECT_EQ(m_connect->minimumWidth(), 90);
    EXPECT_EQ(m_connect->maximumWidth(), 90);
    EXPECT_EQ(m_disconnect->text(), "Disconnect");
    EXPECT_EQ(m_disconnect->minimumWidth(), 90);
    EXPECT_EQ(m_disconnect->maximumWidth(), 90);
    EXPECT_EQ(find<QLabel>(m_frame, "resourceLabel")->text(), "Resource");
    EXPECT_EQ(find<QLabel>(m_frame, "openTimeoutLabel")->text(), "Timeout");
    auto *timeout = find<SpinBoxParameter>(m_frame, "openTimeout");
    EXPECT_EQ(timeout->minimum(), 0);
    EXPECT_EQ(timeout->maximum(), 10000000);
    EXPECT_EQ(timeout->value(), 2000);
    EXPECT_EQ(timeout->singleStep(), 1000);
    EXPECT_EQ(timeout->text(), "2000");
    EXPECT_EQ(find<QCheckBox>(m_frame, "showLog")->text(), "Show Log");
    EXPECT_TRUE(find<QCheckBox>(m_frame, "showLog")->isChecked());
    EXPECT_EQ(find<QCheckBox>(m_frame, "writeLog")->text(), "Write Log");
    EXPECT_FALSE(find<QCheckBox>(m_frame, "writeLog")->isChecked());
}

TEST_F(ResourceFrameTest, LiesInOneRow)
{
    const auto place = [this](const char *name) { return find<QWidget>(m_frame, name)->geometry(); };
    m_frame.resize(900, 200);
    m_frame.show();
    QCoreApplication::processEvents();
    EXPECT_LT(place("resourceLabel").bottom(), place("resourceName").top());
    EXPECT_LT(place("resourceName").right(), place("resourceConnect").left());
    EXPECT_LT(place("resourceConnect").right(), place("openExclusiveLock").left());
    EXPECT_LT(place("openExclusiveLock").bottom(), place("openLoadConfig").top());
    EXPECT_LT(place("openExclusiveLock").right(), place("openTimeout").left());
    EXPECT_LT(place("openTimeoutLabel").bottom(), place("openTimeout").top());
    EXPECT_LT(place("openTimeout").right(), place("showLog").left());
    EXPECT_LT(place("showLog").bottom(), place("writeLog").top());
    EXPECT_GT(place("resourceConnect").bottom(), 150);
    EXPECT_EQ(place("resourceConnect").bottom(), place("openTimeout").bottom());

    const QRect connect = place("resourceConnect");
    finish(result(Kind::Open));
    QCoreApplication::processEvents();
    EXPECT_EQ(place("resourceDisconnect"), connect);
}

TEST_F(ResourceFrameTest, ConnectSendsNameAccessModeAndTimeout)
{
    m_line->setText("TCPIP::localhost::hislip0");
    find<QCheckBox>(m_frame, "openExclusiveLock")->setChecked(true);
    find<QCheckBox>(m_frame, "openLoadConfig")->setChecked(true);
    find<SpinBoxParameter>(m_frame, "openTimeout")->setValue(1234);
    press(m_connect);
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::Open);
    EXPECT_EQ(sent[0].parameter[0].stringValue, "TCPIP::localhost::hislip0");
    EXPECT_EQ(sent[0].parameter[1].uintValue, 5u);
    EXPECT_EQ(sent[0].parameter[2].uintValue, 1234u);
}

TEST_F(ResourceFrameTest, ConnectSendsTheTextAsItStandsBeforeItIsStored)
{
    m_name.setName("old");
    m_line->setText("with\nbreak");
    press(m_connect);
    EXPECT_EQ(requests().at(0).parameter[0].stringValue, "with\nbreak");
    EXPECT_EQ(m_name.getName(), "withbreak");
    EXPECT_EQ(m_line->text(), "withbreak");
}

TEST_F(ResourceFrameTest, ReturnStoresTheNameAndSendsNothing)
{
    m_line->setText("ASRL1::INSTR");
    EXPECT_EQ(m_name.getName(), "");
    QTest::keyClick(m_line, Qt::Key_Return);
    EXPECT_EQ(m_name.getName(), "ASRL1::INSTR");
    EXPECT_TRUE(requests().empty());
}

TEST_F(ResourceFrameTest, DisconnectSendsCloseWithoutParameters)
{
    finish(result(Kind::Open));
    press(m_disconnect);
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::Close);
    for (const Parameter &slot : sent[0].parameter) {
        EXPECT_EQ(slot.uintValue, 0u);
        EXPECT_EQ(slot.stringValue, "");
    }
}

TEST_F(ResourceFrameTest, FollowsOpenAndClose)
{
    finish(result(Kind::Open, VI_ERROR_RSRC_NFOUND));
    EXPECT_TRUE(disconnected());
    finish(result(Kind::Open, VI_SUCCESS));
    EXPECT_TRUE(connected());
    finish(result(Kind::Open, VI_ERROR_RSRC_NFOUND)); // a failed one changes nothing
    EXPECT_TRUE(connected());
    finish(result(Kind::Close, VI_ERROR_INV_OBJECT)); // any close counts
    EXPECT_TRUE(disconnected());
    finish(result(Kind::Open, VI_SUCCESS_DEV_NPRESENT));
    EXPECT_TRUE(connected());
    finish(result(Kind::Read, VI_ERROR_CONN_LOST));
    EXPECT_TRUE(connected());
    finish(result(Kind::Close, VI_SUCCESS));
    EXPECT_TRUE(disconnected());
}

TEST_F(ResourceFrameTest, ShowsANameThatIsRestored)
{
    m_name.setData("VXI0::1::INSTR");
    EXPECT_EQ(m_line->text(), "VXI0::1::INSTR");
}

TEST_F(ResourceFrameTest, TabFollowsTheEyeAndPassesTheRequestButtonsBy)
{
    EXPECT_EQ(tabOrder(m_frame, m_line), QStringList({"resourceName", "openExclusiveLock", "openLoadConfig",
                                                      "openTimeout", "showLog", "writeLog"}));
}

TEST_F(ResourceFrameTest, WithoutAResourceNamePressesStillSend)
{
    ResourceFrame frame(m_handler.get(), nullptr);
    find<ObserverLineEdit>(frame, "resourceName")->setText("x");
    press(find<VisaFunctionCallButton>(frame, "resourceConnect"));
    EXPECT_EQ(requests().size(), 1u);
}
} // namespace
