#include "pipeline/VisaFunctionCall.h"

#include <gtest/gtest.h>

#include <iterator>

namespace
{
// Panels, listeners and the worker rely on numbers and names alike.
const struct {
    VisaFunctionCallTyp type;
    unsigned value;
    const char *name;
} Kinds[] = {
    {VisaFunctionCallTyp::All, 0, "All"},
    {VisaFunctionCallTyp::FindRsrc, 1, "FindRsrc"},
    {VisaFunctionCallTyp::FindNext, 2, "FindNext"},
    {VisaFunctionCallTyp::ParseRsrc, 3, "ParseRsrc"},
    {VisaFunctionCallTyp::Open, 4, "Open"},
    {VisaFunctionCallTyp::Close, 5, "Close"},
    {VisaFunctionCallTyp::SetAttribute, 6, "SetAttribute"},
    {VisaFunctionCallTyp::GetAttribute, 7, "GetAttribute"},
    {VisaFunctionCallTyp::StatusDesc, 8, "StatusDesc"},
    {VisaFunctionCallTyp::Terminate, 9, "Terminate"},
    {VisaFunctionCallTyp::ExclusiveLock, 10, "ExclusiveLock"},
    {VisaFunctionCallTyp::SharedLock, 11, "SharedLock"},
    {VisaFunctionCallTyp::Unlock, 12, "Unlock"},
    {VisaFunctionCallTyp::EnableEvent, 13, "EnableEvent"},
    {VisaFunctionCallTyp::DisableEvent, 14, "DisableEvent"},
    {VisaFunctionCallTyp::DiscardEvents, 15, "DiscardEvents"},
    {VisaFunctionCallTyp::WaitOnEvent, 16, "WaitOnEvent"},
    {VisaFunctionCallTyp::InstallHandler, 17, "InstallHandler"},
    {VisaFunctionCallTyp::UninstallHandler, 18, "UninstallHandler"},
    {VisaFunctionCallTyp::Read, 19, "Read"},
    {VisaFunctionCallTyp::ReadAsync, 20, "ReadAsync"},
    {VisaFunctionCallTyp::ReadToFile, 21, "ReadToFile"},
    {VisaFunctionCallTyp::Write, 22, "Write"},
    {VisaFunctionCallTyp::WriteAsync, 23, "WriteAsync"},
    {VisaFunctionCallTyp::Query, 24, "Query"},
    {VisaFunctionCallTyp::WriteFromFile, 25, "WriteFromFile"},
    {VisaFunctionCallTyp::AssertTrigger, 26, "AssertTrigger"},
    {VisaFunctionCallTyp::ReadSTB, 27, "ReadSTB"},
    {VisaFunctionCallTyp::Clear, 28, "Clear"},
    {VisaFunctionCallTyp::GpibControlREN, 29, "GpibControlREN"},
    {VisaFunctionCallTyp::GpibControlATN, 30, "GpibControlATN"},
    {VisaFunctionCallTyp::GpibSendIFC, 31, "GpibSendIFC"},
    {VisaFunctionCallTyp::GpibCommand, 32, "GpibCommand"},
    {VisaFunctionCallTyp::GpibPassControl, 33, "GpibPassControl"},
    {VisaFunctionCallTyp::VxiCommandQuery, 34, "VxiCommandQuery"},
    {VisaFunctionCallTyp::AssertUtilSignal, 35, "AssertUtilSignal"},
    {VisaFunctionCallTyp::AssertIntrSignal, 36, "AssertIntrSignal"},
    {VisaFunctionCallTyp::MapTrigger, 37, "MapTrigger"},
    {VisaFunctionCallTyp::Test, 38, "Test"},
    {VisaFunctionCallTyp::StopTest, 39, "StopTest"},
    {VisaFunctionCallTyp::SetAttributeDef, 40, "SetAttributeDef"},
    {VisaFunctionCallTyp::GetAttributeDef, 41, "GetAttributeDef"},
    {VisaFunctionCallTyp::End, 42, "End"},
};

TEST(CallKinds, HaveFixedNumbersAndNames)
{
    ASSERT_EQ(std::size(Kinds), 43u);
    ASSERT_EQ(std::size(_VisaFunctionCallTypString), 43u);
    for (unsigned i = 0; i < 43; ++i) {
        EXPECT_EQ(Kinds[i].value, i);
        EXPECT_EQ(static_cast<unsigned>(Kinds[i].type), i);
        EXPECT_STREQ(_VisaFunctionCallTypString[i], Kinds[i].name);
    }
}

TEST(CallRecord, StartsEmptyAndCopiesTextsInFullLength)
{
    _visaFunctionCall call;
    EXPECT_EQ(call.status, 0);
    for (const Parameter &parameter : call.parameter) {
        EXPECT_EQ(parameter.uintValue, 0u);
        EXPECT_TRUE(parameter.stringValue.empty());
    }
    call.parameter[2].stringValue = std::string("\0\0x\0", 4);
    const finsihedFunctionCall finished{call, nullptr};
    EXPECT_EQ(finished.call.parameter[2].stringValue, std::string("\0\0x\0", 4));
}
} // namespace
