#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

namespace simulator
{
namespace
{

constexpr Numeric Voltage{"V", 0, SourceMeasure::MaxVoltage, 0};
constexpr Numeric Current{"A", SourceMeasure::MinCurrent, SourceMeasure::MaxCurrent, 0.1};
constexpr Numeric Load{"OHM", SourceMeasure::MinLoad, SourceMeasure::MaxLoad, SourceMeasure::DefaultLoad};
constexpr Numeric Aperture{"S", SourceMeasure::MinAperture, SourceMeasure::MaxAperture, 0.001};

std::size_t channel(const Command &command)
{
    const unsigned suffix = command.suffixes.front();
    if (suffix < 1 || suffix > SourceMeasure::Channels)
        throw ScpiError{-114, {}};
    return suffix - 1;
}

/// The value, or with MINimum, MAXimum or DEFault behind the query what that stands for.
void tell(Command &command, const Numeric &range, double value)
{
    command.response.real(command.arguments.more() ? command.arguments.number(range) : value);
}

template <typename Change>
void changeChannel(Command &command, Change change)
{
    SourceMeasure::Settings settings = command.instrument.sourceMeasure.settings();
    change(settings.channels[channel(command)]);
    command.instrument.sourceMeasure.apply(settings);
}

const ChannelSettings &channelSettings(const Command &command)
{
    return command.instrument.sourceMeasure.settings().channels[channel(command)];
}

template <typename Change>
void changeAcquisition(Command &command, Change change)
{
    if (command.instrument.sourceMeasure.acquiring())
        throw ScpiError{-221, "acquisition under way"};
    SourceMeasure::Settings settings = command.instrument.sourceMeasure.settings();
    change(settings.acquisition);
    command.instrument.sourceMeasure.apply(settings);
}

const AcquisitionSettings &acquisitionSettings(const Command &command)
{
    return command.instrument.sourceMeasure.settings().acquisition;
}

void addSource(CommandTable &table)
{
    const char *voltage = "SOURce#:VOLTage[:LEVel][:IMMediate][:AMPLitude]";
    table.add(voltage, {1, 1}, [](Command &c) {
        const double value = c.arguments.number(Voltage);
        changeChannel(c, [=](ChannelSettings &settings) { settings.voltage = value; });
    });
    table.add(std::string{voltage} + "?", {0, 1}, [](Command &c) { tell(c, Voltage, channelSettings(c).voltage); });

    for (const char *current : {"SOURce#:CURRent[:LIMit]", "SOURce#:CURRent[:LEVel][:IMMediate][:AMPLitude]"}) {
        table.add(current, {1, 1}, [](Command &c) {
            const double value = c.arguments.number(Current);
            changeChannel(c, [=](ChannelSettings &settings) { settings.currentLimit = value; });
        });
        table.add(std::string{current} + "?", {0, 1},
                  [](Command &c) { tell(c, Current, channelSettings(c).currentLimit); });
    }

    table.add("OUTPut#[:STATe]", {1, 1}, [](Command &c) {
        const bool on = c.arguments.boolean();
        changeChannel(c, [=](ChannelSettings &settings) { settings.output = on; });
    });
    table.add("OUTPut#[:STATe]?", {}, [](Command &c) { c.response.integer(channelSettings(c).output ? 1 : 0); });

    table.add("SIMulate#:LOAD", {1, 1}, [](Command &c) {
        const double ohms = c.arguments.number(Load);
        c.instrument.sourceMeasure.setLoad(channel(c), ohms);
    });
    table.add("SIMulate#:LOAD?", {0, 1},
              [](Command &c) { tell(c, Load, c.instrument.sourceMeasure.load(channel(c))); });
}

void answerReadings(Instrument &instrument, ResponseUnit &response)
{
    for (const double reading : instrument.sourceMeasure.readings())
        response.real(reading);
}

/// Waits for readings that are on their way.
void fetch(Command &command)
{
    Instrument &instrument = command.instrument;
    if (instrument.sourceMeasure.waitsForTrigger())
        throw ScpiError{-214, {}};
    if (!instrument.sourceMeasure.acquiring())
        return answerReadings(instrument, command.response);
    command.exchange.holdUntilIdle([&instrument](ResponseUnit &response) { answerReadings(instrument, response); });
}

void read(Command &command)
{
    if (acquisitionSettings(command).busTrigger)
        throw ScpiError{-214, {}};
    command.instrument.sourceMeasure.abort();
    command.instrument.sourceMeasure.initiate();
    fetch(command);
}

void addReadings(CommandTable &table)
{
    table.add("MEASure#[:SCALar]:VOLTage[:DC]?", {},
              [](Command &c) { c.response.real(c.instrument.sourceMeasure.measureVoltage(channel(c))); });
    table.add("MEASure#[:SCALar]:CURRent[:DC]?", {},
              [](Command &c) { c.response.real(c.instrument.sourceMeasure.measureCurrent(channel(c))); });
    table.add("INITiate[:IMMediate]", {}, [](Command &c) { c.instrument.sourceMeasure.initiate(); });
    table.add("ABORt", {}, [](Command &c) { c.instrument.sourceMeasure.abort(); });
    table.add("FETCh?", {}, fetch);
    table.add("READ?", {}, read);
}

void addTrigger(CommandTable &table)
{
    table.add("TRIGger:SOURce", {1, 1}, [](Command &c) {
        const bool bus = c.arguments.choice({"IMMediate", "BUS"}) == 1;
        changeAcquisition(c, [=](AcquisitionSettings &settings) { settings.busTrigger = bus; });
    });
    table.add("TRIGger:SOURce?", {},
              [](Command &c) { c.response.plain(acquisitionSettings(c).busTrigger ? "BUS" : "IMM"); });
    table.add("SAMPle:COUNt", {1, 1}, [](Command &c) {
        const auto count = static_cast<unsigned>(c.arguments.integer(1, SourceMeasure::MaxCount));
        changeAcquisition(c, [=](AcquisitionSettings &settings) { settings.count = count; });
    });
    table.add("SAMPle:COUNt?", {}, [](Command &c) { c.response.integer(acquisitionSettings(c).count); });
    table.add("SENSe:APERture", {1, 1}, [](Command &c) {
        const double seconds = c.arguments.number(Aperture);
        changeAcquisition(c, [=](AcquisitionSettings &settings) { settings.aperture = seconds; });
    });
    table.add("SENSe:APERture?", {0, 1}, [](Command &c) { tell(c, Aperture, acquisitionSettings(c).aperture); });
}

} // namespace

void addSourceMeasureCommands(CommandTable &table)
{
    addSource(table);
    addReadings(table);
    addTrigger(table);
}

} // namespace simulator
