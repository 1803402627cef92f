#pragma once

#include "kyvisa/core/ResourceName.h"

#include <memory>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}
class AttributeStore;
class Transport;

/// The name with the protocol decided: without a device name it becomes that of the protocol that will be used.
ResourceName withTransportChosen(ResourceName name);

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
