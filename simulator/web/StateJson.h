#pragma once

#include <string>

namespace simulator
{

struct InstrumentState;

/// The state as a JSON document, for programs. What is no UTF-8 becomes U+FFFD.
std::string stateJson(const InstrumentState &state);

} // namespace simulator
