#pragma once

#include "simulator/fault/FaultSpec.h"

#include <cstddef>
#include <cstdint>

namespace simulator
{

/// A number in a message, most significant byte first. Size 0: there is none.
struct NumberField {
    std::size_t at = 0;
    std::size_t size = 0;
    std::uint64_t mask = UINT64_MAX; ///< the bits that are the number
};

/// How a message says that it is the end of an answer.
enum class EndMark : std::uint8_t {
    None,     ///< it does not
    Byte,     ///< a byte of it says so
    LastByte, ///< it stops with a line feed
};

/// What a fault must know about an outgoing message to damage it in a way that means something on its protocol.
struct MessageForm {
    FaultProtocol protocol;
    bool answer = false;    ///< carries what a program message asked for
    std::size_t header = 0; ///< bytes in front that frame the rest
    NumberField length = {};
    NumberField id = {};
    std::uint32_t idStep = 1; ///< from one message to the next
    std::size_t payloadAt = 0;
    std::size_t payloadSize = 0; ///< of what the instrument answered, without padding
    EndMark end = EndMark::None;
    std::size_t endAt = 0;    ///< of Byte
    std::uint8_t openEnd = 0; ///< what that byte is when the end is missing
};

} // namespace simulator
