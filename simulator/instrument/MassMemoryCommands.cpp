#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

namespace simulator
{
namespace
{

void catalog(Command &command)
{
    const MassMemory &memory = command.instrument.massMemory;
    if (command.arguments.more())
        memory.checkDirectory(command.arguments.string());
    ResponseUnit &response = command.response;
    response.integer(static_cast<std::int64_t>(memory.used()));
    response.integer(static_cast<std::int64_t>(memory.free()));
    memory.forEach(
        [&](const std::string &name, std::size_t size) { response.string(name + ",BIN," + std::to_string(size)); });
}

} // namespace

void addMassMemoryCommands(CommandTable &table)
{
    table.add("MMEMory:DATA", {2, 2}, [](Command &c) {
        const std::string name = c.arguments.string();
        c.instrument.massMemory.store(name, c.arguments.block());
    });
    table.add("MMEMory:DATA?", {1, 1},
              [](Command &c) { c.response.block(c.instrument.massMemory.load(c.arguments.string())); });
    table.add("MMEMory:DELete", {1, 1}, [](Command &c) { c.instrument.massMemory.remove(c.arguments.string()); });
    table.add("MMEMory:CATalog?", {0, 1}, catalog);
    table.add("MMEMory:CDIRectory", {0, 1}, [](Command &c) {
        if (c.arguments.more())
            c.instrument.massMemory.checkDirectory(c.arguments.string());
    });
    table.add("MMEMory:CDIRectory?", {}, [](Command &c) { c.response.string("C:\\"); });
    table.add("MMEMory:MSIS", {0, 1}, [](Command &c) {
        if (c.arguments.more())
            c.instrument.massMemory.checkDrive(c.arguments.string());
    });
    table.add("MMEMory:MSIS?", {}, [](Command &c) { c.response.string("C:"); });
}

} // namespace simulator
