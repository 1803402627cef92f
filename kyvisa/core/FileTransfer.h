#pragma once

#include "kyvisa/include/visatype.h"

namespace kyvisa
{

class InstrumentSession;

/**
 * viReadToFile and viWriteFromFile: one message between an instrument and a file, in pieces, under one deadline.
 *
 * Both answer as viRead and viWrite do, VI_ERROR_FILE_ACCESS when the file cannot be opened, and VI_ERROR_FILE_IO when it
 * cannot be read or written. @p count receives the bytes transferred, also on errors.
 */
/// Replaces the file, or appends to it when VI_ATTR_FILE_APPEND_EN says so.
ViStatus readToFile(InstrumentSession &session, const char *file, ViUInt32 size, ViUInt32 &count);
/// Sends @p size bytes, or fewer where the file is shorter. END goes with the last one.
ViStatus writeFromFile(InstrumentSession &session, const char *file, ViUInt32 size, ViUInt32 &count);

} // namespace kyvisa
