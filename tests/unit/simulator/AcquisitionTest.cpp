#include "unit/simulator/InstrumentTest.h"

#include <algorithm>

using namespace std::chrono_literals;

namespace
{

class Acquisition : public InstrumentTest
{
protected:
    Acquisition() { client.ask("*CLS"); }

    std::string condition() { return client.ask("STAT:OPER:COND?"); }
    std::string error() { return client.ask("SYST:ERR?"); }
    std::ptrdiff_t readings()
    {
        const std::string answer = client.ask("FETC?");
        return answer.empty() ? 0 : 1 + std::count(answer.begin(), answer.end(), ',');
    }
};

const char *const NoError = "0,\"No error\"\n";
const char *const Idle = "0\n";
const char *const Measuring = "16\n";
const char *const Waiting = "32\n";

} // namespace

TEST_F(Acquisition, DelaysItsSamplesBehindTheTrigger)
{
    client.ask("TRIG:DEL 2;:SAMP:COUN 4;:SENS:APER 0.5;:INIT;*OPC");
    EXPECT_EQ(condition(), Idle) << "neither waiting nor measuring yet";
    timers.turn(2s);
    EXPECT_EQ(condition(), Measuring);
    timers.turn(1999ms);
    EXPECT_EQ(client.ask("*ESR?"), "0\n");
    timers.turn(1ms);
    EXPECT_EQ(client.ask("*ESR?"), "1\n");
    EXPECT_EQ(readings(), 4);
}

TEST_F(Acquisition, TakesAsManyTriggersAsItsCount)
{
    client.ask("TRIG:SOUR BUS;COUN 3;:SAMP:COUN 2;:INIT;*OPC");
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(condition(), Waiting) << i;
        client.ask("*TRG");
        EXPECT_EQ(condition(), Measuring) << i;
        client.ask("*TRG");
        EXPECT_EQ(error(), "-211,\"Trigger ignored\"\n") << "it is busy with the last one";
        timers.turn(1s);
    }
    EXPECT_EQ(condition(), Idle);
    EXPECT_EQ(client.ask("*ESR?"), "17\n") << "operation complete, and the execution errors";
    EXPECT_EQ(readings(), 6);
}

TEST_F(Acquisition, ObeysTheSourceOfItsTriggers)
{
    client.ask("TRIG:SOUR HOLD;:INIT;*TRG");
    EXPECT_EQ(error(), "-211,\"Trigger ignored\"\n");
    EXPECT_EQ(condition(), Waiting);
    client.ask("TRIG");
    EXPECT_EQ(condition(), Measuring);
    timers.turn(1s);
    client.ask("TRIG:IMM");
    EXPECT_EQ(error(), "-211,\"Trigger ignored\"\n") << "idle";
    client.ask("TRIG:SOUR BUS;:INIT;:TRIG:IMM");
    EXPECT_EQ(condition(), Measuring) << "whatever the source";
    EXPECT_EQ(client.ask("TRIG:SOUR?"), "BUS\n");
}

TEST_F(Acquisition, BeginsAgainAtEachEndWhenContinuous)
{
    client.ask("INIT:CONT ON");
    EXPECT_EQ(client.ask("INIT:CONT?;*OPC?"), "1;1\n") << "no operation to wait for";
    EXPECT_EQ(condition(), Measuring);
    client.ask("FETC?");
    EXPECT_EQ(error(), "-230,\"Data corrupt or stale\"\n");
    timers.turn(100ms);
    EXPECT_EQ(condition(), Measuring);
    EXPECT_EQ(readings(), 1);
    client.ask("INIT;:READ?;:SAMP:COUN 2");
    EXPECT_EQ(client.ask("SYST:ERR:ALL?"),
              "-213,\"Init ignored\",-213,\"Init ignored\",-221,\"Settings conflict;acquisition under way\"\n");
    client.ask("ABOR");
    EXPECT_EQ(condition(), Measuring) << "at once the next one";
    client.ask("INIT:CONT OFF");
    timers.turn(100ms);
    EXPECT_EQ(condition(), Idle);
    EXPECT_EQ(timers.waiting(), 0u);
    client.ask("SAMP:COUN 2;:READ?");
    timers.turn(100ms);
    EXPECT_NE(client.takeAnswers(), "");
    EXPECT_EQ(readings(), 2);
    EXPECT_EQ(error(), NoError);
}

TEST_F(Acquisition, CountsOneThatIsUnderWayToItsEndWhenItBecomesContinuous)
{
    client.ask("SENS:APER 1;:INIT;*OPC;:INIT:CONT ON");
    timers.turn(999ms);
    EXPECT_EQ(client.ask("*ESR?"), "0\n");
    timers.turn(1ms);
    EXPECT_EQ(client.ask("*ESR?"), "1\n");
    EXPECT_EQ(condition(), Measuring);
    client.ask("*RST");
    EXPECT_EQ(client.ask("INIT:CONT?;:STAT:OPER:COND?"), "0;0\n");
}

TEST_F(Acquisition, WaitsContinuouslyForTriggers)
{
    client.ask("TRIG:SOUR BUS;:INIT:CONT ON");
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(condition(), Waiting);
        client.exchange.trigger();
        timers.turn(1s);
        EXPECT_EQ(readings(), 1);
    }
    client.ask("INIT:CONT OFF;:ABOR");
    EXPECT_EQ(condition(), Idle);
}

TEST_F(Acquisition, RefusesMoreReadingsThanItHasRoomFor)
{
    client.ask("TRIG:COUN 101;:SAMP:COUN 100;:INIT");
    EXPECT_EQ(error(), "-221,\"Settings conflict;too many readings\"\n");
    client.ask("INIT:CONT ON");
    EXPECT_EQ(client.ask("SYST:ERR?;:INIT:CONT?"), "-221,\"Settings conflict;too many readings\";0\n");
    client.ask("TRIG:COUN 100;:SENS:APER MIN;:INIT");
    timers.turn(1s);
    EXPECT_EQ(readings(), 10000);
}

TEST_F(Acquisition, RefusesToWaitForATriggerThatCannotCome)
{
    client.ask("TRIG:SOUR BUS;COUN 2;:READ?;:INIT;:FETC?");
    client.ask("*TRG;:FETC?");
    EXPECT_EQ(client.ask("SYST:ERR:CODE:ALL?"), "-214,-214,-214\n")
        << "the second trigger would have to come from the same client";
    timers.turn(1s);
    client.ask("*TRG;:FETC?");
    timers.turn(1s);
    EXPECT_NE(client.takeAnswers(), "");
    EXPECT_EQ(error(), NoError);
}

TEST_F(Acquisition, ForgetsReadingsThatWereTakenWithOtherSettings)
{
    for (const char *change : {"SAMP:COUN 2", "*RST"}) {
        client.ask("INIT");
        timers.turn(1s);
        EXPECT_GT(readings(), 0);
        client.ask(change);
        client.ask("FETC?");
        EXPECT_EQ(error(), "-230,\"Data corrupt or stale\"\n") << change;
    }
}

TEST_F(Acquisition, RefusesATriggerInsideAProgramMessage)
{
    client.ask("TRIG:SOUR BUS;:INIT");
    client.send("*ESE");
    client.exchange.trigger();
    EXPECT_EQ(other.ask("SYST:ERR?;:STAT:OPER:COND?"), "-105,\"GET not allowed\";32\n");
    EXPECT_EQ(client.ask(" 7\n*ESE?\n"), "7\n") << "and the message goes on";
}

TEST_F(Acquisition, IsLearntAndSetAgain)
{
    client.ask("SOUR2:VOLT 2.5;CURR 1;CURR:PROT ON;:OUTP2 ON;:TRIG:SOUR BUS;DEL 3;COUN 4;:SAMP:COUN 5;:SENS:APER 6");
    const std::string learnt = client.ask("*LRN?");
    EXPECT_EQ(learnt, "*RST;:SOUR1:VOLT 0.000000E+00;CURR 1.000000E-01;CURR:PROT 0;:OUTP1 0;"
                      ":SOUR2:VOLT 2.500000E+00;CURR 1.000000E+00;CURR:PROT 1;:OUTP2 1;"
                      ":TRIG:SOUR BUS;DEL 3.000000E+00;COUN 4;:SAMP:COUN 5;:SENS:APER 6.000000E+00;:INIT:CONT 0\n");
    client.ask("*RST");
    EXPECT_NE(client.ask("*LRN?"), learnt);
    client.ask(learnt);
    EXPECT_EQ(client.ask("*LRN?"), learnt);
    EXPECT_EQ(error(), NoError);
}
