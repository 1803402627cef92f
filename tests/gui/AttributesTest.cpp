#include "gui/support/StandinWindowTest.h"

#include <visa.h>

#include <QColor>
#include <QPalette>

namespace
{

const QColor black(0, 0, 0);
const QColor green(0, 128, 0);
const QColor red(255, 0, 0);

/// Connected, on the page "Attributes".
class AttributesPage : public StandinWindowTest
{
protected:
    AttributesPage()
    {
        openWindow();
        connectSession();
        showPage("Attributes");
    }

    /// Narrows the list to what contains @p filter and clicks on @p name there.
    void select(const QString &filter, const QString &name)
    {
        enter("attributesFilter", filter);
        chooseRow("attributesList", name);
    }

    /// Presses "Get Attribute" and waits for the answer.
    void get(const QString &status = "VI_SUCCESS")
    {
        press("attributesGet");
        ASSERT_TRUE(statusIs(status)) << text("statusLabel").toStdString();
    }

    void set(const QString &value, const QString &status = "VI_SUCCESS")
    {
        enter("attributesNew", value);
        press("attributesSet");
        ASSERT_TRUE(statusIs(status)) << text("statusLabel").toStdString();
    }

    QString value() { return text("attributesCurrent"); }
    QColor valueColor() { return widget("attributesCurrent")->palette().color(QPalette::Text); }
    QColor color(const QString &name) { return rowData("attributesList", name, Qt::ForegroundRole).value<QColor>(); }
    bool lineAppears(const QString &line)
    {
        return eventually([&] { return logRow(line) >= 0; });
    }
};

TEST_F(AttributesPage, TypingTcpipShowsEveryNameThatContainsIt)
{
    enter("attributesFilter", "tcpip");
    EXPECT_EQ(
        rows("attributesList"),
        (QStringList{"VI_ATTR_TCPIP_ADDR", "VI_ATTR_TCPIP_HOSTNAME", "VI_ATTR_TCPIP_PORT", "VI_ATTR_TCPIP_DEVICE_NAME",
                     "VI_ATTR_TCPIP_NODELAY", "VI_ATTR_TCPIP_KEEPALIVE", "VI_ATTR_TCPIP_HISLIP_OVERLAP_EN",
                     "VI_ATTR_TCPIP_HISLIP_VERSION", "VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB", "VI_ATTR_TCPIP_IS_HISLIP",
                     "VI_ATTR_RECV_TCPIP_ADDR", "VI_KY_ATTR_TCPIP_FIND_RSRC_TMO", "VI_KY_ATTR_TCPIP_FIND_RSRC_MODE"}));
    enter("attributesFilter", "");
    EXPECT_EQ(rows("attributesList").size(), 195);
}

TEST_F(AttributesPage, AReadTimeOutIsGreenAndRedWhenItIsSelectedAgain)
{
    select("_tm", "VI_ATTR_TMO_VALUE");
    EXPECT_EQ(value(), "");
    get();
    EXPECT_EQ(value(), "0x7d0 (2000)");
    EXPECT_EQ(valueColor(), green);
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), green);
    EXPECT_TRUE(lineAppears("viGetAttribute(vi= 2,type= VI_ATTR_TMO_VALUE,value= 0x7D0)"));
    chooseRow("attributesList", "VI_KY_ATTR_TCPIP_FIND_RSRC_TMO"); // another one, untouched
    EXPECT_EQ(value(), "");
    chooseRow("attributesList", "VI_ATTR_TMO_VALUE");
    EXPECT_EQ(value(), "0x7d0 (2000)");
    EXPECT_EQ(valueColor(), red);
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), green);
}

TEST_F(AttributesPage, ASetAfterAGetIsRedAndALaterGetKeepsItRed)
{
    select("tmo", "VI_ATTR_TMO_VALUE");
    get();
    set("0x1F4");
    EXPECT_EQ(standin::calls("viSetAttribute").back().numbers, (std::vector<std::uint64_t>{0x3FFF001A, 500}));
    EXPECT_TRUE(lineAppears("viSetAttribute(vi= 2,type= VI_ATTR_TMO_VALUE,value= 0x1F4)"));
    EXPECT_EQ(value(), "0x1f4 (500)");
    EXPECT_EQ(valueColor(), green);
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), red);
    get();
    EXPECT_EQ(value(), "0x1f4 (500)");
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), red);
}

TEST_F(AttributesPage, AGetOfAnAliasMarksThe64BitName)
{
    standin::setAttribute(VI_ATTR_USER_DATA_64, 0x123456789ABCDEF0, 8);
    select("user_data", "VI_ATTR_USER_DATA");
    get();
    EXPECT_EQ(value(), "0x123456789abcdef0 (1311768467463790320)");
    EXPECT_EQ(color("VI_ATTR_USER_DATA_64"), green);
    EXPECT_EQ(color("VI_ATTR_USER_DATA"), black);
    EXPECT_EQ(color("VI_ATTR_USER_DATA_32"), black);
    EXPECT_TRUE(lineAppears("viGetAttribute(vi= 2,type= VI_ATTR_USER_DATA,value= 0x123456789ABCDEF0)"));
}

TEST_F(AttributesPage, ANameThatTheLogDoesNotKnowIsReadAllTheSame)
{
    standin::setAttribute(VI_ATTR_USER_DATA_32, 7, 4);
    select("user_data", "VI_ATTR_USER_DATA_32");
    get();
    EXPECT_EQ(value(), "0x7 (7)");
    EXPECT_EQ(color("VI_ATTR_USER_DATA_32"), green);
    EXPECT_TRUE(lineAppears("viGetAttribute(vi= 2,type= Unknown Attribute,value= 0x7)"));
}

TEST_F(AttributesPage, WithoutASelectionNothingIsSent)
{
    const auto before = standin::calls().size();
    press("attributesGet");
    enter("attributesNew", "1");
    press("attributesSet");
    meanwhile();
    EXPECT_EQ(standin::calls().size(), before);
}

TEST_F(AttributesPage, AValueThatIsNoNumberIsNotSent)
{
    select("tmo", "VI_ATTR_TMO_VALUE");
    const auto before = standin::calls().size();
    for (const char *typed : {"", "0x", "ff", "x1F", "0x12345678901234567"}) {
        enter("attributesNew", typed);
        EXPECT_EQ(text("attributesNew"), typed);
        press("attributesSet");
    }
    meanwhile();
    EXPECT_EQ(standin::calls().size(), before);
    enter("attributesNew", "12 ms-"); // what is no digit does not even appear
    EXPECT_EQ(text("attributesNew"), "12");
}

TEST_F(AttributesPage, EveryWidthOfNumberIsReadWithoutRemains)
{
    struct Row {
        const char *filter;
        const char *name;
        ViAttr attribute;
        unsigned width;
        const char *shown;
    };
    for (const Row &row : {Row{"user_data_64", "VI_ATTR_USER_DATA_64", VI_ATTR_USER_DATA_64, 8,
                               "0xfedcba9876543210 (18364758544493064720)"},
                           Row{"asrl_baud", "VI_ATTR_ASRL_BAUD", VI_ATTR_ASRL_BAUD, 4, "0x76543210 (1985229328)"},
                           Row{"tcpip_port", "VI_ATTR_TCPIP_PORT", VI_ATTR_TCPIP_PORT, 2, "0x3210 (12816)"},
                           Row{"xon_char", "VI_ATTR_ASRL_XON_CHAR", VI_ATTR_ASRL_XON_CHAR, 1, "0x10 (16)"}}) {
        standin::setAttribute(row.attribute, 0xFEDCBA9876543210, row.width);
        select(row.filter, row.name);
        get();
        EXPECT_EQ(value(), row.shown) << row.name;
    }
}

TEST_F(AttributesPage, TextsAreShownAsTextsFromTheirBeginning)
{
    standin::setTextAttribute(VI_ATTR_TCPIP_HOSTNAME, "M\xC3\xBCnchen-" + std::string(250, 'x'));
    select("hostname", "VI_ATTR_TCPIP_HOSTNAME");
    get();
    EXPECT_EQ(value(), QString::fromUtf8("München-") + QString(250, 'x'));
    EXPECT_EQ(shown("attributesCurrent", "cursorPosition").toInt(), 0);
    EXPECT_EQ(color("VI_ATTR_TCPIP_HOSTNAME"), green);
    select("rsrc_name", "VI_ATTR_RSRC_NAME");
    get();
    EXPECT_EQ(value(), "TCPIP::localhost::hislip0");
    EXPECT_TRUE(lineAppears("viGetAttribute(vi= 2,type= VI_ATTR_RSRC_NAME,value= TCPIP::localhost::hislip0)"));
}

TEST_F(AttributesPage, ATextCannotBeSet)
{
    select("rsrc_name", "VI_ATTR_RSRC_NAME");
    set("5", "VI_ERROR_ATTR_READONLY");
    EXPECT_EQ(color("VI_ATTR_RSRC_NAME"), black);
}

TEST_F(AttributesPage, AFailedCallLeavesValueAndColours)
{
    select("tmo", "VI_ATTR_TMO_VALUE");
    get();
    select("asrl_baud", "VI_ATTR_ASRL_BAUD");
    EXPECT_EQ(value(), "");
    get("VI_ERROR_NSUP_ATTR");
    EXPECT_EQ(value(), "");
    EXPECT_EQ(color("VI_ATTR_ASRL_BAUD"), black);
    standin::script("viSetAttribute", {.status = VI_ERROR_NSUP_ATTR_STATE});
    set("9600", "VI_ERROR_NSUP_ATTR_STATE");
    EXPECT_EQ(color("VI_ATTR_ASRL_BAUD"), black);
}

TEST_F(AttributesPage, AWarningCountsAsSet)
{
    select("tmo", "VI_ATTR_TMO_VALUE");
    standin::script("viSetAttribute", {.status = VI_WARN_NSUP_ATTR_STATE});
    set("3", "VI_WARN_NSUP_ATTR_STATE");
    EXPECT_EQ(value(), "0x3 (3)");
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), red);
}

TEST_F(AttributesPage, FollowsWhatOtherPagesReadAndSet)
{
    // The title's questions at the start, and the box "Send End" at the connection.
    EXPECT_EQ(color("VI_ATTR_RSRC_MANF_NAME"), green);
    EXPECT_EQ(color("VI_ATTR_SEND_END_EN"), red);
    EXPECT_EQ(value(), "0x1 (1)");
    EXPECT_EQ(valueColor(), green);
}

TEST_F(AttributesPage, ClosingTheSessionForgetsEverything)
{
    select("tmo", "VI_ATTR_TMO_VALUE");
    get();
    set("5");
    press("resourceDisconnect");
    ASSERT_TRUE(statusIs("VI_SUCCESS"));
    enter("attributesFilter", "");
    for (const QString &name : rows("attributesList"))
        EXPECT_EQ(color(name), black) << name.toStdString();
    select("tmo", "VI_ATTR_TMO_VALUE");
    EXPECT_EQ(value(), "");
}

TEST_F(AttributesPage, WithoutASessionTheResourceManagerAnswers)
{
    press("resourceDisconnect");
    ASSERT_TRUE(statusIs("VI_SUCCESS"));
    select("rsrc_class", "VI_ATTR_RSRC_CLASS");
    get();
    EXPECT_EQ(value(), "INSTR"); // the scripted library has one set of attributes for all
    EXPECT_TRUE(lineAppears("viGetAttribute(vi= 1,type= VI_ATTR_RSRC_CLASS,value= INSTR)"));
}

TEST_F(AttributesPage, ArrowKeysSelectAndShowWhatIsRemembered)
{
    select("tmo", "VI_ATTR_TMO_VALUE");
    get();
    chooseRow("attributesList", "VI_KY_ATTR_TCPIP_FIND_RSRC_TMO");
    key(Qt::Key_Up);
    EXPECT_EQ(value(), "0x7d0 (2000)");
    EXPECT_EQ(valueColor(), red);
    key(Qt::Key_Down);
    EXPECT_EQ(value(), "");
    get();
    EXPECT_EQ(standin::calls("viGetAttribute").back().numbers.at(0), 0x0FAF0001u);
}

TEST_F(AttributesPage, OtherKeysSelectAndLeaveTheValueOnDisplay)
{
    select("tmo", "VI_ATTR_TMO_VALUE");
    get();
    key(Qt::Key_End); // the keyboard focus went to the list with the click
    EXPECT_EQ(value(), "0x7d0 (2000)");
    get();
    EXPECT_EQ(standin::calls("viGetAttribute").back().numbers.at(0), 0x0FAF0001u);
}

TEST_F(AttributesPage, AnEntryThatTheFilterHidesIsSelectedNoMore)
{
    select("tmo", "VI_ATTR_TMO_VALUE");
    const auto before = standin::calls("viGetAttribute").size();
    enter("attributesFilter", "gpib");
    press("attributesGet");
    enter("attributesNew", "1");
    press("attributesSet");
    meanwhile();
    EXPECT_EQ(standin::calls("viGetAttribute").size(), before);
    EXPECT_EQ(standin::calls("viSetAttribute").size(), 1u) << "that of the connection";
}

TEST_F(AttributesPage, ATextMayFillItsWholeBuffer)
{
    // 512 bytes is what a text may take; all of them used, the last one ends it.
    standin::setTextAttribute(VI_ATTR_TCPIP_HOSTNAME, std::string(511, 'h'));
    select("hostname", "VI_ATTR_TCPIP_HOSTNAME");
    get();
    EXPECT_EQ(value().size(), 511);
}

} // namespace
