#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

#include <limits>

namespace simulator
{
namespace
{

constexpr std::int64_t MostNumber = std::numeric_limits<std::int32_t>::max();

void addFault(Command &command)
{
    const std::string text = command.arguments.string();
    try {
        if (!command.instrument.faults.add(parseFaultSpec(text)))
            throw ScpiError{-223, "too many faults"};
    } catch (const FaultSpecError &error) {
        throw ScpiError{-224, error.what()};
    }
}

unsigned numberOf(Command &command)
{
    return static_cast<unsigned>(command.arguments.integer(1, MostNumber));
}

void deleteFault(Command &command)
{
    if (command.arguments.isWord("ALL"))
        return command.instrument.faults.clear();
    if (!command.instrument.faults.remove(numberOf(command)))
        throw ScpiError{-224, "there is no such fault"};
}

void listFaults(Command &command)
{
    const Faults &faults = command.instrument.faults;
    command.response.integer(static_cast<std::int64_t>(faults.entries().size()));
    for (const Faults::Entry &entry : faults.entries()) {
        command.response.integer(entry.number);
        command.response.string(entry.spec.text);
    }
}

void countFault(Command &command)
{
    const Faults::Entry *entry = command.instrument.faults.find(numberOf(command));
    if (!entry)
        throw ScpiError{-224, "there is no such fault"};
    command.response.integer(static_cast<std::int64_t>(entry->struck));
}

} // namespace

void addFaultCommands(CommandTable &table)
{
    table.add("DIAGnostic:FAULt:ADD", {1, 1}, addFault);
    table.add("DIAGnostic:FAULt:LIST?", {}, listFaults);
    table.add("DIAGnostic:FAULt:DELete", {1, 1}, deleteFault);
    table.add("DIAGnostic:FAULt:COUNt?", {1, 1}, countFault);
    table.add("DIAGnostic:FAULt:SEED", {1, 1}, [](Command &c) {
        c.instrument.faults.restart(static_cast<std::uint64_t>(c.arguments.integer(0, MostNumber)));
    });
    table.add("DIAGnostic:FAULt:SEED?", {},
              [](Command &c) { c.response.integer(static_cast<std::int64_t>(c.instrument.faults.seed())); });
}

} // namespace simulator
