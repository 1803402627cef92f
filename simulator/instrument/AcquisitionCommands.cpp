#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

#include <array>

namespace simulator
{
namespace
{

constexpr Numeric Aperture{"S", Acquisition::MinAperture, Acquisition::MaxAperture, 0.001};
constexpr Numeric Delay{"S", 0, Acquisition::MaxDelay, 0};
constexpr Numeric Count{"", 1, Acquisition::MaxCount, 1};

Acquisition &acquisition(const Command &command)
{
    return command.instrument.sourceMeasure.acquisition;
}

template <typename Change>
void change(Command &command, Change change)
{
    if (acquisition(command).acquiring())
        throw ScpiError{-221, "acquisition under way"};
    AcquisitionSettings settings = acquisition(command).settings();
    change(settings);
    acquisition(command).apply(settings);
}

void addSeconds(CommandTable &table, const std::string &header, const Numeric &range,
                double AcquisitionSettings::*member)
{
    table.add(header, {1, 1}, [&range, member](Command &c) {
        const double value = c.arguments.number(range);
        change(c, [=](AcquisitionSettings &settings) { settings.*member = value; });
    });
    table.add(header + "?", {0, 1}, [&range, member](Command &c) {
        c.response.real(c.arguments.more() ? c.arguments.limit(range) : acquisition(c).settings().*member);
    });
}

void addCount(CommandTable &table, const std::string &header, unsigned AcquisitionSettings::*member)
{
    table.add(header, {1, 1}, [member](Command &c) {
        const auto value = static_cast<unsigned>(c.arguments.whole(Count));
        change(c, [=](AcquisitionSettings &settings) { settings.*member = value; });
    });
    table.add(header + "?", {0, 1}, [member](Command &c) {
        c.response.integer(c.arguments.more() ? static_cast<std::int64_t>(c.arguments.limit(Count))
                                              : acquisition(c).settings().*member);
    });
}

void addTrigger(CommandTable &table)
{
    table.add("TRIGger:SOURce", {1, 1}, [](Command &c) {
        const auto source = static_cast<TriggerSource>(c.arguments.choice({"IMMediate", "BUS", "HOLD"}));
        change(c, [=](AcquisitionSettings &settings) { settings.source = source; });
    });
    table.add("TRIGger:SOURce?", {}, [](Command &c) {
        constexpr std::array Names{"IMM", "BUS", "HOLD"};
        c.response.plain(Names.at(static_cast<std::size_t>(acquisition(c).settings().source)));
    });
    addSeconds(table, "TRIGger:DELay", Delay, &AcquisitionSettings::delay);
    addCount(table, "TRIGger:COUNt", &AcquisitionSettings::triggers);
    addCount(table, "SAMPle:COUNt", &AcquisitionSettings::samples);
    addSeconds(table, "SENSe:APERture", Aperture, &AcquisitionSettings::aperture);
    table.add("TRIGger[:IMMediate]", {}, [](Command &c) { acquisition(c).triggerNow(); });
    table.add("INITiate[:IMMediate]", {}, [](Command &c) { acquisition(c).initiate(); });
    table.add("INITiate:CONTinuous", {1, 1}, [](Command &c) { acquisition(c).setContinuous(c.arguments.boolean()); });
    table.add("INITiate:CONTinuous?", {},
              [](Command &c) { c.response.integer(acquisition(c).settings().continuous ? 1 : 0); });
    table.add("ABORt", {}, [](Command &c) { acquisition(c).abort(); });
}

void answerReadings(const Acquisition &acquisition, ResponseUnit &response)
{
    for (const double reading : acquisition.readings())
        response.real(reading);
}

/// Waits for readings that are on their way; a continuous acquisition gives the last ones that it has.
void fetch(Command &command)
{
    const Acquisition &source = acquisition(command);
    if (!source.acquiring() || source.settings().continuous)
        return answerReadings(source, command.response);
    if (source.needsTrigger())
        throw ScpiError{-214, {}};
    command.exchange.holdUntilIdle([&source](ResponseUnit &response) { answerReadings(source, response); });
}

void read(Command &command)
{
    Acquisition &source = acquisition(command);
    if (source.settings().source != TriggerSource::Immediate)
        throw ScpiError{-214, {}};
    source.abort();
    source.initiate();
    fetch(command);
}

} // namespace

void addAcquisitionCommands(CommandTable &table)
{
    addTrigger(table);
    table.add("FETCh?", {}, fetch);
    table.add("READ?", {}, read);
}

} // namespace simulator
