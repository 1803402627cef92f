#include "RunningWorker.h"

#include <visa.h>

#include <gmock/gmock.h>

using testing::ElementsAre;
using testing::IsEmpty;

namespace
{
using WorkerFind = RunningWorker;

standin::Resource lxiResource(const std::string &name, const std::string &serial)
{
    return {.name = name,
            .texts = {{VI_KY_ATTR_LXI_MANF, "Oltrava"},
                      {VI_KY_ATTR_LXI_MODEL, "M1"},
                      {VI_KY_ATTR_LXI_SERIAL, serial},
                      {VI_KY_ATTR_LXI_VERSION, "2.0"},
                      {VI_KY_ATTR_LXI_DESCRIPTION, "Bench " + serial},
                      {VI_KY_ATTR_LXI_HOSTNAME, "host" + serial + ".local."}}};
}

TEST_F(WorkerFind, HandsOutOneResourceAfterTheOtherAndClosesTheListWithTheLast)
{
    standin::addResource({.name = "TCPIP::1::INSTR"});
    standin::addResource({.name = "TCPIP::2::INSTR"});
    standin::addResource({.name = "TCPIP::3::INSTR"});
    const auto first = run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    EXPECT_EQ(first.status, 0);
    EXPECT_EQ(first.parameter[0].stringValue, "TCPIP::1::INSTR");
    EXPECT_EQ(first.parameter[1].uintValue, 2u);
    EXPECT_NE(first.parameter[2].uintValue, 0u);
    EXPECT_THAT(standin::calls("viFindRsrc")[0].texts, ElementsAre("?*"));

    const auto second = run(VisaFunctionCallTyp::FindNext);
    EXPECT_EQ(second.parameter[0].stringValue, "TCPIP::2::INSTR");
    EXPECT_EQ(second.parameter[1].uintValue, 1u);
    EXPECT_EQ(second.parameter[2].uintValue, first.parameter[2].uintValue);
    EXPECT_THAT(standin::calls("viClose"), IsEmpty());

    const auto third = run(VisaFunctionCallTyp::FindNext);
    EXPECT_EQ(third.status, 0);
    EXPECT_EQ(third.parameter[0].stringValue, "TCPIP::3::INSTR");
    EXPECT_EQ(third.parameter[1].uintValue, 0u);
    ASSERT_EQ(standin::calls("viClose").size(), 1u);
    EXPECT_EQ(standin::calls("viClose")[0].handle, 1001u);
    EXPECT_EQ(logLines().back(), "viClose(objectid= 1001)");
}

TEST_F(WorkerFind, ASearchThatFindsOneResourceLeavesItsListOpen)
{
    standin::addResource({.name = "TCPIP::1::INSTR"});
    const auto result = run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    EXPECT_EQ(result.parameter[0].stringValue, "TCPIP::1::INSTR");
    EXPECT_EQ(result.parameter[1].uintValue, 0u);
    EXPECT_THAT(standin::calls("viClose"), IsEmpty());
}

TEST_F(WorkerFind, ALibraryThatFindsMoreThanItCountedKeepsItsList)
{
    standin::addResource({.name = "TCPIP::1::INSTR"});
    run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    standin::script("viFindNext", {.status = VI_SUCCESS, .bytes = "TCPIP::2::INSTR"});
    const auto extra = run(VisaFunctionCallTyp::FindNext);
    EXPECT_EQ(extra.status, 0);
    EXPECT_EQ(extra.parameter[0].stringValue, "TCPIP::2::INSTR");
    EXPECT_EQ(extra.parameter[1].uintValue, 0u);
    EXPECT_THAT(standin::calls("viClose"), IsEmpty());
}

TEST_F(WorkerFind, ListsDoNotPileUpFromSearchToSearch)
{
    standin::addResource({.name = "TCPIP::1::INSTR"});
    run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    const std::size_t open = standin::openObjects();
    for (int i = 0; i < 20; ++i)
        run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    EXPECT_EQ(standin::openObjects(), open);

    // One that cannot be closed is no reason not to search.
    standin::script("viClose", {.status = VI_ERROR_SYSTEM_ERROR});
    EXPECT_EQ(run(VisaFunctionCallTyp::FindRsrc, text("?*")).status, 0);
}

TEST_F(WorkerFind, AFailedCloseOfTheListKeepsTheLastName)
{
    standin::addResource({.name = "TCPIP::1::INSTR"});
    standin::addResource({.name = "TCPIP::2::INSTR"});
    run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    standin::script("viClose", {.status = VI_ERROR_SYSTEM_ERROR});
    const auto last = run(VisaFunctionCallTyp::FindNext);
    EXPECT_EQ(last.status, VI_ERROR_SYSTEM_ERROR);
    EXPECT_EQ(last.parameter[0].stringValue, "TCPIP::2::INSTR");
    EXPECT_EQ(last.parameter[1].uintValue, 0u);
}

TEST_F(WorkerFind, ASearchWithoutAMatchAnswersTheStatusAlone)
{
    const auto result = run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    EXPECT_EQ(result.status, static_cast<ViStatus>(0xBFFF0011));
    for (const Parameter &parameter : result.parameter) {
        EXPECT_EQ(parameter.uintValue, 0u);
        EXPECT_EQ(parameter.stringValue, "");
    }
}

TEST_F(WorkerFind, AFailedFindNextDoesNotCount)
{
    standin::addResource({.name = "TCPIP::1::INSTR"});
    standin::addResource({.name = "TCPIP::2::INSTR"});
    run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    standin::script("viFindNext", {.status = VI_ERROR_TMO});
    EXPECT_EQ(run(VisaFunctionCallTyp::FindNext).status, VI_ERROR_TMO);
    EXPECT_EQ(run(VisaFunctionCallTyp::FindNext).parameter[0].stringValue, "TCPIP::2::INSTR");
    EXPECT_EQ(standin::calls("viClose").size(), 1u);
}

TEST_F(WorkerFind, FindNextWithoutASearchFails)
{
    const auto result = run(VisaFunctionCallTyp::FindNext);
    EXPECT_LT(result.status, 0);
    EXPECT_EQ(result.parameter[0].stringValue, "");
}

TEST_F(WorkerFind, ACountOfNothingDoesNotWrapAround)
{
    standin::script("viFindRsrc", {.status = VI_SUCCESS, .bytes = "TCPIP::1::INSTR", .numbers = {1001, 0}});
    const auto result = run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    EXPECT_EQ(result.parameter[1].uintValue, 0u);
}

TEST_F(WorkerFind, TheTextsOfAResourceTravelWithIt)
{
    standin::addResource(lxiResource("TCPIP::1::INSTR", "11"));
    standin::addResource(lxiResource("TCPIP::2::INSTR", "22"));
    const auto first = run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    EXPECT_EQ(first.parameter[1].stringValue, "Oltrava,M1,11,2.0");
    EXPECT_EQ(first.parameter[2].stringValue, std::string("Bench 11\0host11.local", 21));
    const auto second = run(VisaFunctionCallTyp::FindNext);
    EXPECT_EQ(second.parameter[1].stringValue, "Oltrava,M1,22,2.0");
    EXPECT_EQ(second.parameter[2].stringValue, std::string("Bench 22\0host22.local", 21));
}

TEST_F(WorkerFind, AResourceWithoutTextsDoesNotShowThoseOfTheOneBefore)
{
    standin::addResource(lxiResource("TCPIP::1::INSTR", "11"));
    standin::addResource({.name = "ASRL1::INSTR"});
    run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    const auto second = run(VisaFunctionCallTyp::FindNext);
    EXPECT_EQ(second.status, 0);
    EXPECT_EQ(second.parameter[1].stringValue, "");
    EXPECT_EQ(second.parameter[2].stringValue, std::string(1, '\0'));
    EXPECT_NE(second.parameter[2].uintValue, 0u);
}

TEST_F(WorkerFind, NoListOfAClosedManagerIsTouchedAgain)
{
    standin::addResource({.name = "TCPIP::1::INSTR"});
    run(VisaFunctionCallTyp::FindRsrc, text("?*"));
    m_thread.closeRM();
    m_thread.openRM();
    const std::size_t closed = standin::calls("viClose").size();
    EXPECT_EQ(run(VisaFunctionCallTyp::FindRsrc, text("?*")).status, 0);
    EXPECT_EQ(standin::calls("viClose").size(), closed);
}
} // namespace
