#include "protocol/simulator/SimulatorFixture.h"

using namespace test;

TEST(ProfileProgram, IsTheInstrumentThatComesWithIt)
{
    const struct {
        const char *name;
        const char *identification;
    } rows[] = {
        {"power-supply", "Oltrava,PV-3303,PV33-02817,2.14\n"},
        {"multimeter", "Oltrava,MM-6510,MM65-00931,1.07\n"},
        {"oscilloscope", "Oltrava,WS-2104,WS21-01406,3.2.1\n"},
    };
    for (const auto &row : rows) {
        SimulatorProcess simulator({"--socket", "0", "--hislip", "0", "--profile", row.name});
        RawClient client(simulator.port("socket"));
        client.send("*IDN?\n");
        EXPECT_EQ(client.receiveLine(), row.identification);
        HislipClient other(simulator.port("hislip"));
        other.sync.send(message("4853 07 00 FFFFFF00", "*IDN?\n"));
        expectMessage(other.sync, "4853 07 00 FFFFFF00", row.identification);
        EXPECT_EQ(simulator.stop(SIGTERM), 0);
    }
}
