#include "kyvisa/transport/IoStatus.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/os/StreamSocket.h"

namespace kyvisa
{

ViStatus transferStatus(os::IoResult result, const os::WaitLimit &limit)
{
    switch (result) {
    case os::IoResult::Done:
        return VI_SUCCESS;
    case os::IoResult::TimedOut:
        return VI_ERROR_TMO;
    case os::IoResult::Woken:
        return limit.wakeup.closed() ? VI_ERROR_INV_OBJECT : VI_ERROR_ABORT;
    case os::IoResult::Closed:
    case os::IoResult::NoAddress:
        return VI_ERROR_CONN_LOST;
    case os::IoResult::NoMemory:
        break;
    }
    return VI_ERROR_IO;
}

ViStatus connectStatus(os::IoResult result, const os::WaitLimit &limit)
{
    switch (result) {
    case os::IoResult::Closed:
    case os::IoResult::NoAddress:
        return VI_ERROR_RSRC_NFOUND;
    case os::IoResult::NoMemory:
        return VI_ERROR_ALLOC;
    default:
        return transferStatus(result, limit);
    }
}

ViStatus resizeBuffersOf(os::StreamSocket &socket, ViUInt16 mask, std::size_t size)
{
    if (!socket.isOpen())
        return VI_ERROR_CONN_LOST;
    const bool input = (mask & VI_IO_IN_BUF) == 0 || socket.setReceiveBuffer(size);
    const bool output = (mask & VI_IO_OUT_BUF) == 0 || socket.setSendBuffer(size);
    return input && output ? VI_SUCCESS : VI_WARN_NSUP_BUF;
}

} // namespace kyvisa
