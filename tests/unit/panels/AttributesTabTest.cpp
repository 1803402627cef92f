#include "PanelTest.h"

#include "panels/AttributeListModel.h"
#include "panels/AttributeListView.h"
#include "panels/AttributesTab.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QColor>
#include <QLabel>
#include <QLineEdit>
#include <QListView>
#include <QSignalSpy>

namespace
{
class AttributesTabTest : public PanelTest
{
protected:
    AttributesTabTest()
    {
        m_tab.resize(400, 400);
        m_tab.show();
    }

    QAbstractItemModel *shown() const { return m_list->model(); }
    int shownRows() const { return shown()->rowCount(); }

    QModelIndex row(const char *name) const
    {
        for (int i = 0; i < shownRows(); ++i)
            if (shown()->index(i, 0).data().toString() == name)
                return shown()->index(i, 0);
        return {};
    }

    QColor color(const char *name) const { return row(name).data(Qt::ForegroundRole).value<QColor>(); }
    QColor valueColor(QPalette::ColorGroup group = QPalette::Active) const
    {
        return m_current->palette().color(group, QPalette::Text);
    }

    void click(const char *name)
    {
        m_list->scrollTo(row(name));
        QTest::mouseClick(m_list->viewport(), Qt::LeftButton, {}, m_list->visualRect(row(name)).center());
    }

    void filter(const char *text)
    {
        m_filter->selectAll();
        QTest::keyClick(m_filter, Qt::Key_Delete);
        QTest::keyClicks(m_filter, text);
    }

    _visaFunctionCall number(Kind kind, std::uint64_t id, std::uint64_t value, ViStatus status = 0)
    {
        _visaFunctionCall call = result(kind, status);
        call.parameter[0].uintValue = id;
        call.parameter[1].uintValue = value;
        return call;
    }

    _visaFunctionCall text(std::uint64_t id, const std::string &value)
    {
        _visaFunctionCall call = result(Kind::GetAttribute);
        call.parameter[0].uintValue = id;
        call.parameter[1].stringValue = value;
        return call;
    }

    AttributesTab m_tab{m_handler.get(), nullptr};
    QListView *m_list = find<QListView>(m_tab, "attributesList");
    QLineEdit *m_filter = find<QLineEdit>(m_tab, "attributesFilter");
    QLineEdit *m_current = find<QLineEdit>(m_tab, "attributesCurrent");
    QLineEdit *m_new = find<QLineEdit>(m_tab, "attributesNew");
    VisaFunctionCallButton *m_get = find<VisaFunctionCallButton>(m_tab, "attributesGet");
    VisaFunctionCallButton *m_set = find<VisaFunctionCallButton>(m_tab, "attributesSet");
};

TEST_F(AttributesTabTest, ShowsItsTextsAndTheLegend)
{
    EXPECT_EQ(find<QLabel>(m_tab, "attributesFilterLabel")->text(), "Filter:");
    EXPECT_EQ(find<QLabel>(m_tab, "attributesCurrentLabel")->text(), "Current Value:");
    EXPECT_EQ(find<QLabel>(m_tab, "attributesNewLabel")->text(), "New AttributeValue:");
    EXPECT_EQ(m_get->text(), "Get Attribute");
    EXPECT_EQ(m_set->text(), "Set Attribute");
    EXPECT_EQ(m_list->toolTip(),
              "Black: Attribute is unchanged.\r\nGreen: Attribute was read.\r\nRed: Attribute was changed.");
    EXPECT_EQ(m_list->selectionMode(), QAbstractItemView::SingleSelection);
    EXPECT_TRUE(m_current->isReadOnly());
    EXPECT_EQ(m_current->height(), 20);
    EXPECT_EQ(m_current->text(), "");
}

TEST_F(AttributesTabTest, ListsAllAttributesInBlack)
{
    ASSERT_EQ(shownRows(), 195);
    EXPECT_EQ(shown()->index(0, 0).data().toString(), "VI_ATTR_RSRC_CLASS");
    EXPECT_EQ(shown()->index(194, 0).data().toString(), "VI_KY_ATTR_TCPIP_FIND_RSRC_MODE");
    for (int i = 0; i < shownRows(); ++i) {
        EXPECT_EQ(shown()->index(i, 0).data(Qt::ForegroundRole).value<QColor>(), QColor(0, 0, 0));
        const auto entry = shown()->index(i, 0).data(266).value<AttributeEx>();
        EXPECT_EQ(entry.value.userType(), QMetaType::Int);
        EXPECT_EQ(entry.value.toInt(), 0);
        EXPECT_EQ(entry.state, 0);
    }
    EXPECT_FALSE(shown()->index(0, 0).data(Qt::ToolTipRole).isValid());
    EXPECT_NE(QMetaType::type("AttributeEx"), QMetaType::UnknownType);
}

TEST_F(AttributesTabTest, TheFilterFindsATextAnywhereInAnyCase)
{
    filter("tcpip");
    QStringList names;
    for (int i = 0; i < shownRows(); ++i)
        names << shown()->index(i, 0).data().toString();
    EXPECT_EQ(
        names,
        (QStringList{"VI_ATTR_TCPIP_ADDR", "VI_ATTR_TCPIP_HOSTNAME", "VI_ATTR_TCPIP_PORT", "VI_ATTR_TCPIP_DEVICE_NAME",
                     "VI_ATTR_TCPIP_NODELAY", "VI_ATTR_TCPIP_KEEPALIVE", "VI_ATTR_TCPIP_HISLIP_OVERLAP_EN",
                     "VI_ATTR_TCPIP_HISLIP_VERSION", "VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB", "VI_ATTR_TCPIP_IS_HISLIP",
                     "VI_ATTR_RECV_TCPIP_ADDR", "VI_KY_ATTR_TCPIP_FIND_RSRC_TMO", "VI_KY_ATTR_TCPIP_FIND_RSRC_MODE"}));
    filter("");
    EXPECT_EQ(shownRows(), 195);
}

TEST_F(AttributesTabTest, TheFilterTakesItsTextAsItIs)
{
    filter(".*");
    EXPECT_EQ(shownRows(), 0);
    filter("[");
    EXPECT_EQ(shownRows(), 0);
}

TEST_F(AttributesTabTest, WithoutASelectionNothingIsSent)
{
    m_new->setText("1");
    press(m_get);
    press(m_set);
    EXPECT_TRUE(requests().empty());
}

TEST_F(AttributesTabTest, GetSendsTheSelectedIdentifier)
{
    click("VI_ATTR_TMO_VALUE");
    press(m_get);
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::GetAttribute);
    EXPECT_EQ(sent[0].parameter[0].uintValue, 0x3FFF001Au);
}

TEST_F(AttributesTabTest, AnAliasSendsTheIdentifierThatItShares)
{
    click("VI_ATTR_USER_DATA");
    press(m_get);
    EXPECT_EQ(requests().at(0).parameter[0].uintValue, 0x3FFF000Au);
}

TEST_F(AttributesTabTest, SetSendsIdentifierAndValue)
{
    click("VI_ATTR_TMO_VALUE");
    QTest::keyClicks(m_new, "0xFFFFFFFFFFFFFFFF");
    press(m_set);
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::SetAttribute);
    EXPECT_EQ(sent[0].parameter[0].uintValue, 0x3FFF001Au);
    EXPECT_EQ(sent[0].parameter[1].uintValue, 0xFFFFFFFFFFFFFFFFu);
    EXPECT_EQ(sent[0].parameter[1].stringValue, "");
}

TEST_F(AttributesTabTest, AValueThatDoesNotConvertSendsNothing)
{
    click("VI_ATTR_TMO_VALUE");
    for (const char *text : {"", "0x", "ff", "x1F", "0x12345678901234567"}) {
        m_new->setText(text);
        press(m_set);
        EXPECT_TRUE(requests().empty()) << text;
    }
}

TEST_F(AttributesTabTest, ASelectionThatTheFilterHidesIsNoneAnyMore)
{
    click("VI_ATTR_TMO_VALUE");
    filter("tcpip");
    press(m_get);
    EXPECT_TRUE(requests().empty());
}

TEST_F(AttributesTabTest, ASelectionThatTheFilterKeepsStays)
{
    click("VI_ATTR_TCPIP_PORT");
    filter("tcpip");
    press(m_get);
    EXPECT_EQ(requests().at(0).parameter[0].uintValue, 0x3FFF0197u);
}

TEST_F(AttributesTabTest, AReadValueIsShownInGreenAndItsEntryIsGreen)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 2000));
    EXPECT_EQ(m_current->text(), "0x7d0 (2000)");
    for (const auto group : {QPalette::Active, QPalette::Inactive, QPalette::Disabled})
        EXPECT_EQ(valueColor(group), QColor(0, 128, 0));
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), QColor(0, 128, 0));
    const auto entry = row("VI_ATTR_TMO_VALUE").data(266).value<AttributeEx>();
    EXPECT_EQ(entry.name.toString(), "VI_ATTR_TMO_VALUE");
    EXPECT_EQ(entry.value.userType(), QMetaType::ULong);
    EXPECT_EQ(entry.state, 1);
}

TEST_F(AttributesTabTest, ASelectedEntryShowsWhatIsRememberedInRed)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 2000));
    click("VI_ATTR_TERMCHAR");
    EXPECT_EQ(m_current->text(), "");
    click("VI_ATTR_TMO_VALUE");
    EXPECT_EQ(m_current->text(), "0x7d0 (2000)");
    for (const auto group : {QPalette::Active, QPalette::Inactive, QPalette::Disabled})
        EXPECT_EQ(valueColor(group), QColor(255, 0, 0));
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), QColor(0, 128, 0)) << "the list keeps its green";
}

TEST_F(AttributesTabTest, ASetAfterAGetTurnsTheEntryRedForGood)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 2000));
    finish(number(Kind::SetAttribute, 0x3FFF001A, 500));
    EXPECT_EQ(m_current->text(), "0x1f4 (500)");
    EXPECT_EQ(valueColor(), QColor(0, 128, 0));
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), QColor(255, 0, 0));
    finish(number(Kind::GetAttribute, 0x3FFF001A, 500));
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), QColor(255, 0, 0));
    EXPECT_EQ(row("VI_ATTR_TMO_VALUE").data(266).value<AttributeEx>().state, 3);
}

TEST_F(AttributesTabTest, AResultMarksThe64BitEntryNeverItsAlias)
{
    finish(number(Kind::GetAttribute, 0x3FFF000A, 7));
    EXPECT_EQ(color("VI_ATTR_USER_DATA_64"), QColor(0, 128, 0));
    EXPECT_EQ(color("VI_ATTR_USER_DATA"), QColor(0, 0, 0));
    EXPECT_EQ(color("VI_ATTR_USER_DATA_32"), QColor(0, 0, 0));
    click("VI_ATTR_USER_DATA");
    EXPECT_EQ(m_current->text(), "");
}

TEST_F(AttributesTabTest, ATextIsShownAsItIsFromItsBeginning)
{
    finish(text(0xBFFF0174, "M\xC3\xBCller & S\xC3\xB6hne"));
    EXPECT_EQ(m_current->text(), QString::fromUtf8("Müller & Söhne"));
    EXPECT_EQ(m_current->cursorPosition(), 0);
    click("VI_ATTR_TERMCHAR");
    click("VI_ATTR_RSRC_MANF_NAME");
    EXPECT_EQ(m_current->text(), QString::fromUtf8("Müller & Söhne"));
    EXPECT_EQ(valueColor(), QColor(255, 0, 0));
}

TEST_F(AttributesTabTest, AnEmptyTextWasReadAllTheSame)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 1));
    finish(text(0xBFFF0199, ""));
    EXPECT_EQ(m_current->text(), "");
    EXPECT_EQ(color("VI_ATTR_TCPIP_DEVICE_NAME"), QColor(0, 128, 0));
}

TEST_F(AttributesTabTest, TheLargestNumberHasAllItsDigits)
{
    finish(number(Kind::GetAttribute, 0x3FFF000A, 0xFFFFFFFFFFFFFFFF));
    EXPECT_EQ(m_current->text(), "0xffffffffffffffff (18446744073709551615)");
    finish(number(Kind::GetAttribute, 0x3FFF001A, 0));
    EXPECT_EQ(m_current->text(), "0x0 (0)");
}

TEST_F(AttributesTabTest, AWarningCountsAsDone)
{
    finish(number(Kind::SetAttribute, 0x3FFF001A, 3, VI_WARN_NSUP_ATTR_STATE));
    EXPECT_EQ(m_current->text(), "0x3 (3)");
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), QColor(255, 0, 0));
}

TEST_F(AttributesTabTest, AFailedCallLeavesEverything)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 2000));
    finish(number(Kind::GetAttribute, 0x3FFF0018, 10, VI_ERROR_NSUP_ATTR));
    finish(number(Kind::SetAttribute, 0x3FFF001A, 3, VI_ERROR_NSUP_ATTR_STATE));
    finish(result(Kind::Close, VI_ERROR_CLOSING_FAILED));
    EXPECT_EQ(m_current->text(), "0x7d0 (2000)");
    EXPECT_EQ(color("VI_ATTR_TMO_VALUE"), QColor(0, 128, 0));
    EXPECT_EQ(color("VI_ATTR_TERMCHAR"), QColor(0, 0, 0));
}

TEST_F(AttributesTabTest, AnIdentifierOutsideTheListIsShownAndNotRemembered)
{
    finish(number(Kind::GetAttribute, 0x3FFFABCD, 5));
    EXPECT_EQ(m_current->text(), "0x5 (5)");
    for (int i = 0; i < shownRows(); ++i)
        EXPECT_EQ(shown()->index(i, 0).data(266).value<AttributeEx>().state, 0);
}

TEST_F(AttributesTabTest, CloseForgetsEverythingButTheValueOnDisplay)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 2000));
    finish(number(Kind::SetAttribute, 0x3FFF0016, 1));
    finish(result(Kind::Close));
    for (int i = 0; i < shownRows(); ++i) {
        const auto entry = shown()->index(i, 0).data(266).value<AttributeEx>();
        EXPECT_EQ(entry.state, 0);
        EXPECT_EQ(entry.value.toInt(), 0);
    }
    EXPECT_EQ(color("VI_ATTR_SEND_END_EN"), QColor(0, 0, 0));
    EXPECT_EQ(m_current->text(), "0x1 (1)");
    click("VI_ATTR_TMO_VALUE");
    EXPECT_EQ(m_current->text(), "");
}

TEST_F(AttributesTabTest, OtherCallsAreNoMatter)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 2000));
    finish(number(Kind::GetAttributeDef, 0x3FFF0018, 10));
    finish(number(Kind::SetAttributeDef, 0x3FFF0018, 10));
    finish(result(Kind::Open));
    EXPECT_EQ(m_current->text(), "0x7d0 (2000)");
    EXPECT_EQ(color("VI_ATTR_TERMCHAR"), QColor(0, 0, 0));
}

TEST_F(AttributesTabTest, ArrowKeysSelectLikeAClick)
{
    finish(number(Kind::GetAttribute, 0x3FFF0018, 10)); // of the entry above the time-out
    click("VI_ATTR_TMO_VALUE");
    EXPECT_EQ(m_current->text(), "");
    QTest::keyClick(m_list, Qt::Key_Up);
    EXPECT_EQ(m_current->text(), "0xa (10)");
    QTest::keyClick(m_list, Qt::Key_Down);
    EXPECT_EQ(m_current->text(), "");
    press(m_get);
    EXPECT_EQ(requests().at(0).parameter[0].uintValue, 0x3FFF001Au);
}

TEST_F(AttributesTabTest, OtherKeysMoveTheSelectionAndLeaveTheValue)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 2000));
    click("VI_ATTR_TMO_VALUE");
    QTest::keyClick(m_list, Qt::Key_Home);
    EXPECT_EQ(m_current->text(), "0x7d0 (2000)");
    press(m_get);
    EXPECT_EQ(requests().at(0).parameter[0].uintValue, 0xBFFF0001u);
}

TEST_F(AttributesTabTest, ArrowKeysInAnEmptyListAreNoMatter)
{
    finish(number(Kind::GetAttribute, 0x3FFF001A, 2000));
    filter("no such name");
    QTest::keyClick(m_list, Qt::Key_Down);
    EXPECT_EQ(m_current->text(), "0x7d0 (2000)");
}

TEST_F(AttributesTabTest, AnEntryIsAnnouncedAgainWhenItIsClickedAgain)
{
    auto *list = find<AttributeListView>(m_tab, "attributesList");
    QSignalSpy selected(list, &AttributeListView::selectedAttributeChanged);
    click("VI_ATTR_TERMCHAR");
    click("VI_ATTR_TERMCHAR");
    ASSERT_EQ(selected.count(), 2);
    EXPECT_EQ(selected.at(1).at(0).value<AttributeEx>().attribute, 0x3FFF0018u);
}

TEST_F(AttributesTabTest, TabFollowsTheEyeAndPassesTheRequestButtonsBy)
{
    EXPECT_EQ(tabOrder(m_tab, m_filter),
              (QStringList{"attributesFilter", "attributesList", "attributesCurrent", "attributesNew"}));
}

TEST(AttributeModel, UpdatesTheFirstOfTwoEntriesAndTellsWhichRow)
{
    AttributeListModel model(nullptr);
    model.addAttribute({.attribute = 5, .name = "five"});
    model.addAttribute({.attribute = 7, .name = "seven"});
    model.addAttribute({.attribute = 7, .name = "seven again"});
    QSignalSpy changed(&model, &QAbstractItemModel::dataChanged);
    model.update({.attribute = 7, .name = "other", .value = QVariant::fromValue(3UL), .state = 1});
    model.update({.attribute = 8, .name = {}, .value = QVariant::fromValue(4UL), .state = 2});
    ASSERT_EQ(changed.count(), 1);
    EXPECT_EQ(changed[0][0].toModelIndex().row(), 1);
    EXPECT_EQ(changed[0][1].toModelIndex().row(), 1);
    EXPECT_EQ(model.index(1).data(), "seven");
    EXPECT_EQ(model.index(1).data(266).value<AttributeEx>().value.toULongLong(), 3u);
    EXPECT_EQ(model.index(2).data(266).value<AttributeEx>().state, 0);
    EXPECT_EQ(model.index(2).data(Qt::ForegroundRole).value<QColor>(), QColor(0, 0, 0));
}

TEST(AttributeModel, ResetTellsOfAllRows)
{
    AttributeListModel model(nullptr);
    model.resetValues(); // an empty one has no rows to tell of
    model.addAttribute({.attribute = 5, .name = "five", .value = QVariant::fromValue(1UL), .state = 3});
    model.addAttribute({.attribute = 6, .name = "six", .value = "text", .state = 1});
    QSignalSpy changed(&model, &QAbstractItemModel::dataChanged);
    model.resetValues();
    ASSERT_EQ(changed.count(), 1);
    EXPECT_EQ(changed[0][0].toModelIndex().row(), 0);
    EXPECT_EQ(changed[0][1].toModelIndex().row(), 1);
    EXPECT_EQ(model.index(1).data(266).value<AttributeEx>().value.toInt(), 0);
}

TEST(AttributeModel, HasNothingOutsideItsRows)
{
    AttributeListModel model(nullptr);
    model.addAttribute({.attribute = 5, .name = "five"});
    EXPECT_EQ(static_cast<QAbstractItemModel &>(model).columnCount(), 1);
    EXPECT_EQ(model.rowCount(model.index(0)), 0);
    EXPECT_FALSE(model.data(QModelIndex(), Qt::DisplayRole).isValid());
    EXPECT_FALSE(model.data(model.index(0), Qt::EditRole).isValid());
}

TEST(AttributeList, WithoutAModelRefuses)
{
    AttributeListView view(nullptr);
    Parameter parameter;
    parameter.uintValue = 1;
    EXPECT_FALSE(view.getParameter(parameter));
    EXPECT_EQ(parameter.uintValue, 1u);
    view.newItemSelceted({});
}
} // namespace
