#include "unit/simulator/HandTurnedTimers.h"
#include "unit/simulator/TestClient.h"

#include "simulator/profile/NumberText.h"
#include "simulator/profile/ProfileFile.h"
#include "simulator/profile/ProfileModel.h"
#include "simulator/profile/ProfileReader.h"

#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <memory>
#include <optional>
#include <string>

using namespace simulator;
using namespace std::chrono_literals;

namespace
{

/// The value of a formula in which a is 2, b is 3 and noise has the deviation 10.
double valueOf(std::string_view text)
{
    const Expression expression(text, [](std::string_view name) -> std::size_t {
        if (name == "a" || name == "b")
            return name == "a" ? 2 : 3;
        throw ExpressionError("unknown");
    });
    return expression.value({[](std::size_t index) { return static_cast<double>(index); }, [] { return 10.0; }});
}

TEST(ProfileExpression, FollowsTheRulesOfArithmetic)
{
    EXPECT_EQ(valueOf("1 + 2 * 3"), 7);
    EXPECT_EQ(valueOf("(1 + 2) * 3"), 9);
    EXPECT_EQ(valueOf("7 - 2 - 1"), 4);
    EXPECT_EQ(valueOf("8 / 4 / 2"), 1);
    EXPECT_EQ(valueOf("-a + b"), 1);
    EXPECT_EQ(valueOf("a * -b"), -6);
    EXPECT_EQ(valueOf("--a"), 2);
    EXPECT_EQ(valueOf("1.5e1+.5"), 15.5);
    EXPECT_EQ(valueOf("min(a, b, 1) + max(a, b, 1)"), 4);
    EXPECT_EQ(valueOf("min(5)"), 5);
    EXPECT_EQ(valueOf("abs(a - b)"), 1);
    EXPECT_EQ(valueOf("a + noise(0.5)"), 7);
    EXPECT_EQ(valueOf("\t1 "), 1);
    EXPECT_TRUE(std::isinf(valueOf("1 / 0")));
    EXPECT_TRUE(std::isnan(valueOf("0 / 0")));
}

TEST(ProfileExpression, IsBounded)
{
    EXPECT_THROW(valueOf(std::string(1001, ' ')), ExpressionError);
    EXPECT_THROW(valueOf(std::string(33, '(') + "1" + std::string(33, ')')), ExpressionError);
    EXPECT_EQ(valueOf(std::string(31, '(') + "1" + std::string(31, ')')), 1);
    EXPECT_THROW(valueOf(std::string(40, '-') + "1"), ExpressionError);
    EXPECT_THROW(valueOf("1e9999"), ExpressionError);
}

TEST(ProfileNumber, IsWrittenInItsStyle)
{
    using Form = NumberStyle::Form;
    EXPECT_EQ(numberText(12.6, {Form::Nr1, 7}), "13");
    EXPECT_EQ(numberText(-0.0, {Form::Nr1, 7}), "0");
    EXPECT_EQ(numberText(1.25, {Form::Nr2, 1}), "1.2");
    EXPECT_EQ(numberText(1.25, {Form::Nr2, 0}), "1");
    EXPECT_EQ(numberText(-0.0, {Form::Nr2, 2}), "0.00");
    EXPECT_EQ(numberText(1234.5, {Form::Nr3, 3}), "1.23E+03");
    EXPECT_EQ(numberText(0, {Form::Nr3, 1}), "0E+00");
    EXPECT_EQ(numberText(1e300, {Form::Nr1, 2}), "1.0E+300") << "too large for its style";
    EXPECT_EQ(numberText(std::nan(""), {}), "9.91E37");
    EXPECT_EQ(numberText(-INFINITY, {Form::Nr2, 2}), "-9.9E37");
}

/// An instrument made of a profile.
class Profiled : public testing::Test
{
protected:
    void make(std::string_view text)
    {
        client.reset();
        const Profile profile = readProfile(text);
        InstrumentOptions options;
        options.massMemory = 10'000'000;
        options.maxMessage = 100'000;
        applyProfile(profile, options);
        instrument = std::make_unique<Instrument>(timers, options);
        installProfile(profile, *instrument);
        client.emplace(*instrument);
    }
    std::string ask(std::string_view message) { return client->ask(message); }
    std::string error() { return ask("SYST:ERR?\n"); }

    HandTurnedTimers timers;
    std::unique_ptr<Instrument> instrument;
    std::optional<TestClient> client;
};

constexpr const char *NoError = "0,\"No error\"\n";

TEST_F(Profiled, IdentifiesItself)
{
    make(R"({"identification": {"manufacturer": "Oltrava", "model": "X-1", "serial": "7", "firmware": "0.9"}})");
    EXPECT_EQ(ask("*IDN?\n"), "Oltrava,X-1,7,0.9\n");
    make(R"({"identification": {"model": "X-2"}})");
    EXPECT_EQ(ask("*IDN?\n"), "Oltrava,X-2,100001,0\n") << "what is not given stays";
}

TEST_F(Profiled, HasSettingsThatStickAndKnowTheirLimits)
{
    make(R"({"settings": [{"name": "v", "header": "LEVel[:VALue]", "unit": "V", "default": 1, "min": -2, "max": 5}]})");
    EXPECT_EQ(ask("LEV?\n"), "1.000000E+00\n");
    EXPECT_EQ(ask("LEVel:VALue 2500 MV;VAL?\n"), "2.500000E+00\n");
    EXPECT_EQ(ask("LEV? MIN;LEV? MAX;LEV? DEF\n"), "-2.000000E+00;5.000000E+00;1.000000E+00\n");
    EXPECT_EQ(ask("LEV MAX;LEV?\n"), "5.000000E+00\n");
    EXPECT_EQ(error(), NoError);
    ask("LEV 5.01\n");
    EXPECT_EQ(error(), "-222,\"Data out of range\"\n");
    ask("LEV 1 A\n");
    EXPECT_EQ(error(), "-131,\"Invalid suffix;A\"\n");
    ask("LEV\n");
    EXPECT_EQ(error(), "-109,\"Missing parameter;LEV\"\n");
    EXPECT_EQ(ask("LEV?\n"), "5.000000E+00\n") << "none of these changed it";
    ask("*SAV 3;*RST\n");
    EXPECT_EQ(ask("LEV?\n"), "1.000000E+00\n");
    ask("*RCL 3\n");
    EXPECT_EQ(ask("LEV?\n"), "5.000000E+00\n");
}

TEST_F(Profiled, HasSettingsOfEachType)
{
    make(R"({"settings": [
        {"name": "n", "header": "COUNt", "type": "integer", "default": 3, "min": 1, "max": 9},
        {"name": "on", "header": "SWITch", "type": "boolean", "default": false},
        {"name": "shape", "header": "SHAPe", "type": "choice", "choices": ["SINusoid", "SQUare"], "default": "SQUare"}
    ]})");
    EXPECT_EQ(ask("COUN 4.4;COUN?;:SWIT ON;SWIT?;:SHAP?;SHAP sin;SHAP?\n"), "4;1;SQU;SIN\n");
    EXPECT_EQ(error(), NoError);
    ask("SHAP TRI\n");
    EXPECT_EQ(error(), "-224,\"Illegal parameter value;TRI\"\n");
    EXPECT_EQ(ask("*RST;COUN?;SWIT?;SHAP?\n"), "3;0;SQU\n");
}

TEST_F(Profiled, HasChannels)
{
    make(
        R"({"settings": [{"name": "v", "header": "SOURce#:LEVel", "channels": 2, "default": 0, "min": 0, "max": 9, "style": "NR1"}],
             "source-measure": false,
             "commands": [{"header": "MEASure#?", "channels": 2, "answer": {"compute": "v * 2", "style": "NR1"}}]})");
    EXPECT_EQ(ask("SOUR:LEV 3;:SOUR2:LEV 4;:SOUR1:LEV?;:SOUR2:LEV?;:MEAS?;:MEAS2?\n"), "3;4;6;8\n");
    EXPECT_EQ(error(), NoError);
    ask("SOUR3:LEV 1\n");
    EXPECT_EQ(error(), "-114,\"Header suffix out of range\"\n");
    ask("MEAS0?\n");
    EXPECT_EQ(error(), "-114,\"Header suffix out of range\"\n");
}

TEST_F(Profiled, LearnsItsSettings)
{
    make(R"({"source-measure": false, "settings": [
        {"name": "v", "header": "SOURce#:LEVel[:NOW]", "channels": 2, "default": 0, "min": 0, "max": 9},
        {"name": "f", "header": "FORMat", "type": "choice", "choices": ["BYTE", "REAL"], "default": "BYTE"}]})");
    ask("SOUR2:LEV 4.5;:FORM REAL\n");
    const std::string learnt = ask("*LRN?\n");
    EXPECT_EQ(learnt, "*RST;:SOURce1:LEVel 0;:SOURce2:LEVel 4.5;:FORMat REAL\n");
    ask("*RST\n");
    ask(learnt);
    EXPECT_EQ(ask("SOUR2:LEV?;:FORM?\n"), "4.500000E+00;REAL\n");
    EXPECT_EQ(error(), NoError);
}

TEST_F(Profiled, AnswersByEachKind)
{
    make(R"({"settings": [{"name": "r", "header": "LOAD", "default": 10, "min": 0, "max": 99}], "commands": [
        {"header": "FIXed?", "answer": "ready, steady"},
        {"header": "LIST?", "answer": {"list": ["A", "B"]}},
        {"header": "TURN?", "answer": {"counter": {"start": 5, "step": -2}}},
        {"header": "CALCulate?", "answer": {"compute": "100 / r", "style": "NR2", "digits": 1}}]})");
    EXPECT_EQ(ask("FIX?\n"), "ready, steady\n");
    EXPECT_EQ(ask("LIST?;LIST?;LIST?\n"), "A;B;A\n");
    EXPECT_EQ(ask("TURN?;TURN?;TURN?\n"), "5;3;1\n");
    EXPECT_EQ(ask("CALC?;:LOAD 40;CALC?;:LOAD 0;CALC?\n"), "10.0;2.5;9.9E37\n");
    EXPECT_EQ(error(), NoError);
}

TEST_F(Profiled, AnswersAtRandomAndTheSameWithTheSameSeed)
{
    constexpr const char *Text =
        R"({"commands": [{"header": "DICE?", "answer": {"random": {"min": 1, "max": 7}, "style": "NR2", "digits": 3}}]})";
    make(Text);
    std::string first;
    for (int i = 0; i < 20; ++i) {
        const std::string answer = ask("DICE?\n");
        EXPECT_GE(std::stod(answer), 1);
        EXPECT_LE(std::stod(answer), 7);
        first += answer;
    }
    make(Text);
    std::string second;
    for (int i = 0; i < 20; ++i)
        second += ask("DICE?\n");
    EXPECT_EQ(first, second);
    EXPECT_NE(first.substr(0, 6), first.substr(6, 6));
}

TEST_F(Profiled, AnswersWithNoise)
{
    make(R"j({"commands": [{"header": "NOISe?", "answer": {"compute": "5 + noise(0.1)", "digits": 9}}]})j");
    double sum = 0;
    double squares = 0;
    constexpr int Readings = 2000;
    for (int i = 0; i < Readings; ++i) {
        const double off = std::stod(ask("NOIS?\n")) - 5;
        sum += off;
        squares += off * off;
    }
    EXPECT_NEAR(sum / Readings, 0, 0.02);
    EXPECT_NEAR(std::sqrt(squares / Readings), 0.1, 0.02);
}

TEST_F(Profiled, OverridesACommand)
{
    make(R"({"commands": [{"header": "SYSTem:VERSion?", "answer": "1990.0"}, {"header": "*TST?", "answer": "7"},
                          {"header": "MEASure#:VOLTage?", "channels": 2, "answer": "1"}]})");
    EXPECT_EQ(ask("SYST:VERS?;*TST?;:MEAS2:VOLT?\n"), "1990.0;7;1\n");
    EXPECT_NE(ask("MEAS:VOLT:DC?\n"), "1\n") << "the other spellings stay the built-in command";
}

TEST_F(Profiled, GoesWithoutSourceAndMeasureCommandsWhereItSaysSo)
{
    make("{}");
    ask("SOUR:VOLT 1\n");
    EXPECT_EQ(error(), NoError);
    make(R"({"source-measure": false})");
    ask("SOUR:VOLT 1\n");
    EXPECT_EQ(error(), "-113,\"Undefined header;SOUR:VOLT\"\n");
    ask("READ?\n");
    EXPECT_EQ(error(), "-113,\"Undefined header;READ?\"\n");
    ask("*TRG\n");
    EXPECT_EQ(ask("*OPC?\n"), "1\n");
}

TEST_F(Profiled, AnswersAfterItsDelay)
{
    make(R"({"commands": [{"header": "SLOW?", "delay": 2, "answer": "1"}, {"header": "WAIT", "delay": 1}]})");
    EXPECT_EQ(ask("SLOW?\n"), "");
    timers.turn(1999ms);
    EXPECT_EQ(client->takeAnswers(), "");
    TestClient other(*instrument);
    EXPECT_EQ(other.ask("*OPC?\n"), "1\n") << "other clients do not wait";
    timers.turn(1ms);
    EXPECT_EQ(client->takeAnswers(), "1\n");
    EXPECT_EQ(ask("WAIT;:SYST:VERS?\n"), "");
    timers.turn(1s);
    EXPECT_EQ(client->takeAnswers(), "1999.0\n");
}

TEST_F(Profiled, StartsPendingOperations)
{
    make(R"({"settings": [{"name": "v", "header": "LEVel", "default": 0, "min": 0, "max": 9, "pending": 3}],
             "commands": [{"header": "CALibrate", "pending": 2}]})");
    EXPECT_EQ(ask("CAL;*OPC?\n"), "");
    timers.turn(1999ms);
    EXPECT_EQ(client->takeAnswers(), "");
    timers.turn(1ms);
    timers.turn();
    EXPECT_EQ(client->takeAnswers(), "1\n");
    EXPECT_EQ(ask("LEV 5;*WAI;LEV?\n"), "");
    timers.turn(3s);
    timers.turn();
    EXPECT_EQ(client->takeAnswers(), "5.000000E+00\n");
}

TEST_F(Profiled, PushesErrors)
{
    make(R"({"commands": [{"header": "FAIL", "error": {"number": -330, "info": "fan"}},
                          {"header": "LATE?", "error": 205, "delay": 1}]})");
    ask("*CLS;*ESR?\n");
    EXPECT_EQ(ask("FAIL;*ESR?\n"), "8\n") << "device dependent error";
    EXPECT_EQ(error(), "-330,\"Self-test failed;fan\"\n");
    EXPECT_EQ(ask("LATE?\n"), "");
    EXPECT_EQ(instrument->errors.size(), 0u);
    timers.turn(1s);
    EXPECT_EQ(instrument->errors.pop().number, 205);
}

TEST_F(Profiled, TakesAsManyParametersAsItSays)
{
    make(
        R"({"commands": [{"header": "ANY", "parameters": {"min": 1, "max": 2}}, {"header": "TWO?", "parameters": 2, "answer": "2"}]})");
    EXPECT_EQ(ask("ANY 1;ANY 1,(@1:3);TWO? 'a',#12xy\n"), "2\n");
    EXPECT_EQ(error(), NoError);
    ask("ANY\n");
    EXPECT_EQ(error(), "-109,\"Missing parameter;ANY\"\n");
    ask("ANY 1,2,3\n");
    EXPECT_EQ(error(), "-108,\"Parameter not allowed;ANY\"\n");
}

TEST_F(Profiled, HasAShorterErrorQueueWhereItSaysSo)
{
    make(R"({"limits": {"error-queue": 3}})");
    ask("A1;B2;C3;D4;E5\n");
    EXPECT_EQ(ask("SYST:ERR:COUN?\n"), "3\n");
    ask("SYST:ERR?;ERR?\n");
    EXPECT_EQ(error(), "-350,\"Queue overflow\"\n");
}

// ---- waveforms

TEST_F(Profiled, MakesABlockOfSamples)
{
    make(R"({"commands": [
        {"header": "SQUare?", "answer": {"waveform": {"shape": "square", "format": "int16", "points": 4, "amplitude": 2, "offset": 1, "scale": 0.5}}},
        {"header": "LITTle?", "answer": {"waveform": {"shape": "flat", "format": "int32", "points": 1, "offset": 258, "byte-order": "little"}}},
        {"header": "CLIPped?", "answer": {"waveform": {"shape": "square", "format": "int8", "points": 2, "amplitude": 1000}}},
        {"header": "RAMP?", "answer": {"waveform": {"shape": "ramp", "format": "uint8", "points": 4, "amplitude": 100, "offset": 100}}},
        {"header": "TRIangle?", "answer": {"waveform": {"shape": "triangle", "format": "int8", "points": 8, "amplitude": 4, "periods": 1}}},
        {"header": "NONE?", "answer": {"waveform": {"shape": "sine", "format": "float64", "points": 0}}}]})");
    using namespace std::string_literals;
    EXPECT_EQ(ask("SQU?\n"), "#18\0\6\0\6\xFF\xFE\xFF\xFE\n"s);
    EXPECT_EQ(ask("LITT?\n"), "#14\2\1\0\0\n"s);
    EXPECT_EQ(ask("CLIP?\n"), "#12\x7F\x80\n"s);
    EXPECT_EQ(ask("RAMP?\n"), "#14\0\x32\x64\x96\n"s);
    EXPECT_EQ(ask("TRI?\n"), "#18\0\2\4\2\0\xFE\xFC\xFE\n"s);
    EXPECT_EQ(ask("NONE?\n"), "#10\n");
}

TEST_F(Profiled, MakesASineOfTheSettings)
{
    make(R"({"settings": [
        {"name": "points", "header": "POINts", "type": "integer", "default": 4, "min": 1, "max": 2000000},
        {"name": "shape", "header": "SHAPe", "type": "choice", "choices": ["SINusoid", "DC"], "default": "SINusoid"},
        {"name": "width", "header": "WIDTh", "type": "choice", "choices": ["BYTE", "REAL"], "default": "BYTE"}],
      "commands": [{"header": "CURVe?", "answer": {"waveform": {
        "shape": {"setting": "shape", "values": ["sine", "flat"]}, "format": {"setting": "width", "values": ["int8", "float32"]},
        "points": "points", "amplitude": 100, "offset": 1}}}]})");
    using namespace std::string_literals;
    EXPECT_EQ(ask("CURV?\n"), "#14\1\x65\1\x9D\n"s);
    EXPECT_EQ(ask("SHAP DC;POIN 2;CURV?\n"), "#12\1\1\n"s);
    const std::string real = ask("WIDT REAL;CURV?\n");
    EXPECT_EQ(real, "#18\x3F\x80\0\0\x3F\x80\0\0\n"s);
    EXPECT_EQ(ask("POIN 2000000;CURV?\n").substr(0, 9), "#74000000") << "a million points at most";
}

TEST_F(Profiled, RefusesABlockThatDoesNotFitItsMemory)
{
    const Profile profile = readProfile(
        R"({"commands": [{"header": "CURVe?", "answer": {"waveform": {"shape": "sine", "format": "float64", "points": 1000000}}}]})");
    InstrumentOptions options;
    options.massMemory = 1000;
    options.maxMessage = 1000;
    instrument = std::make_unique<Instrument>(timers, options);
    installProfile(profile, *instrument);
    client.emplace(*instrument);
    EXPECT_EQ(ask("CURV?\n"), "");
    EXPECT_EQ(error(), "-321,\"Out of memory\"\n");
}

// ---- what comes with the program

class Shipped : public Profiled
{
protected:
    void load(const std::string &name)
    {
        const Profile profile = loadProfile(std::string(PROFILES_FOLDER) + "/" + name + ".json");
        InstrumentOptions options;
        applyProfile(profile, options);
        instrument = std::make_unique<Instrument>(timers, options);
        installProfile(profile, *instrument);
        client.emplace(*instrument);
    }
    double read(std::string_view query)
    {
        ask(query);
        timers.turn(1s);
        const std::string answer = client->takeAnswers();
        return answer.empty() ? std::nan("") : std::stod(answer);
    }
};

TEST_F(Shipped, PowerSupplyObeysOhmAndItsLimits)
{
    load("power-supply");
    EXPECT_EQ(ask("*IDN?\n"), "Oltrava,PV-3303,PV33-02817,2.14\n");
    ask("SOUR2:VOLT 10;CURR 0.05;:BENC2:LOAD 100\n");
    timers.turn(1s);
    EXPECT_NEAR(read("MEAS2:VOLT?\n"), 0, 0.01) << "switched off";
    ask("OUTP2 ON\n");
    EXPECT_NEAR(read("MEAS2:VOLT?\n"), 5, 0.01) << "the limit rules";
    EXPECT_NEAR(read("MEAS2:CURR?\n"), 0.05, 0.001);
    ask("SOUR2:CURR 1\n");
    EXPECT_NEAR(read("MEAS2:VOLT?\n"), 10, 0.01);
    EXPECT_NEAR(read("MEAS2:CURR?\n"), 0.1, 0.001);
    EXPECT_NEAR(read("MEAS1:VOLT?\n"), 0, 0.01) << "the others are their own";
    EXPECT_EQ(error(), NoError);
    ask("CAL:STAR\n");
    EXPECT_EQ(error().substr(0, 5), "-203,");
}

TEST_F(Shipped, MultimeterReadsWhatIsAtItsTerminals)
{
    load("multimeter");
    EXPECT_EQ(ask("*IDN?\n"), "Oltrava,MM-6510,MM65-00931,1.07\n");
    ask("BENC:VOLT 3.3;CURR 0.5;RES 4700\n");
    EXPECT_NEAR(read("MEAS?\n"), 3.3, 0.001);
    EXPECT_NEAR(read("MEAS:VOLT:DC? 10,0.001\n"), 3.3, 0.001);
    EXPECT_NEAR(read("MEAS:CURR?\n"), 0.5, 0.001);
    EXPECT_NEAR(read("MEAS:RES?\n"), 4700, 1);
    ask("VOLT:RANG 1\n");
    EXPECT_NEAR(read("READ?\n"), 1.2, 0.001) << "more than the range holds";
    EXPECT_EQ(ask("SENS:FUNC?\n"), "VOLT\n");
    EXPECT_EQ(error(), NoError);
    EXPECT_EQ(ask("CAL:ZERO;*OPC?\n"), "");
    timers.turn(2s);
    timers.turn();
    EXPECT_EQ(client->takeAnswers(), "1\n");
}

TEST_F(Shipped, OscilloscopeShowsTheSignal)
{
    load("oscilloscope");
    EXPECT_EQ(ask("*IDN?\n"), "Oltrava,WS-2104,WS21-01406,3.2.1\n");
    ask("ACQ:POIN 1000;:BENC2:SHAP SQU;AMPL 1;:CHAN2:SCAL 0.5;:TIM:SCAL 0.0001\n");
    const std::string record = ask("WAV2:DATA?\n");
    ASSERT_EQ(record.size(), 1007u);
    EXPECT_EQ(record.substr(0, 6), "#41000");
    // One period: half of it at +1 V, which is 50 codes of 20 mV, half at -1 V.
    EXPECT_NEAR(static_cast<signed char>(record[6 + 250]), 50, 5);
    EXPECT_NEAR(static_cast<signed char>(record[6 + 750]), -50, 5);
    EXPECT_EQ(ask("WAV2:YINC?\n"), "2.000000E-02\n");
    EXPECT_EQ(ask("FORM:DATA WORD;:WAV1:DATA?\n").substr(0, 6), "#42000");
    EXPECT_EQ(ask("FORM:DATA REAL;:WAV1:DATA?\n").substr(0, 6), "#44000");
    EXPECT_EQ(error(), NoError);
}

} // namespace
