#include "unit/simulator/InstrumentTest.h"

using namespace std::chrono_literals;

namespace
{
using CommonCommands = InstrumentTest;
}

TEST_F(CommonCommands, StartWithThePowerOnBit)
{
    EXPECT_EQ(client.ask("*ESR?;*ESR?"), "128;0\n");
    EXPECT_EQ(client.ask("*PSC?;*ESE?;*SRE?;*STB?"), "1;0;0;16\n") << "MAV: there are answers in the queue";
    EXPECT_EQ(client.ask("*STB?"), "0\n");
}

TEST_F(CommonCommands, StartAsPowerOnStatusClearSays)
{
    client.ask("*ESE 128;*SRE 32;*CLS;:VOLT 5;:OUTP ON;:DISP:TEXT 'x';:STAT:QUES:ENAB 1;:MMEM:DATA 'f',#11x;:NONSENSE");
    client.exchange.poll();
    client.serviceRequests.clear();
    other.serviceRequests.clear();
    client.ask("SIM:POW:CYCL");
    EXPECT_EQ(client.serviceRequests, std::vector<std::uint8_t>{}) << "*PSC is 1: the enables are cleared";
    EXPECT_EQ(client.ask("*ESR?;*ESE?;*SRE?;:STAT:QUES:ENAB?;:SYST:ERR?"), "128;0;0;0;0,\"No error\"\n");
    EXPECT_EQ(client.ask("VOLT?;:OUTP?;:DISP:TEXT?;:MMEM:DATA? 'f';*PSC?"), "0.000000E+00;0;\"\";#11x;1\n");

    client.ask("*PSC 0;*ESE 128;*SRE 32");
    client.ask("SIM:POW:CYCL");
    EXPECT_EQ(client.serviceRequests, (std::vector<std::uint8_t>{0x60})) << "it asks for service because it was off";
    EXPECT_EQ(other.serviceRequests.size(), 1u);
    EXPECT_EQ(client.exchange.poll(), 0x60);
    EXPECT_EQ(client.ask("*ESR?;*ESE?;*SRE?;*PSC?"), "128;128;32;0\n");
}

TEST_F(CommonCommands, EndWhatIsPendingWhenThePowerGoes)
{
    client.ask("SENS:APER 60;:INIT");
    EXPECT_EQ(client.ask("*OPC?"), "");
    other.ask("*OPC;:SIM:POW:CYCL");
    timers.turn();
    EXPECT_EQ(client.takeAnswers(), "1\n") << "nothing is pending any more";
    EXPECT_EQ(other.ask("*ESR?;:STAT:OPER:COND?"), "128;0\n") << "and nobody is told that it completed";
}

TEST_F(CommonCommands, RequestServiceAtEachPowerOn)
{
    client.ask("*PSC 0;*ESE 128;*SRE 32");
    EXPECT_EQ(client.serviceRequests.size(), 1u);
    client.exchange.poll();
    client.ask("SIM:POW:CYCL");
    EXPECT_EQ(client.serviceRequests.size(), 2u) << "the bit that nobody has read came anew";
}

TEST_F(CommonCommands, KeepTheirEnables)
{
    EXPECT_EQ(client.ask("*ESE 255;*SRE 255;*ESE?;*SRE?"), "255;191\n") << "bit 6 of *SRE does not count";
    client.ask("*ESE 256;*SRE -1");
    EXPECT_EQ(client.ask("SYST:ERR?;ERR?;*ESE?"), "-222,\"Data out of range\";-222,\"Data out of range\";255\n");
    EXPECT_EQ(client.ask("*PSC 0;*PSC?;*PSC -1;*PSC?"), "0;1\n");
}

TEST_F(CommonCommands, ClearStatusAndKeepEnablesAndFilters)
{
    client.ask("*ESE 1;*SRE 4;:STAT:OPER:ENAB 16;PTR 16;NTR 16;:NONSENSE");
    client.ask("*CLS");
    EXPECT_EQ(client.ask("*ESR?;:SYST:ERR?"), "0;0,\"No error\"\n");
    EXPECT_EQ(client.ask("*ESE?;*SRE?;:STAT:OPER:ENAB?;PTR?;NTR?"), "1;4;16;16;16\n");
}

TEST_F(CommonCommands, TellMasterSummaryWithoutChangingIt)
{
    client.ask("*ESE 32;*SRE 32;NONSENSE");
    EXPECT_EQ(client.ask("*STB?"), "100\n");
    EXPECT_EQ(client.ask("*STB?"), "100\n");
    EXPECT_EQ(client.exchange.poll(), 100) << "and RQS is still there for the serial poll";
    EXPECT_EQ(client.exchange.poll(), 36);
    EXPECT_EQ(client.ask("*STB?"), "100\n");
}

TEST_F(CommonCommands, RequestServiceOnceForEachOperationComplete)
{
    client.ask("*CLS;*ESE 1;*SRE 32");
    client.ask("*OPC");
    EXPECT_EQ(client.serviceRequests, (std::vector<std::uint8_t>{0x60}));
    EXPECT_EQ(client.exchange.poll(), 0x60);
    client.ask("*OPC");
    EXPECT_EQ(client.serviceRequests.size(), 1u) << "the bit was set already";
    EXPECT_EQ(client.ask("*ESR?"), "1\n");
    client.ask("*OPC");
    EXPECT_EQ(client.serviceRequests.size(), 2u);
    EXPECT_EQ(other.serviceRequests.size(), 2u) << "every client has its own; one never polled went with its cause";
}

TEST_F(CommonCommands, TellALateClientNothingOfOldReasons)
{
    client.ask("*ESE 1;*SRE 32;*OPC");
    TestClient late(instrument);
    EXPECT_EQ(late.exchange.poll(), 0x20);
    EXPECT_TRUE(late.serviceRequests.empty());
}

TEST_F(CommonCommands, RequestServiceWhenItIsEnabledLater)
{
    client.ask("*ESE 1;*OPC");
    EXPECT_TRUE(client.serviceRequests.empty());
    client.ask("*SRE 32");
    EXPECT_EQ(client.serviceRequests.size(), 1u);
    client.ask("*SRE 0");
    EXPECT_EQ(client.exchange.poll(), 0x20) << "withdrawn";
}

TEST_F(CommonCommands, RequestServiceForAnErrorInTheQueue)
{
    client.ask("*SRE 4;NONSENSE");
    EXPECT_EQ(client.serviceRequests, (std::vector<std::uint8_t>{0x44}));
}

TEST_F(CommonCommands, SetOperationCompleteWhenWhatIsPendingEnds)
{
    client.ask("*CLS;:SENS:APER 1;:INIT;*OPC");
    EXPECT_EQ(client.ask("*ESR?"), "0\n");
    timers.turn(1s);
    EXPECT_EQ(client.ask("*ESR?"), "1\n");
}

TEST_F(CommonCommands, AnswerOperationCompleteWhenWhatIsPendingEnds)
{
    EXPECT_EQ(client.ask("*OPC?"), "1\n");
    EXPECT_EQ(client.ask("SENS:APER 1;:INIT;*OPC?;*ESE?"), "");
    timers.turn(999ms);
    EXPECT_EQ(client.takeAnswers(), "");
    timers.turn(1ms);
    EXPECT_EQ(client.takeAnswers(), "1;0\n");
}

TEST_F(CommonCommands, WaitForWhatIsPending)
{
    client.ask("SENS:APER 1;:INIT;*WAI;*ESE 1\n");
    EXPECT_EQ(other.ask("*ESE?"), "0\n");
    timers.turn(1s);
    EXPECT_EQ(other.ask("*ESE?"), "1\n");
}

TEST_F(CommonCommands, ForgetOperationCompleteOnClearStatusResetAndDeviceClear)
{
    for (const char *how : {"*CLS", "*RST", ""}) {
        client.ask("*RST;*CLS;:SENS:APER 1;:INIT;*OPC");
        if (*how != '\0')
            client.ask(how);
        else
            client.clear();
        timers.turn(2s);
        EXPECT_EQ(client.ask("*ESR?"), "0\n") << how;
    }
}

TEST_F(CommonCommands, CarryOnBehindAWaitThatADeviceClearEnded)
{
    client.ask("SENS:APER 1;:INIT;*OPC?\n");
    client.clear();
    EXPECT_EQ(client.ask("*ESE?"), "0\n");
    timers.turn(2s);
    EXPECT_EQ(client.takeAnswers(), "");
}

TEST_F(CommonCommands, ResetSettingsButNotStatus)
{
    client.ask("SOUR:VOLT 5;:OUTP ON;:TRIG:SOUR BUS;*ESE 32;*SRE 16;NONSENSE;*RST");
    EXPECT_EQ(client.ask("SOUR:VOLT?;:OUTP?;:TRIG:SOUR?;*ESE?;*SRE?;:SYST:ERR:COUN?"), "0.000000E+00;0;IMM;32;16;1\n");
}

TEST_F(CommonCommands, SaveAndRecallSettings)
{
    client.ask("SOUR2:VOLT 5;:OUTP2 ON;*SAV 3;*RST;*RCL 3");
    EXPECT_EQ(client.ask("SOUR2:VOLT?;:OUTP2?"), "5.000000E+00;1\n");
    client.ask("*RCL 4;*RCL 10;*SAV -1");
    EXPECT_EQ(client.ask("SYST:ERR:ALL?"),
              "-224,\"Illegal parameter value;nothing saved\",-222,\"Data out of range\",-222,\"Data out of range\"\n");
}

TEST_F(CommonCommands, IgnoreATriggerThatNobodyWaitsFor)
{
    client.ask("*TRG");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-211,\"Trigger ignored\"\n");
    client.exchange.trigger();
    EXPECT_EQ(client.ask("SYST:ERR?"), "-211,\"Trigger ignored\"\n");
}
