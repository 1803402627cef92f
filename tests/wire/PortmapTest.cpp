#include "wire/Portmap.h"

#include "wire/Hex.h"
#include "wire/Rpc.h"

#include <gtest/gtest.h>
#include <rapidcheck/gtest.h>

using namespace wire;
using namespace wire::portmap;
using xdr::Bytes;
using xdr::Reader;
using xdr::Writer;

namespace
{

template <typename Write>
std::vector<std::byte> written(Write write)
{
    std::vector<std::byte> buffer;
    Writer writer(buffer);
    write(writer);
    return buffer;
}

const char *const CoreOverTcp = "00 06 07 AF | 00 00 00 01 | 00 00 00 06 | 00 00 04 00";
const char *const TwoMappings = "00 00 00 01 | 00 06 07 AF 00 00 00 01 00 00 00 06 00 00 04 00 |"
                                "00 00 00 01 | 00 01 86 A0 00 00 00 02 00 00 00 11 00 00 00 6F | 00 00 00 00";

} // namespace

TEST(Portmap, HasTheNumbersOfTheStandard)
{
    EXPECT_EQ(Program, 100000u);
    EXPECT_EQ(Version, 2u);
    EXPECT_EQ(DefaultPort, 111);
    EXPECT_EQ(static_cast<std::uint32_t>(Procedure::Null), 0u);
    EXPECT_EQ(static_cast<std::uint32_t>(Procedure::Set), 1u);
    EXPECT_EQ(static_cast<std::uint32_t>(Procedure::Unset), 2u);
    EXPECT_EQ(static_cast<std::uint32_t>(Procedure::GetPort), 3u);
    EXPECT_EQ(static_cast<std::uint32_t>(Procedure::Dump), 4u);
    EXPECT_EQ(static_cast<std::uint32_t>(Procedure::CallIt), 5u);
}

TEST(Portmap, WritesTheDatagramThatLooksForInstruments)
{
    const auto datagram = written([](Writer &w) {
        rpc::encode(w, rpc::Call{0x4B59AA01, Program, Version, static_cast<std::uint32_t>(Procedure::GetPort)});
        encode(w, Mapping{0x0607AF, 1, Tcp, 0});
    });
    EXPECT_EQ(datagram, hex("4B 59 AA 01 | 00 00 00 00 | 00 00 00 02 | 00 01 86 A0 | 00 00 00 02 | 00 00 00 03 |"
                            "00 00 00 00 00 00 00 00 | 00 00 00 00 00 00 00 00 |"
                            "00 06 07 AF | 00 00 00 01 | 00 00 00 06 | 00 00 00 00"));
    EXPECT_EQ(datagram.size(), 56u);
}

TEST(Portmap, ReadsTheTwentyEightBytesOfItsAnswer)
{
    const auto bytes =
        hex("4B 59 AA 01 | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 00 | 00 00 04 00");
    ASSERT_EQ(bytes.size(), 28u);
    Reader reader(bytes);
    rpc::Reply reply;
    std::uint16_t port = 0;
    ASSERT_TRUE(rpc::decode(reader, reply));
    EXPECT_TRUE(reply.success());
    EXPECT_EQ(reply.xid, 0x4B59AA01u);
    EXPECT_TRUE(decodePort(reader, port));
    EXPECT_EQ(port, 1024);
}

TEST(Portmap, WritesAndReadsAMapping)
{
    EXPECT_EQ(written([](Writer &w) { encode(w, Mapping{395183, 1, Tcp, 1024}); }), hex(CoreOverTcp));
    const auto bytes = hex(CoreOverTcp);
    Reader reader(bytes);
    Mapping mapping;
    EXPECT_TRUE(decode(reader, mapping));
    EXPECT_EQ(mapping, (Mapping{395183, 1, 6, 1024}));
}

TEST(Portmap, WritesAndReadsAList)
{
    const std::vector<Mapping> expected{{395183, 1, 6, 1024}, {100000, 2, 17, 111}};
    EXPECT_EQ(written([&](Writer &w) { encodeList(w, expected); }), hex(TwoMappings));
    EXPECT_EQ(written([](Writer &w) { encodeList(w, {}); }), hex("00 00 00 00"));
    const auto bytes = hex(TwoMappings);
    Reader reader(bytes);
    std::vector<Mapping> mappings{{1, 2, 3, 4}};
    EXPECT_TRUE(decodeList(reader, mappings));
    EXPECT_EQ(mappings, expected);
}

TEST(Portmap, RefusesAListThatIsLongerThanTheLimit)
{
    const auto bytes = hex(TwoMappings);
    std::vector<Mapping> mappings;
    Reader enough(bytes);
    EXPECT_TRUE(decodeList(enough, mappings, 2));
    Reader tooLong(bytes);
    EXPECT_FALSE(decodeList(tooLong, mappings, 1));
}

TEST(Portmap, RefusesEveryTruncation)
{
    const auto mapping = hex(CoreOverTcp);
    for (std::size_t length = 0; length < mapping.size(); ++length) {
        Reader reader(Bytes(mapping).first(length));
        Mapping ignored;
        EXPECT_FALSE(decode(reader, ignored)) << length;
    }
    const auto list = hex(TwoMappings);
    for (std::size_t length = 0; length < list.size(); ++length) {
        Reader reader(Bytes(list).first(length));
        std::vector<Mapping> ignored;
        EXPECT_FALSE(decodeList(reader, ignored)) << length;
    }
    for (std::size_t length = 0; length < 4; ++length) {
        const std::vector<std::byte> word(length);
        std::uint16_t port = 7;
        bool done = true;
        Reader portReader(word);
        Reader doneReader(word);
        EXPECT_FALSE(decodePort(portReader, port)) << length;
        EXPECT_FALSE(decodeDone(doneReader, done)) << length;
    }
}

TEST(Portmap, ANumberThatIsNoPortReadsAsNotRegistered)
{
    struct Row {
        const char *bytes;
        std::uint16_t port;
    };
    for (const Row &row : {Row{"00 00 00 00", 0}, Row{"00 00 00 01", 1}, Row{"00 00 FF FF", 65535},
                           Row{"00 01 00 00", 0}, Row{"FF FF FF FF", 0}}) {
        const auto bytes = hex(row.bytes);
        Reader reader(bytes);
        std::uint16_t port = 99;
        EXPECT_TRUE(decodePort(reader, port));
        EXPECT_EQ(port, row.port) << row.bytes;
    }
    EXPECT_EQ(written([](Writer &w) { encodePort(w, 4096); }), hex("00 00 10 00"));
}

TEST(Portmap, AnswersWithABoolean)
{
    EXPECT_EQ(written([](Writer &w) { encodeDone(w, true); }), hex("00 00 00 01"));
    EXPECT_EQ(written([](Writer &w) { encodeDone(w, false); }), hex("00 00 00 00"));
    const auto bytes = hex("00 00 00 01 | 00 00 00 00");
    Reader reader(bytes);
    bool done = false;
    EXPECT_TRUE(decodeDone(reader, done));
    EXPECT_TRUE(done);
    EXPECT_TRUE(decodeDone(reader, done));
    EXPECT_FALSE(done);
}

RC_GTEST_PROP(Portmap, ReadsBackTheListsItWrites, (const std::vector<std::uint32_t> &numbers))
{
    std::vector<Mapping> sent;
    for (std::size_t i = 0; i + 4 <= numbers.size(); i += 4)
        sent.push_back({numbers[i], numbers[i + 1], numbers[i + 2], numbers[i + 3]});
    const auto bytes = written([&](Writer &w) { encodeList(w, sent); });
    Reader reader(bytes);
    std::vector<Mapping> mappings;
    RC_ASSERT(decodeList(reader, mappings));
    RC_ASSERT(mappings == sent);
    RC_ASSERT(reader.rest().empty());
}
