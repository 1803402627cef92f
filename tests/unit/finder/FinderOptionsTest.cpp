#include "FinderTest.h"

namespace
{
class FinderOptions : public Finder
{
protected:
    void attributeArrives(std::uint64_t id, std::uint64_t value, ViStatus status = 0)
    {
        _visaFunctionCall call = result(Kind::GetAttributeDef, status);
        call.parameter[0].uintValue = id;
        call.parameter[1].uintValue = value;
        finish(call);
    }

    void expectSet(std::uint64_t id, std::uint64_t value)
    {
        const auto sent = requests();
        ASSERT_EQ(sent.size(), 1U);
        EXPECT_EQ(sent[0].type, Kind::SetAttributeDef);
        EXPECT_EQ(sent[0].parameter[0].uintValue, id);
        EXPECT_EQ(sent[0].parameter[1].uintValue, value);
    }

    static constexpr std::uint64_t Mode = 0x0FAF0002;
    static constexpr std::uint64_t TimeOut = 0x0FAF0001;
    static constexpr std::uint64_t Manufacturer = 0x3FFF0175;
};
} // namespace

TEST_F(FinderOptions, ShowsTheseTexts)
{
    open();
    EXPECT_EQ(m_dialog->windowTitle(), "Find and select resource");
    EXPECT_TRUE(m_dialog->isModal());
    EXPECT_EQ(child<QLabel>("finderExpressionLabel")->text(), "Search expression");
    EXPECT_EQ(child<QLineEdit>("finderExpression")->text(), "?*");
    EXPECT_EQ(child<QPushButton>("finderFind")->text(), "Find Resources");
    EXPECT_EQ(child<QCheckBox>("finderMdns")->text(), "LXI (mDNS)");
    EXPECT_EQ(child<QCheckBox>("finderMdns")->toolTip(), "Search devices in LAN via mDNS query");
    EXPECT_EQ(child<QCheckBox>("finderVxi11")->text(), "VXI-11");
    EXPECT_EQ(child<QCheckBox>("finderVxi11")->toolTip(), "Search devices in LAN via VXI-11 query");
    EXPECT_EQ(child<QLabel>("finderTimeOutLabel")->text(), "LAN discovery timeout (ms)");
    EXPECT_EQ(child<QSpinBox>("finderTimeOut")->minimum(), 1);
    EXPECT_EQ(child<QSpinBox>("finderTimeOut")->maximum(), 600000);
    ASSERT_EQ(tree()->columnCount(), 3);
    EXPECT_EQ(tree()->headerItem()->text(0), "Identification");
    EXPECT_EQ(tree()->headerItem()->text(1), "Description");
    EXPECT_EQ(tree()->headerItem()->text(2), "Resource");
    EXPECT_EQ(tree()->columnWidth(0), 200);
    EXPECT_EQ(child<QLabel>("finderSelectedLabel")->text(), "Selected Resource");
    EXPECT_EQ(child<QLabel>("finderSelected")->text(), "");
    EXPECT_EQ(child<QPushButton>("finderSelect")->text(), "Select");
    EXPECT_EQ(child<QPushButton>("finderCancel")->text(), "Cancel");
}

TEST_F(FinderOptions, AsksForModeTimeOutAndManufacturerWhenItOpens)
{
    m_dialog = std::make_unique<ResourceDialog>(m_handler.get(), nullptr);
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 3U);
    const std::uint64_t expected[] = {Mode, TimeOut, Manufacturer};
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(sent[i].type, Kind::GetAttributeDef);
        EXPECT_EQ(sent[i].parameter[0].uintValue, expected[i]);
    }
}

TEST_F(FinderOptions, AsksWhileALockingCallIsOutstanding)
{
    _visaFunctionCall read;
    read.type = Kind::Read;
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(read, true));
    m_dialog = std::make_unique<ResourceDialog>(m_handler.get(), nullptr);
    EXPECT_EQ(requests().size(), 4U);
}

TEST_F(FinderOptions, MirrorsTheModeByItsBitsAndSendsNothingBack)
{
    open();
    const struct {
        std::uint64_t mode;
        bool mdns, vxi11;
    } rows[] = {{6, true, true},   {4, true, false},     {2, false, true},
                {0, false, false}, {0x11, false, false}, {0x1F, true, true}};
    for (const auto &row : rows) {
        attributeArrives(Mode, row.mode);
        EXPECT_EQ(child<QCheckBox>("finderMdns")->isChecked(), row.mdns) << row.mode;
        EXPECT_EQ(child<QCheckBox>("finderVxi11")->isChecked(), row.vxi11) << row.mode;
    }
    EXPECT_TRUE(requests().empty());
}

TEST_F(FinderOptions, MirrorsTheTimeOutAndSendsNothingBack)
{
    open();
    attributeArrives(TimeOut, 2000);
    EXPECT_EQ(child<QSpinBox>("finderTimeOut")->value(), 2000);
    attributeArrives(TimeOut, 0xFFFFFFFFFFFFFFFF);
    EXPECT_EQ(child<QSpinBox>("finderTimeOut")->value(), 600000);
    attributeArrives(TimeOut, 0);
    EXPECT_EQ(child<QSpinBox>("finderTimeOut")->value(), 1);
    EXPECT_TRUE(requests().empty());
}

TEST_F(FinderOptions, ChangesTheTwoBitsOfTheModeOnly)
{
    open();
    attributeArrives(Mode, 0x12345679); // neither bit is set
    press(child<QCheckBox>("finderMdns"));
    expectSet(Mode, 0x1234567D);
    press(child<QCheckBox>("finderVxi11"));
    expectSet(Mode, 0x1234567F);
    press(child<QCheckBox>("finderMdns"));
    expectSet(Mode, 0x1234567B);
    press(child<QCheckBox>("finderVxi11"));
    expectSet(Mode, 0x12345679);
}

TEST_F(FinderOptions, SendsTheTimeOut)
{
    open();
    attributeArrives(TimeOut, 2000);
    QTest::keyClick(child<QSpinBox>("finderTimeOut"), Qt::Key_Up);
    expectSet(TimeOut, 2001);
}

TEST_F(FinderOptions, HidesTheOptionsWithAnotherMakersLibrary)
{
    open();
    attributeArrives(Manufacturer, 4015);
    for (const char *name : {"finderMdns", "finderVxi11", "finderTimeOut", "finderTimeOutLabel"})
        EXPECT_TRUE(child<QWidget>(name)->isVisible()) << name;
    attributeArrives(Manufacturer, 4014);
    for (const char *name : {"finderMdns", "finderVxi11", "finderTimeOut", "finderTimeOutLabel"})
        EXPECT_FALSE(child<QWidget>(name)->isVisible()) << name;
}

TEST_F(FinderOptions, IgnoresAttributesThatFailed)
{
    open();
    attributeArrives(Mode, 6);
    attributeArrives(TimeOut, 2000);
    attributeArrives(Mode, 0, static_cast<ViStatus>(0xBFFF001D));
    attributeArrives(TimeOut, 0, static_cast<ViStatus>(0xBFFF001D));
    attributeArrives(Manufacturer, 0, static_cast<ViStatus>(0xBFFF001D));
    EXPECT_TRUE(child<QCheckBox>("finderMdns")->isChecked());
    EXPECT_EQ(child<QSpinBox>("finderTimeOut")->value(), 2000);
    EXPECT_TRUE(child<QCheckBox>("finderMdns")->isVisible());
}

TEST_F(FinderOptions, OpensAgainWhereItWas)
{
    open();
    m_dialog->resize(801, 502);
    m_dialog->move(13, 17);
    m_dialog.reset();
    EXPECT_EQ(QSettings().value("ResourceDialog/size").toSize(), QSize(801, 502));
    EXPECT_EQ(QSettings().value("ResourceDialog/pos").toPoint(), QPoint(13, 17));
    EXPECT_FALSE(QSettings().value("ResourceDialog/fullscreen").toBool());
    open();
    EXPECT_EQ(m_dialog->size(), QSize(801, 502));
    EXPECT_EQ(m_dialog->pos(), QPoint(13, 17));
}

TEST_F(FinderOptions, OpensMaximizedAgain)
{
    open();
    m_dialog->showMaximized();
    m_dialog.reset();
    open();
    EXPECT_TRUE(m_dialog->isMaximized());
}

TEST_F(FinderOptions, TabsThroughTheWidgetsAsTheEyeDoes)
{
    open();
    const char *const order[] = {"finderExpression", "finderFind",    "finderMdns",   "finderVxi11",
                                 "finderTimeOut",    "finderResults", "finderSelect", "finderCancel"};
    QWidget *widget = child<QWidget>("finderExpression");
    widget->setFocus();
    for (const char *name : order) {
        ASSERT_NE(m_dialog->focusWidget(), nullptr);
        EXPECT_EQ(m_dialog->focusWidget()->objectName(), name);
        QTest::keyClick(m_dialog->focusWidget(), Qt::Key_Tab);
    }
}
