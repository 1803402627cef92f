#pragma once

#include <string>
#include <vector>

namespace kyvisa::os
{

/**
 * The device files of the serial ports that have real hardware behind them; ASRL1 is the first one.
 *
 * First those that are built in, by name, the number as a number; then those that /dev/serial/by-id knows, by their name there:
 * an adapter keeps its place when it is plugged in elsewhere or later.
 *
 * @param root stands before all system paths; tests put a tree of their own there.
 */
std::vector<std::string> serialPorts(const std::string &root = {});

} // namespace kyvisa::os
