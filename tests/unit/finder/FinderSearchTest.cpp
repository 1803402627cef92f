#include "FinderTest.h"

#include <gmock/gmock.h>

using testing::ElementsAre;
using testing::IsEmpty;

namespace
{
class FinderSearch : public Finder
{
protected:
    void SetUp() override { open(); }
};
constexpr auto NotFound = static_cast<ViStatus>(0xBFFF0011);
} // namespace

TEST_F(FinderSearch, SendsTheExpressionAndWaits)
{
    auto *expression = child<QLineEdit>("finderExpression");
    QTest::keyClick(expression, Qt::Key_A, Qt::ControlModifier);
    QTest::keyClicks(expression, "TCPIP?*INSTR");
    press(child<QPushButton>("finderFind"));
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1U);
    EXPECT_EQ(sent[0].type, Kind::FindRsrc);
    EXPECT_EQ(sent[0].parameter[0].stringValue, "TCPIP?*INSTR");
    EXPECT_FALSE(findEnabled());
    EXPECT_TRUE(waiting());
}

TEST_F(FinderSearch, SendsNothingForAnEmptyExpression)
{
    child<QLineEdit>("finderExpression")->clear();
    press(child<QPushButton>("finderFind"));
    EXPECT_THAT(requests(), IsEmpty());
    EXPECT_TRUE(findEnabled());
    EXPECT_FALSE(waiting());
}

TEST_F(FinderSearch, BeginsWithReturnInTheExpression)
{
    QTest::keyClick(child<QLineEdit>("finderExpression"), Qt::Key_Return);
    EXPECT_EQ(requests().size(), 1U);
    EXPECT_FALSE(findEnabled());
    QTest::keyClick(child<QLineEdit>("finderExpression"), Qt::Key_Return);
    EXPECT_THAT(requests(), IsEmpty());
    EXPECT_TRUE(m_dialog->isVisible());
}

TEST_F(FinderSearch, AsksForOneResourceAfterTheOther)
{
    press(child<QPushButton>("finderFind"));
    requests();
    finish(found(Kind::FindRsrc, "TCPIP::a::INSTR", 2));
    for (const std::uint64_t toCome : {1, 0}) {
        const auto sent = requests();
        ASSERT_EQ(sent.size(), 1U);
        EXPECT_EQ(sent[0].type, Kind::FindNext);
        EXPECT_TRUE(waiting());
        EXPECT_FALSE(findEnabled());
        EXPECT_EQ(tree()->topLevelItemCount(), 0);
        finish(found(Kind::FindNext, toCome == 1 ? "TCPIP::b::INSTR" : "TCPIP::c::INSTR", toCome));
    }
    EXPECT_THAT(requests(), IsEmpty());
    EXPECT_TRUE(findEnabled());
    EXPECT_FALSE(waiting());
    EXPECT_EQ(tree()->topLevelItemCount(), 3);
    EXPECT_THAT(lastSearch(), ElementsAre("TCPIP::a::INSTR", "TCPIP::b::INSTR", "TCPIP::c::INSTR"));
}

TEST_F(FinderSearch, GroupsByDeviceInTheOrderOfTheKeys)
{
    search({"USB0::1::2::3::INSTR", "TCPIP::b::inst0::INSTR", "ASRL2::INSTR", "TCPIP::a::hislip0::INSTR",
            "TCPIP::b::5025::SOCKET", "GPIB0::5::INSTR", "ASRL1::INSTR"});
    const std::vector<std::pair<const char *, std::vector<const char *>>> expected = {
        {"ASRL", {"ASRL2::INSTR", "ASRL1::INSTR"}},  {"GPIB", {"GPIB0::5::INSTR"}},
        {"TCPIP::a", {"TCPIP::a::hislip0::INSTR"}},  {"TCPIP::b", {"TCPIP::b::inst0::INSTR", "TCPIP::b::5025::SOCKET"}},
        {"USB0::1::2::3", {"USB0::1::2::3::INSTR"}},
    };
    ASSERT_EQ(tree()->topLevelItemCount(), 5);
    for (int i = 0; i < 5; ++i) {
        const QTreeWidgetItem *device = tree()->topLevelItem(i);
        EXPECT_EQ(device->text(0), expected[i].first);
        EXPECT_TRUE(device->isExpanded());
        ASSERT_EQ(device->childCount(), static_cast<int>(expected[i].second.size()));
        for (int j = 0; j < device->childCount(); ++j)
            EXPECT_EQ(device->child(j)->text(0), expected[i].second[j]);
    }
}

TEST_F(FinderSearch, ShowsDescriptionAndIdentificationBesideTheResource)
{
    press(child<QPushButton>("finderFind"));
    finish(found(Kind::FindRsrc, "TCPIP::a::INSTR", 1, "Maker,Model,1,2", "A meter", "a.local"));
    finish(found(Kind::FindNext, "TCPIP::b::INSTR", 0));
    const QTreeWidgetItem *first = tree()->topLevelItem(0)->child(0);
    EXPECT_EQ(first->text(0), "TCPIP::a::INSTR");
    EXPECT_EQ(first->text(1), "A meter");
    EXPECT_EQ(first->text(2), "Maker,Model,1,2");
    const QTreeWidgetItem *second = tree()->topLevelItem(1)->child(0);
    EXPECT_EQ(second->text(1), "");
    EXPECT_EQ(second->text(2), "");
    EXPECT_EQ(ResourceDialog::getLastSearch()[0].hostName, "a.local");
    requests();
}

TEST_F(FinderSearch, WidensTheColumnsForWhatWasFoundWithinTheDialog)
{
    search({"ASRL1::INSTR"});
    EXPECT_EQ(tree()->columnWidth(0), 200) << "never narrower";
    search({"TCPIP::" + std::string(500, 'x') + "::INSTR"});
    EXPECT_EQ(tree()->columnWidth(0), tree()->viewport()->width() / 2);
    EXPECT_GT(tree()->columnWidth(0), 200);
}

TEST_F(FinderSearch, EndsWithAnEmptyTreeWhenNothingIsFound)
{
    search({"ASRL1::INSTR"});
    press(child<QPushButton>("finderFind"));
    requests();
    finish(result(Kind::FindRsrc, NotFound));
    EXPECT_TRUE(findEnabled());
    EXPECT_FALSE(waiting());
    EXPECT_EQ(tree()->topLevelItemCount(), 0);
    EXPECT_THAT(requests(), IsEmpty());
}

TEST_F(FinderSearch, ShowsNothingWhenItFailsHalfway)
{
    for (const ViStatus status : {NotFound, ViStatus(0x3FFF0005)}) {
        press(child<QPushButton>("finderFind"));
        requests();
        finish(found(Kind::FindRsrc, "TCPIP::a::INSTR", 2));
        requests();
        finish(result(Kind::FindNext, status));
        EXPECT_TRUE(findEnabled());
        EXPECT_FALSE(waiting());
        EXPECT_EQ(tree()->topLevelItemCount(), 0);
        EXPECT_THAT(requests(), IsEmpty());
    }
}

TEST_F(FinderSearch, ClearsThePreviousOneBeforeTheFirstAnswer)
{
    search({"ASRL1::INSTR", "ASRL2::INSTR"});
    EXPECT_EQ(lastSearch().size(), 2U);
    press(child<QPushButton>("finderFind"));
    EXPECT_THAT(lastSearch(), IsEmpty());
    EXPECT_EQ(tree()->topLevelItemCount(), 0);
    requests();
    finish(found(Kind::FindRsrc, "ASRL3::INSTR", 0));
    EXPECT_THAT(lastSearch(), ElementsAre("ASRL3::INSTR"));
    ASSERT_EQ(tree()->topLevelItemCount(), 1);
    EXPECT_EQ(tree()->topLevelItem(0)->childCount(), 1);
}

TEST_F(FinderSearch, KeepsItsResultsForWhoeverAsksAfterwards)
{
    search({"ASRL1::INSTR"});
    m_dialog.reset();
    EXPECT_THAT(lastSearch(), ElementsAre("ASRL1::INSTR"));
}

TEST_F(FinderSearch, DoesNotWaitForASearchThatWasRefused)
{
    search({"ASRL1::INSTR"});
    _visaFunctionCall read;
    read.type = Kind::Read;
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(read, true));
    requests();
    press(child<QPushButton>("finderFind"));
    EXPECT_THAT(requests(), IsEmpty());
    EXPECT_TRUE(findEnabled());
    EXPECT_FALSE(waiting());
    EXPECT_EQ(tree()->topLevelItemCount(), 1);
    EXPECT_THAT(lastSearch(), ElementsAre("ASRL1::INSTR"));

    finish(result(Kind::Read));
    search({"ASRL2::INSTR"});
    EXPECT_THAT(lastSearch(), ElementsAre("ASRL2::INSTR"));
}

TEST_F(FinderSearch, ClosedInTheMiddleGivesTheCursorBack)
{
    press(child<QPushButton>("finderFind"));
    press(child<QPushButton>("finderCancel"));
    EXPECT_FALSE(waiting());
    m_dialog.reset();
    requests();
    finish(found(Kind::FindRsrc, "ASRL1::INSTR", 1)); // reaches nobody
    EXPECT_THAT(requests(), IsEmpty());
}

TEST_F(FinderSearch, DestroyedInTheMiddleGivesTheCursorBackAndDropsWaitingAnswers)
{
    press(child<QPushButton>("finderFind"));
    requests();
    _visaFunctionCall answer = found(Kind::FindRsrc, "ASRL1::INSTR", 1);
    m_handler->VisaFunctionCallFinshed(answer);
    m_dialog.reset();
    EXPECT_FALSE(waiting());
    QCoreApplication::sendPostedEvents();
    EXPECT_THAT(requests(), IsEmpty());
    EXPECT_THAT(lastSearch(), IsEmpty());
}

TEST_F(FinderSearch, DropsTheAnswersToASearchOfAnEarlierDialog)
{
    press(child<QPushButton>("finderFind"));
    requests();
    finish(found(Kind::FindRsrc, "OLD::1::INSTR", 5));
    requests();
    open(); // another dialog, while the old FindNext is on its way
    press(child<QPushButton>("finderFind"));
    requests();
    finish(found(Kind::FindNext, "OLD::2::INSTR", 4));
    EXPECT_THAT(requests(), IsEmpty()) << "the old search is not continued";
    EXPECT_TRUE(waiting());
    finish(found(Kind::FindRsrc, "NEW::1::INSTR", 0));
    EXPECT_THAT(lastSearch(), ElementsAre("NEW::1::INSTR"));
    EXPECT_FALSE(waiting());
}

TEST_F(FinderSearch, AsksOnceThoughTwoFirstAnswersArrive)
{
    press(child<QPushButton>("finderFind"));
    requests();
    finish(found(Kind::FindRsrc, "OLD::1::INSTR", 5));
    finish(found(Kind::FindRsrc, "NEW::1::INSTR", 1));
    EXPECT_EQ(requests().size(), 1U);
    finish(found(Kind::FindNext, "NEW::2::INSTR", 0));
    EXPECT_THAT(lastSearch(), ElementsAre("NEW::1::INSTR", "NEW::2::INSTR"));
}

TEST_F(FinderSearch, EndsWhenTheHandlerEnds)
{
    press(child<QPushButton>("finderFind"));
    EXPECT_TRUE(waiting());
    m_handler = std::make_unique<VisaFunctionCallHandler>(m_dispatcher);
    EXPECT_FALSE(waiting());
    EXPECT_TRUE(findEnabled());
    press(child<QPushButton>("finderFind"));
    EXPECT_FALSE(waiting());
}

TEST_F(FinderSearch, ShowsTenThousandAndAsksForNoMore)
{
    press(child<QPushButton>("finderFind"));
    requests();
    finish(found(Kind::FindRsrc, "ASRL0::INSTR", 4000000000));
    for (int i = 1; i < 10000; ++i) {
        ASSERT_EQ(requests().size(), 1U);
        finish(found(Kind::FindNext, "ASRL" + std::to_string(i) + "::INSTR", 4000000000));
    }
    EXPECT_THAT(requests(), IsEmpty());
    EXPECT_FALSE(waiting());
    EXPECT_EQ(lastSearch().size(), 10000U);
    ASSERT_EQ(tree()->topLevelItemCount(), 1);
    EXPECT_EQ(tree()->topLevelItem(0)->childCount(), 10000);
}

TEST(FinderWithoutHandler, OpensAndSearchesNothing)
{
    QSettings().clear();
    ResourceDialog dialog(nullptr, nullptr);
    dialog.show();
    QTest::mouseClick(dialog.findChild<QPushButton *>("finderFind"), Qt::LeftButton);
    EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr);
}
