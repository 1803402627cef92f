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

bool Transport::isLive(ViAttr) const
{
    return false;
}

ViStatus Transport::readAttribute(ViAttr, const os::WaitLimit &, ViUInt64 &)
{
    return VI_ERROR_NSUP_ATTR;
}

ViStatus Transport::flushLine(ViUInt16, const os::WaitLimit &)
{
    return VI_SUCCESS;
}

ViStatus Transport::resizeLine(ViUInt16, std::size_t)
{
    return VI_WARN_NSUP_BUF;
}

ViStatus Transport::watchServiceRequests(std::function<void()>, const os::WaitLimit &)
{
    return VI_ERROR_INV_EVENT;
}

ViStatus Transport::lockDevice(const std::string &, std::chrono::milliseconds, const os::WaitLimit &)
{
    return VI_ERROR_NSUP_OPER;
}

ViStatus Transport::unlockDevice(const os::WaitLimit &)
{
    return VI_ERROR_NSUP_OPER;
}

ViStatus Transport::readLockState(const os::WaitLimit &, ViAccessMode &)
{
    return VI_ERROR_NSUP_OPER;
}

} // namespace kyvisa
