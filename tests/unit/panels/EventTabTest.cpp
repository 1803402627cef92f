#include "PanelTest.h"

#include "panels/EventTab.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QComboBox>
#include <QLabel>
#include <QRadioButton>

namespace
{
class EventTabTest : public PanelTest
{
protected:
    _visaFunctionCall sentBy(const char *name)
    {
        press(find<VisaFunctionCallButton>(m_tab, name));
        const auto sent = requests();
        EXPECT_EQ(sent.size(), 1u) << name;
        if (sent.empty())
            return {};
        finish(result(sent[0].type, VI_ERROR_NSUP_OPER)); // frees the buttons
        return sent[0];
    }

    EventTab m_tab{m_handler.get(), nullptr};
    QComboBox *m_type = find<QComboBox>(m_tab, "eventType");
};

TEST_F(EventTabTest, ShowsItsTexts)
{
    EXPECT_EQ(find<QLabel>(m_tab, "eventTypeLabel")->text(), "Eventtype:");
    EXPECT_EQ(m_type->currentText(), "VI_EVENT_IO_COMPLETION");
    EXPECT_EQ(m_type->count(), 15);
    EXPECT_EQ(find<QLabel>(m_tab, "mechanismLabel")->text(), "Mechanism");
    EXPECT_TRUE(find<QRadioButton>(m_tab, "mechanismQueue")->isChecked());
    struct Row {
        const char *name;
        const char *text;
    };
    for (const Row &row : {Row{"eventEnable", "Enable Event"}, Row{"eventDisable", "Disable Event"},
                           Row{"eventDiscard", "Discard Event"}, Row{"eventWait", "Wait On Event"},
                           Row{"eventInstall", "Install Handler"}, Row{"eventUninstall", "Uninstall Handler"}})
        EXPECT_EQ(find<VisaFunctionCallButton>(m_tab, row.name)->text(), row.text);
}

TEST_F(EventTabTest, StartsWithTheQueueForIoCompletion)
{
    const auto sent = sentBy("eventEnable");
    EXPECT_EQ(sent.type, Kind::EnableEvent);
    EXPECT_EQ(sent.parameter[0].uintValue, 0x3FFF2009u);
    EXPECT_EQ(sent.parameter[1].uintValue, 1u);
}

TEST_F(EventTabTest, ButtonsSendTypeAndWhereItCountsMechanism)
{
    m_type->setCurrentIndex(2);
    press(find<QRadioButton>(m_tab, "mechanismHandler"));
    struct Row {
        const char *name;
        Kind kind;
        std::uint64_t mechanism;
    };
    for (const Row &row :
         {Row{"eventEnable", Kind::EnableEvent, 2}, Row{"eventDisable", Kind::DisableEvent, 2},
          Row{"eventDiscard", Kind::DiscardEvents, 2}, Row{"eventWait", Kind::WaitOnEvent, 0},
          Row{"eventInstall", Kind::InstallHandler, 0}, Row{"eventUninstall", Kind::UninstallHandler, 0}}) {
        const auto sent = sentBy(row.name);
        EXPECT_EQ(sent.type, row.kind) << row.name;
        EXPECT_EQ(sent.parameter[0].uintValue, 0x3FFF200Bu) << row.name;
        EXPECT_EQ(sent.parameter[1].uintValue, row.mechanism) << row.name;
    }
}

TEST_F(EventTabTest, AClosedSessionChangesNothing)
{
    m_type->setCurrentIndex(4);
    press(find<QRadioButton>(m_tab, "mechanismHandler"));
    finish(result(Kind::Close));
    EXPECT_EQ(m_type->currentIndex(), 4);
    EXPECT_TRUE(find<QRadioButton>(m_tab, "mechanismHandler")->isChecked());
}

TEST_F(EventTabTest, TabFollowsTheEyeAndPassesTheRequestButtonsBy)
{
    EXPECT_EQ(tabOrder(m_tab, m_type), (QStringList{"eventType", "mechanismQueue", "mechanismHandler"}));
}
} // namespace
