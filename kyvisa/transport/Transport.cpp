#include "kyvisa/transport/Transport.h"

#include "kyvisa/include/visa.h"

namespace kyvisa
{

ViStatus Transport::controlRemote(ViUInt16, const os::WaitLimit &)
{
    return VI_ERROR_NSUP_OPER;
}

ViStatus Transport::applyAttribute(ViAttr, ViUInt64, const os::WaitLimit &)
{
    return VI_SUCCESS;
}

ViStatus Transport::watchServiceRequests(std::function<void()>)
{
    return VI_ERROR_INV_EVENT;
}

} // namespace kyvisa
