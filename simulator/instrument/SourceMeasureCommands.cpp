#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

namespace simulator
{
namespace
{

constexpr Numeric Voltage{"V", 0, SourceMeasure::MaxVoltage, 0};
constexpr Numeric Current{"A", SourceMeasure::MinCurrent, SourceMeasure::MaxCurrent, 0.1};
constexpr Numeric Load{"OHM", SourceMeasure::MinLoad, SourceMeasure::MaxLoad, SourceMeasure::DefaultLoad};

std::size_t channel(const Command &command)
{
    if (command.suffixes.empty())
        return 0; // the optional mnemonic that has the suffix was left out
    const unsigned suffix = command.suffixes.front();
    if (suffix < 1 || suffix > SourceMeasure::Channels)
        throw ScpiError{-114, {}};
    return suffix - 1;
}

/// The value, or with MINimum, MAXimum or DEFault behind the query what that stands for.
void tell(Command &command, const Numeric &range, double value)
{
    command.response.real(command.arguments.more() ? command.arguments.limit(range) : value);
}

template <typename Change>
void changeChannel(Command &command, Change change)
{
    SourceMeasure &source = command.instrument.sourceMeasure;
    ChannelSettings settings = source.channel(channel(command));
    change(settings);
    source.setChannel(channel(command), settings);
}

const ChannelSettings &settings(const Command &command)
{
    return command.instrument.sourceMeasure.channel(channel(command));
}

/// Command and query of a number of a channel, under each of the headers.
void addNumber(CommandTable &table, std::initializer_list<const char *> headers, const Numeric &range,
               double ChannelSettings::*member)
{
    for (const std::string header : headers) {
        table.add(header, {1, 1}, [&range, member](Command &c) {
            const double value = c.arguments.number(range);
            changeChannel(c, [=](ChannelSettings &settings) { settings.*member = value; });
        });
        table.add(header + "?", {0, 1}, [&range, member](Command &c) { tell(c, range, settings(c).*member); });
    }
}

void addSwitch(CommandTable &table, const std::string &header, bool ChannelSettings::*member)
{
    table.add(header, {1, 1}, [member](Command &c) {
        const bool on = c.arguments.boolean();
        changeChannel(c, [=](ChannelSettings &settings) { settings.*member = on; });
    });
    table.add(header + "?", {}, [member](Command &c) { c.response.integer(settings(c).*member ? 1 : 0); });
}

} // namespace

void addSourceMeasureCommands(CommandTable &table)
{
    addNumber(table, {"[SOURce#]:VOLTage[:LEVel][:IMMediate][:AMPLitude]"}, Voltage, &ChannelSettings::voltage);
    addNumber(table, {"[SOURce#]:CURRent[:LIMit]", "[SOURce#]:CURRent[:LEVel][:IMMediate][:AMPLitude]"}, Current,
              &ChannelSettings::currentLimit);
    addSwitch(table, "[SOURce#]:CURRent:PROTection[:STATe]", &ChannelSettings::protection);
    table.add("[SOURce#]:CURRent:PROTection:TRIPped?", {},
              [](Command &c) { c.response.integer(c.instrument.sourceMeasure.tripped(channel(c)) ? 1 : 0); });
    addSwitch(table, "OUTPut#[:STATe]", &ChannelSettings::output);
    table.add("OUTPut#:PROTection:CLEar", {}, [](Command &c) { c.instrument.sourceMeasure.clearTrip(channel(c)); });

    table.add("SIMulate#:LOAD", {1, 1}, [](Command &c) {
        const double ohms = c.arguments.number(Load);
        c.instrument.sourceMeasure.setLoad(channel(c), ohms);
    });
    table.add("SIMulate#:LOAD?", {0, 1},
              [](Command &c) { tell(c, Load, c.instrument.sourceMeasure.load(channel(c))); });

    table.add("MEASure#[:SCALar]:VOLTage[:DC]?", {},
              [](Command &c) { c.response.real(c.instrument.sourceMeasure.measureVoltage(channel(c))); });
    table.add("MEASure#[:SCALar]:CURRent[:DC]?", {},
              [](Command &c) { c.response.real(c.instrument.sourceMeasure.measureCurrent(channel(c))); });
}

} // namespace simulator
