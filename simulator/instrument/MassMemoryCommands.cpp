#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

#include <array>

namespace simulator
{
namespace
{

/// Listing of the directory that an optional parameter names.
std::vector<MassMemory::Entry> entries(Command &command)
{
    return command.instrument.massMemory.list(command.arguments.more() ? command.arguments.string() : std::string{});
}

void catalog(Command &command)
{
    const std::vector<MassMemory::Entry> files = entries(command);
    ResponseUnit &response = command.response;
    response.integer(static_cast<std::int64_t>(command.instrument.massMemory.used()));
    response.integer(static_cast<std::int64_t>(command.instrument.massMemory.free()));
    for (const MassMemory::Entry &entry : files)
        response.string(entry.name + (entry.isDirectory ? ",DIR," : ",BIN,") + std::to_string(entry.size));
}

/// Names alone, those of directories with a separator behind; the empty string when there are none.
void directory(Command &command)
{
    for (const MassMemory::Entry &entry : entries(command))
        command.response.string(entry.isDirectory ? entry.name + "\\" : entry.name);
    if (command.response.empty())
        command.response.string("");
}

void directoryCatalog(Command &command)
{
    for (const MassMemory::Entry &entry : entries(command))
        if (entry.isDirectory)
            command.response.string(entry.name);
    if (command.response.empty())
        command.response.string("");
}

template <auto Action>
void onPath(Command &command)
{
    (command.instrument.massMemory.*Action)(command.arguments.string());
}

template <auto Action>
void onTwoPaths(Command &command)
{
    const std::string from = command.arguments.string();
    (command.instrument.massMemory.*Action)(from, command.arguments.string());
}

void addFiles(CommandTable &table)
{
    table.add("MMEMory:DATA", {2, 2}, [](Command &c) {
        const std::string name = c.arguments.string();
        c.instrument.massMemory.store(name, c.arguments.block());
    });
    table.add("MMEMory:DATA?", {1, 1},
              [](Command &c) { c.response.block(c.instrument.massMemory.load(c.arguments.string())); });
    table.add("MMEMory:DELete", {1, 1}, onPath<&MassMemory::remove>);
    table.add("MMEMory:COPY", {2, 2}, onTwoPaths<&MassMemory::copy>);
    table.add("MMEMory:MOVE", {2, 2}, onTwoPaths<&MassMemory::move>);
}

void addDirectories(CommandTable &table)
{
    table.add("MMEMory:CATalog?", {0, 1}, catalog);
    table.add("MMEMory:CATalog:LENGth?", {0, 1},
              [](Command &c) { c.response.integer(static_cast<std::int64_t>(entries(c).size())); });
    table.add("MMEMory:DCATalog?", {0, 1}, directoryCatalog);
    table.add("MMEMory:DIRectory?", {0, 1}, directory);
    table.add("MMEMory:MDIRectory", {1, 1}, onPath<&MassMemory::makeDirectory>);
    table.add("MMEMory:RDIRectory", {1, 1}, onPath<&MassMemory::removeDirectory>);
    table.add("MMEMory:CDIRectory", {0, 1}, [](Command &c) {
        c.instrument.massMemory.changeDirectory(c.arguments.more() ? c.arguments.string() : std::string{});
    });
    table.add("MMEMory:CDIRectory?", {},
              [](Command &c) { c.response.string(c.instrument.massMemory.currentDirectory()); });
    table.add("MMEMory:MSIS", {0, 1}, [](Command &c) {
        c.instrument.massMemory.checkDrive(c.arguments.more() ? c.arguments.string() : std::string{});
    });
    table.add("MMEMory:MSIS?", {}, [](Command &c) { c.response.string("C:"); });
}

void addMedia(CommandTable &table)
{
    table.add("SIMulate:MEDia", {1, 1}, [](Command &c) {
        const std::size_t media = c.arguments.choice({"NORMal", "MISSing", "CORRupt", "PROTected"});
        c.instrument.massMemory.setMedia(static_cast<MassMemory::Media>(media));
    });
    table.add("SIMulate:MEDia?", {}, [](Command &c) {
        constexpr std::array Names{"NORM", "MISS", "CORR", "PROT"};
        c.response.plain(Names.at(static_cast<std::size_t>(c.instrument.massMemory.media())));
    });
}

} // namespace

void addMassMemoryCommands(CommandTable &table)
{
    addFiles(table);
    addDirectories(table);
    addMedia(table);
}

} // namespace simulator
