#pragma once

/// The commands of the instrument, one source file a subsystem.
namespace simulator
{

class CommandTable;

/// All that follow, those of the source and measure subsystems only if wanted.
void addBuiltInCommands(CommandTable &table, bool sourceMeasure);

void addCommonCommands(CommandTable &table);        ///< IEEE 488.2, `*...`
void addSystemCommands(CommandTable &table);        ///< SYSTem
void addStatusCommands(CommandTable &table);        ///< STATus
void addFaultCommands(CommandTable &table);         ///< DIAGnostic:FAULt
void addSourceMeasureCommands(CommandTable &table); ///< SOURce, OUTPut, MEASure
void addAcquisitionCommands(CommandTable &table);   ///< INITiate, TRIGger, SAMPle, FETCh and friends
void addDisplayCommands(CommandTable &table);       ///< DISPlay
void addMassMemoryCommands(CommandTable &table);    ///< MMEMory
void addPowerCommands(CommandTable &table);         ///< SIMulate:POWer

} // namespace simulator
