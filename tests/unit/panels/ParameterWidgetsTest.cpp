#include "panels/ComboBoxParamerter.h"
#include "panels/EventComboBox.h"
#include "panels/ExprLineEdit.h"
#include "panels/GpibAtnComboBox.h"
#include "panels/GpibRenComboBox.h"
#include "panels/LineEditAttribute.h"
#include "panels/LineEditParameter.h"
#include "panels/MechanismFrame.h"
#include "panels/OpenModeParameter.h"
#include "panels/SpinBoxParameter.h"

#include <QCheckBox>
#include <QLabel>
#include <QRadioButton>
#include <QTest>
#include <QVBoxLayout>
#include <QValidator>

#include <gtest/gtest.h>

#include <utility>
#include <vector>

namespace
{
constexpr std::uint64_t Used = 0xAAAABBBBCCCCDDDDu; ///< what a slot holds before it is filled

Parameter usedSlot()
{
    return {Used, "before"};
}

using Items = std::vector<std::pair<const char *, std::uint64_t>>;

Items itemsOf(const QComboBox &box, std::vector<QByteArray> &texts)
{
    Items items;
    texts.clear();
    for (int i = 0; i < box.count(); ++i)
        texts.push_back(box.itemText(i).toUtf8());
    for (int i = 0; i < box.count(); ++i)
        items.emplace_back(texts[static_cast<std::size_t>(i)].constData(), box.itemData(i, Qt::UserRole).toULongLong());
    return items;
}

void expectItems(const QComboBox &box, const Items &expected)
{
    std::vector<QByteArray> texts;
    const Items items = itemsOf(box, texts);
    ASSERT_EQ(items.size(), expected.size());
    for (std::size_t i = 0; i < items.size(); ++i) {
        EXPECT_STREQ(items[i].first, expected[i].first);
        EXPECT_EQ(items[i].second, expected[i].second) << expected[i].first;
    }
}

TEST(SpinBoxParameter, StoresItsValueInTheLower32BitsOnly)
{
    SpinBoxParameter box(nullptr);
    box.setRange(-5, 1000);
    box.setValue(77);
    Parameter slot = usedSlot();
    EXPECT_TRUE(box.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 0xAAAABBBB0000004Du);
    EXPECT_EQ(slot.stringValue, "before");

    box.setValue(-1);
    Parameter fresh;
    EXPECT_TRUE(box.getParameter(fresh));
    EXPECT_EQ(fresh.uintValue, 0xFFFFFFFFu);
}

TEST(OpenModeParameter, CombinesItsTwoBoxes)
{
    struct Row {
        bool exclusive;
        bool load;
        std::uint64_t mode;
    };
    for (const Row &row : {Row{false, false, 0}, Row{true, false, 1}, Row{false, true, 4}, Row{true, true, 5}}) {
        QWidget window;
        OpenModeParameter mode(&window);
        window.findChild<QCheckBox *>("openExclusiveLock")->setChecked(row.exclusive);
        window.findChild<QCheckBox *>("openLoadConfig")->setChecked(row.load);
        Parameter slot;
        EXPECT_TRUE(mode.getParameter(slot));
        EXPECT_EQ(slot.uintValue, row.mode);
    }
}

TEST(OpenModeParameter, ShowsExclusiveLockAboveLoadConfigBothUnchecked)
{
    QWidget window;
    OpenModeParameter mode(&window);
    ASSERT_EQ(mode.count(), 2);
    auto *first = qobject_cast<QCheckBox *>(mode.itemAt(0)->widget());
    auto *second = qobject_cast<QCheckBox *>(mode.itemAt(1)->widget());
    ASSERT_TRUE(first && second);
    EXPECT_EQ(first->text(), "Exclusive Lock");
    EXPECT_EQ(second->text(), "Load Config");
    EXPECT_FALSE(first->isChecked());
    EXPECT_FALSE(second->isChecked());
}

TEST(OpenModeParameter, KeepsTheUpperHalfOfTheSlot)
{
    QWidget window;
    OpenModeParameter mode(&window);
    Parameter slot = usedSlot();
    EXPECT_TRUE(mode.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 0xAAAABBBB00000000u);
    EXPECT_EQ(slot.stringValue, "before");
}

TEST(OpenModeParameter, WorksAndEndsWithoutAnyWidget)
{
    OpenModeParameter mode(nullptr);
    Parameter slot;
    EXPECT_TRUE(mode.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 0u);
}

TEST(LineEditParameter, AcceptsAnEmptyLine)
{
    LineEditParameter line(nullptr);
    Parameter slot = usedSlot();
    EXPECT_TRUE(line.getParameter(slot));
    EXPECT_EQ(slot.stringValue, "");
    EXPECT_EQ(slot.uintValue, Used);
    EXPECT_EQ(line.validator(), nullptr);
}

TEST(LineEditParameter, SendsUtf8)
{
    LineEditParameter line(nullptr);
    line.setText(QString::fromUtf8("K\xC3\xBChl \xE2\x82\xAC"));
    Parameter slot;
    EXPECT_TRUE(line.getParameter(slot));
    EXPECT_EQ(slot.stringValue, "K\xC3\xBChl \xE2\x82\xAC");
}

TEST(ExprLineEdit, RefusesAnEmptyLineAndLeavesTheSlotAlone)
{
    ExprLineEdit line(nullptr);
    Parameter slot = usedSlot();
    EXPECT_FALSE(line.getParameter(slot));
    EXPECT_EQ(slot.stringValue, "before");
    EXPECT_EQ(slot.uintValue, Used);
}

TEST(ExprLineEdit, SendsUtf8)
{
    ExprLineEdit line(nullptr);
    line.setText(QString::fromUtf8("TCPIP?*\xC3\xA4"));
    Parameter slot = usedSlot();
    EXPECT_TRUE(line.getParameter(slot));
    EXPECT_EQ(slot.stringValue, "TCPIP?*\xC3\xA4");
    EXPECT_EQ(slot.uintValue, Used);
}

struct NumberRow {
    const char *text;
    bool accepted;
    std::uint64_t value;
};

class AttributeNumber : public testing::TestWithParam<NumberRow>
{
};

TEST_P(AttributeNumber, IsReadAsDecimalOrHexadecimal)
{
    LineEditAttribute line(nullptr);
    line.setText(QString::fromLatin1(GetParam().text));
    Parameter slot = usedSlot();
    EXPECT_EQ(line.getParameter(slot), GetParam().accepted);
    EXPECT_EQ(slot.uintValue, GetParam().value);
    EXPECT_EQ(slot.stringValue, "before");
}

INSTANTIATE_TEST_SUITE_P(Texts, AttributeNumber,
                         testing::Values(NumberRow{"0x1F", true, 31}, NumberRow{"0x1f", true, 31},
                                         NumberRow{"31", true, 31}, NumberRow{"0", true, 0}, NumberRow{"010", true, 10},
                                         NumberRow{"", false, 0}, NumberRow{"0x", false, 0}, NumberRow{"x1F", false, 0},
                                         NumberRow{"ff", false, 0}, NumberRow{"0X1F", false, 0},
                                         NumberRow{"0xFFFFFFFFFFFFFFFFFFFF", false, 0},
                                         NumberRow{"0xFFFFFFFFFFFFFFFF", true, 0xFFFFFFFFFFFFFFFFu},
                                         NumberRow{"18446744073709551615", true, 0xFFFFFFFFFFFFFFFFu},
                                         NumberRow{"18446744073709551616", false, 0}));

TEST(AttributeNumberLine, DropsTheFirstTwoCharactersWhereverTheMarkStands)
{
    LineEditAttribute line(nullptr);
    line.setValidator(nullptr);
    Parameter slot;
    line.setText("a110x5"); // "10x5" is left, not "5"
    EXPECT_FALSE(line.getParameter(slot));
    line.setText("zz0x1F"); // found at the third character; the first two go, the mark is left to the conversion
    EXPECT_TRUE(line.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 31u);
}

TEST(AttributeNumberLine, ValidatorLetsThroughDigitsAndMarksOnly)
{
    LineEditAttribute line(nullptr);
    ASSERT_NE(line.validator(), nullptr);
    struct Row {
        const char *text;
        bool accepted;
    };
    for (const Row &row : {Row{"", true}, Row{"0x1F", true}, Row{"x1F", true}, Row{"ff", true}, Row{"0x", true},
                           Row{"12", true}, Row{"0x0123456789abcdefABCD", true}, Row{"0x0123456789abcdefABCD0", false},
                           Row{"0X1", false}, Row{"-1", false}, Row{"1 ", false}, Row{"g", false}, Row{"xx", false}}) {
        QString text = QString::fromLatin1(row.text);
        int position = 0;
        EXPECT_EQ(line.validator()->validate(text, position) == QValidator::Acceptable, row.accepted) << row.text;
    }
}

TEST(AttributeNumberLine, KeepsForeignCharactersOutWhileTyping)
{
    LineEditAttribute line(nullptr);
    QTest::keyClicks(&line, "0xg1 -F");
    EXPECT_EQ(line.text(), "0x1F");
}

TEST(EventComboBox, OffersFifteenEventTypesInOrder)
{
    EventComboBox box(nullptr);
    EXPECT_EQ(box.count(), 0);
    box.showAllEvents();
    expectItems(box, {{"VI_EVENT_IO_COMPLETION", 0x3FFF2009},
                      {"VI_EVENT_TRIG", 0xBFFF200A},
                      {"VI_EVENT_SERVICE_REQ", 0x3FFF200B},
                      {"VI_EVENT_CLEAR", 0x3FFF200D},
                      {"VI_EVENT_EXCEPTION", 0xBFFF200E},
                      {"VI_EVENT_GPIB_CIC", 0x3FFF2012},
                      {"VI_EVENT_GPIB_TALK", 0x3FFF2013},
                      {"VI_EVENT_GPIB_LISTEN", 0x3FFF2014},
                      {"VI_EVENT_VXI_VME_SYSFAIL", 0x3FFF201D},
                      {"VI_EVENT_VXI_VME_SYSRESET", 0x3FFF201E},
                      {"VI_EVENT_VXI_SIGP", 0x3FFF2020},
                      {"VI_EVENT_VXI_VME_INTR", 0xBFFF2021},
                      {"VI_EVENT_PXI_INTR", 0x3FFF2022},
                      {"VI_EVENT_TCPIP_CONNECT", 0x3FFF2036},
                      {"VI_EVENT_USB_INTR", 0x3FFF2037}});
    EXPECT_EQ(box.currentIndex(), 0);
}

TEST(EventComboBox, DoesNotOfferAllEnabledEvents)
{
    EventComboBox box(nullptr);
    box.showAllEvents();
    EXPECT_EQ(box.findData(0x3FFF7FFF), -1);
    EXPECT_EQ(box.findText("VI_ALL_ENABLED_EVENTS"), -1);
}

TEST(EventComboBox, Writes64Bits)
{
    EventComboBox box(nullptr);
    Parameter slot = usedSlot();
    EXPECT_TRUE(box.getParameter(slot)); // empty box
    EXPECT_EQ(slot.uintValue, 0u);

    box.showAllEvents();
    box.setCurrentIndex(1);
    slot = usedSlot();
    EXPECT_TRUE(box.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 0xBFFF200Au);
    EXPECT_EQ(slot.stringValue, "before");
}

TEST(GpibAtnComboBox, OffersFourModesAndWrites16Bits)
{
    GpibAtnComboBox box(nullptr);
    EXPECT_EQ(box.count(), 0);
    box.showAllMode();
    expectItems(box, {{"VI_GPIB_ATN_DEASSERT", 0},
                      {"VI_GPIB_ATN_ASSERT", 1},
                      {"VI_GPIB_ATN_DEASSERT_HANDSHAKE", 2},
                      {"VI_GPIB_ATN_ASSERT_IMMEDIATE", 3}});
    EXPECT_EQ(box.currentIndex(), 0);
    box.setCurrentIndex(3);
    Parameter slot = usedSlot();
    EXPECT_TRUE(box.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 0xAAAABBBBCCCC0003u);
}

TEST(GpibRenComboBox, OffersSevenModesAndWrites16Bits)
{
    GpibRenComboBox box(nullptr);
    EXPECT_EQ(box.count(), 0);
    box.showAllMode();
    expectItems(box, {{"VI_GPIB_REN_DEASSERT", 0},
                      {"VI_GPIB_REN_ASSERT", 1},
                      {"VI_GPIB_REN_DEASSERT_GTL", 2},
                      {"VI_GPIB_REN_ASSERT_ADDRESS", 3},
                      {"VI_GPIB_REN_ASSERT_LLO", 4},
                      {"VI_GPIB_REN_ASSERT_ADDRESS_LLO", 5},
                      {"VI_GPIB_REN_ADDRESS_GTL", 6}});
    EXPECT_EQ(box.currentIndex(), 0);
    box.setCurrentIndex(6);
    Parameter slot = usedSlot();
    EXPECT_TRUE(box.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 0xAAAABBBBCCCC0006u);
}

TEST(MechanismFrame, StartsWithQueue)
{
    MechanismFrame frame(nullptr);
    Parameter slot;
    EXPECT_TRUE(frame.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 1u);
    EXPECT_EQ(frame.frameStyle(), 22);
    EXPECT_EQ(frame.findChild<QLabel *>("mechanismLabel")->text(), "Mechanism");
    EXPECT_EQ(frame.findChild<QRadioButton *>("mechanismQueue")->text(), "Queue");
    EXPECT_EQ(frame.findChild<QRadioButton *>("mechanismHandler")->text(), "Handler");
}

TEST(MechanismFrame, ShowsItsLabelAboveQueueAboveHandler)
{
    MechanismFrame frame(nullptr);
    auto *column = qobject_cast<QVBoxLayout *>(frame.layout());
    ASSERT_TRUE(column);
    ASSERT_EQ(column->count(), 3);
    EXPECT_EQ(column->itemAt(0)->widget()->objectName(), "mechanismLabel");
    EXPECT_EQ(column->itemAt(1)->widget()->objectName(), "mechanismQueue");
    EXPECT_EQ(column->itemAt(2)->widget()->objectName(), "mechanismHandler");
}

TEST(MechanismFrame, WritesTheHandlerMechanismInto16Bits)
{
    MechanismFrame frame(nullptr);
    frame.findChild<QRadioButton *>("mechanismHandler")->setChecked(true);
    Parameter slot = usedSlot();
    EXPECT_TRUE(frame.getParameter(slot));
    EXPECT_EQ(slot.uintValue, 0xAAAABBBBCCCC0002u);
    EXPECT_EQ(slot.stringValue, "before");
}

class ChoiceBox : public testing::Test
{
protected:
    ChoiceBox()
    {
        m_box.addItem(QString::fromUtf8("\xC3\xA9in"), QVariant(QString::fromUtf8("d\xC3\xA4ta")));
        m_box.addItem("two", QVariant(Q_UINT64_C(0x123456789ABCDEF0)));
    }

    ComboBoxParamerter m_box{nullptr};
    Parameter m_slot = usedSlot();
};

TEST_F(ChoiceBox, WritesTheIndexInto32Bits)
{
    m_box.setParameterType(ComboBoxParamerter::ComboBoxType::Index);
    m_box.setCurrentIndex(1);
    EXPECT_TRUE(m_box.getParameter(m_slot));
    EXPECT_EQ(m_slot.uintValue, 0xAAAABBBB00000001u);
    EXPECT_EQ(m_slot.stringValue, "before");
}

TEST_F(ChoiceBox, WritesMinusOneFor32BitsWhenNothingIsSelected)
{
    m_box.clear();
    m_box.setParameterType(ComboBoxParamerter::ComboBoxType::Index);
    EXPECT_TRUE(m_box.getParameter(m_slot));
    EXPECT_EQ(m_slot.uintValue, 0xAAAABBBBFFFFFFFFu);
}

TEST_F(ChoiceBox, WritesTheText)
{
    m_box.setParameterType(ComboBoxParamerter::ComboBoxType::Text);
    EXPECT_TRUE(m_box.getParameter(m_slot));
    EXPECT_EQ(m_slot.stringValue, "\xC3\xA9in");
    EXPECT_EQ(m_slot.uintValue, Used);
}

TEST_F(ChoiceBox, WritesTheUserDataAsText)
{
    m_box.setParameterType(ComboBoxParamerter::ComboBoxType::DataString);
    EXPECT_TRUE(m_box.getParameter(m_slot));
    EXPECT_EQ(m_slot.stringValue, "d\xC3\xA4ta");
    EXPECT_EQ(m_slot.uintValue, Used);
}

TEST_F(ChoiceBox, WritesTheUserDataAs64BitNumber)
{
    m_box.setParameterType(ComboBoxParamerter::ComboBoxType::DataUInt64);
    m_box.setCurrentIndex(1);
    EXPECT_TRUE(m_box.getParameter(m_slot));
    EXPECT_EQ(m_slot.uintValue, 0x123456789ABCDEF0u);
    EXPECT_EQ(m_slot.stringValue, "before");
}

TEST_F(ChoiceBox, RefusesAnUnknownKind)
{
    m_box.setParameterType(static_cast<ComboBoxParamerter::ComboBoxType>(4));
    EXPECT_FALSE(m_box.getParameter(m_slot));
    EXPECT_EQ(m_slot.uintValue, Used);
    EXPECT_EQ(m_slot.stringValue, "before");
}
} // namespace
