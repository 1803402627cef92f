#pragma once

#include "support/RawClient.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>

namespace test
{

/// A HiSLIP message: @p head is "HS", type, control code and parameter in hexadecimal; the length follows from the payload.
inline std::string message(std::string_view head, std::string_view payload = {})
{
    std::string bytes = fromHex(head);
    EXPECT_EQ(bytes.size(), 8u) << head;
    for (int shift = 56; shift >= 0; shift -= 8)
        bytes += static_cast<char>(static_cast<std::uint64_t>(payload.size()) >> shift);
    return bytes.append(payload);
}

/// Waits for exactly this message.
inline void expectMessage(RawClient &channel, std::string_view head, std::string_view payload = {})
{
    const std::string expected = message(head, payload);
    EXPECT_EQ(channel.receive(expected.size()), expected);
}

/// Waits for a message that begins so; its payload, which may be any text.
inline std::string expectText(RawClient &channel, std::string_view head)
{
    const std::string header = channel.receive(16);
    EXPECT_EQ(header.substr(0, 8), fromHex(head));
    std::size_t length = 0;
    for (std::size_t i = 8; i < header.size(); ++i)
        length = length * 256 + static_cast<unsigned char>(header[i]);
    return channel.receive(length);
}

} // namespace test
