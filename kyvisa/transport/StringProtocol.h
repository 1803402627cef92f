#pragma once

#include "kyvisa/include/visatype.h"

namespace kyvisa
{

class Transport;
namespace os
{
struct WaitLimit;
}

/**
 * Status byte and trigger for connections that can carry nothing but text (VI_PROT_4882_STRS): "*STB?" and "*TRG". The caller
 * has checked that the user wants that.
 */
ViStatus queryStatusByte(Transport &transport, const os::WaitLimit &limit, ViUInt16 &status);
ViStatus sendTrigger(Transport &transport, const os::WaitLimit &limit);

} // namespace kyvisa
