#pragma once

#include <cstdint>

namespace kyvisa
{

class AttributeStore;
struct ResourceName;

/// The kind (AttributeTable.h) of session that a resource of this name has, whether this library can open it or not.
std::uint16_t kindOf(const ResourceName &name);

/// Stores the attributes that the name alone tells.
void describeResource(const ResourceName &name, AttributeStore &attributes);

} // namespace kyvisa
