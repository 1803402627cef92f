#include "FormatSupport.h"

#include "kyvisa/include/visa.h"

#include <array>
#include <cstdint>
#include <cstring>
#include <gtest/gtest.h>
#include <limits>

using test::scan;

namespace
{

TEST(FormatScan, ReadsIntegersInEveryFormOf4882)
{
    int value = 0;
    const auto read = [&](const char *text) {
        value = -999;
        EXPECT_EQ(scan(text, "%d", &value), VI_SUCCESS) << text;
        return value;
    };
    EXPECT_EQ(read("42"), 42);
    EXPECT_EQ(read("  -7,"), -7);
    EXPECT_EQ(read("+3"), 3);
    EXPECT_EQ(read("2.4"), 2);
    EXPECT_EQ(read("2.5"), 3);
    EXPECT_EQ(read("-2.5"), -2);
    EXPECT_EQ(read("1.2E3"), 1200);
    EXPECT_EQ(read(".5e1"), 5);
    EXPECT_EQ(read("7."), 7);
    EXPECT_EQ(read("#HfF"), 255);
    EXPECT_EQ(read("#q17"), 15);
    EXPECT_EQ(read("#B101"), 5);
    EXPECT_EQ(read("99999999999"), std::numeric_limits<int>::max());
    EXPECT_EQ(read("-1e30"), std::numeric_limits<int>::min());
    EXPECT_EQ(read("1e99999"), std::numeric_limits<int>::max());
    EXPECT_EQ(read("1e-99999"), 0);
}

TEST(FormatScan, ReadsIntegersOfEachLength)
{
    short s = 0;
    long l = 0;
    long long ll = 0;
    unsigned u = 0;
    unsigned long long ull = 0;
    EXPECT_EQ(scan("2.5 5000000000 -9223372036854775808 4294967295 18446744073709551615", "%hd%ld%lld%u%llu", &s, &l,
                   &ll, &u, &ull),
              VI_SUCCESS);
    EXPECT_EQ(s, 3);
    EXPECT_EQ(l, 5000000000L);
    EXPECT_EQ(ll, std::numeric_limits<long long>::min());
    EXPECT_EQ(u, 4294967295u);
    EXPECT_EQ(ull, 18446744073709551615ull);
}

TEST(FormatScan, ReadsOtherBasesAsCDoes)
{
    unsigned hex = 0;
    unsigned octal = 0;
    int sixteen = 0;
    int eight = 0;
    int ten = 0;
    EXPECT_EQ(scan("fF 17 0x1f 017 10", "%x%o%i%i%i", &hex, &octal, &sixteen, &eight, &ten), VI_SUCCESS);
    EXPECT_EQ(hex, 255u);
    EXPECT_EQ(octal, 15u);
    EXPECT_EQ(sixteen, 31);
    EXPECT_EQ(eight, 15);
    EXPECT_EQ(ten, 10);
    void *address = nullptr;
    EXPECT_EQ(scan("0x10", "%p", &address), VI_SUCCESS);
    EXPECT_EQ(address, reinterpret_cast<void *>(16));
}

TEST(FormatScan, ReadsFloatingPointNumbersOfEachLength)
{
    float f = 0;
    double d = 0;
    long double ld = 0;
    EXPECT_EQ(scan("+1.5E-3,-2.25e+2,9.9E37", "%f,%lf,%Lf", &f, &d, &ld), VI_SUCCESS);
    EXPECT_FLOAT_EQ(f, 1.5e-3f);
    EXPECT_EQ(d, -225.0);
    EXPECT_EQ(ld, 9.9E37L);
    EXPECT_EQ(scan("#H10", "%lf", &d), VI_SUCCESS);
    EXPECT_EQ(d, 16.0);
}

TEST(FormatScan, LeavesAnExponentsLetterThatBeginsNoExponent)
{
    double d = 0;
    char rest[8];
    EXPECT_EQ(scan("5EX", "%lf%s", &d, rest), VI_SUCCESS);
    EXPECT_EQ(d, 5.0);
    EXPECT_STREQ(rest, "EX");
}

TEST(FormatScan, ReadsArraysUntilNoCommaFollows)
{
    std::array<int, 4> ints{-1, -1, -1, -1};
    int count = 4;
    EXPECT_EQ(scan("1, 2,3;4", "%,#d", &count, ints.data()), VI_SUCCESS);
    EXPECT_EQ(count, 3);
    EXPECT_EQ(ints, (std::array<int, 4>{1, 2, 3, -1}));
    std::array<double, 2> doubles{};
    char rest[8];
    EXPECT_EQ(scan("1.5,2.5,3.5", "%,2lf%s", doubles.data(), rest), VI_SUCCESS);
    EXPECT_EQ(doubles, (std::array<double, 2>{1.5, 2.5}));
    EXPECT_STREQ(rest, ",3.5");
    std::array<short, 3> shorts{};
    EXPECT_EQ(scan("#HA,#B11,7", "%,3hd", shorts.data()), VI_SUCCESS);
    EXPECT_EQ(shorts, (std::array<short, 3>{10, 3, 7}));
}

TEST(FormatScan, TakesAWidthOfANumberAsCDoes)
{
    int a = 0;
    int b = 0;
    EXPECT_EQ(scan("123456", "%3d%2d", &a, &b), VI_SUCCESS);
    EXPECT_EQ(a, 123);
    EXPECT_EQ(b, 45);
}

TEST(FormatScan, MatchesTextAndSkipsBlanksWhereTheFormatHasThem)
{
    int a = 0;
    int b = 0;
    EXPECT_EQ(scan("A=1 \t\n,  B=2", "A=%d , B=%d", &a, &b), VI_SUCCESS);
    EXPECT_EQ(a, 1);
    EXPECT_EQ(b, 2);
    b = -1;
    EXPECT_EQ(scan("A=1;B=2", "A=%d,B=%d", &a, &b), VI_SUCCESS);
    EXPECT_EQ(b, -1) << "what does not match ends the call";
    EXPECT_EQ(scan("50% of", "%d%%%c", &a, &b), VI_SUCCESS);
    EXPECT_EQ(a, 50);
}

TEST(FormatScan, SucceedsWhenTheMessageEndsEarly)
{
    int a = -1;
    int b = -1;
    EXPECT_EQ(scan("7", "%d,%d", &a, &b), VI_SUCCESS);
    EXPECT_EQ(a, 7);
    EXPECT_EQ(b, -1);
    EXPECT_EQ(scan("", "%d", &a), VI_SUCCESS);
    EXPECT_EQ(scan("abc", "%d", &a), VI_SUCCESS);
    EXPECT_EQ(a, 7);
}

TEST(FormatScan, ReadsCharactersWithTheirBlanksAndWithoutANul)
{
    std::array<char, 5> characters{'x', 'x', 'x', 'x', 'x'};
    EXPECT_EQ(scan(" a b", "%3c", characters.data()), VI_SUCCESS);
    EXPECT_EQ(std::string(characters.begin(), characters.end()), " a xx");
    int size = 2;
    EXPECT_EQ(scan("qr", "%#c", &size, characters.data()), VI_SUCCESS);
    EXPECT_EQ(std::string(characters.begin(), characters.end()), "qr xx");
}

TEST(FormatScan, ReadsStringsUpToABlankAndDropsTheExcess)
{
    char text[32];
    int next = 0;
    EXPECT_EQ(scan("  hello world", "%s", text), VI_SUCCESS);
    EXPECT_STREQ(text, "hello");
    EXPECT_EQ(scan("hello 7", "%4s%d", text, &next), VI_SUCCESS);
    EXPECT_STREQ(text, "hel");
    EXPECT_EQ(next, 7);
    int size = 4;
    EXPECT_EQ(scan("hello", "%#s", &size, text), VI_SUCCESS);
    EXPECT_STREQ(text, "hel");
    EXPECT_EQ(size, 3);
}

TEST(FormatScan, ReadsSetsOfCharacters)
{
    char digits[16];
    char rest[16];
    EXPECT_EQ(scan("123abc-]", "%[0-9]%[]a-c-]", digits, rest), VI_SUCCESS);
    EXPECT_STREQ(digits, "123");
    EXPECT_STREQ(rest, "abc-]");
    EXPECT_EQ(scan("\"a b\",1", "\"%[^\"]\"", rest), VI_SUCCESS);
    EXPECT_STREQ(rest, "a b");
    std::strcpy(rest, "kept");
    EXPECT_EQ(scan("x", "%[0-9]", rest), VI_SUCCESS);
    EXPECT_STREQ(rest, "kept");
}

// Unlike that of %s, which is the size of the buffer.
TEST(FormatScan, TakesAWidthOfASetAsCDoes)
{
    char first[8] = "";
    char rest[8] = "";
    EXPECT_EQ(scan("123456", "%4[0-9]%s", first, rest), VI_SUCCESS);
    EXPECT_STREQ(first, "1234");
    EXPECT_STREQ(rest, "56");
    int size = 4;
    EXPECT_EQ(scan("123456,9", "%#[0-9],%s", &size, first, rest), VI_SUCCESS);
    EXPECT_STREQ(first, "123");
    EXPECT_STREQ(rest, "9");
    EXPECT_EQ(size, 3);
}

TEST(FormatScan, ReadsToTheEndOrToTheLineFeed)
{
    char text[32];
    int size = sizeof text;
    EXPECT_EQ(scan("one two\nthree\n", "%#t", &size, text), VI_SUCCESS);
    EXPECT_STREQ(text, "one two\nthree\n");
    EXPECT_EQ(size, 14);
    char line[32];
    EXPECT_EQ(scan("one two\nthree\n", "%T%t", line, text), VI_SUCCESS);
    EXPECT_STREQ(line, "one two\n");
    EXPECT_STREQ(text, "three\n");
    EXPECT_EQ(scan("one two\nthree", "%4T%s", line, text), VI_SUCCESS);
    EXPECT_STREQ(line, "one");
    EXPECT_STREQ(text, "three");
}

TEST(FormatScan, DiscardsWithoutAnArgument)
{
    int code = 0;
    char comma = 0;
    char next[8];
    EXPECT_EQ(scan("-113,\"Undefined header\"\n5", "%d,%c%*T%s", &code, &comma, next), VI_SUCCESS);
    EXPECT_EQ(code, -113);
    EXPECT_EQ(comma, '"');
    EXPECT_STREQ(next, "5");
    int last = 0;
    EXPECT_EQ(scan("1,2,abc x #12zz9", "%*d,%*f,%*s%*c%*c%*[ ]%*b%d", &last), VI_SUCCESS);
    EXPECT_EQ(last, 9);
    last = 0;
    EXPECT_EQ(scan("1,2,abc#12zz9", "%*d,%*f,%*3[abc]%*b%d", &last), VI_SUCCESS);
    EXPECT_EQ(last, 9);
}

TEST(FormatScan, ReadsDefiniteBlocks)
{
    std::array<char, 8> bytes{};
    long count = 8;
    int next = 0;
    EXPECT_EQ(scan("#13abc,5", "%#b,%d", &count, bytes.data(), &next), VI_SUCCESS);
    EXPECT_EQ(count, 3);
    EXPECT_STREQ(bytes.data(), "abc");
    EXPECT_EQ(next, 5);
    count = 2;
    EXPECT_EQ(scan("#16abcdef,5", "%#b,%d", &count, bytes.data(), &next), VI_SUCCESS);
    EXPECT_EQ(count, 2);
    EXPECT_EQ(next, 5) << "what was not asked for belongs to the block";
    std::array<std::uint16_t, 2> words{};
    EXPECT_EQ(scan("#14ABCD", "%2hb", words.data()), VI_SUCCESS);
    EXPECT_EQ(words, (std::array<std::uint16_t, 2>{0x4142, 0x4344}));
    std::array<double, 1> doubles{};
    EXPECT_EQ(scan("#18AAAAAAAA", "%1Zb", doubles.data()), VI_SUCCESS);
    EXPECT_EQ(doubles[0], 2261634.5098039214);
}

TEST(FormatScan, ReadsIndefiniteBlocksWithoutTheirLineFeed)
{
    std::array<char, 8> bytes{};
    long count = 8;
    EXPECT_EQ(scan("#0abc\n", "%#b", &count, bytes.data()), VI_SUCCESS);
    EXPECT_EQ(count, 3);
    count = 3;
    EXPECT_EQ(scan("#0ab\n\n", "%#b", &count, bytes.data()), VI_SUCCESS);
    EXPECT_EQ(count, 3) << "only the last line feed ends it";
    EXPECT_EQ(bytes[2], '\n');
}

TEST(FormatScan, LeavesATruncatedBlockCounted)
{
    std::array<std::uint16_t, 4> words{};
    long count = 4;
    EXPECT_EQ(scan("#18ABC", "%#hb", &count, words.data()), VI_SUCCESS);
    EXPECT_EQ(count, 1);
    EXPECT_EQ(words[0], 0x4142);
    count = 4;
    EXPECT_EQ(scan("#99999", "%#hb", &count, words.data()), VI_SUCCESS);
    EXPECT_EQ(scan("#x", "%#hb", &count, words.data()), VI_SUCCESS);
}

TEST(FormatScan, ReadsRawElements)
{
    std::array<std::uint16_t, 2> words{};
    long count = 2;
    EXPECT_EQ(scan("ABCD", "%#!olhy", &count, words.data()), VI_SUCCESS);
    EXPECT_EQ(words, (std::array<std::uint16_t, 2>{0x4241, 0x4443}));
    EXPECT_EQ(count, 2);
    EXPECT_EQ(scan("ABCD", "%2!obhy", words.data()), VI_SUCCESS);
    EXPECT_EQ(words, (std::array<std::uint16_t, 2>{0x4142, 0x4344}));
}

TEST(FormatScan, TellsHowMuchHasBeenRead)
{
    int value = 0;
    int count = 0;
    EXPECT_EQ(scan("ab 12", "ab%d%n", &value, &count), VI_SUCCESS);
    EXPECT_EQ(count, 5);
}

TEST(FormatScan, RefusesWhatIsNoConversion)
{
    std::array<char, 64> anything{};
    for (const char *format :
         {"%", "%q", "%Y", "%hhd", "%@3d", "%-d", "%.2f", "%[abc", "%b", "%y", "%,3s", "%!old", "%zf", "%5#d"})
        EXPECT_EQ(scan("1", format, anything.data(), anything.data()), VI_ERROR_INV_FMT) << format;
    EXPECT_EQ(scan("1", "%2B", anything.data()), VI_ERROR_NSUP_FMT);
    EXPECT_EQ(scan("1", nullptr), VI_ERROR_INV_FMT);
    EXPECT_EQ(scan("1", "%d", nullptr), VI_ERROR_INV_FMT);
    EXPECT_EQ(scan("1", "%s", nullptr), VI_ERROR_INV_FMT);
    EXPECT_EQ(scan("1", "%#s", nullptr, anything.data()), VI_ERROR_INV_FMT);
    int negative = -1;
    EXPECT_EQ(scan("1", "%#s", &negative, anything.data()), VI_ERROR_INV_FMT);
}

} // namespace
