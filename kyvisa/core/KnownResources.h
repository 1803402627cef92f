#pragma once

#include "kyvisa/core/ResourceName.h"
#include "kyvisa/discovery/FoundResource.h"

#include <string_view>
#include <vector>

namespace kyvisa
{

struct Configuration;

/// What needs no search: the resources of the configuration file, in its order, then the GPIB boards that have a gateway,
/// then the serial ports. Entries that are no resource names are left out.
/// @param serialPorts how many the system has.
std::vector<FoundResource> knownResources(const Configuration &configuration, std::size_t serialPorts);

/// Appends what @p found does not have yet. Of a resource that it has, the texts that are missing are filled in.
void addResources(std::vector<FoundResource> &found, std::vector<FoundResource> more);

/// Parses a resource name or an alias of one. @return VI_SUCCESS or VI_ERROR_INV_RSRC_NAME.
ViStatus parseNameOrAlias(std::string_view text, const Configuration &configuration, ResourceName &name);

/// The alias of a resource, given its canonical name; empty when it has none.
std::string aliasOf(const std::string &canonicalName, const Configuration &configuration);

} // namespace kyvisa
