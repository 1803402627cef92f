#include "unit/simulator/InstrumentTest.h"

using namespace std::chrono_literals;

namespace
{
using Exchange = InstrumentTest;
}

TEST_F(Exchange, IdentifiesItself)
{
    EXPECT_EQ(client.ask("*IDN?\n"), "Oltrava,KyVisaSimulator,4711,1.2.3\n");
}

TEST_F(Exchange, JoinsTheAnswersOfOneMessage)
{
    EXPECT_EQ(client.ask("*ESE?;*SRE?;:SYST:VERS?\n"), "0;0;1999.0\n");
}

TEST_F(Exchange, AnswersEachMessageByItself)
{
    EXPECT_EQ(client.ask("*ESE?\n*SRE?\n"), "0\n0\n");
}

TEST_F(Exchange, AnswersNothingBeforeTheMessageEnds)
{
    client.send("*ESE?;*SRE?");
    EXPECT_EQ(client.takeAnswers(), "");
    client.send("\n");
    EXPECT_EQ(client.takeAnswers(), "0;0\n");
}

TEST_F(Exchange, GoesOnAfterAnErrorInTheMessage)
{
    EXPECT_EQ(client.ask("*ESE?;NONSENSE;*SRE?\n"), "0;0\n");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-113,\"Undefined header;NONSENSE\"\n");
}

TEST_F(Exchange, UnderstandsTheSplitErrorQueryOfAStressTest)
{
    client.send(":syst:err?");
    client.send(";    err?;\t :syst:err?\n");
    EXPECT_EQ(client.takeAnswers(), "0,\"No error\";0,\"No error\";0,\"No error\"\n");
}

TEST_F(Exchange, IsIndependentOfOtherClientsInTheMiddleOfAMessage)
{
    client.send("*ESE 3");
    EXPECT_EQ(other.ask("*IDN?;"), "Oltrava,KyVisaSimulator,4711,1.2.3\n");
    client.send("2\n");
    EXPECT_EQ(other.ask("*ESE?"), "32\n");
}

TEST_F(Exchange, CountsParameters)
{
    client.ask("*ESE;*ESE 1,2;*CLS 1");
    EXPECT_EQ(client.ask("SYST:ERR:ALL?"), "-109,\"Missing parameter;*ESE\",-108,\"Parameter not allowed;*ESE\","
                                           "-108,\"Parameter not allowed;*CLS\"\n");
}

TEST_F(Exchange, RefusesAQueryBehindAnIndefiniteResponse)
{
    EXPECT_EQ(client.ask("*IDN?;*ESE?\n"), "Oltrava,KyVisaSimulator,4711,1.2.3\n");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-440,\"Query UNTERMINATED after indefinite response\"\n");
    EXPECT_EQ(client.ask("*ESR?"), "132\n");
    EXPECT_EQ(client.ask("*ESE?;*IDN?\n"), "0;Oltrava,KyVisaSimulator,4711,1.2.3\n") << "as the last one it is fine";
}

TEST_F(Exchange, ReportsADeadlockWhenTheAnswerGrowsBeyondItsQueue)
{
    std::string message;
    for (int i = 0; i < 40000; ++i)
        message += "*ESE?;";
    EXPECT_EQ(client.ask(message + "*SRE?\n"), "");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-430,\"Query DEADLOCKED\"\n");
    EXPECT_EQ(client.ask("*ESE?"), "0\n");
}

TEST_F(Exchange, ReportsAnInterruptedQuery)
{
    client.ask("*CLS");
    client.exchange.interrupted();
    EXPECT_EQ(client.ask("*ESR?;:SYST:ERR?"), "4;-410,\"Query INTERRUPTED\"\n");
}

TEST_F(Exchange, ReportsAnOverlongMessageAndRecovers)
{
    client.ask("*CLS");
    client.send("*ESE ");
    for (int i = 0; i < 2100; ++i)
        client.send(std::string(1000, ' '));
    client.ask("1\n");
    EXPECT_EQ(client.ask("SYST:ERR?;*ESE?"), "-363,\"Input buffer overrun\";0\n");
}

TEST_F(Exchange, ForgetsHalfAMessageOnDeviceClear)
{
    for (const char *beginning :
         {"*ESE 2", "*ESE 2;", "MMEM:DATA 'x',#9000000100abc", "MMEM:DATA 'x", "*ESE?;SYST:DEL 5;*SRE?\n"}) {
        client.send(beginning);
        client.clear();
        EXPECT_EQ(client.ask("*SRE?\n"), "0\n") << beginning;
    }
    EXPECT_EQ(client.ask("MMEM:CAT?"), "0,3000000\n");
}

TEST_F(Exchange, KeepsSettingsAndStatusOnDeviceClear)
{
    client.ask("*ESE 36;*SRE 32;:SOUR:VOLT 5;NONSENSE");
    client.clear();
    EXPECT_EQ(client.ask("*ESE?;*SRE?;*ESR?;:SOUR:VOLT?;:SYST:ERR:COUN?"), "36;32;160;5.000000E+00;1\n");
}

TEST_F(Exchange, ForgetsThePathAtTheEndOfAMessage)
{
    EXPECT_EQ(client.ask("SYST:ERR?;VERS?\n"), "0,\"No error\";1999.0\n");
    client.ask("VERS?\n");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-113,\"Undefined header;VERS?\"\n");
}

TEST_F(Exchange, HoldsItsClientAndNobodyElseForADelay)
{
    client.send("SYST:DEL 2;*ESE?\n*SRE?\n");
    EXPECT_EQ(client.takeAnswers(), "");
    EXPECT_FALSE(client.exchange.accepting());
    EXPECT_EQ(other.ask("*ESE?"), "0\n");
    timers.turn(1999ms);
    EXPECT_EQ(client.takeAnswers(), "");
    timers.turn(1ms);
    EXPECT_EQ(client.takeAnswers(), "0\n0\n");
}

TEST_F(Exchange, SelfTestsAndPasses)
{
    client.ask("*TST?");
    timers.turn(1s);
    EXPECT_EQ(client.takeAnswers(), "0\n");
}

TEST_F(Exchange, DiesWhileItWaits)
{
    {
        TestClient third(instrument);
        third.send("INIT;*OPC;SYST:DEL 1\n");
        third.send("*IDN?\n");
    }
    timers.turn(10s);
    EXPECT_EQ(client.ask("*ESE?"), "0\n");
}

TEST_F(Exchange, AnswersTheSameHoweverAMessageIsSplit)
{
    const std::string message = "*CLS;:MMEM:DATA 'a\"b',#14x\n;y;:SYST:ERR?;ERR?;*ESE 3;*ESE?;*OPT?\n";
    const std::string answer = client.ask(message);
    EXPECT_EQ(answer, "-257,\"File name error;a\"\"b\";0,\"No error\";3;0\n");
    for (std::size_t at = 0; at <= message.size(); ++at) {
        client.send(message.substr(0, at));
        other.send("*OPC?\n");
        EXPECT_EQ(other.takeAnswers(), "1\n");
        client.send(message.substr(at));
        EXPECT_EQ(client.takeAnswers(), answer) << "split at " << at;
    }
}

TEST_F(Exchange, HasNoEndOnASocket)
{
    TestClient socket(instrument, false);
    socket.send("*ESE?\r\n*SRE?\n*ID");
    EXPECT_EQ(socket.takeAnswers(), "0\n0\n");
    socket.send("N?\n");
    EXPECT_EQ(socket.takeAnswers(), "Oltrava,KyVisaSimulator,4711,1.2.3\n");
    socket.send("MMEM:DATA 'a',#0abc\n*ESE?\n");
    EXPECT_EQ(socket.takeAnswers(), "0\n");
    EXPECT_EQ(client.ask("SYST:ERR?"), "-161,\"Invalid block data\"\n");
}
