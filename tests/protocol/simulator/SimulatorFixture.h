#pragma once

#include "support/RawClient.h"
#include "support/SimulatorProcess.h"

#include <gtest/gtest.h>

#include <csignal>
#include <string>
#include <string_view>
#include <vector>

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

/// Both channels of a client, initialized.
struct HislipClient {
    explicit HislipClient(std::uint16_t port, std::string_view subAddress = "hislip0") : sync(port), async(port)
    {
        sync.send(message("4853 00 00 0100 5A5A", subAddress));
        const std::string response = sync.receive(16);
        EXPECT_EQ(response.substr(0, 6), fromHex("4853 01 00 0100")) << "synchronized mode, protocol 1.0";
        async.send(fromHex("4853 11 00 0000") + response.substr(6, 2) + fromHex("0000 0000 0000 0000"));
        expectMessage(async, "4853 12 00 0000 5A5A");
    }

    RawClient sync;
    RawClient async;
};

/// A simulator with HiSLIP and raw socket that has to survive the test.
class SimulatorFixture : public testing::Test
{
protected:
    explicit SimulatorFixture(const std::vector<std::string> &options = {"--hislip", "0", "--socket", "0"})
        : simulator(options)
    {
    }

    void TearDown() override
    {
        RawClient last(simulator.port("socket"));
        last.send("*IDN?\n");
        EXPECT_EQ(last.receiveLine().substr(0, 24), "Oltrava,KyVisaSimulator,") << "it still answers others";
        last.close();
        EXPECT_EQ(simulator.stop(SIGTERM), 0);
    }

    std::string ask(std::string_view query)
    {
        RawClient client(simulator.port("socket"));
        client.send(query);
        return client.receiveLine();
    }

    SimulatorProcess simulator;
};

} // namespace test
