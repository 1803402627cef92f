#include "wire/Xdr.h"

#include "wire/Hex.h"

#include <gtest/gtest.h>
#include <rapidcheck/gtest.h>

#include <functional>

using namespace wire::xdr;

namespace
{

std::vector<std::byte> written(const std::function<void(Writer &)> &write)
{
    std::vector<std::byte> buffer;
    Writer writer(buffer);
    write(writer);
    return buffer;
}

} // namespace

TEST(Xdr, WritesNumbersBigEndianInFourBytes)
{
    EXPECT_EQ(written([](Writer &w) { w.u32(0x01020304); }), hex("01 02 03 04"));
    EXPECT_EQ(written([](Writer &w) { w.u32(0xFFFFFFFF); }), hex("FF FF FF FF"));
    EXPECT_EQ(written([](Writer &w) { w.i32(-2); }), hex("FF FF FF FE"));
    EXPECT_EQ(written([](Writer &w) { w.boolean(true); }), hex("00 00 00 01"));
    EXPECT_EQ(written([](Writer &w) { w.boolean(false); }), hex("00 00 00 00"));
}

TEST(Xdr, WritesSeveralNumbersAsOneAfterTheOther)
{
    EXPECT_EQ(written([](Writer &w) {
                  w.u32(1);
                  w.u32s({0x01020304, 0xFFFFFFFF, 0});
                  w.u32s({});
                  w.u32(2);
              }),
              hex("00 00 00 01  01 02 03 04  FF FF FF FF  00 00 00 00  00 00 00 02"));
}

TEST(Xdr, PadsDataWithZeroesToFourBytes)
{
    EXPECT_EQ(written([](Writer &w) { w.string(""); }), hex("00 00 00 00"));
    EXPECT_EQ(written([](Writer &w) { w.string("a"); }), hex("00 00 00 01 'a' 00 00 00"));
    EXPECT_EQ(written([](Writer &w) { w.string("ab"); }), hex("00 00 00 02 'ab' 00 00"));
    EXPECT_EQ(written([](Writer &w) { w.string("abc"); }), hex("00 00 00 03 'abc' 00"));
    EXPECT_EQ(written([](Writer &w) { w.string("abcd"); }), hex("00 00 00 04 'abcd'"));
    EXPECT_EQ(written([](Writer &w) { w.string("inst0"); }), hex("00 00 00 05 'inst0' 00 00 00"));
}

TEST(Xdr, WritesOnlyTheLengthWhenTheDataIsSentFromElsewhere)
{
    EXPECT_EQ(written([](Writer &w) { w.opaqueHead(65537); }), hex("00 01 00 01"));
    EXPECT_EQ(padding(0), 0u);
    EXPECT_EQ(padding(1), 3u);
    EXPECT_EQ(padding(2), 2u);
    EXPECT_EQ(padding(3), 1u);
    EXPECT_EQ(padding(4), 0u);
}

TEST(Xdr, AppendsAndPatches)
{
    std::vector<std::byte> buffer = hex("AA");
    Writer writer(buffer);
    const std::size_t place = writer.position();
    writer.u32(0);
    writer.u32(2);
    writer.patch(place, 0x80000004);
    EXPECT_EQ(buffer, hex("AA 80 00 00 04 00 00 00 02"));
}

TEST(Xdr, ReadsItemsInOrder)
{
    const auto bytes =
        hex("00 00 00 2A | FF FF FF FF | 00 00 00 01 | 00 00 00 05 'inst0' 00 00 00 | 00 00 00 02 'hi' 00 00 | 99");
    Reader reader(bytes);
    EXPECT_EQ(reader.u32(), 42u);
    EXPECT_EQ(reader.i32(), -1);
    EXPECT_TRUE(reader.boolean());
    EXPECT_EQ(reader.string(), "inst0");
    const Bytes data = reader.opaque();
    ASSERT_EQ(data.size(), 2u);
    EXPECT_EQ(data.data(), bytes.data() + 28) << "a view, not a copy";
    EXPECT_TRUE(reader.ok());
    EXPECT_EQ(reader.rest().size(), 1u);
}

TEST(Xdr, TakesAnyNonZeroWordAsTrueAndAnyPadding)
{
    const auto bytes = hex("00 00 01 00 | 00 00 00 01 'a' FF FF FF");
    Reader reader(bytes);
    EXPECT_TRUE(reader.boolean());
    EXPECT_EQ(reader.string(), "a");
    EXPECT_TRUE(reader.ok());
}

TEST(Xdr, FailsForGoodAtTheFirstItemThatIsCut)
{
    const auto bytes = hex("00 00 00 2A | 00 00 00");
    Reader reader(bytes);
    EXPECT_EQ(reader.u32(), 42u);
    EXPECT_EQ(reader.u32(), 0u);
    EXPECT_FALSE(reader.ok());
    EXPECT_TRUE(reader.rest().empty());
    EXPECT_EQ(reader.u32(), 0u);
    EXPECT_TRUE(reader.opaque().empty());
    EXPECT_FALSE(reader.ok());
}

TEST(Xdr, RefusesDataWhosePaddingIsMissing)
{
    const auto bytes = hex("00 00 00 03 'abc'");
    Reader reader(bytes);
    EXPECT_TRUE(reader.opaque().empty());
    EXPECT_FALSE(reader.ok());
}

TEST(Xdr, RefusesLengthsThatTheInputOrTheLimitDoesNotHold)
{
    for (const char *claim : {"FF FF FF FF 'abcd'", "FF FF FF FD 'abcd'", "80 00 00 00 'abcd'", "00 00 00 05 'abcd'"}) {
        const auto bytes = hex(claim);
        Reader reader(bytes);
        EXPECT_TRUE(reader.opaque().empty()) << claim;
        EXPECT_FALSE(reader.ok()) << claim;
    }
    const auto bytes = hex("00 00 00 04 'abcd'");
    Reader atLimit(bytes);
    EXPECT_EQ(atLimit.string(4), "abcd");
    Reader aboveLimit(bytes);
    EXPECT_EQ(aboveLimit.string(3), "");
    EXPECT_FALSE(aboveLimit.ok());
}

RC_GTEST_PROP(Xdr, ReadsBackWhatItWrote, (std::uint32_t number, std::int32_t sign, bool flag, const std::string &text))
{
    std::vector<std::byte> buffer;
    Writer writer(buffer);
    writer.u32(number);
    writer.string(text);
    writer.i32(sign);
    writer.boolean(flag);
    RC_ASSERT(buffer.size() % 4 == 0);

    Reader reader(buffer);
    RC_ASSERT(reader.u32() == number);
    RC_ASSERT(reader.string() == text);
    RC_ASSERT(reader.i32() == sign);
    RC_ASSERT(reader.boolean() == flag);
    RC_ASSERT(reader.ok());
    RC_ASSERT(reader.rest().empty());
}
