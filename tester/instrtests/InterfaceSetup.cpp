#include "instrtests/InterfaceSetup.h"

#include "visa/Attribute.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <QScopeGuard>

#include <cstdlib>

namespace interfacesetup
{

std::uint64_t number(VisaSessionWithLog &session, ViAttr attribute)
{
    Attribute value{.id = attribute};
    session.getAttribute(value, true);
    return value.value;
}

std::string text(VisaSessionWithLog &session, ViAttr attribute)
{
    Attribute value{.id = attribute};
    const auto release = qScopeGuard([&value] { std::free(reinterpret_cast<void *>(value.value)); });
    session.getAttribute(value, true);
    return value.text();
}

bool isSerial(VisaSessionWithLog &session)
{
    return number(session, VI_ATTR_INTF_TYPE) == VI_INTF_ASRL;
}

bool isRawSocket(VisaSessionWithLog &session)
{
    return text(session, VI_ATTR_RSRC_CLASS) == "SOCKET";
}

void forceSerialSettings(VisaSessionWithLog &session, ViUInt16 flowControl)
{
    session.setAttribute(VI_ATTR_TERMCHAR_EN, VI_FALSE, true);
    session.setAttribute(VI_ATTR_ASRL_BAUD, 115200, true);
    session.setAttribute(VI_ATTR_ASRL_DATA_BITS, 8, true);
    session.setAttribute(VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_NONE, true);
    session.setAttribute(VI_ATTR_ASRL_STOP_BITS, VI_ASRL_STOP_ONE, true);
    session.setAttribute(VI_ATTR_ASRL_FLOW_CNTRL, flowControl, true);
}

void toggle(VisaSessionWithLog &session, ViAttr attribute)
{
    session.setAttribute(attribute, number(session, attribute) == 0 ? VI_TRUE : VI_FALSE, true);
}

} // namespace interfacesetup
