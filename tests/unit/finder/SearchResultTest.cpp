#include "finder/SearchResult.h"

#include "pipeline/VisaFunctionCall.h"

#include <gtest/gtest.h>

namespace
{
_visaFunctionCall found(const std::string &resource, const std::string &identification, const std::string &texts)
{
    _visaFunctionCall call;
    call.type = VisaFunctionCallTyp::FindRsrc;
    call.parameter[0].stringValue = resource;
    call.parameter[1].stringValue = identification;
    call.parameter[2].stringValue = texts;
    call.parameter[2].uintValue = 1;
    return call;
}
} // namespace

TEST(SearchResult, TakesAllFourTexts)
{
    const SearchResult result(found("TCPIP::h::INSTR", "Maker,Model,1,2", std::string("A meter\0meter.local", 19)));
    EXPECT_EQ(result.resource, "TCPIP::h::INSTR");
    EXPECT_EQ(result.identification, "Maker,Model,1,2");
    EXPECT_EQ(result.description, "A meter");
    EXPECT_EQ(result.hostName, "meter.local");
}

TEST(SearchResult, HasOnlyTheResourceWithoutASession)
{
    _visaFunctionCall call = found("ASRL1::INSTR", "Maker", std::string("A\0h", 3));
    call.parameter[2].uintValue = 0;
    const SearchResult result(call);
    EXPECT_EQ(result.resource, "ASRL1::INSTR");
    EXPECT_EQ(result.identification, "");
    EXPECT_EQ(result.description, "");
    EXPECT_EQ(result.hostName, "");
}

TEST(SearchResult, HasNoHostNameWithoutAZeroByte)
{
    const SearchResult result(found("R", "", "only a description"));
    EXPECT_EQ(result.description, "only a description");
    EXPECT_EQ(result.hostName, "");
}

TEST(SearchResult, ReadsUtf8AndMarksWhatIsNone)
{
    const SearchResult result(found("m\xc3\xbcnchen", "\xff", std::string("\xc3\0\xc3\xbc", 4)));
    EXPECT_EQ(result.resource, QStringLiteral("m\u00fcnchen"));
    EXPECT_EQ(result.identification, QStringLiteral("\ufffd"));
    EXPECT_EQ(result.description, QStringLiteral("\ufffd"));
    EXPECT_EQ(result.hostName, QStringLiteral("\u00fc"));
}
