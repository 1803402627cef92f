#include "simulator/web/InstrumentState.h"

#include "simulator/instrument/StatusBits.h"

#include <algorithm>
#include <array>
#include <utility>

namespace simulator
{
namespace
{

struct BitName {
    unsigned bit;
    const char *name;
};

constexpr std::array StatusByteNames = {
    BitName{StbErrorAvailable, "error available"},     BitName{StbQuestionable, "questionable"},
    BitName{StbMessageAvailable, "message available"}, BitName{StbStandardEvent, "standard event"},
    BitName{StbRequestService, "master summary"},      BitName{StbOperation, "operation"}};
constexpr std::array StandardEventNames = {BitName{EsrOperationComplete, "operation complete"},
                                           BitName{EsrRequestControl, "request control"},
                                           BitName{EsrQueryError, "query error"},
                                           BitName{EsrDeviceError, "device error"},
                                           BitName{EsrExecutionError, "execution error"},
                                           BitName{EsrCommandError, "command error"},
                                           BitName{EsrUserRequest, "user request"},
                                           BitName{EsrPowerOn, "power on"}};
constexpr std::array OperationNames = {BitName{OperationMeasuring, "measuring"},
                                       BitName{OperationWaitingForTrigger, "waiting for trigger"}};
constexpr std::array QuestionableNames = {BitName{QuestionableVoltage, "voltage"}};

template <std::size_t Count>
std::vector<std::string> bitsIn(unsigned value, const std::array<BitName, Count> &names)
{
    std::vector<std::string> result;
    for (unsigned bit = 1; bit < 0x10000; bit <<= 1) {
        if ((value & bit) == 0)
            continue;
        std::string name = "bit " + std::to_string(bit);
        for (const BitName &known : names)
            if (known.bit == bit)
                name = known.name;
        result.push_back(std::move(name));
    }
    return result;
}

template <std::size_t Count>
InstrumentState::Register group(std::string name, const RegisterGroup &registers,
                                const std::array<BitName, Count> &names)
{
    return {std::move(name),
            registers.condition(),
            true,
            registers.event(),
            registers.enable,
            bitsIn(registers.condition(), names),
            bitsIn(registers.event(), names)};
}

std::vector<InstrumentState::Register> registersOf(const Instrument &instrument)
{
    const StatusModel &status = instrument.status;
    unsigned byte = instrument.statusSummary();
    if ((byte & status.serviceEnable()) != 0)
        byte |= StbRequestService;
    const auto byteBits = bitsIn(byte, StatusByteNames);
    const auto eventBits = bitsIn(status.event(), StandardEventNames);
    return {{"Status byte", byte, false, byte, status.serviceEnable(), byteBits, byteBits},
            {"Standard event", status.event(), false, status.event(), status.eventEnable(), eventBits, eventBits},
            group("Operation", status.operation, OperationNames),
            group("Questionable", status.questionable, QuestionableNames)};
}

/// Taken from what *LRN? would say of them: ";:HEADer value" each.
std::vector<std::pair<std::string, std::string>> settingsOf(const Instrument &instrument)
{
    std::vector<std::pair<std::string, std::string>> result;
    std::string units = instrument.learnProfile ? instrument.learnProfile() : std::string{};
    for (std::size_t next = 0; !units.empty(); units.erase(0, next)) {
        next = std::min(units.find(";:", 1), units.size());
        const std::size_t blank = std::min(units.find(' '), next);
        result.emplace_back(units.substr(2, blank - 2), units.substr(blank + 1, next - blank - 1));
    }
    return result;
}

} // namespace

std::vector<ServedAt> servicesIn(const std::vector<std::string> &startLines)
{
    std::vector<ServedAt> services;
    for (const std::string &line : startLines) {
        const std::string resource = line.substr(line.rfind(' ') + 1);
        if (resource.find("::") != resource.npos && (resource.ends_with("::INSTR") || resource.ends_with("::SOCKET")))
            services.push_back({line.substr(0, line.find(' ')), resource});
    }
    return services;
}

InstrumentState stateOf(const Instrument &instrument, const std::vector<std::string> &startLines)
{
    InstrumentState state;
    state.identity = instrument.identification();
    state.services = servicesIn(startLines);
    const SourceMeasure &source = instrument.sourceMeasure;
    for (std::size_t i = 0; instrument.options().sourceMeasure && i < SourceMeasure::Channels; ++i) {
        const ChannelSettings &set = source.channel(i);
        const SourceMeasure::Point present = source.point(i);
        state.channels.push_back({set.voltage, set.currentLimit, set.output, source.load(i), present.voltage,
                                  present.current, present.limited});
    }
    state.acquisition = !source.acquisition.acquiring()        ? "idle"
                        : source.acquisition.waitsForTrigger() ? "waiting for trigger"
                                                               : "measuring";
    state.settings = settingsOf(instrument);
    state.remote = instrument.remote.name();
    state.registers = registersOf(instrument);
    state.errors = instrument.errors.size();
    state.exclusivelyLocked = instrument.locks.exclusivelyLocked();
    state.lockHolders = instrument.locks.holders();
    for (const TrafficLog::Client *client : instrument.traffic.clients())
        state.clients.push_back({client->protocol(), client->name(), client->messages()});
    instrument.massMemory.forEach([&](const std::string &name, std::size_t size) {
        if (state.fileCount++ < InstrumentState::MaxFiles)
            state.files.push_back({name, size});
    });
    state.memoryUsed = instrument.massMemory.used();
    state.memoryFree = instrument.massMemory.free();
    return state;
}

} // namespace simulator
