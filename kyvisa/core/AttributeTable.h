#pragma once

#include "kyvisa/include/visatype.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

namespace kyvisa
{

/// What has attributes, as bits.
namespace kind
{
constexpr std::uint16_t ResourceManager = 0x0001;
constexpr std::uint16_t Hislip = 0x0002;
constexpr std::uint16_t Vxi11 = 0x0004;
constexpr std::uint16_t Socket = 0x0008;
constexpr std::uint16_t Serial = 0x0010;
constexpr std::uint16_t GpibInstr = 0x0020;
constexpr std::uint16_t GpibIntfc = 0x0040;
constexpr std::uint16_t FindListObject = 0x0080;
constexpr std::uint16_t CompletionEvent = 0x0100;
constexpr std::uint16_t ExceptionEvent = 0x0200;
constexpr std::uint16_t OtherEvent = 0x0400;
} // namespace kind

enum class AttributeType : std::uint8_t { UInt8, Int16, UInt16, Int32, UInt32, UInt64, Text };
enum class Access : std::uint8_t { ReadOnly, ReadWrite };
enum class Scope : std::uint8_t { Local, Global };

/// The longest text attribute, with its NUL.
constexpr std::size_t MaxAttributeText = 256;

/**
 * One attribute: what the standard says about it. A value that may be set lies in [low, high], and where `allowed` is not
 * empty it is one of these as well. Signed values are compared with their sign.
 */
struct AttributeRow {
    ViAttr id;
    AttributeType type;
    Access access;
    Scope scope;
    std::int64_t low;
    std::int64_t high;
    std::int64_t initial;
    std::uint16_t kinds;
    std::array<std::int16_t, 4> allowed{};
    std::uint8_t allowedCount = 0;

    std::size_t width() const; ///< bytes that viGetAttribute() writes; 0 for text
    bool accepts(std::int64_t value) const;
    /// @p state as this attribute's type: 16-bit and 32-bit signed values may come sign-extended or not.
    bool convert(ViAttrState state, std::int64_t &value) const;
};

constexpr std::size_t AttributeCount = 82;

/// All attributes that something in this library has, by ascending id.
std::span<const AttributeRow, AttributeCount> attributeTable();

/// The row, or nullptr for an attribute that none of @p kinds has.
const AttributeRow *findAttribute(ViAttr id, std::uint16_t kinds);

} // namespace kyvisa
