#include "wire/Vxi11.h"

#include "wire/Hex.h"
#include "wire/Rpc.h"
#include "wire/RpcRecord.h"

#include <gtest/gtest.h>
#include <rapidcheck/gtest.h>

#include <concepts>

using namespace wire;
using namespace wire::vxi11;
using xdr::Bytes;
using xdr::Reader;
using xdr::Writer;

namespace
{

template <typename Value>
std::vector<std::byte> written(const Value &value)
{
    std::vector<std::byte> buffer;
    Writer writer(buffer);
    encode(writer, value);
    return buffer;
}

std::string_view text(Bytes bytes)
{
    return {reinterpret_cast<const char *>(bytes.data()), bytes.size()};
}

Bytes bytesOf(std::string_view characters)
{
    return std::as_bytes(std::span(characters));
}

/// Writes @p value, expects @p bytes; reads them back, leaves what follows alone; refuses every truncation.
template <typename Value>
void expectBothWays(const Value &value, std::string_view bytes)
{
    SCOPED_TRACE(bytes);
    const auto expected = hex(bytes);
    EXPECT_EQ(written(value), expected);

    auto followed = expected;
    followed.push_back(std::byte{0x99});
    Reader reader(followed);
    Value read{};
    ASSERT_TRUE(decode(reader, read));
    EXPECT_EQ(reader.rest().size(), 1u);
    if constexpr (std::equality_comparable<Value>) {
        EXPECT_TRUE(read == value);
    }
    EXPECT_EQ(written(read), expected);

    for (std::size_t length = 0; length < expected.size(); ++length) {
        Reader cut(Bytes(expected).first(length));
        Value ignored{};
        EXPECT_FALSE(decode(cut, ignored)) << "cut to " << length;
    }
}

} // namespace

TEST(Vxi11, HasTheProgramNumbersOfTheStandard)
{
    EXPECT_EQ(CoreProgram, 395183u);
    EXPECT_EQ(AbortProgram, 395184u);
    EXPECT_EQ(InterruptProgram, 395185u);
    EXPECT_EQ(Version, 1u);
}

TEST(Vxi11, HasTheProcedureNumbersOfTheStandard)
{
    const auto number = [](Procedure procedure) { return static_cast<unsigned>(procedure); };
    EXPECT_EQ(DeviceAbort, 1u);
    EXPECT_EQ(number(Procedure::CreateLink), 10u);
    EXPECT_EQ(number(Procedure::DeviceWrite), 11u);
    EXPECT_EQ(number(Procedure::DeviceRead), 12u);
    EXPECT_EQ(number(Procedure::DeviceReadStb), 13u);
    EXPECT_EQ(number(Procedure::DeviceTrigger), 14u);
    EXPECT_EQ(number(Procedure::DeviceClear), 15u);
    EXPECT_EQ(number(Procedure::DeviceRemote), 16u);
    EXPECT_EQ(number(Procedure::DeviceLocal), 17u);
    EXPECT_EQ(number(Procedure::DeviceLock), 18u);
    EXPECT_EQ(number(Procedure::DeviceUnlock), 19u);
    EXPECT_EQ(number(Procedure::DeviceEnableSrq), 20u);
    EXPECT_EQ(number(Procedure::DeviceDocmd), 22u);
    EXPECT_EQ(number(Procedure::DestroyLink), 23u);
    EXPECT_EQ(number(Procedure::CreateIntrChan), 25u);
    EXPECT_EQ(number(Procedure::DestroyIntrChan), 26u);
    EXPECT_EQ(DeviceIntrSrq, 30u);
}

TEST(Vxi11, HasTheErrorAndCommandNumbersOfTheStandard)
{
    const auto number = [](Error error) { return static_cast<int>(error); };
    EXPECT_EQ(number(Error::Syntax), 1);
    EXPECT_EQ(number(Error::NotAccessible), 3);
    EXPECT_EQ(number(Error::InvalidLink), 4);
    EXPECT_EQ(number(Error::Parameter), 5);
    EXPECT_EQ(number(Error::ChannelNotEstablished), 6);
    EXPECT_EQ(number(Error::NotSupported), 8);
    EXPECT_EQ(number(Error::OutOfResources), 9);
    EXPECT_EQ(number(Error::LockedByAnother), 11);
    EXPECT_EQ(number(Error::NoLockHeld), 12);
    EXPECT_EQ(number(Error::IoTimeout), 15);
    EXPECT_EQ(number(Error::IoError), 17);
    EXPECT_EQ(number(Error::InvalidAddress), 21);
    EXPECT_EQ(number(Error::Abort), 23);
    EXPECT_EQ(number(Error::ChannelEstablished), 29);
    EXPECT_EQ(static_cast<unsigned>(Command::SendCommand), 0x020000u);
    EXPECT_EQ(static_cast<unsigned>(Command::BusStatus), 0x020001u);
    EXPECT_EQ(static_cast<unsigned>(Command::AtnControl), 0x020002u);
    EXPECT_EQ(static_cast<unsigned>(Command::RenControl), 0x020003u);
    EXPECT_EQ(static_cast<unsigned>(Command::PassControl), 0x020004u);
    EXPECT_EQ(static_cast<unsigned>(Command::BusAddress), 0x02000Au);
    EXPECT_EQ(static_cast<unsigned>(Command::IfcControl), 0x020010u);
}

TEST(Vxi11, CreateLinkArguments)
{
    expectBothWays(CreateLinkCall{1, false, 0, "inst0"},
                   "00 00 00 01 | 00 00 00 00 | 00 00 00 00 | 00 00 00 05 'inst0' 00 00 00");
    expectBothWays(CreateLinkCall{-7, true, 10000, "gpib0,5,1"},
                   "FF FF FF F9 | 00 00 00 01 | 00 00 27 10 | 00 00 00 09 'gpib0,5,1' 00 00 00");
    expectBothWays(CreateLinkCall{0, false, 0, ""}, "00 00 00 00 | 00 00 00 00 | 00 00 00 00 | 00 00 00 00");
}

TEST(Vxi11, CreateLinkResult)
{
    expectBothWays(CreateLinkResult{Error::NoError, 0, 1025, 16384},
                   "00 00 00 00 | 00 00 00 00 | 00 00 04 01 | 00 00 40 00");
    expectBothWays(CreateLinkResult{Error::NoError, -2, 65535, 0xFFFFFFFF},
                   "00 00 00 00 | FF FF FF FE | 00 00 FF FF | FF FF FF FF");
    expectBothWays(CreateLinkResult{Error::NotAccessible, 0, 0, 0},
                   "00 00 00 03 | 00 00 00 00 | 00 00 00 00 | 00 00 00 00");
}

TEST(Vxi11, AnAbortPortThatIsNoPortReadsAsNone)
{
    const auto bytes = hex("00 00 00 00 | 00 00 00 01 | 00 01 00 00 | 00 00 04 00");
    Reader reader(bytes);
    CreateLinkResult result;
    ASSERT_TRUE(decode(reader, result));
    EXPECT_EQ(result, (CreateLinkResult{Error::NoError, 1, 0, 1024}));
}

TEST(Vxi11, DeviceWriteArguments)
{
    expectBothWays(WriteCall{3, 2000, 0, FlagEnd, bytesOf("*IDN?\n")},
                   "00 00 00 03 | 00 00 07 D0 | 00 00 00 00 | 00 00 00 08 | 00 00 00 06 '*IDN?' 0A 00 00");
    expectBothWays(WriteCall{3, 1, 2, FlagWaitLock | FlagEnd, {}},
                   "00 00 00 03 | 00 00 00 01 | 00 00 00 02 | 00 00 00 09 | 00 00 00 00");
}

TEST(Vxi11, DeviceWriteArgumentsInFrontOfDataThatIsSentFromElsewhere)
{
    std::vector<std::byte> buffer;
    Writer writer(buffer);
    encodeHead(writer, WriteCall{3, 2000, 0, FlagEnd, bytesOf("*IDN?\n")});
    EXPECT_EQ(buffer, hex("00 00 00 03 | 00 00 07 D0 | 00 00 00 00 | 00 00 00 08 | 00 00 00 06"));
}

TEST(Vxi11, DeviceWriteResult)
{
    expectBothWays(WriteResult{Error::NoError, 6}, "00 00 00 00 | 00 00 00 06");
    expectBothWays(WriteResult{Error::IoTimeout, 5}, "00 00 00 0F | 00 00 00 05");
}

TEST(Vxi11, DeviceReadArguments)
{
    expectBothWays(ReadCall{3, 1024, 2000, 500, FlagTermCharSet, '\n'},
                   "00 00 00 03 | 00 00 04 00 | 00 00 07 D0 | 00 00 01 F4 | 00 00 00 80 | 00 00 00 0A");
    expectBothWays(ReadCall{0, 0, 0, 0, 0, 0xFE},
                   "00 00 00 00 | 00 00 00 00 | 00 00 00 00 | 00 00 00 00 | 00 00 00 00 | 00 00 00 FE");
}

TEST(Vxi11, ATerminationCharacterMayArriveWithItsSignExtended)
{
    const auto bytes = hex("00 00 00 03 | 00 00 04 00 | 00 00 07 D0 | 00 00 01 F4 | 00 00 00 80 | FF FF FF FE");
    Reader reader(bytes);
    ReadCall call;
    ASSERT_TRUE(decode(reader, call));
    EXPECT_EQ(call.termChar, 0xFE);
}

TEST(Vxi11, DeviceReadResult)
{
    expectBothWays(ReadResult{Error::NoError, ReasonEnd, bytesOf("1\n")},
                   "00 00 00 00 | 00 00 00 04 | 00 00 00 02 '1' 0A 00 00");
    expectBothWays(ReadResult{Error::NoError, ReasonRequestCount | ReasonCharacter, bytesOf("abcd")},
                   "00 00 00 00 | 00 00 00 03 | 00 00 00 04 'abcd'");
    expectBothWays(ReadResult{Error::IoTimeout, 0, {}}, "00 00 00 0F | 00 00 00 00 | 00 00 00 00");
}

TEST(Vxi11, DeviceReadResultIsReadableBeforeItsDataArrived)
{
    expectBothWays(ReadHead{Error::NoError, ReasonEnd, 1000000}, "00 00 00 00 | 00 00 00 04 | 00 0F 42 40");
    EXPECT_EQ(ReadHead::Size, 12u);
}

TEST(Vxi11, DeviceReadStbResult)
{
    expectBothWays(ReadStbResult{Error::NoError, 0x50}, "00 00 00 00 | 00 00 00 50");
    expectBothWays(ReadStbResult{Error::NotSupported, 0}, "00 00 00 08 | 00 00 00 00");
}

TEST(Vxi11, GenericArgumentsHaveTheLockTimeoutBeforeTheIoTimeout)
{
    const GenericCall call{7, FlagWaitLock, /*lockTimeout*/ 0x0A0B, /*ioTimeout*/ 0x0C0D};
    expectBothWays(call, "00 00 00 07 | 00 00 00 01 | 00 00 0A 0B | 00 00 0C 0D");
}

TEST(Vxi11, LockArguments)
{
    expectBothWays(LockCall{-1, FlagWaitLock, 5000}, "FF FF FF FF | 00 00 00 01 | 00 00 13 88");
}

TEST(Vxi11, LinkArgument)
{
    expectBothWays(Link{0x7FFFFFFF}, "7F FF FF FF");
    expectBothWays(Link{-1}, "FF FF FF FF");
}

TEST(Vxi11, ErrorResult)
{
    expectBothWays(ErrorResult{Error::LockedByAnother}, "00 00 00 0B");
    expectBothWays(ErrorResult{static_cast<Error>(99)}, "00 00 00 63");
}

TEST(Vxi11, EnableSrqArguments)
{
    expectBothWays(EnableSrqCall{2, true, bytesOf("link2")},
                   "00 00 00 02 | 00 00 00 01 | 00 00 00 05 'link2' 00 00 00");
    expectBothWays(EnableSrqCall{2, false, {}}, "00 00 00 02 | 00 00 00 00 | 00 00 00 00");
    expectBothWays(EnableSrqCall{2, true, bytesOf("0123456789012345678901234567890123456789")},
                   "00 00 00 02 | 00 00 00 01 | 00 00 00 28 '0123456789012345678901234567890123456789'");
}

TEST(Vxi11, RefusesAHandleOfMoreThanFortyBytes)
{
    const auto bytes =
        hex("00 00 00 02 | 00 00 00 01 | 00 00 00 29 '01234567890123456789012345678901234567890' 00 00 00");
    Reader reader(bytes);
    EnableSrqCall call;
    EXPECT_FALSE(decode(reader, call));
}

TEST(Vxi11, CreateIntrChanArguments)
{
    expectBothWays(RemoteFunc{0x7F000001, 40000, 395185, 1, static_cast<std::uint32_t>(Family::Tcp)},
                   "7F 00 00 01 | 00 00 9C 40 | 00 06 07 B1 | 00 00 00 01 | 00 00 00 00");
    expectBothWays(RemoteFunc{0xC0A80109, 1, 395185, 1, static_cast<std::uint32_t>(Family::Udp)},
                   "C0 A8 01 09 | 00 00 00 01 | 00 06 07 B1 | 00 00 00 01 | 00 00 00 01");
}

TEST(Vxi11, DocmdArguments)
{
    const auto listen = hex("3F 25");
    expectBothWays(DocmdCall{1, 0, 3000, 0, static_cast<std::uint32_t>(Command::SendCommand), true, 1, listen},
                   "00 00 00 01 | 00 00 00 00 | 00 00 0B B8 | 00 00 00 00 | 00 02 00 00 | 00 00 00 01 | 00 00 00 01 | "
                   "00 00 00 02 3F 25 00 00");
    expectBothWays(DocmdCall{1, 1, 2, 3, static_cast<std::uint32_t>(Command::IfcControl), false, -1, {}},
                   "00 00 00 01 | 00 00 00 01 | 00 00 00 02 | 00 00 00 03 | 00 02 00 10 | 00 00 00 00 | FF FF FF FF | "
                   "00 00 00 00");
}

TEST(Vxi11, DocmdResult)
{
    const auto busStatus = hex("00 01");
    expectBothWays(DocmdResult{Error::NoError, busStatus}, "00 00 00 00 | 00 00 00 02 00 01 00 00");
    expectBothWays(DocmdResult{Error::NotSupported, {}}, "00 00 00 08 | 00 00 00 00");
}

TEST(Vxi11, IntrSrqArguments)
{
    expectBothWays(IntrSrqCall{bytesOf("link2")}, "00 00 00 05 'link2' 00 00 00");
}

TEST(Vxi11, DataAndNamesAreViewsOfTheInput)
{
    const auto bytes = hex("00 00 00 03 | 00 00 07 D0 | 00 00 00 00 | 00 00 00 08 | 00 00 00 06 '*IDN?' 0A 00 00");
    Reader reader(bytes);
    WriteCall call;
    ASSERT_TRUE(decode(reader, call));
    EXPECT_EQ(text(call.data), "*IDN?\n");
    EXPECT_EQ(static_cast<const void *>(call.data.data()), bytes.data() + 20);
}

TEST(Vxi11, RefusesLengthsThatTheMessageDoesNotHold)
{
    const auto write = hex("00 00 00 03 | 00 00 07 D0 | 00 00 00 00 | 00 00 00 08 | FF FF FF FF '*IDN?' 0A 00 00");
    Reader writeReader(write);
    WriteCall writeCall;
    EXPECT_FALSE(decode(writeReader, writeCall));
    const auto read = hex("00 00 00 00 | 00 00 00 04 | 7F FF FF FF '1' 0A 00 00");
    Reader readReader(read);
    ReadResult readResult;
    EXPECT_FALSE(decode(readReader, readResult));
    const auto create = hex("00 00 00 01 | 00 00 00 00 | 00 00 00 00 | 00 00 00 09 'inst0' 00 00 00");
    Reader createReader(create);
    CreateLinkCall createCall;
    EXPECT_FALSE(decode(createReader, createCall));
}

// One whole query as it stands on the wire, record marks and RPC headers included.
TEST(Vxi11, WritesAQueryAsItStandsOnTheWire)
{
    const auto record = [](std::uint32_t xid, Procedure procedure, const auto &arguments) {
        std::vector<std::byte> buffer;
        Writer writer(buffer);
        const std::size_t begun = rpc::beginRecord(writer);
        rpc::encode(writer, rpc::Call{xid, CoreProgram, Version, static_cast<std::uint32_t>(procedure)});
        encode(writer, arguments);
        rpc::finishRecord(writer, begun);
        return buffer;
    };
    EXPECT_EQ(record(1, Procedure::CreateLink, CreateLinkCall{0, false, 0, "inst0"}),
              hex("80 00 00 40 | 00 00 00 01 00 00 00 00 00 00 00 02 00 06 07 AF 00 00 00 01 00 00 00 0A |"
                  "00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 |"
                  "00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 05 'inst0' 00 00 00"));
    EXPECT_EQ(record(2, Procedure::DeviceWrite, WriteCall{1, 2000, 0, FlagEnd, bytesOf("*IDN?\n")}),
              hex("80 00 00 44 | 00 00 00 02 00 00 00 00 00 00 00 02 00 06 07 AF 00 00 00 01 00 00 00 0B |"
                  "00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 |"
                  "00 00 00 01 00 00 07 D0 00 00 00 00 00 00 00 08 00 00 00 06 '*IDN?' 0A 00 00"));
    EXPECT_EQ(record(3, Procedure::DestroyLink, Link{1}),
              hex("80 00 00 2C | 00 00 00 03 00 00 00 00 00 00 00 02 00 06 07 AF 00 00 00 01 00 00 00 17 |"
                  "00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 | 00 00 00 01"));
}

RC_GTEST_PROP(Vxi11, ReadsBackTheWritesItWrites,
              (std::int32_t link, std::uint32_t io, std::uint32_t lock, std::uint32_t flags, const std::string &data))
{
    const auto bytes = written(WriteCall{link, io, lock, flags, bytesOf(data)});
    Reader reader(bytes);
    WriteCall call;
    RC_ASSERT(decode(reader, call));
    RC_ASSERT(call.link == link && call.ioTimeout == io && call.lockTimeout == lock && call.flags == flags);
    RC_ASSERT(text(call.data) == data);
    RC_ASSERT(reader.rest().empty());
}

RC_GTEST_PROP(Vxi11, ReadsBackTheReadResultsItWrites,
              (std::int32_t error, std::uint32_t reason, const std::string &data))
{
    const auto bytes = written(ReadResult{static_cast<Error>(error), reason, bytesOf(data)});
    Reader reader(bytes);
    ReadResult result;
    RC_ASSERT(decode(reader, result));
    RC_ASSERT(result.error == static_cast<Error>(error) && result.reason == reason);
    RC_ASSERT(text(result.data) == data);
}

RC_GTEST_PROP(Vxi11, ReadsBackTheLinkCallsItWrites,
              (std::int32_t id, bool lock, std::uint32_t timeout, const std::string &device))
{
    const CreateLinkCall sent{id, lock, timeout, device};
    const auto bytes = written(sent);
    Reader reader(bytes);
    CreateLinkCall call;
    RC_ASSERT(decode(reader, call));
    RC_ASSERT(call == sent);
}
