#include "wire/Rpc.h"

#include "wire/Hex.h"

#include <gtest/gtest.h>
#include <rapidcheck/gtest.h>

using namespace wire::rpc;
using wire::xdr::Bytes;
using wire::xdr::Reader;
using wire::xdr::Writer;

namespace
{

template <typename Message>
std::vector<std::byte> written(const Message &message)
{
    std::vector<std::byte> buffer;
    Writer writer(buffer);
    encode(writer, message);
    return buffer;
}

/// xid 0x11223344 calls program 100000 version 2 procedure 3.
const char *const SampleCall = "11 22 33 44 | 00 00 00 00 | 00 00 00 02 | 00 01 86 A0 | 00 00 00 02 | 00 00 00 03 |"
                               "00 00 00 00 | 00 00 00 00 | 00 00 00 00 | 00 00 00 00";

struct ReplyRow {
    const char *name;
    const char *bytes;
    Reply reply;
};

/// Every state of a reply.
std::vector<ReplyRow> replies()
{
    using K = Reply::Kind;
    using A = AcceptStatus;
    using R = RejectStatus;
    const std::uint32_t xid = 0xCAFEF00D;
    return {
        {"success",
         "CA FE F0 0D | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 00",
         {xid, K::Accepted, A::Success, R::RpcMismatch, 0, 0, 0}},
        {"program unavailable",
         "CA FE F0 0D | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 01",
         {xid, K::Accepted, A::ProgramUnavailable, R::RpcMismatch, 0, 0, 0}},
        {"program mismatch",
         "CA FE F0 0D | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 02 | 00 00 00 01 | 00 00 00 07",
         {xid, K::Accepted, A::ProgramMismatch, R::RpcMismatch, 1, 7, 0}},
        {"procedure unavailable",
         "CA FE F0 0D | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 03",
         {xid, K::Accepted, A::ProcedureUnavailable, R::RpcMismatch, 0, 0, 0}},
        {"garbage arguments",
         "CA FE F0 0D | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 04",
         {xid, K::Accepted, A::GarbageArguments, R::RpcMismatch, 0, 0, 0}},
        {"system error",
         "CA FE F0 0D | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 05",
         {xid, K::Accepted, A::SystemError, R::RpcMismatch, 0, 0, 0}},
        {"RPC mismatch",
         "CA FE F0 0D | 00 00 00 01 | 00 00 00 01 | 00 00 00 00 | 00 00 00 02 | 00 00 00 03",
         {xid, K::Denied, A::Success, R::RpcMismatch, 2, 3, 0}},
        {"authentication",
         "CA FE F0 0D | 00 00 00 01 | 00 00 00 01 | 00 00 00 01 | 00 00 00 05",
         {xid, K::Denied, A::Success, R::AuthError, 0, 0, 5}},
    };
}

} // namespace

TEST(Rpc, WritesACallWithoutCredentials)
{
    EXPECT_EQ(written(Call{0x11223344, 100000, 2, 3}), hex(SampleCall));
}

TEST(Rpc, ReadsACallAndStopsAtItsArguments)
{
    auto bytes = hex(SampleCall);
    bytes.push_back(std::byte{0x99});
    Reader reader(bytes);
    Call call;
    EXPECT_EQ(decode(reader, call), CallForm::Good);
    EXPECT_EQ(call, (Call{0x11223344, 100000, 2, 3}));
    EXPECT_EQ(reader.rest().size(), 1u);
}

TEST(Rpc, ACallIsNotGoodAfterAnyTruncation)
{
    const auto bytes = hex(SampleCall);
    for (std::size_t length = 0; length < bytes.size(); ++length) {
        Reader reader(Bytes(bytes).first(length));
        Call call;
        // From the procedure number on there is somebody to answer.
        EXPECT_EQ(decode(reader, call), length < 24 ? CallForm::NotACall : CallForm::BadCredentials) << length;
    }
}

TEST(Rpc, AcceptsAnyCredentialsUpToFourHundredBytes)
{
    const auto head = hex("00 00 00 01 | 00 00 00 00 | 00 00 00 02 | 00 06 07 AF | 00 00 00 01 | 00 00 00 0A");
    struct Row {
        const char *flavourAndLength;
        std::size_t body;
        CallForm form;
    };
    for (const Row &row :
         {Row{"00 00 00 01 | 00 00 00 14", 20, CallForm::Good}, Row{"00 00 00 06 | 00 00 01 90", 400, CallForm::Good},
          Row{"FF FF FF FF | 00 00 00 01", 4, CallForm::Good},
          Row{"00 00 00 01 | 00 00 01 91", 404, CallForm::BadCredentials},
          Row{"00 00 00 01 | FF FF FF FF", 400, CallForm::BadCredentials}}) {
        for (const bool asVerifier : {false, true}) {
            auto bytes = head;
            const auto none = hex("00 00 00 00 00 00 00 00");
            if (asVerifier)
                bytes.insert(bytes.end(), none.begin(), none.end());
            const auto auth = hex(row.flavourAndLength);
            bytes.insert(bytes.end(), auth.begin(), auth.end());
            bytes.insert(bytes.end(), row.body, std::byte{0x5A});
            if (!asVerifier)
                bytes.insert(bytes.end(), none.begin(), none.end());
            Reader reader(bytes);
            Call call;
            EXPECT_EQ(decode(reader, call), row.form)
                << row.flavourAndLength << (asVerifier ? " verifier" : " credential");
            EXPECT_EQ(call, (Call{1, 0x0607AF, 1, 10}));
        }
    }
}

TEST(Rpc, TellsAnotherRpcVersionFromNoCallAtAll)
{
    Call call;
    const auto version3 = hex("00 00 00 07 | 00 00 00 00 | 00 00 00 03");
    Reader other(version3);
    EXPECT_EQ(decode(other, call), CallForm::OtherVersion);
    EXPECT_EQ(call.xid, 7u);

    const auto reply = hex("CA FE F0 0D | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 00");
    Reader notACall(reply);
    EXPECT_EQ(decode(notACall, call), CallForm::NotACall);

    const auto strange = hex("CA FE F0 0D | 00 00 00 02 | 00 00 00 02 | 00 00 00 00 00 00 00 00 | 00 00 00 00");
    Reader neither(strange);
    EXPECT_EQ(decode(neither, call), CallForm::NotACall);
}

TEST(Rpc, WritesAndReadsEveryStateOfAReply)
{
    for (const ReplyRow &row : replies()) {
        EXPECT_EQ(written(row.reply), hex(row.bytes)) << row.name;
        auto bytes = hex(row.bytes);
        bytes.push_back(std::byte{0x99});
        Reader reader(bytes);
        Reply reply;
        EXPECT_TRUE(decode(reader, reply)) << row.name;
        EXPECT_EQ(reply, row.reply) << row.name;
        EXPECT_EQ(reader.rest().size(), 1u) << row.name;
    }
}

TEST(Rpc, OnlyAcceptedAndSuccessfulIsSuccess)
{
    for (const ReplyRow &row : replies())
        EXPECT_EQ(row.reply.success(), std::string_view(row.name) == "success") << row.name;
}

TEST(Rpc, RefusesEveryTruncationOfAReply)
{
    for (const ReplyRow &row : replies()) {
        const auto bytes = hex(row.bytes);
        for (std::size_t length = 0; length < bytes.size(); ++length) {
            Reader reader(Bytes(bytes).first(length));
            Reply reply;
            EXPECT_FALSE(decode(reader, reply)) << row.name << " cut to " << length;
        }
    }
}

TEST(Rpc, RefusesRepliesWithNumbersThatDoNotExist)
{
    for (
        const char *text : {
            "00 00 00 01 | 00 00 00 00 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 00", // a call
            "00 00 00 01 | 00 00 00 01 | 00 00 00 02 | 00 00 00 00 00 00 00 00 | 00 00 00 00", // neither accepted nor denied
            "00 00 00 01 | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 06", // accept status
            "00 00 00 01 | 00 00 00 01 | 00 00 00 01 | 00 00 00 02 | 00 00 00 00",             // reject status
            "00 00 00 01 | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 01 91 | 00 00 00 00", // long verifier
        }) {
        const auto bytes = hex(text);
        Reader reader(bytes);
        Reply reply;
        EXPECT_FALSE(decode(reader, reply)) << text;
    }
}

TEST(Rpc, AcceptsAReplyWithAVerifier)
{
    const auto bytes =
        hex("00 00 00 01 | 00 00 00 01 | 00 00 00 00 | 00 00 00 02 00 00 00 05 'token' 00 00 00 | 00 00 00 00");
    Reader reader(bytes);
    Reply reply;
    EXPECT_TRUE(decode(reader, reply));
    EXPECT_TRUE(reply.success());
}

TEST(Rpc, AnswersForThoseThatCannotBeServed)
{
    EXPECT_EQ(written(success(9)),
              hex("00 00 00 09 | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 00"));
    EXPECT_EQ(written(refuse(9, AcceptStatus::ProgramUnavailable)),
              hex("00 00 00 09 | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 | 00 00 00 01"));
    EXPECT_EQ(written(refuseVersion(9, 1, 2)), hex("00 00 00 09 | 00 00 00 01 | 00 00 00 00 | 00 00 00 00 00 00 00 00 "
                                                   "| 00 00 00 02 | 00 00 00 01 00 00 00 02"));
    EXPECT_EQ(written(denyVersion(9)),
              hex("00 00 00 09 | 00 00 00 01 | 00 00 00 01 | 00 00 00 00 | 00 00 00 02 00 00 00 02"));
    EXPECT_EQ(written(denyAuthentication(9)),
              hex("00 00 00 09 | 00 00 00 01 | 00 00 00 01 | 00 00 00 01 | 00 00 00 01"));
}

RC_GTEST_PROP(Rpc, ReadsBackTheCallsItWrites,
              (std::uint32_t xid, std::uint32_t program, std::uint32_t version, std::uint32_t procedure))
{
    const Call sent{xid, program, version, procedure};
    const auto bytes = written(sent);
    Reader reader(bytes);
    Call call;
    RC_ASSERT(decode(reader, call) == CallForm::Good);
    RC_ASSERT(call == sent);
    RC_ASSERT(reader.rest().empty());
}
