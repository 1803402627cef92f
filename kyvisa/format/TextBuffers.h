#pragma once

#include "kyvisa/format/Arguments.h"

#include "kyvisa/include/visatype.h"

namespace kyvisa::format
{

/// viSPrintf: @p buffer has room for the text and the NUL behind it, by the caller's promise.
ViStatus printToText(char *buffer, const char *format, Arguments &arguments);
/// viSScanf: the text up to its NUL is one message.
ViStatus scanText(const char *text, const char *format, Arguments &arguments);

} // namespace kyvisa::format
