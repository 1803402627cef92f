#pragma once

#include <string>

namespace kyvisa
{

/// What an instrument says of itself beside its resource string; empty where it says nothing.
struct LxiTexts {
    std::string manufacturer;
    std::string model;
    std::string serialNumber;
    std::string version; ///< of the firmware
    std::string description;
    std::string hostName;
};

/// Takes from @p more what @p texts does not have.
void fillIn(LxiTexts &texts, const LxiTexts &more);

/// One resource that viOpen accepts.
struct FoundResource {
    std::string name; ///< canonical
    LxiTexts texts;
};

} // namespace kyvisa
