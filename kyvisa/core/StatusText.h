#pragma once

#include "kyvisa/include/visatype.h"

namespace kyvisa
{

/// The sentence for @p status, or nullptr for a status that the library does not know.
const char *statusText(ViStatus status);
/// Its name in visa.h, or nullptr.
const char *statusName(ViStatus status);

} // namespace kyvisa
