#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

/**
 * HiSLIP (IVI-6.1) messages: numbers and the 16-byte header. No I/O, no allocation.
 *
 * A message is the header, all fields big-endian, followed by the payload:
 *
 *     0 'H' 'S' | 2 type u8 | 3 control code u8 | 4 message parameter u32 | 8 payload length u64 | 16 payload
 */
namespace wire::hislip
{

constexpr std::uint16_t DefaultPort = 4880;
constexpr std::size_t HeaderSize = 16;
constexpr std::size_t MaxSubAddress = 256;
constexpr std::size_t MaxLockString = 256;

constexpr std::uint32_t FirstMessageId =
    0xFFFFFF00u; ///< of the first Data, DataEND or Trigger after initialize or clear
constexpr std::uint32_t NothingSentId = 0xFFFFFEFEu;    ///< "no message yet" where an id of a sent message is asked for
constexpr std::uint32_t UnknownMessageId = 0xFFFFFFFFu; ///< a Data message of a response may carry it
constexpr std::uint16_t Version1 = 0x0100;              ///< protocol 1.0: major byte, minor byte

enum class MessageType : std::uint8_t {
    Initialize = 0,
    InitializeResponse = 1,
    FatalError = 2,
    Error = 3,
    AsyncLock = 4,
    AsyncLockResponse = 5,
    Data = 6,
    DataEnd = 7,
    DeviceClearComplete = 8,
    DeviceClearAcknowledge = 9,
    AsyncRemoteLocalControl = 10,
    AsyncRemoteLocalResponse = 11,
    Trigger = 12,
    Interrupted = 13,
    AsyncInterrupted = 14,
    AsyncMaximumMessageSize = 15,
    AsyncMaximumMessageSizeResponse = 16,
    AsyncInitialize = 17,
    AsyncInitializeResponse = 18,
    AsyncDeviceClear = 19,
    AsyncServiceRequest = 20,
    AsyncStatusQuery = 21,
    AsyncStatusResponse = 22,
    AsyncDeviceClearAcknowledge = 23,
    AsyncLockInfo = 24,
    AsyncLockInfoResponse = 25,
};

enum class FatalErrorCode : std::uint8_t {
    Unidentified = 0,
    BadHeader = 1,
    ChannelsNotEstablished = 2,
    BadInitialization = 3,
    MaximumClients = 4,
    SecureConnectionFailed = 5,
};

enum class ErrorCode : std::uint8_t {
    Unidentified = 0,
    UnknownMessageType = 1,
    UnknownControlCode = 2,
    UnknownVendorMessage = 3,
    MessageTooLarge = 4,
    AuthenticationFailed = 5,
};

/// One header. Unknown types are kept as numbers: the receiver decides what to do with them.
struct Header {
    MessageType type = MessageType::Initialize;
    std::uint8_t control = 0;
    std::uint32_t parameter = 0;
    std::uint64_t payloadLength = 0;

    bool operator==(const Header &) const = default;
};

std::array<std::byte, HeaderSize> encode(const Header &header);

/// Decodes 16 bytes. False when they do not start with "HS"; @p header is unchanged then.
bool decode(std::span<const std::byte, HeaderSize> bytes, Header &header);

/// Parameter of Initialize: client protocol version in the high 16 bits, vendor id (two ASCII letters) in the low 16.
constexpr std::uint32_t initializeParameter(std::uint16_t version, std::uint16_t vendor)
{
    return std::uint32_t{version} << 16 | vendor;
}

/// Big-endian 64-bit payload of the two maximum message size messages.
std::array<std::byte, 8> encodeSize(std::uint64_t size);
std::uint64_t decodeSize(std::span<const std::byte, 8> bytes);

} // namespace wire::hislip
