#include "visa/KyVisaCodedString.h"

#include <gtest/gtest.h>

namespace
{

std::string coded(const std::string &bytes)
{
    return KyVisaCodedString(bytes.data(), bytes.size());
}

} // namespace

TEST(CodedString, IsEmptyForNoBytes)
{
    EXPECT_EQ(KyVisaCodedString("abc", 0), "");
    EXPECT_EQ(KyVisaCodedString(nullptr, 0), "");
    EXPECT_EQ(KyVisaCodedString(nullptr, 3), "");
}

TEST(CodedString, LeavesPrintableBytesAlone)
{
    EXPECT_EQ(
        coded(" !\"#$%&'()*+,-./0123456789:;<=>?@ABCDEFGHIJKLMNOPQRSTUVWXYZ[\\]^_`abcdefghijklmnopqrstuvwxyz{|}~"),
        " !\"#$%&'()*+,-./0123456789:;<=>?@ABCDEFGHIJKLMNOPQRSTUVWXYZ[\\]^_`abcdefghijklmnopqrstuvwxyz{|}~");
}

TEST(CodedString, EscapesLineEndsTabAndZero)
{
    EXPECT_EQ(coded("*IDN?\r\n"), "*IDN?\\r\\n");
    EXPECT_EQ(coded("a\tb"), "a\\tb");
    EXPECT_EQ(coded(std::string("\0\x01\x7F", 3)), "\\0\\x01\\x7F");
}

TEST(CodedString, WritesEveryOtherByteAsTwoUpperCaseDigits)
{
    EXPECT_EQ(coded("\x01\x02\x03\x04\x05\x06\x07\x08"), "\\x01\\x02\\x03\\x04\\x05\\x06\\x07\\x08");
    EXPECT_EQ(coded("\x0B\x0C\x0E\x0F\x10\x1A\x1B\x1F"), "\\x0B\\x0C\\x0E\\x0F\\x10\\x1A\\x1B\\x1F");
    EXPECT_EQ(coded("\x7F\x80\xA5\xC3\xBC\xFF"), "\\x7F\\x80\\xA5\\xC3\\xBC\\xFF");
}

TEST(CodedString, DoesNotStopAtAZeroByte)
{
    EXPECT_EQ(coded(std::string("a\0b", 3)), "a\\0b");
}

TEST(CodedString, CutsPlainTextAt250Characters)
{
    EXPECT_EQ(coded(std::string(249, 'A')), std::string(249, 'A'));
    EXPECT_EQ(coded(std::string(250, 'A')), std::string(250, 'A'));
    EXPECT_EQ(coded(std::string(251, 'A')), std::string(250, 'A'));
    EXPECT_EQ(coded(std::string(300, 'A')), std::string(250, 'A'));
}

TEST(CodedString, NeverTearsAnEscape)
{
    std::string sixtyThree;
    for (int i = 0; i < 63; ++i)
        sixtyThree += "\\x01";
    EXPECT_EQ(coded(std::string(100, '\x01')), sixtyThree);
    // One character short of the limit, the whole escape still goes in: 253 characters, the longest text there is.
    EXPECT_EQ(coded(std::string(249, 'A') + "\x1B" + "B"), std::string(249, 'A') + "\\x1B");
    EXPECT_EQ(coded(std::string(248, 'A') + "\n" + "B"), std::string(248, 'A') + "\\n");
}

TEST(CodedString, MarksNoCut)
{
    const std::string cut = coded(std::string(4096, 'Z'));
    EXPECT_EQ(cut, std::string(250, 'Z'));
}
