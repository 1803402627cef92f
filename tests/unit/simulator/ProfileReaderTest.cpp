#include "simulator/profile/ProfileReader.h"

#include <gtest/gtest.h>

#include <string>

namespace
{

using simulator::Profile;
using simulator::ProfileError;
using simulator::readProfile;

struct Wrong {
    const char *name;
    const char *text;
    std::size_t line;
    std::size_t column;
    const char *reason;
};

void PrintTo(const Wrong &row, std::ostream *out)
{
    *out << row.name;
}

class DamagedProfile : public testing::TestWithParam<Wrong>
{
};

TEST_P(DamagedProfile, IsRefusedWithPlaceAndReason)
{
    try {
        readProfile(GetParam().text);
        ADD_FAILURE() << "taken";
    } catch (const ProfileError &error) {
        EXPECT_STREQ(error.what(), GetParam().reason);
        EXPECT_EQ(error.position.line, GetParam().line);
        EXPECT_EQ(error.position.column, GetParam().column);
    }
}

constexpr Wrong Rows[] = {
    // The shape of the whole.
    {"NoObject", "[]", 1, 1, "a profile is an object, not a list"},
    {"UnknownKey", "{\n  \"colour\": 1\n}", 2, 3,
     "a profile has no key \"colour\"; the keys are description identification limits source-measure settings "
     "commands"},
    {"KeyTwice", "{\"limits\": {},\n \"limits\": {}}", 2, 2, "the key \"limits\" stands here already, in line 1"},
    {"DescriptionNoString", "{\"description\": 1}", 1, 17, "\"description\" is a string, not a number"},
    {"SourceMeasureNoBoolean", "{\"source-measure\": \"no\"}", 1, 20,
     "\"source-measure\" is true or false, not a string"},
    {"SettingsNoList", "{\"settings\": {}}", 1, 14, "\"settings\" is a list, not an object"},
    {"CommandsNoList", "{\n\"commands\":\n 5}", 3, 2, "\"commands\" is a list, not a number"},
    // Identification and limits.
    {"IdentificationNoObject", "{\"identification\": null}", 1, 20, "\"identification\" is an object, not null"},
    {"IdentificationUnknownKey", "{\"identification\": {\"maker\": \"x\"}}", 1, 21,
     "\"identification\" has no key \"maker\"; the keys are manufacturer model serial firmware"},
    {"IdentificationComma", "{\"identification\": {\"model\": \"a,b\"}}", 1, 30,
     "\"model\" is a field of *IDN?: printable ASCII without comma and semicolon"},
    {"IdentificationEmpty", "{\"identification\": {\"serial\": \"\"}}", 1, 31,
     "\"serial\" is a field of *IDN?: printable ASCII without comma and semicolon"},
    {"IdentificationLong", "{\"identification\": {\"serial\": \"123456789012345678901234567890123\"}}", 1, 31,
     "\"serial\" is at most 32 bytes long"},
    {"MaxMessageSmall", "{\"limits\": {\"max-message\": 1023}}", 1, 28,
     "\"max-message\" is between 1024 and 17179869184, not 1023"},
    {"MaxMessageBroken", "{\"limits\": {\"max-message\": 2000.5}}", 1, 28, "\"max-message\" is a whole number"},
    {"ErrorQueueSmall", "{\"limits\": {\"error-queue\": 1}}", 1, 28, "\"error-queue\" is between 2 and 10000, not 1"},
    // Settings.
    {"SettingNoObject", "{\"settings\": [1]}", 1, 15, "a setting is an object, not a number"},
    {"SettingWithoutName", "{\"settings\": [\n {\"header\": \"A\"}]}", 2, 2, "a setting needs the key \"name\""},
    {"SettingBadName", "{\"settings\": [{\"name\": \"2x\"}]}", 1, 24,
     "the name \"2x\" is not made of letters, digits and _"},
    {"SettingWithoutHeader", "{\"settings\": [{\"name\": \"x\"}]}", 1, 15, "a setting needs the key \"header\""},
    {"SettingTwice",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"default\": 0, \"min\": 0, \"max\": 1},\n"
     "{\"name\": \"x\", \"header\": \"BBB\"}]}",
     2, 10, "there is a setting \"x\" already"},
    {"SettingQuery", "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA?\"}]}", 1, 39,
     "header \"AAA?\": a setting has its query by itself"},
    {"SettingCommon", "{\"settings\": [{\"name\": \"x\", \"header\": \"*STB\"}]}", 1, 39,
     "header \"*STB\": a setting is no common command"},
    {"SettingUnknownType", "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"type\": \"text\"}]}", 1, 54,
     "\"type\" \"text\" is none of number integer boolean choice"},
    {"SettingWithoutRange", "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\"}]}", 1, 15,
     "a setting needs the key \"min\""},
    {"SettingRangeUpsideDown",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"default\": 0, \"min\": 2,\n \"max\": 1}]}", 2, 9,
     "\"max\" is between 2 and 1.7976931348623157e+308, not 1"},
    {"SettingDefaultOutside",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"min\": 2, \"max\": 3,\n \"default\": 0}]}", 2, 13,
     "\"default\" is between 2 and 3, not 0"},
    {"SettingIntegerBroken",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"type\": \"integer\", \"min\": 0, \"max\": 3,\n"
     " \"default\": 0.5}]}",
     2, 13, "\"default\" is a whole number"},
    {"SettingUnit",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"min\": 0, \"max\": 3, \"default\": 0,\n"
     " \"unit\": \"volts\"}]}",
     2, 10, "the unit \"volts\" is not 1 to 8 capital letters"},
    {"SettingStyle",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"min\": 0, \"max\": 3, \"default\": 0,\n"
     " \"style\": \"NR4\"}]}",
     2, 11, "\"style\" \"NR4\" is none of NR1 NR2 NR3"},
    {"SettingPending",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"min\": 0, \"max\": 3, \"default\": 0,\n"
     " \"pending\": -1}]}",
     2, 13, "\"pending\" is between 0 and 3600, not -1"},
    {"BooleanWithUnit",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"type\": \"boolean\", \"default\": true, \"unit\": "
     "\"V\"}]}",
     1, 90, "\"unit\" is for a setting that is a number"},
    {"BooleanDefault",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"type\": \"boolean\", \"default\": 1}]}", 1, 76,
     "\"default\" is true or false, not a number"},
    {"ChoiceWithoutChoices",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"type\": \"choice\", \"default\": \"A\"}]}", 1, 15,
     "a setting needs the key \"choices\""},
    {"ChoiceUnclear",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"type\": \"choice\", \"choices\": [\"SINe\",\n"
     " \"SINusoid\"], \"default\": \"SINe\"}]}",
     2, 2, "choice \"SINusoid\": clients could not tell it from another one"},
    {"ChoiceBad",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"type\": \"choice\", \"choices\": [\"A:B\"], "
     "\"default\": \"A\"}]}",
     1, 76, "choice \"A:B\": a choice is one mnemonic"},
    {"ChoiceDefault",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"type\": \"choice\", \"choices\": [\"BBB\"],\n"
     " \"default\": \"CCC\"}]}",
     2, 13, "\"default\" \"CCC\" is none of the choices"},
    {"NumberWithChoices",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"min\": 0, \"max\": 3, \"default\": 0,\n"
     " \"choices\": []}]}",
     2, 13, "\"choices\" are for a setting of type \"choice\""},
    // Headers.
    {"HeaderLowerCase", "{\"commands\": [{\"header\": \"aaa?\", \"answer\": \"\"}]}", 1, 26,
     "header \"aaa?\": a mnemonic begins with the capital letters of its short form"},
    {"HeaderEmpty", "{\"commands\": [{\"header\": \"\"}]}", 1, 26,
     "header \"\": a header has a mnemonic that cannot be left out"},
    {"HeaderAllOptional", "{\"commands\": [{\"header\": \"[SENSe]\"}]}", 1, 26,
     "header \"[SENSe]\": a header has a mnemonic that cannot be left out"},
    {"HeaderLongMnemonic", "{\"commands\": [{\"header\": \"ABCDEFGHIJKLM\"}]}", 1, 26,
     "header \"ABCDEFGHIJKLM\": a mnemonic has at most 12 letters"},
    {"HeaderTwoColons", "{\"commands\": [{\"header\": \"AAA::BBB\"}]}", 1, 26,
     "header \"AAA::BBB\": a mnemonic begins with the capital letters of its short form"},
    {"HeaderTrailingColon", "{\"commands\": [{\"header\": \"AAA:\"}]}", 1, 26, "header \"AAA:\": a colon at its end"},
    {"HeaderLeadingColon", "{\"commands\": [{\"header\": \":AAA\"}]}", 1, 26,
     "header \":AAA\": a colon where a mnemonic should be"},
    {"HeaderBlank", "{\"commands\": [{\"header\": \"AAA BBB\"}]}", 1, 26,
     "header \"AAA BBB\": \" \" where a colon should be"},
    {"HeaderOpenBracket", "{\"commands\": [{\"header\": \"AAA[:BBB\"}]}", 1, 26,
     "header \"AAA[:BBB\": a bracket encloses one mnemonic and its colon"},
    {"HeaderTwoSuffixes", "{\"commands\": [{\"header\": \"AAA#:BBB#\", \"channels\": 2}]}", 1, 26,
     "header \"AAA#:BBB#\": only one mnemonic can take a numeric suffix"},
    {"HeaderCommon", "{\"commands\": [{\"header\": \"*Ab\"}]}", 1, 26,
     "header \"*Ab\": a common command is an asterisk and capital letters"},
    {"HeaderTooLong", "{\"commands\": [{\"header\": \"A:B:C:D:E:F:G:H:I:J:K\"}]}", 1, 26,
     "header \"A:B:C:D:E:F:G:H:I:J:K\": the header has too many mnemonics"},
    // Clashes.
    {"HeaderTwice",
     "{\"commands\": [{\"header\": \"AAA[:BBB]?\", \"answer\": \"1\"},\n {\"header\": \"AAA?\", \"answer\": \"2\"}]}",
     2, 13, "the header \"AAA?\" is taken already, in line 1"},
    {"SettingAndCommand",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA\", \"default\": 0, \"min\": 0, \"max\": 1}],\n"
     "\"commands\": [{\"header\": \"AAA?\", \"answer\": \"2\"}]}",
     2, 25, "the header \"AAA?\" is taken already, in line 1"},
    {"SameShortForm", "{\"commands\": [{\"header\": \"AAAb\"},\n {\"header\": \"AAAc:DDD\"}]}", 2, 13,
     "header \"AAAc:DDD\": clients could not tell it from \"AAAb\""},
    {"OtherShortFormThanBuiltIn", "{\"commands\": [{\"header\": \"SYSTEm:FOO\"}]}", 1, 26,
     "header \"SYSTEm:FOO\": clients could not tell it from \"SYSTem:ERRor\""},
    {"SuffixThatTheBuiltInHasNot", "{\"commands\": [{\"header\": \"SYSTem#:FOO\", \"channels\": 2}]}", 1, 26,
     "header \"SYSTem#:FOO\": clients could not tell it from \"SYSTem:ERRor\""},
    // Channels.
    {"SuffixWithoutChannels", "{\"commands\": [\n{\"header\": \"AAA#\"}]}", 2, 1,
     "a header with a \"#\" needs the key \"channels\""},
    {"ChannelsWithoutSuffix", "{\"commands\": [{\"header\": \"AAA\", \"channels\": 2}]}", 1, 45,
     "\"channels\" needs a header with a \"#\""},
    {"TooManyChannels", "{\"commands\": [{\"header\": \"AAA#\", \"channels\": 65}]}", 1, 46,
     "\"channels\" is between 1 and 64, not 65"},
    {"OtherChannelsInExpression",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"AAA#\", \"channels\": 2, \"default\": 0, \"min\": 0, \"max\": "
     "1}],\n"
     "\"commands\": [{\"header\": \"BBB?\", \"answer\": {\"compute\": \"x\"}}]}",
     2, 55, "\"x\": \"x\" has 2 channels, and the command has not as many"},
    // Commands.
    {"CommandWithoutHeader", "{\"commands\": [{}]}", 1, 15, "a command needs the key \"header\""},
    {"CommandUnknownKey", "{\"commands\": [{\"header\": \"AAA\", \"reply\": 1}]}", 1, 33,
     "a command has no key \"reply\"; the keys are header parameters channels answer delay pending error"},
    {"QueryWithoutAnswer", "{\"commands\": [{\"header\": \"AAA?\"}]}", 1, 15,
     "a query needs an \"answer\" or an \"error\""},
    {"AnswerToNoQuery", "{\"commands\": [{\"header\": \"AAA\", \"answer\": \"1\"}]}", 1, 43,
     "a command without \"?\" has no answer"},
    {"AnswerAndError", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": \"1\", \"error\": -200}]}", 1, 44,
     "a query with an \"error\" has no answer"},
    {"ErrorZero", "{\"commands\": [{\"header\": \"AAA\", \"error\": 0}]}", 1, 42,
     "an error number is a whole number and not 0"},
    {"ErrorOutside", "{\"commands\": [{\"header\": \"AAA\", \"error\": {\"number\": 40000}}]}", 1, 53,
     "an error number is between -32768 and 32767, not 40000"},
    {"Delay", "{\"commands\": [{\"header\": \"AAA\", \"delay\": \"long\"}]}", 1, 42,
     "\"delay\" is a number, not a string"},
    {"Parameters", "{\"commands\": [{\"header\": \"AAA\", \"parameters\": {\"min\": 2, \"max\": 1}}]}", 1, 65,
     "\"max\" is between 2 and 100, not 1"},
    // Answers.
    {"AnswerKind", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": 5}]}", 1, 44,
     "\"answer\" is an object, not a number"},
    {"AnswerWithoutKey", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {}}]}", 1, 44,
     "an answer is a string, or an object with one of the keys list counter random compute waveform"},
    {"AnswerWithTwoKeys", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"list\": [\"1\"], \"compute\": 1}}]}",
     1, 44, "an answer is a string, or an object with one of the keys list counter random compute waveform"},
    {"AnswerControlCharacter", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": \"a\\nb\"}]}", 1, 44,
     "\"answer\" has a control character"},
    {"ListEmpty", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"list\": []}}]}", 1, 53,
     "a list has at least one answer"},
    {"CounterBroken", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"counter\": {\"step\": 0.5}}}]}", 1, 65,
     "\"step\" is a whole number"},
    {"RandomUpsideDown", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"random\": {\"min\": 2, \"max\": 1}}}]}",
     1, 73, "\"max\" is between 2 and 1e+300, not 1"},
    {"StyleOfAList", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"list\": [\"1\"], \"digits\": 3}}]}", 1, 70,
     "\"digits\" is for random and computed answers"},
    {"Digits", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"compute\": 1, \"digits\": 18}}]}", 1, 69,
     "\"digits\" is between 1 and 17, not 18"},
    // Expressions.
    {"ExpressionKind", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"compute\": []}}]}", 1, 56,
     "an expression is a string or a number, not a list"},
    {"ExpressionUnknownName", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"compute\": \"volts\"}}]}", 1, 56,
     "\"volts\": there is no setting \"volts\""},
    {"ExpressionUnknownFunction", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"compute\": \"sin(1)\"}}]}", 1,
     56, "\"sin(1)\": there is no function \"sin\"; they are min max abs noise"},
    {"ExpressionOpen", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"compute\": \"(1 + 2\"}}]}", 1, 56,
     "\"(1 + 2\": expected \")\", found end in the expression"},
    {"ExpressionEmpty", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"compute\": \"\"}}]}", 1, 56,
     "\"\": expected a value, found end in the expression"},
    {"ExpressionTail", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"compute\": \"1 2\"}}]}", 1, 56,
     "\"1 2\": unexpected \"2\" in the expression"},
    // Waveforms.
    {"WaveformWithoutShape", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"waveform\": {}}}]}", 1, 57,
     "\"waveform\" needs the key \"shape\""},
    {"WaveformShape", "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"waveform\": {\"shape\": \"saw\"}}}]}", 1,
     67, "a shape \"saw\" is none of sine square triangle ramp flat"},
    {"WaveformFormatSetting",
     "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"waveform\": {\"shape\": \"sine\",\n"
     " \"format\": {\"setting\": \"f\", \"values\": []}}}}]}",
     2, 24, "there is no setting \"f\""},
    {"WaveformFormatOfANumber",
     "{\"settings\": [{\"name\": \"x\", \"header\": \"BBB\", \"default\": 0, \"min\": 0, \"max\": 1}],\n"
     "\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"waveform\": {\"shape\": \"sine\",\n"
     " \"format\": {\"setting\": \"x\", \"values\": []}}}}]}",
     3, 24, "\"x\" is no setting of type \"choice\""},
    {"WaveformByteOrder",
     "{\"commands\": [{\"header\": \"AAA?\", \"answer\": {\"waveform\": {\"shape\": \"sine\", \"format\": \"int8\",\n"
     " \"points\": 1, \"byte-order\": \"middle\"}}}]}",
     2, 29, "\"byte-order\" \"middle\" is none of big little"},
};

INSTANTIATE_TEST_SUITE_P(Rows, DamagedProfile, testing::ValuesIn(Rows),
                         [](const auto &row) { return std::string{row.param.name}; });

/// What the JSON parser says is its own; the place is what counts.
TEST(ProfileSyntax, IsRefusedWithLineAndColumn)
{
    const struct {
        const char *text;
        std::size_t line;
        std::size_t column;
    } rows[] = {
        {"", 1, 1},
        {"{\n  \"settings\": [\n    {]\n}", 3, 6},
        {"{\n  \"description\": \"a\n\"}", 2, 20},
        {"{\"description\": tru}", 1, 20},
        {"{}\n{}", 2, 1},
        {"{\"limits\": {\"max-message\": 1e999}}", 1, 32},
        {"{\n\"description\": \"\xFF\"}", 2, 17},
    };
    for (const auto &row : rows) {
        try {
            readProfile(row.text);
            ADD_FAILURE() << "taken: " << row.text;
        } catch (const ProfileError &error) {
            EXPECT_EQ(error.position.line, row.line) << row.text << ": " << error.what();
            EXPECT_EQ(error.position.column, row.column) << row.text << ": " << error.what();
            EXPECT_EQ(std::string(error.what()).find("json.exception"), std::string::npos) << error.what();
        }
    }
}

TEST(ProfileSyntax, RefusesWhatIsNestedTooDeep)
{
    try {
        readProfile("{\"settings\":\n" + std::string(100000, '['));
        ADD_FAILURE() << "taken";
    } catch (const ProfileError &error) {
        EXPECT_STREQ(error.what(), "nested deeper than 16");
        EXPECT_EQ(error.position.line, 2u);
        EXPECT_EQ(error.position.column, 16u);
    }
}

TEST(ProfileReader, RefusesMoreThanAProfileHas)
{
    const auto reasonOf = [](const std::string &text) -> std::string {
        try {
            readProfile(text);
        } catch (const ProfileError &error) {
            return error.what();
        }
        return {};
    };
    std::string keys = "{\"k\": 1";
    for (int i = 0; i < 300000; ++i)
        keys += ", \"k" + std::to_string(i) + "\": 1";
    EXPECT_EQ(reasonOf(keys + "}"), "more than 100 keys in one object");

    std::string entries = "{\"commands\": [1";
    for (int i = 0; i < 10000; ++i)
        entries += ", 1";
    EXPECT_EQ(reasonOf(entries + "]}"), "more than 10000 entries");

    // Each may be written in sixteen ways.
    std::string commands = "{\"commands\": [";
    for (int i = 0; i < 1000; ++i) {
        std::string name = "QZ";
        for (int digit = i, place = 0; place < 3; ++place, digit /= 26)
            name += static_cast<char>('A' + digit % 26);
        commands += (i == 0 ? "" : ", ");
        commands += R"({"header": ")" + name + R"([:ONE][:TWO][:THRee][:FOUR]:VALue?", "answer": "1"})";
    }
    EXPECT_EQ(reasonOf(commands + "]}"), "more than 4000 headers, with and without what may be left out of them");
}

TEST(ProfileReader, TakesAnEmptyProfile)
{
    const Profile profile = readProfile("{}");
    EXPECT_FALSE(profile.manufacturer);
    EXPECT_FALSE(profile.maxMessage);
    EXPECT_TRUE(profile.sourceMeasure);
    EXPECT_TRUE(profile.settings.empty());
    EXPECT_TRUE(profile.commands.empty());
}

TEST(ProfileReader, TakesABomAndLineEndsOfBothKinds)
{
    EXPECT_EQ(readProfile("\xEF\xBB\xBF{\r\n\"limits\":\r\n{\"error-queue\": 5}}").errorQueue, 5u);
}

} // namespace
