#include "wire/RpcRecord.h"

#include "wire/Hex.h"

#include <gtest/gtest.h>
#include <rapidcheck/gtest.h>

using namespace wire::rpc;
using wire::xdr::Bytes;
using wire::xdr::Writer;

namespace
{

using Records = std::vector<std::vector<std::byte>>;

std::vector<std::byte> copy(Bytes bytes)
{
    return {bytes.begin(), bytes.end()};
}

/// Feeds everything; returns the complete records. Stops when the reader refuses.
Records recordsOf(RecordReader &reader, Bytes bytes, std::size_t piece = SIZE_MAX)
{
    Records records;
    while (!bytes.empty()) {
        const std::size_t used = reader.feed(bytes.first(std::min(piece, bytes.size())));
        bytes = bytes.subspan(used);
        if (reader.state() == RecordReader::State::Complete) {
            records.push_back(copy(reader.record()));
            reader.next();
        } else if (reader.state() == RecordReader::State::Refused || used == 0) {
            break;
        }
    }
    return records;
}

} // namespace

TEST(RpcRecord, MarksHoldALastBitAndThirtyOneBitsOfLength)
{
    EXPECT_EQ(encodeMark({true, 0x28}), 0x80000028u);
    EXPECT_EQ(encodeMark({false, 0x28}), 0x00000028u);
    EXPECT_EQ(encodeMark({true, 0x7FFFFFFF}), 0xFFFFFFFFu);
    EXPECT_EQ(decodeMark(0x80000028u), (Mark{true, 0x28}));
    EXPECT_EQ(decodeMark(0x00000400u), (Mark{false, 0x400}));
    EXPECT_EQ(decodeMark(0x80000000u), (Mark{true, 0}));
}

TEST(RpcRecord, WritesTheMarkInFrontOfWhatFollowed)
{
    std::vector<std::byte> buffer = hex("EE");
    Writer writer(buffer);
    const std::size_t begun = beginRecord(writer);
    writer.u32(1);
    writer.u32(2);
    finishRecord(writer, begun);
    EXPECT_EQ(buffer, hex("EE | 80 00 00 08 | 00 00 00 01 | 00 00 00 02"));
}

TEST(RpcRecord, CountsBytesThatAreSentFromElsewhere)
{
    std::vector<std::byte> buffer;
    Writer writer(buffer);
    const std::size_t begun = beginRecord(writer);
    writer.opaqueHead(1000000);
    finishRecord(writer, begun, 1000000);
    EXPECT_EQ(buffer, hex("80 0F 42 44 | 00 0F 42 40"));
}

TEST(RpcRecord, ReadsOneFragment)
{
    RecordReader reader(100);
    EXPECT_TRUE(reader.idle());
    const auto bytes = hex("80 00 00 03 'abc'");
    EXPECT_EQ(reader.feed(bytes), 7u);
    ASSERT_EQ(reader.state(), RecordReader::State::Complete);
    EXPECT_EQ(copy(reader.record()), hex("'abc'"));
    reader.next();
    EXPECT_TRUE(reader.idle());
}

TEST(RpcRecord, JoinsFragments)
{
    const auto bytes = hex("00 00 00 02 'ab' 00 00 00 00 00 00 00 01 'c' 80 00 00 02 'de'");
    RecordReader reader(5);
    EXPECT_EQ(recordsOf(reader, bytes), Records{hex("'abcde'")});
}

TEST(RpcRecord, AnEmptyLastFragmentEndsARecord)
{
    RecordReader reader(5);
    const auto bytes = hex("00 00 00 02 'ab' 80 00 00 00 80 00 00 00");
    EXPECT_EQ(recordsOf(reader, bytes), (Records{hex("'ab'"), hex("")}));
}

TEST(RpcRecord, ConsumesNothingBeyondTheRecord)
{
    const auto bytes = hex("80 00 00 01 'a' 80 00 00 01 'b'");
    RecordReader reader(5);
    EXPECT_EQ(reader.feed(bytes), 5u);
    EXPECT_EQ(reader.feed(Bytes(bytes).subspan(5)), 0u) << "not before next()";
    reader.next();
    EXPECT_EQ(reader.feed(Bytes(bytes).subspan(5)), 5u);
    EXPECT_EQ(copy(reader.record()), hex("'b'"));
}

TEST(RpcRecord, ReadsTheSameInPiecesOfAnySize)
{
    const auto bytes = hex("00 00 00 02 'ab' 80 00 00 03 'cde' 80 00 00 00 00 00 00 00 80 00 00 01 'f'");
    for (std::size_t piece = 1; piece <= bytes.size(); ++piece) {
        RecordReader reader(5);
        EXPECT_EQ(recordsOf(reader, bytes, piece), (Records{hex("'abcde'"), hex(""), hex("'f'")})) << piece;
        EXPECT_TRUE(reader.idle()) << piece;
    }
}

TEST(RpcRecord, KnowsThatItIsInsideARecordAfterEveryTruncation)
{
    const auto bytes = hex("00 00 00 02 'ab' 80 00 00 03 'cde'");
    for (std::size_t length = 1; length < bytes.size(); ++length) {
        RecordReader reader(5);
        EXPECT_EQ(reader.feed(Bytes(bytes).first(length)), length);
        EXPECT_EQ(reader.state(), RecordReader::State::NeedMore) << length;
        EXPECT_FALSE(reader.idle()) << length;
    }
}

TEST(RpcRecord, RefusesARecordAboveTheLimitWhenItsMarkArrives)
{
    for (const char *claim : {"80 00 00 06", "FF FF FF FF", "7F FF FF FF", "00 00 00 03 'abc' 80 00 00 03",
                              "00 00 00 05 'abcde' 00 00 00 01"}) {
        RecordReader reader(5);
        EXPECT_TRUE(recordsOf(reader, hex(claim)).empty()) << claim;
        EXPECT_EQ(reader.state(), RecordReader::State::Refused) << claim;
        EXPECT_EQ(reader.feed(hex("00")), 0u) << "nothing follows a refusal";
    }
    RecordReader reader(5);
    EXPECT_EQ(recordsOf(reader, hex("80 00 00 05 'abcde'")).size(), 1u);
}

TEST(RpcRecord, RefusesAnEndlessRowOfEmptyFragments)
{
    RecordReader reader(5);
    const std::vector<std::byte> empty(4 * 1000);
    EXPECT_LE(reader.feed(empty), 4u * 20);
    EXPECT_EQ(reader.state(), RecordReader::State::Refused);
}

TEST(RpcRecord, AllocatesForWhatArrivedNotForWhatIsAnnounced)
{
    // Two gigabytes announced, ten bytes sent: the sanitizers' allocator would refuse the former.
    RecordReader reader(MaxFragment);
    const auto bytes = hex("FF FF FF FF 00 01 02 03 04 05 06 07 08 09");
    EXPECT_EQ(reader.feed(bytes), bytes.size());
    EXPECT_EQ(reader.state(), RecordReader::State::NeedMore);
    EXPECT_EQ(reader.record().size(), 10u);
}

RC_GTEST_PROP(RpcRecord, AnyFragmentationAndAnyPiecesGiveTheRecordBack, (const std::vector<std::uint8_t> &content))
{
    std::vector<std::byte> stream;
    Writer writer(stream);
    std::size_t sent = 0;
    do {
        const std::size_t length = *rc::gen::inRange<std::size_t>(1, content.size() - sent + 2);
        const std::size_t count = std::min(length, content.size() - sent);
        writer.u32(encodeMark({sent + count == content.size(), static_cast<std::uint32_t>(count)}));
        for (std::size_t i = 0; i < count; ++i)
            stream.push_back(static_cast<std::byte>(content[sent + i]));
        sent += count;
    } while (sent < content.size());

    RecordReader reader(content.size());
    const auto records = recordsOf(reader, stream, *rc::gen::inRange<std::size_t>(1, stream.size() + 1));
    RC_ASSERT(records.size() == 1u);
    const auto expected = std::as_bytes(std::span(content));
    RC_ASSERT(std::equal(records[0].begin(), records[0].end(), expected.begin(), expected.end()));
}
