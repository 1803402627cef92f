#pragma once

#include <string>

namespace simulator
{

struct InstrumentState;

/// The sections of the page that shows the instrument to people.
std::string statePage(const InstrumentState &state);

} // namespace simulator
