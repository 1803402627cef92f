#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

#include <array>
#include <chrono>
#include <locale>
#include <sstream>

namespace simulator
{
namespace
{

constexpr std::chrono::milliseconds SelfTestTime{20};

void clearStatus(Command &command)
{
    command.exchange.forgetOperationComplete();
    command.instrument.status.clearEvents();
    command.instrument.errors.clear();
}

void reset(Command &command)
{
    command.exchange.forgetOperationComplete();
    command.instrument.reset();
}

void identify(Command &command)
{
    const Identification &own = command.instrument.identification();
    command.response.arbitrary(own.manufacturer + "," + own.model + "," + own.serial + "," + own.firmware);
}

void save(Command &command)
{
    const auto index = static_cast<std::size_t>(command.arguments.integer(0, Instrument::Memories - 1));
    command.instrument.memories[index] = {command.instrument.sourceMeasure.settings(),
                                          command.instrument.profileSettings};
}

void recall(Command &command)
{
    const auto index = static_cast<std::size_t>(command.arguments.integer(0, Instrument::Memories - 1));
    const auto &memory = command.instrument.memories[index];
    if (!memory)
        throw ScpiError{-224, "nothing saved"};
    command.instrument.sourceMeasure.apply(memory->settings);
    command.instrument.profileSettings = memory->profileSettings;
}

/// Program message units that bring back all settings.
void learn(Command &command)
{
    const SourceMeasure::Settings settings = command.instrument.sourceMeasure.settings();
    const AcquisitionSettings &acquisition = settings.acquisition;
    constexpr std::array Sources{"IMM", "BUS", "HOLD"};
    std::ostringstream units;
    units.imbue(std::locale::classic());
    units << std::scientific << std::uppercase << "*RST";
    if (command.instrument.learnProfile)
        units << command.instrument.learnProfile();
    if (!command.instrument.options().sourceMeasure)
        return command.response.arbitrary(units.str());
    for (std::size_t i = 0; i < settings.channels.size(); ++i) {
        const ChannelSettings &channel = settings.channels.at(i);
        units << ";:SOUR" << i + 1 << ":VOLT " << channel.voltage << ";CURR " << channel.currentLimit << ";CURR:PROT "
              << channel.protection << ";:OUTP" << i + 1 << ' ' << channel.output;
    }
    units << ";:TRIG:SOUR " << Sources.at(static_cast<std::size_t>(acquisition.source)) << ";DEL " << acquisition.delay
          << ";COUN " << acquisition.triggers << ";:SAMP:COUN " << acquisition.samples << ";:SENS:APER "
          << acquisition.aperture << ";:INIT:CONT " << acquisition.continuous;
    command.response.arbitrary(units.str());
}

void addStatusByteCommands(CommandTable &table)
{
    table.add("*CLS", {}, clearStatus);
    table.add("*ESE", {1, 1}, [](Command &c) {
        c.instrument.status.setEventEnable(static_cast<std::uint8_t>(c.arguments.integer(0, 255)));
    });
    table.add("*ESE?", {}, [](Command &c) { c.response.integer(c.instrument.status.eventEnable()); });
    table.add("*ESR?", {}, [](Command &c) { c.response.integer(c.instrument.status.takeEvent()); });
    table.add("*SRE", {1, 1}, [](Command &c) {
        c.instrument.status.setServiceEnable(static_cast<std::uint8_t>(c.arguments.integer(0, 255)));
    });
    table.add("*SRE?", {}, [](Command &c) { c.response.integer(c.instrument.status.serviceEnable()); });
    table.add("*STB?", {}, [](Command &c) { c.response.integer(c.exchange.masterSummaryByte()); });
    table.add("*PSC", {1, 1}, [](Command &c) { c.instrument.powerOnClear = c.arguments.integer(-32767, 32767) != 0; });
    table.add("*PSC?", {}, [](Command &c) { c.response.integer(c.instrument.powerOnClear ? 1 : 0); });
}

void addSynchronisationCommands(CommandTable &table)
{
    table.add("*OPC", {}, [](Command &c) { c.exchange.noteOperationComplete(); });
    table.add("*OPC?", {},
              [](Command &c) { c.exchange.holdUntilIdle([](ResponseUnit &response) { response.integer(1); }); });
    table.add("*WAI", {}, [](Command &c) { c.exchange.holdUntilIdle([](ResponseUnit &) {}); });
    table.add("*TRG", {}, [](Command &c) { c.instrument.trigger(); });
}

} // namespace

void addCommonCommands(CommandTable &table)
{
    addStatusByteCommands(table);
    addSynchronisationCommands(table);
    table.add("*IDN?", {}, identify);
    table.add("*OPT?", {}, [](Command &c) { c.response.arbitrary("0"); });
    table.add("*LRN?", {}, learn);
    table.add("*RST", {}, reset);
    table.add("*SAV", {1, 1}, save);
    table.add("*RCL", {1, 1}, recall);
    table.add("*TST?", {}, [](Command &c) {
        c.exchange.holdFor(SelfTestTime, [](ResponseUnit &response) { response.integer(0); });
    });
}

} // namespace simulator
