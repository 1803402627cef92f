#pragma once

#include "kyvisa/core/ResourceName.h"

#include <memory>
#include <vector>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}
class AttributeStore;
struct Configuration;
class Transport;

/// The names under which to open it, best first. A LAN instrument without a device name may be meant in either protocol.
/// A GPIB name gets the gateway that the configuration has for its board.
std::vector<ResourceName> transportChoices(const ResourceName &name, const Configuration &configuration);

/// By what the processes of this machine know the resource when they lock it: the name, and the way to it where the name alone
/// does not say that.
std::string lockName(const ResourceName &name);

/// The kind of session (AttributeTable.h) that a resource makes; 0 where this library has no transport for it, with the
/// status that says so in @p status.
std::uint16_t sessionKind(const ResourceName &name, ViStatus &status);

/**
 * Connects to the instrument that @p name means.
 *
 * @param attributes receives what the connection knows: address, port, protocol version.
 */
ViStatus openTransport(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                       std::unique_ptr<Transport> &transport);

} // namespace kyvisa
