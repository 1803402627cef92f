#pragma once

#include "support/RawClient.h"

#include <gtest/gtest.h>

#include <sys/socket.h>

#include <string>
#include <string_view>

namespace test
{

/// An ONC RPC client that says literal bytes: calls of one program, and what comes back behind the reply's header.
class RpcCaller
{
public:
    /// @param program eight hexadecimal digits
    RpcCaller(std::uint16_t port, std::string_view program) : m_client(port), m_program(program) {}

    /// Calls a procedure (eight digits) of version 1. The results, in hexadecimal digits with a blank behind every four bytes.
    std::string call(std::string_view procedure, std::string_view arguments = {}, std::string_view data = {})
    {
        send(procedure, arguments, data);
        return results();
    }

    /// Sends a call. @p data stands behind the arguments and is padded here.
    void send(std::string_view procedure, std::string_view arguments = {}, std::string_view data = {},
              std::string_view version = "00000001")
    {
        std::string message = fromHex("11223344 00000000 00000002") + fromHex(m_program) + fromHex(version) +
                              fromHex(procedure) + fromHex("00000000 00000000 00000000 00000000") + fromHex(arguments);
        message.append(data);
        message.append((4 - data.size() % 4) % 4, '\0');
        m_client.send(word(0x80000000u | static_cast<std::uint32_t>(message.size())) + message);
    }

    /// Waits for the reply to a call that was accepted and successful.
    std::string results()
    {
        const std::string message = reply();
        constexpr std::size_t HeaderSize = 24;
        EXPECT_EQ(digits(message.substr(0, HeaderSize)), "11223344 00000001 00000000 00000000 00000000 00000000 ");
        return digits(message.size() < HeaderSize ? std::string{} : message.substr(HeaderSize));
    }

    /// Waits for a whole reply, record mark taken off.
    std::string reply()
    {
        const std::string mark = m_client.receive(4);
        if (mark.size() != 4)
            return {};
        EXPECT_NE(mark[0] & '\x80', 0) << "one fragment a reply";
        return m_client.receive(number(mark) & 0x7FFFFFFF);
    }

    RawClient &client() { return m_client; }

    static std::string word(std::uint32_t value)
    {
        std::string bytes;
        for (int shift = 24; shift >= 0; shift -= 8)
            bytes += static_cast<char>(value >> shift);
        return bytes;
    }
    static std::uint32_t number(std::string_view bytes)
    {
        std::uint32_t value = 0;
        for (const char byte : bytes.substr(0, 4))
            value = value << 8 | static_cast<unsigned char>(byte);
        return value;
    }
    static std::string digits(std::string_view bytes)
    {
        constexpr char Digits[] = "0123456789ABCDEF";
        std::string text;
        for (std::size_t i = 0; i < bytes.size(); ++i) {
            text += Digits[static_cast<unsigned char>(bytes[i]) >> 4];
            text += Digits[static_cast<unsigned char>(bytes[i]) & 15];
            if (i % 4 == 3)
                text += ' ';
        }
        return text;
    }

private:
    RawClient m_client;
    std::string m_program;
};

} // namespace test
