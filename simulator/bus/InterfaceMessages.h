#pragma once

#include <cstdint>

/// The multiline interface messages of IEEE 488.1: bytes that say something while ATN is true. Bit 7 does not count.
namespace simulator::bus
{

// Addressed commands: for the instruments that are addressed to listen.
constexpr std::uint8_t GoToLocal = 0x01;
constexpr std::uint8_t SelectedDeviceClear = 0x04;
constexpr std::uint8_t GroupExecuteTrigger = 0x08;
constexpr std::uint8_t TakeControl = 0x09; ///< for the one that is addressed to talk

// Universal commands: for all.
constexpr std::uint8_t LocalLockout = 0x11;
constexpr std::uint8_t DeviceClear = 0x14;
constexpr std::uint8_t SerialPollEnable = 0x18;
constexpr std::uint8_t SerialPollDisable = 0x19;

// Groups: the low five bits are an address.
constexpr std::uint8_t ListenGroup = 0x20;
constexpr std::uint8_t TalkGroup = 0x40;
constexpr std::uint8_t SecondaryGroup = 0x60;
constexpr std::uint8_t GroupMask = 0x60;
constexpr std::uint8_t AddressMask = 0x1F;

constexpr std::uint8_t Unlisten = ListenGroup | AddressMask;
constexpr std::uint8_t Untalk = TalkGroup | AddressMask;

constexpr std::uint8_t listen(std::uint8_t address)
{
    return ListenGroup | address;
}
constexpr std::uint8_t talk(std::uint8_t address)
{
    return TalkGroup | address;
}
constexpr std::uint8_t secondary(std::uint8_t address)
{
    return SecondaryGroup | address;
}

} // namespace simulator::bus
