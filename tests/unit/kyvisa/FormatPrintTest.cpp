#include "FormatSupport.h"

#include "kyvisa/include/visa.h"

#include <array>
#include <clocale>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <gtest/gtest.h>
#include <limits>
#include <unistd.h>

using test::print;
using test::Printed;

namespace
{

Printed text(std::string expected)
{
    return {VI_SUCCESS, std::move(expected)};
}

const Printed Invalid{VI_ERROR_INV_FMT, ""};

TEST(FormatPrint, PassesTextOn)
{
    EXPECT_EQ(print("*IDN?"), text("*IDN?"));
    EXPECT_EQ(print(""), text(""));
    EXPECT_EQ(print("100%% sure\n"), text("100% sure\n"));
}

TEST(FormatPrint, ResolvesEscapesWrittenAsTwoCharacters)
{
    EXPECT_EQ(print(R"(a\nb\tc\rd\\e\"f)"), text("a\nb\tc\rd\\e\"f"));
    EXPECT_EQ(print(R"(\101\12x\7)"), text("A\nx\a"));
    EXPECT_EQ(print(R"(\1234)"), text("S4"));
    EXPECT_EQ(print(R"(\q)"), text("\\q"));
}

TEST(FormatPrint, WritesIntegersAsCDoes)
{
    EXPECT_EQ(print("%d|%i|%u", -5, 7, 4000000000u), text("-5|7|4000000000"));
    EXPECT_EQ(print("[%5d][%-5d][%+d][% d][%05d]", 42, 42, 42, 42, -42), text("[   42][42   ][+42][ 42][-0042]"));
    EXPECT_EQ(print("%.3d|%6.3d|%.0d|", 7, -7, 0), text("007|  -007||"));
    EXPECT_EQ(print("%x|%X|%o|%04x", 255, 255, 8, 10), text("ff|FF|10|000a"));
    EXPECT_EQ(print("%x", -1), text("ffffffff"));
    EXPECT_EQ(print("%hd|%ld|%lld", 65537, -3000000000L, std::numeric_limits<long long>::min()),
              text("1|-3000000000|-9223372036854775808"));
    EXPECT_EQ(print("%llu", std::numeric_limits<unsigned long long>::max()), text("18446744073709551615"));
}

TEST(FormatPrint, TakesWidthPrecisionAndValueInThisOrder)
{
    EXPECT_EQ(print("[%*.*f]", 8, 2, 3.14159), text("[    3.14]"));
    EXPECT_EQ(print("[%*d]", -5, 42), text("[42   ]"));
    EXPECT_EQ(print("[%.*f]", -1, 0.5), text("[0.500000]"));
}

TEST(FormatPrint, WritesFloatingPointNumbersAsCDoes)
{
    EXPECT_EQ(print("%f|%.0f|%.10f", 3.5, 2.5, 0.1), text("3.500000|2|0.1000000000"));
    EXPECT_EQ(print("%e|%.2E", 12345.678, 0.00012), text("1.234568e+04|1.20E-04"));
    EXPECT_EQ(print("%g|%G|%g|%.3g", 0.0001, 1e-10, 100000.0, 1234.5), text("0.0001|1E-10|100000|1.23e+03"));
    EXPECT_EQ(print("[%10.3f][%-10.3f][%+.1f][%010.2f]", 3.14159, 3.14159, 2.0, -1.5),
              text("[     3.142][3.142     ][+2.0][-000001.50]"));
    EXPECT_EQ(print("%lf|%Lf", 1.5, 2.5L), text("1.500000|2.500000"));
    EXPECT_EQ(print("%f|%f|[%06f]", HUGE_VAL, -HUGE_VAL, std::nan("")), text("inf|-inf|[   nan]"));
    EXPECT_EQ(print("%.1f", 1e300).text.size(), 303u);
}

TEST(FormatPrint, WritesTheNumberFormsOf4882)
{
    EXPECT_EQ(print("%@1d|%@2d|%@3d", 12, 12, 12), text("12|12.000000|1.200000E+01"));
    EXPECT_EQ(print("%@1f|%@2f|%@3f", -12.9, 12.25, 12.25), text("-12|12.250000|1.225000E+01"));
    EXPECT_EQ(print("%@3.2f|%@2.1d", 1234.5, 3), text("1.23E+03|3.0"));
    EXPECT_EQ(print("%@Hd|%@Qd|%@Bd", 255, 8, 5), text("#HFF|#Q10|#B101"));
    EXPECT_EQ(print("%@Hhd|%@Hd", -1, -1), text("#HFFFF|#HFFFFFFFF"));
}

TEST(FormatPrint, CountsThePrefixOfABaseIntoTheWidth)
{
    EXPECT_EQ(print("[%@H6d][%-@H6d][%@H.4d]", 255, 255, 255), text("[  #HFF][#HFF  ][#H00FF]"));
}

TEST(FormatPrint, JoinsArraysByCommas)
{
    const int ints[] = {1, -2, 3};
    const short shorts[] = {1, -2};
    const long longs[] = {5000000000L, 2};
    const long long longLongs[] = {-1, 7};
    const float floats[] = {0.5f, 1.5f};
    const double doubles[] = {0.25, -2};
    const long double longDoubles[] = {0.125L};
    EXPECT_EQ(print("%,3d", ints), text("1,-2,3"));
    EXPECT_EQ(print("%,*d", 2, ints), text("1,-2"));
    EXPECT_EQ(print("%,2hd|%,2ld|%,2lld", shorts, longs, longLongs), text("1,-2|5000000000,2|-1,7"));
    EXPECT_EQ(print("%.2,2f|%.2,2lf|%.3,1Lf", floats, doubles, longDoubles), text("0.50,1.50|0.25,-2.00|0.125"));
    EXPECT_EQ(print("%4,3d", ints), text("   1,  -2,   3"));
    EXPECT_EQ(print("%@H,2hd", shorts), text("#H1,#HFFFE"));
    EXPECT_EQ(print("[%,0d]", ints), text("[]"));
    EXPECT_EQ(print("%,*d", -1, ints), Invalid);
    EXPECT_EQ(print("%,2d", static_cast<int *>(nullptr)), Invalid);
}

TEST(FormatPrint, WritesCharactersStringsAndAddresses)
{
    EXPECT_EQ(print("%c%3c%-3c|", 'a', 'b', 'c'), text("a  bc  |"));
    EXPECT_EQ(print("[%s][%5s][%-5s][%.2s]", "abc", "abc", "abc", "abc"), text("[abc][  abc][abc  ][ab]"));
    EXPECT_EQ(print("%p", reinterpret_cast<void *>(0x1F)), text("0x1f"));
    const char open[] = {'x', 'y'}; // no NUL within the precision
    EXPECT_EQ(print("%.2s", open), text("xy"));
    EXPECT_EQ(print("%s", static_cast<char *>(nullptr)), Invalid);
}

TEST(FormatPrint, TellsHowMuchHasBeenWritten)
{
    int count = -1;
    short shortCount = -1;
    long long longCount = -1;
    EXPECT_EQ(print("abc%n%5d%hn\n%lln", &count, 1, &shortCount, &longCount), text("abc    1\n"));
    EXPECT_EQ(count, 3);
    EXPECT_EQ(shortCount, 8);
    EXPECT_EQ(longCount, 9);
}

TEST(FormatPrint, WritesDefiniteBlocksWithTheMostSignificantByteFirst)
{
    const char bytes[] = {'a', 'b', 'c'};
    const std::uint16_t words[] = {0x4142, 0x4344};
    const std::uint32_t longs[] = {0x41424344};
    const std::uint64_t longLongs[] = {0x4142434445464748};
    const float floats[] = {12.03125f};            // 0x41408000
    const double doubles[] = {2261634.5098039214}; // 0x4141414141414141
    EXPECT_EQ(print("%3b", bytes), text("#13abc"));
    EXPECT_EQ(print("%*b\n", 2L, bytes), text("#12ab\n"));
    EXPECT_EQ(print("%2hb", words), text("#14ABCD"));
    EXPECT_EQ(print("%1lb", longs), text("#14ABCD"));
    EXPECT_EQ(print("%1llb", longLongs), text("#18ABCDEFGH"));
    EXPECT_EQ(print("%1zb", floats).text.substr(0, 5), "#14A@");
    EXPECT_EQ(print("%1Zb", doubles), text("#18AAAAAAAA"));
    EXPECT_EQ(print("%12b", "abcdefghijkl"), text("#212abcdefghijkl"));
    EXPECT_EQ(print("%*b", 0L, nullptr), text("#10"));
}

TEST(FormatPrint, EndsIndefiniteBlocksWithALineFeed)
{
    EXPECT_EQ(print("X %3B", "abc"), text("X #0abc\n"));
}

TEST(FormatPrint, WritesRawElementsInTheOrderAskedFor)
{
    const std::uint16_t words[] = {0x4142, 0x4344};
    EXPECT_EQ(print("%2hy", words), text("ABCD"));
    EXPECT_EQ(print("%2!obhy", words), text("ABCD"));
    EXPECT_EQ(print("%2!olhy", words), text("BADC"));
    EXPECT_EQ(print("%3y", "abc"), text("abc"));
}

TEST(FormatPrint, WritesLargeBlocksWhole)
{
    std::vector<std::uint16_t> words(20'000, 0x4142);
    words.back() = 0x595A;
    const Printed printed = print("%20000hb", words.data());
    ASSERT_EQ(printed.text.size(), 7u + 40'000u);
    EXPECT_EQ(printed.text.substr(0, 11), "#540000ABAB");
    EXPECT_EQ(printed.text.substr(printed.text.size() - 4), "ABYZ");
}

TEST(FormatPrint, RefusesWhatIsNoConversion)
{
    for (const char *format :
         {"%",   "%q",  "%5",  "%d%",  "%b",   "%y",   "%-3b", "%.2b", "%@4d",          "%@", "%!oxd", "%!ol5d", "%hf",
          "%zd", "%Ls", "%lc", "%,3s", "%@Hs", "%hhd", "%5*d", "%#d",  "%99999999999d", "%Y", "%*b%"})
        EXPECT_EQ(print(format, 0L, "", 0L), Invalid) << format;
    EXPECT_EQ(print("%*b", -1L, ""), Invalid);
    EXPECT_EQ(print(nullptr), Invalid);
}

TEST(FormatPrint, DoesNotSupportTheReadingCodes)
{
    EXPECT_EQ(print("%t").status, VI_ERROR_NSUP_FMT);
    EXPECT_EQ(print("%T").status, VI_ERROR_NSUP_FMT);
}

/// A process whose numbers have a decimal comma. The locale is made here, since hosts have different ones.
class DecimalComma : public testing::Test
{
protected:
    void SetUp() override
    {
        const std::string folder = testing::TempDir() + "decimal-comma-" + std::to_string(::getpid());
        ASSERT_EQ(std::system(
                      ("mkdir -p " + folder + " && localedef --no-archive -f UTF-8 -i de_DE " + folder + "/de_DE.UTF-8")
                          .c_str()),
                  0);
        ::setenv("LOCPATH", folder.c_str(), 1);
        ASSERT_NE(std::setlocale(LC_ALL, "de_DE.UTF-8"), nullptr);
        ASSERT_STREQ(std::localeconv()->decimal_point, ",");
    }
    void TearDown() override
    {
        std::setlocale(LC_ALL, "C");
        ::unsetenv("LOCPATH");
    }
};

TEST_F(DecimalComma, ChangesNoNumberOnItsWayOut)
{
    EXPECT_EQ(print("%f %g %e", 1.5, 1234567.5, 0.25), text("1.500000 1.23457e+06 2.500000e-01"));
}

TEST_F(DecimalComma, ChangesNoNumberOnItsWayIn)
{
    double first = 0;
    double second = 0;
    EXPECT_EQ(test::scan("1.5,-2.5e-1", "%lf,%lf", &first, &second), VI_SUCCESS);
    EXPECT_EQ(first, 1.5);
    EXPECT_EQ(second, -0.25);
}

} // namespace
