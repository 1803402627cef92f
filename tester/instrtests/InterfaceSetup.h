#pragma once

#include <visatype.h>

#include <cstdint>
#include <string>

class VisaSessionWithLog;

/// What the tests have to know about the interface before they talk, and to set on it. Everything throws VisaError.
namespace interfacesetup
{

std::uint64_t number(VisaSessionWithLog &session, ViAttr attribute);
std::string text(VisaSessionWithLog &session, ViAttr attribute);

bool isSerial(VisaSessionWithLog &session);
/// A raw socket has neither service requests nor a status byte of its own.
bool isRawSocket(VisaSessionWithLog &session);

/// 115200 baud, 8 data bits, no parity, one stop bit; input does not end at a termination character.
void forceSerialSettings(VisaSessionWithLog &session, ViUInt16 flowControl);
/// Sets a boolean attribute to the opposite of what it is.
void toggle(VisaSessionWithLog &session, ViAttr attribute);

} // namespace interfacesetup
