#include "wire/Dns.h"

#include "wire/Hex.h"

#include <gtest/gtest.h>
#include <rapidcheck/gtest.h>

using namespace wire::dns;

namespace
{

std::vector<std::byte> joined(std::initializer_list<const char *> parts)
{
    std::vector<std::byte> bytes;
    for (const char *part : parts) {
        const auto piece = hex(part);
        bytes.insert(bytes.end(), piece.begin(), piece.end());
    }
    return bytes;
}

/// Both directions, and no truncation is taken for the whole.
void expectBoth(const std::vector<std::byte> &bytes, const Message &message)
{
    EXPECT_EQ(encode(message), bytes);
    Message decoded;
    ASSERT_TRUE(decode(bytes, decoded));
    EXPECT_EQ(decoded, message);
    for (std::size_t size = 0; size < bytes.size(); ++size) {
        // A copy of its own, so that a sanitizer sees what is read behind it.
        const std::vector<std::byte> part(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(size));
        EXPECT_FALSE(decode(part, decoded)) << size << " bytes";
        EXPECT_EQ(decoded, Message{}) << size << " bytes";
    }
}

bool decodes(const std::vector<std::byte> &bytes)
{
    Message message;
    return decode(bytes, message);
}

const Name Http = {"_http", "_tcp", "local"};

} // namespace

TEST(Dns, HasTheNumbersOfTheStandards)
{
    EXPECT_EQ(MulticastPort, 5353);
    EXPECT_EQ(TypeA, 1);
    EXPECT_EQ(TypePtr, 12);
    EXPECT_EQ(TypeTxt, 16);
    EXPECT_EQ(TypeAaaa, 28);
    EXPECT_EQ(TypeSrv, 33);
    EXPECT_EQ(TypeAny, 255);
    EXPECT_EQ(Internet, 1);
}

TEST(Dns, WritesAndReadsAQueryForServices)
{
    Message query;
    query.id = 0x1234;
    query.questions = {{Http, TypePtr, Internet, false}, {{"_lxi", "_tcp", "local"}, TypePtr, Internet, true}};
    expectBoth(joined({"12 34 | 00 00 | 00 02 | 00 00 | 00 00 | 00 00",
                       "05 '_http' 04 '_tcp' 05 'local' 00 | 00 0C | 00 01", //
                       "04 '_lxi' C0 12 | 00 0C | 80 01"}),
               query);
}

TEST(Dns, WritesAndReadsEachKindOfRecord)
{
    Message response;
    response.flags = 0x8400;
    const Name instance = "Box" + Http;
    const Name host = {"box", "local"};
    response.answers = {{Http, TypePtr, Internet, false, 4500, Pointer{instance}}};
    response.authorities = {
        {host, TypeAaaa, Internet, true, 120, Ipv6{0xFE, 0x80, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1}}};
    response.additionals = {{instance, TypeSrv, Internet, true, 120, Service{0, 0, 8080, host}},
                            {instance, TypeTxt, Internet, true, 4500, Text{{"txtvers=1", "Model=M"}}},
                            {host, TypeA, Internet, true, 120, Ipv4{192, 168, 1, 9}},
                            {host, 47, Internet, true, 120, Unknown{std::byte{0xAB}, std::byte{0xCD}}}};
    expectBoth(joined({"00 00 | 84 00 | 00 00 | 00 01 | 00 01 | 00 04",
                       "05 '_http' 04 '_tcp' 05 'local' 00 | 00 0C | 00 01 | 00 00 11 94 | 00 06 | 03 'Box' C0 0C",
                       "03 'box' C0 17 | 00 1C | 80 01 | 00 00 00 78 | 00 10 |"
                       "FE 80 00 00 00 00 00 00 00 00 00 00 00 00 00 01",
                       "C0 28 | 00 21 | 80 01 | 00 00 00 78 | 00 08 | 00 00 | 00 00 | 1F 90 | C0 2E",
                       "C0 28 | 00 10 | 80 01 | 00 00 11 94 | 00 12 | 09 'txtvers=1' 07 'Model=M'",
                       "C0 2E | 00 01 | 80 01 | 00 00 00 78 | 00 04 | C0 A8 01 09",
                       "C0 2E | 00 2F | 80 01 | 00 00 00 78 | 00 02 | AB CD"}),
               response);
}

// The example of RFC 1035, 4.1.4: F.ISI.ARPA, FOO.F.ISI.ARPA, ARPA and the root, in the places that it gives.
TEST(Dns, CompressesAsTheExampleOfTheStandard)
{
    Message message;
    message.questions = {{{"F", "ISI", "ARPA"}, TypeA, Internet, false},
                         {{"FOO", "F", "ISI", "ARPA"}, TypeA, Internet, false},
                         {{"ARPA"}, TypeA, Internet, false},
                         {{}, TypeA, Internet, false}};
    expectBoth(joined({"00 00 | 00 00 | 00 04 | 00 00 | 00 00 | 00 00", //
                       "01 'F' 03 'ISI' 04 'ARPA' 00 | 00 01 | 00 01",  //
                       "03 'FOO' C0 0C | 00 01 | 00 01",                //
                       "C0 12 | 00 01 | 00 01",                         //
                       "00 | 00 01 | 00 01"}),
               message);
}

TEST(Dns, ReadsTextStringsAndTheirKeys)
{
    Message message;
    ASSERT_TRUE(decode(
        joined({"00 00 | 84 00 | 00 00 | 00 01 | 00 00 | 00 00", "00 | 00 10 | 00 01 | 00 00 00 0A | 00 17 |"
                                                                 "04 'KEY=' 07 'Key=two' 04 'flag' 00 03 '=no'"}),
        message));
    const auto &text = std::get<Text>(message.answers.at(0).data);
    EXPECT_EQ(text.strings, (std::vector<std::string>{"KEY=", "Key=two", "flag", "=no"}));
    EXPECT_EQ(text.value("key"), "") << "the first counts, whatever its case";
    EXPECT_EQ(text.value("flag"), "");
    EXPECT_EQ(text.value("fla"), std::nullopt);
    EXPECT_EQ(text.value(""), std::nullopt) << "a string without a key is none";
}

TEST(Dns, WritesAnEmptyTextAsOneEmptyString)
{
    Message message;
    message.answers = {{{"a"}, TypeTxt, Internet, false, 1, Text{}}};
    expectBoth(joined({"00 00 | 00 00 | 00 00 | 00 01 | 00 00 | 00 00",
                       "01 'a' 00 | 00 10 | 00 01 | 00 00 00 01 | 00 01 | 00"}),
               message);
}

TEST(Dns, ComparesNamesWhateverTheirCase)
{
    EXPECT_EQ((Name{"Box", "LOCAL"}), (Name{"bOX", "local"}));
    EXPECT_FALSE((Name{"box", "local"} == Name{"box"}));
    EXPECT_FALSE((Name{"box.local"} == Name{"box", "local"}));
    EXPECT_EQ((Name{"a.b\\c", "local"}).text(), "a\\.b\\\\c.local");
    // Only ASCII letters have a case here.
    EXPECT_FALSE((Name{"\xC3\x84"} == Name{"\xC3\xA4"}));
}

TEST(Dns, WritesNoNameThatIsNone)
{
    const auto written = [](Name name) {
        Message message;
        message.questions = {{std::move(name), TypeA, Internet, false}};
        return !encode(message).empty();
    };
    const std::string label(63, 'a');
    EXPECT_TRUE(written(Name{label}));
    EXPECT_FALSE(written(Name{label + "a"}));
    EXPECT_FALSE(written(Name{"a", "", "b"}));
    EXPECT_TRUE(written(Name{label, label, label, label.substr(0, 61)})) << "255 bytes";
    EXPECT_FALSE(written(Name{label, label, label, label.substr(0, 62)})) << "256 bytes";
    Message message;
    message.answers = {{{"a"}, TypeTxt, Internet, false, 1, Text{{std::string(256, 'a')}}}};
    EXPECT_TRUE(encode(message).empty()) << "a string of 256 bytes";
}

TEST(Dns, RefusesNamesThatLeadNowhere)
{
    const char *const Header = "00 00 | 00 00 | 00 01 | 00 00 | 00 00 | 00 00";
    const char *const Tail = "00 01 | 00 01 | 00 00 00 00 00 00 00 00";
    EXPECT_FALSE(decodes(joined({Header, "C0 0C", Tail}))) << "a pointer to itself";
    EXPECT_FALSE(decodes(joined({Header, "C0 0E C0 0C", Tail}))) << "two that point to each other";
    EXPECT_FALSE(decodes(joined({Header, "01 'a' C0 0C", Tail}))) << "a loop through a label";
    EXPECT_FALSE(decodes(joined({Header, "C0 10 | 00 01 | 00 01", Tail}))) << "a pointer forward";
    EXPECT_FALSE(decodes(joined({Header, "FF FF", Tail}))) << "a pointer out of the message";
    EXPECT_FALSE(decodes(joined({Header, "40 'a' 00", Tail}))) << "a length that is none";
    EXPECT_FALSE(decodes(joined({Header, "80 'a' 00", Tail})));
    EXPECT_FALSE(decodes(joined({Header, "3F 'abc' 00"}))) << "a label longer than the message";
    EXPECT_TRUE(decodes(joined({Header, "C0 04", Tail}))) << "two zero bytes of the header are a name";
}

TEST(Dns, RefusesNamesThatAreTooLong)
{
    auto bytes = hex("00 00 | 00 00 | 00 01 | 00 00 | 00 00 | 00 00");
    const auto add = [&](std::size_t label) {
        bytes.push_back(static_cast<std::byte>(label));
        bytes.insert(bytes.end(), label, std::byte{'a'});
    };
    for (int i = 0; i < 3; ++i)
        add(63);
    auto longest = bytes;
    add(62);
    std::swap(bytes, longest);
    add(61);
    for (auto *name : {&bytes, &longest}) {
        const auto tail = hex("00 | 00 01 | 00 01");
        name->insert(name->end(), tail.begin(), tail.end());
    }
    EXPECT_TRUE(decodes(bytes)) << "255 bytes";
    EXPECT_FALSE(decodes(longest)) << "256 bytes";
}

TEST(Dns, RefusesDataThatDoesNotFillItsLength)
{
    const char *const Header = "00 00 | 84 00 | 00 00 | 00 01 | 00 00 | 00 00";
    const auto record = [&](const char *type, const char *data) {
        return joined({Header, "01 'a' 00", type, "00 01 | 00 00 00 01", data, "00 00 00 00 00 00 00 00"});
    };
    EXPECT_TRUE(decodes(record("00 01", "00 04 | 01 02 03 04")));
    EXPECT_FALSE(decodes(record("00 01", "00 03 | 01 02 03 04")));
    EXPECT_FALSE(decodes(record("00 01", "00 05 | 01 02 03 04")));
    EXPECT_FALSE(decodes(record("00 01", "FF FF | 01 02 03 04")));
    EXPECT_FALSE(decodes(record("00 1C", "00 04 | 01 02 03 04")));
    EXPECT_TRUE(decodes(record("00 0C", "00 02 | C0 0C")));
    EXPECT_FALSE(decodes(record("00 0C", "00 03 | C0 0C 00"))) << "something behind the name";
    EXPECT_FALSE(decodes(record("00 0C", "00 02 | 01 'b' 00"))) << "a name longer than the data";
    EXPECT_FALSE(decodes(record("00 0C", "00 01 | C0 0C"))) << "half a pointer";
    EXPECT_FALSE(decodes(record("00 21", "00 05 | 00 00 00 00 00"))) << "SRV without a name";
    EXPECT_FALSE(decodes(record("00 10", "00 03 | 03 'abc'"))) << "a string longer than the data";
    EXPECT_TRUE(decodes(record("00 10", "00 00 |"))) << "no string at all: passed over, as long as it harms nothing";
}

TEST(Dns, BelievesNoCounts)
{
    EXPECT_FALSE(decodes(hex("00 00 | 00 00 | FF FF | FF FF | FF FF | FF FF")));
    EXPECT_TRUE(decodes(hex("00 00 | 00 00 | 00 00 | 00 00 | 00 00 | 00 00 | 01 02 03")))
        << "what follows is none of it";
}

TEST(Dns, ComparesDataWithoutCompression)
{
    const Record record{Http, TypeSrv, Internet, true, 120, Service{0, 0, 80, {"box", "local"}}};
    EXPECT_EQ(encodeData(record), hex("00 00 | 00 00 | 00 50 | 03 'box' 05 'local' 00"));
}

RC_GTEST_PROP(DnsProperty, WhateverIsWrittenIsReadAgain, (const std::vector<std::string> &words, std::uint16_t number))
{
    Message message;
    message.id = number;
    for (const std::string &word : words) {
        const std::string label = word.empty() ? "empty" : word.substr(0, MaxLabel);
        const Name name = label + Http;
        message.questions.push_back({name, number, Internet, (number & 1) != 0});
        message.answers.push_back({Http, TypePtr, Internet, false, number, Pointer{name}});
        message.additionals.push_back({name, TypeSrv, Internet, true, number, Service{1, 2, number, name}});
    }
    Message again;
    RC_ASSERT(decode(encode(message), again));
    RC_ASSERT(again == message);
}
