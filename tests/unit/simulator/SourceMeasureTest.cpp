#include "unit/simulator/InstrumentTest.h"

#include <cstdlib>

using namespace std::chrono_literals;

namespace
{

class SourceMeasure : public InstrumentTest
{
protected:
    double ask(const std::string &query) { return std::atof(client.ask(query).c_str()); }
};

} // namespace

TEST_F(SourceMeasure, ReadsWhatItDelivers)
{
    client.ask("SIM:LOAD 100;:SOUR:VOLT 5V;CURR 100 mA;:OUTP ON");
    EXPECT_NEAR(ask("MEAS:VOLT?"), 5, 0.01);
    EXPECT_NEAR(ask("MEAS:CURR?"), 0.05, 0.001);
    EXPECT_NEAR(ask("MEAS2:VOLT?"), 0, 0.01) << "the other channel is off";
    client.ask("OUTP OFF");
    EXPECT_NEAR(ask("MEAS:VOLT?"), 0, 0.01);
}

TEST_F(SourceMeasure, ObeysItsCurrentLimit)
{
    client.ask("*CLS;:SIM:LOAD 10;:SOUR:VOLT 5;CURR:LIM 0.1;:OUTP ON");
    EXPECT_NEAR(ask("MEAS:CURR?"), 0.1, 0.001);
    EXPECT_NEAR(ask("MEAS:VOLT?"), 1, 0.01);
    EXPECT_EQ(client.ask("STAT:QUES:COND?;EVEN?;EVEN?"), "1;1;0\n");
    client.ask("SOUR:CURR 1");
    EXPECT_EQ(client.ask("STAT:QUES:COND?"), "0\n");
    EXPECT_NEAR(ask("MEAS:VOLT?"), 5, 0.01);
}

TEST_F(SourceMeasure, SwitchesAProtectedOutputOffAtItsLimit)
{
    client.ask("*CLS;:STAT:QUES:ENAB 2;*SRE 8;:SIM2:LOAD 10;:SOUR2:VOLT 5;CURR 0.1;CURR:PROT ON;:OUTP2 ON");
    EXPECT_EQ(client.ask("OUTP2?;:SOUR2:CURR:PROT:TRIP?;:STAT:QUES:COND?"), "0;1;2\n");
    EXPECT_EQ(client.exchange.poll(), 0x48) << "and asks for service";
    EXPECT_NEAR(ask("MEAS2:CURR?"), 0, 0.001);
    client.ask("OUTP2 ON");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-221,\"Settings conflict;protection has tripped\"\n");
    client.ask("SIM2:LOAD 100;:OUTP2:PROT:CLE;:OUTP2 ON");
    EXPECT_EQ(client.ask("OUTP2?;:SOUR2:CURR:PROT:TRIP?;:STAT:QUES:COND?;:SYST:ERR?"), "1;0;0;0,\"No error\"\n");
    client.ask("SIM2:LOAD 10");
    EXPECT_EQ(client.ask("OUTP2?;:CURR:PROT:TRIP?;:SOUR2:CURR:PROT:TRIP?"), "0;0;1\n") << "the load alone trips it too";
    client.ask("*RST");
    EXPECT_EQ(client.ask("SOUR2:CURR:PROT:TRIP?;:STAT:QUES:COND?"), "0;0\n");
}

TEST_F(SourceMeasure, MakesNoiseThatTheSeedRepeats)
{
    const std::string first = client.ask("MEAS:VOLT?");
    const std::string second = client.ask("MEAS:VOLT?");
    EXPECT_NE(first, second);
    simulator::Instrument again(timers, options());
    TestClient third(again);
    EXPECT_EQ(third.ask("MEAS:VOLT?"), first);
    EXPECT_EQ(third.ask("MEAS:VOLT?"), second);
}

TEST_F(SourceMeasure, TellsItsLimitsAndRefusesMore)
{
    EXPECT_EQ(client.ask("SOUR:VOLT? MAX;VOLT? MIN;VOLT? DEF"), "3.000000E+01;0.000000E+00;0.000000E+00\n");
    client.ask("SOUR:VOLT 31;VOLT 5A;:SOUR3:VOLT 1;:SOUR0:VOLT 1;:OUTP 1V");
    EXPECT_EQ(client.ask("SYST:ERR:ALL?"),
              "-222,\"Data out of range\",-131,\"Invalid suffix;A\",-114,\"Header suffix out of range\","
              "-114,\"Header suffix out of range\",-138,\"Suffix not allowed;V\"\n");
    EXPECT_EQ(client.ask("SOUR:VOLT MAX;VOLT?"), "3.000000E+01\n");
}

TEST_F(SourceMeasure, AcquiresInItsTime)
{
    client.ask("*CLS;:SAMP:COUN 3;:SENS:APER 0.5;:INIT");
    EXPECT_EQ(client.ask("STAT:OPER:COND?"), "16\n");
    client.ask("INIT;:SAMP:COUN 4");
    EXPECT_EQ(client.ask("SYST:ERR:ALL?"), "-213,\"Init ignored\",-221,\"Settings conflict;acquisition under way\"\n");
    EXPECT_EQ(client.ask("FETC?"), "");
    timers.turn(1500ms);
    const std::string readings = client.takeAnswers();
    EXPECT_EQ(std::count(readings.begin(), readings.end(), ','), 2);
    EXPECT_EQ(client.ask("STAT:OPER:COND?"), "0\n");
    EXPECT_EQ(client.ask("FETC?"), readings);
}

TEST_F(SourceMeasure, WaitsForItsTrigger)
{
    client.ask("*CLS;:TRIG:SOUR BUS;:INIT");
    EXPECT_EQ(client.ask("STAT:OPER:COND?"), "32\n");
    client.ask("FETC?");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-214,\"Trigger deadlock\"\n");
    client.exchange.trigger();
    EXPECT_EQ(client.ask("STAT:OPER:COND?"), "16\n");
    timers.turn(1s);
    EXPECT_NE(client.ask("FETC?"), "");
    client.ask("INIT;*TRG;*WAI;*ESE 7");
    timers.turn(1s);
    EXPECT_EQ(client.ask("*ESE?;:SYST:ERR?"), "7;0,\"No error\"\n");
}

TEST_F(SourceMeasure, AbortsAnAcquisition)
{
    client.ask("SENS:APER 1;:INIT;:ABOR");
    EXPECT_EQ(client.ask("STAT:OPER:COND?;*OPC?"), "0;1\n");
    client.ask("FETC?");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-230,\"Data corrupt or stale\"\n");
    timers.turn(2s);
    EXPECT_EQ(client.ask("*OPC?"), "1\n");
}

TEST_F(SourceMeasure, TellsAWaitingClientWhenAnotherOneAborts)
{
    client.ask("SENS:APER 1;:INIT;:FETC?");
    other.ask("ABOR");
    timers.turn();
    EXPECT_EQ(client.takeAnswers(), "");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-230,\"Data corrupt or stale\"\n");
}

TEST_F(SourceMeasure, FollowsItsStateInTheOperationRegister)
{
    client.ask("*CLS;:STAT:PRES;:STAT:OPER:ENAB 16;NTR 16;PTR 0;:INIT");
    EXPECT_EQ(client.ask("STAT:OPER?"), "0\n");
    timers.turn(1s);
    EXPECT_EQ(client.ask("*STB?;:STAT:OPER?"), "128;16\n");
    EXPECT_EQ(client.ask("STAT:PRES;:STAT:OPER:ENAB?;PTR?;NTR?"), "0;32767;0\n");
    client.ask("STAT:OPER:ENAB 65535;:STAT:QUES:ENAB #H8001");
    EXPECT_EQ(client.ask("STAT:OPER:ENAB?;:STAT:QUES:ENAB?"), "32767;1\n");
}
