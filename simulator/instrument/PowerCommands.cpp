#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

namespace simulator
{

void addPowerCommands(CommandTable &table)
{
    table.add("SIMulate:POWer:CYCLe", {}, [](Command &c) { c.instrument.powerCycle(); });
}

} // namespace simulator
