#pragma once

#include "unit/simulator/HandTurnedTimers.h"
#include "unit/simulator/TestClient.h"

#include <gtest/gtest.h>

/// An instrument, two clients, and a clock that the test turns.
class InstrumentTest : public testing::Test
{
protected:
    static simulator::InstrumentOptions options()
    {
        simulator::InstrumentOptions result;
        result.identification.firmware = "1.2.3";
        result.identification.serial = "4711";
        result.maxMessage = 2'000'000;
        result.massMemory = 3'000'000;
        return result;
    }

    HandTurnedTimers timers;
    simulator::Instrument instrument{timers, options()};
    TestClient client{instrument};
    TestClient other{instrument};
};
