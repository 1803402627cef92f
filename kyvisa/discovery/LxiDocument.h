#pragma once

#include "kyvisa/discovery/FoundResource.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace kyvisa
{

/// What the LXI identification document of an instrument tells.
struct LxiDocument {
    LxiTexts texts;
    std::vector<std::string> resources; ///< its InstrumentAddressStrings, as written
};

/**
 * Reads an LXI identification document, of whichever version: elements count by their local names. Nothing when the text
 * is not one. Entities beyond the five of XML and character references are left as they stand; there are no other
 * documents behind one.
 */
std::optional<LxiDocument> readLxiDocument(std::string_view text);

} // namespace kyvisa
