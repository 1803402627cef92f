#pragma once

#include "protocol/simulator/HislipMessage.h"
#include "support/RawClient.h"
#include "support/SimulatorProcess.h"

#include <gtest/gtest.h>

#include <csignal>
#include <string>
#include <string_view>
#include <vector>

namespace test
{

/// Both channels of a client, initialized.
struct HislipClient {
    explicit HislipClient(std::uint16_t port, std::string_view subAddress = "hislip0",
                          std::string_view mode = "4853 01 00 0100")
        : sync(port), async(port)
    {
        sync.send(message("4853 00 00 0100 5A5A", subAddress));
        const std::string response = sync.receive(16);
        EXPECT_EQ(response.substr(0, 6), fromHex(mode)) << "the mode, protocol 1.0";
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
