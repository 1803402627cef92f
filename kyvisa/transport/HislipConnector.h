#pragma once

#include "kyvisa/include/visatype.h"

#include <memory>

namespace kyvisa
{

class AttributeStore;
class Transport;
struct ResourceName;
namespace os
{
struct WaitLimit;
}

/// Opens both connections of a HiSLIP session and agrees on the sizes of messages. A server that wants encryption is refused
/// with VI_ERROR_INV_PROT, one that has no more room answers VI_ERROR_RSRC_BUSY.
ViStatus connectHislip(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                       std::unique_ptr<Transport> &transport);

} // namespace kyvisa
