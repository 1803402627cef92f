#include "kyvisa/api/Entry.h"

#include <span>

using namespace kyvisa;
using namespace kyvisa::api;

namespace
{

std::span<std::byte> bytes(ViPBuf buf, ViUInt32 cnt)
{
    return std::as_writable_bytes(std::span(buf, cnt));
}

std::span<const std::byte> bytes(ViConstBuf buf, ViUInt32 cnt)
{
    return std::as_bytes(std::span(buf, cnt));
}

} // namespace

ViStatus viRead(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return onInstrument(vi, "viRead", [&](InstrumentSession &session) -> ViStatus {
        if (!buf && cnt > 0)
            return VI_ERROR_USER_BUF;
        std::size_t count = 0;
        const ViStatus status = session.read(bytes(buf, cnt), count);
        storeIfWanted(retCnt, static_cast<ViUInt32>(count));
        return status;
    });
}

ViStatus viReadAsync(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPJobId jobId)
{
    return onInstrument(vi, "viReadAsync", [&](InstrumentSession &session) -> ViStatus {
        if (!buf && cnt > 0)
            return VI_ERROR_USER_BUF;
        ViJobId job = VI_NULL;
        const ViStatus status = session.readAsync(bytes(buf, cnt), job);
        storeIfWanted(jobId, job);
        return status;
    });
}

ViStatus viReadToFile(ViSession vi, ViConstString, ViUInt32, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return unimplemented(vi, "viReadToFile");
}

ViStatus viWrite(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return onInstrument(vi, "viWrite", [&](InstrumentSession &session) -> ViStatus {
        if (!buf && cnt > 0)
            return VI_ERROR_USER_BUF;
        std::size_t count = 0;
        const ViStatus status = session.write(bytes(buf, cnt), count);
        storeIfWanted(retCnt, static_cast<ViUInt32>(count));
        return status;
    });
}

ViStatus viWriteAsync(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPJobId jobId)
{
    return onInstrument(vi, "viWriteAsync", [&](InstrumentSession &session) -> ViStatus {
        if (!buf && cnt > 0)
            return VI_ERROR_USER_BUF;
        ViJobId job = VI_NULL;
        const ViStatus status = session.writeAsync(bytes(buf, cnt), job);
        storeIfWanted(jobId, job);
        return status;
    });
}

ViStatus viWriteFromFile(ViSession vi, ViConstString, ViUInt32, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return unimplemented(vi, "viWriteFromFile");
}

ViStatus viAssertTrigger(ViSession vi, ViUInt16 protocol)
{
    return onInstrument(vi, "viAssertTrigger",
                        [&](InstrumentSession &session) { return session.assertTrigger(protocol); });
}

ViStatus viReadSTB(ViSession vi, ViPUInt16 status)
{
    storeIfWanted<ViUInt16>(status, 0);
    return onInstrument(vi, "viReadSTB", [&](InstrumentSession &session) {
        ViUInt16 byte = 0;
        const ViStatus result = session.readStatusByte(byte);
        storeIfWanted(status, byte);
        return result;
    });
}

ViStatus viClear(ViSession vi)
{
    return onInstrument(vi, "viClear", [](InstrumentSession &session) { return session.clear(); });
}

ViStatus viSetBuf(ViSession vi, ViUInt16, ViUInt32)
{
    return unimplemented(vi, "viSetBuf");
}

ViStatus viFlush(ViSession vi, ViUInt16)
{
    return unimplemented(vi, "viFlush");
}

ViStatus viBufWrite(ViSession vi, ViConstBuf, ViUInt32, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return unimplemented(vi, "viBufWrite");
}

ViStatus viBufRead(ViSession vi, ViPBuf, ViUInt32, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return unimplemented(vi, "viBufRead");
}
