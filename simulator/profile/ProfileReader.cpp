#include "simulator/profile/ProfileReader.h"

#include "simulator/instrument/Characters.h"
#include "simulator/instrument/CommandTable.h"
#include "simulator/instrument/Commands.h"
#include "simulator/profile/HeaderPattern.h"
#include "simulator/profile/JsonFields.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <map>

namespace simulator
{
namespace
{

using Kind = JsonValue::Kind;

constexpr std::size_t MaxText = 65536;
constexpr std::size_t MaxEntries = 10000;
constexpr std::size_t MaxPaths = 4000; ///< headers, each with and without what may be left out of it
constexpr std::size_t MaxChannels = 64;
constexpr double MaxSeconds = 3600;
constexpr double Largest = std::numeric_limits<double>::max();

/// Reads one profile from front to back; settings first, since expressions name them.
class Reader
{
public:
    Profile read(const JsonValue &root);

private:
    void readIdentification(const JsonValue &value);
    void readLimits(const JsonValue &value);
    void readSetting(const JsonValue &value);
    void readRange(const JsonFields &fields, ProfileSetting &setting);
    void readChoices(const JsonFields &fields, ProfileSetting &setting);
    void readCommand(const JsonValue &value);
    ProfileAnswer readAnswer(const JsonValue &value);
    Waveform readWaveform(const JsonValue &value);
    ScpiError readError(const JsonValue &value);
    NumberStyle readStyle(const JsonFields &fields, NumberStyle style = {});
    Expression readExpression(const JsonValue &value);
    Expression readExpression(const JsonFields &fields, std::string_view key, double otherwise);
    std::size_t settingNamed(std::string_view name) const;
    template <typename Value, std::size_t Count>
    void readChoice(const JsonValue &value, std::string_view what,
                    const std::array<std::pair<std::string_view, Value>, Count> &words, std::vector<Value> &values,
                    std::optional<std::size_t> &setting);

    HeaderPattern readHeader(const JsonValue &value, bool query);
    unsigned readChannels(const JsonFields &fields, const HeaderPattern &pattern);
    void claim(const HeaderPattern &pattern, bool query, TextPosition position);

    Profile m_profile;
    std::vector<std::string> m_builtIn;           ///< headers of the instrument as it is
    std::vector<std::string> m_paths;             ///< of this profile
    std::map<std::string, std::size_t> m_claimed; ///< long form, and `?` for a query: the line where it stands
    std::size_t m_values = 0;
    unsigned m_channels = 1; ///< of the command that is being read
};

std::string quoted(std::string_view text)
{
    return "\"" + std::string{text} + "\"";
}

Profile Reader::read(const JsonValue &root)
{
    const JsonFields fields(root, "a profile",
                            {"description", "identification", "limits", "source-measure", "settings", "commands"});
    if (const JsonValue *value = fields.find("description"))
        textOf(*value, "\"description\"", MaxText);
    if (const JsonValue *value = fields.find("identification"))
        readIdentification(*value);
    if (const JsonValue *value = fields.find("limits"))
        readLimits(*value);
    m_profile.sourceMeasure = fields.boolean("source-measure", true);
    CommandTable table;
    addBuiltInCommands(table, m_profile.sourceMeasure);
    m_builtIn = table.headers();

    const JsonValue *settings = fields.find("settings");
    const JsonValue *commands = fields.find("commands");
    for (const JsonValue *list : {settings, commands})
        if (list &&
            expect(*list, Kind::Array, list == settings ? "\"settings\"" : "\"commands\"").elements.size() > MaxEntries)
            throw ProfileError(list->position, "more than " + std::to_string(MaxEntries) + " entries");
    if (settings)
        for (const JsonValue &value : settings->elements)
            readSetting(value);
    if (commands)
        for (const JsonValue &value : commands->elements)
            readCommand(value);
    return std::move(m_profile);
}

void Reader::readIdentification(const JsonValue &value)
{
    constexpr std::size_t MaxField = 32;
    const JsonFields fields(value, "\"identification\"", {"manufacturer", "model", "serial", "firmware"});
    const auto read = [&](std::string_view key) -> std::optional<std::string> {
        const JsonValue *field = fields.find(key);
        if (!field)
            return std::nullopt;
        const std::string text = textOf(*field, quoted(key), MaxField);
        const bool fits = !text.empty() && std::all_of(text.begin(), text.end(), [](char c) {
            return c >= ' ' && c <= '~' && c != ',' && c != ';';
        });
        if (!fits)
            throw ProfileError(field->position,
                               quoted(key) + " is a field of *IDN?: printable ASCII without comma and semicolon");
        return text;
    };
    m_profile.manufacturer = read("manufacturer");
    m_profile.model = read("model");
    m_profile.serial = read("serial");
    m_profile.firmware = read("firmware");
}

void Reader::readLimits(const JsonValue &value)
{
    const JsonFields fields(value, "\"limits\"", {"max-message", "error-queue"});
    if (fields.find("max-message"))
        m_profile.maxMessage = fields.whole("max-message", 0, 1024, std::size_t{16} << 30);
    if (fields.find("error-queue"))
        m_profile.errorQueue = fields.whole("error-queue", 0, 2, 10000);
}

HeaderPattern Reader::readHeader(const JsonValue &value, bool query)
{
    const std::string &text = expect(value, Kind::String, "\"header\"").string;
    try {
        HeaderPattern pattern(text);
        if (pattern.query && !query)
            throw HeaderPatternError("a setting has its query by itself");
        if (text.starts_with('*') && !query)
            throw HeaderPatternError("a setting is no common command");
        for (const std::string &path : pattern.paths) {
            std::string other = ambiguity(path, m_builtIn);
            if (other.empty())
                other = ambiguity(path, m_paths);
            if (!other.empty())
                throw HeaderPatternError("clients could not tell it from " + quoted(other));
        }
        return pattern;
    } catch (const HeaderPatternError &error) {
        throw ProfileError(value.position, "header " + quoted(text) + ": " + error.what());
    }
}

/// Makes the header this entry's and nobody else's of the profile.
void Reader::claim(const HeaderPattern &pattern, bool query, TextPosition position)
{
    for (const std::string &path : pattern.paths) {
        const auto [entry, isNew] = m_claimed.emplace(longForm(path) + (query ? "?" : ""), position.line);
        if (!isNew)
            throw ProfileError(position, "the header " + quoted(path + (query ? "?" : "")) +
                                             " is taken already, in line " + std::to_string(entry->second));
        if (m_paths.size() == MaxPaths)
            throw ProfileError(position, "more than " + std::to_string(MaxPaths) +
                                             " headers, with and without what may be left out of them");
        m_paths.push_back(path);
    }
}

unsigned Reader::readChannels(const JsonFields &fields, const HeaderPattern &pattern)
{
    const JsonValue *value = fields.find("channels");
    if (value && !pattern.suffix)
        throw ProfileError(value->position, "\"channels\" needs a header with a \"#\"");
    if (!value && pattern.suffix)
        throw ProfileError(fields.position(), "a header with a \"#\" needs the key \"channels\"");
    return static_cast<unsigned>(fields.whole("channels", 1, 1, MaxChannels));
}

void Reader::readSetting(const JsonValue &value)
{
    const JsonFields fields(value, "a setting",
                            {"name", "header", "type", "unit", "default", "min", "max", "choices", "channels",
                             "pending", "style", "digits"});
    ProfileSetting setting;
    const JsonValue &name = fields.require("name");
    setting.name = expect(name, Kind::String, "\"name\"").string;
    const bool isName = !setting.name.empty() && isLetter(setting.name.front()) &&
                        std::all_of(setting.name.begin(), setting.name.end(),
                                    [](char c) { return isLetter(c) || isDigit(c) || c == '_'; });
    if (!isName)
        throw ProfileError(name.position, "the name " + quoted(setting.name) + " is not made of letters, digits and _");
    for (const ProfileSetting &other : m_profile.settings)
        if (other.name == setting.name)
            throw ProfileError(name.position, "there is a setting " + quoted(setting.name) + " already");

    const JsonValue &header = fields.require("header");
    const HeaderPattern pattern = readHeader(header, false);
    setting.header = header.string;
    setting.channels = readChannels(fields, pattern);
    claim(pattern, false, header.position);
    claim(pattern, true, header.position);

    if (const JsonValue *type = fields.find("type"))
        setting.type = std::array{
            ProfileSetting::Type::Number, ProfileSetting::Type::Integer, ProfileSetting::Type::Boolean,
            ProfileSetting::Type::Choice}[wordOf(*type, "\"type\"", {"number", "integer", "boolean", "choice"})];
    setting.pending = fields.number("pending", 0, 0, MaxSeconds);
    if (setting.type == ProfileSetting::Type::Number || setting.type == ProfileSetting::Type::Integer)
        readRange(fields, setting);
    else
        readChoices(fields, setting);
    setting.firstValue = m_values;
    m_values += setting.channels;
    m_profile.settings.push_back(std::move(setting));
}

void Reader::readRange(const JsonFields &fields, ProfileSetting &setting)
{
    if (const JsonValue *choices = fields.find("choices"))
        throw ProfileError(choices->position, "\"choices\" are for a setting of type \"choice\"");
    setting.least = numberOf(fields.require("min"), "\"min\"", -Largest, Largest);
    setting.most = numberOf(fields.require("max"), "\"max\"", setting.least, Largest);
    setting.initial = numberOf(fields.require("default"), "\"default\"", setting.least, setting.most);
    if (const JsonValue *unit = fields.find("unit")) {
        setting.unit = expect(*unit, Kind::String, "\"unit\"").string;
        const bool fits = setting.unit.size() <= 8 && std::all_of(setting.unit.begin(), setting.unit.end(), isUpper);
        if (!fits || setting.unit.empty())
            throw ProfileError(unit->position, "the unit " + quoted(setting.unit) + " is not 1 to 8 capital letters");
    }
    const bool whole = setting.type == ProfileSetting::Type::Integer;
    if (whole)
        for (const char *key : {"min", "max", "default"})
            if (const JsonValue &bound = fields.require(key);
                bound.number != std::floor(bound.number) || std::fabs(bound.number) > 9e15)
                throw ProfileError(bound.position, quoted(key) + " is a whole number");
    setting.style = readStyle(fields, {whole ? NumberStyle::Form::Nr1 : NumberStyle::Form::Nr3, 7});
}

void Reader::readChoices(const JsonFields &fields, ProfileSetting &setting)
{
    for (const char *key : {"unit", "min", "max", "style", "digits"})
        if (const JsonValue *value = fields.find(key))
            throw ProfileError(value->position, quoted(key) + " is for a setting that is a number");
    if (setting.type == ProfileSetting::Type::Boolean) {
        if (const JsonValue *choices = fields.find("choices"))
            throw ProfileError(choices->position, "\"choices\" are for a setting of type \"choice\"");
        setting.most = 1;
        setting.initial = expect(fields.require("default"), Kind::Boolean, "\"default\"").boolean ? 1 : 0;
        return;
    }
    const JsonValue &choices = expect(fields.require("choices"), Kind::Array, "\"choices\"");
    if (choices.elements.empty() || choices.elements.size() > MaxChannels)
        throw ProfileError(choices.position, "\"choices\" are 1 to " + std::to_string(MaxChannels));
    for (const JsonValue &choice : choices.elements) {
        const std::string &text = expect(choice, Kind::String, "a choice").string;
        try {
            const HeaderPattern pattern(text);
            if (pattern.suffix || pattern.query || text.find_first_of(":[*") != std::string::npos)
                throw HeaderPatternError("a choice is one mnemonic");
            const std::string other = ambiguity(text, setting.choices);
            const bool same = std::any_of(setting.choices.begin(), setting.choices.end(),
                                          [&](const std::string &each) { return longForm(each) == longForm(text); });
            if (!other.empty() || same)
                throw HeaderPatternError("clients could not tell it from another one");
        } catch (const HeaderPatternError &error) {
            throw ProfileError(choice.position, "choice " + quoted(text) + ": " + error.what());
        }
        setting.choices.push_back(text);
    }
    const JsonValue &initial = fields.require("default");
    const std::string &chosen = expect(initial, Kind::String, "\"default\"").string;
    const auto found = std::find(setting.choices.begin(), setting.choices.end(), chosen);
    if (found == setting.choices.end())
        throw ProfileError(initial.position, "\"default\" " + quoted(chosen) + " is none of the choices");
    setting.most = static_cast<double>(setting.choices.size() - 1);
    setting.initial = static_cast<double>(found - setting.choices.begin());
}

NumberStyle Reader::readStyle(const JsonFields &fields, NumberStyle style)
{
    if (const JsonValue *form = fields.find("style"))
        style.form = std::array{NumberStyle::Form::Nr1, NumberStyle::Form::Nr2,
                                NumberStyle::Form::Nr3}[wordOf(*form, "\"style\"", {"NR1", "NR2", "NR3"})];
    const bool behindPoint = style.form == NumberStyle::Form::Nr2;
    style.digits = static_cast<unsigned>(fields.whole("digits", style.digits, behindPoint ? 0 : 1, 17));
    return style;
}

std::size_t Reader::settingNamed(std::string_view name) const
{
    const auto found = std::find_if(m_profile.settings.begin(), m_profile.settings.end(),
                                    [&](const ProfileSetting &each) { return each.name == name; });
    if (found == m_profile.settings.end())
        throw ExpressionError("there is no setting " + quoted(name));
    if (found->channels > 1 && found->channels != m_channels)
        throw ExpressionError(quoted(name) + " has " + std::to_string(found->channels) +
                              " channels, and the command has not as many");
    return static_cast<std::size_t>(found - m_profile.settings.begin());
}

Expression Reader::readExpression(const JsonValue &value)
{
    if (value.kind == Kind::Number)
        return Expression(value.number);
    if (value.kind != Kind::String)
        throw ProfileError(value.position,
                           "an expression is a string or a number, not " + std::string{JsonValue::nameOf(value.kind)});
    try {
        return Expression(value.string, [this](std::string_view name) { return settingNamed(name); });
    } catch (const ExpressionError &error) {
        throw ProfileError(value.position, quoted(value.string) + ": " + error.what());
    }
}

Expression Reader::readExpression(const JsonFields &fields, std::string_view key, double otherwise)
{
    const JsonValue *value = fields.find(key);
    return value ? readExpression(*value) : Expression(otherwise);
}

void Reader::readCommand(const JsonValue &value)
{
    const JsonFields fields(value, "a command",
                            {"header", "parameters", "channels", "answer", "delay", "pending", "error"});
    ProfileCommand command;
    const JsonValue &header = fields.require("header");
    const HeaderPattern pattern = readHeader(header, true);
    command.header = header.string;
    command.channels = m_channels = readChannels(fields, pattern);
    claim(pattern, pattern.query, header.position);

    if (const JsonValue *parameters = fields.find("parameters")) {
        if (parameters->kind == Kind::Number) {
            command.leastParameters = command.mostParameters = fields.whole("parameters", 0, 0, 100);
        } else {
            const JsonFields range(*parameters, "\"parameters\"", {"min", "max"});
            command.leastParameters = range.whole("min", 0, 0, 100);
            command.mostParameters = range.whole("max", 100, command.leastParameters, 100);
        }
    }
    command.delay = fields.number("delay", 0, 0, MaxSeconds);
    command.pending = fields.number("pending", 0, 0, MaxSeconds);
    if (const JsonValue *error = fields.find("error"))
        command.error = readError(*error);
    if (const JsonValue *answer = fields.find("answer")) {
        if (!pattern.query)
            throw ProfileError(answer->position, "a command without \"?\" has no answer");
        if (command.error)
            throw ProfileError(answer->position, "a query with an \"error\" has no answer");
        command.answer = readAnswer(*answer);
    } else if (pattern.query && !command.error) {
        throw ProfileError(fields.position(), "a query needs an \"answer\" or an \"error\"");
    }
    m_profile.commands.push_back(std::move(command));
}

ScpiError Reader::readError(const JsonValue &value)
{
    constexpr double Least = -32768;
    constexpr double Most = 32767;
    constexpr std::size_t MaxInfo = 200;
    ScpiError error{0, {}};
    const JsonValue *number = &value;
    if (value.kind == Kind::Object) {
        const JsonFields fields(value, "\"error\"", {"number", "info"});
        number = &fields.require("number");
        if (const JsonValue *info = fields.find("info"))
            error.info = textOf(*info, "\"info\"", MaxInfo);
    }
    const double code = numberOf(*number, "an error number", Least, Most);
    if (code != std::floor(code) || code == 0)
        throw ProfileError(number->position, "an error number is a whole number and not 0");
    error.number = static_cast<int>(code);
    return error;
}

ProfileAnswer Reader::readAnswer(const JsonValue &value)
{
    if (value.kind == Kind::String)
        return FixedAnswer{textOf(value, "\"answer\"", MaxText)};
    constexpr std::string_view OneOf = "an answer is a string, or an object with one of the keys "
                                       "list counter random compute waveform";
    const JsonFields any(expect(value, Kind::Object, "\"answer\""), "an answer",
                         {"list", "counter", "random", "compute", "waveform", "style", "digits"});
    std::string_view key;
    for (const std::string_view each : {"list", "counter", "random", "compute", "waveform"}) {
        if (!any.find(each))
            continue;
        if (!key.empty())
            throw ProfileError(value.position, std::string{OneOf});
        key = each;
    }
    if (key.empty())
        throw ProfileError(value.position, std::string{OneOf});
    const JsonValue &what = any.require(key);
    const bool isNumber = key == "random" || key == "compute";
    for (const char *style : {"style", "digits"})
        if (const JsonValue *given = any.find(style); given && !isNumber)
            throw ProfileError(given->position, quoted(style) + " is for random and computed answers");

    if (key == "list") {
        ListAnswer answer;
        for (const JsonValue &text : expect(what, Kind::Array, "\"list\"").elements)
            answer.texts.push_back(textOf(text, "an answer of the list", MaxText));
        if (answer.texts.empty())
            throw ProfileError(what.position, "a list has at least one answer");
        return answer;
    }
    if (key == "counter") {
        const JsonFields fields(what, "\"counter\"", {"start", "step"});
        constexpr double Most = 1e15;
        CounterAnswer answer{fields.number("start", 0, -Most, Most), fields.number("step", 1, -Most, Most)};
        for (const char *part : {"start", "step"})
            if (const JsonValue *number = fields.find(part); number && number->number != std::floor(number->number))
                throw ProfileError(number->position, quoted(part) + " is a whole number");
        return answer;
    }
    if (key == "random") {
        const JsonFields fields(what, "\"random\"", {"min", "max"});
        constexpr double Most = 1e300;
        const double least = numberOf(fields.require("min"), "\"min\"", -Most, Most);
        return RandomAnswer{least, numberOf(fields.require("max"), "\"max\"", least, Most), readStyle(any)};
    }
    if (key == "compute")
        return ComputedAnswer{readExpression(what), readStyle(any)};
    return readWaveform(what);
}

template <typename Value, std::size_t Count>
void Reader::readChoice(const JsonValue &value, std::string_view what,
                        const std::array<std::pair<std::string_view, Value>, Count> &words, std::vector<Value> &values,
                        std::optional<std::size_t> &setting)
{
    const auto one = [&](const JsonValue &word) {
        const std::string &text = expect(word, Kind::String, what).string;
        std::string list;
        for (const auto &[name, each] : words) {
            if (name == text)
                return each;
            list.append(" ").append(name);
        }
        throw ProfileError(word.position, std::string{what} + " " + quoted(text) + " is none of" + list);
    };
    if (value.kind == Kind::String) {
        values = {one(value)};
        return;
    }
    const JsonFields fields(value, std::string{what}, {"setting", "values"});
    const JsonValue &name = fields.require("setting");
    try {
        setting = settingNamed(expect(name, Kind::String, "\"setting\"").string);
    } catch (const ExpressionError &error) {
        throw ProfileError(name.position, error.what());
    }
    const ProfileSetting &chooser = m_profile.settings[*setting];
    const JsonValue &list = expect(fields.require("values"), Kind::Array, "\"values\"");
    if (chooser.type != ProfileSetting::Type::Choice)
        throw ProfileError(name.position, quoted(chooser.name) + " is no setting of type \"choice\"");
    if (list.elements.size() != chooser.choices.size())
        throw ProfileError(list.position, quoted(chooser.name) + " has " + std::to_string(chooser.choices.size()) +
                                              " choices, and as many \"values\" are needed");
    for (const JsonValue &word : list.elements)
        values.push_back(one(word));
}

Waveform Reader::readWaveform(const JsonValue &value)
{
    using Shape = std::pair<std::string_view, WaveformShape>;
    using Format = std::pair<std::string_view, SampleFormat>;
    static constexpr std::array Shapes{Shape{"sine", WaveformShape::Sine}, Shape{"square", WaveformShape::Square},
                                       Shape{"triangle", WaveformShape::Triangle}, Shape{"ramp", WaveformShape::Ramp},
                                       Shape{"flat", WaveformShape::Flat}};
    static constexpr std::array Formats{
        Format{"int8", SampleFormat::Int8},      Format{"uint8", SampleFormat::Uint8},
        Format{"int16", SampleFormat::Int16},    Format{"uint16", SampleFormat::Uint16},
        Format{"int32", SampleFormat::Int32},    Format{"float32", SampleFormat::Float32},
        Format{"float64", SampleFormat::Float64}};
    const JsonFields fields(
        value, "\"waveform\"",
        {"shape", "format", "points", "amplitude", "offset", "periods", "noise", "scale", "byte-order"});
    Waveform waveform;
    readChoice(fields.require("shape"), "a shape", Shapes, waveform.shapes, waveform.shapeSetting);
    readChoice(fields.require("format"), "a format", Formats, waveform.formats, waveform.formatSetting);
    waveform.points = readExpression(fields.require("points"));
    waveform.amplitude = readExpression(fields, "amplitude", 1);
    waveform.offset = readExpression(fields, "offset", 0);
    waveform.periods = readExpression(fields, "periods", 1);
    waveform.noise = readExpression(fields, "noise", 0);
    waveform.scale = readExpression(fields, "scale", 1);
    if (const JsonValue *order = fields.find("byte-order"))
        waveform.bigEndian = wordOf(*order, "\"byte-order\"", {"big", "little"}) == 0;
    return waveform;
}

} // namespace

Profile readProfile(std::string_view text)
{
    return Reader().read(parseJson(text));
}

} // namespace simulator
