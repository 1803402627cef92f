#include "simulator/profile/ProfileModel.h"

#include "simulator/instrument/Command.h"
#include "simulator/profile/HeaderPattern.h"
#include "simulator/profile/NumberText.h"
#include "simulator/profile/Profile.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <memory>
#include <random>
#include <utility>

namespace simulator
{
namespace
{

constexpr double LargestCount = 9e15;

std::chrono::nanoseconds nanoseconds(double seconds)
{
    return std::chrono::duration_cast<std::chrono::nanoseconds>(std::chrono::duration<double>{seconds});
}

/// As short as it can be and still the same number.
std::string exactText(double value)
{
    std::array<char, 32> buffer;
    std::string text{buffer.data(), std::to_chars(buffer.data(), buffer.data() + buffer.size(), value + 0.0).ptr};
    std::replace(text.begin(), text.end(), 'e', 'E');
    return text;
}

std::string shortForm(const ProfileSetting &setting, double value)
{
    std::string word = setting.choices.at(static_cast<std::size_t>(value));
    std::erase_if(word, [](char c) { return c >= 'a' && c <= 'z'; });
    return word;
}

/// The profile at work: what its commands share. They hold it.
class Model : public std::enable_shared_from_this<Model>
{
public:
    Model(Profile profile, Instrument &instrument)
        : m_profile(std::move(profile)), m_instrument(instrument), m_random(instrument.options().seed)
    {
    }

    void install();

private:
    std::string units();
    void addSetting(const ProfileSetting &setting);
    void addCommand(const ProfileCommand &command);
    void addTo(const std::string &header, bool query, Arity arity, const CommandTable::Handler &handler);

    void set(const ProfileSetting &setting, Command &command);
    void tell(const ProfileSetting &setting, Command &command);
    void execute(const ProfileCommand &command, std::size_t &turn, Command &call);
    void answer(const ProfileCommand &command, std::size_t &turn, unsigned channel, ResponseUnit &response);
    void answerCounter(const CounterAnswer &counter, std::size_t &turn, ResponseUnit &response);
    void answerWaveform(const Waveform &waveform, unsigned channel, ResponseUnit &response);

    static unsigned channelOf(unsigned channels, const Command &command);
    double &valueOf(const ProfileSetting &setting, unsigned channel)
    {
        return m_instrument.profileSettings.at(setting.firstValue + (setting.channels > 1 ? channel : 0));
    }
    Expression::Surroundings surroundings(unsigned channel)
    {
        return {[this, channel](std::size_t index) { return valueOf(m_profile.settings[index], channel); },
                [this] { return m_normal(m_random); }};
    }
    /// Begins an overlapped operation of so many seconds.
    void begin(double seconds);

    const Profile m_profile;
    Instrument &m_instrument;
    std::mt19937_64 m_random;
    std::normal_distribution<double> m_normal;
};

void Model::install()
{
    for (const ProfileSetting &setting : m_profile.settings)
        m_instrument.profileDefaults.insert(m_instrument.profileDefaults.end(), setting.channels, setting.initial);
    m_instrument.profileSettings = m_instrument.profileDefaults;
    m_instrument.learnProfile = [self = shared_from_this()] { return self->units(); };
    for (const ProfileSetting &setting : m_profile.settings)
        addSetting(setting);
    for (const ProfileCommand &command : m_profile.commands)
        addCommand(command);
}

/// Program message units that bring back the settings as they are.
std::string Model::units()
{
    std::string result;
    for (const ProfileSetting &setting : m_profile.settings) {
        const std::string path = HeaderPattern(setting.header).paths.front();
        const std::size_t mark = path.find('#');
        for (unsigned channel = 0; channel < setting.channels; ++channel) {
            const double value = valueOf(setting, channel);
            std::string header = path;
            if (mark != std::string::npos)
                header.replace(mark, 1, std::to_string(channel + 1));
            result += ";:" + header + " " +
                      (setting.type == ProfileSetting::Type::Choice ? shortForm(setting, value) : exactText(value));
        }
    }
    return result;
}

void Model::addTo(const std::string &header, bool query, Arity arity, const CommandTable::Handler &handler)
{
    for (const std::string &path : HeaderPattern(header).paths)
        m_instrument.commands.add(path + (query ? "?" : ""), arity, handler);
}

void Model::addSetting(const ProfileSetting &setting)
{
    const auto self = shared_from_this();
    const bool number = setting.type == ProfileSetting::Type::Number || setting.type == ProfileSetting::Type::Integer;
    addTo(setting.header, false, {1, 1}, [self, &setting](Command &command) { self->set(setting, command); });
    addTo(setting.header, true, {0, number ? std::size_t{1} : 0},
          [self, &setting](Command &command) { self->tell(setting, command); });
}

void Model::addCommand(const ProfileCommand &command)
{
    const auto turn = std::make_shared<std::size_t>(0);
    addTo(command.header, command.header.ends_with('?'), {command.leastParameters, command.mostParameters},
          [self = shared_from_this(), &command, turn](Command &call) { self->execute(command, *turn, call); });
}

unsigned Model::channelOf(unsigned channels, const Command &command)
{
    if (command.suffixes.empty())
        return 0;
    const unsigned suffix = command.suffixes.front();
    if (suffix < 1 || suffix > channels)
        throw ScpiError{-114, {}};
    return suffix - 1;
}

void Model::set(const ProfileSetting &setting, Command &command)
{
    const unsigned channel = channelOf(setting.channels, command);
    const Numeric range{setting.unit, setting.least, setting.most, setting.initial};
    double value = 0;
    switch (setting.type) {
    case ProfileSetting::Type::Number:
        value = command.arguments.number(range);
        break;
    case ProfileSetting::Type::Integer:
        value = static_cast<double>(command.arguments.whole(range));
        break;
    case ProfileSetting::Type::Boolean:
        value = command.arguments.boolean() ? 1 : 0;
        break;
    case ProfileSetting::Type::Choice:
        value = static_cast<double>(command.arguments.choice(std::span{setting.choices}));
        break;
    }
    valueOf(setting, channel) = value;
    begin(setting.pending);
}

void Model::tell(const ProfileSetting &setting, Command &command)
{
    const unsigned channel = channelOf(setting.channels, command);
    double value = valueOf(setting, channel);
    switch (setting.type) {
    case ProfileSetting::Type::Number:
    case ProfileSetting::Type::Integer:
        if (command.arguments.more())
            value = command.arguments.limit({setting.unit, setting.least, setting.most, setting.initial});
        return command.response.plain(numberText(value, setting.style));
    case ProfileSetting::Type::Boolean:
        return command.response.integer(value != 0 ? 1 : 0);
    case ProfileSetting::Type::Choice:
        return command.response.plain(shortForm(setting, value));
    }
}

void Model::execute(const ProfileCommand &command, std::size_t &turn, Command &call)
{
    const unsigned channel = channelOf(command.channels, call);
    if (!command.error)
        begin(command.pending);
    if (command.delay == 0)
        return answer(command, turn, channel, call.response);
    call.exchange.holdFor(nanoseconds(command.delay),
                          [self = shared_from_this(), &command, &turn, channel](ResponseUnit &response) {
                              self->answer(command, turn, channel, response);
                          });
}

void Model::answer(const ProfileCommand &command, std::size_t &turn, unsigned channel, ResponseUnit &response)
{
    if (command.error)
        throw ScpiError{*command.error};
    if (!command.answer)
        return;
    const ProfileAnswer &form = *command.answer;
    if (const auto *fixed = std::get_if<FixedAnswer>(&form))
        return response.plain(fixed->text);
    if (const auto *list = std::get_if<ListAnswer>(&form))
        return response.plain(list->texts[turn++ % list->texts.size()]);
    if (const auto *counter = std::get_if<CounterAnswer>(&form))
        return answerCounter(*counter, turn, response);
    if (const auto *random = std::get_if<RandomAnswer>(&form)) {
        std::uniform_real_distribution<double> between(0, 1);
        const double value = random->least + (random->most - random->least) * between(m_random);
        return response.plain(numberText(value, random->style));
    }
    if (const auto *computed = std::get_if<ComputedAnswer>(&form))
        return response.plain(numberText(computed->expression.value(surroundings(channel)), computed->style));
    answerWaveform(std::get<Waveform>(form), channel, response);
}

void Model::answerCounter(const CounterAnswer &counter, std::size_t &turn, ResponseUnit &response)
{
    double value = counter.start + counter.step * static_cast<double>(turn++);
    if (std::abs(value) > LargestCount) {
        turn = 1;
        value = counter.start;
    }
    response.integer(static_cast<std::int64_t>(value));
}

void Model::answerWaveform(const Waveform &waveform, unsigned channel, ResponseUnit &response)
{
    const std::vector<std::byte> samples = samplesOf(waveform, surroundings(channel));
    auto block = std::make_shared<Bytes>(m_instrument.blocks);
    if (!block->append(samples, samples.size()))
        throw ScpiError{-321, {}};
    response.block(std::move(block));
}

void Model::begin(double seconds)
{
    if (seconds == 0)
        return;
    m_instrument.operations.begin();
    m_instrument.timers.after(nanoseconds(seconds), [this, self = shared_from_this()] {
        m_instrument.operations.end();
        m_instrument.publishStatus();
    });
}

} // namespace

void applyProfile(const Profile &profile, InstrumentOptions &options)
{
    Identification &identification = options.identification;
    identification.manufacturer = profile.manufacturer.value_or(identification.manufacturer);
    identification.model = profile.model.value_or(identification.model);
    identification.serial = profile.serial.value_or(identification.serial);
    identification.firmware = profile.firmware.value_or(identification.firmware);
    options.errorQueue = profile.errorQueue.value_or(options.errorQueue);
    options.sourceMeasure = profile.sourceMeasure;
}

void installProfile(const Profile &profile, Instrument &instrument)
{
    std::make_shared<Model>(profile, instrument)->install();
}

} // namespace simulator
