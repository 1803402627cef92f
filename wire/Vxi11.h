#pragma once

#include "wire/Xdr.h"

#include <cstdint>
#include <string_view>

/**
 * VXI-11: arguments and results of the calls on its three channels, behind the RPC headers of wire/Rpc.h.
 *
 * Core and abort channel are served by the instrument, the interrupt channel by the controller: the instrument connects back and calls
 * DeviceIntrSrq, which is never answered. Every field of a result is on the wire also when its error is not NoError.
 *
 * Data, strings and handles in a decoded structure are views of the bytes that were decoded.
 */
namespace wire::vxi11
{

constexpr std::uint32_t CoreProgram = 0x0607AF;
constexpr std::uint32_t AbortProgram = 0x0607B0;
constexpr std::uint32_t InterruptProgram = 0x0607B1;
constexpr std::uint32_t Version = 1; ///< of all three

constexpr std::size_t MaxHandle = 40;          ///< bytes that EnableSrq may carry
constexpr std::uint32_t MinMaxRecvSize = 1024; ///< what every instrument takes in one write

/// Numbers on the core channel.
enum class Procedure : std::uint32_t {
    CreateLink = 10,
    DeviceWrite = 11,
    DeviceRead = 12,
    DeviceReadStb = 13,
    DeviceTrigger = 14,
    DeviceClear = 15,
    DeviceRemote = 16,
    DeviceLocal = 17,
    DeviceLock = 18,
    DeviceUnlock = 19,
    DeviceEnableSrq = 20,
    DeviceDocmd = 22,
    DestroyLink = 23,
    CreateIntrChan = 25,
    DestroyIntrChan = 26,
};

constexpr std::uint32_t DeviceAbort = 1;    ///< on the abort channel: a Link, answered by an ErrorResult
constexpr std::uint32_t DeviceIntrSrq = 30; ///< on the interrupt channel: an IntrSrqCall, not answered

enum class Error : std::int32_t {
    NoError = 0,
    Syntax = 1,
    NotAccessible = 3,
    InvalidLink = 4,
    Parameter = 5,
    ChannelNotEstablished = 6,
    NotSupported = 8,
    OutOfResources = 9,
    LockedByAnother = 11,
    NoLockHeld = 12,
    IoTimeout = 15,
    IoError = 17,
    InvalidAddress = 21,
    Abort = 23,
    ChannelEstablished = 29,
};

/// Bits of the flags of a call.
constexpr std::uint32_t FlagWaitLock = 0x01;
constexpr std::uint32_t FlagEnd = 0x08;         ///< write: END with the last byte
constexpr std::uint32_t FlagTermCharSet = 0x80; ///< read: stop at the termination character

/// Bits of the reason why a read ended. None with NoError: the instrument's buffer was full, read again.
constexpr std::uint32_t ReasonRequestCount = 1;
constexpr std::uint32_t ReasonCharacter = 2;
constexpr std::uint32_t ReasonEnd = 4;

/// Values of DocmdCall::command.
enum class Command : std::uint32_t {
    SendCommand = 0x020000,
    BusStatus = 0x020001,
    AtnControl = 0x020002,
    RenControl = 0x020003,
    PassControl = 0x020004,
    BusAddress = 0x02000A,
    IfcControl = 0x020010,
};

/// Chosen by the instrument: zero and negative numbers are links as well. Times are in milliseconds.
using LinkId = std::int32_t;

struct Link { // DestroyLink, DeviceUnlock, DeviceAbort
    LinkId link = 0;
    bool operator==(const Link &) const = default;
};

struct ErrorResult { // of all procedures without a result of their own
    Error error = Error::NoError;
    bool operator==(const ErrorResult &) const = default;
};

struct CreateLinkCall {
    std::int32_t clientId = 0;
    bool lockDevice = false;
    std::uint32_t lockTimeout = 0;
    std::string_view device;
    bool operator==(const CreateLinkCall &) const = default;
};

struct CreateLinkResult {
    Error error = Error::NoError;
    LinkId link = 0;
    std::uint16_t abortPort = 0; ///< 0: no abort channel; a number that is no port reads as 0
    std::uint32_t maxRecvSize = 0;
    bool operator==(const CreateLinkResult &) const = default;
};

struct WriteCall {
    LinkId link = 0;
    std::uint32_t ioTimeout = 0;
    std::uint32_t lockTimeout = 0;
    std::uint32_t flags = 0;
    xdr::Bytes data;
};

struct WriteResult {
    Error error = Error::NoError;
    std::uint32_t size = 0; ///< bytes taken, also when a time-out or an abort cut the call short
    bool operator==(const WriteResult &) const = default;
};

struct ReadCall {
    LinkId link = 0;
    std::uint32_t requestSize = 0;
    std::uint32_t ioTimeout = 0;
    std::uint32_t lockTimeout = 0;
    std::uint32_t flags = 0;
    std::uint8_t termChar = 0;
    bool operator==(const ReadCall &) const = default;
};

struct ReadResult {
    Error error = Error::NoError;
    std::uint32_t reason = 0;
    xdr::Bytes data;
};

/// The part of ReadResult before the data: enough to receive the data straight into its place.
struct ReadHead {
    static constexpr std::size_t Size = 12;
    Error error = Error::NoError;
    std::uint32_t reason = 0;
    std::uint32_t length = 0;
    bool operator==(const ReadHead &) const = default;
};

struct ReadStbResult {
    Error error = Error::NoError;
    std::uint8_t statusByte = 0;
    bool operator==(const ReadStbResult &) const = default;
};

/// DeviceReadStb, DeviceTrigger, DeviceClear, DeviceRemote, DeviceLocal.
struct GenericCall {
    LinkId link = 0;
    std::uint32_t flags = 0;
    std::uint32_t lockTimeout = 0; ///< before the I/O time-out here, after it in the calls with data
    std::uint32_t ioTimeout = 0;
    bool operator==(const GenericCall &) const = default;
};

struct LockCall {
    LinkId link = 0;
    std::uint32_t flags = 0;
    std::uint32_t lockTimeout = 0;
    bool operator==(const LockCall &) const = default;
};

struct EnableSrqCall {
    LinkId link = 0;
    bool enable = false;
    xdr::Bytes handle; ///< at most MaxHandle bytes; comes back in DeviceIntrSrq
};

enum class Family : std::uint32_t { Tcp = 0, Udp = 1 };

/// CreateIntrChan: where the controller listens.
struct RemoteFunc {
    std::uint32_t hostAddress = 0; ///< IPv4, 127.0.0.1 is 0x7F000001
    std::uint32_t hostPort = 0;
    std::uint32_t program = InterruptProgram;
    std::uint32_t version = Version;
    std::uint32_t family = static_cast<std::uint32_t>(Family::Tcp);
    bool operator==(const RemoteFunc &) const = default;
};

struct DocmdCall {
    LinkId link = 0;
    std::uint32_t flags = 0;
    std::uint32_t ioTimeout = 0;
    std::uint32_t lockTimeout = 0;
    std::uint32_t command = 0;
    bool networkOrder = true;  ///< elements of the data are big-endian
    std::int32_t dataSize = 0; ///< bytes of one element
    xdr::Bytes data;
};

struct DocmdResult {
    Error error = Error::NoError;
    xdr::Bytes data;
};

struct IntrSrqCall {
    xdr::Bytes handle;
};

void encode(xdr::Writer &writer, const Link &value);
void encode(xdr::Writer &writer, const ErrorResult &value);
void encode(xdr::Writer &writer, const CreateLinkCall &value);
void encode(xdr::Writer &writer, const CreateLinkResult &value);
void encode(xdr::Writer &writer, const WriteCall &value);
void encode(xdr::Writer &writer, const WriteResult &value);
void encode(xdr::Writer &writer, const ReadCall &value);
void encode(xdr::Writer &writer, const ReadResult &value);
void encode(xdr::Writer &writer, const ReadHead &value);
void encode(xdr::Writer &writer, const ReadStbResult &value);
void encode(xdr::Writer &writer, const GenericCall &value);
void encode(xdr::Writer &writer, const LockCall &value);
void encode(xdr::Writer &writer, const EnableSrqCall &value);
void encode(xdr::Writer &writer, const RemoteFunc &value);
void encode(xdr::Writer &writer, const DocmdCall &value);
void encode(xdr::Writer &writer, const DocmdResult &value);
void encode(xdr::Writer &writer, const IntrSrqCall &value);

/// WriteCall without its data: the caller sends data and padding (xdr::padding) behind it.
void encodeHead(xdr::Writer &writer, const WriteCall &value);

// False when the input is too short or a length is out of bounds. What follows the structure stays in the reader.
[[nodiscard]] bool decode(xdr::Reader &reader, Link &value);
[[nodiscard]] bool decode(xdr::Reader &reader, ErrorResult &value);
[[nodiscard]] bool decode(xdr::Reader &reader, CreateLinkCall &value);
[[nodiscard]] bool decode(xdr::Reader &reader, CreateLinkResult &value);
[[nodiscard]] bool decode(xdr::Reader &reader, WriteCall &value);
[[nodiscard]] bool decode(xdr::Reader &reader, WriteResult &value);
[[nodiscard]] bool decode(xdr::Reader &reader, ReadCall &value);
[[nodiscard]] bool decode(xdr::Reader &reader, ReadResult &value);
[[nodiscard]] bool decode(xdr::Reader &reader, ReadHead &value);
[[nodiscard]] bool decode(xdr::Reader &reader, ReadStbResult &value);
[[nodiscard]] bool decode(xdr::Reader &reader, GenericCall &value);
[[nodiscard]] bool decode(xdr::Reader &reader, LockCall &value);
[[nodiscard]] bool decode(xdr::Reader &reader, EnableSrqCall &value);
[[nodiscard]] bool decode(xdr::Reader &reader, RemoteFunc &value);
[[nodiscard]] bool decode(xdr::Reader &reader, DocmdCall &value);
[[nodiscard]] bool decode(xdr::Reader &reader, DocmdResult &value);
[[nodiscard]] bool decode(xdr::Reader &reader, IntrSrqCall &value);

} // namespace wire::vxi11
