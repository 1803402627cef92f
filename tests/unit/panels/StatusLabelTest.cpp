#include "PanelTest.h"

#include "panels/StatusLabel.h"

#include <visa.h>

namespace
{
class StatusLabelTest : public PanelTest
{
protected:
    /// The text colour, when all colour groups agree.
    QColor colour() const
    {
        const QPalette palette = m_label.palette();
        const QColor active = palette.color(QPalette::Active, QPalette::WindowText);
        EXPECT_EQ(palette.color(QPalette::Inactive, QPalette::WindowText), active);
        EXPECT_EQ(palette.color(QPalette::Disabled, QPalette::WindowText), active);
        return active;
    }

    StatusLabel m_label{m_handler.get(), nullptr};
    const QColor m_blue{0, 0, 255};
    const QColor m_orange = QColor::fromHsl(30, 255, 128);
    const QColor m_red{255, 0, 0};
};

TEST_F(StatusLabelTest, DefaultIsBlueDashes)
{
    m_label.setStatus(0xBFFF0015);
    m_label.setDefault();
    EXPECT_EQ(m_label.text(), "Status: ----");
    EXPECT_EQ(colour(), m_blue);
}

TEST_F(StatusLabelTest, ColoursByRange)
{
    m_label.setStatus(0);
    EXPECT_EQ(m_label.text(), "Status: VI_SUCCESS");
    EXPECT_EQ(colour(), m_blue);
    m_label.setStatus(1);
    EXPECT_EQ(colour().rgb(), m_orange.rgb());
    m_label.setStatus(0x3FFF0006);
    EXPECT_EQ(m_label.text(), "Status: VI_SUCCESS_MAX_CNT");
    EXPECT_EQ(colour().rgb(), m_orange.rgb());
    m_label.setStatus(0x7FFFFFFE);
    EXPECT_EQ(colour().rgb(), m_orange.rgb());
    m_label.setStatus(0x7FFFFFFF);
    EXPECT_EQ(colour(), m_red);
    m_label.setStatus(0x80000000);
    EXPECT_EQ(colour(), m_red);
    m_label.setStatus(0xBFFF0015);
    EXPECT_EQ(m_label.text(), "Status: VI_ERROR_TMO");
    EXPECT_EQ(colour(), m_red);
}

TEST_F(StatusLabelTest, ShowsEveryFinishedCall)
{
    finish(result(Kind::Clear, VI_ERROR_TMO));
    EXPECT_EQ(m_label.text(), "Status: VI_ERROR_TMO");
    finish(result(Kind::Read, VI_SUCCESS));
    EXPECT_EQ(m_label.text(), "Status: VI_SUCCESS");
    EXPECT_EQ(colour(), m_blue);
    EXPECT_TRUE(requests().empty());
}

TEST_F(StatusLabelTest, IsResetByEveryStartedCall)
{
    finish(result(Kind::Clear, VI_ERROR_TMO));
    m_handler->sendVisaFunctionCall(result(Kind::ReadSTB), true);
    EXPECT_EQ(m_label.text(), "Status: ----");
    EXPECT_EQ(colour(), m_blue);
}

TEST_F(StatusLabelTest, ClosesTheSessionWhenTheConnectionIsLost)
{
    finish(result(Kind::Query, static_cast<ViStatus>(0xBFFF00A6)));
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].type, Kind::Close);
    for (const Parameter &slot : sent[0].parameter) {
        EXPECT_EQ(slot.uintValue, 0u);
        EXPECT_EQ(slot.stringValue, "");
    }
}

TEST_F(StatusLabelTest, ClosesTheSessionAlsoWhileALockingRequestIsOutstanding)
{
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(result(Kind::Read), true));
    m_label.visaFunctionCallFinished(*std::make_unique<_visaFunctionCall>(result(Kind::Write, VI_ERROR_CONN_LOST)));
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 2u);
    EXPECT_EQ(sent[1].type, Kind::Close);
}
} // namespace
