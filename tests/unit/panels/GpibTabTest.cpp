#include "PanelTest.h"

#include "panels/GpibCommandEdit.h"
#include "panels/GpibTab.h"
#include "panels/SpinBoxParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QComboBox>
#include <QElapsedTimer>
#include <QLabel>

#include <string>

namespace
{
using namespace std::string_literals;

class GpibTabTest : public PanelTest
{
protected:
    VisaFunctionCallButton *button(const char *name) const { return find<VisaFunctionCallButton>(m_tab, name); }

    /// What a press of that button sends.
    _visaFunctionCall sentBy(const char *name)
    {
        press(button(name));
        const auto sent = requests();
        EXPECT_EQ(sent.size(), 1u) << name;
        if (sent.empty())
            return {};
        finish(result(sent[0].type, VI_ERROR_NSUP_OPER)); // frees the buttons
        return sent[0];
    }

    GpibTab m_tab{m_handler.get(), nullptr};
    QComboBox *m_ren = find<QComboBox>(m_tab, "gpibRen");
    QComboBox *m_atn = find<QComboBox>(m_tab, "gpibAtn");
    GpibCommandEdit *m_command = find<GpibCommandEdit>(m_tab, "gpibCommand");
    SpinBoxParameter *m_primary = find<SpinBoxParameter>(m_tab, "gpibPrimary");
    SpinBoxParameter *m_secondary = find<SpinBoxParameter>(m_tab, "gpibSecondary");
};

TEST_F(GpibTabTest, ShowsItsTextsAndRanges)
{
    struct Row {
        const char *name;
        const char *text;
    };
    for (const Row &row :
         {Row{"gpibRenLabel", "Control REN"}, Row{"gpibAtnLabel", "Control ATN"}, Row{"gpibIfcLabel", "Send IFC"},
          Row{"gpibCommandLabel", "Command"}, Row{"gpibPassControlLabel", "Pass Control:"},
          Row{"gpibPrimaryLabel", "Primary:"}, Row{"gpibSecondaryLabel", "Second:"}})
        EXPECT_EQ(find<QLabel>(m_tab, row.name)->text(), row.text);
    for (const char *name : {"gpibSendRen", "gpibSendAtn", "gpibSendIfc", "gpibSendCommand", "gpibPassControl"})
        EXPECT_EQ(button(name)->text(), "Send") << name;
    for (const SpinBoxParameter *address : {m_primary, m_secondary}) {
        EXPECT_EQ(address->minimum(), 0);
        EXPECT_EQ(address->maximum(), 65545);
        EXPECT_EQ(address->value(), 0);
        EXPECT_EQ(address->minimumWidth(), 100);
    }
    EXPECT_EQ(m_ren->count(), 7);
    EXPECT_EQ(m_ren->currentText(), "VI_GPIB_REN_DEASSERT");
    EXPECT_EQ(m_atn->count(), 4);
    EXPECT_EQ(m_atn->currentText(), "VI_GPIB_ATN_DEASSERT");
    EXPECT_EQ(m_command->toPlainText(), "");
}

TEST_F(GpibTabTest, EachButtonHasANameOfItsOwnForThoseWhoCannotSeeItsRow)
{
    EXPECT_EQ(button("gpibSendRen")->accessibleName(), "Send control REN");
    EXPECT_EQ(button("gpibSendAtn")->accessibleName(), "Send control ATN");
    EXPECT_EQ(button("gpibSendIfc")->accessibleName(), "Send IFC");
    EXPECT_EQ(button("gpibSendCommand")->accessibleName(), "Send command");
    EXPECT_EQ(button("gpibPassControl")->accessibleName(), "Send pass control");
}

TEST_F(GpibTabTest, RenSendsEachOfTheSevenModes)
{
    for (int mode = 0; mode < 7; ++mode) {
        m_ren->setCurrentIndex(mode);
        const auto sent = sentBy("gpibSendRen");
        EXPECT_EQ(sent.type, Kind::GpibControlREN);
        EXPECT_EQ(sent.parameter[0].uintValue, static_cast<std::uint64_t>(mode));
    }
}

TEST_F(GpibTabTest, AtnSendsEachOfTheFourModes)
{
    for (int mode = 0; mode < 4; ++mode) {
        m_atn->setCurrentIndex(mode);
        const auto sent = sentBy("gpibSendAtn");
        EXPECT_EQ(sent.type, Kind::GpibControlATN);
        EXPECT_EQ(sent.parameter[0].uintValue, static_cast<std::uint64_t>(mode));
    }
}

TEST_F(GpibTabTest, IfcSendsNothingBesides)
{
    const auto sent = sentBy("gpibSendIfc");
    EXPECT_EQ(sent.type, Kind::GpibSendIFC);
    EXPECT_EQ(sent.parameter[0].uintValue, 0u);
    EXPECT_EQ(sent.parameter[0].stringValue, "");
}

TEST_F(GpibTabTest, CommandSendsItsBytes)
{
    QTest::keyClicks(m_command, "\\x3F?A");
    const auto sent = sentBy("gpibSendCommand");
    EXPECT_EQ(sent.type, Kind::GpibCommand);
    EXPECT_EQ(sent.parameter[0].stringValue, "??A");
    EXPECT_EQ(m_command->toPlainText(), "\\x3F?A") << "stays as it was typed";
}

TEST_F(GpibTabTest, AnEmptyCommandIsSent)
{
    EXPECT_EQ(sentBy("gpibSendCommand").parameter[0].stringValue, "");
}

TEST_F(GpibTabTest, PassControlSendsBothAddressesAsTheyAre)
{
    m_primary->setValue(30);
    m_secondary->setValue(65535);
    auto sent = sentBy("gpibPassControl");
    EXPECT_EQ(sent.type, Kind::GpibPassControl);
    EXPECT_EQ(sent.parameter[0].uintValue, 30u);
    EXPECT_EQ(sent.parameter[1].uintValue, 65535u);
    m_primary->setValue(65545);
    sent = sentBy("gpibPassControl");
    EXPECT_EQ(sent.parameter[0].uintValue, 65545u) << "the page does not check addresses";
}

TEST_F(GpibTabTest, FinishedCallsChangeNothing)
{
    m_ren->setCurrentIndex(3);
    QTest::keyClicks(m_command, "x");
    finish(result(Kind::GpibControlREN));
    finish(result(Kind::GpibControlREN, VI_ERROR_NSUP_OPER));
    EXPECT_EQ(m_ren->currentIndex(), 3);
    EXPECT_EQ(m_command->toPlainText(), "x");
}

TEST_F(GpibTabTest, TabFollowsTheEyeAndPassesTheRequestButtonsBy)
{
    EXPECT_EQ(tabOrder(m_tab, m_ren),
              (QStringList{"gpibRen", "gpibAtn", "gpibCommand", "gpibPrimary", "gpibSecondary"}));
}

TEST_F(GpibTabTest, TabLeavesTheCommandAndReturnBeginsALine)
{
    m_tab.show();
    QApplication::setActiveWindow(&m_tab);
    m_command->setFocus();
    QTest::keyClicks(m_command, "a");
    QTest::keyClick(m_command, Qt::Key_Return);
    QTest::keyClicks(m_command, "b");
    QTest::keyClick(m_command, Qt::Key_Tab);
    EXPECT_EQ(QApplication::focusWidget(), m_primary);
    EXPECT_EQ(sentBy("gpibSendCommand").parameter[0].stringValue, "a\nb");
}

struct Expansion {
    const char *name;
    const char *typed;
    std::string sent;
};

void PrintTo(const Expansion &expansion, std::ostream *out)
{
    *out << expansion.typed;
}

class GpibCommandEscapes : public testing::TestWithParam<Expansion>
{
};

TEST_P(GpibCommandEscapes, GiveTheBytes)
{
    GpibCommandEdit edit(nullptr);
    edit.setPlainText(GetParam().typed);
    Parameter parameter;
    parameter.uintValue = 9;
    EXPECT_TRUE(edit.getParameter(parameter));
    EXPECT_EQ(parameter.stringValue, GetParam().sent);
    EXPECT_EQ(parameter.uintValue, 9u);
}

INSTANTIATE_TEST_SUITE_P(
    All, GpibCommandEscapes,
    testing::Values(
        Expansion{"TwoDigits", R"(\x3F)", "?"}, //
        Expansion{"LowerCaseDigitsStay", R"(\x3f)", "\\x3f"}, Expansion{"OneLowerCaseDigitStays", R"(\x0a)", "\\x0a"},
        Expansion{"ThreeDigitsModulo256", R"(\x13F)", "?"}, Expansion{"ThreeDigitsBeforeTwo", R"(\x41B)", "\x1B"},
        Expansion{"TwoDigitsBeforeALowerCaseOne", R"(\x41b)", "Ab"}, Expansion{"UpperCaseXStays", R"(\X3F)", "\\X3F"},
        Expansion{"OneDigitStays", R"(\x3)", "\\x3"}, Expansion{"LineFeed", R"(a\nb)", "a\nb"},
        Expansion{"NoCarriageReturn", R"(\r)", "\\r"}, Expansion{"NoTab", R"(\t)", "\\t"},
        Expansion{"BackslashZeroVanishes", R"(a\0b)", "ab"}, Expansion{"AZeroByte", R"(a\x00z)", "a\0z"s},
        Expansion{"DoubledBackslash", R"(a\\b)", "a\\b"},
        Expansion{"ADoubledBackslashProtectsNothing", R"(\\n)", "\\\n"},
        Expansion{"AnExpandedBackslashJoinsInALaterPass", R"(\x5Cn)", "\n"},
        Expansion{"AnExpandedBackslashJoinsInTheSamePass", R"(\x5Cx41)", "A"},
        Expansion{"AbyteAbove7FIsTwo", R"(\xFF)", "\xC3\xBF"}, Expansion{"ThreeDigitsAbove7F", R"(\x180)", "\xC2\x80"},
        Expansion{"TypedTextAsUtf8", "\xC3\xA4", "\xC3\xA4"}, Expansion{"LineBreaks", "a\nb\n", "a\nb\n"}, //
        Expansion{"Nothing", "", ""}),
    [](const auto &each) { return each.param.name; });

TEST(GpibCommand, AMegabyteOfEscapesIsExpandedInNoTime)
{
    GpibCommandEdit edit(nullptr);
    edit.setPlainText(QString(R"(\x3F)").repeated(250000));
    QElapsedTimer timer;
    timer.start();
    EXPECT_EQ(edit.getCommand(), QString(250000, '?'));
    EXPECT_LT(timer.elapsed(), 5000);
}
} // namespace
