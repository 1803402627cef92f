#pragma once

/// The commands of the instrument, one source file a subsystem.
namespace simulator
{

class CommandTable;

void addCommonCommands(CommandTable &table);        ///< IEEE 488.2, `*...`
void addSystemCommands(CommandTable &table);        ///< SYSTem
void addStatusCommands(CommandTable &table);        ///< STATus
void addSourceMeasureCommands(CommandTable &table); ///< SOURce, OUTPut, MEASure, INITiate and friends
void addMassMemoryCommands(CommandTable &table);    ///< MMEMory

} // namespace simulator
