// What parameters may be, by the commands that take them.
#include "unit/simulator/InstrumentTest.h"

#include <cstring>

namespace
{

using Parameters = InstrumentTest;

} // namespace

TEST_F(Parameters, TakeNumbersWithUnits)
{
    const struct {
        const char *value;
        const char *volts;
    } rows[] = {
        {"5", "5.000000E+00"},       {"5V", "5.000000E+00"},       {"5 V", "5.000000E+00"},
        {"5000 mV", "5.000000E+00"}, {"5E6UV", "5.000000E+00"},    {".5e1", "5.000000E+00"},
        {"+5.", "5.000000E+00"},     {"0.005 kv", "5.000000E+00"}, {"#H1E", "3.000000E+01"},
        {"#Q36", "3.000000E+01"},    {"#B11110", "3.000000E+01"},  {"MIN", "0.000000E+00"},
        {"maximum", "3.000000E+01"}, {"DEF", "0.000000E+00"},      {"1 E 1", "1.000000E+01"},
        {"-0", "0.000000E+00"},
    };
    for (const auto &row : rows) {
        client.ask(std::string("VOLT ") + row.value);
        const std::string answer = client.ask("VOLT?");
        EXPECT_TRUE(answer == std::string(row.volts) + "\n" || answer == "-" + std::string(row.volts) + "\n")
            << row.value << ": " << answer;
        EXPECT_EQ(client.ask("SYST:ERR?"), "0,\"No error\"\n") << row.value;
    }
}

TEST_F(Parameters, TellTheirLimitsBehindAQuery)
{
    EXPECT_EQ(client.ask("VOLT? MAX;VOLT? MIN;VOLT? DEF;:CURR? MAXIMUM;:SIM:LOAD? DEF"),
              "3.000000E+01;0.000000E+00;0.000000E+00;3.000000E+00;1.000000E+03\n");
    EXPECT_EQ(client.ask("TRIG:COUN? MAX;:SAMP:COUN? MIN;:TRIG:DEL? MAX;:SENS:APER? MIN"),
              "10000;1;3.600000E+03;1.000000E-04\n");
    EXPECT_EQ(client.ask("SAMP:COUN MAX;:SAMP:COUN?;:SAMP:COUN 2.4;:SAMP:COUN?;:SAMP:COUN DEF;:SAMP:COUN?"),
              "10000;2;1\n");
}

TEST_F(Parameters, NameEachError)
{
    const struct {
        const char *message;
        const char *error;
    } rows[] = {
        {"VOLT 31", "-222,\"Data out of range\"\n"},
        {"VOLT -1 MV", "-222,\"Data out of range\"\n"},
        {"VOLT INF", "-222,\"Data out of range;INF\"\n"},
        {"VOLT 1E400", "-222,\"Data out of range\"\n"},
        {"VOLT 1E99999", "-123,\"Exponent too large\"\n"},
        {"VOLT 5 A", "-131,\"Invalid suffix;A\"\n"},
        {"VOLT 5 QV", "-131,\"Invalid suffix;Q\"\n"},
        {"VOLT 5 VVVVVVVVVVVVVV", "-131,\"Invalid suffix;VVVVVVVVVVVVVV\"\n"},
        {"VOLT 'x'", "-158,\"String data not allowed\"\n"},
        {"VOLT #11x", "-168,\"Block data not allowed\"\n"},
        {"VOLT (@1)", "-178,\"Expression data not allowed\"\n"},
        {"VOLT FOO", "-148,\"Character data not allowed;FOO\"\n"},
        {"VOLT? 3", "-128,\"Numeric data not allowed\"\n"},
        {"VOLT? FOO", "-148,\"Character data not allowed;FOO\"\n"},
        {"VOLT? MAX,MIN", "-108,\"Parameter not allowed;VOLT?\"\n"},
        {"VOLT", "-109,\"Missing parameter;VOLT\"\n"},
        {"VOLT 1 2", "-103,\"Invalid separator;VOLT\"\n"},
        {"VOLT 1,", "-109,\"Missing parameter;VOLT\"\n"},
        {"SAMP:COUN 0", "-222,\"Data out of range\"\n"},
        {"SAMP:COUN 0.5", "-222,\"Data out of range\"\n"},
        {"SAMP:COUN 10001", "-222,\"Data out of range\"\n"},
        {"SAMP:COUN 1S", "-138,\"Suffix not allowed;S\"\n"},
        {"OUTP MAYBE", "-224,\"Illegal parameter value;MAYBE\"\n"},
        {"OUTP 1 V", "-138,\"Suffix not allowed;V\"\n"},
        {"OUTP 'ON'", "-158,\"String data not allowed\"\n"},
        {"TRIG:SOUR EXT", "-224,\"Illegal parameter value;EXT\"\n"},
        {"TRIG:SOUR 1", "-128,\"Numeric data not allowed\"\n"},
        {"SOUR3:VOLT 1", "-114,\"Header suffix out of range\"\n"},
        {"OUTP0 ON", "-114,\"Header suffix out of range\"\n"},
        {"SYST2:ERR?", "-114,\"Header suffix out of range;SYST2:ERR?\"\n"},
        {"DISP:TEXT 5", "-128,\"Numeric data not allowed\"\n"},
        {"DISP:TEXT 'open", "-151,\"Invalid string data\"\n"},
        {"DISP:TEXT '12345678901234567890123456789012345678901'", "-223,\"Too much data;40 characters fit\"\n"},
        {"*SRE ON", "-148,\"Character data not allowed;ON\"\n"},
        {"VOLT 5;VOLT \x01", "-109,\"Missing parameter;VOLT\"\n"},
        {"VOLT 5,\x7F", "-101,\"Invalid character;?\"\n"},
    };
    client.ask("VOLT 5");
    for (const auto &row : rows) {
        client.ask(row.message);
        EXPECT_EQ(client.ask("SYST:ERR?;ERR?"),
                  std::string(row.error, std::strlen(row.error) - 1) + ";0,\"No error\"\n")
            << row.message;
        EXPECT_EQ(client.ask("VOLT?"), "5.000000E+00\n") << row.message;
    }
}

TEST_F(Parameters, TakeBooleansInAllSpellings)
{
    for (const char *on : {"ON", "on", "1", "-3", "0.6", "#HFF"}) {
        client.ask(std::string("OUTP OFF;:OUTP ") + on);
        EXPECT_EQ(client.ask("OUTP?"), "1\n") << on;
    }
    for (const char *off : {"OFF", "0", "0.4", "-0.4", "#B0"}) {
        client.ask(std::string("OUTP ON;:OUTP ") + off);
        EXPECT_EQ(client.ask("OUTP?"), "0\n") << off;
    }
}

TEST_F(Parameters, TakeStringsInBothQuotes)
{
    EXPECT_EQ(client.ask("DISP:TEXT?"), "\"\"\n");
    EXPECT_EQ(client.ask("DISP:TEXT 'it''s \"on\"';TEXT?"), "\"it's \"\"on\"\"\"\n");
    EXPECT_EQ(client.ask("DISP:WIND:TEXT:DATA \"a;b,c\nd\";DATA?"), "\"a;b,c\nd\"\n");
    EXPECT_EQ(client.ask("DISP:TEXT:CLE;:DISP:TEXT?"), "\"\"\n");
    EXPECT_EQ(client.ask("DISP:TEXT 'x';*RST;:DISP:TEXT?"), "\"\"\n");
}

TEST_F(Parameters, KeepTheChannelOfTheLastHeader)
{
    client.ask("VOLT 1;:SOUR2:VOLT 2;CURR 0.2;:CURR 0.3");
    EXPECT_EQ(client.ask("SOUR1:VOLT?;CURR?;:SOUR2:VOLT?;CURR?"),
              "1.000000E+00;3.000000E-01;2.000000E+00;2.000000E-01\n");
}

TEST_F(Parameters, TellErrorsAsCodesToo)
{
    client.ask("*CLS;NONSENSE;VOLT 31;VOLT");
    EXPECT_EQ(client.ask("SYST:ERR:COUN?;CODE?;CODE:NEXT?;ALL?"), "3;-113;-222;-109\n");
    EXPECT_EQ(client.ask("SYST:ERR:CODE?;CODE:ALL?;:SYST:ERR:ALL?"), "0;0;0,\"No error\"\n");
}

TEST_F(Parameters, ReportALostErrorAsADeviceError)
{
    client.ask("*CLS");
    for (int i = 0; i < 30; ++i)
        client.ask("NONSENSE");
    EXPECT_EQ(client.ask("*ESR?"), "32\n");
    client.ask("NONSENSE");
    EXPECT_EQ(client.ask("*ESR?"), "40\n") << "the overflow is one itself";
}
